#include "ports/svf/SvfHex.h"

#include <array>

namespace vorant::svf {
namespace {

constexpr char kDigits[] = "0123456789ABCDEF";

// Two characters per byte value, high nibble first.
constexpr std::array<char, 512> makeByteDigits() {
    std::array<char, 512> table{};
    for (int value = 0; value < 256; ++value) {
        table[2 * value] = kDigits[value >> 4];
        table[2 * value + 1] = kDigits[value & 0xF];
    }
    return table;
}
constexpr std::array<char, 512> kByteDigits = makeByteDigits();

}  // namespace

void appendSvfHex(std::string& out, const std::uint8_t* bytes, std::size_t bits,
                  std::size_t digitsPerLine) {
    const std::size_t digits = (bits + 3) / 4;
    const bool wrap = digits > digitsPerLine;
    std::size_t onLine = 0;
    bool lineStart = wrap;  // a wrapped value starts on its own line
    auto emit = [&](const char* text, std::size_t count) {
        if (wrap && (lineStart || onLine + count > digitsPerLine)) {
            out.push_back('\n');
            onLine = 0;
            lineStart = false;
        }
        out.append(text, count);
        onLine += count;
    };
    std::size_t byte = (digits + 1) / 2;
    // An odd digit count leaves the high nibble of the top byte unused.
    if (digits % 2 != 0) {
        --byte;
        emit(&kDigits[bytes[byte] & 0xF], 1);
    }
    while (byte > 0) {
        --byte;
        emit(&kByteDigits[2 * bytes[byte]], 2);
    }
}

int hexDigitValue(char c) {
    if (c >= '0' && c <= '9') return c - '0';
    if (c >= 'A' && c <= 'F') return c - 'A' + 10;
    if (c >= 'a' && c <= 'f') return c - 'a' + 10;
    return -1;
}

std::optional<std::string> parseSvfHex(std::string_view digits, std::size_t bits, BitBuffer& out) {
    out.assign(bits, false);
    std::uint8_t* bytes = out.data();
    // Digit j from the end carries bits 4j .. 4j+3.
    const std::size_t count = digits.size();
    for (std::size_t j = 0; j < count; ++j) {
        const unsigned value = static_cast<unsigned>(hexDigitValue(digits[count - 1 - j]));
        if (value == 0) continue;
        const std::size_t firstBit = 4 * j;
        if (firstBit >= bits || (bits - firstBit < 4 && (value >> (bits - firstBit)) != 0))
            return "value has set bits beyond its length of " + std::to_string(bits) + " bits";
        bytes[j / 2] |= static_cast<std::uint8_t>(value << (4 * (j % 2)));
    }
    return std::nullopt;
}

}  // namespace vorant::svf
