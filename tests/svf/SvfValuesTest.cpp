// The building blocks of the SVF text: bit strings, hex values, seconds.

#include "ports/svf/BitBuffer.h"
#include "ports/svf/SvfHex.h"
#include "ports/svf/SvfSeconds.h"

#include <gtest/gtest.h>

#include <cmath>
#include <cstdlib>
#include <random>

namespace vorant::svf {
namespace {

TEST(BitBuffer, AppendsAtAnyBitOffsetAsBitByBitWould) {
    std::mt19937 random(7);
    for (int round = 0; round < 200; ++round) {
        BitBuffer buffer;
        std::vector<bool> reference;
        for (int piece = 0; piece < 5; ++piece) {
            const std::size_t bits = random() % 29;
            std::vector<std::uint8_t> source((bits + 7) / 8 + 1);
            for (auto& byte : source) byte = static_cast<std::uint8_t>(random());
            if (random() % 4 == 0) {
                buffer.appendZeros(bits);
                reference.insert(reference.end(), bits, false);
            } else {
                buffer.append(source.data(), bits);
                for (std::size_t i = 0; i < bits; ++i) reference.push_back((source[i / 8] >> (i % 8)) & 1);
            }
        }
        ASSERT_EQ(buffer.size(), reference.size());
        ASSERT_EQ(buffer.byteSize(), (reference.size() + 7) / 8);
        for (std::size_t i = 0; i < reference.size(); ++i) ASSERT_EQ(buffer.bit(i), reference[i]) << i;
        // Source bits past the appended length never leak in.
        if (reference.size() % 8 != 0) {
            EXPECT_EQ(buffer.data()[buffer.byteSize() - 1] >> (reference.size() % 8), 0);
        }
    }
}

TEST(SvfHex, WritesMostSignificantDigitFirst) {
    struct Case {
        std::vector<std::uint8_t> bytes;
        std::size_t bits;
        std::size_t digitsPerLine;
        const char* text;
    };
    const Case cases[] = {
        {{0x60}, 8, 128, "60"},
        {{0x05}, 3, 128, "5"},
        {{0xA0, 0x00}, 16, 128, "00A0"},
        {{0x01, 0x02}, 12, 128, "201"},
        {{0x12, 0x34, 0x56}, 24, 6, "563412"},
        {{0x12, 0x34, 0x56}, 24, 4, "\n5634\n12"},
        {{0x12, 0x34, 0x05}, 20, 4, "\n534\n12"},
        {{}, 0, 128, ""},
    };
    for (const Case& c : cases) {
        std::string text = "(";
        appendSvfHex(text, c.bytes.data(), c.bits, c.digitsPerLine);
        EXPECT_EQ(text, std::string("(") + c.text) << c.bits << " bits";
    }
}

TEST(SvfHex, ReadsDigitsBackIntoTheSameBits) {
    struct Case {
        const char* digits;
        std::size_t bits;
        std::vector<std::uint8_t> bytes;  // empty: refused
    };
    const Case cases[] = {
        {"00A0", 16, {0xA0, 0x00}},
        {"a0", 16, {0xA0, 0x00}},  // leading zeros implied
        {"0F", 4, {0x0F}},
        {"1F", 4, {}},
        {"10", 5, {0x10}},
        {"20", 5, {}},
        {"0000000001", 1, {0x01}},
        {"2", 1, {}},
        {"201", 12, {0x01, 0x02}},
    };
    for (const Case& c : cases) {
        BitBuffer bits;
        const auto error = parseSvfHex(c.digits, c.bits, bits);
        if (c.bytes.empty()) {
            EXPECT_TRUE(error.has_value()) << c.digits;
            continue;
        }
        ASSERT_FALSE(error.has_value()) << c.digits << ": " << *error;
        EXPECT_EQ(bits.size(), c.bits);
        EXPECT_EQ(std::vector<std::uint8_t>(bits.data(), bits.data() + bits.byteSize()), c.bytes) << c.digits;
    }
}

TEST(SvfSeconds, WritesMicrosecondsExactlyInScientificForm) {
    const std::pair<std::uint64_t, const char*> cases[] = {
        {0, "0.0E+00"},        {1, "1.0E-06"},          {10, "1.0E-05"},
        {700, "7.0E-04"},      {1500, "1.5E-03"},       {15000, "1.5E-02"},
        {1000000, "1.0E+00"},  {40000000, "4.0E+01"},   {123456789, "1.23456789E+02"},
        {2147483647, "2.147483647E+03"}, {10000000000000ull, "1.0E+07"},
    };
    for (const auto& [microseconds, text] : cases) EXPECT_EQ(formatSvfSeconds(microseconds), text);
}

TEST(SvfSeconds, ReadsBackToTheSameMicroseconds) {
    std::mt19937 random(3);
    for (int i = 0; i < 10000; ++i) {
        const std::uint64_t microseconds = random() % 2147483648u;
        const double seconds = std::strtod(formatSvfSeconds(microseconds).c_str(), nullptr);
        ASSERT_EQ(static_cast<std::uint64_t>(std::llround(seconds * 1e6)), microseconds);
    }
}

}  // namespace
}  // namespace vorant::svf
