#pragma once
// A growable bit string in scan order: bit i is bit (i % 8) of byte i / 8,
// bit 0 first in time. Bits past size() are always 0, so whole bytes can be
// compared, searched and printed without masking.

#include <cstddef>
#include <cstdint>
#include <vector>

namespace vorant::svf {

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

// True when any of the first `bits` bits of a scan-order buffer is set.
bool anyBitSet(const std::uint8_t* bytes, std::size_t bits);

}  // namespace vorant::svf
