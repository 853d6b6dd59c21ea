#include "ports/jtag/BridgeKeys.h"

#include "ports/PortError.h"

#include <stdexcept>

namespace vorant::ports::jtag {

namespace {

[[noreturn]] void refuse(const PortAddress& address, const std::string& why) {
    throw PortError(PortError::Kind::BadRequest, "--port " + address.text + ": " + why);
}

}  // namespace

std::vector<PortKey> bridgeKeys() {
    return {
        {"bridge", "NAME", std::string("the JTAG-to-SPI bridge: ") + bridgeNames()},
        {"ir", "VALUE", "the bridge's user instruction (default 0x02, USER1 of a 6-bit IR)"},
        {"irlen", "N", "the IR length of the bridge's TAP (default 6)"},
        {"delay", "N", "clocks MISO comes back late (jtagspi: one per TAP; shiftdr: 1)"},
        {"chain", "LIST", "the IR lengths of the chain from TDI, the bridge's in brackets: 8:[6]:4"},
    };
}

std::uint64_t keyNumber(const PortAddress& address, const std::string& key, std::uint64_t limit) {
    const std::string text = address.key(key);
    const bool hex = text.size() > 2 && text[0] == '0' && (text[1] == 'x' || text[1] == 'X');
    const std::string digits = hex ? text.substr(2) : text;
    const char* allowed = hex ? "0123456789abcdefABCDEF" : "0123456789";
    if (digits.empty() || digits.size() > 16 || digits.find_first_not_of(allowed) != std::string::npos)
        refuse(address, key + "=" + text + " is not a whole number");
    const std::uint64_t value = std::stoull(digits, nullptr, hex ? 16 : 10);
    if (value > limit) refuse(address, key + "=" + text + " is out of range; give 0 to " + std::to_string(limit));
    return value;
}

BridgeSettings bridgeSettings(const PortAddress& address, const std::string& defaultBridge) {
    BridgeSettings settings;
    settings.name = address.key("bridge", defaultBridge);
    if (address.keys.count("irlen")) {
        settings.irLength = static_cast<unsigned>(keyNumber(address, "irlen", 64));
        if (settings.irLength == 0) refuse(address, "irlen=0: a TAP has at least one IR bit");
    }
    if (address.keys.count("chain")) {
        unsigned chainIrLength = 0;
        try {
            settings.chain = parseJtagChain(address.key("chain"), chainIrLength);
        } catch (const std::invalid_argument& error) {
            refuse(address, "chain=" + address.key("chain") + ": " + error.what());
        }
        if (address.keys.count("irlen") && chainIrLength != settings.irLength)
            refuse(address, "irlen=" + address.key("irlen") + " and the bracketed TAP of chain= disagree");
        settings.irLength = chainIrLength;
    }
    if (address.keys.count("ir")) {
        const std::uint64_t limit = settings.irLength >= 64 ? ~0ull : (1ull << settings.irLength) - 1;
        settings.instruction = keyNumber(address, "ir", limit);
    }
    if (address.keys.count("delay")) settings.misoDelay = static_cast<unsigned>(keyNumber(address, "delay", 64));
    // Without a marker the other TAPs' bypass bits of a scan would be SPI
    // clocks; only jtagspi finds its frame among them.
    if (settings.chain.tapCount() > 1 && settings.name != "jtagspi")
        refuse(address, "bridge=" + settings.name + " cannot share a chain with other TAPs (their bypass bits "
                        "would be SPI clocks); use bridge=jtagspi");
    try {
        makeBridge(settings);
    } catch (const std::invalid_argument& error) {
        refuse(address, error.what());
    }
    return settings;
}

}  // namespace vorant::ports::jtag
