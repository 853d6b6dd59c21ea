#include "ports/jtag/JtagPort.h"

namespace vorant::ports::jtag {

JtagPort::JtagPort(std::string name, std::unique_ptr<Bridge> bridge, const BridgeSettings& settings, JtagSink& sink)
    : name_(std::move(name)), bridge_(std::move(bridge)), settings_(settings), sink_(sink) {}

bool JtagPort::fail(const std::string& why) {
    reason_ = name_ + ": " + why;
    return false;
}

bool JtagPort::ensureInstruction() {
    if (!bridge_->selectsInstruction()) return true;
    if (instructionSelected_ && !sink_.tapMayHaveReset()) return true;
    ++stats_.irScans;
    if (!sink_.irScan(settings_.irLength, settings_.instruction))
        return fail("selecting the bridge's instruction failed: " + sink_.error());
    instructionSelected_ = true;
    return true;
}

void JtagPort::select() {
    mosi_.clear();
    reads_ = false;
    capture_ = nullptr;
    transactionFailed_ = false;
}

// A live port compares nothing itself: the device checks what it reads,
// so the mask plays no part here.
void JtagPort::shiftBits(const RLBitVec& tdi, RLBitVec* tdo, const RLBitVec* /*tdoMask*/, bool capture) {
    const std::size_t at = mosi_.size();
    mosi_.append(tdi.data(), tdi.length());
    if (capture && tdo != nullptr) {
        reads_ = true;
        capture_ = tdo;
        captureAt_ = at;
        captureBits_ = std::min(tdo->length(), tdi.length());
    }
}

// The transaction goes out as one DR scan; a failure is kept for the
// shift that closed it.
void JtagPort::deselect() {
    if (mosi_.empty()) return;
    ++stats_.transactions;
    if (!ensureInstruction()) {
        transactionFailed_ = true;
        return;
    }
    bridge_->encode(mosi_, reads_, dr_);
    if (!sink_.drScan(dr_, reads_ ? &drTdo_ : nullptr)) {
        fail("a DR scan failed: " + sink_.error());
        instructionSelected_ = false;
        transactionFailed_ = true;
        return;
    }
    if (capture_ == nullptr) return;
    bridge_->decode(drTdo_.data(), mosi_.size(), miso_);
    copyBits(capture_->data(), 0, miso_.data(), captureAt_, captureBits_);
}

bool JtagPort::shift(int stage, RLBitVec* tdi, RLBitVec*, RLBitVec* tdo, RLBitVec* tdoMask) {
    if (sink_.lost()) return fail(reason_.empty() ? "the adapter is gone" : reason_.substr(name_.size() + 2));
    transactionFailed_ = false;
    const FramingFault fault = framer_.shift(stage, tdi, tdo, tdoMask);
    if (fault != FramingFault::None) return fail(describeFramingFault(fault, stage));
    return !transactionFailed_;
}

bool JtagPort::shiftWrite(int stage, RLBitVec* tdi, int) { return shift(stage, tdi, nullptr, nullptr, nullptr); }

bool JtagPort::wait(int time, bool) {
    transactionFailed_ = false;
    framer_.closeOpenTransaction();
    if (transactionFailed_) return false;
    if (time < 0) return fail("wait of a negative time (" + std::to_string(time) + " us)");
    if (time == 0) return true;
    ++stats_.idles;
    if (!sink_.idle(static_cast<std::uint64_t>(time))) return fail("a wait failed: " + sink_.error());
    return true;
}

}  // namespace vorant::ports::jtag
