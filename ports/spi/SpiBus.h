#pragma once
// What an SPI cable does with a transaction, in bytes as they go on the
// wire (each most significant bit first). A bus turns transactions into
// its device's packets (spidev transfer lists, MPSSE commands, CH341
// stream packets) and reaches the device through its own narrow seam; it
// knows nothing of stage codes or shift vectors.

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>

namespace vorant::ports::spi {

// One shift of a transaction.
struct SpiSegment {
    const std::uint8_t* mosi = nullptr;
    std::size_t length = 0;
    // Receives the bytes clocked in with these; null when nobody reads them.
    std::uint8_t* miso = nullptr;
};

class SpiBus {
public:
    virtual ~SpiBus() = default;
    // One transaction: chip select asserted, the segments back to back,
    // chip select released. A transaction that reads (any segment with
    // miso) is on the wire and its reply stored when this returns; one
    // that reads nothing may be held back and sent with later ones, so the
    // bus copies what it holds. False on failure; error() says why.
    virtual bool transact(std::span<const SpiSegment> segments) = 0;
    // Puts everything held back on the wire. Comes before every wait: a
    // page program still in a buffer would not start while its time runs.
    virtual bool flush() = 0;
    // Lets the time pass, after a flush: a cable sleeps on a monotonic
    // clock, a double advances its chip.
    virtual bool pause(std::uint64_t microseconds) = 0;
    // Why the last call failed, in the device's terms.
    virtual std::string error() const = 0;
    // True once the device is gone (unplugged): every further call fails.
    virtual bool lost() const = 0;
};

}  // namespace vorant::ports::spi
