#include "ports/ch341a/Ch341aPort.h"

#include "ports/PortError.h"
#include "ports/ch341a/Ch341aBus.h"
#include "ports/spi/SpiCablePort.h"

#include <optional>

namespace vorant::ports::ch341a {

namespace {

constexpr const char* kUdevRule =
    R"(SUBSYSTEM=="usb", ATTR{idVendor}=="1a86", ATTR{idProduct}=="5512", MODE="0660", GROUP="plugdev")";

struct UsbLocation {
    int bus = 0;
    int address = 0;
};

std::string addressOf(int bus, int address) { return "ch341a:" + std::to_string(bus) + ":" + std::to_string(address); }
std::string addressOf(const Ch341Device& device) { return addressOf(device.bus, device.address); }

// A decimal number from 1 to `most` (leading zeros allowed, as lsusb
// prints them); nothing otherwise.
std::optional<int> numberIn(const std::string& text, int most) {
    if (text.empty() || text.size() > 3 || text.find_first_not_of("0123456789") != std::string::npos)
        return std::nullopt;
    const int value = std::stoi(text);
    if (value < 1 || value > most) return std::nullopt;
    return value;
}

// "BUS:ADDR" as `vorant-spi ports` lists it.
UsbLocation locationOf(const PortAddress& address) {
    const std::size_t colon = address.path.find(':');
    const std::optional<int> bus =
        colon == std::string::npos ? std::nullopt : numberIn(address.path.substr(0, colon), 255);
    const std::optional<int> device =
        colon == std::string::npos ? std::nullopt : numberIn(address.path.substr(colon + 1), 127);
    if (!bus || !device)
        throw PortError(PortError::Kind::BadRequest,
                        "--port " + address.text + ": '" + address.path +
                            "' is not BUS:ADDR; give the USB bus (1 to 255) and address (1 to 127) that "
                            "'vorant-spi ports' lists, such as ch341a:1:5");
    return {*bus, *device};
}

std::string list(const std::vector<Ch341Device>& devices) {
    std::string text;
    for (const Ch341Device& device : devices) text += (text.empty() ? "" : ", ") + addressOf(device);
    return text;
}

[[noreturn]] void unavailable(const std::string& message) { throw PortError(PortError::Kind::Unavailable, message); }

// The device the address names, or the only one there is.
Ch341Device choose(const PortAddress& address) {
    const std::string port = "--port " + address.text;
    const std::vector<Ch341Device> found = ch341Usb().list();
    if (!address.hasPath) {
        if (found.size() == 1) return found.front();
        if (found.empty())
            unavailable(port +
                        ": cannot open a CH341A: none is plugged in (no USB device 1a86:5512); plug it in "
                        "with its mode jumper in the SPI/I2C position (as a serial adapter it is 1a86:5523)");
        throw PortError(PortError::Kind::BadRequest,
                        port + ": cannot choose a CH341A: " + std::to_string(found.size()) + " are plugged in (" +
                            list(found) + "); name one with --port ch341a:BUS:ADDR");
    }
    const UsbLocation wanted = locationOf(address);
    for (const Ch341Device& device : found)
        if (device.bus == wanted.bus && device.address == wanted.address) return device;
    unavailable(port + ": cannot open a CH341A: there is none at USB bus " + std::to_string(wanted.bus) + " address " +
                std::to_string(wanted.address) + " (" +
                (found.empty() ? std::string("none is plugged in") : "found: " + list(found)) +
                "); give one that 'vorant-spi ports' lists");
}

std::unique_ptr<Port> open(const PortAddress& address, const PortContext&) {
    // A malformed address is refused before USB is looked at.
    if (address.hasPath) locationOf(address);
    const Ch341Device device = choose(address);
    Ch341Opening opening = ch341Usb().open(device);
    const std::string failed = "--port " + address.text + ": cannot open the CH341A at USB bus " +
                               std::to_string(device.bus) + " address " + std::to_string(device.address) + ": ";
    switch (opening.refusal) {
        case OpenRefusal::None:
            break;
        case OpenRefusal::NoPermission:
            unavailable(failed + "no permission (" + opening.detail + "); add the udev rule " + kUdevRule +
                        " to a file in /etc/udev/rules.d/, reload the rules, replug the programmer and be in group "
                        "plugdev");
        case OpenRefusal::Busy:
            unavailable(failed + "another program or driver holds it (" + opening.detail + "); close that program");
        case OpenRefusal::Absent:
            unavailable(failed + "it went away (" + opening.detail + "); plug it in again");
        case OpenRefusal::Failed:
            unavailable(failed + opening.detail + "; unplug the programmer and plug it in again");
    }
    return openCh341aCable(std::move(opening.io), addressOf(device));
}

std::vector<FoundCable> discover() {
    std::vector<FoundCable> cables;
    for (const Ch341Device& device : ch341Usb().list()) {
        std::string description =
            "CH341A programmer, USB bus " + std::to_string(device.bus) + " address " + std::to_string(device.address);
        if (!device.product.empty()) description += ", \"" + device.product + "\"";
        cables.push_back({addressOf(device), description});
    }
    return cables;
}

}  // namespace

std::unique_ptr<Port> openCh341aCable(std::unique_ptr<Ch341Io> io, const std::string& name) {
    auto bus = std::make_unique<Ch341aBus>(std::move(io));
    if (!bus->start()) unavailable(name + ": setting the CH341A up for SPI failed: " + bus->error());
    return std::make_unique<spi::SpiCable>(name, std::move(bus));
}

const PortInfo& ch341aPortInfo() {
    static const PortInfo row = [] {
        PortInfo info;
        info.name = "ch341a";
        info.synopsis = {
            {"ch341a[:BUS:ADDR]",
             "a CH341A USB programmer (1a86:5512); BUS:ADDR as 'vorant-spi ports' lists it picks one of several. "
             "The chip fixes its SPI clock (about 1.4 MHz): it takes no clock key"},
        };
        info.path = PathUse::Optional;
        info.pathName = "BUS:ADDR";
        info.caps = {
            .readsBack = true, .records = false, .simulatesChip = false, .hasBusClock = false, .takesSimFaults = false};
        info.open = &open;
        info.discover = &discover;
        return info;
    }();
    return row;
}

}  // namespace vorant::ports::ch341a
