#pragma once
// An SPI bus over a CH341A's stream commands. Chip select is pin D0
// (CS0#), driven by UIO stream packets; data goes in SPI stream packets of
// at most 31 bytes, each answered by the device with as many bytes as it
// clocked. The device shifts every byte least significant bit first, so
// each byte is mirrored on the way out and on the way back.
//
// Chip-select packets need no answer: they wait and go out in front of the
// next SPI packet (or at a flush), so a transaction of up to 31 bytes is
// one OUT transfer and one IN transfer. Every SPI packet's answer is read,
// also where nobody wants the bytes, so answers never pile up in the
// device.

#include "ports/ch341a/Ch341Io.h"
#include "ports/spi/SpiBus.h"

#include <memory>
#include <string>
#include <vector>

namespace vorant::ports::ch341a {

class Ch341aBus final : public spi::SpiBus {
public:
    explicit Ch341aBus(std::unique_ptr<Ch341Io> io);
    // Raises chip select and lets the pins go (inputs), as a programmer
    // should leave a board; nothing when the device is gone.
    ~Ch341aBus() override;
    Ch341aBus(const Ch341aBus&) = delete;
    Ch341aBus& operator=(const Ch341aBus&) = delete;

    // Sets the device up for SPI: answers left over from an earlier
    // program are read away, one data line, CS# high, D0..D5 driven. False
    // (error() says why) when the device does not take it.
    bool start();

    bool transact(std::span<const spi::SpiSegment> segments) override;
    bool flush() override;
    bool pause(std::uint64_t microseconds) override;
    std::string error() const override { return error_; }
    bool lost() const override { return io_->lost(); }

private:
    bool send(const std::vector<std::uint8_t>& bytes);
    bool receive(std::uint8_t* into, std::size_t clocked);
    // Reads away answers nobody asked for (after a late or wrong one).
    bool drain();
    void appendPendingPins(bool padded);
    bool fail(const std::string& why);

    std::unique_ptr<Ch341Io> io_;
    // UIO sub-commands that wait for the next OUT transfer.
    std::vector<std::uint8_t> pendingPins_;
    // An answer went missing or came wrong: the next ones may be stale.
    bool outOfStep_ = false;
    std::vector<std::uint8_t> packet_, mosi_, miso_;
    std::string error_;
};

}  // namespace vorant::ports::ch341a
