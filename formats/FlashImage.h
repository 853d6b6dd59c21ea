#pragma once
#include "host/ConfigData.h"

#include <cstddef>
#include <limits>
#include <vector>

namespace vorant::formats {

// Configuration data held in memory, laid out from flash address 0: byte k
// of the image is the flash byte at address k. The image ends at its last
// data byte; holes inside it already read 0xFF.
//
// next() hands out one page per call. Whole pages point straight into the
// image; only a short tail is copied, into one page buffer that is reused,
// and padded with 0xFF because the device always takes a full page of bits.
class FlashImage final : public ConfigDataReader {
public:
    // The largest image whose size in bits still fits dataSize()'s unsigned
    // count: just under 512 MiB.
    static constexpr std::size_t kMaxBytes = std::numeric_limits<unsigned>::max() / 8;

    // Throws FormatError when the image is larger than kMaxBytes.
    explicit FlashImage(std::vector<unsigned char> bytes);

    const std::vector<unsigned char>& bytes() const { return bytes_; }
    std::size_t byteSize() const { return bytes_.size(); }
    bool empty() const { return bytes_.empty(); }

    unsigned dataSize() override;
    void rewind() override;
    // maxBits must be a positive multiple of 8 (a page is whole bytes);
    // anything else throws std::invalid_argument rather than silently
    // ending the data.
    int next(const char** data, int* address, int maxBits) override;

private:
    std::vector<unsigned char> bytes_;
    std::size_t cursor_ = 0;
    std::vector<unsigned char> tailPage_;
};

}  // namespace vorant::formats
