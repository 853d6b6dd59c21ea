#pragma once
// The seam between the FTDI cable and USB: one channel of an FTDI chip as
// libftdi gives it (bitmode, purge, bulk bytes out, bulk bytes in with the
// per-packet status bytes already stripped, a sleep), plus finding and
// opening devices. LibFtdiIo.cpp is the only file that includes libftdi;
// tests put a double that speaks MPSSE behind ftdiUsb().

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <span>
#include <string>
#include <vector>

namespace vorant::ports::ftdi {

// The chips whose channels have an MPSSE engine; Other is anything else
// (an FT232R, an FT2232D, an unknown bcdDevice).
enum class FtdiChip { Other, FT232H, FT2232H, FT4232H };

struct FtdiUsbId {
    std::uint16_t vendor = 0;
    std::uint16_t product = 0;
    bool operator==(const FtdiUsbId&) const = default;
};

// Where a device sits on USB, so the one listed is the one opened even
// when several share ids and lack serial numbers.
struct FtdiUsbLocation {
    std::uint8_t bus = 0;
    std::uint8_t address = 0;
};

struct FtdiDeviceInfo {
    FtdiUsbId id;
    FtdiUsbLocation location;
    FtdiChip chip = FtdiChip::Other;
    std::string serial;       // empty when the device has none or it could not be read
    std::string description;  // the product string
    // Why the strings could not be read ("no permission"); empty when they could.
    std::string stringsProblem;
};

// Why an open or a listing failed, in the terms the user can act on.
enum class FtdiUsbFailure { None, NotFound, Busy, Permission, Other };

struct FtdiOpenRequest {
    FtdiUsbId id;
    FtdiUsbLocation location;
    char channel = 'A';  // 'A' or 'B'
};

class FtdiIo;

struct FtdiOpening {
    std::unique_ptr<FtdiIo> io;  // null when the open failed
    FtdiUsbFailure failure = FtdiUsbFailure::None;
    std::string detail;  // the library's words for it
};

struct FtdiListing {
    std::vector<FtdiDeviceInfo> devices;
    FtdiUsbFailure failure = FtdiUsbFailure::None;  // USB could not be looked at
    std::string detail;
};

// One opened channel.
class FtdiIo {
public:
    virtual ~FtdiIo() = default;
    // The channel's mode (0x00 reset, 0x02 MPSSE) and pin mask.
    virtual bool setBitmode(std::uint8_t pinMask, std::uint8_t mode) = 0;
    // Drops whatever both FIFOs of the channel hold.
    virtual bool purge() = 0;
    // Puts all the bytes on the bulk OUT pipe.
    virtual bool write(std::span<const std::uint8_t> bytes) = 0;
    // Reads until `into` is full or `timeout` has passed; `got` says how
    // many arrived. False only when USB failed (not for a short reply).
    virtual bool read(std::span<std::uint8_t> into, std::size_t& got, std::chrono::milliseconds timeout) = 0;
    // Lets time pass (a real cable sleeps; a double advances its chip).
    virtual void sleep(std::uint64_t microseconds) = 0;
    // True once the device is gone from USB: every further call fails.
    virtual bool lost() const = 0;
    // Why the last call failed.
    virtual std::string error() const = 0;
};

// Finding and opening devices. The default is libftdi; a test replaces
// both and restores them.
struct FtdiUsb {
    std::function<FtdiListing(std::span<const FtdiUsbId> ids)> list;
    std::function<FtdiOpening(const FtdiOpenRequest& request)> open;
};
FtdiUsb& ftdiUsb();
// libftdi's, for restoring after a test.
FtdiUsb libFtdiUsb();

}  // namespace vorant::ports::ftdi
