#include "ports/spidev/SpidevSetup.h"

#include "ports/PortError.h"

#include <cerrno>
#include <cstdio>
#include <cstring>

namespace vorant::ports::spidev {

namespace {

// Mode bits that change what reaches the flash: clock polarity and phase,
// bit order, a shared data line, loopback, no chip select. CS_HIGH is left
// out on purpose: a kernel driving chip select through a GPIO descriptor
// sets it on its own and applies the pin's real polarity itself.
constexpr std::uint32_t kWireModeBits = 0x01 | 0x02 | 0x08 | 0x10 | 0x20 | 0x40;

[[noreturn]] void refuse(const std::string& message) { throw PortError(PortError::Kind::Unavailable, message); }

std::string hex(std::uint32_t value) {
    char text[16];
    std::snprintf(text, sizeof text, "0x%02X", value);
    return text;
}

void write(SpidevIo& io, SpidevSetting setting, std::uint32_t value, const char* request, const std::string& what,
           const std::string& where, const std::string& path) {
    const int error = io.write(setting, value);
    if (error == 0) return;
    if (error == ENOTTY)
        refuse(where + ": " + path + " is not a spidev device (" + request + ": " + std::strerror(error) +
               "); give a /dev/spidevB.C node ('vorant-spi ports' lists them)");
    refuse(where + ": the SPI controller refuses " + what + " (" + request + ": " + std::strerror(error) + ")" +
           (setting == SpidevSetting::MaxSpeedHz ? "; give another speed=, such as speed=1000000" : ""));
}

std::uint32_t readBack(SpidevIo& io, SpidevSetting setting, const char* request, const std::string& where) {
    std::uint32_t value = 0;
    if (const int error = io.read(setting, value))
        refuse(where + ": reading the setting back failed (" + request + ": " + std::strerror(error) + ")");
    return value;
}

}  // namespace

void setUpSpidev(SpidevIo& io, std::uint32_t speedHz, const std::string& where, const std::string& path) {
    write(io, SpidevSetting::Mode, 0, "SPI_IOC_WR_MODE", "SPI mode 0", where, path);
    const std::uint32_t mode = readBack(io, SpidevSetting::Mode, "SPI_IOC_RD_MODE", where);
    if ((mode & kWireModeBits) != 0)
        refuse(where + ": the driver keeps SPI mode bits " + hex(mode) +
               " where mode 0 was set; the flash needs mode 0, most significant bit first, with chip select");

    write(io, SpidevSetting::BitsPerWord, 8, "SPI_IOC_WR_BITS_PER_WORD", "8-bit words", where, path);
    const std::uint32_t bits = readBack(io, SpidevSetting::BitsPerWord, "SPI_IOC_RD_BITS_PER_WORD", where);
    if (bits != 8 && bits != 0)  // 0 stands for 8
        refuse(where + ": the driver keeps " + std::to_string(bits) + "-bit words where 8 were set");

    write(io, SpidevSetting::MaxSpeedHz, speedHz, "SPI_IOC_WR_MAX_SPEED_HZ", "speed=" + std::to_string(speedHz) + " Hz",
          where, path);
    // A driver that keeps a slower clock is only slower; one that reports a
    // faster one (or none) would clock the flash past what was asked.
    const std::uint32_t speed = readBack(io, SpidevSetting::MaxSpeedHz, "SPI_IOC_RD_MAX_SPEED_HZ", where);
    if (speed == 0 || speed > speedHz)
        refuse(where + ": the driver reports " + std::to_string(speed) + " Hz where speed=" + std::to_string(speedHz) +
               " was set; give another speed=");
}

}  // namespace vorant::ports::spidev
