#include "tests/doubles/FakeSpidev.h"

#include <algorithm>
#include <climits>
#include <cstdio>
#include <cstring>

namespace vorant::test {

namespace {

using ports::spidev::SpidevSetting;

// Mode bits as the kernel's spi.h numbers them.
constexpr std::uint8_t kCpha = 0x01, kCpol = 0x02, kCsHigh = 0x04, kNoCs = 0x40;
// What this controller can do: both clock bits, chip select polarity, no
// chip select. LSB first, three-wire, loopback and READY it refuses.
constexpr std::uint8_t kControllerModeBits = kCpha | kCpol | kCsHigh | kNoCs;
// ARCH_KMALLOC_MINALIGN on x86-64: each transfer's share of a bounce buffer
// is rounded up to it.
constexpr std::uint64_t kBounceAlignment = 8;
// The kernel's SPI_IOC_MESSAGE size field has 14 bits.
constexpr std::size_t kRecordBytes = 32, kSizeFieldLimit = 1u << 14;

// struct spi_ioc_transfer as the kernel copies it in, read at its
// documented offsets.
struct Record {
    std::uint64_t tx = 0, rx = 0;
    std::uint32_t len = 0, speedHz = 0;
    std::uint16_t delayUs = 0;
    std::uint8_t bitsPerWord = 0, csChange = 0, txNbits = 0, rxNbits = 0;
};

Record decode(const unsigned char* at) {
    Record r;
    std::memcpy(&r.tx, at + 0, 8);
    std::memcpy(&r.rx, at + 8, 8);
    std::memcpy(&r.len, at + 16, 4);
    std::memcpy(&r.speedHz, at + 20, 4);
    std::memcpy(&r.delayUs, at + 24, 2);
    r.bitsPerWord = at[26];
    r.csChange = at[27];
    r.txNbits = at[28];
    r.rxNbits = at[29];
    return r;
}

const std::uint8_t* bytesAt(std::uint64_t pointer) {
    return reinterpret_cast<const std::uint8_t*>(static_cast<std::uintptr_t>(pointer));
}

std::string describe(const Record& r) {
    if (r.tx == 0) return (r.rx == 0 ? "-" : "<") + std::to_string(r.len);
    std::string text;
    char hex[3];
    for (std::uint32_t i = 0; i < r.len; ++i) {
        std::snprintf(hex, sizeof hex, "%02X", bytesAt(r.tx)[i]);
        text += hex;
    }
    return r.rx == 0 ? text : text + "<";
}

std::uint64_t roundUp(std::uint64_t n) { return (n + kBounceAlignment - 1) / kBounceAlignment * kBounceAlignment; }

}  // namespace

FakeSpidev::FakeSpidev(sim::FlashModel* flash) : flash_(flash) {}

void FakeSpidev::note(std::string line) {
    if (keepLog) log.push_back(std::move(line));
}

int FakeSpidev::write(SpidevSetting setting, std::uint32_t value) {
    ++ioctls;
    if (gone()) return vanishErrno;
    if (notSpidev) return ENOTTY;
    switch (setting) {
    case SpidevSetting::Mode: {
        note("set mode " + std::to_string(value));
        if (value > 0xFF || (value & ~kControllerModeBits) != 0) return EINVAL;
        mode_ = static_cast<std::uint8_t>(value | forcedModeBits);
        return 0;
    }
    case SpidevSetting::BitsPerWord:
        note("set bits " + std::to_string(value));
        if (value != 0 && value != 8) return EINVAL;
        bitsPerWord_ = static_cast<std::uint8_t>(value);
        return 0;
    case SpidevSetting::MaxSpeedHz:
        note("set speed " + std::to_string(value));
        // Current kernels refuse 0, and the controller a clock it cannot
        // divide down to; a faster one is kept as asked and clamped per
        // transfer.
        if (value == 0 || value < controllerMinHz) return EINVAL;
        speedHz_ = value;
        return 0;
    }
    return EINVAL;
}

int FakeSpidev::read(SpidevSetting setting, std::uint32_t& value) {
    ++ioctls;
    if (gone()) return vanishErrno;
    if (notSpidev) return ENOTTY;
    switch (setting) {
    case SpidevSetting::Mode: note("get mode"); value = mode_; return 0;
    case SpidevSetting::BitsPerWord: note("get bits"); value = bitsPerWord_; return 0;
    case SpidevSetting::MaxSpeedHz: note("get speed"); value = speedHz_; return 0;
    }
    return EINVAL;
}

long FakeSpidev::message(std::span<const ports::spidev::SpidevTransfer> transfers) {
    ++ioctls;
    if (gone()) {
        note("msg: the device is gone");
        return -vanishErrno;
    }
    if (notSpidev) return -ENOTTY;
    // A message size of 0 (no transfers, or more than the size field
    // holds) makes the request a no-op that succeeds.
    if (transfers.empty() || transfers.size() * kRecordBytes >= kSizeFieldLimit) {
        note("msg: no-op");
        return 0;
    }
    ++messages;

    const auto* raw = reinterpret_cast<const unsigned char*>(transfers.data());
    std::vector<Record> records;
    std::uint64_t total = 0, txBuffer = 0, rxBuffer = 0;
    std::string line = "msg";
    for (std::size_t i = 0; i < transfers.size(); ++i) {
        const Record r = decode(raw + i * kRecordBytes);
        const auto refuse = [&](const std::string& why, int error) {
            note("msg refused: transfer " + std::to_string(i) + ": " + why);
            return -static_cast<long>(error);
        };
        if (r.bitsPerWord != 0 && r.bitsPerWord != 8) return refuse("word size", EINVAL);
        // cs_change and delays are not modelled: a flash port has no use for them.
        if (r.csChange != 0 || r.delayUs != 0) return refuse("cs_change or delay", EINVAL);
        if (r.txNbits > 1 || r.rxNbits > 1) return refuse("dual or quad transfer", EINVAL);
        if ((r.tx != 0 && r.tx < 4096) || (r.rx != 0 && r.rx < 4096)) return refuse("bad buffer", EFAULT);
        if (r.tx != 0) txBuffer += roundUp(r.len);
        if (r.rx != 0) rxBuffer += roundUp(r.len);
        total += r.len;
        line += (i == 0 ? " " : " | ") + describe(r);
        records.push_back(r);
    }
    const std::uint64_t buffer = bufsiz.value_or(4096);
    if (total > INT_MAX || txBuffer > buffer || rxBuffer > buffer) {
        note(line + " refused: larger than bufsiz");
        return -EMSGSIZE;
    }
    if (messages == failAtMessage) {
        note(line + " failed");
        return -failErrno;
    }

    // The flash understands modes 0 and 3 with its chip select driven low;
    // on any other wire it hears nothing and MISO floats high.
    const bool clockPhaseFits = (mode_ & (kCpha | kCpol)) == 0 || (mode_ & (kCpha | kCpol)) == (kCpha | kCpol);
    const bool selectFits = (mode_ & kNoCs) == 0 && ((mode_ & kCsHigh) == 0 || (forcedModeBits & kCsHigh) != 0);
    sim::FlashModel* flash = clockPhaseFits && selectFits ? flash_ : nullptr;
    ++chipSelects;
    if (flash) flash->select();
    if (records.front().tx != 0 && records.front().len > 0) ++messagesByFirstByte[bytesAt(records.front().tx)[0]];
    for (std::size_t i = 0; i < records.size(); ++i) {
        const Record& r = records[i];
        // A transfer with neither buffer is skipped by the core, unclocked.
        if (r.len > 0 && (r.tx != 0 || r.rx != 0)) {
            if (zeros_.size() < r.len) zeros_.resize(r.len, 0);
            if (scratch_.size() < r.len) scratch_.resize(r.len);
            const std::uint8_t* out = r.tx != 0 ? bytesAt(r.tx) : zeros_.data();
            auto* in = r.rx != 0 ? reinterpret_cast<std::uint8_t*>(static_cast<std::uintptr_t>(r.rx)) : scratch_.data();
            if (flash) {
                flash->setClockHz(std::min(r.speedHz != 0 ? r.speedHz : speedHz_, controllerMaxHz));
                flash->clockBytes(out, in, r.len);
            } else {
                std::memset(in, 0xFF, r.len);
            }
        }
    }
    if (flash_ && flash_->selected()) flash_->deselect();
    note(line);
    return static_cast<long>(messages == miscountAtMessage ? total - 1 : total);
}

void FakeSpidev::sleep(std::uint64_t microseconds) {
    if (flash_) flash_->advance(microseconds * 1000);
}

namespace {

// What a port holds: the node's double stays the test's.
class NodeHandle final : public ports::spidev::SpidevIo {
public:
    explicit NodeHandle(FakeSpidev& device) : device_(device) {}
    int write(SpidevSetting setting, std::uint32_t value) override { return device_.write(setting, value); }
    int read(SpidevSetting setting, std::uint32_t& value) override { return device_.read(setting, value); }
    long message(std::span<const ports::spidev::SpidevTransfer> transfers) override {
        return device_.message(transfers);
    }
    std::optional<std::uint32_t> bufferSize() override { return device_.bufferSize(); }
    void sleep(std::uint64_t microseconds) override { device_.sleep(microseconds); }

private:
    FakeSpidev& device_;
};

}  // namespace

std::unique_ptr<ports::spidev::SpidevIo> FakeSpidev::handle() { return std::make_unique<NodeHandle>(*this); }

FakeSpidevNode::FakeSpidevNode(sim::FlashModel* flash) : device(flash), saved_(ports::spidev::spidevIoOpener()) {
    ports::spidev::spidevIoOpener() = [this](const std::string& path,
                                             int& error) -> std::unique_ptr<ports::spidev::SpidevIo> {
        opened.push_back(path);
        error = openError;
        if (openError != 0) return nullptr;
        return device.handle();
    };
}

FakeSpidevNode::~FakeSpidevNode() { ports::spidev::spidevIoOpener() = saved_; }

}  // namespace vorant::test
