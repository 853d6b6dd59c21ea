#pragma once
// The seam between the spidev cable and Linux: one open /dev/spidevB.C
// node and what the cable asks of it (the mode, word size and speed
// ioctls, SPI_IOC_MESSAGE, the driver's buffer size, and sleeping). Only
// LinuxSpidevIo.cpp reaches the kernel; tests put a double written from the
// kernel's documented interface behind spidevIoOpener().

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <span>
#include <string>

namespace vorant::ports::spidev {

// One transfer of a message, laid out byte for byte as the kernel's
// struct spi_ioc_transfer (32 bytes, the same for 32- and 64-bit
// programs): buffers as integers, 0 for none. A null tx shifts zeros out;
// a null rx drops what comes in.
struct SpidevTransfer {
    std::uint64_t txBuffer = 0;
    std::uint64_t rxBuffer = 0;
    std::uint32_t length = 0;
    std::uint32_t speedHz = 0;  // 0: the node's default
    std::uint16_t delayMicroseconds = 0;
    std::uint8_t bitsPerWord = 0;  // 0: the node's default
    std::uint8_t csChange = 0;
    std::uint8_t txBits = 0;
    std::uint8_t rxBits = 0;
    std::uint8_t wordDelayMicroseconds = 0;
    std::uint8_t pad = 0;
};
static_assert(sizeof(SpidevTransfer) == 32, "the kernel copies 32 bytes per transfer");

// The settings the node's setup ioctls read and write.
enum class SpidevSetting {
    Mode,         // SPI_IOC_{RD,WR}_MODE, 8 bits
    BitsPerWord,  // SPI_IOC_{RD,WR}_BITS_PER_WORD, 8 bits (0 reads as 8)
    MaxSpeedHz,   // SPI_IOC_{RD,WR}_MAX_SPEED_HZ, 32 bits
};

class SpidevIo {
public:
    virtual ~SpidevIo() = default;
    // The WR_ and RD_ ioctl of a setting: 0, or the errno it failed with.
    virtual int write(SpidevSetting setting, std::uint32_t value) = 0;
    virtual int read(SpidevSetting setting, std::uint32_t& value) = 0;
    // SPI_IOC_MESSAGE(n) of the transfers, run as one message with chip
    // select held across them unless a transfer's csChange says otherwise.
    // The ioctl's result (bytes moved), or -errno.
    virtual long message(std::span<const SpidevTransfer> transfers) = 0;
    // The driver's bounce buffer in bytes (the spidev.bufsiz module
    // parameter); nothing when it cannot be read.
    virtual std::optional<std::uint32_t> bufferSize() = 0;
    // Lets a wait's time pass.
    virtual void sleep(std::uint64_t microseconds) = 0;
};

// Opens a node for reading and writing; null with `error` (an errno) set
// when open() fails.
using SpidevIoOpener = std::function<std::unique_ptr<SpidevIo>(const std::string& path, int& error)>;

// The opener the port uses: Linux's by default. A test sets its own and
// restores the one it found.
SpidevIoOpener& spidevIoOpener();

}  // namespace vorant::ports::spidev
