// Self-check of the shipped part database (parts/*.toml). Every shipped part
// is loaded through the host's loader and held to the rules that the
// plug-in, the flash simulator and identification rely on, then compared
// with the datasheet facts it was built from. The rule checker itself is
// proven on deliberately broken copies of shipped parts.

#include "host/ConstraintsManager.h"
#include "host/VorantException.h"
#include "tests/support/TestParts.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <climits>
#include <cstdint>
#include <map>
#include <optional>
#include <ostream>
#include <set>
#include <string>
#include <vector>

namespace {

using Properties = std::map<std::string, std::string>;

// ---------------------------------------------------------------------------
// Facts per part, taken once from shared/reference/spi-nor-parts.tsv (which
// CI does not see). Opcodes are the 3-byte-address ones of the table; -1
// marks an absent command or a time the datasheet does not give. An empty
// file marks a part that is deliberately not shipped.

struct Opcodes {
    int wren, wrdi, rdid, rdsr, rdsr2, wrsr, read, fastRead, pp, se, be, dp, res;
};

struct Reference {
    const char* part;
    const char* file;
    const char* vendor;
    const char* jedecId;
    const char* resSignature;  // "" when the part has none
    long long sizeBytes;
    int pageBytes;
    int addressBits;
    Opcodes op;
    long long sectorBytes;
    const char* qeLocation;
    int wrsrBits;
    long long tppTypUs, tppMaxUs, tbeTypMs, tbeMaxMs, twMaxMs, tresUs;
};

const Reference kReference[] = {
    {"W25Q16JV", "winbond.toml", "Winbond", "EF4015", "14", 2097152, 256, 24,
     {0x06, 0x04, 0x9F, 0x05, 0x35, 0x01, 0x03, 0x0B, 0x02, 0x20, 0xC7, 0xB9, 0xAB}, 4096, "SR2.1", 8,
     400, 3000, 5000, 25000, 15, 3},
    {"W25Q32JV", "winbond.toml", "Winbond", "EF4016", "15", 4194304, 256, 24,
     {0x06, 0x04, 0x9F, 0x05, 0x35, 0x01, 0x03, 0x0B, 0x02, 0x20, 0xC7, 0xB9, 0xAB}, 4096, "SR2.1", 16,
     400, 3000, 10000, 50000, 15, 3},
    {"W25Q64JV", "winbond.toml", "Winbond", "EF4017", "16", 8388608, 256, 24,
     {0x06, 0x04, 0x9F, 0x05, 0x35, 0x01, 0x03, 0x0B, 0x02, 0x20, 0xC7, 0xB9, 0xAB}, 4096, "SR2.1", 16,
     400, 3000, 20000, 100000, 15, 3},
    {"W25Q128JV", "winbond.toml", "Winbond", "EF4018", "17", 16777216, 256, 24,
     {0x06, 0x04, 0x9F, 0x05, 0x35, 0x01, 0x03, 0x0B, 0x02, 0x20, 0xC7, 0xB9, 0xAB}, 4096, "SR2.1", 16,
     700, 3000, 40000, 200000, 15, 3},
    {"W25Q256JV", "winbond.toml", "Winbond", "EF4019", "18", 33554432, 256, 32,
     {0x06, 0x04, 0x9F, 0x05, 0x35, 0x01, 0x03, 0x0B, 0x02, 0x20, 0xC7, 0xB9, 0xAB}, 4096, "SR2.1", 8,
     700, 3000, 80000, 400000, 15, 3},
    {"MX25L3233F", "macronix.toml", "Macronix", "C22016", "15", 4194304, 256, 24,
     {0x06, 0x04, 0x9F, 0x05, -1, 0x01, 0x03, 0x0B, 0x02, 0x20, 0xC7, 0xB9, 0xAB}, 4096, "SR1.6", 8,
     500, 3000, 25000, 50000, 40, 9},
    {"MX25L6433F", "macronix.toml", "Macronix", "C22017", "16", 8388608, 256, 24,
     {0x06, 0x04, 0x9F, 0x05, -1, 0x01, 0x03, 0x0B, 0x02, 0x20, 0xC7, 0xB9, 0xAB}, 4096, "SR1.6", 8,
     500, 3000, 50000, 100000, 40, 9},
    {"MX25L12835F", "macronix.toml", "Macronix", "C22018", "17", 16777216, 256, 24,
     {0x06, 0x04, 0x9F, 0x05, -1, 0x01, 0x03, 0x0B, 0x02, 0x20, 0xC7, 0xB9, 0xAB}, 4096, "SR1.6", 8,
     500, 3000, 50000, 150000, 40, 9},
    {"MX25L25645G", "macronix.toml", "Macronix", "C22019", "18", 33554432, 256, 32,
     {0x06, 0x04, 0x9F, 0x05, -1, 0x01, 0x03, 0x0B, 0x02, 0x20, 0xC7, 0xB9, 0xAB}, 4096, "SR1.6", 8,
     500, 3000, 150000, 300000, 40, 9},
    {"N25Q128A", "micron.toml", "Micron", "20BA18", "", 16777216, 256, 24,
     {0x06, 0x04, 0x9F, 0x05, -1, 0x01, 0x03, 0x0B, 0x02, 0x20, 0xC7, -1, -1}, 4096, "none", 8,
     500, 5000, 170000, 250000, 8, -1},
    {"MT25QL128ABA", "micron.toml", "Micron", "20BA18", "", 16777216, 256, 24,
     {0x06, 0x04, 0x9F, 0x05, -1, 0x01, 0x03, 0x0B, 0x02, 0x20, 0xC7, 0xB9, 0xAB}, 4096, "none", 8,
     120, 1800, 38000, 114000, 8, 30},
    {"MT25QL256ABA", "micron.toml", "Micron", "20BA19", "", 33554432, 256, 32,
     {0x06, 0x04, 0x9F, 0x05, -1, 0x01, 0x03, 0x0B, 0x02, 0x20, 0xC7, 0xB9, 0xAB}, 4096, "none", 8,
     120, 1800, 76000, 230000, 8, 30},
    {"S25FL128S", "spansion.toml", "Infineon (Spansion)", "012018", "17", 16777216, 256, 24,
     {0x06, 0x04, 0x9F, 0x05, 0x35, 0x01, 0x03, 0x0B, 0x02, 0xD8, 0xC7, -1, 0xAB}, 65536, "SR2.1", 16,
     250, 750, 33000, 165000, 500, -1},
    {"S25FL256S", "spansion.toml", "Infineon (Spansion)", "010219", "18", 33554432, 256, 32,
     {0x06, 0x04, 0x9F, 0x05, 0x35, 0x01, 0x03, 0x0B, 0x02, 0xD8, 0xC7, -1, 0xAB}, 65536, "SR2.1", 16,
     250, 750, 66000, 330000, 500, -1},
    {"S25FL064L", "spansion.toml", "Infineon (Spansion)", "016017", "16", 8388608, 256, 24,
     {0x06, 0x04, 0x9F, 0x05, 0x35, 0x01, 0x03, 0x0B, 0x02, 0x20, 0xC7, 0xB9, 0xAB}, 4096, "SR2.1", 16,
     500, 1350, 55000, 150000, 400, 30},
    {"IS25LP128", "issi.toml", "ISSI", "9D6018", "17", 16777216, 256, 24,
     {0x06, 0x04, 0x9F, 0x05, -1, 0x01, 0x03, 0x0B, 0x02, 0x20, 0xC7, 0xB9, 0xAB}, 4096, "SR1.6", 8,
     200, 800, 45000, 90000, 15, 5},
    {"IS25LP256", "issi.toml", "ISSI", "9D6019", "18", 33554432, 256, 32,
     {0x06, 0x04, 0x9F, 0x05, -1, 0x01, 0x03, 0x0B, 0x02, 0x20, 0xC7, 0xB9, 0xAB}, 4096, "SR1.6", 8,
     200, 800, 90000, 180000, 15, 5},
    {"GD25Q128C", "gigadevice.toml", "GigaDevice", "C84018", "17", 16777216, 256, 24,
     {0x06, 0x04, 0x9F, 0x05, 0x35, 0x01, 0x03, 0x0B, 0x02, 0x20, 0xC7, 0xB9, 0xAB}, 4096, "SR2.1", 8,
     600, 2400, 50000, 250000, 30, 30},
    // Not shipped: every block is write-protected at power-up and only a
    // dedicated unlock command (98h) clears that, which the plug-in cannot send.
    {"SST26VF032B", "", "Microchip (SST)", "BF2642", "", 4194304, 256, 24,
     {0x06, 0x04, 0x9F, 0x05, 0x35, 0x01, 0x03, 0x0B, 0x02, 0x20, 0xC7, -1, -1}, 4096, "SR2.1", 16,
     -1, 1500, 35, 50, 25, -1},
    {"AT25SF128A", "adesto.toml", "Renesas (Adesto)", "1F8901", "17", 16777216, 256, 24,
     {0x06, 0x04, 0x9F, 0x05, 0x35, 0x01, 0x03, 0x0B, 0x02, 0x20, 0xC7, 0xB9, 0xAB}, 4096, "SR2.1", 8,
     600, 3000, 30000, 100000, 30, 30},
    {"M25P16", "micron.toml", "Micron (ST)", "202015", "14", 2097152, 256, 24,
     {0x06, 0x04, 0x9F, 0x05, -1, 0x01, 0x03, 0x0B, 0x02, 0xD8, 0xC7, 0xB9, 0xAB}, 65536, "none", 8,
     640, 5000, 13000, 40000, 15, 30},
    {"N25Q032A", "micron.toml", "Micron", "20BA16", "", 4194304, 256, 24,
     {0x06, 0x04, 0x9F, 0x05, -1, 0x01, 0x03, 0x0B, 0x02, 0x20, 0xC7, -1, -1}, 4096, "none", 8,
     500, 5000, 30000, 60000, 8, -1},
};

// Readable test names in failure messages instead of byte dumps.
void PrintTo(const Reference& r, std::ostream* out) { *out << r.part; }

bool shipped(const Reference& r) { return r.file[0] != '\0'; }

std::vector<Reference> shippedReferences() {
    std::vector<Reference> rows;
    for (const Reference& r : kReference)
        if (shipped(r)) rows.push_back(r);
    return rows;
}

// ---------------------------------------------------------------------------
// Key lists.

enum class Kind { Instruction, Number, Text, Flag };

// The keys a device reads at construction, in its reading order.
const std::pair<const char*, Kind> kDeviceKeys[] = {
    {"ENABLE_INSTRUCTION", Kind::Instruction},        {"DISABLE_INSTRUCTION", Kind::Instruction},
    {"IDENTIFICATION_INSTRUCTION", Kind::Instruction}, {"READSTATUS_INSTRUCTION", Kind::Instruction},
    {"READSTATUS2_INSTRUCTION", Kind::Instruction},   {"WRITESTATUS_INSTRUCTION", Kind::Instruction},
    {"READ_INSTRUCTION", Kind::Instruction},          {"FASTREAD_INSTRUCTION", Kind::Instruction},
    {"PAGEPROGRAM_INSTRUCTION", Kind::Instruction},   {"SECTORERASE_INSTRUCTION", Kind::Instruction},
    {"BULKERASE_INSTRUCTION", Kind::Instruction},     {"DEEPDOWN_INSTRUCTION", Kind::Instruction},
    {"RELEASE_INSTRUCTION", Kind::Instruction},       {"READSIGNATURE_INSTRUCTION", Kind::Instruction},
    {"WRITESR_INSTRUCTION", Kind::Instruction},       {"PROGRAM_WAITTIME_INC", Kind::Number},
    {"BULKERASE_WAITTIME_INC", Kind::Number},         {"WRITESTATUS_WAITTIME", Kind::Number},
    {"SECTORERASE_WAITTIME", Kind::Number},           {"ADDRESS_SIZE", Kind::Number},
    {"READ_SIZE", Kind::Number},                      {"PAGE_SIZE", Kind::Number},
    {"DATA_START_INDEX", Kind::Number},               {"PAGE_ADDRESS_START_INDEX", Kind::Number},
    {"TOTAL_SHIFT_SIZE", Kind::Number},               {"PROGRAM_MAXWAITTIME", Kind::Number},
    {"PROGRAM_WAITTIME", Kind::Number},               {"BULKERASE_WAITTIME", Kind::Number},
    {"PROGRESS_ERASE_WAITTIME_INC", Kind::Number},    {"BULKERASE_MAXWAITTIME", Kind::Number},
    {"WRSR_MAXWAITTIME", Kind::Number},               {"DEVICE_SIZE", Kind::Number},
    {"IDCODE", Kind::Text},                           {"INSTRUCTION_LENGTH", Kind::Number},
    {"USE_RES", Kind::Flag},                          {"USE_UNLOCKSR", Kind::Flag},
    {"READ_STATUS_ENABLED", Kind::Flag},              {"X2_READ", Kind::Flag},
    {"X4_READ", Kind::Flag},                          {"STATUS_REGISTER_LENGTH", Kind::Number},
    {"RELEASE_FROM_STANDBY_MAX_WAITTIME", Kind::Number},
};

// Identification and simulator keys every shipped part carries
// (RES_SIGNATURE only when the part has one).
const std::pair<const char*, Kind> kExtraKeys[] = {
    {"VENDOR", Kind::Text},          {"DESCRIPTION", Kind::Text},         {"JEDEC_ID", Kind::Text},
    {"QE_LOCATION", Kind::Text},     {"WRSR_BITS", Kind::Number},         {"SECTOR_SIZE", Kind::Number},
    {"SIM_PAGE_PROGRAM_US", Kind::Number}, {"SIM_BULK_ERASE_US", Kind::Number},
    {"SIM_WRITE_STATUS_US", Kind::Number}, {"SIM_RELEASE_US", Kind::Number},
};

constexpr int kMaxLabels = 32;
const char* const kRead2 = "00110101";  // 35h, read status register 2
const char* const kNone = "00000000";   // a command the part does not have

std::string label(int i) { return "STATUS_LOCATION_" + std::to_string(i); }

// ---------------------------------------------------------------------------
// Loading.

ConstraintsManager& db() { return ConstraintsManager::instance(); }

// Loads parts/ once; the error text of a failed load, "" on success.
const std::string& loadError() {
    static const std::string error = [] {
        try {
            db().clear();
            vorant::test::loadShippedParts();
            return std::string();
        } catch (const VorantException& e) {
            return std::string(e.what());
        }
    }();
    return error;
}

#define ASSERT_LOADED() ASSERT_EQ(loadError(), "") << "parts/ does not load"

// Every key of a part that this test knows about, as the database holds it.
Properties readPart(const std::string& name) {
    Properties p;
    auto take = [&](const std::string& key) {
        if (db().hasProperty(name, key)) p[key] = db().getDeviceStringProperty(name.c_str(), key.c_str());
    };
    for (const auto& [key, kind] : kDeviceKeys) take(key);
    for (const auto& [key, kind] : kExtraKeys) take(key);
    take("RES_SIGNATURE");
    for (int i = 0; i < kMaxLabels; ++i) take(label(i));
    return p;
}

std::string binary(int opcode) {
    std::string text;
    for (int bit = 7; bit >= 0; --bit) text += (opcode >> bit) & 1 ? '1' : '0';
    return text;
}

std::string upper(std::string text) {
    for (char& c : text) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
    return text;
}

std::optional<long long> numberOf(const Properties& p, const std::string& key) {
    auto it = p.find(key);
    if (it == p.end() || it->second.empty()) return std::nullopt;
    const std::string& t = it->second;
    std::size_t i = t[0] == '-' ? 1 : 0;
    if (i == t.size() || t.find_first_not_of("0123456789", i) != std::string::npos || t.size() - i > 10)
        return std::nullopt;
    const long long v = std::stoll(t);
    if (v < INT32_MIN || v > INT32_MAX) return std::nullopt;
    return v;
}

// ---------------------------------------------------------------------------
// The rules every shipped part keeps. Returns one "KEY: reason" line per
// broken rule; an empty list means the part is sound.

std::vector<std::string> checkRules(const Properties& p) {
    std::vector<std::string> problems;
    auto problem = [&](const std::string& key, const std::string& why) { problems.push_back(key + ": " + why); };
    auto has = [&](const std::string& key) { return p.count(key) != 0; };
    auto text = [&](const std::string& key) { return has(key) ? p.at(key) : std::string(); };
    auto num = [&](const std::string& key) { return numberOf(p, key).value_or(0); };

    // Presence and form of every key.
    for (const auto& list : {std::vector<std::pair<const char*, Kind>>(std::begin(kDeviceKeys), std::end(kDeviceKeys)),
                             std::vector<std::pair<const char*, Kind>>(std::begin(kExtraKeys), std::end(kExtraKeys))}) {
        for (const auto& [key, kind] : list) {
            if (!has(key)) {
                problem(key, "missing");
                continue;
            }
            const std::string& v = p.at(key);
            switch (kind) {
            case Kind::Instruction:
                if (v.size() != 8 || v.find_first_not_of("01") != std::string::npos)
                    problem(key, "'" + v + "' is not one opcode byte of '0'/'1' text");
                break;
            case Kind::Number:
                if (!numberOf(p, key)) problem(key, "'" + v + "' is not a 32-bit decimal number");
                break;
            case Kind::Flag:
                if (v != "TRUE" && v != "FALSE") problem(key, "'" + v + "' is not TRUE or FALSE");
                break;
            case Kind::Text:
                if (v.empty()) problem(key, "empty");
                break;
            }
        }
    }
    if (!problems.empty()) return problems;  // the rules below need well-formed keys

    // Sizes and the address width.
    const long long bytes = num("DEVICE_SIZE") / 8, sector = num("SECTOR_SIZE");
    const long long pageBits = num("PAGE_SIZE"), address = num("ADDRESS_SIZE");
    if (num("DEVICE_SIZE") <= 0 || num("DEVICE_SIZE") % 8 != 0) problem("DEVICE_SIZE", "not a whole number of bytes");
    if (pageBits <= 0 || pageBits % 8 != 0) problem("PAGE_SIZE", "not a whole number of bytes");
    if (sector <= 0 || bytes % sector != 0) problem("SECTOR_SIZE", "does not divide the flash size");
    else if (pageBits > 0 && sector % (pageBits / 8) != 0) problem("SECTOR_SIZE", "is not a whole number of pages");
    if (address != (bytes > (16LL << 20) ? 32 : 24))
        problem("ADDRESS_SIZE", "must be 32 exactly for flashes over 16 MiB, else 24");

    // Frames: opcode, then the address, then the data, without gaps (a gap
    // would shift the data of a read or be programmed as data).
    const long long start = num("PAGE_ADDRESS_START_INDEX");
    if (start != static_cast<long long>(text("READ_INSTRUCTION").size()) ||
        start != static_cast<long long>(text("PAGEPROGRAM_INSTRUCTION").size()))
        problem("PAGE_ADDRESS_START_INDEX", "must follow the read and page program opcodes directly");
    if (num("READ_SIZE") != start + address) problem("READ_SIZE", "must be opcode plus address");
    if (num("DATA_START_INDEX") != start + address) problem("DATA_START_INDEX", "must follow the address directly");
    if (num("DATA_START_INDEX") + pageBits != num("TOTAL_SHIFT_SIZE"))
        problem("TOTAL_SHIFT_SIZE", "must be DATA_START_INDEX + PAGE_SIZE");
    // Parts power up taking 3-byte addresses; a 32-bit frame needs the
    // opcodes that always take four address bytes, a 24-bit one the plain ones.
    const bool wide = address == 32;
    if (text("READ_INSTRUCTION") != (wide ? "00010011" : "00000011"))
        problem("READ_INSTRUCTION", wide ? "a 32-bit address needs 13h" : "a 24-bit address needs 03h");
    if (text("PAGEPROGRAM_INSTRUCTION") != (wide ? "00010010" : "00000010"))
        problem("PAGEPROGRAM_INSTRUCTION", wide ? "a 32-bit address needs 12h" : "a 24-bit address needs 02h");

    // Waits: typical within the limits, steps that make progress, limits
    // that still fit a 32-bit wait counter after one more step.
    struct Wait {
        const char* first;
        const char* step;
        const char* limit;
        const char* simulated;
    };
    for (const Wait& w : {Wait{"PROGRAM_WAITTIME", "PROGRAM_WAITTIME_INC", "PROGRAM_MAXWAITTIME", "SIM_PAGE_PROGRAM_US"},
                          Wait{"BULKERASE_WAITTIME", "BULKERASE_WAITTIME_INC", "BULKERASE_MAXWAITTIME",
                               "SIM_BULK_ERASE_US"}}) {
        if (num(w.first) <= 0 || num(w.first) > num(w.limit)) problem(w.first, std::string("must be in 1..") + w.limit);
        if (num(w.simulated) <= 0 || num(w.simulated) > num(w.limit))
            problem(w.simulated, std::string("typical time must be in 1..") + w.limit);
        if (num(w.step) <= 0 || num(w.step) > num(w.first)) problem(w.step, std::string("must be in 1..") + w.first);
        if (num(w.limit) + num(w.step) > INT32_MAX) problem(w.limit, "plus its step exceeds the 32-bit range");
    }
    if (num("SIM_WRITE_STATUS_US") <= 0 || num("SIM_WRITE_STATUS_US") > num("WRSR_MAXWAITTIME"))
        problem("SIM_WRITE_STATUS_US", "must be in 1..WRSR_MAXWAITTIME");
    if (num("SIM_RELEASE_US") < 0 || num("SIM_RELEASE_US") > num("RELEASE_FROM_STANDBY_MAX_WAITTIME"))
        problem("SIM_RELEASE_US", "must be in 0..RELEASE_FROM_STANDBY_MAX_WAITTIME");
    if (num("RELEASE_FROM_STANDBY_MAX_WAITTIME") <= 0) problem("RELEASE_FROM_STANDBY_MAX_WAITTIME", "must be positive");
    if (num("PROGRESS_ERASE_WAITTIME_INC") <= 0) {
        problem("PROGRESS_ERASE_WAITTIME_INC", "must be positive");
    } else {
        const long long steps =
            (num("BULKERASE_MAXWAITTIME") - num("BULKERASE_WAITTIME")) / num("PROGRESS_ERASE_WAITTIME_INC");
        if (steps < 10 || steps > 1000)
            problem("PROGRESS_ERASE_WAITTIME_INC", "gives " + std::to_string(steps) + " erase steps, not 10..1000");
    }

    // Status registers and Quad Enable.
    const std::string qe = text("QE_LOCATION");
    if (qe != "SR2.1" && qe != "SR1.6" && qe != "none") problem("QE_LOCATION", "must be SR2.1, SR1.6 or none");
    if (num("WRSR_BITS") != 8 && num("WRSR_BITS") != 16) problem("WRSR_BITS", "must be 8 or 16");
    const bool hasRegister2 = qe == "SR2.1";
    if (hasRegister2 && text("READSTATUS2_INSTRUCTION") != kRead2)
        problem("READSTATUS2_INSTRUCTION", "a part with register 2 reads it with 35h");
    if (!hasRegister2 && text("READSTATUS2_INSTRUCTION") != text("READSTATUS_INSTRUCTION"))
        problem("READSTATUS2_INSTRUCTION", "a part without register 2 must read register 1 again (35h may enter QPI)");
    if (text("X4_READ") == "TRUE" && !(hasRegister2 && num("WRSR_BITS") == 16))
        problem("X4_READ", "needs QE in register 2 bit 1 and a two-byte 01h write");
    if (num("INSTRUCTION_LENGTH") != 8) problem("INSTRUCTION_LENGTH", "the unlock writes exactly one byte");
    if (text("READ_STATUS_ENABLED") != "TRUE") problem("READ_STATUS_ENABLED", "must be TRUE");
    if (num("STATUS_REGISTER_LENGTH") != 16) problem("STATUS_REGISTER_LENGTH", "must be 16 (two registers)");
    for (int i = 0; i < std::min<long long>(num("STATUS_REGISTER_LENGTH"), kMaxLabels); ++i)
        if (text(label(i)).empty()) problem(label(i), "missing");
    const std::string busy = text(label(0));
    if (busy != "WIP" && busy != "BUSY") problem(label(0), "bit 0 is the busy bit");
    if (text(label(1)) != "WEL") problem(label(1), "bit 1 is the write enable latch");
    if (!hasRegister2)
        for (int i = 8; i < 16; ++i)
            if (text(label(i)) != "NOT_VALID") problem(label(i), "register 2 is not read on this part");
    if (hasRegister2 && text(label(9)) != "QE" && text(label(9)) != "QUAD")
        problem(label(9), "register 2 bit 1 is the Quad Enable bit");
    if (qe == "SR1.6" && text(label(6)) != "QE") problem(label(6), "register 1 bit 6 is the Quad Enable bit");

    // Identification.
    const std::string id = text("IDCODE"), jedec = text("JEDEC_ID"), res = text("RES_SIGNATURE");
    auto hex = [](const std::string& t, std::size_t n) {
        return t.size() == n && t.find_first_not_of("0123456789ABCDEFabcdef") == std::string::npos;
    };
    if (!hex(jedec, 6)) problem("JEDEC_ID", "must be 6 hexadecimal digits");
    if (has("RES_SIGNATURE") && !hex(res, 2)) problem("RES_SIGNATURE", "must be 2 hexadecimal digits");
    if (text("USE_RES") == "TRUE") {
        if (!has("RES_SIGNATURE") || upper(res) != upper(id))
            problem("RES_SIGNATURE", "a part identified by signature expects IDCODE = RES_SIGNATURE");
    } else if (upper(id) != upper(jedec)) {
        problem("IDCODE", "must be the JEDEC ID");
    }
    if (has("RES_SIGNATURE") && text("READSIGNATURE_INSTRUCTION") == kNone)
        problem("RES_SIGNATURE", "a part without a signature command has no RES byte");
    if (text("DEEPDOWN_INSTRUCTION") != kNone && text("READSIGNATURE_INSTRUCTION") == kNone)
        problem("READSIGNATURE_INSTRUCTION", "a part that powers down needs the release command");
    if (text("DEEPDOWN_INSTRUCTION") == kNone && num("SIM_RELEASE_US") != 0)
        problem("SIM_RELEASE_US", "a part without deep power-down has no release time");
    return problems;
}

std::string joined(const std::vector<std::string>& lines) {
    std::string all;
    for (const auto& l : lines) all += "\n  " + l;
    return all;
}

// ---------------------------------------------------------------------------
// The database as a whole.

TEST(PartDatabase, LoadsAtLeastTwentyPartsOfFiveVendorsFromOneFilePerVendor) {
    ASSERT_LOADED();
    const auto names = db().partNames();
    EXPECT_GE(names.size(), 20u);
    std::set<std::string> vendors, files;
    std::map<std::string, std::set<std::string>> filesOfVendor;
    for (const auto& name : names) {
        const std::string vendor = db().getDeviceStringProperty(name.c_str(), "VENDOR");
        const std::string file = db().sourceOf(name);
        vendors.insert(vendor);
        files.insert(file);
        filesOfVendor[vendor].insert(file);
    }
    EXPECT_GE(vendors.size(), 5u);
    EXPECT_GE(files.size(), 5u);
    for (const auto& [vendor, its] : filesOfVendor) EXPECT_EQ(its.size(), 1u) << vendor << " is spread over files";
}

TEST(PartDatabase, DeviceKeyListIsTheFortyOneTheDeviceReads) {
    std::vector<std::string> mine;
    for (const auto& [key, kind] : kDeviceKeys) mine.push_back(key);
    EXPECT_EQ(mine.size(), 41u);
    EXPECT_EQ(ConstraintsManager::deviceKeys(), mine);
}

TEST(PartDatabase, ShipsExactlyThePartsOfTheReferenceTableItShouldShip) {
    ASSERT_LOADED();
    std::set<std::string> expected;
    for (const Reference& r : kReference) {
        if (shipped(r)) {
            expected.insert(r.part);
        } else {
            EXPECT_FALSE(db().hasPart(r.part)) << r.part << " cannot be unlocked by the plug-in and must not ship";
        }
    }
    const auto names = db().partNames();
    EXPECT_EQ(std::set<std::string>(names.begin(), names.end()), expected);
}

TEST(PartDatabase, SharedJedecIdListsEveryPartSorted) {
    ASSERT_LOADED();
    const std::vector<std::string> both{"MT25QL128ABA", "N25Q128A"};
    EXPECT_EQ(db().partsWithId("20BA18"), both);
    EXPECT_EQ(db().partsWithId("20ba18"), both) << "letter case must not matter";
    EXPECT_EQ(db().partsWithId("20BA18"), db().partsWithId("20BA18")) << "the answer must not vary";
    EXPECT_TRUE(db().partsWithId("14").empty()) << "a RES signature is no JEDEC ID";
    EXPECT_TRUE(db().partsWithId("BF2642").empty());
}

// ---------------------------------------------------------------------------
// One shipped part at a time.

class ShippedPart : public ::testing::TestWithParam<Reference> {};

TEST_P(ShippedPart, ReadsEveryDeviceKeyAsTheDeviceDoes) {
    ASSERT_LOADED();
    const char* name = GetParam().part;
    ASSERT_TRUE(db().hasPart(name));
    for (const auto& [key, kind] : kDeviceKeys) {
        if (kind == Kind::Number) {
            EXPECT_NO_THROW(db().getDeviceLongProperty(name, key)) << key;
        } else {
            EXPECT_NO_THROW(db().getDeviceStringProperty(name, key)) << key;
        }
    }
}

TEST_P(ShippedPart, KeepsEveryRule) {
    ASSERT_LOADED();
    const auto problems = checkRules(readPart(GetParam().part));
    EXPECT_TRUE(problems.empty()) << GetParam().part << ":" << joined(problems);
}

TEST_P(ShippedPart, MatchesItsDatasheetFacts) {
    ASSERT_LOADED();
    const Reference& r = GetParam();
    const Properties p = readPart(r.part);
    auto at = [&](const char* key) { return p.count(key) ? p.at(key) : std::string("<missing>"); };
    auto num = [&](const char* key) { return numberOf(p, key).value_or(-1); };
    const bool wide = r.addressBits == 32;

    EXPECT_EQ(at("VENDOR"), r.vendor);
    const std::string source = db().sourceOf(r.part);
    EXPECT_EQ(source.substr(source.find_last_of("/\\") + 1), r.file);
    EXPECT_EQ(at("JEDEC_ID"), r.jedecId);
    if (r.resSignature[0]) {
        EXPECT_EQ(at("RES_SIGNATURE"), r.resSignature);
    } else {
        EXPECT_EQ(p.count("RES_SIGNATURE"), 0u) << "the part has no RES byte";
    }
    EXPECT_EQ(num("DEVICE_SIZE"), r.sizeBytes * 8);
    EXPECT_EQ(num("PAGE_SIZE"), r.pageBytes * 8);
    EXPECT_EQ(num("ADDRESS_SIZE"), r.addressBits);
    EXPECT_EQ(num("SECTOR_SIZE"), r.sectorBytes);
    EXPECT_EQ(at("QE_LOCATION"), r.qeLocation);
    EXPECT_EQ(num("WRSR_BITS"), r.wrsrBits);

    // Opcodes; over 16 MiB the memory commands use their 4-byte-address forms.
    auto wideForm = [&](int opcode) {
        if (!wide) return opcode;
        switch (opcode) {
        case 0x03: return 0x13;
        case 0x0B: return 0x0C;
        case 0x02: return 0x12;
        case 0x20: return 0x21;
        case 0xD8: return 0xDC;
        default: return -1;
        }
    };
    auto orNone = [](int opcode) { return opcode < 0 ? 0x00 : opcode; };
    const struct {
        const char* key;
        int opcode;
    } opcodes[] = {
        {"ENABLE_INSTRUCTION", r.op.wren},
        {"DISABLE_INSTRUCTION", r.op.wrdi},
        {"IDENTIFICATION_INSTRUCTION", r.op.rdid},
        {"READSTATUS_INSTRUCTION", r.op.rdsr},
        {"READSTATUS2_INSTRUCTION", r.op.rdsr2 < 0 ? r.op.rdsr : r.op.rdsr2},
        {"WRITESTATUS_INSTRUCTION", r.op.wrsr},
        {"WRITESR_INSTRUCTION", r.op.wrsr},
        {"READ_INSTRUCTION", wideForm(r.op.read)},
        {"FASTREAD_INSTRUCTION", wideForm(r.op.fastRead)},
        {"PAGEPROGRAM_INSTRUCTION", wideForm(r.op.pp)},
        {"SECTORERASE_INSTRUCTION", wideForm(r.op.se)},
        {"BULKERASE_INSTRUCTION", r.op.be},
        {"DEEPDOWN_INSTRUCTION", orNone(r.op.dp)},
        {"RELEASE_INSTRUCTION", orNone(r.op.res)},
        {"READSIGNATURE_INSTRUCTION", orNone(r.op.res)},
    };
    for (const auto& [key, opcode] : opcodes) EXPECT_EQ(at(key), binary(opcode)) << key;

    // Identification: by JEDEC ID, or by signature for the M25P16.
    const bool bySignature = std::string(r.part) == "M25P16";
    EXPECT_EQ(at("USE_RES"), bySignature ? "TRUE" : "FALSE");
    EXPECT_EQ(at("IDCODE"), bySignature ? r.resSignature : r.jedecId);
    // Quad Enable policy.
    const bool x4 = std::string(r.qeLocation) == "SR2.1" && r.wrsrBits == 16;
    EXPECT_EQ(at("X4_READ"), x4 ? "TRUE" : "FALSE");

    // Waits: typical figures as first waits and simulated times, maxima with
    // a margin of 1.25x to 2x, polling steps of about a tenth.
    EXPECT_EQ(num("PROGRAM_WAITTIME"), r.tppTypUs);
    EXPECT_EQ(num("SIM_PAGE_PROGRAM_US"), r.tppTypUs);
    EXPECT_EQ(num("BULKERASE_WAITTIME"), r.tbeTypMs * 1000);
    EXPECT_EQ(num("SIM_BULK_ERASE_US"), r.tbeTypMs * 1000);
    EXPECT_EQ(num("SIM_WRITE_STATUS_US"), r.twMaxMs * 1000);
    EXPECT_EQ(num("SIM_RELEASE_US"), r.tresUs < 0 ? 0 : r.tresUs);
    const struct {
        const char* key;
        long long max;
    } limits[] = {{"PROGRAM_MAXWAITTIME", r.tppMaxUs},
                  {"BULKERASE_MAXWAITTIME", r.tbeMaxMs * 1000},
                  {"WRSR_MAXWAITTIME", r.twMaxMs * 1000}};
    for (const auto& [key, max] : limits) {
        EXPECT_GE(num(key) * 4, max * 5) << key << " needs a margin over the datasheet maximum " << max;
        EXPECT_LE(num(key), max * 2) << key << " is more than twice the datasheet maximum " << max;
    }
    const struct {
        const char* key;
        long long typical;
    } steps[] = {{"PROGRAM_WAITTIME_INC", r.tppTypUs}, {"BULKERASE_WAITTIME_INC", r.tbeTypMs * 1000}};
    for (const auto& [key, typical] : steps) {
        EXPECT_GE(num(key) * 20, typical) << key;
        EXPECT_LE(num(key) * 5, typical) << key;
    }
    if (r.tresUs >= 0) {
        EXPECT_GE(num("RELEASE_FROM_STANDBY_MAX_WAITTIME") * 4, r.tresUs * 5) << "tRES needs a margin";
    }
}

TEST_P(ShippedPart, IsFoundByItsJedecIdWithEveryPartSharingIt) {
    ASSERT_LOADED();
    const Reference& r = GetParam();
    std::vector<std::string> expected;
    for (const Reference& other : kReference)
        if (shipped(other) && std::string(other.jedecId) == r.jedecId) expected.push_back(other.part);
    std::sort(expected.begin(), expected.end());
    EXPECT_EQ(db().partsWithId(r.jedecId), expected);
    std::string lower = r.jedecId;
    for (char& c : lower) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    EXPECT_EQ(db().partsWithId(lower), expected);
}

std::string partName(const ::testing::TestParamInfo<Reference>& info) { return info.param.part; }

INSTANTIATE_TEST_SUITE_P(Parts, ShippedPart, ::testing::ValuesIn(shippedReferences()), partName);

// ---------------------------------------------------------------------------
// The rule checker catches each fault it is meant to catch: a shipped part
// with one key broken (or removed, for a null value) must fail on that key.

struct Fault {
    const char* name;
    const char* part;
    const char* key;
    const char* value;  // nullptr: the key is removed
    const char* blamed;  // the key the problem must name
};

const Fault kFaults[] = {
    {"MissingDeviceKey", "W25Q128JV", "BULKERASE_INSTRUCTION", nullptr, "BULKERASE_INSTRUCTION"},
    {"MissingSimulatorKey", "W25Q128JV", "SIM_RELEASE_US", nullptr, "SIM_RELEASE_US"},
    {"NumberNotDecimal", "W25Q128JV", "PAGE_SIZE", "2k", "PAGE_SIZE"},
    {"FlagLowerCase", "W25Q128JV", "X4_READ", "yes", "X4_READ"},
    {"OpcodeNotBinary", "W25Q128JV", "READ_INSTRUCTION", "0000001x", "READ_INSTRUCTION"},
    {"OpcodeTooLong", "W25Q128JV", "PAGEPROGRAM_INSTRUCTION", "000000010", "PAGEPROGRAM_INSTRUCTION"},
    {"SectorNotDividingSize", "W25Q128JV", "SECTOR_SIZE", "12288", "SECTOR_SIZE"},
    {"ThreeByteAddressOver16MiB", "W25Q256JV", "ADDRESS_SIZE", "24", "ADDRESS_SIZE"},
    {"FourByteAddressUpTo16MiB", "W25Q128JV", "ADDRESS_SIZE", "32", "ADDRESS_SIZE"},
    {"ReadFrameWithDummyBits", "W25Q128JV", "READ_SIZE", "40", "READ_SIZE"},
    {"ThreeByteReadOver16MiB", "IS25LP256", "READ_INSTRUCTION", "00000011", "READ_INSTRUCTION"},
    {"ThreeByteProgramOver16MiB", "MT25QL256ABA", "PAGEPROGRAM_INSTRUCTION", "00000010", "PAGEPROGRAM_INSTRUCTION"},
    {"FourByteReadUpTo16MiB", "MX25L12835F", "READ_INSTRUCTION", "00010011", "READ_INSTRUCTION"},
    {"GapBeforeData", "W25Q128JV", "DATA_START_INDEX", "40", "DATA_START_INDEX"},
    {"ShortProgramFrame", "W25Q128JV", "TOTAL_SHIFT_SIZE", "2072", "TOTAL_SHIFT_SIZE"},
    {"SimulatedProgramOverLimit", "W25Q128JV", "SIM_PAGE_PROGRAM_US", "4501", "SIM_PAGE_PROGRAM_US"},
    {"SimulatedEraseOverLimit", "W25Q128JV", "SIM_BULK_ERASE_US", "300000001", "SIM_BULK_ERASE_US"},
    {"FirstWaitOverLimit", "W25Q128JV", "PROGRAM_WAITTIME", "5000", "PROGRAM_WAITTIME"},
    {"ZeroPollingStep", "W25Q128JV", "BULKERASE_WAITTIME_INC", "0", "BULKERASE_WAITTIME_INC"},
    {"LimitOverflowsWithStep", "W25Q128JV", "BULKERASE_MAXWAITTIME", "2147483000", "BULKERASE_MAXWAITTIME"},
    {"StatusWriteOverLimit", "S25FL128S", "SIM_WRITE_STATUS_US", "750001", "SIM_WRITE_STATUS_US"},
    {"TooFewEraseSteps", "W25Q128JV", "PROGRESS_ERASE_WAITTIME_INC", "100000000", "PROGRESS_ERASE_WAITTIME_INC"},
    {"TooManyEraseSteps", "W25Q128JV", "PROGRESS_ERASE_WAITTIME_INC", "100000", "PROGRESS_ERASE_WAITTIME_INC"},
    {"QpiEntryAsReadStatus2", "MX25L12835F", "READSTATUS2_INSTRUCTION", "00110101", "READSTATUS2_INSTRUCTION"},
    {"QpiEntryOnMicron", "MT25QL128ABA", "READSTATUS2_INSTRUCTION", "00110101", "READSTATUS2_INSTRUCTION"},
    {"Register2NotRead", "W25Q128JV", "READSTATUS2_INSTRUCTION", "00000101", "READSTATUS2_INSTRUCTION"},
    {"X4WithQeInRegister1", "IS25LP128", "X4_READ", "TRUE", "X4_READ"},
    {"X4WithOneByteStatusWrite", "GD25Q128C", "X4_READ", "TRUE", "X4_READ"},
    {"X4WithoutQe", "N25Q128A", "X4_READ", "TRUE", "X4_READ"},
    {"UnlockOfTwoBytes", "W25Q128JV", "INSTRUCTION_LENGTH", "16", "INSTRUCTION_LENGTH"},
    {"OneStatusRegister", "W25Q128JV", "STATUS_REGISTER_LENGTH", "8", "STATUS_REGISTER_LENGTH"},
    {"LabelMissing", "W25Q128JV", "STATUS_LOCATION_12", nullptr, "STATUS_LOCATION_12"},
    {"BusyBitMislabelled", "S25FL064L", "STATUS_LOCATION_0", "WEL", "STATUS_LOCATION_0"},
    {"QeLabelMisplaced", "W25Q64JV", "STATUS_LOCATION_9", "NOT_VALID", "STATUS_LOCATION_9"},
    {"LabelOnUnreadRegister", "MX25L3233F", "STATUS_LOCATION_9", "QE", "STATUS_LOCATION_9"},
    {"IdcodeNotJedecId", "W25Q128JV", "IDCODE", "EF4017", "IDCODE"},
    {"SignaturePartWithJedecIdcode", "M25P16", "IDCODE", "202015", "RES_SIGNATURE"},
    {"SignatureMismatch", "M25P16", "RES_SIGNATURE", "15", "RES_SIGNATURE"},
    {"ResByteWithoutSignatureCommand", "N25Q128A", "RES_SIGNATURE", "17", "RES_SIGNATURE"},
    {"PowerDownWithoutRelease", "S25FL064L", "READSIGNATURE_INSTRUCTION", "00000000", "READSIGNATURE_INSTRUCTION"},
    {"ReleaseTimeWithoutPowerDown", "S25FL256S", "SIM_RELEASE_US", "1", "SIM_RELEASE_US"},
    {"UnknownQeLocation", "W25Q128JV", "QE_LOCATION", "SR3.1", "QE_LOCATION"},
};

void PrintTo(const Fault& f, std::ostream* out) { *out << f.part << " with " << f.key << " broken"; }

class RuleChecker : public ::testing::TestWithParam<Fault> {};

TEST_P(RuleChecker, BlamesTheBrokenKey) {
    ASSERT_LOADED();
    const Fault& f = GetParam();
    Properties p = readPart(f.part);
    ASSERT_TRUE(checkRules(p).empty()) << "the unbroken " << f.part << " must pass";
    if (f.value) p[f.key] = f.value;
    else p.erase(f.key);
    const auto problems = checkRules(p);
    const bool blamed = std::any_of(problems.begin(), problems.end(), [&](const std::string& line) {
        return line.rfind(std::string(f.blamed) + ":", 0) == 0;
    });
    EXPECT_TRUE(blamed) << "expected a problem with " << f.blamed << ", got:" << joined(problems);
}

std::string faultName(const ::testing::TestParamInfo<Fault>& info) { return info.param.name; }

INSTANTIATE_TEST_SUITE_P(Faults, RuleChecker, ::testing::ValuesIn(kFaults), faultName);

}  // namespace
