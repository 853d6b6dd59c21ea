#pragma once
// The spidev cable's bus: each transaction is one SPI_IOC_MESSAGE whose
// transfers are the transaction's shifts, chip select held across them.
// Nothing is held back, so flush() has nothing to send; the kernel's
// buffer (spidev.bufsiz) bounds a transaction.

#include "ports/spi/SpiBus.h"
#include "ports/spidev/SpidevIo.h"

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace vorant::ports::spidev {

class SpidevBus final : public spi::SpiBus {
public:
    // `io` is set up already (mode 0, 8-bit words); every transfer asks for
    // `speedHz`, and a transaction may hold `bufferBytes` at most.
    SpidevBus(std::unique_ptr<SpidevIo> io, std::uint32_t speedHz, std::uint32_t bufferBytes);

    bool transact(std::span<const spi::SpiSegment> segments) override;
    // Nothing is held back, so there is nothing to fail: a lost device has
    // already failed the transaction that found it gone.
    bool flush() override { return true; }
    bool pause(std::uint64_t microseconds) override;
    std::string error() const override { return error_; }
    bool lost() const override { return lost_; }

private:
    bool fail(std::string why);

    std::unique_ptr<SpidevIo> io_;
    std::uint32_t speedHz_;
    std::uint32_t bufferBytes_;
    std::vector<SpidevTransfer> transfers_;
    std::string error_;
    bool lost_ = false;
};

// What to do about a buffer smaller than `neededBytes`: the kernel
// parameter that raises it, with a value that fits.
std::string raiseBufsizAdvice(std::uint64_t neededBytes);

}  // namespace vorant::ports::spidev
