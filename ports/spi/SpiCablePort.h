#pragma once
// The scan port of every SPI cable: the framer turns stage codes into
// transactions, the shifts of a transaction become wire bytes (whole bytes
// only: an SPI cable moves bytes), and the bus carries them. A capture is
// read back from the same clocks and laid into tdo in scan order.

#include "host/ScanPort.h"
#include "ports/Port.h"
#include "ports/spi/SpiBus.h"
#include "ports/wire/TransactionFramer.h"

#include <memory>
#include <string>
#include <vector>

namespace vorant::ports::spi {

struct SpiCableStats {
    std::uint64_t transactions = 0;
    std::uint64_t flushes = 0;
    std::uint64_t bytes = 0;
};

class SpiCablePort final : public ScanPort, private TransactionSink {
public:
    // `name` starts every failure reason ("spidev:/dev/spidev0.0").
    SpiCablePort(std::string name, SpiBus& bus);

    bool outputMode() override { return false; }
    void comment(const char*) override {}
    bool shift(int stage, RLBitVec* tdi, RLBitVec* tdiMask, RLBitVec* tdo, RLBitVec* tdoMask) override;
    bool shiftWrite(int stage, RLBitVec* tdi, int reserved) override;
    bool wait(int time, bool microseconds) override;
    // A cable has no cancel of its own (Ctrl-C is the host's); a lost one
    // ends the run.
    bool isCancelled(int) override { return bus_.lost(); }
    const char* failureReason() override { return reason_.empty() ? nullptr : reason_.c_str(); }
    bool connectionLost() override { return bus_.lost(); }

    // Puts what the bus holds on the wire; false (with a reason) on failure.
    bool flush();
    const SpiCableStats& stats() const { return stats_; }

private:
    struct Capture {
        std::size_t begin = 0;  // wire byte of the transaction
        RLBitVec* tdo = nullptr;
        std::size_t bits = 0;
    };

    void select() override;
    void shiftBits(const RLBitVec& tdi, RLBitVec* tdo, const RLBitVec* tdoMask, bool capture) override;
    void deselect() override;
    bool fail(const std::string& why);

    std::string name_;
    SpiBus& bus_;
    TransactionFramer framer_{*this};

    // The open transaction: its wire bytes, where each shift starts, and
    // the shifts whose capture someone reads.
    std::vector<std::uint8_t> mosi_, miso_;
    std::vector<std::size_t> shiftStarts_;
    std::vector<Capture> captures_;
    std::vector<SpiSegment> segments_;
    std::string refusal_;
    bool transactionFailed_ = false;

    std::string reason_;
    SpiCableStats stats_;
};

// The Port of an SPI cable: owns the bus (and through it the seam) and
// the scan port over it.
class SpiCable final : public Port {
public:
    SpiCable(std::string name, std::unique_ptr<SpiBus> bus);
    ScanPort& scan() override { return port_; }
    // Sends what is still held back; throws PortError (Unavailable) when
    // the cable fails.
    void commit() override;
    SpiBus& bus() { return *bus_; }
    const SpiCablePort& port() const { return port_; }

private:
    std::unique_ptr<SpiBus> bus_;
    SpiCablePort port_;
};

}  // namespace vorant::ports::spi
