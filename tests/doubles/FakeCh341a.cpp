#include "tests/doubles/FakeCh341a.h"

#include <algorithm>
#include <cstdio>

namespace vorant::test {

namespace {

using ports::ch341a::BulkResult;

constexpr std::size_t kPacket = 32;
// Pins: D0 CS0#, D3 SCK, D5 MOSI (D7 MISO is an input).
constexpr std::uint8_t kCs0 = 0x01, kSck = 0x08, kMosi = 0x20;

const char* const kNoDevice = "LIBUSB_ERROR_NO_DEVICE: No such device (it may have been disconnected)";

// The device shifts bit 0 first; the flash takes bit 7 first.
std::uint8_t mirrored(std::uint8_t byte) {
    std::uint8_t out = 0;
    for (int bit = 0; bit < 8; ++bit)
        if (byte & (1u << bit)) out = static_cast<std::uint8_t>(out | (0x80u >> bit));
    return out;
}

std::string hex(const std::uint8_t* bytes, std::size_t length) {
    std::string text;
    for (std::size_t i = 0; i < length; ++i) {
        char digits[4];
        std::snprintf(digits, sizeof digits, "%s%02X", i == 0 ? "" : " ", bytes[i]);
        text += digits;
    }
    return text;
}

}  // namespace

class FakeCh341a::Connection final : public ports::ch341a::Ch341Io {
public:
    explicit Connection(FakeCh341a& device) : device_(device) {}
    BulkResult bulkOut(const std::uint8_t* data, std::size_t length, std::chrono::milliseconds) override {
        return device_.bulkOut(data, length);
    }
    BulkResult bulkIn(std::uint8_t* data, std::size_t capacity, std::size_t& received,
                      std::chrono::milliseconds) override {
        return device_.bulkIn(data, capacity, received);
    }
    void sleep(std::uint64_t microseconds) override { device_.flash_.advance(microseconds * 1000); }
    std::string error() const override { return device_.error_; }
    bool lost() const override { return device_.gone_; }

private:
    FakeCh341a& device_;
};

FakeCh341a::FakeCh341a(sim::FlashModel& flash) : flash_(flash) { flash_.setClockHz(kSpiClockHz); }

std::unique_ptr<ports::ch341a::Ch341Io> FakeCh341a::connect() { return std::make_unique<Connection>(*this); }

// A long run (a 16 MiB readback is a million packets) keeps its latest
// lines only.
void FakeCh341a::note(std::vector<std::string>& lines, std::string line) {
    if (lines.size() >= kKeptLines) lines.erase(lines.begin(), lines.begin() + kKeptLines / 2);
    lines.push_back(std::move(line));
}

BulkResult FakeCh341a::result(BulkResult outcome, const std::string& error) {
    error_ = error;
    return outcome;
}

bool FakeCh341a::refuse(const std::string& why) {
    refusal = why;
    note(log, "refused: " + why);
    return false;
}

BulkResult FakeCh341a::bulkOut(const std::uint8_t* data, std::size_t length) {
    if (gone_) return result(BulkResult::Failed, kNoDevice);
    ++outTransfers;
    outBytes += length;
    note(transfers, hex(data, length));
    // A full packet goes on with the next; a short one ends the transfer.
    for (std::size_t offset = 0; offset < length; offset += kPacket) {
        ++packets;
        if (packets == vanishAtPacket) {
            gone_ = true;
            note(log, "unplugged");
            return result(BulkResult::Failed, kNoDevice);
        }
        if (packets == failAtPacket) {
            note(log, "transfer failed");
            return result(BulkResult::Failed, "LIBUSB_ERROR_IO: Input/Output Error");
        }
        if (!packet(data + offset, std::min(kPacket, length - offset))) {
            error_ = "LIBUSB_ERROR_PIPE: the double refused a packet: " + refusal;
            return BulkResult::Failed;
        }
    }
    return BulkResult::Done;
}

BulkResult FakeCh341a::bulkIn(std::uint8_t* data, std::size_t capacity, std::size_t& received) {
    received = 0;
    if (gone_) return result(BulkResult::Failed, kNoDevice);
    ++inTransfers;
    if (answers_.empty()) return result(BulkResult::TimedOut, "LIBUSB_ERROR_TIMEOUT: Operation timed out");
    const std::vector<std::uint8_t> answer = std::move(answers_.front());
    answers_.pop_front();
    if (answer.size() > capacity) return result(BulkResult::Failed, "LIBUSB_ERROR_OVERFLOW: Overflow");
    std::copy(answer.begin(), answer.end(), data);
    received = answer.size();
    note(log, "in " + std::to_string(received));
    return BulkResult::Done;
}

bool FakeCh341a::packet(const std::uint8_t* bytes, std::size_t length) {
    switch (bytes[0]) {
        case 0xAA:
            return streamSetup(bytes, length);
        case 0xAB:
            return uioStream(bytes, length);
        case 0xA8:
            return spiStream(bytes, length);
        default:
            return refuse("unknown command " + hex(bytes, 1));
    }
}

// AA 60|mode 00: the rest of the packet is padding.
bool FakeCh341a::streamSetup(const std::uint8_t* bytes, std::size_t length) {
    if (length < 3 || (bytes[1] & 0xF8) != 0x60 || bytes[2] != 0x00)
        return refuse("stream setup is not AA 60|mode 00: " + hex(bytes, std::min<std::size_t>(length, 3)));
    note(log, "stream " + hex(bytes + 1, 1));
    return true;
}

bool FakeCh341a::uioStream(const std::uint8_t* bytes, std::size_t length) {
    std::string line = "uio";
    for (std::size_t i = 1; i < length; ++i) {
        const std::uint8_t sub = bytes[i];
        char token[16];
        switch (sub & 0xC0) {
            case 0x80:
                pins_ = sub & 0x3F;
                // The other pins as a programmer leaves them: MOSI and DOUT2
                // high, SCK low, CS1# and CS2# high.
                if ((pins_ & 0x3E) == 0x36)
                    std::snprintf(token, sizeof token, " cs=%d", pins_ & kCs0);
                else
                    std::snprintf(token, sizeof token, " pins=%02X", pins_);
                line += token;
                if (!chipSelectFollowsPins()) return false;
                break;
            case 0x40:
                directions_ = sub & 0x3F;
                std::snprintf(token, sizeof token, " dir=%02X", directions_);
                line += token;
                if (!chipSelectFollowsPins()) return false;
                break;
            default:
                // Delays and pin samples are not modelled: a port driving SPI
                // has no use for them.
                if (sub != 0x20) return refuse("unknown UIO sub-command " + hex(&sub, 1));
                note(log, line);
                return true;
        }
    }
    return refuse("UIO stream without its end (20): " + hex(bytes, length));
}

// CS0# is low when D0 is driven low; an undriven pin is pulled up.
bool FakeCh341a::chipSelectFollowsPins() {
    const bool low = (directions_ & kCs0) != 0 && (pins_ & kCs0) == 0;
    if (low && !csLow_) {
        if ((directions_ & kSck) != 0 && (pins_ & kSck) != 0)
            return refuse("SCK high as chip select falls (the flash would take SPI mode 3)");
        csLow_ = true;
        flash_.select();
    } else if (!low && csLow_) {
        csLow_ = false;
        flash_.deselect();
    }
    return true;
}

bool FakeCh341a::spiStream(const std::uint8_t* bytes, std::size_t length) {
    const std::size_t count = length - 1;
    if (count == 0) return refuse("SPI stream packet without data");
    if (!csLow_) return refuse("SPI data while chip select is high");
    if ((directions_ & (kSck | kMosi)) != (kSck | kMosi))
        return refuse("SPI data with SCK or MOSI not driven (D3 and D5 must be outputs)");
    std::vector<std::uint8_t> toFlash(count), fromFlash(count);
    for (std::size_t i = 0; i < count; ++i) toFlash[i] = mirrored(bytes[1 + i]);
    flash_.clockBytes(toFlash.data(), fromFlash.data(), count);
    note(log, "spi " + hex(toFlash.data(), count));
    std::vector<std::uint8_t> answer(count);
    for (std::size_t i = 0; i < count; ++i) answer[i] = mirrored(fromFlash[i]);
    if (++spiPackets_ == answerFaultAtSpiPacket) {
        if (answerWithheld) return true;
        answer.resize(static_cast<std::size_t>(std::max<long>(0, static_cast<long>(count) + answerSizeChange)), 0xFF);
    }
    answers_.push_back(std::move(answer));
    return true;
}

}  // namespace vorant::test
