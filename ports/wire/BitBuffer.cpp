#include "ports/wire/BitBuffer.h"

#include <algorithm>
#include <cstring>

namespace vorant::ports {

void BitBuffer::clear() {
    bytes_.clear();
    bits_ = 0;
}

void BitBuffer::assign(std::size_t bits, bool value) {
    bytes_.assign((bits + 7) / 8, value ? 0xFF : 0x00);
    bits_ = bits;
    clearTail();
}

void BitBuffer::append(const std::uint8_t* source, std::size_t bits) {
    if (bits == 0) return;
    const std::size_t sourceBytes = (bits + 7) / 8;
    const std::size_t first = bits_ / 8;
    const unsigned offset = bits_ % 8;
    bits_ += bits;
    bytes_.resize((bits_ + 7) / 8, 0);
    if (offset == 0) {
        // The common case: every shift of an SPI transaction is whole bytes.
        std::memcpy(bytes_.data() + first, source, sourceBytes);
    } else {
        for (std::size_t k = 0; k < sourceBytes; ++k) {
            const unsigned byte = source[k];
            bytes_[first + k] |= static_cast<std::uint8_t>(byte << offset);
            if (first + k + 1 < bytes_.size())
                bytes_[first + k + 1] |= static_cast<std::uint8_t>(byte >> (8 - offset));
        }
    }
    clearTail();
}

void BitBuffer::appendZeros(std::size_t bits) {
    bits_ += bits;
    bytes_.resize((bits_ + 7) / 8, 0);
}

void BitBuffer::appendRange(const std::uint8_t* source, std::size_t begin, std::size_t count) {
    const std::size_t at = bits_;
    appendZeros(count);
    copyBits(bytes_.data(), at, source, begin, count);
}

void BitBuffer::setBit(std::size_t index, bool value) {
    const auto mask = static_cast<std::uint8_t>(1u << (index % 8));
    if (value)
        bytes_[index / 8] |= mask;
    else
        bytes_[index / 8] &= static_cast<std::uint8_t>(~mask);
}

bool BitBuffer::anySet() const {
    return std::any_of(bytes_.begin(), bytes_.end(), [](std::uint8_t b) { return b != 0; });
}

void BitBuffer::clearTail() {
    if (bits_ % 8 != 0) bytes_.back() &= static_cast<std::uint8_t>((1u << (bits_ % 8)) - 1);
}

namespace {

// Up to 8 bits of a buffer from bit `begin`, never reading past bit `end`.
std::uint8_t bitsAt(const std::uint8_t* src, std::size_t begin, std::size_t end) {
    const std::size_t index = begin / 8;
    const unsigned offset = begin % 8;
    unsigned value = src[index] >> offset;
    if (offset != 0 && (index + 1) * 8 < end) value |= static_cast<unsigned>(src[index + 1]) << (8 - offset);
    return static_cast<std::uint8_t>(value);
}

// Writes the low `count` (1..8) bits of value at bit `begin`.
void putBits(std::uint8_t* dst, std::size_t begin, std::uint8_t value, unsigned count) {
    const std::size_t index = begin / 8;
    const unsigned offset = begin % 8;
    const unsigned mask = (1u << count) - 1u;
    const unsigned bits = value & mask;
    dst[index] = static_cast<std::uint8_t>((dst[index] & ~(mask << offset)) | (bits << offset));
    if (offset + count > 8) {
        const unsigned high = offset + count - 8;
        const unsigned highMask = (1u << high) - 1u;
        dst[index + 1] = static_cast<std::uint8_t>((dst[index + 1] & ~highMask) | (bits >> (8 - offset)));
    }
}

}  // namespace

void copyBits(std::uint8_t* dst, std::size_t dstBegin, const std::uint8_t* src, std::size_t srcBegin,
              std::size_t count) {
    if (count == 0) return;
    if (dstBegin % 8 == 0 && srcBegin % 8 == 0) {
        std::memcpy(dst + dstBegin / 8, src + srcBegin / 8, count / 8);
        if (count % 8 != 0)
            putBits(dst, dstBegin + count / 8 * 8, src[(srcBegin + count) / 8], static_cast<unsigned>(count % 8));
        return;
    }
    const std::size_t end = srcBegin + count;
    for (std::size_t done = 0; done < count; done += 8) {
        const auto n = static_cast<unsigned>(std::min<std::size_t>(8, count - done));
        putBits(dst, dstBegin + done, bitsAt(src, srcBegin + done, end), n);
    }
}

bool anyBitSet(const std::uint8_t* bytes, std::size_t bits) {
    const std::size_t whole = bits / 8;
    for (std::size_t k = 0; k < whole; ++k)
        if (bytes[k] != 0) return true;
    if (bits % 8 != 0) return (bytes[whole] & ((1u << (bits % 8)) - 1)) != 0;
    return false;
}

}  // namespace vorant::ports
