#pragma once
#include "host/RLBitVec.h"

#include <optional>
#include <string>

namespace vorant::cli {

// The opcode an instruction text starts with: its first eight '0'/'1'
// characters, the first the most significant bit. Nothing when the text is
// shorter or holds other characters.
std::optional<unsigned char> opcodeOfInstruction(const std::string& bits);

// The first byte a vector puts on the wire (its bits 0..7, bit 0 the most
// significant); nothing for a vector shorter than a byte.
std::optional<unsigned char> firstWireByte(const RLBitVec& vector);

}  // namespace vorant::cli
