#include "tests/support/RecordingScanPort.h"

#include <algorithm>

namespace vorant::test {

std::string bitsOf(const RLBitVec& vector) {
    std::string text(vector.length(), '0');
    for (std::size_t i = 0; i < text.size(); ++i)
        if (vector.getBit(i)) text[i] = '1';
    return text;
}

bool RecordingScanPort::record(const std::string& line, const std::vector<int>& failing, int& calls) {
    events.push_back({.line = line});
    const bool ok = std::find(failing.begin(), failing.end(), ++calls) == failing.end();
    if (!ok) {
        failed_ = true;
        lost_ = lost_ || failureLosesCable;
    }
    return ok;
}

bool RecordingScanPort::outputMode() {
    events.push_back({.line = "outputMode"});
    return fileMode;
}

void RecordingScanPort::comment(const char* text) {
    events.push_back({.line = std::string("comment ") + (text ? text : "")});
}

bool RecordingScanPort::shift(int stage, RLBitVec* tdi, RLBitVec* tdiMask, RLBitVec* tdo, RLBitVec* tdoMask) {
    const std::string tdiBits = tdi ? bitsOf(*tdi) : "";
    const bool ok = record("shift " + std::to_string(stage) + " " + tdiBits, failingShifts, shiftCalls_);
    ScanEvent& event = events.back();
    event.tdiMask = tdiMask ? bitsOf(*tdiMask) : "";
    event.tdo = tdo ? bitsOf(*tdo) : "";
    event.tdoMask = tdoMask ? bitsOf(*tdoMask) : "";
    if (stage == ScanStage::kCaptureClose && ok && responder && tdo) {
        std::string captured = responder(openingTdi_, tdo->length());
        if (!captured.empty()) captured.resize(tdo->length(), '0');
        for (std::size_t i = 0; i < captured.size(); ++i) tdo->setBit(i, captured[i] == '1');
    }
    // Stage 1 opens a transaction, stage 2 continues it, the others end it.
    if (stage != ScanStage::kContinue) openingTdi_ = stage == ScanStage::kOpen ? tdiBits : "";
    return ok;
}

bool RecordingScanPort::shiftWrite(int stage, RLBitVec* tdi, int /*reserved*/) {
    const std::string tdiBits = tdi ? bitsOf(*tdi) : "";
    if (stage != ScanStage::kContinue) openingTdi_ = stage == ScanStage::kOpen ? tdiBits : "";
    return record("shiftWrite " + std::to_string(stage) + " " + tdiBits, failingShifts, shiftCalls_);
}

bool RecordingScanPort::wait(int time, bool microseconds) {
    openingTdi_.clear();  // a wait closes an open transaction
    return record("wait " + std::to_string(time) + (microseconds ? "" : " (not us)"), failingWaits, waitCalls_);
}

bool RecordingScanPort::isCancelled(int level) {
    events.push_back({.line = "isCancelled " + std::to_string(level)});
    return cancelFromQuery > 0 && ++cancelQueries_ >= cancelFromQuery;
}

std::vector<std::string> RecordingScanPort::lines(bool withOutputModeQueries) const {
    std::vector<std::string> out;
    for (const ScanEvent& event : events)
        if (withOutputModeQueries || event.line != "outputMode") out.push_back(event.line);
    return out;
}

}  // namespace vorant::test
