#pragma once
// The SVF code names the shared scan-order bit string in its own namespace.
#include "ports/wire/BitBuffer.h"

namespace vorant::svf {
using ports::anyBitSet;
using ports::BitBuffer;
}  // namespace vorant::svf
