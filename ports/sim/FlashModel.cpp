#include "ports/sim/FlashModel.h"

#include "host/VorantException.h"
#include "ports/sim/FlashFile.h"

#include <algorithm>
#include <cstring>
#include <limits>

namespace vorant::sim {

namespace {

constexpr std::uint8_t kWip = 0x01;
constexpr std::uint8_t kWel = 0x02;
constexpr std::uint64_t kPsPerNs = 1000;
constexpr std::uint64_t kPsPerUs = 1000 * 1000;
constexpr std::uint64_t kNever = std::numeric_limits<std::uint64_t>::max();

// Native 4-byte-address opcodes and the erase sizes of the common erase
// opcodes, as 4-byte-capable parts know them besides their configured ones.
constexpr int kRead4 = 0x13, kFastRead4 = 0x0C, kProgram4 = 0x12, kErase64K4 = 0xDC, kErase4K4 = 0x21;
constexpr int kRead3 = 0x03, kFastRead3 = 0x0B, kProgram3 = 0x02, kErase64K3 = 0xD8, kErase4K3 = 0x20;
constexpr int kReadSfdp = 0x5A;  // read SFDP: 3-byte address, one dummy byte

void requireConfig(bool condition, const FlashConfig& config, const std::string& what) {
    if (!condition) throw VorantException("simulated flash '" + config.partName + "': " + what);
}

void requireOpcode(int opcode, const FlashConfig& config, const char* name) {
    requireConfig(opcode >= -1 && opcode <= 0xFF, config,
                  std::string(name) + " opcode " + std::to_string(opcode) + " is not a byte");
}

}  // namespace

FlashModel::FlashModel(FlashConfig config, const FaultPlan& faults, const std::string& backingFile)
    : config_(std::move(config)) {
    requireConfig(config_.sizeBytes > 0, config_, "size is 0");
    requireConfig(config_.pageBytes > 0 && config_.pageBytes <= config_.sizeBytes, config_,
                  "page size " + std::to_string(config_.pageBytes) + " does not fit the array");
    requireConfig(config_.sizeBytes % config_.pageBytes == 0, config_, "size is not a whole number of pages");
    requireConfig(config_.sectorBytes > 0, config_, "sector size is 0");
    requireConfig(config_.addressBytes == 3 || config_.addressBytes == 4, config_,
                  "address length " + std::to_string(config_.addressBytes) + " is not 3 or 4 bytes");
    requireOpcode(config_.opWriteEnable, config_, "write enable");
    requireOpcode(config_.opWriteDisable, config_, "write disable");
    requireOpcode(config_.opReadId, config_, "read ID");
    requireOpcode(config_.opReadStatus1, config_, "read status 1");
    requireOpcode(config_.opReadStatus2, config_, "read status 2");
    requireOpcode(config_.opWriteStatus, config_, "write status");
    requireOpcode(config_.opRead, config_, "read");
    requireOpcode(config_.opFastRead, config_, "fast read");
    requireOpcode(config_.opPageProgram, config_, "page program");
    requireOpcode(config_.opSectorErase, config_, "sector erase");
    requireOpcode(config_.opBulkErase, config_, "bulk erase");
    requireOpcode(config_.opDeepPowerDown, config_, "deep power-down");
    requireOpcode(config_.opReleaseSignature, config_, "release/signature");
    for (const StuckBits& stuck : faults.stuckBits)
        requireConfig(stuck.address < config_.sizeBytes, config_,
                      "stuck bits at " + std::to_string(stuck.address) + " lie beyond the array");

    memory_.assign(config_.sizeBytes, 0xFF);
    pageBuffer_.assign(config_.pageBytes, 0xFF);
    buildOpcodeTable();
    setClockHz(kDefaultClockHz);

    if (!backingFile.empty()) {
        file_ = std::make_unique<FlashFile>(backingFile, config_.sizeBytes);
        std::uint8_t status1 = 0, status2 = 0;
        file_->load(memory_, status1, status2);
        status1_ = status1 & config_.status1WritableMask & static_cast<std::uint8_t>(~(kWip | kWel));
        status2_ = status2 & config_.status2WritableMask;
    }

    stuckBits_ = faults.stuckBits;
    stuckBusy_ = faults.stuckBusy;
    statusWriteLocked_ = faults.statusWriteLocked;
    if (faults.protectAtPowerOn) status1_ |= config_.blockProtectMask;
    poweredDown_ = faults.startInDeepPowerDown;
}

FlashModel::~FlashModel() = default;

void FlashModel::buildOpcodeTable() {
    auto set = [this](int opcode, Command command, int addressBytes = 0, std::uint32_t eraseBytes = 0) {
        if (opcode < 0) return;
        opcodes_[static_cast<std::size_t>(opcode)] =
            OpcodeEntry{command, static_cast<std::uint8_t>(addressBytes), eraseBytes};
    };
    const int addressBytes = config_.addressBytes;
    if (addressBytes == 4) {
        // A 4-byte part powers up in 3-byte mode: the legacy opcodes take 3
        // address bytes, the native ones always 4.
        set(kRead3, Command::Read, 3);
        set(kFastRead3, Command::FastRead, 3);
        set(kProgram3, Command::PageProgram, 3);
        set(kErase4K3, Command::SectorErase, 3, 4096);
        set(kErase64K3, Command::SectorErase, 3, 65536);
        set(kRead4, Command::Read, 4);
        set(kFastRead4, Command::FastRead, 4);
        set(kProgram4, Command::PageProgram, 4);
        set(kErase4K4, Command::SectorErase, 4, 4096);
        set(kErase64K4, Command::SectorErase, 4, 65536);
    }
    // The part's own opcodes win over the generic ones; on a clash register
    // 1 wins over register 2, so a part naming 05h for both reads register 1.
    set(config_.opReadStatus2, Command::ReadStatus2);
    set(config_.opReadStatus1, Command::ReadStatus1);
    set(config_.opWriteEnable, Command::WriteEnable);
    set(config_.opWriteDisable, Command::WriteDisable);
    set(config_.opReadId, Command::ReadId);
    set(config_.opWriteStatus, Command::WriteStatus);
    set(config_.opRead, Command::Read, addressBytes);
    set(config_.opFastRead, Command::FastRead, addressBytes);
    set(config_.opPageProgram, Command::PageProgram, addressBytes);
    set(config_.opSectorErase, Command::SectorErase, addressBytes, config_.sectorBytes);
    set(config_.opBlockErase32, Command::SectorErase, addressBytes, 32 * 1024);
    set(config_.opBlockErase64, Command::SectorErase, addressBytes, 64 * 1024);
    set(config_.opBulkErase, Command::BulkErase);
    set(config_.opDeepPowerDown, Command::DeepPowerDown);
    set(config_.opReleaseSignature, Command::ReleaseSignature);
    if (!config_.sfdp.empty()) set(kReadSfdp, Command::ReadSfdp, 3);
}

// --- chip select -----------------------------------------------------------

void FlashModel::select() {
    if (selected_) return;
    settle();
    selected_ = true;
    bitPhase_ = 0;
    inShift_ = 0;
    phase_ = Phase::Opcode;
    entry_ = OpcodeEntry{};
    bytesReceived_ = 0;
    pendingBytes_ = 0;
    address_ = 0;
    dataBytes_ = 0;
    answerIndex_ = 0;
}

void FlashModel::deselect() {
    if (!selected_) return;
    settle();
    // The chip is deselected even if writing the backing file fails below.
    selected_ = false;
    const bool onByteBoundary = bitPhase_ == 0;
    bitPhase_ = 0;
    inShift_ = 0;
    executeAtDeselect(onByteBoundary);
    phase_ = Phase::Opcode;
}

bool FlashModel::selected() const { return selected_; }

// --- clocks ------------------------------------------------------------------

bool FlashModel::clockBit(bool mosi) {
    if (!selected_) {
        nowPs_ += bitPs_;
        return true;  // MISO idles high while the chip is not selected
    }
    if (bitPhase_ == 0) outByte_ = outputForNextByte();
    const bool miso = ((outByte_ >> (7 - bitPhase_)) & 1) != 0;
    inShift_ = static_cast<std::uint8_t>((inShift_ << 1) | (mosi ? 1 : 0));
    nowPs_ += bitPs_;
    if (++bitPhase_ == 8) {
        bitPhase_ = 0;
        const std::uint8_t in = inShift_;
        inShift_ = 0;
        receiveByte(in);
    }
    return miso;
}

std::uint8_t FlashModel::clockByte(std::uint8_t mosi) {
    if (!selected_ || bitPhase_ != 0) {
        std::uint8_t out = 0;
        for (int bit = 7; bit >= 0; --bit)
            out = static_cast<std::uint8_t>((out << 1) | (clockBit(((mosi >> bit) & 1) != 0) ? 1 : 0));
        return out;
    }
    const std::uint8_t out = outputForNextByte();
    nowPs_ += 8 * bitPs_;
    receiveByte(mosi);
    return out;
}

void FlashModel::clockBytes(const std::uint8_t* mosi, std::uint8_t* miso, std::size_t n) {
    std::size_t i = 0;
    while (i < n) {
        const bool aligned = selected_ && bitPhase_ == 0;
        if (aligned && phase_ == Phase::ReadData && stuckBits_.empty()) {
            // The array streams out; MOSI is don't-care.
            const std::size_t run = std::min<std::size_t>(n - i, config_.sizeBytes - address_);
            if (miso) std::memcpy(miso + i, memory_.data() + address_, run);
            address_ += static_cast<std::uint32_t>(run);
            if (address_ == config_.sizeBytes) address_ = 0;
            bytesReceived_ += static_cast<std::uint32_t>(run);
            nowPs_ += 8 * bitPs_ * run;
            i += run;
        } else if (aligned && phase_ == Phase::ProgramData) {
            const std::size_t run = std::min<std::size_t>(n - i, config_.pageBytes - pageOffset_);
            std::memcpy(pageBuffer_.data() + pageOffset_, mosi + i, run);
            if (miso) std::memset(miso + i, 0xFF, run);
            pageOffset_ += static_cast<std::uint32_t>(run);
            if (pageOffset_ == config_.pageBytes) pageOffset_ = 0;
            dataBytes_ += static_cast<std::uint32_t>(run);
            bytesReceived_ += static_cast<std::uint32_t>(run);
            nowPs_ += 8 * bitPs_ * run;
            i += run;
        } else {
            const std::uint8_t out = clockByte(mosi[i]);
            if (miso) miso[i] = out;
            ++i;
        }
    }
}

// --- byte-level protocol ------------------------------------------------------

std::uint8_t FlashModel::outputForNextByte() {
    switch (phase_) {
    case Phase::ReadData: {
        const std::uint8_t value = readArrayByte(address_);
        if (++address_ == config_.sizeBytes) address_ = 0;
        return value;
    }
    case Phase::Answer:
        settle();
        switch (entry_.command) {
        case Command::ReadStatus1: return status1();
        case Command::ReadStatus2: return status2();
        case Command::ReadId: {
            // The three ID bytes repeat for as long as the clock runs.
            const std::uint8_t value = config_.jedecId[answerIndex_];
            answerIndex_ = (answerIndex_ + 1) % 3;
            return value;
        }
        case Command::ReleaseSignature: return config_.hasSignature ? config_.signature : 0xFF;
        case Command::ReadSfdp: {
            const std::uint32_t at = address_++;
            return at < config_.sfdp.size() ? config_.sfdp[at] : 0xFF;
        }
        default: return 0xFF;
        }
    default:
        return 0xFF;  // a command still being clocked in, or nothing to say
    }
}

void FlashModel::receiveByte(std::uint8_t in) {
    ++bytesReceived_;
    switch (phase_) {
    case Phase::Opcode:
        startCommand(in);
        break;
    case Phase::Address:
        address_ = (address_ << 8) | in;
        if (--pendingBytes_ == 0) addressComplete();
        break;
    case Phase::Dummy:
        if (--pendingBytes_ == 0)
            phase_ = entry_.command == Command::FastRead ? Phase::ReadData : Phase::Answer;
        break;
    case Phase::ProgramData:
        pageBuffer_[pageOffset_] = in;
        if (++pageOffset_ == config_.pageBytes) pageOffset_ = 0;
        ++dataBytes_;
        break;
    case Phase::StatusData:
        if (dataBytes_ < 2) statusBytes_[dataBytes_] = in;
        ++dataBytes_;
        break;
    default:
        break;
    }
}

void FlashModel::startCommand(std::uint8_t opcode) {
    settle();
    entry_ = opcodes_[opcode];
    const Command command = entry_.command;
    bool accepted = command != Command::None;
    if (poweredDown_) {
        accepted = command == Command::ReleaseSignature;
    } else if (busy_) {
        accepted = command == Command::ReadStatus1 || command == Command::ReadStatus2;
    }
    const bool needsLatch = command == Command::WriteStatus || command == Command::PageProgram ||
                            command == Command::SectorErase || command == Command::BulkErase;
    if (needsLatch && (status1_ & kWel) == 0) accepted = false;
    if (!accepted) {
        entry_ = OpcodeEntry{};
        phase_ = Phase::Ignored;
        return;
    }

    phase_ = Phase::Ignored;
    switch (command) {
    case Command::WriteEnable: status1_ |= kWel; break;
    case Command::WriteDisable: status1_ &= static_cast<std::uint8_t>(~kWel); break;
    case Command::ReadId:
    case Command::ReadStatus1:
    case Command::ReadStatus2:
        answerIndex_ = 0;
        phase_ = Phase::Answer;
        break;
    case Command::WriteStatus:
        dataBytes_ = 0;
        phase_ = Phase::StatusData;
        break;
    case Command::Read:
    case Command::FastRead:
    case Command::PageProgram:
    case Command::SectorErase:
    case Command::ReadSfdp:
        address_ = 0;
        pendingBytes_ = entry_.addressBytes;
        phase_ = Phase::Address;
        break;
    case Command::ReleaseSignature:
        pendingBytes_ = 3;
        phase_ = Phase::Dummy;
        break;
    default:
        break;  // bulk erase and deep power-down act at deselect
    }
}

void FlashModel::addressComplete() {
    if (entry_.command == Command::ReadSfdp) {  // an address in the SFDP area, then one dummy byte
        pendingBytes_ = 1;
        phase_ = Phase::Dummy;
        return;
    }
    address_ %= config_.sizeBytes;  // address bits above the array are ignored
    switch (entry_.command) {
    case Command::Read: phase_ = Phase::ReadData; break;
    case Command::FastRead:
        pendingBytes_ = 1;
        phase_ = Phase::Dummy;
        break;
    case Command::PageProgram:
        pageOffset_ = address_ % config_.pageBytes;
        pageBase_ = address_ - pageOffset_;
        std::fill(pageBuffer_.begin(), pageBuffer_.end(), std::uint8_t{0xFF});
        dataBytes_ = 0;
        phase_ = Phase::ProgramData;
        break;
    default: phase_ = Phase::Ignored; break;  // sector erase acts at deselect
    }
}

// Program, erase, status write and deep power-down act when chip select
// rises, and like a real chip only when it rises on a byte boundary after a
// complete command.
void FlashModel::executeAtDeselect(bool onByteBoundary) {
    switch (entry_.command) {
    case Command::PageProgram: {
        if (!onByteBoundary || phase_ != Phase::ProgramData || dataBytes_ == 0) return;
        if (protectedArray()) break;
        // Programming only clears bits; bytes not sent stay 0xFF in the
        // buffer and leave the array alone.
        std::uint8_t* page = memory_.data() + pageBase_;
        for (std::uint32_t i = 0; i < config_.pageBytes; ++i) page[i] &= pageBuffer_[i];
        persistMemory(pageBase_, config_.pageBytes);
        startBusy(config_.pageProgramUs);
        return;
    }
    case Command::SectorErase: {
        if (!onByteBoundary || bytesReceived_ != 1u + entry_.addressBytes) return;
        if (protectedArray()) break;
        const std::uint32_t eraseBytes = entry_.eraseBytes ? entry_.eraseBytes : config_.sectorBytes;
        const std::uint32_t base = address_ - address_ % eraseBytes;
        const std::uint32_t length = std::min(eraseBytes, config_.sizeBytes - base);
        std::fill_n(memory_.begin() + base, length, std::uint8_t{0xFF});
        persistMemory(base, length);
        ++eraseCounts_[eraseBytes];
        startBusy(eraseBytes == config_.sectorBytes ? config_.sectorEraseUs
                  : eraseBytes <= 32 * 1024         ? config_.block32EraseUs
                                                    : config_.block64EraseUs);
        return;
    }
    case Command::BulkErase:
        if (!onByteBoundary || bytesReceived_ != 1) return;
        if (protectedArray()) break;
        std::fill(memory_.begin(), memory_.end(), std::uint8_t{0xFF});
        persistMemory(0, config_.sizeBytes);
        ++eraseCounts_[config_.sizeBytes];
        startBusy(config_.bulkEraseUs);
        return;
    case Command::WriteStatus: {
        if (!onByteBoundary || dataBytes_ == 0 || statusWriteLocked_) return;
        // Bytes beyond those the part takes are ignored.
        const auto writable1 = static_cast<std::uint8_t>(config_.status1WritableMask & ~(kWip | kWel));
        status1_ = static_cast<std::uint8_t>((status1_ & ~writable1) | (statusBytes_[0] & writable1));
        if (dataBytes_ >= 2 && config_.writeStatusTakesTwoBytes) {
            const std::uint8_t writable2 = config_.status2WritableMask;
            status2_ = static_cast<std::uint8_t>((status2_ & ~writable2) | (statusBytes_[1] & writable2));
        }
        persistStatus();
        startBusy(config_.writeStatusUs);
        return;
    }
    case Command::DeepPowerDown:
        if (onByteBoundary && bytesReceived_ == 1) poweredDown_ = true;
        return;
    case Command::ReleaseSignature:
        if (poweredDown_ && !waking_) {
            waking_ = true;
            wakeAtPs_ = nowPs_ + config_.releaseUs * kPsPerUs;
            settle();
        }
        return;
    default:
        return;
    }
    // A program or erase refused by the block protection: nothing changes
    // but the write enable latch, which is reset as after a completed one.
    status1_ &= static_cast<std::uint8_t>(~kWel);
}

void FlashModel::startBusy(std::uint32_t microseconds) {
    busy_ = true;
    busyUntilPs_ = stuckBusy_ ? kNever : nowPs_ + microseconds * kPsPerUs;
}

void FlashModel::settle() {
    if (busy_ && nowPs_ >= busyUntilPs_) {
        busy_ = false;
        status1_ &= static_cast<std::uint8_t>(~kWel);
    }
    if (waking_ && nowPs_ >= wakeAtPs_) {
        waking_ = false;
        poweredDown_ = false;
    }
}

bool FlashModel::protectedArray() const { return (status1_ & config_.blockProtectMask) != 0; }

std::uint8_t FlashModel::readArrayByte(std::uint32_t address) const {
    std::uint8_t value = memory_[address];
    for (const StuckBits& stuck : stuckBits_) {
        if (stuck.address == address)
            value = static_cast<std::uint8_t>((value & ~stuck.mask) | (stuck.value & stuck.mask));
    }
    return value;
}

void FlashModel::persistMemory(std::uint32_t offset, std::uint32_t length) {
    if (file_) file_->writeMemory(offset, memory_.data() + offset, length);
}

void FlashModel::persistStatus() {
    if (file_) file_->writeStatus(status1_, status2_);
}

// --- time ------------------------------------------------------------------------

void FlashModel::advance(std::uint64_t nanoseconds) {
    // Saturates just below kNever, the end of a stuck busy state.
    const std::uint64_t ps = nanoseconds > kNever / kPsPerNs ? kNever : nanoseconds * kPsPerNs;
    nowPs_ = (kNever - 1 - nowPs_ < ps) ? kNever - 1 : nowPs_ + ps;
    settle();
}

std::uint64_t FlashModel::now() const { return nowPs_ / kPsPerNs; }

void FlashModel::setClockHz(std::uint32_t hz) {
    requireConfig(hz > 0, config_, "the SPI clock must be faster than 0 Hz");
    clockHz_ = hz;
    bitPs_ = (1'000'000'000'000ull + hz / 2) / hz;
}

// --- state ---------------------------------------------------------------------------

const FlashConfig& FlashModel::config() const { return config_; }
const std::vector<std::uint8_t>& FlashModel::memory() const { return memory_; }
std::vector<std::uint8_t>& FlashModel::memory() { return memory_; }

bool FlashModel::busy() const { return busy_ && nowPs_ < busyUntilPs_; }

bool FlashModel::inDeepPowerDown() const { return poweredDown_ && !(waking_ && nowPs_ >= wakeAtPs_); }

std::uint8_t FlashModel::status1() const {
    std::uint8_t value = status1_;
    if (busy_) {
        if (nowPs_ < busyUntilPs_) value |= kWip;
        else value &= static_cast<std::uint8_t>(~kWel);  // completed, not yet settled
    }
    return value;
}

std::uint8_t FlashModel::status2() const { return status2_; }

bool FlashModel::writeEnabled() const { return (status1() & kWel) != 0; }

void FlashModel::setStatus(std::uint8_t status1, std::uint8_t status2) {
    status1_ = static_cast<std::uint8_t>(status1 & ~kWip);
    status2_ = status2;
    persistStatus();
}

bool FlashModel::movesPageData(std::uint8_t opcode) const {
    const Command command = opcodes_[opcode].command;
    return command == Command::PageProgram || command == Command::Read || command == Command::FastRead;
}

std::uint64_t FlashModel::erasesOf(std::uint32_t bytes) const {
    const auto it = eraseCounts_.find(bytes);
    return it == eraseCounts_.end() ? 0 : it->second;
}

}  // namespace vorant::sim
