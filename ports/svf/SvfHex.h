#pragma once
// SVF hex values. A value is written most significant digit first, so bit 0
// of a scan (the first bit shifted) is the least significant bit of the last
// digit. A value of n bits has ceil(n / 4) digits.

#include "ports/svf/BitBuffer.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace vorant::svf {

// Appends the digits of the first `bits` bits of a scan-order buffer (bits
// past `bits` must be 0). A value of more than digitsPerLine digits (at
// least 2) is wrapped: its digits start on a new line and no line holds more
// than digitsPerLine of them.
void appendSvfHex(std::string& out, const std::uint8_t* bytes, std::size_t bits,
                  std::size_t digitsPerLine);

// Digit value of a hex character, or -1.
int hexDigitValue(char c);

// Fills `out` with `bits` bits from hex digits (already checked to be hex).
// Fewer digits than needed stand for leading zeros. Returns an error text
// when a set bit lies beyond `bits`, nothing on success.
std::optional<std::string> parseSvfHex(std::string_view digits, std::size_t bits, BitBuffer& out);

}  // namespace vorant::svf
