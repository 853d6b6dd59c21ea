#include "formats/BinaryWriter.h"

#include "formats/BitReversal.h"

#include <algorithm>

namespace vorant::formats {

BinaryWriter::BinaryWriter(const std::string& path) : AtomicFileWriter(path) {}

bool BinaryWriter::fillTo(std::uint64_t offset) {
    if (position_ != length_) out().seekp(static_cast<std::streamoff>(length_));
    const std::vector<char> erased(64 * 1024, static_cast<char>(0xFF));
    while (length_ < offset) {
        const auto count = static_cast<std::size_t>(std::min<std::uint64_t>(erased.size(), offset - length_));
        out().write(erased.data(), static_cast<std::streamsize>(count));
        length_ += count;
    }
    position_ = length_;
    return checkStream();
}

bool BinaryWriter::writeData(const unsigned char* data, int offset, int bits, int /*reserved*/) {
    std::size_t count = 0;
    if (!acceptData(data, offset, bits, count)) return false;
    if (count == 0) return true;
    const auto start = static_cast<std::uint64_t>(offset);
    if (start < length_ && !seekable()) {
        return fail(targetName() + ": data at offset " + std::to_string(start) +
                    " arrive below data already written; a stream takes data in ascending order");
    }
    if (start > length_) {
        if (!fillTo(start)) return false;
    } else if (start != position_) {
        out().seekp(static_cast<std::streamoff>(start));
        position_ = start;
    }

    if (flashBytes_.size() < count) flashBytes_.resize(count);
    reverseBitsOfEachByte(data, count, flashBytes_.data());
    out().write(reinterpret_cast<const char*>(flashBytes_.data()), static_cast<std::streamsize>(count));
    position_ += count;
    length_ = std::max(length_, position_);
    return checkStream();
}

}  // namespace vorant::formats
