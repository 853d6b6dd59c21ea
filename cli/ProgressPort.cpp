#include "cli/ProgressPort.h"

#include "cli/InstructionOpcode.h"

#include <algorithm>

namespace vorant::cli {

ProgressPort::ProgressPort(ScanPort& inner, ProgressPlan plan, const std::atomic<bool>* userCancel)
    : inner_(inner), plan_(plan), userCancel_(userCancel) {}

bool ProgressPort::outputMode() { return inner_.outputMode(); }

void ProgressPort::comment(const char* text) { inner_.comment(text); }

bool ProgressPort::shift(int stage, RLBitVec* tdi, RLBitVec* tdiMask, RLBitVec* tdo, RLBitVec* tdoMask) {
    const bool capturesPage = stage == ScanStage::kCaptureClose && readCommandOpen_;
    observeOpening(stage, tdi);
    const bool ok = inner_.shift(stage, tdi, tdiMask, tdo, tdoMask);
    if (capturesPage) {
        readCommandOpen_ = false;
        ++pagesRead_;
        if (tdo != nullptr) readBytes_ += tdo->length() / 8;
        advance(1);
    }
    return ok;
}

bool ProgressPort::shiftWrite(int stage, RLBitVec* tdi, int reserved) {
    observeOpening(stage, tdi);
    return inner_.shiftWrite(stage, tdi, reserved);
}

bool ProgressPort::wait(int time, bool microseconds) {
    readCommandOpen_ = false;  // a wait closes any open transaction
    if (eraseRunning_ && time > 0 && plan_.eraseStepMicroseconds > 0) {
        eraseWaitedUs_ += time;
        const long long due = std::min(plan_.eraseSteps, eraseWaitedUs_ / plan_.eraseStepMicroseconds);
        if (due > eraseStepsCounted_) {
            advance(due - eraseStepsCounted_);
            eraseStepsCounted_ = due;
        }
    }
    return inner_.wait(time, microseconds);
}

bool ProgressPort::isCancelled(int level) {
    const bool userAsked = userCancel_ != nullptr && userCancel_->load();
    const bool cancelled = userAsked || inner_.isCancelled(level);
    if (cancelled) cancelSeen_ = true;
    return cancelled;
}

void ProgressPort::observeOpening(int stage, const RLBitVec* tdi) {
    if (stage != ScanStage::kWhole && stage != ScanStage::kOpen) return;
    readCommandOpen_ = false;
    const std::optional<unsigned char> opcode = tdi != nullptr ? firstWireByte(*tdi) : std::nullopt;
    // Status polls open with stage 1 and belong to the erase; the next
    // whole transaction (write disable, Quad Enable write) comes after it.
    if (stage == ScanStage::kWhole && eraseRunning_) endErase();
    if (!opcode) return;

    if (stage == ScanStage::kOpen) {
        readCommandOpen_ = opcode == plan_.readOpcode;
        if (readCommandOpen_) phases_.enter(RunPhase::Read);
        return;
    }
    // A bare instruction is one byte; a page program carries address and data.
    if (opcode == plan_.pageProgramOpcode && tdi->length() > 8) {
        phases_.enter(RunPhase::Program);
        ++pagesProgrammed_;
        programmedBytes_ += plan_.pageBytes;
        advance(1);
    } else if (opcode == plan_.bulkEraseOpcode) {
        phases_.enter(RunPhase::Erase);
        eraseRunning_ = true;
        eraseWaitedUs_ = 0;
        eraseStepsCounted_ = 0;
    }
}

std::vector<PhaseFigures> ProgressPort::phaseFigures(const std::string& readName) const {
    std::vector<PhaseFigures> figures;
    const auto add = [&](const char* name, RunPhase phase, std::uint64_t bytes) {
        const double seconds = phases_.seconds(phase);
        if (seconds > 0 || bytes > 0) figures.push_back({name, seconds, bytes});
    };
    add("erase", RunPhase::Erase, 0);
    add("program", RunPhase::Program, programmedBytes_);
    add(readName.c_str(), RunPhase::Read, readBytes_);
    return figures;
}

void ProgressPort::endErase() {
    eraseRunning_ = false;
    if (plan_.eraseSteps > eraseStepsCounted_) advance(plan_.eraseSteps - eraseStepsCounted_);
    eraseStepsCounted_ = plan_.eraseSteps;
}

void ProgressPort::advance(long long steps) {
    if (steps <= 0) return;
    const long long before = done_;
    done_ += steps;
    if (plan_.totalSteps > 0) done_ = std::min(done_, plan_.totalSteps);
    if (done_ != before && listener_ != nullptr) listener_->progressed(done_, plan_.totalSteps);
}

}  // namespace vorant::cli
