#include "cli/InstructionOpcode.h"

namespace vorant::cli {

std::optional<unsigned char> opcodeOfInstruction(const std::string& bits) {
    if (bits.size() < 8) return std::nullopt;
    unsigned value = 0;
    for (std::size_t i = 0; i < 8; ++i) {
        if (bits[i] != '0' && bits[i] != '1') return std::nullopt;
        value = value << 1 | static_cast<unsigned>(bits[i] - '0');
    }
    return static_cast<unsigned char>(value);
}

std::optional<unsigned char> firstWireByte(const RLBitVec& vector) {
    if (vector.length() < 8) return std::nullopt;
    // Storage keeps bit i in byte i / 8 under 1 << (i % 8), and the wire
    // sends bit 0 first as the most significant: the wire byte is the
    // storage byte reversed.
    unsigned storage = vector.data()[0], wire = 0;
    for (int bit = 0; bit < 8; ++bit) wire |= ((storage >> bit) & 1u) << (7 - bit);
    return static_cast<unsigned char>(wire);
}

}  // namespace vorant::cli
