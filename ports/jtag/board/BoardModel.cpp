#include "ports/jtag/board/BoardModel.h"

#include <stdexcept>

namespace vorant::ports::jtag {

namespace {

std::uint64_t mask(unsigned bits) { return bits >= 64 ? ~0ull : (1ull << bits) - 1; }

}  // namespace

BoardModel::BoardModel(sim::FlashModel& flash, BoardSettings settings)
    : flash_(flash), settings_(std::move(settings)) {
    if (settings_.irLength < 2 || settings_.irLength > 64)
        throw std::invalid_argument("the IR length must be 2 to 64 bits (it captures ...01)");
    if (settings_.tckHz == 0) throw std::invalid_argument("the TCK frequency must not be 0");
    bridge_ = makeGateware(settings_.bridge, flash_, settings_.misoDelay);
    // Every SPI clock costs the flash one TCK period.
    flash_.setClockHz(settings_.tckHz);
    tckPeriodPs_ = 1'000'000'000'000ull / settings_.tckHz;
    ir_ = settings_.idcodeInstruction & mask(settings_.irLength);
    for (unsigned length : settings_.chain.irLengthsBefore) before_.push_back({length});
    for (unsigned length : settings_.chain.irLengthsAfter) after_.push_back({length});
}

bool BoardModel::otherTdo(const OtherTap& tap) const {
    if (state_ == TapState::ShiftIr) return tap.irShift & 1u;
    if (state_ == TapState::ShiftDr) return tap.bypass;
    return true;
}

void BoardModel::clockOther(OtherTap& tap, bool tdi) const {
    switch (state_) {
    case TapState::CaptureIr: tap.irShift = 0x1; break;
    case TapState::ShiftIr:
        tap.irShift = (tap.irShift >> 1) | (static_cast<std::uint64_t>(tdi) << (tap.irLength - 1));
        break;
    case TapState::CaptureDr: tap.bypass = false; break;
    case TapState::ShiftDr: tap.bypass = tdi; break;
    default: break;
    }
}

bool BoardModel::bridgeTapTdi() const { return before_.empty() ? tdi_ : otherTdo(before_.back()); }

// The ideal bridge needs no instruction: every DR scan reaches the flash.
bool BoardModel::bridgeSelected() const {
    return settings_.bridge == "direct" || ir_ == (settings_.userInstruction & mask(settings_.irLength));
}

void BoardModel::resetTap() {
    if (bridgeSelected()) bridge_->update();
    state_ = TapState::TestLogicReset;
    ir_ = settings_.idcodeInstruction & mask(settings_.irLength);
}

bool BoardModel::tdo() { return after_.empty() ? bridgeTapTdo() : otherTdo(after_.back()); }

bool BoardModel::bridgeTapTdo() {
    if (state_ == TapState::ShiftIr) return irShift_ & 1u;
    if (state_ != TapState::ShiftDr) return true;
    if (!bridgeSelected()) return drShift_ & 1u;
    if (bridge_->clocksBeforeTdo() && !bridgeClockedThisCycle_) {
        bridge_->shiftClock(bridgeTapTdi());
        bridgeClockedThisCycle_ = true;
    }
    return bridge_->tdo();
}

// Adapters set TDI with TCK low (some with no edge at all after a state
// move left TCK low), so only the rising edge samples it.
void BoardModel::setPins(bool tck, bool tms, bool tdi) {
    tdi_ = tdi;
    if (tck == tck_) return;
    tck_ = tck;
    if (tck) risingEdge(tms, tdi);
}

void BoardModel::risingEdge(bool tms, bool pinTdi) {
    ++cycles_;
    // Every register of the chain samples its neighbour's output from
    // before this edge: the TAPs after the bridge's first (from the TDO
    // end), then the bridge's, then those before it.
    tdi_ = pinTdi;
    const bool tdi = bridgeTapTdi();
    const bool bridgeOut = bridgeTapTdo();
    for (std::size_t k = after_.size(); k-- > 0;) clockOther(after_[k], k == 0 ? bridgeOut : otherTdo(after_[k - 1]));
    for (std::size_t k = before_.size(); k-- > 0;) clockOther(before_[k], k == 0 ? pinTdi : otherTdo(before_[k - 1]));
    const bool user = bridgeSelected();
    if (state_ == TapState::ShiftDr && user && !bridgeClockedThisCycle_) {
        bridge_->shiftClock(tdi);
        bridgeClockedThisCycle_ = true;
    }
    // A cycle that clocked the flash has already cost it its period.
    if (!bridgeClockedThisCycle_ || !flash_.selected()) {
        owedPs_ += tckPeriodPs_;
        if (owedPs_ >= 1000) {
            flash_.advance(owedPs_ / 1000);
            owedPs_ %= 1000;
        }
    }
    bridgeClockedThisCycle_ = false;

    switch (state_) {
    case TapState::TestLogicReset: ir_ = settings_.idcodeInstruction & mask(settings_.irLength); break;
    case TapState::CaptureDr:
        if (user) bridge_->capture();
        else drShift_ = ir_ == (settings_.idcodeInstruction & mask(settings_.irLength)) ? settings_.idcode : 0;
        break;
    case TapState::ShiftDr:
        if (!user) {
            const bool bypass = ir_ != (settings_.idcodeInstruction & mask(settings_.irLength));
            const unsigned length = bypass ? 1 : 32;
            drShift_ = (drShift_ >> 1) | (static_cast<std::uint64_t>(tdi) << (length - 1));
        }
        if (tms && user) bridge_->leaveShift();
        break;
    case TapState::UpdateDr:
        if (user) bridge_->update();
        break;
    case TapState::CaptureIr: irShift_ = 0x1; break;  // ...01, as every TAP captures
    case TapState::ShiftIr:
        irShift_ = (irShift_ >> 1) | (static_cast<std::uint64_t>(tdi) << (settings_.irLength - 1));
        break;
    case TapState::UpdateIr: ir_ = irShift_ & mask(settings_.irLength); break;
    default: break;
    }
    state_ = nextTapState(state_, tms);
}

void BoardModel::idleCycles(std::uint64_t count) {
    if (state_ != TapState::RunTestIdle) {
        for (std::uint64_t k = 0; k < count; ++k) cycle(false, false);
        return;
    }
    cycles_ += count;
    const std::uint64_t ps = owedPs_ + count * tckPeriodPs_;
    flash_.advance(ps / 1000);
    owedPs_ = ps % 1000;
}

bool BoardModel::cycle(bool tms, bool tdi) {
    setPins(false, tms, tdi);
    const bool out = tdo();
    setPins(true, tms, tdi);
    return out;
}

}  // namespace vorant::ports::jtag
