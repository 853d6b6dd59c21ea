#pragma once
// The byte mirror lives with the bit vectors it serves; the image formats
// and the cables use the same one.
#include "host/BitReversal.h"

namespace vorant::formats {
using vorant::kReversedBits;
using vorant::reverseBitsOfEachByte;
}  // namespace vorant::formats
