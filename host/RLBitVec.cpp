#include "RLBitVec.h"

#include "BitReversal.h"

#include "VorantException.h"

#include <algorithm>
#include <array>
#include <string>

namespace {

// A data byte sent MSB first occupies its eight vector bits with the MSB at
// the lowest index, which is the storage byte read backwards.
constexpr const auto& kReverse = vorant::kReversedBits;

std::size_t bytesFor(std::size_t bits) { return (bits + 7) / 8; }

}  // namespace

RLBitVec::RLBitVec(std::size_t bits, bool value)
    : bits_(bits), bytes_(bytesFor(bits), value ? 0xFF : 0x00) {
    if (value && bits % 8 != 0) bytes_.back() = static_cast<unsigned char>((1u << (bits % 8)) - 1);
}

RLBitVec::RLBitVec(const unsigned char* data, std::size_t bits) : bits_(bits), bytes_(bytesFor(bits), 0) {
    if (bits != 0) updateBitField(reinterpret_cast<const char*>(data), 0, static_cast<int>(bits), true);
}

RLBitVec::~RLBitVec() = default;

std::size_t RLBitVec::length() const { return bits_; }

bool RLBitVec::equals(const RLBitVec& other) const {
    // Bits past length() are always 0, so whole-byte comparison is exact.
    return bits_ == other.bits_ && bytes_ == other.bytes_;
}

std::uint64_t RLBitVec::uniformValue() const {
    if (bits_ == 0) return 0xFFFFFFFFu;
    const bool ones = (bytes_[0] & 1u) != 0;
    const unsigned char full = ones ? 0xFF : 0x00;
    const std::size_t whole = bits_ / 8;
    if (std::any_of(bytes_.begin(), bytes_.begin() + static_cast<long>(whole),
                    [full](unsigned char b) { return b != full; }))
        return kNotUniform;
    if (bits_ % 8 != 0) {
        const unsigned char tailMask = static_cast<unsigned char>((1u << (bits_ % 8)) - 1);
        if ((bytes_.back() & tailMask) != (full & tailMask)) return kNotUniform;
    }
    return ones ? 0xFFFFFFFFu : 0u;
}

bool RLBitVec::getBit(std::size_t i) const {
    if (i >= bits_) throw VorantException("bit " + std::to_string(i) + " is outside a vector of " +
                                          std::to_string(bits_) + " bits");
    return (bytes_[i / 8] >> (i % 8)) & 1u;
}

void RLBitVec::setBit(std::size_t i, bool value) {
    if (i >= bits_) throw VorantException("bit " + std::to_string(i) + " is outside a vector of " +
                                          std::to_string(bits_) + " bits");
    const unsigned char mask = static_cast<unsigned char>(1u << (i % 8));
    if (value)
        bytes_[i / 8] |= mask;
    else
        bytes_[i / 8] &= static_cast<unsigned char>(~mask);
}

bool RLBitVec::testBit(std::size_t fromEnd) const {
    if (fromEnd >= bits_) throw VorantException("bit " + std::to_string(fromEnd) +
                                                " from the end is outside a vector of " +
                                                std::to_string(bits_) + " bits");
    return getBit(bits_ - 1 - fromEnd);
}

void RLBitVec::requireField(long long start, long long length) const {
    if (start < 0 || length < 0 || start + length > static_cast<long long>(bits_))
        throw VorantException("a field of " + std::to_string(length) + " bits at bit " +
                              std::to_string(start) + " does not fit a vector of " +
                              std::to_string(bits_) + " bits");
}

void RLBitVec::updateBitField(const char* bits, int start) {
    const std::string text = bits ? bits : "";
    requireField(start, static_cast<long long>(text.size()));
    if (text.find_first_not_of("01") != std::string::npos)
        throw VorantException("'" + text + "' is not a text of '0' and '1' characters");
    for (std::size_t j = 0; j < text.size(); ++j) setBit(static_cast<std::size_t>(start) + j, text[j] == '1');
}

void RLBitVec::updateBitField(unsigned value, int start, int length, bool msbFirst) {
    requireField(start, length);
    if (msbFirst && start % 8 == 0 && length % 8 == 0 && length <= 32) {
        // A byte-aligned address (every page's): its bytes most significant
        // first, each mirrored into storage order.
        unsigned char* out = bytes_.data() + start / 8;
        for (int k = 0; k < length / 8; ++k) out[k] = kReverse[(value >> (length - 8 - 8 * k)) & 0xFFu];
        return;
    }
    for (int k = 0; k < length; ++k) {
        const int valueBit = msbFirst ? length - 1 - k : k;
        const bool bit = valueBit < 32 && ((value >> valueBit) & 1u);
        setBit(static_cast<std::size_t>(start + k), bit);
    }
}

void RLBitVec::updateBitField(const char* data, int start, int length, bool msbFirst) {
    requireField(start, length);
    const auto* in = reinterpret_cast<const unsigned char*>(data);
    const int wholeBytes = length / 8;
    if (start % 8 == 0) {
        // Byte-aligned: one table look-up per byte.
        unsigned char* out = bytes_.data() + start / 8;
        if (msbFirst)
            for (int k = 0; k < wholeBytes; ++k) out[k] = kReverse[in[k]];
        else
            std::copy(in, in + wholeBytes, out);
    } else {
        for (int k = 0; k < wholeBytes; ++k)
            for (int b = 0; b < 8; ++b) {
                const int valueBit = msbFirst ? 7 - b : b;
                setBit(static_cast<std::size_t>(start + 8 * k + b), (in[k] >> valueBit) & 1u);
            }
    }
    // A partial last byte contributes its leading bits in wire order.
    for (int b = 0; b < length % 8; ++b) {
        const int valueBit = msbFirst ? 7 - b : b;
        setBit(static_cast<std::size_t>(start + 8 * wholeBytes + b), (in[wholeBytes] >> valueBit) & 1u);
    }
}
