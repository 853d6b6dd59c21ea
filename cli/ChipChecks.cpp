#include "cli/ChipChecks.h"

#include "cli/ChipProbe.h"
#include "cli/ToolFailure.h"
#include "host/ConstraintsManager.h"
#include "host/RLBitVec.h"
#include "host/UT_STR.h"

#include <cstdint>
#include <cstdio>
#include <string>
#include <vector>

namespace vorant::cli {

namespace {

constexpr int kIdBytes = 3;
constexpr unsigned kQuadEnableBit = 1;  // bit 1 of status register 2

std::string partText(const std::string& part, const char* key) {
    ConstraintsManager& database = ConstraintsManager::instance();
    return database.hasProperty(part, key) ? database.getDeviceStringProperty(part.c_str(), key) : "";
}

bool partFlag(const std::string& part, const char* key) {
    return UT_STR::ICompare(partText(part, key).c_str(), "TRUE") == 0;
}

std::string portReason(ScanPort& port) {
    const char* reason = port.failureReason();
    return reason != nullptr ? std::string(": ") + reason : std::string();
}

bool allBytesAre(const std::vector<std::uint8_t>& bytes, std::uint8_t value) {
    for (std::uint8_t byte : bytes)
        if (byte != value) return false;
    return true;
}

// The JEDEC ID the part answers; empty for a part identified by its RES
// signature alone.
std::string partJedecId(const std::string& part) {
    const std::string jedec = partText(part, "JEDEC_ID");
    if (!jedec.empty()) return jedec;
    return partFlag(part, "USE_RES") ? std::string() : partText(part, "IDCODE");
}

void checkChipIsThePart(const std::vector<std::uint8_t>& id, const std::string& part) {
    const std::string expected = partJedecId(part);
    const std::string read = hexText(id);
    if (expected.empty() || UT_STR::ICompare(expected.c_str(), read.c_str()) == 0) return;
    std::string names;
    for (const std::string& name : ConstraintsManager::instance().partsWithId(read))
        names += (names.empty() ? "" : ", ") + name;
    throw ToolFailure("the chip answers the JEDEC ID " + read + (names.empty() ? "" : " (" + names + ")") +
                      ", not " + part + "'s " + expected +
                      "; nothing was written: name the right part, or give --force to write anyway");
}

void checkChipAnswers(ChipProbe& probe, ScanPort& port, const std::string& part, bool idMustMatch) {
    const auto id = probe.read(partText(part, "IDENTIFICATION_INSTRUCTION"), kIdBytes);
    if (!id) throw ToolFailure("the chip's ID could not be read" + portReason(port) + "; nothing was written");
    // A chip in deep power-down, or none at all, leaves MISO at one level.
    if (allBytesAre(*id, 0xFF) || allBytesAre(*id, 0x00))
        throw ToolFailure("no chip answered the ID read (it read " + hexText(*id) +
                         "): check the connection, or wake a chip in deep power-down with 'vorant-spi --part " +
                         part + " release'; nothing was written");
    if (idMustMatch) checkChipIsThePart(*id, part);
}

// The status register 1 bits the part labels BP0, BP1, ...
std::string setBlockProtectBits(const std::string& part, std::uint8_t status) {
    std::string names;
    for (int bit = 7; bit >= 0; --bit) {
        const std::string label = partText(part, ("STATUS_LOCATION_" + std::to_string(bit)).c_str());
        if (UT_STR::IMatch(label.c_str(), "BP*") == 0 || ((status >> bit) & 1u) == 0) continue;
        names += (names.empty() ? "" : ", ") + label;
    }
    return names;
}

void checkNoBlockProtection(ChipProbe& probe, ScanPort& port, const std::string& part) {
    const auto status = probe.readRegister(partText(part, "READSTATUS_INSTRUCTION"));
    if (!status)
        throw ToolFailure("status register 1 could not be read" + portReason(port) + "; nothing was written");
    const std::string names = setBlockProtectBits(part, *status);
    if (names.empty()) return;
    char value[8];
    std::snprintf(value, sizeof value, "0x%02X", static_cast<unsigned>(*status));
    throw ToolFailure("the chip is write-protected: " + names + " set in status register 1 (" + value +
                     "), so erase and program would change nothing; clear them with 'vorant-spi --part " + part +
                     " unlock'; nothing was written");
}

}  // namespace

void checkChipBeforeWrite(ScanPort& port, const std::string& part, const WriteCheck& check) {
    ChipProbe probe(port);
    if (check.chipMustAnswer) checkChipAnswers(probe, port, part, check.idMustMatch);
    if (check.noBlockProtection && !partFlag(part, "USE_UNLOCKSR")) checkNoBlockProtection(probe, port, part);
}

bool recordIdCheck(ScanPort& port, const std::string& part) {
    const std::string id = partJedecId(part);
    if (id.size() != 2 * kIdBytes) return true;
    std::vector<std::uint8_t> expected(kIdBytes);
    for (int k = 0; k < kIdBytes; ++k) expected[k] = static_cast<std::uint8_t>(std::stoul(id.substr(2 * k, 2), nullptr, 16));
    const std::string instruction = partText(part, "IDENTIFICATION_INSTRUCTION");
    RLBitVec opcode(instruction.size(), false);
    for (std::size_t j = 0; j < instruction.size(); ++j) opcode.setBit(j, instruction[j] == '1');
    RLBitVec opcodeOnes(opcode.length(), true), opcodeZeros(opcode.length(), false);
    // The expected answer in the wire layout: first byte first, MSB first.
    RLBitVec answer(expected.data(), expected.size() * 8), answerOnes(answer.length(), true);
    port.comment(("//Checking the chip's JEDEC ID (" + id + "): a player stops here on another chip.\n").c_str());
    const bool opened = port.shift(ScanStage::kOpen, &opcode, &opcodeOnes, &opcodeZeros, &opcodeZeros);
    return port.shift(ScanStage::kCaptureClose, &answer, &answerOnes, &answer, &answerOnes) && opened;
}

void checkQuadEnableAfterWrite(ScanPort& port, const std::string& part, bool expectedSet) {
    ChipProbe probe(port);
    const auto status2 = probe.readRegister(partText(part, "READSTATUS2_INSTRUCTION"));
    if (!status2)
        throw ToolFailure("status register 2 could not be read back to check Quad Enable" + portReason(port));
    const bool set = ((*status2 >> kQuadEnableBit) & 1u) != 0;
    if (set == expectedSet) return;
    char value[8];
    std::snprintf(value, sizeof value, "0x%02X", static_cast<unsigned>(*status2));
    throw ToolFailure(std::string("Quad Enable was to be ") + (expectedSet ? "set" : "cleared") +
                     " but status register 2 reads " + value + " (QE " + (set ? "set" : "clear") +
                     ") after the write");
}

}  // namespace vorant::cli
