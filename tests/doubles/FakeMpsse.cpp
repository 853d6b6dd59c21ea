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
// Longer payloads are cut in the log.
constexpr std::size_t kLoggedPayload = 16;

std::string hex(const std::uint8_t* bytes, std::size_t n, const char* separator = "") {
    std::string text;
    for (std::size_t i = 0; i < n; ++i) {
        char digits[3];
        std::snprintf(digits, sizeof digits, "%02X", bytes[i]);
        if (i > 0) text += separator;
        text += digits;
    }
    return text;
}

std::string hexByte(std::uint8_t byte) { return hex(&byte, 1); }

std::string payload(const std::uint8_t* bytes, std::size_t n) {
    if (n <= kLoggedPayload) return hex(bytes, n);
    return hex(bytes, kLoggedPayload) + "..(" + std::to_string(n) + " bytes)";
}

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
    const std::uint64_t number = writeCount_ + 1;
    if (faults.vanishAfterWrites > 0 && writeCount_ >= static_cast<std::uint64_t>(faults.vanishAfterWrites)) {
        gone_ = true;
        if (!chipSelectHigh()) flash_.deselect();  // unpowered pins: chip select floats high
        return refuse("usb bulk write failed (LIBUSB_ERROR_NO_DEVICE)");
    }
    if (faults.failWrite > 0 && number == static_cast<std::uint64_t>(faults.failWrite))
        return refuse("usb bulk write failed (LIBUSB_ERROR_TIMEOUT)");
    ++writeCount_;
    if (keepWrites) writes.emplace_back(bytes.begin(), bytes.end());
    if (!mpsse_) {
        // Not an engine: the bytes leave as serial data and nothing answers.
        note("serial " + std::to_string(bytes.size()) + " bytes");
        return true;
    }
    return interpret(bytes.data(), bytes.size());
}

bool FakeMpsse::read(std::span<std::uint8_t> into, std::size_t& got, std::chrono::milliseconds) {
    got = 0;
    if (gone_) return refuse("usb bulk read failed (LIBUSB_ERROR_NO_DEVICE)");
    const std::uint64_t number = ++readCount_;
    if (faults.failRead > 0 && number == static_cast<std::uint64_t>(faults.failRead))
        return refuse("usb bulk read failed (LIBUSB_ERROR_IO)");
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
    auto need = [&](std::size_t count, const char* what) {
        if (n - at >= count) return true;
        note(hexByte(bytes[at - 1]) + " (cut short)");
        return refuse("malformed MPSSE command " + hexByte(bytes[at - 1]) + ": its " + what + " needs " +
                      std::to_string(count) + " more bytes, the write ends after " + std::to_string(n - at));
    };
    while (at < n) {
        const std::uint8_t opcode = bytes[at++];
        if ((opcode & 0x80) == 0) {
            std::size_t used = 0;
            if (!clockData(opcode, bytes + at, n - at, used)) return false;
            at += used;
            continue;
        }
        switch (opcode) {
            case 0x80:
            case 0x82: {
                if (!need(2, "value and direction")) return false;
                note(hexByte(opcode) + " " + hex(bytes + at, 2, " "));
                if (opcode == 0x80) setLowPins(bytes[at], bytes[at + 1]);
                at += 2;
                break;
            }
            case 0x81:
            case 0x83: {
                note(hexByte(opcode));
                std::uint8_t pins = 0xFF;  // inputs read high
                if (opcode == 0x81) pins = static_cast<std::uint8_t>((levels_ & directions_) | ~directions_);
                replies_.push_back(pins);
                break;
            }
            case 0x84:
                loopback_ = true;
                note("84");
                break;
            case 0x85:
                loopback_ = false;
                note("85");
                break;
            case 0x86:
                if (!need(2, "divisor")) return false;
                note("86 " + hex(bytes + at, 2));
                divisor_ = static_cast<std::uint16_t>(bytes[at] | (bytes[at + 1] << 8));
                at += 2;
                break;
            case 0x87:
                note("87");
                flushed_ = replies_.size();
                break;
            case 0x8A:
                divideBy5_ = false;
                note("8A");
                break;
            case 0x8B:
                divideBy5_ = true;
                note("8B");
                break;
            case 0x8C:
                threePhase_ = true;
                note("8C");
                break;
            case 0x8D:
                threePhase_ = false;
                note("8D");
                break;
            case 0x96:
                adaptive_ = true;
                note("96");
                break;
            case 0x97:
                adaptive_ = false;
                note("97");
                break;
            case 0x8E:
            case 0x8F: {
                const std::size_t field = opcode == 0x8E ? 1 : 2;
                if (!need(field, "length")) return false;
                note(hexByte(opcode) + " " + hex(bytes + at, field));
                const std::size_t bits = opcode == 0x8E ? bytes[at] + 1u : (bytes[at] | (bytes[at + 1] << 8)) * 8u + 8u;
                at += field;
                if (!checkPinsForClocking(opcode)) return false;
                flash_.setClockHz(static_cast<std::uint32_t>(std::lround(sckHz())));
                for (std::size_t i = 0; i < bits; ++i) clockOneBit((levels_ & kDoPin) != 0);
                break;
            }
            case 0x88:
            case 0x89:
            case 0x94:
            case 0x95:
            case 0x9C:
            case 0x9D:
            case 0x9E:
                note(hexByte(opcode));
                return refuse("MPSSE command " + hexByte(opcode) +
                              " waits on or drives GPIO; this double does not model it");
            default:
                // The engine's answer to an opcode it does not know.
                note(hexByte(opcode));
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
    return true;
}

bool FakeMpsse::clockOneBit(bool mosi) {
    const bool miso = flash_.clockBit(mosi);
    levels_ = static_cast<std::uint8_t>(mosi ? levels_ | kDoPin : levels_ & ~kDoPin);
    return loopback_ ? mosi : miso;
}

bool FakeMpsse::clockData(std::uint8_t opcode, const std::uint8_t* bytes, std::size_t n, std::size_t& used) {
    const std::string name = hexByte(opcode);
    if ((opcode & kWritesTms) != 0) {
        note(name);
        return misused("command " + name + " clocks TMS, which SPI has no use for");
    }
    if ((opcode & (kWritesDo | kReadsDi)) == 0) {
        note(name);
        return refuse("malformed MPSSE command " + name + ": it neither writes DO nor reads DI");
    }
    const bool bitMode = (opcode & kBitMode) != 0;
    const bool writes = (opcode & kWritesDo) != 0;
    const bool reads = (opcode & kReadsDi) != 0;
    const bool lsbFirst = (opcode & kLsbFirst) != 0;
    const std::size_t field = bitMode ? 1 : 2;
    if (n < field) {
        note(name + " (cut short)");
        return refuse("malformed MPSSE command " + name + ": its length needs " + std::to_string(field) +
                      " bytes, the write ends after " + std::to_string(n));
    }
    const std::size_t count = bitMode ? bytes[0] + 1u : (bytes[0] | (bytes[1] << 8)) + 1u;
    if (bitMode && bytes[0] > 7) {
        note(name + " " + hex(bytes, 1));
        return refuse("malformed MPSSE command " + name + ": a bit count of " + std::to_string(count) + " (1 to 8)");
    }
    const std::size_t dataBytes = writes ? (bitMode ? 1 : count) : 0;
    if (n - field < dataBytes) {
        note(name + " " + hex(bytes, field) + " (cut short)");
        return refuse("malformed MPSSE command " + name + " " + hex(bytes, field) + ": it carries " +
                      std::to_string(dataBytes) + " data bytes, the write ends after " + std::to_string(n - field));
    }
    const std::uint8_t* data = bytes + field;
    used = field + dataBytes;
    note(name + " " + hex(bytes, field) + (writes ? " " + payload(data, dataBytes) : std::string()));

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
    if (!bitMode && !lsbFirst && !loopback_) {
        std::vector<std::uint8_t> out(writes ? std::vector<std::uint8_t>(data, data + count)
                                             : std::vector<std::uint8_t>(count, idle));
        std::vector<std::uint8_t> in(count);
        flash_.clockBytes(out.data(), in.data(), count);
        levels_ = static_cast<std::uint8_t>((out.back() & 1) ? levels_ | kDoPin : levels_ & ~kDoPin);
        if (reads) replies_.insert(replies_.end(), in.begin(), in.end());
        return true;
    }
    // Bit by bit: LSB-first order, bit mode, or loopback.
    const std::size_t units = bitMode ? 1 : count;
    const int bitsPerUnit = bitMode ? static_cast<int>(count) : 8;
    for (std::size_t u = 0; u < units; ++u) {
        const std::uint8_t value = writes ? data[u] : idle;
        std::uint8_t captured = 0;
        for (int k = 0; k < bitsPerUnit; ++k) {
            const int bit = lsbFirst ? k : 7 - k;
            const bool in = clockOneBit(((value >> bit) & 1) != 0);
            // MSB first shifts in from bit 0 (a short read is right-aligned);
            // LSB first shifts in from bit 7 (left-aligned).
            if (lsbFirst)
                captured = static_cast<std::uint8_t>((captured >> 1) | (in ? 0x80 : 0));
            else
                captured = static_cast<std::uint8_t>((captured << 1) | (in ? 1 : 0));
        }
        if (reads) replies_.push_back(captured);
    }
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
    ftdiUsb().open = [this](const FtdiOpenRequest& request) {
        char text[48];
        std::snprintf(text, sizeof text, "open %04x:%04x %u:%u %c", request.id.vendor, request.id.product,
                      request.location.bus, request.location.address, request.channel);
        log.push_back(text);
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
