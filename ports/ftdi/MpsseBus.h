#pragma once
// SPI mode 0 through an FTDI MPSSE engine: each transaction becomes the
// engine's commands (chip select low, bytes out on the falling edge and in
// on the rising edge, most significant bit first, chip select high).
// Transactions that read nothing are held and go out together in one USB
// write; a read sends what is held plus itself and waits for exactly the
// bytes it expects. No I/O but through FtdiIo.

#include "ports/ftdi/FtdiIo.h"
#include "ports/spi/SpiBus.h"

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace vorant::ports::ftdi {

struct MpsseSettings {
    // SCK = 30 MHz / (divisor + 1), with the 60 MHz engine clock.
    std::uint16_t divisor = 4;
    // The ADBUS pin of chip select, 3..7.
    unsigned chipSelectPin = 3;
};

// The SCK a divisor gives, in Hz.
double mpsseClockHz(std::uint16_t divisor);

class MpsseBus final : public spi::SpiBus {
public:
    MpsseBus(std::unique_ptr<FtdiIo> io, MpsseSettings settings);
    // Leaves the pins as inputs and the channel out of MPSSE mode, so the
    // board's own master can reach the flash again.
    ~MpsseBus() override;
    MpsseBus(const MpsseBus&) = delete;
    MpsseBus& operator=(const MpsseBus&) = delete;

    // Puts the channel in MPSSE mode, checks the engine answers, and sets
    // clock and pins (chip select high, SCK low). False with error() when
    // the device does not act as an MPSSE engine.
    bool start();

    bool transact(std::span<const spi::SpiSegment> segments) override;
    bool flush() override;
    bool pause(std::uint64_t microseconds) override;
    std::string error() const override { return error_; }
    // A bus that failed stays failed for the run (see fail()), so every
    // further call would fail too: polling on is pointless.
    bool lost() const override { return broken_ || io_->lost(); }

private:
    // Where a run of reply bytes goes.
    struct ReplyTarget {
        std::uint8_t* into;
        std::size_t length;
    };

    void setPins(bool chipSelectHigh);
    void shiftCommand(std::uint8_t opcode, const std::uint8_t* data, std::size_t length);
    bool roundTrip();
    bool send();
    bool fail(const std::string& why);
    bool usable();
    bool ioFailure(const std::string& what);

    std::unique_ptr<FtdiIo> io_;
    MpsseSettings settings_;
    bool started_ = false;
    // Commands not yet on the wire, the reply bytes they will bring, and
    // the SCK bits they clock (for the reply's deadline).
    std::vector<std::uint8_t> held_;
    std::vector<ReplyTarget> replyTargets_;
    std::size_t replyBytes_ = 0;
    std::uint64_t heldBits_ = 0;
    std::vector<std::uint8_t> reply_;
    std::string error_;
    bool broken_ = false;
};

}  // namespace vorant::ports::ftdi
