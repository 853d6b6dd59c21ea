#include "cli/SfdpPart.h"

#include "cli/ChipProbe.h"
#include "cli/PartIdentification.h"
#include "cli/ToolFailure.h"
#include "cli/SfdpOperation.h"
#include "cli/ToolMessages.h"
#include "cli/UsageError.h"
#include "host/ConstraintsManager.h"
#include "host/VorantException.h"

#include <algorithm>
#include <bitset>
#include <climits>
#include <cstdint>
#include <sstream>

namespace vorant::cli {

namespace {

constexpr long long kSixteenMiB = 16ll << 20;
// Waits the table does not give: long enough for any common chip.
constexpr long long kConservativeProgramUs = 1000, kConservativeProgramMaxUs = 5000;
constexpr long long kConservativeEraseUsPerMiB = 2000000, kConservativeEraseMaxUsPerMiB = 10000000;
constexpr long long kStatusWriteMaxUs = 50000;  // tW is never in the table
constexpr long long kReleaseUs = 50;

std::string bits(int opcode) { return std::bitset<8>(static_cast<unsigned long>(opcode)).to_string(); }

// A limit: the maximum with the shipped parts' 1.5 margin, kept so that
// limit plus step stays a 32-bit number.
long long limitOf(long long maximumUs, long long stepUs) {
    return std::min(maximumUs * 3 / 2, static_cast<long long>(INT32_MAX) - stepUs);
}

class TomlPart {
public:
    void comment(const std::string& text) { out_ << "# " << text << "\n"; }
    void text(const char* key, const std::string& value) { out_ << key << " = \"" << value << "\"\n"; }
    void number(const char* key, long long value) { out_ << key << " = " << value << "\n"; }
    std::string str() const { return out_.str(); }
    std::ostringstream out_;
};

}  // namespace

std::string sfdpPartToml(const std::string& name, const std::string& jedecId, const formats::SfdpTable& table) {
    const long long bytes = static_cast<long long>(table.densityBytes);
    const bool fourByte = bytes > kSixteenMiB;
    if (table.addressing == formats::SfdpAddressing::FourByteOnly)
        throw UsageError("the chip's SFDP table says it takes 4-byte addresses only, which vorant-spi does not drive; "
                         "name the part with --part NAME");
    // The smallest erase; over 16 MiB its 4-byte form.
    std::vector<formats::SfdpEraseType> erases = table.eraseTypes;
    std::sort(erases.begin(), erases.end(), [](auto& a, auto& b) { return a.sizeBytes < b.sizeBytes; });
    const formats::SfdpEraseType* smallest = &erases.front();
    if (fourByte) {
        auto withFourByte = std::find_if(erases.begin(), erases.end(), [](auto& e) { return e.opcode4.has_value(); });
        if (!table.fourByteRead || !table.fourBytePageProgram || withFourByte == erases.end())
            throw UsageError("the chip holds " + std::to_string(bytes >> 20) +
                             " MiB, and its SFDP table offers no 4-byte read, page program and erase opcodes; "
                             "name the part with --part NAME");
        smallest = &*withFourByte;
    }
    const int requirement = table.quadEnableRequirement.value_or(-1);
    const bool register2 = requirement == 1 || requirement == 4 || requirement == 5;
    const bool x4 = requirement == 1 || requirement == 4;

    TomlPart part;
    part.comment("Built by 'vorant-spi --part sfdp' from the JEDEC ID and SFDP table of a chip (SFDP " +
                 std::to_string(table.majorRevision) + "." + std::to_string(table.minorRevision) +
                 "). Save it and load it with --parts FILE.");
    part.out_ << "[part." << name << "]\n";
    part.text("VENDOR", "unknown (manufacturer byte " + jedecId.substr(0, 2) + "h)");
    part.text("DESCRIPTION", "part built from its SFDP table, " + std::to_string(bytes) + " bytes");
    part.text("SOURCE", "SFDP table read from the chip; margins on its times");
    part.text("JEDEC_ID", jedecId);
    part.text("IDCODE", jedecId);
    part.number("DEVICE_SIZE", bytes * 8);
    part.text("ENABLE_INSTRUCTION", bits(0x06));
    part.text("DISABLE_INSTRUCTION", bits(0x04));
    part.text("IDENTIFICATION_INSTRUCTION", bits(0x9F));
    part.text("READSTATUS_INSTRUCTION", bits(0x05));
    part.comment(register2 ? "Quad Enable requirement " + std::to_string(requirement) + ": register 2 is read with 35h."
                           : "35h is read only for Quad Enable requirements 1, 4 and 5: register 1 is read again.");
    part.text("READSTATUS2_INSTRUCTION", bits(register2 ? 0x35 : 0x05));
    part.text("WRITESTATUS_INSTRUCTION", bits(0x01));
    part.text("WRITESR_INSTRUCTION", bits(0x01));
    part.text("READ_INSTRUCTION", bits(fourByte ? 0x13 : 0x03));
    part.text("FASTREAD_INSTRUCTION", bits(fourByte ? 0x0C : 0x0B));
    part.text("PAGEPROGRAM_INSTRUCTION", bits(fourByte ? 0x12 : 0x02));
    part.text("SECTORERASE_INSTRUCTION", bits(fourByte ? *smallest->opcode4 : smallest->opcode));
    part.number("SECTOR_SIZE", smallest->sizeBytes);
    part.number("SECTORERASE_WAITTIME", smallest->maximumMs ? static_cast<long long>(*smallest->maximumMs) * 1000 : 2000000);
    part.comment("The chip-erase opcode is not in the table: C7h, the common one, is assumed.");
    part.text("BULKERASE_INSTRUCTION", bits(0xC7));
    const bool powerDown = table.deepPowerDownOpcode.has_value();
    part.text("DEEPDOWN_INSTRUCTION", bits(powerDown ? *table.deepPowerDownOpcode : 0));
    part.text("RELEASE_INSTRUCTION", bits(powerDown ? *table.releaseOpcode : 0));
    part.text("READSIGNATURE_INSTRUCTION", bits(powerDown ? *table.releaseOpcode : 0));
    part.number("RELEASE_FROM_STANDBY_MAX_WAITTIME", powerDown ? kReleaseUs : 1);

    const int address = fourByte ? 32 : 24;
    const long long page = table.pageBytes.value_or(256);
    if (!table.pageBytes)
        part.comment("A table before revision 1.5 gives no page size or times: 256-byte pages and conservative "
                     "waits are assumed.");
    part.number("ADDRESS_SIZE", address);
    part.number("READ_SIZE", 8 + address);
    part.number("PAGE_ADDRESS_START_INDEX", 8);
    part.number("DATA_START_INDEX", 8 + address);
    part.number("PAGE_SIZE", page * 8);
    part.number("TOTAL_SHIFT_SIZE", 8 + address + page * 8);

    const long long programUs = table.pageProgramTypicalUs.value_or(kConservativeProgramUs);
    const long long programMaxUs = table.pageProgramMaximumUs.value_or(kConservativeProgramMaxUs);
    const long long programStep = std::max(1ll, programUs / 10);
    part.number("PROGRAM_WAITTIME", programUs);
    part.number("PROGRAM_WAITTIME_INC", programStep);
    part.number("PROGRAM_MAXWAITTIME", limitOf(programMaxUs, programStep));
    const long long mebibytes = std::max(1ll, bytes >> 20);
    const long long eraseUs = std::min<long long>(
        table.chipEraseTypicalMs ? static_cast<long long>(*table.chipEraseTypicalMs) * 1000 : kConservativeEraseUsPerMiB * mebibytes,
        INT32_MAX / 4);
    const long long eraseMaxUs = table.chipEraseMaximumMs ? static_cast<long long>(*table.chipEraseMaximumMs) * 1000
                                                          : kConservativeEraseMaxUsPerMiB * mebibytes;
    const long long eraseStep = std::max(1ll, eraseUs / 10);
    const long long eraseLimit = std::max(limitOf(eraseMaxUs, eraseStep), eraseUs);
    part.number("BULKERASE_WAITTIME", eraseUs);
    part.number("BULKERASE_WAITTIME_INC", eraseStep);
    part.number("BULKERASE_MAXWAITTIME", eraseLimit);
    part.number("PROGRESS_ERASE_WAITTIME_INC", std::max(1ll, (eraseLimit - eraseUs) / 100));
    part.comment("The status-write time is not in the table: a conservative 50 ms is assumed.");
    part.number("WRITESTATUS_WAITTIME", kStatusWriteMaxUs);
    part.number("WRSR_MAXWAITTIME", kStatusWriteMaxUs * 3 / 2);

    part.text("USE_RES", "FALSE");
    part.number("INSTRUCTION_LENGTH", 8);
    if (requirement == 1)
        part.comment("Quad Enable requirement 1: a one-byte status write clears register 2, so no unlock.");
    else if (requirement < 0)
        part.comment("The table does not say what a one-byte status write does to register 2: no unlock.");
    part.text("USE_UNLOCKSR", requirement >= 0 && requirement != 1 ? "TRUE" : "FALSE");
    part.text("READ_STATUS_ENABLED", "TRUE");
    part.text("X2_READ", "FALSE");
    part.text("X4_READ", x4 ? "TRUE" : "FALSE");
    part.text("QE_LOCATION", register2 || requirement == 6 ? "SR2.1" : requirement == 2 ? "SR1.6" : "none");
    part.number("WRSR_BITS", register2 ? 16 : 8);
    part.number("STATUS_REGISTER_LENGTH", 16);
    const char* const labels[] = {"BUSY", "WEL", "BP0", "BP1", "BP2", "S5", "S6", "S7"};
    for (int bit = 0; bit < 8; ++bit) part.text(("STATUS_LOCATION_" + std::to_string(bit)).c_str(), labels[bit]);
    for (int bit = 8; bit < 16; ++bit)
        part.text(("STATUS_LOCATION_" + std::to_string(bit)).c_str(),
                  !register2 ? "NOT_VALID" : bit == 9 ? "QE" : "S" + std::to_string(bit));
    return part.str();
}

std::string partFromChipSfdp(ScanPort& port, std::string& jedecId) {
    ChipProbe probe(port);
    const auto id = probe.read("10011111", 3);
    if (!id) throw ToolFailure("the JEDEC ID could not be read over the port");
    jedecId = hexText(*id);
    if (!chipAnswered(jedecId))
        throw ToolFailure("no chip answered the JEDEC ID read (it read " + jedecId + "); check the connection");
    const auto area = readSfdpArea(port);
    if (!area) throw ToolFailure("the SFDP area could not be read over the port");
    formats::SfdpTable table;
    try {
        table = formats::decodeSfdp(*area);
    } catch (const formats::SfdpError& error) {
        throw UsageError("the chip (JEDEC ID " + jedecId + ") has no usable SFDP table (" + error.what() +
                         "); name the part with --part NAME");
    }
    const std::string name = "SFDP_" + jedecId;
    const std::string toml = sfdpPartToml(name, jedecId, table);
    std::istringstream lines(toml);
    for (std::string line; std::getline(lines, line);) toolStatus(line);
    try {
        ConstraintsManager::instance().loadText(toml, "the chip's SFDP table");
    } catch (const VorantException& error) {
        throw UsageError(std::string("the part built from the chip's SFDP table is not usable: ") + error.what() +
                         "; name the part with --part NAME");
    }
    return name;
}

}  // namespace vorant::cli
