#include "formats/FixedWidthCif.h"

#include <stdexcept>
#include <string>

namespace vorant::formats {

FixedWidthCif::FixedWidthCif(int width) : width_(width) {
    if (width != 1 && width != 2 && width != 4) {
        throw std::invalid_argument("data width " + std::to_string(width) + " is not 1, 2 or 4");
    }
}

}  // namespace vorant::formats
