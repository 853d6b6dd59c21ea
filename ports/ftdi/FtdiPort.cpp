#include "ports/ftdi/FtdiPort.h"

#include "host/Port_MsgManData.h"
#include "ports/PortError.h"
#include "ports/ftdi/FtdiRequest.h"
#include "ports/ftdi/MpsseBus.h"
#include "ports/spi/SpiCablePort.h"

#include <cstdio>

namespace vorant::ports::ftdi {

namespace {

struct KnownChip {
    FtdiUsbId id;
    FtdiChip chip;
    const char* name;
};
constexpr KnownChip kKnownChips[] = {
    {{0x0403, 0x6014}, FtdiChip::FT232H, "FT232H"},
    {{0x0403, 0x6010}, FtdiChip::FT2232H, "FT2232H"},
    {{0x0403, 0x6011}, FtdiChip::FT4232H, "FT4232H"},
};

const char* chipName(FtdiChip chip) {
    for (const KnownChip& known : kKnownChips)
        if (known.chip == chip) return known.name;
    return "FTDI device";
}

std::string hex4(std::uint16_t value) {
    char text[5];
    std::snprintf(text, sizeof text, "%04x", value);
    return text;
}

std::string usbId(const FtdiUsbId& id) { return hex4(id.vendor) + ":" + hex4(id.product); }

// A --port value that opens this device.
std::string addressOf(const FtdiDeviceInfo& device) {
    return "ftdi:" + usbId(device.id) + (device.serial.empty() ? "" : ",serial=" + device.serial);
}

// "FT232H 0403:6014, serial FT4ABC12 (bus 1 device 7)"
std::string describe(const FtdiDeviceInfo& device) {
    return std::string(chipName(device.chip)) + " " + usbId(device.id) +
           (device.serial.empty() ? "" : ", serial " + device.serial) + " (bus " + std::to_string(device.location.bus) +
           " device " + std::to_string(device.location.address) + ")";
}

std::string udevRule(std::uint16_t product) {
    return "SUBSYSTEM==\"usb\", ATTR{idVendor}==\"0403\", ATTR{idProduct}==\"" + hex4(product) +
           "\", MODE=\"0660\", GROUP=\"plugdev\"";
}

std::string udevAdvice(const FtdiUsbId& id) {
    return "add the udev rule " + udevRule(id.product) +
           " to a file in /etc/udev/rules.d/ (one line per product id: 6014 FT232H, 6010 FT2232H, 6011 FT4232H), run "
           "'udevadm control --reload', replug the cable, and be a member of group plugdev";
}

std::string hertz(double hz) {
    char text[32];
    if (hz >= 1e6)
        std::snprintf(text, sizeof text, "%.6g MHz", hz / 1e6);
    else if (hz >= 1e3)
        std::snprintf(text, sizeof text, "%.6g kHz", hz / 1e3);
    else
        std::snprintf(text, sizeof text, "%.6g Hz", hz);
    return text;
}

[[noreturn]] void unavailable(const PortAddress& address, const std::string& why) {
    throw PortError(PortError::Kind::Unavailable, "--port " + address.text + ": " + why);
}
[[noreturn]] void badRequest(const PortAddress& address, const std::string& why) {
    throw PortError(PortError::Kind::BadRequest, "--port " + address.text + ": " + why);
}

std::vector<FtdiUsbId> idsToLookFor(const FtdiRequest& request) {
    if (request.id) return {*request.id};
    std::vector<FtdiUsbId> ids;
    for (const KnownChip& known : kKnownChips) ids.push_back(known.id);
    return ids;
}

std::string lookedFor(const std::vector<FtdiUsbId>& ids) {
    std::string text;
    for (const FtdiUsbId& id : ids) {
        text += (text.empty() ? "" : ", ") + usbId(id);
        for (const KnownChip& known : kKnownChips)
            if (known.id == id) text += std::string(" (") + known.name + ")";
    }
    return text;
}

// The one device the request means.
FtdiDeviceInfo chooseDevice(const PortAddress& address, const FtdiRequest& request) {
    const std::vector<FtdiUsbId> ids = idsToLookFor(request);
    const FtdiListing listing = ftdiUsb().list(ids);
    if (listing.failure != FtdiUsbFailure::None)
        unavailable(address, "cannot look for FTDI devices: " + listing.detail + "; check that USB is reachable");
    std::vector<FtdiDeviceInfo> matches;
    bool unreadable = false;
    for (const FtdiDeviceInfo& device : listing.devices) {
        if (request.serial.empty() || device.serial == request.serial) matches.push_back(device);
        unreadable = unreadable || !device.stringsProblem.empty();
    }
    if (matches.empty()) {
        if (listing.devices.empty())
            unavailable(address, "no FTDI device found (looked for " + lookedFor(ids) +
                                     "); plug the cable in, or give its VID:PID as ftdi:VID:PID");
        std::string found;
        for (const FtdiDeviceInfo& device : listing.devices) found += (found.empty() ? "" : ", ") + describe(device);
        if (unreadable)
            unavailable(address, "no FTDI device with serial " + request.serial + " among " + found +
                                     ", and the serial of some cannot be read (no permission); " +
                                     udevAdvice(listing.devices.front().id));
        unavailable(address, "no FTDI device with serial " + request.serial + " (found " + found +
                                 "); give one of their serials, or none");
    }
    if (matches.size() > 1) {
        std::string found;
        for (const FtdiDeviceInfo& device : matches) found += (found.empty() ? "" : "; ") + addressOf(device);
        unavailable(address, std::to_string(matches.size()) + " FTDI devices found (" + found +
                                 "); say which with serial= (vorant-spi ports lists them)");
    }
    return matches.front();
}

void checkChannel(const PortAddress& address, const FtdiRequest& request, const FtdiDeviceInfo& device) {
    if (device.chip == FtdiChip::Other)
        badRequest(address, describe(device) +
                                " is not an FT232H, FT2232H or FT4232H (its bcdDevice says otherwise), so it has no "
                                "MPSSE engine vorant-spi can drive");
    if (device.chip == FtdiChip::FT232H && request.channel != 'A')
        badRequest(address, "interface=" + std::string(1, request.channel) + ": the " + describe(device) +
                                " has one channel, A; leave interface= out");
}

std::unique_ptr<FtdiIo> openChannel(const PortAddress& address, const FtdiRequest& request,
                                    const FtdiDeviceInfo& device) {
    FtdiOpening opening = ftdiUsb().open({device.id, device.location, request.channel});
    if (opening.io) return std::move(opening.io);
    const std::string what = "cannot open interface " + std::string(1, request.channel) + " of the " + describe(device);
    switch (opening.failure) {
        case FtdiUsbFailure::Permission:
            unavailable(address, what + ": " + opening.detail + "; " + udevAdvice(device.id));
        case FtdiUsbFailure::Busy:
            unavailable(address, what + ": it is in use" + (opening.detail.empty() ? "" : " (" + opening.detail + ")") +
                                     ": another program has claimed it, or the kernel's ftdi_sio driver holds it and "
                                     "could not be detached; close the other program, or unbind ftdi_sio "
                                     "(sudo rmmod ftdi_sio)");
        case FtdiUsbFailure::NotFound:
            unavailable(address, what + ": " + opening.detail + "; plug it in again");
        default:
            unavailable(address, what + ": " + opening.detail + "; replug the cable and try again");
    }
}

std::unique_ptr<Port> open(const PortAddress& address, const PortContext&) {
    const FtdiRequest request = parseFtdiRequest(address);
    const FtdiDeviceInfo device = chooseDevice(address, request);
    checkChannel(address, request, device);
    auto bus = std::make_unique<MpsseBus>(openChannel(address, request, device),
                                          MpsseSettings{request.divisor, request.chipSelectPin});
    if (!bus->start())
        unavailable(address,
                    "the " + describe(device) + ", interface " + std::string(1, request.channel) + ": " + bus->error());
    const double sck = mpsseClockHz(request.divisor);
    const std::string said = "FTDI " + describe(device) + ", interface " + std::string(1, request.channel) + ": SCK " +
                             hertz(sck) + ", chip select on ADBUS" + std::to_string(request.chipSelectPin);
    if (sck != request.speedHz)
        Port_MsgManData::createObject("vorant-spi", "ports/ftdi", __LINE__, VORANT_REVISION)
            .issueInfo("%s (speed=%s is not one of the steps 30 MHz / N; this is the next one below it)\n",
                       said.c_str(), hertz(request.speedHz).c_str());
    else
        Port_MsgManData::debugStub("%s\n", said.c_str());
    return std::make_unique<spi::SpiCable>("FTDI " + describe(device), std::move(bus));
}

std::vector<FoundCable> discover() {
    std::vector<FtdiUsbId> ids;
    for (const KnownChip& known : kKnownChips) ids.push_back(known.id);
    const FtdiListing listing = ftdiUsb().list(ids);
    if (listing.failure != FtdiUsbFailure::None)
        throw PortError(PortError::Kind::Unavailable, "ftdi: cannot look for FTDI devices: " + listing.detail);
    std::vector<FoundCable> found;
    for (const FtdiDeviceInfo& device : listing.devices) {
        std::string text = chipName(device.chip);
        if (!device.description.empty()) text += " '" + device.description + "'";
        if (!device.serial.empty()) text += ", serial " + device.serial;
        if (device.chip == FtdiChip::FT2232H || device.chip == FtdiChip::FT4232H) text += ", interfaces A and B";
        if (!device.stringsProblem.empty())
            text += " (its serial cannot be read: " + device.stringsProblem + "; add the udev rule " +
                    udevRule(device.id.product) + ")";
        found.push_back({addressOf(device), text});
    }
    return found;
}

}  // namespace

const PortInfo& ftdiPortInfo() {
    static const PortInfo row = [] {
        PortInfo info;
        info.name = "ftdi";
        info.synopsis = {
            {"ftdi[:VID:PID]",
             "an FT232H, FT2232H or FT4232H as SPI master through its MPSSE engine (SCK ADBUS0, MOSI ADBUS1, MISO "
             "ADBUS2, chip select ADBUS3); without VID:PID the one such chip on USB"},
        };
        info.path = PathUse::Optional;
        info.pathName = "VID:PID";
        info.keys = {
            {"interface", "A|B", "the chip's channel (default A; an FT4232H has MPSSE on A and B only)"},
            {"serial", "S", "the device with this USB serial number, when several are plugged in"},
            {"speed", "HZ", "the SPI clock, 458 to 30000000 Hz (default 6000000; rounded down to a step of 30 MHz/N)"},
            {"cs", "PIN", "the chip select pin, ADBUS3 to ADBUS7 (default ADBUS3)"},
        };
        info.caps = {
            .readsBack = true, .records = false, .simulatesChip = false, .hasBusClock = false, .takesSimFaults = false};
        info.open = &open;
        info.discover = &discover;
        return info;
    }();
    return row;
}

}  // namespace vorant::ports::ftdi
