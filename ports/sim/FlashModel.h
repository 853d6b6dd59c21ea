#pragma once
// Behavioural model of a 25-series SPI NOR flash, driven on the wire.
//
// This header is the contract other components (the simulator port, the
// SVF player, tests) rely on. The members below must stay; more may be
// added. The model is an independent witness of the plug-in: it decodes
// bits and bytes with its own code and never uses the host's bit-vector
// helpers.

#include "ports/sim/FaultPlan.h"

#include <array>
#include <map>
#include <cstddef>
#include <cstdint>
#include <memory>
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
    int opBlockErase32 = -1, opBlockErase64 = -1;  // 32 KiB and 64 KiB block erases
    int opDeepPowerDown = 0xB9, opReleaseSignature = 0xAB;
    std::uint32_t sectorBytes = 4096;
    QeLocation qe = QeLocation::None;
    bool writeStatusTakesTwoBytes = false;  // 01h accepts SR1 and SR2
    // Typical busy times in microseconds.
    std::uint32_t pageProgramUs = 700, bulkEraseUs = 40000, sectorEraseUs = 45;
    std::uint32_t block32EraseUs = 120000, block64EraseUs = 150000;
    std::uint32_t writeStatusUs = 10000, releaseUs = 3;

    // Status register layout. Any block-protect bit set protects the whole
    // array (a simplification: real parts protect a range chosen by the BP,
    // TB, SEC and CMP bits). Only the writable bits change on a status
    // write; WIP and WEL (bits 0 and 1) never do.
    std::uint8_t blockProtectMask = 0x1C;     // BP0..BP2
    std::uint8_t status1WritableMask = 0xFC;
    std::uint8_t status2WritableMask = 0xFF;
    // The SFDP area served to 5Ah (3-byte address, one dummy byte; FFh past
    // its end); empty for a chip without one, which ignores 5Ah.
    std::vector<std::uint8_t> sfdp;

    // Builds the configuration of a part from the process-wide part
    // database (ConstraintsManager). Throws VorantException for an unknown
    // part.
    static FlashConfig fromPartDatabase(const std::string& partName);
};

class FlashFile;

class FlashModel {
public:
    static constexpr std::uint32_t kDefaultClockHz = 50'000'000;

    // Powers the chip up: the array erased (or loaded from backingFile when
    // one is named; a missing or empty file is created erased), then the
    // chip faults of the plan applied. Throws VorantException for an
    // unusable configuration or backing file.
    explicit FlashModel(FlashConfig config, const FaultPlan& faults = FaultPlan{},
                        const std::string& backingFile = std::string{});
    ~FlashModel();
    FlashModel(const FlashModel&) = delete;
    FlashModel& operator=(const FlashModel&) = delete;

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
    // n bytes in a row, as n clockByte calls; miso may be null.
    void clockBytes(const std::uint8_t* mosi, std::uint8_t* miso, std::size_t n);

    // Time passes (nanoseconds); busy operations complete as it does.
    void advance(std::uint64_t nanoseconds);
    std::uint64_t now() const;

    // The SPI clock: every clocked bit costs one period of it.
    void setClockHz(std::uint32_t hz);
    std::uint32_t clockHz() const { return clockHz_; }

    const FlashConfig& config() const;
    // The array, sizeBytes long. Changes made through the non-const
    // accessor are not written to a backing file.
    const std::vector<std::uint8_t>& memory() const;
    std::vector<std::uint8_t>& memory();
    // Status register 1 as a status read answers it (WIP live) and 2.
    std::uint8_t status1() const;
    std::uint8_t status2() const;
    // Sets both registers as they are (WIP comes from the busy state and is
    // not set by this); written through to a backing file.
    void setStatus(std::uint8_t status1, std::uint8_t status2);

    bool busy() const;
    // Erases the chip carried out, by size in bytes (the whole chip counted
    // under its size).
    std::uint64_t erasesOf(std::uint32_t bytes) const;
    // true for the opcodes that write or read array data a page at a time
    // (page program, read, fast read, in either address width).
    bool movesPageData(std::uint8_t opcode) const;
    bool inDeepPowerDown() const;
    bool writeEnabled() const;

private:
    enum class Command : std::uint8_t {
        None, WriteEnable, WriteDisable, ReadId, ReadStatus1, ReadStatus2, WriteStatus,
        Read, FastRead, PageProgram, SectorErase, BulkErase, DeepPowerDown, ReleaseSignature, ReadSfdp,
    };
    // Where the current transaction stands, byte by byte.
    enum class Phase : std::uint8_t {
        Opcode,        // waiting for the opcode byte
        Address,       // collecting address bytes
        Dummy,         // dummy bytes before the answer
        ReadData,      // shifting out the array
        ProgramData,   // latching page data
        StatusData,    // latching status register bytes
        Answer,        // shifting out an ID, signature or register
        Ignored,       // rest of the transaction does nothing
    };
    struct OpcodeEntry {
        Command command = Command::None;
        std::uint8_t addressBytes = 0;
        std::uint32_t eraseBytes = 0;
    };

    void buildOpcodeTable();
    void settle();  // completes busy operations whose time has come
    std::uint8_t outputForNextByte();
    void receiveByte(std::uint8_t in);
    void startCommand(std::uint8_t opcode);
    void addressComplete();
    void executeAtDeselect(bool onByteBoundary);
    void startBusy(std::uint32_t microseconds);
    bool protectedArray() const;
    std::uint8_t readArrayByte(std::uint32_t address) const;
    void persistMemory(std::uint32_t offset, std::uint32_t length);
    void persistStatus();

    FlashConfig config_;
    std::vector<std::uint8_t> memory_;
    std::array<OpcodeEntry, 256> opcodes_{};
    std::unique_ptr<FlashFile> file_;
    std::vector<StuckBits> stuckBits_;
    bool stuckBusy_ = false;
    bool statusWriteLocked_ = false;

    // Registers: status1_ holds WEL and the non-volatile bits; WIP is
    // derived from the busy state.
    std::uint8_t status1_ = 0;
    std::uint8_t status2_ = 0;

    // Time in picoseconds, so any clock frequency adds up exactly enough.
    std::map<std::uint32_t, std::uint64_t> eraseCounts_;
    std::uint64_t nowPs_ = 0;
    std::uint64_t bitPs_ = 0;
    std::uint32_t clockHz_ = kDefaultClockHz;
    bool busy_ = false;
    std::uint64_t busyUntilPs_ = 0;
    bool poweredDown_ = false;
    bool waking_ = false;
    std::uint64_t wakeAtPs_ = 0;

    // The transaction in progress.
    bool selected_ = false;
    int bitPhase_ = 0;          // bits of the current byte already clocked
    std::uint8_t inShift_ = 0;  // MOSI bits of the current byte so far
    std::uint8_t outByte_ = 0xFF;
    Phase phase_ = Phase::Opcode;
    OpcodeEntry entry_{};
    std::uint32_t bytesReceived_ = 0;
    int pendingBytes_ = 0;      // address or dummy bytes still to come
    std::uint32_t address_ = 0;
    std::uint32_t dataBytes_ = 0;
    std::uint32_t answerIndex_ = 0;
    std::vector<std::uint8_t> pageBuffer_;
    std::uint32_t pageBase_ = 0, pageOffset_ = 0;
    std::uint8_t statusBytes_[2] = {0, 0};
};

}  // namespace vorant::sim
