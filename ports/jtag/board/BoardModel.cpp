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
}

// The ideal bridge needs no instruction: every DR scan reaches the flash.
bool BoardModel::bridgeSelected() const {
    return settings_.bridge == "direct" || ir_ == (settings_.userInstruction & mask(settings_.irLength));
}

void BoardModel::resetTap() {
    if (bridgeSelected()) bridge_->update();
    state_ = TapState::TestLogicReset;
    ir_ = settings_.idcodeInstruction & mask(settings_.irLength);
}

bool BoardModel::tdo() {
    if (state_ == TapState::ShiftIr) return irShift_ & 1u;
    if (state_ != TapState::ShiftDr) return true;
    if (!bridgeSelected()) return drShift_ & 1u;
    if (bridge_->clocksBeforeTdo() && !bridgeClockedThisCycle_) {
        bridge_->shiftClock(tdi_);
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

void BoardModel::risingEdge(bool tms, bool tdi) {
    ++cycles_;
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
