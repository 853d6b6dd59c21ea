#pragma once
// A CH341A programmer in its SPI/I2C personality (1a86:5512) as a test
// double, written from the device's stream protocol and never from the
// port's code. Each OUT transfer is cut into 32-byte packets, and each
// packet is one command:
//   AA 60|mode .. 00       stream setup
//   AB sub-commands .. 20  UIO stream: 80|v drives D5..D0, 40|d sets their
//                          directions
//   A8 data (1..31)        SPI stream: each byte shifted LSB first, answered
//                          by one IN packet of the bytes clocked in
// Pin D0 is CS0# of a simulated flash: low (and driven) selects it, high
// deselects it. The chip clocks at the programmer's fixed rate, 1.4 MHz.
// Unknown commands, SPI data while chip select is high or with SCK/MOSI
// not driven, SCK high as chip select falls, and a UIO packet without its
// end are refused: the transfer fails and `refusal` says why.
//
// Each packet is logged as one line ("stream 61", "uio cs=0", "uio cs=1
// dir=3F", "spi 9F FF FF FF" with the bytes as the flash sees them, "in 3"
// for each answer taken), and each OUT transfer kept as raw hex.

#include "ports/ch341a/Ch341Io.h"
#include "ports/sim/FlashModel.h"

#include <cstdint>
#include <deque>
#include <memory>
#include <string>
#include <vector>

namespace vorant::test {

class FakeCh341a {
public:
    static constexpr std::uint32_t kSpiClockHz = 1'400'000;
    static constexpr std::size_t kKeptLines = 20000;

    // Sets the flash's clock to the programmer's.
    explicit FakeCh341a(sim::FlashModel& flash);

    // An opened connection, as the port's opener hands it out; the device
    // (its log, its flash) stays the test's.
    std::unique_ptr<ports::ch341a::Ch341Io> connect();

    // The latest lines (at most kKeptLines; older ones are dropped).
    std::vector<std::string> log;
    // Every OUT transfer as sent, "AB B6 20 00 .. A8 60", the latest likewise.
    std::vector<std::string> transfers;
    std::string refusal;
    std::uint64_t outTransfers = 0, inTransfers = 0, outBytes = 0, packets = 0;

    // Faults, counted in OUT packets from 1 (0: never). At failAtPacket the
    // transfer carrying it fails (LIBUSB_ERROR_IO); at vanishAtPacket the
    // device leaves the bus (LIBUSB_ERROR_NO_DEVICE) for good.
    std::uint64_t failAtPacket = 0, vanishAtPacket = 0;
    // The answer to the SPI packet numbered here (from 1) comes with
    // `answerSizeChange` bytes more (or fewer), or not at all when
    // `answerWithheld`.
    std::uint64_t answerFaultAtSpiPacket = 0;
    int answerSizeChange = -1;
    bool answerWithheld = false;

    bool chipSelected() const { return csLow_; }

private:
    class Connection;
    using BulkResult = ports::ch341a::BulkResult;

    BulkResult bulkOut(const std::uint8_t* data, std::size_t length);
    BulkResult bulkIn(std::uint8_t* data, std::size_t capacity, std::size_t& received);
    // Runs one packet; false (with `refusal`) when the device refuses it.
    bool packet(const std::uint8_t* bytes, std::size_t length);
    bool streamSetup(const std::uint8_t* bytes, std::size_t length);
    bool uioStream(const std::uint8_t* bytes, std::size_t length);
    bool spiStream(const std::uint8_t* bytes, std::size_t length);
    bool chipSelectFollowsPins();
    bool refuse(const std::string& why);
    static void note(std::vector<std::string>& lines, std::string line);
    BulkResult result(BulkResult outcome, const std::string& error);

    sim::FlashModel& flash_;
    std::uint8_t pins_ = 0x3F, directions_ = 0x00;
    bool csLow_ = false, gone_ = false;
    std::uint64_t spiPackets_ = 0;
    std::deque<std::vector<std::uint8_t>> answers_;
    std::string error_;
};

}  // namespace vorant::test
