// The CH341A through libusb-1.0: the only file that speaks to USB.

#include "ports/PortError.h"
#include "ports/ch341a/Ch341Io.h"
#include "ports/spi/MonotonicSleep.h"

#include <libusb.h>

#include <algorithm>

namespace vorant::ports::ch341a {

namespace {

constexpr std::uint16_t kVendor = 0x1a86, kProduct = 0x5512;
constexpr int kInterface = 0;
constexpr unsigned char kBulkOut = 0x02, kBulkIn = 0x82;

std::string describe(int code) {
    return std::string(libusb_error_name(code)) + ": " + libusb_strerror(static_cast<libusb_error>(code));
}

// One libusb context for the life of whatever holds it.
class Context {
public:
    Context() : status_(libusb_init(&context_)) {}
    ~Context() {
        if (status_ == 0) libusb_exit(context_);
    }
    Context(const Context&) = delete;
    Context& operator=(const Context&) = delete;
    int status() const { return status_; }
    libusb_context* get() const { return context_; }

private:
    libusb_context* context_ = nullptr;
    int status_;
};

// The device list of a context, freed with it.
class DeviceList {
public:
    explicit DeviceList(libusb_context* context) : count_(libusb_get_device_list(context, &devices_)) {}
    ~DeviceList() {
        if (count_ >= 0) libusb_free_device_list(devices_, 1);
    }
    DeviceList(const DeviceList&) = delete;
    DeviceList& operator=(const DeviceList&) = delete;
    ssize_t count() const { return count_; }
    libusb_device* operator[](ssize_t i) const { return devices_[i]; }

private:
    libusb_device** devices_ = nullptr;
    ssize_t count_;
};

bool isCh341a(libusb_device* device) {
    libusb_device_descriptor descriptor{};
    return libusb_get_device_descriptor(device, &descriptor) == 0 && descriptor.idVendor == kVendor &&
           descriptor.idProduct == kProduct;
}

std::string productString(libusb_device* device) {
    libusb_device_descriptor descriptor{};
    libusb_device_handle* handle = nullptr;
    if (libusb_get_device_descriptor(device, &descriptor) != 0 || descriptor.iProduct == 0 ||
        libusb_open(device, &handle) != 0)
        return {};
    unsigned char text[128] = {};
    const int length = libusb_get_string_descriptor_ascii(handle, descriptor.iProduct, text, sizeof text);
    libusb_close(handle);
    return length > 0 ? std::string(reinterpret_cast<const char*>(text), static_cast<std::size_t>(length)) : "";
}

class LibUsbIo final : public Ch341Io {
public:
    LibUsbIo(std::unique_ptr<Context> context, libusb_device_handle* handle)
        : context_(std::move(context)), handle_(handle) {}
    ~LibUsbIo() override {
        libusb_release_interface(handle_, kInterface);
        libusb_close(handle_);
    }

    BulkResult bulkOut(const std::uint8_t* data, std::size_t length, std::chrono::milliseconds timeout) override {
        int sent = 0;
        const int status = libusb_bulk_transfer(handle_, kBulkOut, const_cast<unsigned char*>(data),
                                                static_cast<int>(length), &sent, timeoutOf(timeout));
        if (status == 0 && static_cast<std::size_t>(sent) != length) {
            error_ = "only " + std::to_string(sent) + " of " + std::to_string(length) + " bytes went out";
            return BulkResult::Failed;
        }
        return result(status);
    }

    BulkResult bulkIn(std::uint8_t* data, std::size_t capacity, std::size_t& received,
                      std::chrono::milliseconds timeout) override {
        int got = 0;
        const int status =
            libusb_bulk_transfer(handle_, kBulkIn, data, static_cast<int>(capacity), &got, timeoutOf(timeout));
        received = static_cast<std::size_t>(got);
        return result(status);
    }

    void sleep(std::uint64_t microseconds) override { spi::sleepOnMonotonicClock(microseconds); }
    std::string error() const override { return error_; }
    bool lost() const override { return lost_; }

private:
    static unsigned timeoutOf(std::chrono::milliseconds timeout) {
        // libusb takes 0 as "no timeout": a wait is always bounded here.
        return static_cast<unsigned>(std::max<std::chrono::milliseconds::rep>(timeout.count(), 1));
    }
    BulkResult result(int status) {
        if (status == 0) return BulkResult::Done;
        error_ = describe(status);
        if (status == LIBUSB_ERROR_NO_DEVICE) lost_ = true;
        return status == LIBUSB_ERROR_TIMEOUT ? BulkResult::TimedOut : BulkResult::Failed;
    }

    std::unique_ptr<Context> context_;
    libusb_device_handle* handle_;
    std::string error_;
    bool lost_ = false;
};

OpenRefusal refusalOf(int status) {
    switch (status) {
        case LIBUSB_ERROR_ACCESS:
            return OpenRefusal::NoPermission;
        case LIBUSB_ERROR_BUSY:
            return OpenRefusal::Busy;
        case LIBUSB_ERROR_NO_DEVICE:
        case LIBUSB_ERROR_NOT_FOUND:
            return OpenRefusal::Absent;
        default:
            return OpenRefusal::Failed;
    }
}

std::vector<Ch341Device> listDevices() {
    Context context;
    if (context.status() != 0)
        throw PortError(PortError::Kind::Unavailable, "ch341a: libusb cannot start: " + describe(context.status()));
    DeviceList devices(context.get());
    if (devices.count() < 0)
        throw PortError(PortError::Kind::Unavailable,
                        "ch341a: cannot list the USB devices: " + describe(static_cast<int>(devices.count())));
    std::vector<Ch341Device> found;
    for (ssize_t i = 0; i < devices.count(); ++i)
        if (isCh341a(devices[i]))
            found.push_back(
                {libusb_get_bus_number(devices[i]), libusb_get_device_address(devices[i]), productString(devices[i])});
    return found;
}

Ch341Opening openDevice(const Ch341Device& wanted) {
    auto context = std::make_unique<Context>();
    if (context->status() != 0) return {nullptr, OpenRefusal::Failed, describe(context->status())};
    libusb_device_handle* handle = nullptr;
    {
        DeviceList devices(context->get());
        for (ssize_t i = 0; i < devices.count() && handle == nullptr; ++i) {
            if (!isCh341a(devices[i]) || libusb_get_bus_number(devices[i]) != wanted.bus ||
                libusb_get_device_address(devices[i]) != wanted.address)
                continue;
            if (const int status = libusb_open(devices[i], &handle); status != 0)
                return {nullptr, refusalOf(status), describe(status)};
        }
    }
    if (handle == nullptr) return {nullptr, OpenRefusal::Absent, "no such device on the bus"};
    // A kernel driver (the ch341 UART or an SPI driver) may hold the
    // interface; libusb gives it back when the interface is released.
    if (libusb_set_auto_detach_kernel_driver(handle, 1) != 0 && libusb_kernel_driver_active(handle, kInterface) == 1) {
        if (const int status = libusb_detach_kernel_driver(handle, kInterface); status != 0) {
            libusb_close(handle);
            return {nullptr, refusalOf(status), "a kernel driver holds it: " + describe(status)};
        }
    }
    if (const int status = libusb_claim_interface(handle, kInterface); status != 0) {
        libusb_close(handle);
        return {nullptr, refusalOf(status), describe(status)};
    }
    return {std::make_unique<LibUsbIo>(std::move(context), handle), OpenRefusal::None, {}};
}

}  // namespace

Ch341Usb libUsbCh341() { return {&listDevices, &openDevice}; }

Ch341Usb& ch341Usb() {
    static Ch341Usb usb = libUsbCh341();
    return usb;
}

}  // namespace vorant::ports::ch341a
