#pragma once
// An FTDI channel with its MPSSE engine, as a test double behind the FTDI
// seam, written from FTDI's MPSSE command reference and never from the
// port's code. Once set_bitmode asks for MPSSE it interprets what an SPI
// master sends (clock set-up, the low pins, byte-wide MSB-first data
// commands, send immediate), drives a simulated flash by its chip select
// pin, advances the flash's clock at the divisor's frequency, and queues
// the bytes clocked in for the next read. Any other opcode is answered FA
// and the opcode, as the chip answers one it does not know. A truncated
// command, or a port that clocks data with chip select high, with SCK or
// MOSI not outputs, on the wrong edges for SPI mode 0 or with an engine
// setting left on, fails the write with a clear error.

#include "ports/ftdi/FtdiIo.h"
#include "ports/sim/FlashModel.h"

#include <cstdint>
#include <deque>
#include <memory>
#include <string>
#include <vector>

namespace vorant::test {

class FakeMpsse final : public ports::ftdi::FtdiIo {
public:
    // `chipSelectPin`: the ADBUS pin wired to the flash's CS#.
    explicit FakeMpsse(sim::FlashModel& flash, unsigned chipSelectPin = 3);

    bool setBitmode(std::uint8_t pinMask, std::uint8_t mode) override;
    bool purge() override;
    bool write(std::span<const std::uint8_t> bytes) override;
    bool read(std::span<std::uint8_t> into, std::size_t& got, std::chrono::milliseconds timeout) override;
    void sleep(std::uint64_t microseconds) override;
    bool lost() const override { return gone_; }
    std::string error() const override { return error_; }

    // A handle that forwards to this double, for an opener to hand out:
    // the port owns the handle, the test keeps the double.
    std::unique_ptr<ports::ftdi::FtdiIo> handle();

    struct Faults {
        int vanishAfterWrites = 0;  // after this many writes the device is gone from USB
        int shortReplyAtRead = 0;   // this read loses the last byte the chip sent
        int strayByteAtRead = 0;    // this read finds a stray byte ahead of the reply
        bool noMpsse = false;       // the channel never enters MPSSE mode (not an H chip)
        // The engine as another program left it: divide-by-5, 3-phase
        // clocking, adaptive clocking and loopback all on.
        bool leftoverState = false;
    };
    Faults faults;

    // One line per set_bitmode and purge ("bitmode 02", "purge").
    std::vector<std::string> log;
    bool keepLog = true;
    // Every USB write as written.
    std::vector<std::vector<std::uint8_t>> writes;
    bool keepWrites = true;
    // What the port did wrong, one line each (its write failed with it).
    std::vector<std::string> misuse;

    // The SCK the engine is set to.
    double sckHz() const;
    std::uint64_t writeCount() const { return writeCount_; }
    std::uint64_t readCount() const { return readCount_; }
    // Reads that had to wait for the latency timer: their reply had no send
    // immediate after it.
    std::uint64_t latencyWaits() const { return latencyWaits_; }

private:
    class Handle;

    bool interpret(const std::uint8_t* bytes, std::size_t n);
    bool clockData(std::uint8_t opcode, const std::uint8_t* bytes, std::size_t n, std::size_t& used);
    bool refuse(const std::string& why);
    bool misused(const std::string& why);
    bool checkPinsForClocking(std::uint8_t opcode);
    void setLowPins(std::uint8_t levels, std::uint8_t directions);
    bool chipSelectHigh() const;
    void note(std::string line);

    sim::FlashModel& flash_;
    unsigned chipSelectPin_;
    bool mpsse_ = false;
    bool gone_ = false;
    std::string error_;

    // The engine.
    bool divideBy5_ = true;
    bool threePhase_ = false, adaptive_ = false, loopback_ = false;
    std::uint16_t divisor_ = 0;
    std::uint8_t levels_ = 0, directions_ = 0;

    // Bytes for the host; the first `flushed_` of them were pushed out by a
    // send immediate.
    std::deque<std::uint8_t> replies_;
    std::size_t flushed_ = 0;

    std::uint64_t writeCount_ = 0, readCount_ = 0, latencyWaits_ = 0;
};

// The USB side of the double: the devices a listing finds, and the open of
// one of them handing out a FakeMpsse (or failing as told). Installs itself
// behind the FTDI seam and restores libftdi's when it goes.
class FakeFtdiUsb {
public:
    explicit FakeFtdiUsb(FakeMpsse* device = nullptr);
    ~FakeFtdiUsb();
    FakeFtdiUsb(const FakeFtdiUsb&) = delete;
    FakeFtdiUsb& operator=(const FakeFtdiUsb&) = delete;

    // An FT232H, 0403:6014, serial FT4ABC12, bus 1 device 7.
    static ports::ftdi::FtdiDeviceInfo ft232h(const std::string& serial = "FT4ABC12");

    std::vector<ports::ftdi::FtdiDeviceInfo> devices;
    // What the open answers instead of a device.
    ports::ftdi::FtdiUsbFailure openFailure = ports::ftdi::FtdiUsbFailure::None;
    std::string openFailureDetail;
    // The listings asked for: "list 0403:6014 0403:6010".
    std::vector<std::string> log;

private:
    FakeMpsse* device_;
};

}  // namespace vorant::test
