// The flash model as a chip, driven on the wire; the file that keeps its
// contents between runs; its configuration from the part database.

#include "ports/sim/FlashFile.h"
#include "ports/sim/FlashFileError.h"
#include "tests/sim/SimTestSupport.h"
#include "tests/support/ScratchFolder.h"
#include "tests/support/TestParts.h"

#include "host/VorantException.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <sstream>
#include <tuple>

namespace vorant::sim::test {
namespace {

using vorant::test::ScratchFolder;

// Plays a transcript on the chip at its 50 MHz clock; returns "" or the
// first step whose answer differs. Steps are separated by '|': a
// transaction is its MOSI bytes in hex, then optionally '>' and the MISO
// bytes expected after them (00h is sent meanwhile), and a '~' to clock one
// more bit before chip select rises; "+N" lets N microseconds pass.
std::string play(FlashModel& chip, const std::string& transcript) {
    std::istringstream steps(transcript);
    for (std::string step; std::getline(steps, step, '|');) {
        const bool offAByte = !step.empty() && step.back() == '~';
        if (offAByte) step.pop_back();
        const std::size_t wait = step.find('+'), split = std::min(step.find('>'), step.size());
        if (wait != std::string::npos) {
            chip.advance(std::stoull(step.substr(wait + 1)) * 1000);
            continue;
        }
        const Bytes expected = hexBytes(step.substr(std::min(split + 1, step.size())));
        Bytes answer;
        chip.select();
        for (std::uint8_t b : hexBytes(step.substr(0, split))) chip.clockByte(b);
        while (answer.size() < expected.size()) answer.push_back(chip.clockByte(0x00));
        if (offAByte) chip.clockBit(true);
        chip.deselect();
        std::string read;
        for (std::uint8_t b : answer) read += {"0123456789ABCDEF"[b >> 4], "0123456789ABCDEF"[b & 15]};
        if (answer != expected) return step + " read " + read;
    }
    return "";
}

TEST(FlashModel, Transcripts) {
    // What each shows, a change to the small part, the transcript.
    const std::tuple<const char*, void (*)(FlashConfig&), const char*> cases[] = {
        {"a program only clears bits and wraps inside its page", nullptr,
         "06|02 000100 F00FAA|+700|06|02 000100 3CFF55|+700|03 000100>300F00FF|"
         "06|02 0002FE 01020304|+700|03 0002FE>0102FF|03 000200>0304FF"},
        {"without the write enable latch nothing is written", nullptr,
         "06|02 000000 00|+700|06|04|20 000000|C7|02 000001 00|01 1C02|05>00|35>00|03 000000>00FF"},
        {"a write command ending off a byte boundary does nothing", nullptr,
         "06|02 000000 00~|05>02|20 000000~|C7~|01 1C02~|05>02|03 000000>FF"},
        {"block protection stops erase and program, and resets the latch", nullptr,
         "06|02 000000 00|+700|06|01 04|+10000|06|20 000000|05>04|06|C7|06|02 000001 00|05>04|03 000000>00FF"},
        {"while busy only status reads answer; reads wrap at the end", nullptr,
         "06|02 000000 42|+700|06|02 000100 00|05>0303|35>00|03 000000>FFFF|9F>FFFFFF|04|02 000200 00|B9|05>03|"
         "+700|05>00|03 000000>42|03 000100>00|03 000200>FF|03 00FFFF>FF42"},
        {"WIP and WEL stay set for exactly the busy time", nullptr,
         "06|02 000000 00|+699|05>03|+1|05>00|06|20 000000|+44999|05>03|+1|05>00|"
         "06|C7|+39999|05>03|+1|05>00|06|01 00|+9999|05>03|+1|05>00"},
        {"an erase sets exactly its sector, or the whole array", nullptr,
         "06|02 000FFF 00|+700|06|02 002000 00|+700|06|02 001000 00|+700|06|20 001234|+45000|"
         "03 000FFF>00FF|03 001FFF>FF00|06|C7|+40000|03 000FFF>FF|03 002000>FF"},
        {"deep power-down (an opcode alone) answers only the release, which wakes the chip after its time", nullptr,
         "B9 00|05>00|B9|9F>FFFFFF|05>FF|06|AB 000000>1313|9F>FF|+3|9F>EF4010|05>00"},
        {"ID repeats, signature after three dummy bytes, unknown opcode", nullptr,
         "9F>EF4010EF4010EF|AB 000000>131313|AB>FFFFFF13|77>FFFF"},
        {"no signature", [](FlashConfig& c) { c.hasSignature = false; }, "AB 000000>FFFF"},
        {"SFDP: a 3-byte address and one dummy byte, then the area from there, FFh past its end",
         [](FlashConfig& c) { c.sfdp = {0x53, 0x46, 0x44, 0x50, 0x06, 0x01}; },
         "5A 000000 FF>53464450|5A 000003 00>500601FFFF|5A 010000 00>FF"},
        {"a chip without SFDP ignores 5Ah", nullptr, "5A 000000 FF>FFFF|9F>EF4010"},
        {"a 32-bit address part: native 4-byte opcodes and legacy 3-byte ones",
         [](FlashConfig& c) {
             c.sizeBytes = 32 * 1024 * 1024, c.addressBytes = 4;
             c.opRead = 0x13, c.opFastRead = 0x0C, c.opPageProgram = 0x12, c.opSectorErase = 0x21;
         },
         "06|12 01234500 1122|+700|06|02 234500 33|+700|13 01234500>1122|0C 01234501 00>22|03 234500>33|"
         "06|21 01234500|+45000|13 01234500>FF|03 234500>33"},
        // New values show at deselect; one byte keeps register 2 (QE), two
        // change it; WIP, WEL and read-only bits are not written.
        {"two-byte status write", nullptr,
         "06|01 1C02|05>1F|+10000|05>1C|35>02|06|01 00|+10000|05>00|35>02|06|01 0000|+10000|35>00|"
         "06|01 0386|+10000|05>00|35>02"},
        {"a part taking one status byte ignores a second",
         [](FlashConfig& c) { c.qe = QeLocation::None, c.writeStatusTakesTwoBytes = false; },
         "06|01 1C02|+10000|05>1C|35>00"},
        {"QE in register 1 bit 6", [](FlashConfig& c) { c.qe = QeLocation::Sr1Bit6; }, "06|01 40|+10000|05>40"},
    };
    for (const auto& [name, change, transcript] : cases) {
        FlashConfig part = smallPart();
        if (change) change(part);
        FlashModel chip(part);
        EXPECT_EQ(play(chip, transcript), "") << name;
    }
}

// Two instances on one file: the second finds the first's programs, erases
// and status bits.
TEST(FlashFile, KeepsTheFlashBetweenRuns) {
    ScratchFolder folder;
    const std::string path = folder.file("flash.bin");
    {
        FlashModel chip(smallPart(), FaultPlan{}, path);
        EXPECT_EQ(play(chip, "06|02 001200 1234|+700|06|02 002000 00|+700|06|20 002000|+45000|06|01 1C02|+10000"), "");
    }
    FlashModel again(smallPart(), FaultPlan{}, path);
    EXPECT_EQ(play(again, "03 0011FF>FF1234FF|03 002000>FF|05>1C|35>02"), "");
    EXPECT_EQ(folder.names(), std::vector<std::string>{"flash.bin"});
}

// A file that cannot be this flash's is refused untouched, saying why: cut
// short while it was made, the complete file of another chip, or no flash
// file at all. The small part holds 64 KiB.
TEST(FlashFile, RefusesAFileOfAnotherSizeNamingWhy) {
    using Kind = FlashFileError::Kind;
    const std::string trailer = std::string("VSIMFLSH") + std::string(8, '\0');
    const std::tuple<std::string, Kind, const char*> cases[] = {
        {std::string(32 * 1024, '\xFF'), Kind::Truncated, "is truncated: it holds 32768 bytes and no status trailer"},
        {std::string(5, '\xFF'), Kind::Truncated, "is truncated: it holds 5 bytes"},
        {std::string(32 * 1024, '\xFF') + trailer, Kind::OtherChip, "of a chip with 32768 bytes of flash"},
        {std::string(128 * 1024, '\xFF') + trailer, Kind::OtherChip, "of a chip with 131072 bytes of flash"},
        {std::string(128 * 1024, '\x5A'), Kind::Unusable, "not a simulated flash file"},
        {std::string(64 * 1024 + FlashFile::kTrailerBytes, '\x5A'), Kind::Unusable, "status trailer is missing"},
    };
    ScratchFolder folder;
    const std::string path = folder.file("flash.bin");
    for (const auto& [contents, kind, reason] : cases) {
        std::ofstream(path, std::ios::binary | std::ios::trunc) << contents;
        try {
            FlashModel(smallPart(), FaultPlan{}, path);
            ADD_FAILURE() << reason << ": accepted";
        } catch (const FlashFileError& e) {
            EXPECT_EQ(e.kind(), kind) << e.what();
            EXPECT_NE(std::string(e.what()).find("flash file '" + path + "' "), std::string::npos) << e.what();
            EXPECT_NE(std::string(e.what()).find(reason), std::string::npos) << e.what();
            if (contents.size() != 64 * 1024 + FlashFile::kTrailerBytes) {
                EXPECT_NE(std::string(e.what()).find("this chip holds 65552"), std::string::npos) << e.what();
            }
        }
        std::ifstream in(path, std::ios::binary);
        EXPECT_TRUE(std::string(std::istreambuf_iterator<char>(in), {}) == contents) << reason;
        EXPECT_EQ(folder.names(), std::vector<std::string>{"flash.bin"});
    }
}

// The facts a chip takes from its part; the register-2 read opcode in
// decimal (-1: the chip has none).
std::string summary(const FlashConfig& c) {
    const char* qe[] = {"none", "SR2.1", "SR1.6"};
    char text[200];
    std::snprintf(text, sizeof text, "%uK a%d id %02X%02X%02X sig %02X/%d qe %s/%d rs2 %d se %02X/%u pp %u rel %u "
                  "s1 %02X s2 %02X", unsigned(c.sizeBytes / 1024), c.addressBytes, c.jedecId[0], c.jedecId[1],
                  c.jedecId[2], c.signature, c.hasSignature, qe[int(c.qe)], c.writeStatusTakesTwoBytes, c.opReadStatus2,
                  c.opSectorErase, c.sectorBytes, c.pageProgramUs, c.releaseUs, c.status1WritableMask,
                  c.status2WritableMask);
    return text;
}

// A part (W25Q128- or M25P16-like) with some keys changed (nullptr: removed),
// and the configuration it gives or a text its refusal must contain.
TEST(FlashConfig, FromThePartDatabase) {
    const std::tuple<bool, std::vector<std::pair<const char*, const char*>>, const char*> cases[] = {
        {false, {}, "16384K a3 id EF4018 sig 17/1 qe SR2.1/1 rs2 53 se 20/4096 pp 700 rel 3 s1 FC s2 7B"},
        {true, {}, "2048K a3 id 202015 sig 14/1 qe none/0 rs2 -1 se D8/65536 pp 640 rel 30 s1 9C s2 00"},
        // Optional keys missing: the ID from IDCODE (the signature, for a
        // part identified by it), QE and the status write from X4_READ,
        // default busy times.
        {false, {{"JEDEC_ID", nullptr}, {"RES_SIGNATURE", nullptr}, {"QE_LOCATION", nullptr}, {"WRSR_BITS", nullptr}},
         "id EF4018 sig 00/0 qe SR2.1/1 rs2 53"},
        {true, {{"JEDEC_ID", nullptr}, {"RES_SIGNATURE", nullptr}, {"SIM_PAGE_PROGRAM_US", nullptr},
                {"SIM_RELEASE_US", nullptr}, {"QE_LOCATION", nullptr}, {"WRSR_BITS", nullptr}},
         "2048K a3 id FFFFFF sig 14/1 qe none/0 rs2 -1 se D8/65536 pp 700 rel 3 s1 9C"},
        {true, {{"QE_LOCATION", "SR1.6"}}, "qe SR1.6/0 rs2 -1 se D8/65536 pp 640 rel 30 s1 DC"},
        {false, {{"ADDRESS_SIZE", "32"}}, "16384K a4 id EF4018"},
        {false, {{"READ_INSTRUCTION", "0000001x"}}, "READ_INSTRUCTION"},
        {false, {{"ADDRESS_SIZE", "16"}}, "ADDRESS_SIZE"},
        {false, {{"SIM_PAGE_PROGRAM_US", "-1"}}, "SIM_PAGE_PROGRAM_US"},
    };
    for (const auto& [m25p, edits, expected] : cases) {
        vorant::test::Properties p = m25p ? vorant::test::m25p16Properties() : vorant::test::w25q128Properties();
        for (const auto& [key, value] : edits) {
            if (value) p[key] = value;
            else p.erase(key);
        }
        std::string got;
        try {
            got = summary(FlashConfig::fromPartDatabase(vorant::test::addTestPart("SIM_CONFIG", p)));
        } catch (const VorantException& error) {
            got = error.what();
        }
        EXPECT_NE(got.find(expected), std::string::npos) << got;
    }
}

}  // namespace
}  // namespace vorant::sim::test
