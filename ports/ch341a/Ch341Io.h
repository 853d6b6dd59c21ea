#pragma once
// The seam between the CH341A cable and USB: find the programmers that are
// plugged in, open one (interface 0 claimed), and move bulk transfers on
// its two pipes. Only the libusb implementation (LibUsbIo.cpp) touches
// USB; tests put a double that speaks the CH341 stream commands behind
// ch341Usb() instead.

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace vorant::ports::ch341a {

// A CH341A in its SPI/I2C personality as USB lists it.
struct Ch341Device {
    int bus = 0;
    int address = 0;
    // The product string the device reports; empty when it cannot be read
    // (no permission to open it, or none given).
    std::string product;
};

enum class BulkResult { Done, TimedOut, Failed };

// One opened CH341A.
class Ch341Io {
public:
    virtual ~Ch341Io() = default;
    // One bulk OUT transfer (the device cuts it into 32-byte packets);
    // Done only when every byte went out.
    virtual BulkResult bulkOut(const std::uint8_t* data, std::size_t length, std::chrono::milliseconds timeout) = 0;
    // One bulk IN transfer of at most `capacity` bytes; a short packet ends
    // it. `received` says how many bytes came.
    virtual BulkResult bulkIn(std::uint8_t* data, std::size_t capacity, std::size_t& received,
                              std::chrono::milliseconds timeout) = 0;
    // Lets time pass on the monotonic clock (a double advances its chip).
    virtual void sleep(std::uint64_t microseconds) = 0;
    // The last failure in USB terms ("LIBUSB_ERROR_PIPE: Pipe error").
    virtual std::string error() const = 0;
    // True once the device has gone from the bus: every further transfer fails.
    virtual bool lost() const = 0;
};

// Why an open was refused.
enum class OpenRefusal { None, Absent, Busy, NoPermission, Failed };

struct Ch341Opening {
    std::unique_ptr<Ch341Io> io;  // set when refusal is None
    OpenRefusal refusal = OpenRefusal::None;
    std::string detail;  // the library's words for a refusal
};

struct Ch341Usb {
    // The CH341As present, in bus order. Throws PortError (Unavailable)
    // when USB cannot be looked at.
    std::function<std::vector<Ch341Device>()> list;
    // Opens one of them: interface 0 claimed, a kernel driver that held it
    // detached first.
    std::function<Ch341Opening(const Ch341Device&)> open;
};

// The USB access the port uses: libusb unless a test has replaced it (a
// test restores it afterwards).
Ch341Usb& ch341Usb();
// Access through libusb-1.0.
Ch341Usb libUsbCh341();

}  // namespace vorant::ports::ch341a
