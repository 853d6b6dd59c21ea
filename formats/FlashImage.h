#pragma once
#include "host/ConfigData.h"

#include <cstddef>
#include <cstdint>
#include <limits>
#include <vector>

namespace vorant::formats {

// The largest flash a part can describe (its DEVICE_SIZE counts bits in a
// signed 32-bit number): 256 MiB. Image data past it fit no part.
inline constexpr std::uint64_t kLargestFlashBytes = std::uint64_t{1} << 28;

// Bytes bound for consecutive flash addresses from `address` on.
struct ImageRange {
    std::uint64_t address = 0;
    std::vector<unsigned char> bytes;

    std::uint64_t end() const { return address + bytes.size(); }
};

// Configuration data held in memory as the address ranges the file names,
// so memory follows the data, never the highest address: a few bytes at
// the top of a 256 MiB flash cost a few bytes.
//
// To the device it reads as one image laid out from flash address 0 to its
// last data byte, the holes (and the space below the first range) reading
// 0xFF. next() hands out one page per call: a page inside one range points
// straight into it; any other page is put together in one reused page
// buffer, padded with 0xFF, because the device always takes a full page of
// bits.
class FlashImage final : public ConfigDataReader {
public:
    // The largest span whose size in bits still fits dataSize()'s unsigned
    // count: just under 512 MiB.
    static constexpr std::uint64_t kMaxBytes = std::numeric_limits<unsigned>::max() / 8;

    // A whole image from address 0.
    explicit FlashImage(std::vector<unsigned char> bytes);
    // Ranges in any order; empty ones are dropped, touching ones joined.
    // Throws FormatError when two overlap or the span passes kMaxBytes.
    explicit FlashImage(std::vector<ImageRange> ranges);

    // Sorted by address, disjoint, none empty.
    const std::vector<ImageRange>& ranges() const { return ranges_; }
    // One past the last data byte: the span the device sees.
    std::uint64_t byteSize() const { return ranges_.empty() ? 0 : ranges_.back().end(); }
    // Bytes the file really holds.
    std::uint64_t dataBytes() const;
    bool empty() const { return ranges_.empty(); }
    // The span from address 0 with its holes filled with 0xFF. Costs the
    // whole span in memory: for tests and small images.
    std::vector<unsigned char> denseBytes() const;

    unsigned dataSize() override;
    void rewind() override;
    // maxBits must be a positive multiple of 8 (a page is whole bytes);
    // anything else throws std::invalid_argument rather than silently
    // ending the data.
    int next(const char** data, int* address, int maxBits) override;
    // The ranges' bytes only, cut at page bounds; points into the ranges.
    int nextPiece(const char** data, int* address, int maxBits) override;

private:
    std::vector<ImageRange> ranges_;
    std::uint64_t cursor_ = 0;
    std::size_t firstRange_ = 0;  // the first range that ends after the cursor
    std::vector<unsigned char> page_;
};

}  // namespace vorant::formats
