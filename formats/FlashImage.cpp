#include "formats/FlashImage.h"

#include "formats/FormatError.h"

#include <algorithm>
#include <cstring>
#include <stdexcept>
#include <string>

namespace vorant::formats {

FlashImage::FlashImage(std::vector<unsigned char> bytes) : bytes_(std::move(bytes)) {
    if (bytes_.size() > kMaxBytes) {
        throw FormatError("image of " + std::to_string(bytes_.size()) +
                          " bytes is larger than the largest supported image (" +
                          std::to_string(kMaxBytes) + " bytes)");
    }
}

unsigned FlashImage::dataSize() {
    return static_cast<unsigned>(bytes_.size() * 8);
}

void FlashImage::rewind() {
    cursor_ = 0;
}

int FlashImage::next(const char** data, int* address, int maxBits) {
    if (maxBits <= 0 || maxBits % 8 != 0) {
        throw std::invalid_argument("configuration data are read in whole bytes; a page of " +
                                    std::to_string(maxBits) + " bits cannot be served");
    }
    if (cursor_ >= bytes_.size()) return 0;

    const std::size_t pageBytes = static_cast<std::size_t>(maxBits) / 8;
    const std::size_t chunkBytes = std::min(pageBytes, bytes_.size() - cursor_);
    if (address) *address = static_cast<int>(cursor_);

    if (chunkBytes == pageBytes) {
        *data = reinterpret_cast<const char*>(bytes_.data() + cursor_);
    } else {
        if (tailPage_.size() < pageBytes) tailPage_.resize(pageBytes);
        std::memcpy(tailPage_.data(), bytes_.data() + cursor_, chunkBytes);
        std::fill(tailPage_.begin() + static_cast<std::ptrdiff_t>(chunkBytes), tailPage_.end(),
                  static_cast<unsigned char>(0xFF));
        *data = reinterpret_cast<const char*>(tailPage_.data());
    }
    cursor_ += chunkBytes;
    return static_cast<int>(chunkBytes * 8);
}

}  // namespace vorant::formats
