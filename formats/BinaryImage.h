#pragma once
#include "formats/FlashImage.h"

#include <string>

namespace vorant::formats {

// A raw binary file: its bytes are the flash bytes from address 0. Throws
// FormatError naming the file when it cannot be read or is too large.
FlashImage readBinaryImage(const std::string& path);

}  // namespace vorant::formats
