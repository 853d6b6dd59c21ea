// The FTDI seam on libftdi1 (and, for what libftdi does not say, the
// libusb it runs on): the only file that includes either.

#include "ports/ftdi/FtdiIo.h"
#include "ports/spi/MonotonicSleep.h"

#include <libftdi1/ftdi.h>
#include <libusb.h>

#include <cstring>

namespace vorant::ports::ftdi {

namespace {

// The latency timer: how long the chip holds a short reply that no send
// immediate flushed. Every reply here ends in one, so this only bounds
// the status-only packets a read waits through.
constexpr unsigned char kLatencyMs = 2;
// One USB read returns at the latest after this; the caller's deadline
// decides how many it waits through.
constexpr int kUsbReadTimeoutMs = 50;
constexpr int kUsbWriteTimeoutMs = 5000;
constexpr std::uint8_t kVendorRequestIn =
    static_cast<std::uint8_t>(LIBUSB_REQUEST_TYPE_VENDOR) | static_cast<std::uint8_t>(LIBUSB_ENDPOINT_IN);

FtdiChip chipOf(std::uint16_t bcdDevice) {
    switch (bcdDevice) {
        case 0x0700:
            return FtdiChip::FT2232H;
        case 0x0800:
            return FtdiChip::FT4232H;
        case 0x0900:
            return FtdiChip::FT232H;
        default:
            return FtdiChip::Other;
    }
}

class LibFtdiIo final : public FtdiIo {
public:
    explicit LibFtdiIo(ftdi_context* context) : context_(context) {}
    ~LibFtdiIo() override {
        ftdi_usb_close(context_);  // also frees the handle of a device that is gone
        ftdi_free(context_);
    }

    bool setBitmode(std::uint8_t pinMask, std::uint8_t mode) override {
        return check(ftdi_set_bitmode(context_, pinMask, mode), "set_bitmode");
    }
    bool purge() override { return check(ftdi_tcioflush(context_), "purge"); }

    bool write(std::span<const std::uint8_t> bytes) override {
        std::size_t done = 0;
        while (done < bytes.size()) {
            const int n = ftdi_write_data(context_, bytes.data() + done, static_cast<int>(bytes.size() - done));
            if (!check(n, "bulk write")) return false;
            done += static_cast<std::size_t>(n);
        }
        return true;
    }

    bool read(std::span<std::uint8_t> into, std::size_t& got, std::chrono::milliseconds timeout) override {
        got = 0;
        const auto deadline = std::chrono::steady_clock::now() + timeout;
        while (got < into.size()) {
            // Returns what has come, 0 on a packet with only status bytes.
            const int n = ftdi_read_data(context_, into.data() + got, static_cast<int>(into.size() - got));
            if (!check(n, "bulk read")) return false;
            got += static_cast<std::size_t>(n);
            if (got < into.size() && std::chrono::steady_clock::now() >= deadline) break;
        }
        return true;
    }

    void sleep(std::uint64_t microseconds) override { spi::sleepOnMonotonicClock(microseconds); }
    bool lost() const override { return lost_; }
    std::string error() const override { return error_; }

private:
    // A failed call: its words, and whether the device is still there (a
    // control request to a device that is gone fails with NO_DEVICE, which
    // libftdi's bulk calls do not pass on).
    bool check(int result, const char* what) {
        if (result >= 0) return true;
        error_ = std::string(what) + ": " + ftdi_get_error_string(context_);
        if (context_->usb_dev == nullptr) {  // libftdi closed it
            lost_ = true;
            return false;
        }
        unsigned char status[2];
        const int probe = libusb_control_transfer(context_->usb_dev, kVendorRequestIn, SIO_POLL_MODEM_STATUS_REQUEST, 0,
                                                  static_cast<std::uint16_t>(context_->index), status, 2, 100);
        if (probe == LIBUSB_ERROR_NO_DEVICE) {
            lost_ = true;
            error_ += " (" + std::string(libusb_strerror(static_cast<libusb_error>(probe))) + ")";
        }
        return false;
    }

    ftdi_context* context_;
    bool lost_ = false;
    std::string error_;
};

// Calls `visit(device, descriptor)` for each USB device.
template <class Visit>
bool forEachUsbDevice(libusb_context* usb, std::string& error, Visit visit) {
    libusb_device** list = nullptr;
    const ssize_t count = libusb_get_device_list(usb, &list);
    if (count < 0) {
        error = std::string("cannot list USB devices: ") + libusb_strerror(static_cast<libusb_error>(count));
        return false;
    }
    for (ssize_t i = 0; i < count; ++i) {
        libusb_device_descriptor descriptor{};
        if (libusb_get_device_descriptor(list[i], &descriptor) == 0) visit(list[i], descriptor);
    }
    libusb_free_device_list(list, 1);
    return true;
}

std::string stringDescriptor(libusb_device_handle* handle, std::uint8_t index) {
    if (index == 0) return {};
    unsigned char text[256];
    const int n = libusb_get_string_descriptor_ascii(handle, index, text, sizeof text);
    return n > 0 ? std::string(reinterpret_cast<const char*>(text), static_cast<std::size_t>(n)) : std::string();
}

FtdiListing listDevices(std::span<const FtdiUsbId> ids) {
    FtdiListing listing;
    libusb_context* usb = nullptr;
    if (const int rc = libusb_init(&usb); rc != 0) {
        listing.failure = FtdiUsbFailure::Other;
        listing.detail = std::string("libusb cannot start: ") + libusb_strerror(static_cast<libusb_error>(rc));
        return listing;
    }
    const bool listed =
        forEachUsbDevice(usb, listing.detail, [&](libusb_device* device, const libusb_device_descriptor& d) {
            const FtdiUsbId id{d.idVendor, d.idProduct};
            bool wanted = false;
            for (const FtdiUsbId& candidate : ids) wanted = wanted || candidate == id;
            if (!wanted) return;
            FtdiDeviceInfo info;
            info.id = id;
            info.location = {libusb_get_bus_number(device), libusb_get_device_address(device)};
            info.chip = chipOf(d.bcdDevice);
            libusb_device_handle* handle = nullptr;
            const int rc = libusb_open(device, &handle);
            if (rc == 0) {
                info.description = stringDescriptor(handle, d.iProduct);
                info.serial = stringDescriptor(handle, d.iSerialNumber);
                libusb_close(handle);
            } else {
                info.stringsProblem = rc == LIBUSB_ERROR_ACCESS ? "no permission to open it"
                                                                : libusb_strerror(static_cast<libusb_error>(rc));
            }
            listing.devices.push_back(std::move(info));
        });
    if (!listed) listing.failure = FtdiUsbFailure::Other;
    libusb_exit(usb);
    return listing;
}

FtdiOpening openDevice(const FtdiOpenRequest& request) {
    FtdiOpening opening;
    auto failed = [&opening](FtdiUsbFailure failure, std::string detail) {
        opening.failure = failure;
        opening.detail = std::move(detail);
        return std::move(opening);
    };
    ftdi_context* context = ftdi_new();
    if (context == nullptr) return failed(FtdiUsbFailure::Other, "libftdi cannot start (libusb_init failed)");
    std::unique_ptr<ftdi_context, void (*)(ftdi_context*)> owned(context, ftdi_free);
    if (ftdi_set_interface(context, request.channel == 'B' ? INTERFACE_B : INTERFACE_A) < 0)
        return failed(FtdiUsbFailure::Other, ftdi_get_error_string(context));

    libusb_device* found = nullptr;
    std::string error;
    forEachUsbDevice(context->usb_ctx, error, [&](libusb_device* device, const libusb_device_descriptor& d) {
        if (d.idVendor == request.id.vendor && d.idProduct == request.id.product &&
            libusb_get_bus_number(device) == request.location.bus &&
            libusb_get_device_address(device) == request.location.address)
            found = libusb_ref_device(device);
    });
    if (found == nullptr) return failed(FtdiUsbFailure::NotFound, error.empty() ? "it is no longer on USB" : error);
    std::unique_ptr<libusb_device, void (*)(libusb_device*)> device(found, libusb_unref_device);

    // libftdi reports a refused open without libusb's reason; ask libusb.
    libusb_device_handle* handle = nullptr;
    const int rc = libusb_open(device.get(), &handle);
    if (rc == LIBUSB_ERROR_ACCESS) return failed(FtdiUsbFailure::Permission, "no permission to open it");
    if (rc == LIBUSB_ERROR_NO_DEVICE) return failed(FtdiUsbFailure::NotFound, "it is no longer on USB");
    if (rc != 0) return failed(FtdiUsbFailure::Other, libusb_strerror(static_cast<libusb_error>(rc)));
    libusb_close(handle);

    // libftdi detaches the kernel's ftdi_sio from the interface it claims.
    const int opened = ftdi_usb_open_dev(context, device.get());
    if (opened < 0) {
        const std::string words = ftdi_get_error_string(context);
        if (words.find("permission") != std::string::npos) return failed(FtdiUsbFailure::Permission, words);
        if (words.find("claim") != std::string::npos || words.find("detach") != std::string::npos)
            return failed(FtdiUsbFailure::Busy, words);
        return failed(FtdiUsbFailure::Other, words);
    }
    if (ftdi_usb_reset(context) < 0 || ftdi_set_latency_timer(context, kLatencyMs) < 0) {
        const std::string words = ftdi_get_error_string(context);
        ftdi_usb_close(context);
        return failed(FtdiUsbFailure::Other, words);
    }
    context->usb_read_timeout = kUsbReadTimeoutMs;
    context->usb_write_timeout = kUsbWriteTimeoutMs;
    owned.release();
    opening.io = std::make_unique<LibFtdiIo>(context);
    return opening;
}

}  // namespace

FtdiUsb libFtdiUsb() { return FtdiUsb{&listDevices, &openDevice}; }

FtdiUsb& ftdiUsb() {
    static FtdiUsb usb = libFtdiUsb();
    return usb;
}

}  // namespace vorant::ports::ftdi
