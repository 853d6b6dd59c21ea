#pragma once
#include "HostExport.h"

#include <cstddef>
#include <cstdint>
#include <vector>

// A fixed-length bit vector as the scan port sees it.
//
// Storage: bit i lives in byte i / 8 under mask 1 << (i % 8). Bit 0 is the
// first bit shifted to the flash (or, in a capture, the first bit received).
// SPI sends bytes most significant bit first, so a data byte occupies eight
// consecutive vector bits with its MSB at the lowest index: the storage byte
// of a byte-aligned data byte is that byte bit-reversed.
class VORANT_HOST_API RLBitVec {
public:
    // Every bit set to value.
    RLBitVec(std::size_t bits, bool value);
    // The first `bits` bits of a byte buffer laid out as data bytes are on the
    // wire: byte k fills bits 8k..8k+7, MSB at the lowest index. This equals
    // updateBitField(data, 0, bits, true) on a zeroed vector, so a page built
    // from file bytes compares equal to the same page captured from the flash.
    RLBitVec(const unsigned char* data, std::size_t bits);
    RLBitVec(const RLBitVec&) = default;
    RLBitVec& operator=(const RLBitVec&) = default;
    virtual ~RLBitVec();

    virtual std::size_t length() const;
    virtual bool equals(const RLBitVec& other) const;
    // 0xFFFFFFFF when every bit is 1 (a blank page), 0 when every bit is 0,
    // kNotUniform otherwise. An empty vector answers 0xFFFFFFFF.
    virtual std::uint64_t uniformValue() const;
    static constexpr std::uint64_t kNotUniform = ~std::uint64_t{0};

    // Counts from the end: testBit(0) is bit length()-1, the last bit shifted.
    bool testBit(std::size_t fromEnd) const;
    bool getBit(std::size_t i) const;
    void setBit(std::size_t i, bool value);

    // Text of '0'/'1' characters: character j goes to bit start + j.
    void updateBitField(const char* bits, int start);
    // A number in `length` bits from `start`. msbFirst: bit start + k carries
    // value bit length-1-k (the wire order of an address); otherwise value
    // bit k.
    void updateBitField(unsigned value, int start, int length, bool msbFirst);
    // `length` bits of byte data from `start`. msbFirst: byte k fills bits
    // start+8k .. start+8k+7 with its MSB at the lowest index (the wire order
    // of data); otherwise its LSB. Byte-aligned fields are copied a byte at a
    // time.
    void updateBitField(const char* data, int start, int length, bool msbFirst);

    // The storage buffer, byteLength() bytes; bits past length() are 0.
    unsigned char* data() { return bytes_.data(); }
    const unsigned char* data() const { return bytes_.data(); }
    std::size_t byteLength() const { return bytes_.size(); }

private:
    void requireField(long long start, long long length) const;

    std::size_t bits_;
    std::vector<unsigned char> bytes_;
};
