#include "ports/spidev/SpidevPort.h"

#include "ports/PortError.h"
#include "ports/spi/SpiCablePort.h"
#include "ports/spidev/SpidevBus.h"
#include "ports/spidev/SpidevSetup.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <regex>
#include <tuple>
#include <system_error>

namespace vorant::ports::spidev {

namespace {

// Slow enough for a flash on jumper wires, fast enough that a 16 MiB read
// takes seconds; every controller in common boards reaches it.
constexpr std::uint32_t kDefaultSpeedHz = 10'000'000;
constexpr std::uint32_t kSlowestHz = 1'000, kFastestHz = 200'000'000;
// What the driver's buffer holds unless the module was told otherwise.
constexpr std::uint32_t kDefaultBufsiz = 4096;
// The longest transaction a shipped part makes: a 256-byte page behind an
// opcode, a 4-byte address and a dummy byte, with room to spare. A buffer
// below it would fail the first page only after an erase had run.
constexpr std::uint32_t kLargestTransactionBytes = 264;

[[noreturn]] void unavailable(const std::string& message) { throw PortError(PortError::Kind::Unavailable, message); }

// "10000000", "10M", "500k": Hz as a whole number, or kHz and MHz.
std::uint32_t speedOf(const PortAddress& address) {
    const std::string text = address.key("speed");
    if (text.empty()) return kDefaultSpeedHz;
    std::uint64_t scale = 1;
    std::string digits = text;
    if (const char unit = text.back(); unit == 'k' || unit == 'K' || unit == 'M') {
        scale = unit == 'M' ? 1'000'000 : 1'000;
        digits.pop_back();
    }
    const bool number =
        !digits.empty() && digits.size() <= 10 && digits.find_first_not_of("0123456789") == std::string::npos;
    const std::uint64_t hz = number ? std::stoull(digits) * scale : 0;
    if (!number || hz < kSlowestHz || hz > kFastestHz)
        throw PortError(PortError::Kind::BadRequest,
                        "--port " + address.text + ": speed=" + text + " is not a speed from 1k to 200M Hz; give Hz, " +
                            "kHz or MHz, such as speed=10000000, speed=500k or speed=10M");
    return static_cast<std::uint32_t>(hz);
}

[[noreturn]] void openFailed(const std::string& where, const std::string& path, int error) {
    const std::string failed = where + ": cannot open " + path + ": " + std::strerror(error) + "; ";
    switch (error) {
    case ENOENT:
        unavailable(failed + "enable the SPI controller (on a Raspberry Pi: dtparam=spi=on in config.txt, then reboot) "
                             "and see 'vorant-spi ports' for the nodes there are");
    case EACCES:
    case EPERM:
        unavailable(failed + "give your user access: a udev rule such as SUBSYSTEM==\"spidev\", GROUP=\"spi\", "
                             "MODE=\"0660\" in /etc/udev/rules.d/, then 'sudo usermod -aG spi $USER' and log in again");
    case ENXIO:
    case ENODEV:
        unavailable(failed + "the SPI device behind the node is gone; check that its controller and spidev are bound");
    default: unavailable(failed + "check the node");
    }
}

std::unique_ptr<Port> open(const PortAddress& address, const PortContext&) {
    // The keys first: a bad speed opens nothing.
    const std::uint32_t speedHz = speedOf(address);
    const std::string where = "--port " + address.text;
    int error = 0;
    std::unique_ptr<SpidevIo> io = spidevIoOpener()(address.path, error);
    if (!io) openFailed(where, address.path, error != 0 ? error : EIO);
    const std::uint32_t bufferBytes = io->bufferSize().value_or(kDefaultBufsiz);
    if (bufferBytes < kLargestTransactionBytes)
        unavailable(where + ": the spidev driver's buffer (spidev.bufsiz) is " + std::to_string(bufferBytes) +
                    " bytes, below the " + std::to_string(kLargestTransactionBytes) +
                    " of a page program with its command; " + raiseBufsizAdvice(kLargestTransactionBytes));
    setUpSpidev(*io, speedHz, where, address.path);
    return std::make_unique<spi::SpiCable>(address.kind + ":" + address.path,
                                           std::make_unique<SpidevBus>(std::move(io), speedHz, bufferBytes));
}

std::vector<FoundCable> discover() { return findSpidevNodes("/dev"); }

}  // namespace

std::vector<FoundCable> findSpidevNodes(const std::filesystem::path& folder) {
    static const std::regex kNodeName("spidev([0-9]+)\\.([0-9]+)");
    struct Node {
        unsigned long bus, chipSelect;
        FoundCable cable;
    };
    std::vector<Node> nodes;
    std::error_code error;
    for (const auto& entry : std::filesystem::directory_iterator(folder, error)) {
        const std::string name = entry.path().filename().string();
        std::smatch match;
        if (!std::regex_match(name, match, kNodeName) || match[1].length() > 6 || match[2].length() > 6) continue;
        const unsigned long bus = std::stoul(match[1]), chipSelect = std::stoul(match[2]);
        nodes.push_back({bus, chipSelect,
                         {"spidev:" + entry.path().string(),
                          "SPI bus " + std::to_string(bus) + ", chip select " + std::to_string(chipSelect)}});
    }
    std::sort(nodes.begin(), nodes.end(), [](const Node& a, const Node& b) {
        return std::tie(a.bus, a.chipSelect) < std::tie(b.bus, b.chipSelect);
    });
    std::vector<FoundCable> found;
    for (Node& node : nodes) found.push_back(std::move(node.cable));
    return found;
}

const PortInfo& spidevPortInfo() {
    static const PortInfo row = [] {
        PortInfo info;
        info.name = "spidev";
        info.synopsis = {
            {"spidev:/dev/spidevB.C",
             "a flash on a Linux board's SPI bus B, chip select C (a Raspberry Pi's header: /dev/spidev0.0), through "
             "the kernel's spidev driver: SPI mode 0, 8-bit words"},
        };
        info.path = PathUse::Required;
        info.pathName = "/dev/spidevB.C";
        info.keys = {{"speed", "HZ",
                      "the SPI clock in Hz, or with k or M (default 10M; lower it, say to 1M, for long wires; the "
                      "controller rounds down)"}};
        info.caps = {.readsBack = true, .records = false, .simulatesChip = false, .hasBusClock = false,
                     .takesSimFaults = false};
        info.open = &open;
        info.discover = &discover;
        return info;
    }();
    return row;
}

}  // namespace vorant::ports::spidev
