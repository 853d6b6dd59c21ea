#pragma once
#include <array>
#include <cstddef>

namespace vorant {

// Captured bytes hold the first bit read in bit 0, while SPI sends every
// byte most significant bit first; reversing a captured byte gives back the
// byte as it sits in the flash (and the other way round).
inline constexpr std::array<unsigned char, 256> kReversedBits = [] {
    std::array<unsigned char, 256> table{};
    for (unsigned value = 0; value < 256; ++value) {
        unsigned reversed = 0;
        for (unsigned bit = 0; bit < 8; ++bit) {
            if (value & (1u << bit)) reversed |= 0x80u >> bit;
        }
        table[value] = static_cast<unsigned char>(reversed);
    }
    return table;
}();

inline void reverseBitsOfEachByte(const unsigned char* from, std::size_t count, unsigned char* to) {
    for (std::size_t i = 0; i < count; ++i) to[i] = kReversedBits[from[i]];
}

}  // namespace vorant
