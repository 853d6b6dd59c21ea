#pragma once
// A growable bit string in scan order: bit i is bit (i % 8) of byte i / 8,
// bit 0 first in time. Bits past size() are always 0, so whole bytes can be
// compared, searched and printed without masking.

#include <cstddef>
#include <cstdint>
#include <vector>

namespace vorant::ports {

class BitBuffer {
public:
    BitBuffer() = default;

    std::size_t size() const { return bits_; }
    bool empty() const { return bits_ == 0; }
    std::size_t byteSize() const { return bytes_.size(); }
    const std::uint8_t* data() const { return bytes_.data(); }
    std::uint8_t* data() { return bytes_.data(); }

    void clear();
    void assign(std::size_t bits, bool value);
    // Appends the first `bits` bits of a buffer in the same layout. Bits of
    // the source past `bits` are ignored.
    void append(const std::uint8_t* source, std::size_t bits);
    void appendZeros(std::size_t bits);
    // Appends `count` bits of a scan-order buffer starting at bit `begin`.
    void appendRange(const std::uint8_t* source, std::size_t begin, std::size_t count);

    bool bit(std::size_t index) const { return (bytes_[index / 8] >> (index % 8)) & 1u; }
    void setBit(std::size_t index, bool value);
    bool anySet() const;

    friend bool operator==(const BitBuffer& a, const BitBuffer& b) {
        return a.bits_ == b.bits_ && a.bytes_ == b.bytes_;
    }

private:
    void clearTail();

    std::vector<std::uint8_t> bytes_;
    std::size_t bits_ = 0;
};

// Copies bits [srcBegin, srcBegin + count) of one scan-order buffer onto
// bits [dstBegin, dstBegin + count) of another, a byte at a time; the other
// bits of the destination stay. Bridge frames put their fields off byte
// boundaries (a marker bit comes first), so no field copy may assume one.
void copyBits(std::uint8_t* dst, std::size_t dstBegin, const std::uint8_t* src, std::size_t srcBegin,
              std::size_t count);

// True when any of the first `bits` bits of a scan-order buffer is set.
bool anyBitSet(const std::uint8_t* bytes, std::size_t bits);

}  // namespace vorant::ports
