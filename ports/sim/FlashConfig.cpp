// FlashConfig from a part entry of the part database.

#include "ports/sim/FlashModel.h"
#include "ports/sim/SfdpImage.h"

#include "host/ConstraintsManager.h"
#include "host/VorantException.h"

#include <cstddef>

namespace vorant::sim {

namespace {

class PartReader {
public:
    explicit PartReader(const std::string& partName)
        : partName_(partName), database_(ConstraintsManager::instance()) {
        if (!database_.hasPart(partName_)) throw VorantException("simulated flash: unknown part '" + partName_ + "'");
    }

    bool has(const char* key) const { return database_.hasProperty(partName_, key); }

    std::string text(const char* key) const {
        return database_.getDeviceStringProperty(partName_.c_str(), key);
    }

    std::int32_t number(const char* key) const {
        return database_.getDeviceLongProperty(partName_.c_str(), key);
    }

    // A size or time that must not be negative.
    std::uint32_t count(const char* key) const {
        const std::int32_t value = number(key);
        if (value < 0) fail(key, "is negative");
        return static_cast<std::uint32_t>(value);
    }

    std::uint32_t countOr(const char* key, std::uint32_t fallback) const {
        return has(key) ? count(key) : fallback;
    }

    // The opcode of an instruction text: its first eight '0'/'1'
    // characters, the first one the most significant bit. -1 when the part
    // has no such key.
    int opcode(const char* key) const {
        if (!has(key)) return -1;
        const std::string bits = text(key);
        if (bits.size() < 8) fail(key, "'" + bits + "' is shorter than an 8-bit opcode");
        int value = 0;
        for (std::size_t i = 0; i < 8; ++i) {
            if (bits[i] != '0' && bits[i] != '1') fail(key, "'" + bits + "' is not a text of '0' and '1'");
            value = (value << 1) | (bits[i] - '0');
        }
        return value;
    }

    // Hexadecimal text of exactly `bytes` bytes, most significant first.
    void hexBytes(const char* key, std::uint8_t* out, std::size_t bytes) const {
        const std::string hex = text(key);
        if (hex.size() != 2 * bytes) fail(key, "'" + hex + "' is not " + std::to_string(2 * bytes) + " hex digits");
        for (std::size_t i = 0; i < bytes; ++i) {
            const int high = hexDigit(hex[2 * i]), low = hexDigit(hex[2 * i + 1]);
            if (high < 0 || low < 0) fail(key, "'" + hex + "' is not hexadecimal");
            out[i] = static_cast<std::uint8_t>(high << 4 | low);
        }
    }

    bool flag(const char* key) const {
        if (!has(key)) return false;
        const std::string value = text(key);
        return value == "TRUE" || value == "true" || value == "1";
    }

    [[noreturn]] void fail(const char* key, const std::string& what) const {
        throw VorantException("simulated flash: part " + partName_ + ": " + key + ": " + what);
    }

private:
    static int hexDigit(char c) {
        if (c >= '0' && c <= '9') return c - '0';
        if (c >= 'a' && c <= 'f') return c - 'a' + 10;
        if (c >= 'A' && c <= 'F') return c - 'A' + 10;
        return -1;
    }

    std::string partName_;
    ConstraintsManager& database_;
};

// Masks of the status registers from the part's bit labels
// (STATUS_LOCATION_0..7 name register 1 bits 0..7, 8..15 register 2).
void applyStatusLabels(const PartReader& part, FlashConfig& config) {
    bool anyLabel = false;
    std::uint8_t blockProtect = 0, writable1 = 0, writable2 = 0;
    for (int bit = 0; bit < 16; ++bit) {
        const std::string key = "STATUS_LOCATION_" + std::to_string(bit);
        if (!part.has(key.c_str())) continue;
        anyLabel = true;
        const std::string label = part.text(key.c_str());
        const bool reserved = label == "NOT_VALID";
        const auto mask = static_cast<std::uint8_t>(1u << (bit % 8));
        // Bits the chip sets itself: a status write cannot change them.
        const bool readOnly = label == "SUS" || label == "SUS1" || label == "SUS2" || label == "E_ERR" ||
                              label == "P_ERR";
        if (bit < 8) {
            if (label.size() == 3 && label[0] == 'B' && label[1] == 'P' && label[2] >= '0' && label[2] <= '4')
                blockProtect |= mask;
            if (bit >= 2 && !reserved && !readOnly) writable1 |= mask;
        } else if (!reserved && !readOnly) {
            writable2 |= mask;
        }
    }
    if (!anyLabel) return;
    if (blockProtect) config.blockProtectMask = blockProtect;
    config.status1WritableMask = writable1;
    config.status2WritableMask = writable2;
}

}  // namespace

FlashConfig FlashConfig::fromPartDatabase(const std::string& partName) {
    const PartReader part(partName);
    FlashConfig config;
    config.partName = partName;

    config.sizeBytes = part.count("DEVICE_SIZE") / 8;
    config.pageBytes = part.count("PAGE_SIZE") / 8;
    config.addressBytes = static_cast<int>(part.count("ADDRESS_SIZE") / 8);
    if (config.addressBytes != 3 && config.addressBytes != 4)
        part.fail("ADDRESS_SIZE", "the simulator knows 24- and 32-bit addresses only");

    config.opWriteEnable = part.opcode("ENABLE_INSTRUCTION");
    config.opWriteDisable = part.opcode("DISABLE_INSTRUCTION");
    config.opReadId = part.opcode("IDENTIFICATION_INSTRUCTION");
    config.opReadStatus1 = part.opcode("READSTATUS_INSTRUCTION");
    config.opWriteStatus = part.opcode("WRITESR_INSTRUCTION");
    config.opRead = part.opcode("READ_INSTRUCTION");
    config.opFastRead = part.opcode("FASTREAD_INSTRUCTION");
    config.opPageProgram = part.opcode("PAGEPROGRAM_INSTRUCTION");
    config.opSectorErase = part.opcode("SECTORERASE_INSTRUCTION");
    config.opBulkErase = part.opcode("BULKERASE_INSTRUCTION");
    // Part files write 00h for a command the chip does not have.
    auto optionalOpcode = [&](const char* key) {
        const int op = part.opcode(key);
        return op == 0x00 ? -1 : op;
    };
    config.opDeepPowerDown = optionalOpcode("DEEPDOWN_INSTRUCTION");
    config.opReleaseSignature = optionalOpcode("READSIGNATURE_INSTRUCTION");
    if (part.has("BLOCKERASE32_INSTRUCTION")) config.opBlockErase32 = optionalOpcode("BLOCKERASE32_INSTRUCTION");
    if (part.has("BLOCKERASE64_INSTRUCTION")) config.opBlockErase64 = optionalOpcode("BLOCKERASE64_INSTRUCTION");

    const bool usesRes = part.flag("USE_RES");
    // The JEDEC ID; a part without one known answers FF FF FF, as MISO
    // idles high.
    config.jedecId[0] = config.jedecId[1] = config.jedecId[2] = 0xFF;
    if (part.has("JEDEC_ID")) part.hexBytes("JEDEC_ID", config.jedecId, 3);
    else if (!usesRes && part.has("IDCODE")) part.hexBytes("IDCODE", config.jedecId, 3);

    if (part.has("RES_SIGNATURE")) {
        part.hexBytes("RES_SIGNATURE", &config.signature, 1);
        config.hasSignature = true;
    } else if (usesRes && part.has("IDCODE")) {
        part.hexBytes("IDCODE", &config.signature, 1);
        config.hasSignature = true;
    }

    // Quad Enable: where the part says, else where an x4 part must have it.
    config.qe = part.flag("X4_READ") ? QeLocation::Sr2Bit1 : QeLocation::None;
    if (part.has("QE_LOCATION")) {
        const std::string location = part.text("QE_LOCATION");
        if (location == "SR2.1") config.qe = QeLocation::Sr2Bit1;
        else if (location == "SR1.6") config.qe = QeLocation::Sr1Bit6;
        else if (location == "none") config.qe = QeLocation::None;
        else part.fail("QE_LOCATION", "'" + location + "' is not SR2.1, SR1.6 or none");
    }
    config.writeStatusTakesTwoBytes = config.qe == QeLocation::Sr2Bit1;
    if (part.has("WRSR_BITS")) {
        const std::int32_t bits = part.number("WRSR_BITS");
        if (bits != 8 && bits != 16) part.fail("WRSR_BITS", "is not 8 or 16");
        config.writeStatusTakesTwoBytes = bits == 16;
    }
    // Only a part with QE in register 2 has a register 2 worth reading;
    // the others name a harmless opcode there, which reads register 1.
    config.opReadStatus2 = config.qe == QeLocation::Sr2Bit1 ? part.opcode("READSTATUS2_INSTRUCTION") : -1;

    config.sectorBytes = part.countOr("SECTOR_SIZE", config.sectorBytes);
    config.pageProgramUs = part.countOr("SIM_PAGE_PROGRAM_US", config.pageProgramUs);
    config.bulkEraseUs = part.countOr("SIM_BULK_ERASE_US", config.bulkEraseUs);
    // A typical 4 KiB sector erase takes tens of milliseconds.
    config.sectorEraseUs = part.countOr("SIM_SECTOR_ERASE_US", 45000);
    // Typical 32 KiB and 64 KiB block erases of current parts; the part's
    // own SIM_ keys set them, never the plug-in's waits.
    config.block32EraseUs = part.countOr("SIM_BLOCK32_ERASE_US", 120000);
    config.block64EraseUs = part.countOr("SIM_BLOCK64_ERASE_US", 150000);
    config.writeStatusUs = part.countOr("SIM_WRITE_STATUS_US", config.writeStatusUs);
    config.releaseUs = part.countOr("SIM_RELEASE_US", config.releaseUs);

    // SFDP: a real chip's dump where the part carries one, none for a part
    // too old to have it, else an area written from this configuration.
    if (part.has("SFDP") && part.text("SFDP") != "none") {
        const std::string hex = part.text("SFDP");
        config.sfdp.resize(hex.size() / 2);
        part.hexBytes("SFDP", config.sfdp.data(), config.sfdp.size());
    }

    applyStatusLabels(part, config);
    if (config.qe == QeLocation::Sr1Bit6) {
        config.status1WritableMask |= 0x40;
        config.blockProtectMask &= static_cast<std::uint8_t>(~0x40);
    } else if (config.qe == QeLocation::Sr2Bit1) {
        config.status2WritableMask |= 0x02;
    }
    if (!part.has("SFDP")) config.sfdp = sfdpImageFor(config);
    return config;
}

}  // namespace vorant::sim
