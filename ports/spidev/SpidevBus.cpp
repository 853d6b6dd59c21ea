#include "ports/spidev/SpidevBus.h"

#include <algorithm>
#include <cerrno>
#include <cstring>

namespace vorant::ports::spidev {

namespace {

// SPI_IOC_MESSAGE carries its transfer count in the request's size field:
// 511 transfers fit on most architectures, 255 on all of them.
constexpr std::size_t kMostTransfers = 255;

std::uint64_t address(const void* buffer) {
    return static_cast<std::uint64_t>(reinterpret_cast<std::uintptr_t>(buffer));
}

// Errors after which the node answers nothing more: the device was
// removed, or its controller or driver went away.
bool meansGone(int error) { return error == ENODEV || error == ESHUTDOWN || error == ENXIO; }

std::string tooLarge(std::uint64_t bytes, std::uint32_t bufferBytes) {
    return "a transaction of " + std::to_string(bytes) +
           " bytes is larger than the spidev driver's buffer (spidev.bufsiz, " + std::to_string(bufferBytes) +
           " bytes); " + raiseBufsizAdvice(bytes);
}

}  // namespace

std::string raiseBufsizAdvice(std::uint64_t neededBytes) {
    std::uint64_t size = 4096;
    while (size < neededBytes) size *= 2;
    const std::string value = std::to_string(size);
    return "raise it with the kernel parameter spidev.bufsiz=" + value + " (or 'modprobe spidev bufsiz=" + value +
           "' where spidev is a module) and restart";
}

SpidevBus::SpidevBus(std::unique_ptr<SpidevIo> io, std::uint32_t speedHz, std::uint32_t bufferBytes)
    : io_(std::move(io)), speedHz_(speedHz), bufferBytes_(bufferBytes) {}

bool SpidevBus::fail(std::string why) {
    error_ = std::move(why);
    return false;
}

bool SpidevBus::transact(std::span<const spi::SpiSegment> segments) {
    if (lost_) return false;
    transfers_.clear();
    std::uint64_t total = 0;
    for (const spi::SpiSegment& segment : segments) {
        if (segment.length == 0) continue;
        SpidevTransfer transfer;
        // A read that sends zeros leaves tx empty: the kernel shifts zeros
        // for it, and the message says plainly which bytes are read.
        const bool sendsZeros =
            segment.mosi == nullptr ||
            (segment.miso != nullptr &&
             std::all_of(segment.mosi, segment.mosi + segment.length, [](std::uint8_t b) { return b == 0; }));
        transfer.txBuffer = sendsZeros ? 0 : address(segment.mosi);
        transfer.rxBuffer = address(segment.miso);
        transfer.length = static_cast<std::uint32_t>(std::min<std::size_t>(segment.length, UINT32_MAX));
        // Speed and word size go with every transfer: the node's defaults
        // are shared with every other program that opens it.
        transfer.speedHz = speedHz_;
        transfer.bitsPerWord = 8;
        transfers_.push_back(transfer);
        total += segment.length;
    }
    if (transfers_.empty()) return true;
    if (total > bufferBytes_) return fail(tooLarge(total, bufferBytes_));
    if (transfers_.size() > kMostTransfers)
        return fail("a transaction of " + std::to_string(transfers_.size()) + " shifts; one spidev message takes " +
                    std::to_string(kMostTransfers) + " at most");

    const long result = io_->message(transfers_);
    if (result < 0) {
        const int error = static_cast<int>(-result);
        // Current kernels also count each transfer's alignment against
        // the buffer, so a transaction near the limit may still not fit.
        if (error == EMSGSIZE) return fail(tooLarge(total, bufferBytes_));
        lost_ = meansGone(error);
        return fail(std::string("SPI_IOC_MESSAGE failed: ") + std::strerror(error) +
                    (lost_ ? "; the SPI device is gone (controller removed or spidev unbound): check the board and "
                             "run again"
                           : ""));
    }
    // SPI has no acknowledge; the byte count is the one thing the driver
    // confirms, and a wrong one means the reply cannot be trusted.
    if (static_cast<std::uint64_t>(result) != total)
        return fail("SPI_IOC_MESSAGE moved " + std::to_string(result) + " bytes of a " + std::to_string(total) +
                    "-byte transaction; the reply is not used");
    return true;
}

bool SpidevBus::pause(std::uint64_t microseconds) {
    if (lost_) return false;
    io_->sleep(microseconds);
    return true;
}

}  // namespace vorant::ports::spidev
