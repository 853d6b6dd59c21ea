#pragma once
// Reading property texts as the part database stores them.

#include <cstdint>
#include <optional>
#include <string>

namespace vorant::host {

// A 32-bit signed number written in decimal (optionally signed) or in hex
// with 0x; nothing else, no surrounding blanks.
std::optional<std::int32_t> parseInt32(const std::string& text);

bool isBinaryText(const std::string& text);  // non-empty, '0'/'1' only
bool isHexText(const std::string& text);     // non-empty, hex digits only

}  // namespace vorant::host
