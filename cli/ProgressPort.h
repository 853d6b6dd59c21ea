#pragma once
#include "cli/PhaseTimer.h"
#include "cli/ProgressListener.h"
#include "cli/RunSummary.h"
#include "host/ScanPort.h"

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace vorant::cli {

// What the progress of one operation is measured in, from the part.
struct ProgressPlan {
    long long totalSteps = 0;  // 0: unknown (a spinner)
    std::optional<unsigned char> pageProgramOpcode;
    std::optional<unsigned char> readOpcode;
    std::optional<unsigned char> bulkEraseOpcode;
    long long eraseSteps = 0;            // what one bulk erase is worth
    long long eraseStepMicroseconds = 0; // PROGRESS_ERASE_WAITTIME_INC
    std::size_t pageBytes = 0;           // data bytes of one page program
};

// A scan port in front of the real one that measures progress from what
// goes over the wire, not from cancel queries (those also come on every busy
// poll): one step per page-program transaction (a stage-0 shift opening with
// the page-program opcode) and per page read (a stage-12 capture after an
// opening shift of the read opcode); during a bulk erase, one step per
// PROGRESS_ERASE_WAITTIME_INC waited, the erase's remaining steps when it
// ends. Steps never pass the total.
//
// Given a clock, it also splits the run's time among erase, program and
// read by the same transactions: a bulk erase opens the erase (its busy
// polls belong to it), the first page program the program, the first read
// command the read; each lasts until another begins.
//
// It also answers cancel queries: true once the user asked (a flag a signal
// handler may set) or the real port says so, and remembers that it did, so
// the tool can tell a cancelled run from a finished one.
class ProgressPort final : public ScanPort {
public:
    ProgressPort(ScanPort& inner, ProgressPlan plan, const std::atomic<bool>* userCancel = nullptr);

    void setListener(ProgressListener* listener) { listener_ = listener; }
    // Starts timing the phases by `clock` (see PhaseTimer).
    void setPhaseClock(PhaseTimer::Clock clock) { phases_ = PhaseTimer(std::move(clock)); }

    bool outputMode() override;
    void comment(const char* text) override;
    bool shift(int stage, RLBitVec* tdi, RLBitVec* tdiMask, RLBitVec* tdo, RLBitVec* tdoMask) override;
    bool shiftWrite(int stage, RLBitVec* tdi, int reserved) override;
    bool wait(int time, bool microseconds) override;
    bool isCancelled(int level) override;
    const char* failureReason() override { return inner_.failureReason(); }
    bool connectionLost() override { return inner_.connectionLost(); }

    long long stepsDone() const { return done_; }
    long long totalSteps() const { return plan_.totalSteps; }
    bool cancelSeen() const { return cancelSeen_; }
    std::uint64_t pagesProgrammed() const { return pagesProgrammed_; }
    std::uint64_t pagesRead() const { return pagesRead_; }
    // Data bytes moved by page programs and page reads.
    std::uint64_t dataBytes() const { return programmedBytes_ + readBytes_; }
    // Erase, program and read, in that order, as far as they took time or
    // moved data; the read is called `readName` ("verify", "read").
    std::vector<PhaseFigures> phaseFigures(const std::string& readName) const;

private:
    void observeOpening(int stage, const RLBitVec* tdi);
    void endErase();
    void advance(long long steps);

    ScanPort& inner_;
    ProgressPlan plan_;
    const std::atomic<bool>* userCancel_;
    ProgressListener* listener_ = nullptr;

    long long done_ = 0;
    bool cancelSeen_ = false;
    bool readCommandOpen_ = false;  // the open transaction is a read command
    bool eraseRunning_ = false;
    long long eraseWaitedUs_ = 0;
    long long eraseStepsCounted_ = 0;
    std::uint64_t pagesProgrammed_ = 0;
    std::uint64_t pagesRead_ = 0;
    std::uint64_t programmedBytes_ = 0;
    std::uint64_t readBytes_ = 0;
    PhaseTimer phases_;
};

}  // namespace vorant::cli
