#include "ports/svf/BitBuffer.h"

#include <algorithm>
#include <cstring>

namespace vorant::svf {

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

bool anyBitSet(const std::uint8_t* bytes, std::size_t bits) {
    const std::size_t whole = bits / 8;
    for (std::size_t k = 0; k < whole; ++k)
        if (bytes[k] != 0) return true;
    if (bits % 8 != 0) return (bytes[whole] & ((1u << (bits % 8)) - 1)) != 0;
    return false;
}

}  // namespace vorant::svf
