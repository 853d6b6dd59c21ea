#include "ports/spi/SpiCablePort.h"

#include "formats/BitReversal.h"
#include "ports/PortError.h"

#include <algorithm>

namespace vorant::ports::spi {

SpiCablePort::SpiCablePort(std::string name, SpiBus& bus) : name_(std::move(name)), bus_(bus) {}

bool SpiCablePort::fail(const std::string& why) {
    reason_ = name_ + ": " + why;
    return false;
}

void SpiCablePort::select() {
    mosi_.clear();
    shiftStarts_.clear();
    captures_.clear();
    refusal_.clear();
}

// A live cable compares nothing itself: the device checks what it reads,
// so the mask plays no part here.
void SpiCablePort::shiftBits(const RLBitVec& tdi, RLBitVec* tdo, const RLBitVec*, bool capture) {
    const std::size_t bits = tdi.length();
    if (bits % 8 != 0) {
        // Refused whole: the transaction is not sent at its deselect.
        if (refusal_.empty())
            refusal_ = "a shift of " + std::to_string(bits) + " bits; an SPI cable moves whole bytes";
        return;
    }
    const std::size_t begin = mosi_.size();
    shiftStarts_.push_back(begin);
    mosi_.resize(begin + bits / 8);
    formats::reverseBitsOfEachByte(tdi.data(), bits / 8, mosi_.data() + begin);
    if (capture && tdo != nullptr) captures_.push_back({begin, tdo, std::min(tdo->length(), bits)});
}

// The transaction goes to the bus as one; a failure is kept for the shift
// (or wait) that closed it.
void SpiCablePort::deselect() {
    if (!refusal_.empty()) {
        fail(refusal_);
        transactionFailed_ = true;
        return;
    }
    if (mosi_.empty()) return;
    miso_.assign(mosi_.size(), 0);
    segments_.clear();
    for (std::size_t i = 0; i < shiftStarts_.size(); ++i) {
        const std::size_t begin = shiftStarts_[i];
        const std::size_t end = i + 1 < shiftStarts_.size() ? shiftStarts_[i + 1] : mosi_.size();
        const bool read = std::any_of(captures_.begin(), captures_.end(),
                                      [begin](const Capture& c) { return c.begin == begin; });
        segments_.push_back({mosi_.data() + begin, end - begin, read ? miso_.data() + begin : nullptr});
    }
    ++stats_.transactions;
    stats_.bytes += mosi_.size();
    if (!bus_.transact(segments_)) {
        fail(bus_.error());
        transactionFailed_ = true;
        return;
    }
    for (const Capture& capture : captures_) {
        unsigned char* out = capture.tdo->data();
        const std::size_t whole = capture.bits / 8;
        formats::reverseBitsOfEachByte(miso_.data() + capture.begin, whole, out);
        if (const std::size_t rest = capture.bits % 8) {
            // A capture shorter than its shift keeps tdo's unused bits 0.
            const unsigned char byte = formats::kReversedBits[miso_[capture.begin + whole]];
            out[whole] = static_cast<unsigned char>(byte & ((1u << rest) - 1u));
        }
    }
}

bool SpiCablePort::shift(int stage, RLBitVec* tdi, RLBitVec*, RLBitVec* tdo, RLBitVec* tdoMask) {
    if (bus_.lost()) return fail(bus_.error());
    transactionFailed_ = false;
    const FramingFault fault = framer_.shift(stage, tdi, tdo, tdoMask);
    if (fault != FramingFault::None) return fail(describeFramingFault(fault, stage));
    return !transactionFailed_;
}

bool SpiCablePort::shiftWrite(int stage, RLBitVec* tdi, int) { return shift(stage, tdi, nullptr, nullptr, nullptr); }

bool SpiCablePort::flush() {
    ++stats_.flushes;
    return bus_.flush() || fail(bus_.error());
}

bool SpiCablePort::wait(int time, bool) {
    if (bus_.lost()) return fail(bus_.error());
    transactionFailed_ = false;
    framer_.closeOpenTransaction();
    if (transactionFailed_) return false;
    if (time < 0) return fail("wait of a negative time (" + std::to_string(time) + " us)");
    if (!flush()) return false;
    if (time > 0 && !bus_.pause(static_cast<std::uint64_t>(time))) return fail(bus_.error());
    return true;
}

SpiCable::SpiCable(std::string name, std::unique_ptr<SpiBus> bus) : bus_(std::move(bus)), port_(std::move(name), *bus_) {}

void SpiCable::commit() {
    if (!port_.flush()) throw PortError(PortError::Kind::Unavailable, port_.failureReason());
}

}  // namespace vorant::ports::spi
