#include "ports/ch341a/Ch341aBus.h"

#include "formats/BitReversal.h"

#include <algorithm>

namespace vorant::ports::ch341a {

namespace {

using namespace std::chrono_literals;

constexpr std::size_t kPacketBytes = 32;
constexpr std::size_t kSpiBytesPerPacket = kPacketBytes - 1;  // after the command byte

// Commands (the first byte of a packet).
constexpr std::uint8_t kSpiStream = 0xA8;
constexpr std::uint8_t kUioStream = 0xAB;
constexpr std::uint8_t kStreamSetup = 0xAA;
// The stream setup's operand: 0x60 | mode, where mode bit 2 = 0 is one
// data line each way and bits 1..0 = 01 the (I2C) 100 kHz rate; then the end.
constexpr std::uint8_t kStreamModeSingle = 0x61;
constexpr std::uint8_t kStreamSetupEnd = 0x00;

// UIO sub-commands.
constexpr std::uint8_t kUioOutput = 0x80;     // | D5..D0 levels
constexpr std::uint8_t kUioDirection = 0x40;  // | D5..D0, 1 = output
constexpr std::uint8_t kUioEnd = 0x20;

// Pin levels: D0 CS0#, D1 CS1#, D2 CS2#, D3 SCK, D4 DOUT2, D5 MOSI. SCK
// stays low (mode 0); the unused chip selects stay high.
constexpr std::uint8_t kPinsDeselected = 0x37;
constexpr std::uint8_t kPinsSelected = 0x36;  // CS0# low
constexpr std::uint8_t kAllOutputs = 0x3F;
constexpr std::uint8_t kAllInputs = 0x00;

constexpr std::chrono::milliseconds kTransferTimeout = 1000ms;
constexpr std::chrono::milliseconds kDrainTimeout = 20ms;
// More stale answers than this means the device is not listening to us.
constexpr int kMostStaleAnswers = 64;

const std::string kTimeoutText = std::to_string(kTransferTimeout.count()) + " ms";

}  // namespace

Ch341aBus::Ch341aBus(std::unique_ptr<Ch341Io> io) : io_(std::move(io)) {}

Ch341aBus::~Ch341aBus() {
    if (io_->lost()) return;
    pendingPins_.push_back(kUioOutput | kPinsDeselected);
    pendingPins_.push_back(kUioDirection | kAllInputs);
    flush();
}

bool Ch341aBus::fail(const std::string& why) {
    error_ = io_->lost() ? "the CH341A is gone (unplugged?): " + io_->error() : why;
    return false;
}

bool Ch341aBus::start() {
    if (!drain()) return false;
    packet_ = {kStreamSetup, kStreamModeSingle, kStreamSetupEnd};
    packet_.resize(kPacketBytes, 0x00);
    pendingPins_ = {kUioOutput | kPinsDeselected, kUioDirection | kAllOutputs};
    appendPendingPins(false);
    return send(packet_);
}

// [AB, sub-commands, 20]; padded to a whole packet when an SPI packet
// follows in the same transfer (a short packet would end the transfer).
void Ch341aBus::appendPendingPins(bool padded) {
    const std::size_t begin = packet_.size();
    packet_.push_back(kUioStream);
    packet_.insert(packet_.end(), pendingPins_.begin(), pendingPins_.end());
    packet_.push_back(kUioEnd);
    if (padded) packet_.resize(begin + kPacketBytes, 0x00);
}

bool Ch341aBus::send(const std::vector<std::uint8_t>& bytes) {
    switch (io_->bulkOut(bytes.data(), bytes.size(), kTransferTimeout)) {
        case BulkResult::Done:
            pendingPins_.clear();
            return true;
        case BulkResult::TimedOut:
            return fail("sending to the CH341A timed out after " + kTimeoutText);
        case BulkResult::Failed:
            break;
    }
    return fail("sending to the CH341A failed: " + io_->error());
}

bool Ch341aBus::receive(std::uint8_t* into, std::size_t clocked) {
    std::uint8_t answer[kPacketBytes];
    std::size_t received = 0;
    const std::string packet = "an SPI packet of " + std::to_string(clocked) + " bytes";
    switch (io_->bulkIn(answer, sizeof answer, received, kTransferTimeout)) {
        case BulkResult::Done:
            break;
        case BulkResult::TimedOut:
            outOfStep_ = true;
            return fail("the CH341A did not answer " + packet + " within " + kTimeoutText);
        case BulkResult::Failed:
            outOfStep_ = true;
            return fail("reading the CH341A's answer to " + packet + " failed: " + io_->error());
    }
    if (received != clocked) {
        outOfStep_ = true;
        return fail("the CH341A answered " + packet + " with " + std::to_string(received) + " bytes");
    }
    std::copy(answer, answer + clocked, into);
    return true;
}

bool Ch341aBus::drain() {
    std::uint8_t answer[kPacketBytes];
    for (int stale = 0; stale < kMostStaleAnswers; ++stale) {
        std::size_t received = 0;
        switch (io_->bulkIn(answer, sizeof answer, received, kDrainTimeout)) {
            case BulkResult::TimedOut:
                outOfStep_ = false;
                return true;
            case BulkResult::Failed:
                return fail("reading the CH341A failed: " + io_->error());
            case BulkResult::Done:
                break;
        }
    }
    return fail("the CH341A keeps sending answers nobody asked for; unplug it and plug it in again");
}

bool Ch341aBus::transact(std::span<const spi::SpiSegment> segments) {
    std::size_t total = 0;
    for (const spi::SpiSegment& segment : segments) total += segment.length;
    if (total == 0) return true;
    if (io_->lost()) return fail("");
    if (outOfStep_ && !drain()) return false;
    mosi_.resize(total);
    miso_.resize(total);
    std::size_t at = 0;
    for (const spi::SpiSegment& segment : segments) {
        formats::reverseBitsOfEachByte(segment.mosi, segment.length, mosi_.data() + at);
        at += segment.length;
    }
    pendingPins_.push_back(kUioOutput | kPinsSelected);
    for (std::size_t offset = 0; offset < total; offset += kSpiBytesPerPacket) {
        const std::size_t count = std::min(kSpiBytesPerPacket, total - offset);
        packet_.clear();
        if (!pendingPins_.empty()) appendPendingPins(true);
        packet_.push_back(kSpiStream);
        packet_.insert(packet_.end(), mosi_.begin() + offset, mosi_.begin() + offset + count);
        if (!send(packet_) || !receive(miso_.data() + offset, count)) {
            // Whatever went out, the chip is deselected before anything else.
            pendingPins_ = {kUioOutput | kPinsDeselected};
            return false;
        }
    }
    pendingPins_.push_back(kUioOutput | kPinsDeselected);
    at = 0;
    for (const spi::SpiSegment& segment : segments) {
        if (segment.miso != nullptr) formats::reverseBitsOfEachByte(miso_.data() + at, segment.length, segment.miso);
        at += segment.length;
    }
    return true;
}

bool Ch341aBus::flush() {
    if (pendingPins_.empty()) return true;
    if (io_->lost()) return fail("");
    packet_.clear();
    appendPendingPins(false);
    return send(packet_);
}

bool Ch341aBus::pause(std::uint64_t microseconds) {
    if (io_->lost()) return fail("");
    io_->sleep(microseconds);
    return true;
}

}  // namespace vorant::ports::ch341a
