#pragma once
// The Linux spidev driver and an SPI controller as a test double, written
// from the kernel's documented interface and never from the cable's code.
// It reads each message as the kernel copies it in (32-byte transfer
// records at their documented offsets), checks what the kernel and a
// controller would (word size, nbits, speed, the bounce buffers against
// bufsiz, transfers without buffers, the transfer count), and clocks the
// transfers into a simulated flash with chip select held across the
// message. cs_change and delays, which a flash port has no use for, are
// refused. Every ioctl is one log line; faults can be scripted.

#include "ports/sim/FlashModel.h"
#include "ports/spidev/SpidevIo.h"

#include <array>
#include <cerrno>
#include <cstdint>
#include <string>
#include <vector>

namespace vorant::test {

class FakeSpidev final : public ports::spidev::SpidevIo {
public:
    // `flash` null: nothing answers on the bus, MISO reads all ones.
    explicit FakeSpidev(sim::FlashModel* flash);

    int write(ports::spidev::SpidevSetting setting, std::uint32_t value) override;
    int read(ports::spidev::SpidevSetting setting, std::uint32_t& value) override;
    long message(std::span<const ports::spidev::SpidevTransfer> transfers) override;
    std::optional<std::uint32_t> bufferSize() override { return bufsiz; }
    void sleep(std::uint64_t microseconds) override;

    // What an opener hands a port: this device, which stays the test's.
    std::unique_ptr<ports::spidev::SpidevIo> handle();

    // One line per ioctl: "set mode 00", "get speed", "msg 06",
    // "msg 05 | <1" (a transfer sent, then one read with zeros out);
    // "9F00<" is sent while as many bytes are read, "-3" a transfer with
    // no buffer. Off for long runs.
    std::vector<std::string> log;
    bool keepLog = true;

    // The driver and the controller.
    std::optional<std::uint32_t> bufsiz = 4096;
    std::uint32_t controllerMinHz = 3'815, controllerMaxHz = 125'000'000;
    // Mode bits the kernel adds on every mode write (CS_HIGH, 0x04, where
    // chip select is a GPIO descriptor).
    std::uint8_t forcedModeBits = 0;
    // A node of another driver: every ioctl fails with ENOTTY.
    bool notSpidev = false;

    // Faults, counted in messages from 1: the one that fails with
    // `failErrno`; the last one before the device is gone (from then on
    // every ioctl fails with `vanishErrno`); the one whose byte count
    // comes back one short.
    std::uint64_t failAtMessage = 0;
    int failErrno = EIO;
    std::uint64_t vanishAfterMessages = 0;
    int vanishErrno = ESHUTDOWN;
    std::uint64_t miscountAtMessage = 0;

    // What went over the bus.
    std::uint64_t ioctls = 0, messages = 0, chipSelects = 0;
    // Messages clocked, by the first byte they sent.
    std::array<std::uint64_t, 256> messagesByFirstByte{};

private:
    bool gone() const { return vanishAfterMessages != 0 && messages >= vanishAfterMessages; }
    void note(std::string line);

    sim::FlashModel* flash_;
    std::uint8_t mode_ = 0;
    std::uint8_t bitsPerWord_ = 0;
    std::uint32_t speedHz_ = 500'000;
    std::vector<std::uint8_t> zeros_, scratch_;
};

// A /dev node with the double behind it, for as long as this lives (nest
// these in scopes): every open through spidevIoOpener() reaches `device`
// (which outlives the port, so a test reads it after a run), or fails with
// `openError`.
class FakeSpidevNode {
public:
    explicit FakeSpidevNode(sim::FlashModel* flash);
    ~FakeSpidevNode();
    FakeSpidevNode(const FakeSpidevNode&) = delete;
    FakeSpidevNode& operator=(const FakeSpidevNode&) = delete;

    FakeSpidev device;
    int openError = 0;
    std::vector<std::string> opened;  // the paths asked for

private:
    ports::spidev::SpidevIoOpener saved_;
};

}  // namespace vorant::test
