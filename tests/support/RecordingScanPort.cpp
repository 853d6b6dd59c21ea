#include "tests/support/RecordingScanPort.h"

#include <algorithm>
#include <memory>
#include <utility>

namespace vorant::test {

std::string bitsOf(const RLBitVec& vector) {
    std::string text(vector.length(), '0');
    for (std::size_t i = 0; i < text.size(); ++i)
        if (vector.getBit(i)) text[i] = '1';
    return text;
}

namespace {

std::string bitsOrEmpty(const RLBitVec* vector) { return vector ? bitsOf(*vector) : std::string(); }

// The 8-bit status value as it comes off the wire: MSB first, repeated for
// captures longer than one byte.
std::string statusCapture(unsigned value, std::size_t bits) {
    std::string text(bits, '0');
    for (std::size_t i = 0; i < bits; ++i)
        if ((value >> (7 - i % 8)) & 1u) text[i] = '1';
    return text;
}

}  // namespace

bool RecordingScanPort::outputMode() {
    ScanEvent event(ScanEvent::Kind::OutputMode);
    event.result = fileMode;
    events.push_back(std::move(event));
    return fileMode;
}

void RecordingScanPort::comment(const char* text) {
    ScanEvent event(ScanEvent::Kind::Comment);
    event.text = text ? text : "";
    events.push_back(std::move(event));
}

bool RecordingScanPort::nextShiftFails() {
    ++shiftCalls_;
    return failAllShifts ||
           std::find(failingShifts.begin(), failingShifts.end(), shiftCalls_) != failingShifts.end();
}

void RecordingScanPort::trackTransaction(int stage, const std::string& tdiBits) {
    switch (stage) {
        case ScanStage::kOpen: openingTdi_ = tdiBits; break;
        case ScanStage::kContinue: break;
        default: openingTdi_.clear(); break;  // 0, 3 and 12 end the transaction
    }
}

bool RecordingScanPort::shift(int stage, RLBitVec* tdi, RLBitVec* tdiMask, RLBitVec* tdo,
                              RLBitVec* tdoMask) {
    ScanEvent event(ScanEvent::Kind::Shift);
    event.stage = stage;
    event.tdi = bitsOrEmpty(tdi);
    event.tdiMask = bitsOrEmpty(tdiMask);
    event.tdo = bitsOrEmpty(tdo);
    event.tdoMask = bitsOrEmpty(tdoMask);
    event.result = !nextShiftFails();

    if (stage == ScanStage::kCaptureClose && event.result && responder && tdo) {
        const std::size_t bits = tdo->length();
        std::string captured = responder(openingTdi_, bits);
        captured.resize(bits, '0');
        for (std::size_t i = 0; i < bits; ++i) tdo->setBit(i, captured[i] == '1');
    }
    event.tdoAfter = bitsOrEmpty(tdo);
    trackTransaction(stage, event.tdi);
    const bool result = event.result;
    events.push_back(std::move(event));
    return result;
}

bool RecordingScanPort::shiftWrite(int stage, RLBitVec* tdi, int /*reserved*/) {
    ScanEvent event(ScanEvent::Kind::ShiftWrite);
    event.stage = stage;
    event.tdi = bitsOrEmpty(tdi);
    event.result = !nextShiftFails();
    trackTransaction(stage, event.tdi);
    const bool result = event.result;
    events.push_back(std::move(event));
    return result;
}

bool RecordingScanPort::wait(int time, bool microseconds) {
    ++waitCalls_;
    ScanEvent event(ScanEvent::Kind::Wait);
    event.time = time;
    event.timeFlag = microseconds;
    event.result = std::find(failingWaits.begin(), failingWaits.end(), waitCalls_) == failingWaits.end();
    openingTdi_.clear();  // a wait closes an open transaction
    const bool result = event.result;
    events.push_back(std::move(event));
    return result;
}

bool RecordingScanPort::isCancelled(int level) {
    ++cancelQueries_;
    ScanEvent event(ScanEvent::Kind::Cancel);
    event.level = level;
    event.result = cancelFromQuery > 0 && cancelQueries_ >= cancelFromQuery;
    const bool result = event.result;
    events.push_back(std::move(event));
    return result;
}

void RecordingScanPort::scriptStatus(const std::string& statusOpcodeBits, int busyReads,
                                     unsigned statusValue) {
    auto readsSoFar = std::make_shared<int>(0);
    Responder previous = std::move(responder);
    responder = [=](const std::string& openingTdi, std::size_t bits) -> std::string {
        if (openingTdi != statusOpcodeBits) return previous ? previous(openingTdi, bits) : std::string();
        const bool busy = (*readsSoFar)++ < busyReads;
        return statusCapture(busy ? (statusValue | 0x01u) : statusValue, bits);
    };
}

std::vector<std::string> RecordingScanPort::lines() const {
    std::vector<std::string> out;
    out.reserve(events.size());
    for (const ScanEvent& event : events) {
        switch (event.kind) {
            case ScanEvent::Kind::Comment: out.push_back("comment " + event.text); break;
            case ScanEvent::Kind::Shift:
                out.push_back("shift " + std::to_string(event.stage) + " " + event.tdi);
                break;
            case ScanEvent::Kind::ShiftWrite:
                out.push_back("shiftWrite " + std::to_string(event.stage) + " " + event.tdi);
                break;
            case ScanEvent::Kind::Wait: out.push_back("wait " + std::to_string(event.time)); break;
            case ScanEvent::Kind::Cancel: out.push_back("isCancelled " + std::to_string(event.level)); break;
            case ScanEvent::Kind::OutputMode: out.push_back("outputMode"); break;
        }
    }
    return out;
}

std::vector<std::string> RecordingScanPort::scanLines() const {
    std::vector<std::string> out = lines();
    out.erase(std::remove(out.begin(), out.end(), std::string("outputMode")), out.end());
    return out;
}

std::size_t RecordingScanPort::count(ScanEvent::Kind kind) const {
    return static_cast<std::size_t>(std::count_if(events.begin(), events.end(),
                                                  [kind](const ScanEvent& e) { return e.kind == kind; }));
}

}  // namespace vorant::test
