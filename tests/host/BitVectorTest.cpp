// The bit vector and its conversions carry the wire contract: bit 0 is the
// first bit on the wire and every byte travels MSB first.
#include "host/Hex2Bit.h"
#include "host/RLBitVec.h"
#include "host/VorantException.h"

#include <gtest/gtest.h>

#include <string>

namespace {

std::string bits(const RLBitVec& v) {
    std::string s;
    for (std::size_t i = 0; i < v.length(); ++i) s += v.getBit(i) ? '1' : '0';
    return s;
}

TEST(BitVector, FieldOutsideTheVectorThrowsAndWritesNothing) {
    RLBitVec v(16, false);
    const unsigned char data[] = {0xFF, 0xFF, 0xFF};
    EXPECT_THROW(v.updateBitField(reinterpret_cast<const char*>(data), 8, 16, true), VorantException);
    EXPECT_THROW(v.updateBitField(0xFFFFu, 4, 16, true), VorantException);
    EXPECT_THROW(v.updateBitField("111111111111111111", 0), VorantException);
    EXPECT_THROW(v.updateBitField(1u, -1, 4, true), VorantException);
    EXPECT_THROW(v.updateBitField("10x1", 0), VorantException);
    EXPECT_EQ(bits(v), std::string(16, '0'));
    EXPECT_THROW(v.testBit(16), VorantException);
}

TEST(BitVector, UniformValueAnswersBlankOnlyForAllOnes) {
    struct Case { std::size_t bits; int clearBit; std::uint64_t expected; };
    const Case cases[] = {
        {2048, -1, 0xFFFFFFFFu}, {13, -1, 0xFFFFFFFFu}, {2048, 0, RLBitVec::kNotUniform},
        {2048, 2047, RLBitVec::kNotUniform}, {13, 12, RLBitVec::kNotUniform}, {3, -1, 0xFFFFFFFFu},
    };
    for (const auto& c : cases) {
        RLBitVec v(c.bits, true);
        if (c.clearBit >= 0) v.setBit(static_cast<std::size_t>(c.clearBit), false);
        EXPECT_EQ(v.uniformValue(), c.expected) << c.bits << " bits, bit " << c.clearBit << " clear";
    }
    EXPECT_EQ(RLBitVec(64, false).uniformValue(), 0u);
}

TEST(Conversions, HexTextsAreRightAlignedInTheirWidth) {
    EXPECT_THROW(Hex2Bit::convertHexString2BitVec("EF40G8", 24, true, false, false), VorantException);
    // Wider than asked: the low-order (last) digits stay.
    auto wide = Hex2Bit::convertHexString2BitVec("1EF4018", 24, true, false, false);
    EXPECT_STREQ(Hex2Bit::convertBinData2HexString(wide->data(), 24, true, false), "EF4018");
    auto signature = Hex2Bit::convertHexString2BitVec("EF4017", 8, true, false, false);
    EXPECT_STREQ(Hex2Bit::convertBinData2HexString(signature->data(), 8, true, false), "17");
    auto padded = Hex2Bit::convertHexString2BitVec("18", 24, true, false, false);
    EXPECT_STREQ(Hex2Bit::convertBinData2HexString(padded->data(), 24, true, false), "000018");
}

TEST(Conversions, BinaryStringMapsCharacterJToBitJ) {
    auto v = Hex2Bit::convertBinString2BitVec("10011111", 8, true);
    EXPECT_EQ(v->length(), 8u);
    EXPECT_EQ(v->data()[0], 0xF9) << "opcode 9F sent MSB first is the storage byte reversed";
    EXPECT_THROW(Hex2Bit::convertBinString2BitVec("101", 8, true), VorantException);
}

}  // namespace
