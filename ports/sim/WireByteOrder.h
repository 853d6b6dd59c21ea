#pragma once
// Scan vectors and SVF values store the first bit on the wire in bit 0 of
// byte 0, while SPI sends a byte most significant bit first: a byte-aligned
// wire byte is its storage byte mirrored. The simulator side keeps its own
// table, apart from the host's bit-vector code it witnesses.

#include <array>
#include <cstdint>

namespace vorant::sim {

inline constexpr std::array<std::uint8_t, 256> kWireMirror = [] {
    std::array<std::uint8_t, 256> table{};
    for (unsigned value = 0; value < 256; ++value) {
        unsigned mirrored = 0;
        for (unsigned bit = 0; bit < 8; ++bit)
            if (value & (1u << bit)) mirrored |= 0x80u >> bit;
        table[value] = static_cast<std::uint8_t>(mirrored);
    }
    return table;
}();

}  // namespace vorant::sim
