#include "formats/FlashImage.h"

#include "formats/FormatError.h"
#include "formats/HexText.h"

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <stdexcept>
#include <string>

namespace vorant::formats {

FlashImage::FlashImage(std::vector<unsigned char> bytes)
    : FlashImage(std::vector<ImageRange>{ImageRange{0, std::move(bytes)}}) {}

FlashImage::FlashImage(std::vector<ImageRange> ranges) {
    std::sort(ranges.begin(), ranges.end(),
              [](const ImageRange& a, const ImageRange& b) { return a.address < b.address; });
    for (ImageRange& range : ranges) {
        if (range.bytes.empty()) continue;
        if (!ranges_.empty() && range.address < ranges_.back().end())
            throw FormatError("the data at " + hexNumber(range.address) + " overlap the data at " +
                              hexNumber(ranges_.back().address) + ".." + hexNumber(ranges_.back().end() - 1));
        if (!ranges_.empty() && range.address == ranges_.back().end()) {
            std::vector<unsigned char>& joined = ranges_.back().bytes;
            joined.insert(joined.end(), range.bytes.begin(), range.bytes.end());
        } else {
            ranges_.push_back(std::move(range));
        }
    }
    if (byteSize() > kMaxBytes)
        throw FormatError("an image reaching " + hexNumber(byteSize()) +
                          " is larger than the largest supported image (" + std::to_string(kMaxBytes) + " bytes)");
}

std::uint64_t FlashImage::dataBytes() const {
    std::uint64_t total = 0;
    for (const ImageRange& range : ranges_) total += range.bytes.size();
    return total;
}

std::vector<unsigned char> FlashImage::denseBytes() const {
    std::vector<unsigned char> dense(static_cast<std::size_t>(byteSize()), 0xFF);
    for (const ImageRange& range : ranges_)
        std::copy(range.bytes.begin(), range.bytes.end(), dense.begin() + static_cast<std::ptrdiff_t>(range.address));
    return dense;
}

unsigned FlashImage::dataSize() { return static_cast<unsigned>(byteSize() * 8); }

void FlashImage::rewind() {
    cursor_ = 0;
    firstRange_ = 0;
}

namespace {

void checkPageBits(int maxBits) {
    if (maxBits <= 0 || maxBits % 8 != 0) {
        throw std::invalid_argument("configuration data are read in whole bytes; a page of " +
                                    std::to_string(maxBits) + " bits cannot be served");
    }
}

}  // namespace

int FlashImage::nextPiece(const char** data, int* address, int maxBits) {
    checkPageBits(maxBits);
    const std::uint64_t pageBytes = static_cast<std::uint64_t>(maxBits) / 8;
    while (firstRange_ < ranges_.size() && ranges_[firstRange_].end() <= cursor_) ++firstRange_;
    if (firstRange_ >= ranges_.size()) return 0;
    const ImageRange& range = ranges_[firstRange_];
    cursor_ = std::max(cursor_, range.address);
    const std::uint64_t pageEnd = (cursor_ / pageBytes + 1) * pageBytes;
    const std::uint64_t pieceEnd = std::min(pageEnd, range.end());
    *data = reinterpret_cast<const char*>(range.bytes.data() + (cursor_ - range.address));
    if (address) *address = static_cast<int>(cursor_);
    const auto bits = static_cast<int>((pieceEnd - cursor_) * 8);
    cursor_ = pieceEnd;
    return bits;
}

int FlashImage::next(const char** data, int* address, int maxBits) {
    checkPageBits(maxBits);
    const std::uint64_t end = byteSize();
    if (cursor_ >= end) return 0;

    const std::uint64_t pageBytes = static_cast<std::uint64_t>(maxBits) / 8;
    const std::uint64_t chunkBytes = std::min(pageBytes, end - cursor_);
    const std::uint64_t chunkEnd = cursor_ + chunkBytes;
    if (address) *address = static_cast<int>(cursor_);

    while (firstRange_ < ranges_.size() && ranges_[firstRange_].end() <= cursor_) ++firstRange_;
    const ImageRange* range = firstRange_ < ranges_.size() ? &ranges_[firstRange_] : nullptr;
    if (range != nullptr && chunkBytes == pageBytes && range->address <= cursor_ && chunkEnd <= range->end()) {
        *data = reinterpret_cast<const char*>(range->bytes.data() + (cursor_ - range->address));
    } else {
        // Holes and range edges: the page is put together, 0xFF where no
        // range reaches.
        page_.assign(static_cast<std::size_t>(pageBytes), 0xFF);
        for (std::size_t k = firstRange_; k < ranges_.size() && ranges_[k].address < chunkEnd; ++k) {
            const std::uint64_t from = std::max(cursor_, ranges_[k].address);
            const std::uint64_t to = std::min(chunkEnd, ranges_[k].end());
            std::memcpy(page_.data() + (from - cursor_), ranges_[k].bytes.data() + (from - ranges_[k].address),
                        static_cast<std::size_t>(to - from));
        }
        *data = reinterpret_cast<const char*>(page_.data());
    }
    cursor_ = chunkEnd;
    return static_cast<int>(chunkBytes * 8);
}

}  // namespace vorant::formats
