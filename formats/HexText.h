#pragma once
// Hexadecimal text as the image formats read and name it.
#include <cstdint>
#include <cstdio>
#include <string>

namespace vorant::formats {

// The value of one hex digit in either case; -1 for any other character.
inline int hexDigitValue(char c) {
    if (c >= '0' && c <= '9') return c - '0';
    if (c >= 'A' && c <= 'F') return c - 'A' + 10;
    if (c >= 'a' && c <= 'f') return c - 'a' + 10;
    return -1;
}

// "0x1F00"; with `digits`, padded with zeros to that many.
inline std::string hexNumber(std::uint64_t value, int digits = 0) {
    char text[32];
    std::snprintf(text, sizeof text, "0x%0*llX", digits, static_cast<unsigned long long>(value));
    return text;
}

}  // namespace vorant::formats
