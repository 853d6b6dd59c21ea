// The spidev seam on Linux: the node's file descriptor, its ioctls, the
// module's bufsiz parameter and a monotonic sleep. The only file that
// includes the kernel's spidev header.

#include "ports/spi/MonotonicSleep.h"
#include "ports/spidev/SpidevIo.h"

#include <linux/spi/spidev.h>

#include <cerrno>
#include <cstddef>
#include <fcntl.h>
#include <fstream>
#include <sys/ioctl.h>
#include <unistd.h>

namespace vorant::ports::spidev {

namespace {

// The cable fills its own copy of the kernel's transfer record; it must be
// the kernel's layout field for field.
static_assert(sizeof(SpidevTransfer) == sizeof(spi_ioc_transfer));
static_assert(offsetof(SpidevTransfer, txBuffer) == offsetof(spi_ioc_transfer, tx_buf));
static_assert(offsetof(SpidevTransfer, rxBuffer) == offsetof(spi_ioc_transfer, rx_buf));
static_assert(offsetof(SpidevTransfer, length) == offsetof(spi_ioc_transfer, len));
static_assert(offsetof(SpidevTransfer, speedHz) == offsetof(spi_ioc_transfer, speed_hz));
static_assert(offsetof(SpidevTransfer, delayMicroseconds) == offsetof(spi_ioc_transfer, delay_usecs));
static_assert(offsetof(SpidevTransfer, bitsPerWord) == offsetof(spi_ioc_transfer, bits_per_word));
static_assert(offsetof(SpidevTransfer, csChange) == offsetof(spi_ioc_transfer, cs_change));
static_assert(offsetof(SpidevTransfer, txBits) == offsetof(spi_ioc_transfer, tx_nbits));
static_assert(offsetof(SpidevTransfer, rxBits) == offsetof(spi_ioc_transfer, rx_nbits));
static_assert(offsetof(SpidevTransfer, wordDelayMicroseconds) == offsetof(spi_ioc_transfer, word_delay_usecs));

constexpr const char* kBufsizParameter = "/sys/module/spidev/parameters/bufsiz";

class LinuxSpidevIo final : public SpidevIo {
public:
    explicit LinuxSpidevIo(int fd) : fd_(fd) {}
    ~LinuxSpidevIo() override { ::close(fd_); }
    LinuxSpidevIo(const LinuxSpidevIo&) = delete;
    LinuxSpidevIo& operator=(const LinuxSpidevIo&) = delete;

    int write(SpidevSetting setting, std::uint32_t value) override {
        std::uint8_t byte = static_cast<std::uint8_t>(value);
        switch (setting) {
        case SpidevSetting::Mode: return control(SPI_IOC_WR_MODE, &byte);
        case SpidevSetting::BitsPerWord: return control(SPI_IOC_WR_BITS_PER_WORD, &byte);
        case SpidevSetting::MaxSpeedHz: return control(SPI_IOC_WR_MAX_SPEED_HZ, &value);
        }
        return EINVAL;
    }

    int read(SpidevSetting setting, std::uint32_t& value) override {
        std::uint8_t byte = 0;
        int error = EINVAL;
        switch (setting) {
        case SpidevSetting::Mode: error = control(SPI_IOC_RD_MODE, &byte); break;
        case SpidevSetting::BitsPerWord: error = control(SPI_IOC_RD_BITS_PER_WORD, &byte); break;
        case SpidevSetting::MaxSpeedHz: return control(SPI_IOC_RD_MAX_SPEED_HZ, &value);
        }
        value = byte;
        return error;
    }

    long message(std::span<const SpidevTransfer> transfers) override {
        if (transfers.empty()) return 0;
        // The count rides in the request's size field; a size that does not
        // fit would make the ioctl a silent no-op.
        const std::size_t bytes = transfers.size() * sizeof(spi_ioc_transfer);
        if (bytes >= (std::size_t{1} << _IOC_SIZEBITS)) return -EMSGSIZE;
        const unsigned long request = _IOC(_IOC_WRITE, SPI_IOC_MAGIC, 0, bytes);
        const int result = ::ioctl(fd_, request, transfers.data());
        return result < 0 ? -static_cast<long>(errno) : result;
    }

    std::optional<std::uint32_t> bufferSize() override {
        std::ifstream in(kBufsizParameter);
        std::uint64_t bytes = 0;
        if (!(in >> bytes) || bytes == 0 || bytes > UINT32_MAX) return std::nullopt;
        return static_cast<std::uint32_t>(bytes);
    }

    void sleep(std::uint64_t microseconds) override { spi::sleepOnMonotonicClock(microseconds); }

private:
    int control(unsigned long request, void* argument) {
        return ::ioctl(fd_, request, argument) < 0 ? errno : 0;
    }

    int fd_;
};

std::unique_ptr<SpidevIo> openLinuxSpidev(const std::string& path, int& error) {
    const int fd = ::open(path.c_str(), O_RDWR | O_CLOEXEC);
    if (fd < 0) {
        error = errno;
        return nullptr;
    }
    error = 0;
    return std::make_unique<LinuxSpidevIo>(fd);
}

}  // namespace

SpidevIoOpener& spidevIoOpener() {
    static SpidevIoOpener opener = &openLinuxSpidev;
    return opener;
}

}  // namespace vorant::ports::spidev
