#pragma once
#include "formats/FlashImage.h"

#include <cstdint>
#include <string>

namespace vorant::formats {

// A raw binary file: its bytes are the flash bytes from address `offset`
// on. Throws FormatError naming the file when it cannot be read or reaches
// past the largest flash there is.
FlashImage readBinaryImage(const std::string& path, std::uint64_t offset = 0);

}  // namespace vorant::formats
