#include "ports/ftdi/MpsseBus.h"

#include <algorithm>
#include <cstdio>

namespace vorant::ports::ftdi {

namespace {

// The channel modes of set_bitmode.
constexpr std::uint8_t kModeReset = 0x00;
constexpr std::uint8_t kModeMpsse = 0x02;

// MPSSE opcodes.
constexpr std::uint8_t kSetLowPins = 0x80;  // levels, directions of ADBUS7..0
constexpr std::uint8_t kSetDivisor = 0x86;  // LL HH
constexpr std::uint8_t kSendImmediate = 0x87;
constexpr std::uint8_t kDivideBy5Off = 0x8A;  // 60 MHz engine clock
constexpr std::uint8_t kThreePhaseOff = 0x8D;
constexpr std::uint8_t kAdaptiveClockOff = 0x97;
constexpr std::uint8_t kLoopbackOff = 0x85;
// Bytes MSB first, out on the falling edge (and, for the second, in on
// the rising edge): SPI mode 0.
constexpr std::uint8_t kBytesOut = 0x11;
constexpr std::uint8_t kBytesInOut = 0x31;
// An opcode the engine does not know: it answers FA and the opcode, which
// tells a reply that is in step from one that is not.
constexpr std::uint8_t kCheckOpcode = 0xAA;
constexpr std::uint8_t kBadCommandEcho = 0xFA;

// ADBUS pins of SPI.
constexpr std::uint8_t kSck = 1u << 0;
constexpr std::uint8_t kMosi = 1u << 1;

// Write-only transactions held before they go out as one write: a page
// program with its write enable is under 300 bytes.
constexpr std::size_t kMaxHeldBytes = 4096;
// Reply bytes one write may ask for: the engine stalls when its IN FIFO
// (1 KiB on an FT232H) is full while the host still blocks in the write.
constexpr std::size_t kMaxReplyPerWrite = 512;
// Bytes one shift command carries (its length field holds count - 1).
constexpr std::size_t kMaxCommandBytes = 65536;
// How long a reply may take beyond its clocking time.
constexpr std::chrono::milliseconds kReplySlack{1000};

std::string hexBytes(const std::uint8_t* bytes, std::size_t n) {
    std::string text;
    for (std::size_t i = 0; i < n; ++i) {
        char hex[4];
        std::snprintf(hex, sizeof hex, i == 0 ? "%02X" : " %02X", bytes[i]);
        text += hex;
    }
    return text;
}

}  // namespace

double mpsseClockHz(std::uint16_t divisor) { return 30e6 / (static_cast<double>(divisor) + 1.0); }

MpsseBus::MpsseBus(std::unique_ptr<FtdiIo> io, MpsseSettings settings) : io_(std::move(io)), settings_(settings) {}

MpsseBus::~MpsseBus() {
    if (!started_ || io_->lost()) return;
    // Commands still held belong to a run that did not complete; they stay
    // unsent. Chip select goes high and every pin becomes an input.
    const std::uint8_t release[] = {kSetLowPins, static_cast<std::uint8_t>(1u << settings_.chipSelectPin), 0x00};
    if (io_->write(release)) io_->setBitmode(0x00, kModeReset);
}

// Every failure ends the bus: after a failed write or a reply out of step
// the engine's state is unknown, and nothing sent after it can be trusted.
bool MpsseBus::fail(const std::string& why) {
    error_ = why;
    broken_ = true;
    return false;
}

bool MpsseBus::usable() {
    if (broken_) return false;
    if (io_->lost()) return fail("the FTDI device is gone from USB: " + io_->error());
    return true;
}

bool MpsseBus::ioFailure(const std::string& what) {
    if (io_->lost()) return fail("the FTDI device is gone from USB (unplugged?) during " + what + ": " + io_->error());
    return fail(what + " failed: " + io_->error());
}

void MpsseBus::setPins(bool chipSelectHigh) {
    const std::uint8_t chipSelect = static_cast<std::uint8_t>(1u << settings_.chipSelectPin);
    held_.push_back(kSetLowPins);
    held_.push_back(chipSelectHigh ? chipSelect : 0x00);
    held_.push_back(static_cast<std::uint8_t>(kSck | kMosi | chipSelect));
}

void MpsseBus::shiftCommand(std::uint8_t opcode, const std::uint8_t* data, std::size_t length) {
    const std::size_t field = length - 1;
    held_.push_back(opcode);
    held_.push_back(static_cast<std::uint8_t>(field & 0xFF));
    held_.push_back(static_cast<std::uint8_t>(field >> 8));
    held_.insert(held_.end(), data, data + length);
    heldBits_ += 8 * length;
}

bool MpsseBus::start() {
    if (!io_->setBitmode(0x00, kModeReset)) return ioFailure("leaving the channel's current mode");
    if (!io_->setBitmode(0x00, kModeMpsse)) return ioFailure("switching the channel to MPSSE mode");
    if (!io_->purge()) return ioFailure("emptying the channel's buffers");
    started_ = true;
    // An engine answers an unknown opcode with FA and the opcode; a
    // channel that is not one answers nothing or something else.
    const std::uint8_t check[] = {kCheckOpcode, kSendImmediate};
    if (!io_->write(check)) return ioFailure("the MPSSE synchronisation");
    std::uint8_t answer[2] = {0, 0};
    std::size_t got = 0;
    if (!io_->read(answer, got, kReplySlack)) return ioFailure("reading the MPSSE synchronisation");
    if (got != 2 || answer[0] != kBadCommandEcho || answer[1] != kCheckOpcode)
        return fail("the device did not answer as an MPSSE engine: opcode AA should come back as FA AA, but " +
                    (got == 0 ? "nothing came back within " + std::to_string(kReplySlack.count()) + " ms"
                              : "it answered " + hexBytes(answer, got)) +
                    "; is this an FT232H, FT2232H or FT4232H, on interface A or B?");
    const std::uint16_t divisor = settings_.divisor;
    held_ = {kDivideBy5Off,
             kSetDivisor,
             static_cast<std::uint8_t>(divisor & 0xFF),
             static_cast<std::uint8_t>(divisor >> 8),
             kThreePhaseOff,
             kAdaptiveClockOff,
             kLoopbackOff};
    setPins(true);
    return send();
}

bool MpsseBus::transact(std::span<const spi::SpiSegment> segments) {
    if (!usable()) return false;
    std::size_t outBytes = 6;
    bool reads = false;
    for (const spi::SpiSegment& segment : segments) {
        outBytes += segment.length + 3 * ((segment.length + kMaxCommandBytes - 1) / kMaxCommandBytes);
        reads = reads || (segment.miso != nullptr && segment.length > 0);
    }
    if (!reads && !held_.empty() && held_.size() + outBytes > kMaxHeldBytes && !send()) return false;

    setPins(false);
    for (const spi::SpiSegment& segment : segments) {
        std::size_t done = 0;
        while (done < segment.length) {
            std::size_t piece = std::min(segment.length - done, kMaxCommandBytes);
            if (segment.miso == nullptr) {
                shiftCommand(kBytesOut, segment.mosi + done, piece);
            } else {
                // Chip select stays low across the writes of a long read;
                // SCK just pauses at its idle level between them.
                if (replyBytes_ == kMaxReplyPerWrite && !roundTrip()) return false;
                piece = std::min(piece, kMaxReplyPerWrite - replyBytes_);
                shiftCommand(kBytesInOut, segment.mosi + done, piece);
                replyTargets_.push_back({segment.miso + done, piece});
                replyBytes_ += piece;
            }
            done += piece;
        }
    }
    setPins(true);
    if (reads) return roundTrip();
    return held_.size() < kMaxHeldBytes || send();
}

bool MpsseBus::send() {
    if (held_.empty()) return true;
    const std::size_t size = held_.size();
    const bool written = io_->write(held_);
    held_.clear();
    heldBits_ = 0;
    if (!written) return ioFailure("a USB write of " + std::to_string(size) + " bytes");
    return true;
}

// The held commands and the read go out with a check opcode and send
// immediate; the reply must be exactly the bytes clocked in and FA AA.
bool MpsseBus::roundTrip() {
    held_.push_back(kCheckOpcode);
    held_.push_back(kSendImmediate);
    const std::size_t expected = replyBytes_ + 2;
    const auto timeout =
        kReplySlack +
        std::chrono::milliseconds(static_cast<std::uint64_t>(2000.0 * heldBits_ / mpsseClockHz(settings_.divisor)));
    if (!send()) return false;
    reply_.assign(expected, 0);
    std::size_t got = 0;
    if (!io_->read(reply_, got, timeout)) return ioFailure("a USB read of " + std::to_string(expected) + " bytes");
    replyBytes_ = 0;
    if (got != expected)
        return fail("a short or late reply from the FTDI device: " + std::to_string(got) + " of the " +
                    std::to_string(expected) + " bytes expected came within " + std::to_string(timeout.count()) +
                    " ms");
    if (reply_[expected - 2] != kBadCommandEcho || reply_[expected - 1] != kCheckOpcode)
        return fail("a malformed reply from the FTDI device: it should end in FA AA but ends in " +
                    hexBytes(reply_.data() + expected - 2, 2) + " (the reply is out of step with the commands)");
    std::size_t at = 0;
    for (const ReplyTarget& target : replyTargets_) {
        std::copy_n(reply_.begin() + static_cast<std::ptrdiff_t>(at), target.length, target.into);
        at += target.length;
    }
    replyTargets_.clear();
    return true;
}

bool MpsseBus::flush() { return usable() && send(); }

bool MpsseBus::pause(std::uint64_t microseconds) {
    if (!usable()) return false;
    io_->sleep(microseconds);
    return true;
}

}  // namespace vorant::ports::ftdi
