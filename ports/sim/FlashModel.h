#pragma once
// Behavioural model of a 25-series SPI NOR flash, driven on the wire.
//
// This header is the contract other components (the simulator port, the
// SVF player, tests) rely on. The members below must stay; more may be
// added. The model is an independent witness of the plug-in: it decodes
// bits and bytes with its own code and never uses the host's bit-vector
// helpers.

#include <cstdint>
#include <string>
#include <vector>

namespace vorant::sim {

enum class QeLocation { None, Sr2Bit1, Sr1Bit6 };

// Everything the model needs to behave like one part.
struct FlashConfig {
    std::string partName;
    std::uint32_t sizeBytes = 0;
    std::uint32_t pageBytes = 256;
    int addressBytes = 3;             // 3 or 4
    std::uint8_t jedecId[3] = {0, 0, 0};
    bool hasSignature = false;        // answers the RES signature command
    std::uint8_t signature = 0;
    // Opcodes; -1 where the part lacks the command.
    int opWriteEnable = 0x06, opWriteDisable = 0x04, opReadId = 0x9F;
    int opReadStatus1 = 0x05, opReadStatus2 = -1, opWriteStatus = 0x01;
    int opRead = 0x03, opFastRead = 0x0B, opPageProgram = 0x02;
    int opSectorErase = 0x20, opBulkErase = 0xC7;
    int opDeepPowerDown = 0xB9, opReleaseSignature = 0xAB;
    std::uint32_t sectorBytes = 4096;
    QeLocation qe = QeLocation::None;
    bool writeStatusTakesTwoBytes = false;  // 01h accepts SR1 and SR2
    // Typical busy times in microseconds.
    std::uint32_t pageProgramUs = 700, bulkEraseUs = 40000, sectorEraseUs = 45;
    std::uint32_t writeStatusUs = 10000, releaseUs = 3;

    // Builds the configuration of a part from the process-wide part
    // database (ConstraintsManager). Throws VorantException for an unknown
    // part.
    static FlashConfig fromPartDatabase(const std::string& partName);
};

class FlashModel {
public:
    explicit FlashModel(FlashConfig config);

    // Chip select falls / rises. Commands that execute at deselect (program,
    // erase, status write) execute in deselect().
    void select();
    void deselect();
    bool selected() const;

    // One SPI clock: drives MOSI, returns MISO. Bits of one byte come MSB
    // first.
    bool clockBit(bool mosi);
    // Eight clocks, MSB first. Must behave exactly like eight clockBit calls.
    std::uint8_t clockByte(std::uint8_t mosi);

    // Time passes (nanoseconds); busy operations complete as it does.
    void advance(std::uint64_t nanoseconds);
    std::uint64_t now() const;

    const FlashConfig& config() const;
    // The array, sizeBytes long.
    const std::vector<std::uint8_t>& memory() const;
    std::vector<std::uint8_t>& memory();
    std::uint8_t status1() const;
    std::uint8_t status2() const;
    void setStatus(std::uint8_t status1, std::uint8_t status2);
};

}  // namespace vorant::sim
