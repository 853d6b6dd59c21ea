#pragma once
// Which erases cover the blocks an image touches: a pure function of the
// image's address ranges and the part's erase sizes, so the plan can be
// checked row by row without a chip.

#include <cstdint>
#include <vector>

namespace vorant::device {

// A byte range [begin, end) the image writes.
struct AddressSpan {
    std::uint64_t begin = 0;
    std::uint64_t end = 0;
};

// One erase: the index of its erase size in the sizes given, and the
// block's address (a multiple of that size).
struct EraseStep {
    std::size_t sizeIndex = 0;
    std::uint64_t address = 0;

    bool operator==(const EraseStep&) const = default;
};

// Covers every smallest-size block that holds a byte of `spans` (inside
// [0, flashBytes)) with the fewest erases: from the lowest block up, each
// step takes the largest size whose aligned block lies wholly among the
// blocks to erase. `sizes` are the part's erase sizes in bytes, each a
// power of two and a multiple of the smallest (for example 4 KiB, 32 KiB
// and 64 KiB), in any order; spans may overlap and come in any order.
// Steps come in ascending address order. An empty `sizes` plans nothing.
std::vector<EraseStep> planErase(std::vector<AddressSpan> spans, const std::vector<std::uint32_t>& sizes,
                                 std::uint64_t flashBytes);

// The smallest-size blocks the plan erases that the spans cover only in
// part: bytes of them outside the image must be read first and written back.
std::vector<AddressSpan> partlyCoveredBlocks(std::vector<AddressSpan> spans, std::uint32_t smallestSize,
                                             std::uint64_t flashBytes);

}  // namespace vorant::device
