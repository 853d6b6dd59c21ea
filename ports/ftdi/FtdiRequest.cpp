#include "ports/ftdi/FtdiRequest.h"

#include "ports/PortError.h"

#include <cctype>

namespace vorant::ports::ftdi {

namespace {

[[noreturn]] void refuse(const PortAddress& address, const std::string& why) {
    throw PortError(PortError::Kind::BadRequest, "--port " + address.text + ": " + why);
}

bool hexDigits(const std::string& text) {
    if (text.empty() || text.size() > 4) return false;
    for (const char c : text)
        if (!std::isxdigit(static_cast<unsigned char>(c))) return false;
    return true;
}

// "0403:6014": two USB ids of one to four hexadecimal digits.
FtdiUsbId usbId(const PortAddress& address) {
    const std::string& text = address.path;
    const std::size_t colon = text.find(':');
    const std::string vendor = text.substr(0, colon);
    const std::string product = colon == std::string::npos ? std::string() : text.substr(colon + 1);
    if (!hexDigits(vendor) || !hexDigits(product))
        refuse(address, "'" + text +
                            "' is not VID:PID; give the USB vendor and product ids in hexadecimal, such as "
                            "0403:6014");
    return {static_cast<std::uint16_t>(std::stoul(vendor, nullptr, 16)),
            static_cast<std::uint16_t>(std::stoul(product, nullptr, 16))};
}

char channel(const PortAddress& address) {
    const std::string text = address.key("interface", "A");
    const char letter = text.size() == 1 ? static_cast<char>(std::toupper(static_cast<unsigned char>(text[0]))) : '?';
    if (letter == 'A' || letter == 'B') return letter;
    if (letter == 'C' || letter == 'D')
        refuse(address, "interface=" + text + ": channel " + std::string(1, letter) +
                            " has no MPSSE engine (on an FT4232H only A and B have one); give interface=A or B");
    refuse(address, "interface=" + text + " is not a channel; give interface=A or B");
}

// Whole Hz, or kHz/MHz with a k or M after the number.
std::uint32_t speed(const PortAddress& address) {
    const std::string text = address.key("speed");
    if (text.empty()) return kDefaultSpeedHz;
    std::string digits = text;
    std::uint64_t scale = 1;
    if (const char last = digits.back(); last == 'k' || last == 'K' || last == 'M') {
        scale = last == 'M' ? 1'000'000 : 1'000;
        digits.pop_back();
    }
    const std::string range = "; give " + std::to_string(kMinSpeedHz) + " to " + std::to_string(kMaxSpeedHz) +
                              " Hz (or with k or M, such as 500k or 6M)";
    if (digits.empty() || digits.find_first_not_of("0123456789") != std::string::npos)
        refuse(address, "speed=" + text + " is not a whole number of Hz" + range);
    const std::uint64_t hz = digits.size() > 9 ? UINT64_MAX : std::stoull(digits) * scale;
    if (hz < kMinSpeedHz || hz > kMaxSpeedHz) refuse(address, "speed=" + text + " is out of range" + range);
    return static_cast<std::uint32_t>(hz);
}

// "ADBUS5" (or "D5", or "5").
unsigned chipSelectPin(const PortAddress& address) {
    const std::string text = address.key("cs", "ADBUS3");
    std::string upper;
    for (const char c : text) upper += static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
    std::string number = upper;
    if (number.rfind("ADBUS", 0) == 0)
        number = number.substr(5);
    else if (number.rfind("D", 0) == 0)
        number = number.substr(1);
    if (number.size() != 1 || !std::isdigit(static_cast<unsigned char>(number[0])) || number[0] > '7')
        refuse(address, "cs=" + text + " is not an ADBUS pin; give ADBUS3 to ADBUS7");
    const unsigned pin = static_cast<unsigned>(number[0] - '0');
    static const char* const kSpiRoles[] = {"SCK", "MOSI", "MISO"};
    if (pin < 3)
        refuse(address, "cs=" + text + ": ADBUS" + std::to_string(pin) + " is " + kSpiRoles[pin] +
                            "; chip select goes on ADBUS3 to ADBUS7");
    return pin;
}

}  // namespace

std::uint16_t divisorAtOrBelow(std::uint32_t hz) {
    // SCK = 30 MHz / (D + 1) <= hz  <=>  D + 1 >= 30 MHz / hz.
    const std::uint32_t steps = (kMaxSpeedHz + hz - 1) / hz;
    return static_cast<std::uint16_t>(steps - 1);
}

FtdiRequest parseFtdiRequest(const PortAddress& address) {
    FtdiRequest request;
    if (address.hasPath) request.id = usbId(address);
    request.channel = channel(address);
    request.serial = address.key("serial");
    request.speedHz = speed(address);
    request.divisor = divisorAtOrBelow(request.speedHz);
    request.chipSelectPin = chipSelectPin(address);
    return request;
}

}  // namespace vorant::ports::ftdi
