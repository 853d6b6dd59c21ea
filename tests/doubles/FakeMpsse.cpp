#include "tests/doubles/FakeMpsse.h"

#include <algorithm>
#include <cmath>
#include <cstdio>

namespace vorant::test {

namespace {

using ports::ftdi::FtdiIo;

// Bits of a clock-data opcode (bit 7 clear), from the command reference.
constexpr std::uint8_t kOutOnFallingEdge = 0x01;
constexpr std::uint8_t kBitMode = 0x02;
constexpr std::uint8_t kInOnFallingEdge = 0x04;
constexpr std::uint8_t kLsbFirst = 0x08;
constexpr std::uint8_t kWritesDo = 0x10;
constexpr std::uint8_t kReadsDi = 0x20;
constexpr std::uint8_t kWritesTms = 0x40;

// ADBUS pins.
constexpr std::uint8_t kSckPin = 0x01, kDoPin = 0x02, kDiPin = 0x04;

// A reply the host reads without a send immediate waits this long in the
// chip (the latency timer's default).
constexpr std::uint64_t kLatencyTimerNs = 16'000'000;

std::string hex(const std::uint8_t* bytes, std::size_t n) {
    std::string text;
    for (std::size_t i = 0; i < n; ++i) {
        char digits[3];
        std::snprintf(digits, sizeof digits, "%02X", bytes[i]);
        text += digits;
    }
    return text;
}

std::string hexByte(std::uint8_t byte) { return hex(&byte, 1); }

}  // namespace

class FakeMpsse::Handle final : public FtdiIo {
public:
    explicit Handle(FakeMpsse& device) : device_(device) {}
    bool setBitmode(std::uint8_t mask, std::uint8_t mode) override { return device_.setBitmode(mask, mode); }
    bool purge() override { return device_.purge(); }
    bool write(std::span<const std::uint8_t> bytes) override { return device_.write(bytes); }
    bool read(std::span<std::uint8_t> into, std::size_t& got, std::chrono::milliseconds timeout) override {
        return device_.read(into, got, timeout);
    }
    void sleep(std::uint64_t microseconds) override { device_.sleep(microseconds); }
    bool lost() const override { return device_.lost(); }
    std::string error() const override { return device_.error(); }

private:
    FakeMpsse& device_;
};

FakeMpsse::FakeMpsse(sim::FlashModel& flash, unsigned chipSelectPin) : flash_(flash), chipSelectPin_(chipSelectPin) {}

std::unique_ptr<FtdiIo> FakeMpsse::handle() { return std::make_unique<Handle>(*this); }

void FakeMpsse::note(std::string line) {
    if (keepLog) log.push_back(std::move(line));
}

bool FakeMpsse::refuse(const std::string& why) {
    error_ = why;
    return false;
}

bool FakeMpsse::misused(const std::string& why) {
    misuse.push_back(why);
    return refuse("MPSSE misuse: " + why);
}

double FakeMpsse::sckHz() const {
    const double base = divideBy5_ ? 12e6 : 60e6;
    return base / ((1.0 + divisor_) * 2.0);
}

bool FakeMpsse::chipSelectHigh() const {
    const std::uint8_t pin = static_cast<std::uint8_t>(1u << chipSelectPin_);
    // An input floats high: boards pull chip select up.
    return (directions_ & pin) == 0 || (levels_ & pin) != 0;
}

void FakeMpsse::setLowPins(std::uint8_t levels, std::uint8_t directions) {
    const bool wasHigh = chipSelectHigh();
    levels_ = levels;
    directions_ = directions;
    const bool isHigh = chipSelectHigh();
    if (wasHigh && !isHigh) flash_.select();
    if (!wasHigh && isHigh) flash_.deselect();
}

bool FakeMpsse::setBitmode(std::uint8_t pinMask, std::uint8_t mode) {
    if (gone_) return refuse("the device is gone (LIBUSB_ERROR_NO_DEVICE)");
    note("bitmode " + hexByte(mode));
    if (mode == 0x02 && !faults.noMpsse) {
        if (!mpsse_ && faults.leftoverState) {
            threePhase_ = adaptive_ = loopback_ = true;
            divideBy5_ = true;
        }
        mpsse_ = true;
        return true;
    }
    // Leaving MPSSE (or a mode this double does not model): the engine
    // stops and its pins fall back to the mask's directions.
    mpsse_ = false;
    setLowPins(levels_, mode == 0x00 ? 0x00 : pinMask);
    return true;
}

bool FakeMpsse::purge() {
    if (gone_) return refuse("the device is gone (LIBUSB_ERROR_NO_DEVICE)");
    note("purge");
    replies_.clear();
    flushed_ = 0;
    return true;
}

void FakeMpsse::sleep(std::uint64_t microseconds) { flash_.advance(microseconds * 1000); }

bool FakeMpsse::write(std::span<const std::uint8_t> bytes) {
    if (gone_) return refuse("usb bulk write failed (LIBUSB_ERROR_NO_DEVICE)");
    if (faults.vanishAfterWrites > 0 && writeCount_ >= static_cast<std::uint64_t>(faults.vanishAfterWrites)) {
        gone_ = true;
        if (!chipSelectHigh()) flash_.deselect();  // unpowered pins: chip select floats high
        return refuse("usb bulk write failed (LIBUSB_ERROR_NO_DEVICE)");
    }
    ++writeCount_;
    if (keepWrites) writes.emplace_back(bytes.begin(), bytes.end());
    // Not an engine: the bytes leave as serial data and nothing answers.
    return !mpsse_ || interpret(bytes.data(), bytes.size());
}

bool FakeMpsse::read(std::span<std::uint8_t> into, std::size_t& got, std::chrono::milliseconds) {
    got = 0;
    if (gone_) return refuse("usb bulk read failed (LIBUSB_ERROR_NO_DEVICE)");
    const std::uint64_t number = ++readCount_;
    if (faults.strayByteAtRead > 0 && number == static_cast<std::uint64_t>(faults.strayByteAtRead)) {
        replies_.push_front(0x5A);
        ++flushed_;
    }
    std::size_t available = std::min(into.size(), replies_.size());
    if (available > flushed_) {
        // The chip holds a reply nobody flushed until its latency timer runs out.
        ++latencyWaits_;
        flash_.advance(kLatencyTimerNs);
    }
    if (faults.shortReplyAtRead > 0 && number == static_cast<std::uint64_t>(faults.shortReplyAtRead) && available > 0) {
        replies_.erase(replies_.begin() + static_cast<std::ptrdiff_t>(available - 1));
        --available;
    }
    std::copy_n(replies_.begin(), available, into.begin());
    replies_.erase(replies_.begin(), replies_.begin() + static_cast<std::ptrdiff_t>(available));
    flushed_ = flushed_ > available ? flushed_ - available : 0;
    got = available;
    return true;
}

bool FakeMpsse::interpret(const std::uint8_t* bytes, std::size_t n) {
    std::size_t at = 0;
    while (at < n) {
        const std::uint8_t opcode = bytes[at++];
        if ((opcode & 0x80) == 0) {
            std::size_t used = 0;
            if (!clockData(opcode, bytes + at, n - at, used)) return false;
            at += used;
            continue;
        }
        if ((opcode == 0x80 || opcode == 0x86) && n - at < 2)
            return refuse("malformed MPSSE command " + hexByte(opcode) + ": its arguments need 2 more bytes, the " +
                          "write ends after " + std::to_string(n - at));
        switch (opcode) {
            case 0x80:
                setLowPins(bytes[at], bytes[at + 1]);
                at += 2;
                break;
            case 0x86:
                divisor_ = static_cast<std::uint16_t>(bytes[at] | (bytes[at + 1] << 8));
                at += 2;
                break;
            case 0x87: flushed_ = replies_.size(); break;
            case 0x84: loopback_ = true; break;
            case 0x85: loopback_ = false; break;
            case 0x8A: divideBy5_ = false; break;
            case 0x8B: divideBy5_ = true; break;
            case 0x8C: threePhase_ = true; break;
            case 0x8D: threePhase_ = false; break;
            case 0x96: adaptive_ = true; break;
            case 0x97: adaptive_ = false; break;
            default:
                // The engine's answer to an opcode it does not know; the
                // commands an SPI port has no use for are answered so too.
                replies_.push_back(0xFA);
                replies_.push_back(opcode);
                break;
        }
    }
    return true;
}

// The pins and engine settings SPI mode 0 needs before a clock moves.
bool FakeMpsse::checkPinsForClocking(std::uint8_t opcode) {
    const std::string command = "command " + hexByte(opcode);
    if ((directions_ & kSckPin) == 0) return misused(command + " clocks with SCK (ADBUS0) not an output");
    if ((directions_ & kDoPin) == 0) return misused(command + " clocks with MOSI (ADBUS1) not an output");
    if ((directions_ & kDiPin) != 0)
        return misused(command + " with MISO (ADBUS2) driven as an output, against the flash");
    if ((levels_ & kSckPin) != 0) return misused(command + " starts with SCK high; SPI mode 0 idles low");
    if (chipSelectHigh())
        return misused(command + " clocks data with chip select (ADBUS" + std::to_string(chipSelectPin_) + ") high");
    if (threePhase_) return misused(command + " with 3-phase clocking on (the flash wants one edge per bit)");
    if (adaptive_)
        return misused(command + " with adaptive clocking on: the engine waits for RTCK, which the flash never drives");
    if (loopback_) return misused(command + " with loopback on: MISO would read back MOSI, not the flash");
    return true;
}

// Byte-wide, MSB-first data commands only: what a flash on SPI mode 0
// needs. Bit mode, LSB first and TMS are a port's mistake here.
bool FakeMpsse::clockData(std::uint8_t opcode, const std::uint8_t* bytes, std::size_t n, std::size_t& used) {
    const std::string name = hexByte(opcode);
    if ((opcode & (kWritesTms | kBitMode | kLsbFirst)) != 0)
        return misused("command " + name + " clocks bits, LSB first or TMS; SPI flash takes whole bytes MSB first");
    const bool writes = (opcode & kWritesDo) != 0;
    const bool reads = (opcode & kReadsDi) != 0;
    if (!writes && !reads) return refuse("malformed MPSSE command " + name + ": it neither writes DO nor reads DI");
    if (n < 2)
        return refuse("malformed MPSSE command " + name + ": its length needs 2 bytes, the write ends after " +
                      std::to_string(n));
    const std::size_t count = (bytes[0] | (bytes[1] << 8)) + 1u;
    const std::size_t dataBytes = writes ? count : 0;
    if (n - 2 < dataBytes)
        return refuse("malformed MPSSE command " + name + " " + hex(bytes, 2) + ": it carries " +
                      std::to_string(dataBytes) + " data bytes, the write ends after " + std::to_string(n - 2));
    used = 2 + dataBytes;

    // SPI mode 0: the flash samples MOSI on the rising edge and shifts MISO
    // out on the falling one.
    if (writes && (opcode & kOutOnFallingEdge) == 0)
        return misused("command " + name + " changes MOSI on the rising edge, where the flash samples it");
    if (reads && (opcode & kInOnFallingEdge) != 0)
        return misused("command " + name + " samples MISO on the falling edge, where the flash changes it");
    if (!checkPinsForClocking(opcode)) return false;
    flash_.setClockHz(static_cast<std::uint32_t>(std::lround(sckHz())));

    // A read-only command holds MOSI where it is.
    const std::uint8_t idle = (levels_ & kDoPin) != 0 ? 0xFF : 0x00;
    std::vector<std::uint8_t> out(writes ? std::vector<std::uint8_t>(bytes + 2, bytes + 2 + count)
                                         : std::vector<std::uint8_t>(count, idle));
    std::vector<std::uint8_t> in(count);
    flash_.clockBytes(out.data(), in.data(), count);
    levels_ = static_cast<std::uint8_t>((out.back() & 1) ? levels_ | kDoPin : levels_ & ~kDoPin);
    if (reads) replies_.insert(replies_.end(), in.begin(), in.end());
    return true;
}

// --- USB ---------------------------------------------------------------------------

FakeFtdiUsb::FakeFtdiUsb(FakeMpsse* device) : device_(device) {
    using namespace ports::ftdi;
    ftdiUsb().list = [this](std::span<const FtdiUsbId> ids) {
        std::string line = "list";
        for (const FtdiUsbId& id : ids) {
            char text[16];
            std::snprintf(text, sizeof text, " %04x:%04x", id.vendor, id.product);
            line += text;
        }
        log.push_back(line);
        FtdiListing listing;
        for (const FtdiDeviceInfo& found : devices)
            if (std::find(ids.begin(), ids.end(), found.id) != ids.end()) listing.devices.push_back(found);
        return listing;
    };
    ftdiUsb().open = [this](const FtdiOpenRequest&) {
        FtdiOpening opening;
        if (openFailure != FtdiUsbFailure::None || device_ == nullptr) {
            opening.failure = openFailure == FtdiUsbFailure::None ? FtdiUsbFailure::NotFound : openFailure;
            opening.detail = openFailureDetail;
            return opening;
        }
        opening.io = device_->handle();
        return opening;
    };
}

FakeFtdiUsb::~FakeFtdiUsb() { ports::ftdi::ftdiUsb() = ports::ftdi::libFtdiUsb(); }

ports::ftdi::FtdiDeviceInfo FakeFtdiUsb::ft232h(const std::string& serial) {
    ports::ftdi::FtdiDeviceInfo info;
    info.id = {0x0403, 0x6014};
    info.location = {1, 7};
    info.chip = ports::ftdi::FtdiChip::FT232H;
    info.serial = serial;
    info.description = "Single RS232-HS";
    return info;
}

}  // namespace vorant::test
