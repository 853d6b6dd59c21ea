#pragma once
// The scan port that plays every transfer on a simulated flash: stage codes
// become chip-select edges, shift vectors become SPI clocks, waits advance
// the virtual clock. Nothing ever sleeps.

#include "host/RLBitVec.h"
#include "host/ScanPort.h"
#include "ports/sim/FaultPlan.h"
#include "ports/sim/FlashModel.h"
#include "ports/wire/TransactionFramer.h"

#include <atomic>
#include <cstdint>
#include <string>

namespace vorant::sim {

// What a run cost on the simulated bus.
struct SimStats {
    std::uint64_t bitsShifted = 0;
    std::uint64_t transactions = 0;  // chip-select cycles
    std::uint64_t shiftCalls = 0;    // shift and shiftWrite together
    std::uint64_t waitCalls = 0;
    std::uint64_t cancelQueries = 0;
    std::uint64_t simulatedNs = 0;   // clocks plus waits
};

class SimScanPort : public ScanPort, private ports::TransactionSink {
public:
    // The port owns its chip. backingFile: see FlashModel.
    explicit SimScanPort(FlashConfig config, FaultPlan faults = FaultPlan{},
                         const std::string& backingFile = std::string{});

    // --- ScanPort ---
    bool outputMode() override { return false; }
    void comment(const char*) override {}
    // Stages: 0 select+shift+deselect, 1 select+shift, 2 shift, 3
    // shift+deselect, 12 shift capturing MISO into tdo, then deselect. An
    // opening stage (0 or 1) first closes a transaction left open. Stages
    // 2, 3 and 12 without an open transaction, unknown stages and a null
    // tdi fail and change nothing. tdi->length() bits are clocked; on stage
    // 12 the first min(tdo->length(), tdi->length()) bits of tdo receive
    // MISO (bit 0 = first bit received), the rest of tdo is left alone.
    // tdiMask and tdoMask play no part: the simulator compares nothing.
    bool shift(int stage, RLBitVec* tdi, RLBitVec* tdiMask, RLBitVec* tdo, RLBitVec* tdoMask) override;
    bool shiftWrite(int stage, RLBitVec* tdi, int reserved) override;
    // Closes an open transaction, then lets `time` microseconds pass. A
    // negative time fails and lets no time pass.
    bool wait(int time, bool microseconds) override;
    bool isCancelled(int level) override;
    const char* failureReason() override { return lastError_.empty() ? nullptr : lastError_.c_str(); }
    bool connectionLost() override { return disconnected_; }

    // One whole transaction (select, shift, deselect) capturing MISO into
    // captured (may be null, may be tdi itself); counts as a shift call.
    bool transaction(const RLBitVec& tdi, RLBitVec* captured);

    // Cancel from another thread or a signal handler: requestCancel(), or
    // store true into cancelFlag() (lock-free).
    void requestCancel() { cancel_.store(true); }
    void clearCancel() { cancel_.store(false); }
    std::atomic<bool>& cancelFlag() { return cancel_; }

    // The SPI clock (default 50 MHz).
    void setClockHz(std::uint32_t hz) { model_.setClockHz(hz); }

    FlashModel& model() { return model_; }
    const FlashModel& model() const { return model_; }
    SimStats stats() const;
    // Why the last failing call failed, "simulated cable: ..." ("" when
    // none has).
    const std::string& lastError() const { return lastError_; }

private:
    // Counts a page transaction when this opening shift starts one; true
    // when an injected fault makes the shift fail (the reason recorded).
    bool shiftFails(int stage, const RLBitVec* tdi);
    bool opensPageTransaction(int stage, const RLBitVec* tdi) const;
    bool shiftOnce(int stage, RLBitVec* tdi, RLBitVec* tdo);
    // --- ports::TransactionSink: the chip-select edges and the clocks ---
    void select() override;
    void shiftBits(const RLBitVec& tdi, RLBitVec* tdo, const RLBitVec* tdoMask, bool capture) override;
    void deselect() override;
    void clock(const RLBitVec& tdi, RLBitVec* captured);
    bool fail(const std::string& why);

    FlashModel model_;
    FaultPlan faults_;
    ports::TransactionFramer framer_{*this};
    std::atomic<bool> cancel_{false};
    bool disconnected_ = false;
    bool lastCallFailed_ = false;  // the shift before this one failed
    std::uint64_t pageTransactions_ = 0;
    std::uint64_t failWaitFromCall_ = 0;  // the wait call that fails after the faulty page opened
    SimStats stats_;
    std::string lastError_;
};

}  // namespace vorant::sim
