#pragma once
// A scan port for any JTAG adapter: the framer turns stage codes into SPI
// transactions, each transaction is buffered whole (the jtagspi header
// needs its length up front) and goes out as the bridge's one DR scan, the
// capture comes back through the bridge's decoder. The bridge's
// instruction is selected before the first scan and again whenever the
// sink says the TAP may have been reset.

#include "host/ScanPort.h"
#include "ports/jtag/Bridge.h"
#include "ports/jtag/JtagSink.h"
#include "ports/wire/TransactionFramer.h"

#include <atomic>
#include <memory>
#include <string>

namespace vorant::ports::jtag {

struct JtagPortStats {
    std::uint64_t transactions = 0;
    std::uint64_t irScans = 0;
    std::uint64_t idles = 0;
};

class JtagPort final : public ScanPort, private TransactionSink {
public:
    // `name` starts every failure reason ("OpenOCD at localhost:6666").
    JtagPort(std::string name, std::unique_ptr<Bridge> bridge, const BridgeSettings& settings, JtagSink& sink);

    bool outputMode() override { return false; }
    void comment(const char*) override {}
    bool shift(int stage, RLBitVec* tdi, RLBitVec* tdiMask, RLBitVec* tdo, RLBitVec* tdoMask) override;
    bool shiftWrite(int stage, RLBitVec* tdi, int reserved) override;
    bool wait(int time, bool microseconds) override;
    bool isCancelled(int) override { return cancel_.load() || sink_.lost(); }
    const char* failureReason() override { return reason_.empty() ? nullptr : reason_.c_str(); }
    bool connectionLost() override { return sink_.lost(); }

    std::atomic<bool>& cancelFlag() { return cancel_; }
    const JtagPortStats& stats() const { return stats_; }

private:
    void select() override;
    void shiftBits(const RLBitVec& tdi, RLBitVec* tdo, const RLBitVec* tdoMask, bool capture) override;
    void deselect() override;
    bool ensureInstruction();
    bool fail(const std::string& why);

    std::string name_;
    std::unique_ptr<Bridge> bridge_;
    BridgeSettings settings_;
    JtagSink& sink_;
    TransactionFramer framer_{*this};
    std::atomic<bool> cancel_{false};
    bool instructionSelected_ = false;

    // The open transaction.
    BitBuffer mosi_, dr_, drTdo_, miso_;
    bool reads_ = false;
    RLBitVec* capture_ = nullptr;
    std::size_t captureAt_ = 0, captureBits_ = 0;
    bool transactionFailed_ = false;

    std::string reason_;
    JtagPortStats stats_;
};

}  // namespace vorant::ports::jtag
