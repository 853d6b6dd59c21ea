#pragma once
#include "host/ConfigData.h"

namespace vorant::formats {

// Configuration details for data files that carry none of their own (binary
// and Intel HEX): the data width is whatever the user says, x1 by default.
class FixedWidthCif final : public CifReader {
public:
    // width is 1, 2 or 4; anything else throws std::invalid_argument.
    explicit FixedWidthCif(int width = 1);

    int getDataWidth() override { return width_; }

private:
    int width_;
};

}  // namespace vorant::formats
