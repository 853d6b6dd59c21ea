// The bridge encoders against golden frames written in drscan terms (each
// field NBITS:0xVALUE, bit 0 of a value shifted first), the jtagspi ID read
// taken from a session with OpenOCD's own driver; and the bit copier the
// frames rest on, against a bit-by-bit reference.

#include "ports/jtag/Bridge.h"
#include "ports/jtag/JtagChain.h"
#include "ports/wire/BitBuffer.h"

#include <gtest/gtest.h>

#include <random>
#include <sstream>
#include <stdexcept>

namespace vorant::ports::jtag::test {
namespace {

// "1:0x1 32:0xf8000000" -> scan-order bits.
BitBuffer fields(const std::string& text) {
    BitBuffer bits;
    std::istringstream in(text);
    for (std::string field; in >> field;) {
        const std::size_t colon = field.find(':');
        const std::size_t count = std::stoul(field.substr(0, colon));
        const std::string hex = field.substr(colon + 3);  // after "0x"
        for (std::size_t i = 0; i < count; ++i) {
            const std::size_t digit = i / 4;
            const bool bit = digit < hex.size() &&
                             ((std::stoul(hex.substr(hex.size() - 1 - digit, 1), nullptr, 16) >> (i % 4)) & 1u);
            bits.appendZeros(1);
            bits.setBit(bits.size() - 1, bit);
        }
    }
    return bits;
}

std::string text(const BitBuffer& bits) {
    std::string out;
    for (std::size_t i = 0; i < bits.size(); ++i) out += bits.bit(i) ? '1' : '0';
    return out;
}

// MOSI bits of SPI bytes, each most significant bit first.
BitBuffer spi(std::initializer_list<std::uint8_t> bytes, std::size_t trailingZeros = 0) {
    BitBuffer bits;
    for (std::uint8_t byte : bytes)
        for (int k = 7; k >= 0; --k) {
            bits.appendZeros(1);
            bits.setBit(bits.size() - 1, (byte >> k) & 1);
        }
    bits.appendZeros(trailingZeros);
    return bits;
}

struct FrameCase {
    const char* name;
    BridgeSettings settings;
    BitBuffer mosi;
    bool reads;
    const char* dr;  // fields
    std::size_t misoOffset;
};

BridgeSettings settings(const char* name, std::optional<unsigned> delay = {}, JtagChain chain = {}) {
    BridgeSettings s;
    s.name = name;
    s.misoDelay = delay;
    s.chain = chain;
    return s;
}

TEST(Bridge, EncodesGoldenFrames) {
    const JtagChain threeTaps{{8}, {4}};
    const FrameCase cases[] = {
        // OpenOCD's jtagspi driver reads the ID of a single-TAP board as
        // drscan 1 1 32 0xf8000000 8 0xf9 1 0 24 0.
        {"JtagSpiIdRead", settings("jtagspi"), spi({0x9F}, 24), true, "1:0x1 32:0xf8000000 8:0xf9 1:0x0 24:0x0", 34},
        // A write runs no extra clocks; WREN is one byte: length 7.
        {"JtagSpiWriteEnable", settings("jtagspi"), spi({0x06}), false, "1:0x1 32:0xe0000000 8:0x60", 34},
        // A page program of 256 bytes: length 2079 = 0x81F, MSB first.
        {"JtagSpiPageLength", settings("jtagspi"), spi({0x02, 0, 1, 0}, 2048), false,
         "1:0x1 32:0xf8100000 8:0x40 8:0x0 8:0x80 8:0x0 2048:0x0", 34},
        // One late clock per TAP of the chain.
        {"JtagSpiInAChain", settings("jtagspi", {}, threeTaps), spi({0x05}, 8), true,
         "1:0x1 32:0xf0000000 8:0xa0 8:0x0 3:0x0", 36},
        {"JtagSpiDelayGiven", settings("jtagspi", 0u), spi({0x05}, 8), true, "1:0x1 32:0xf0000000 8:0xa0 8:0x0", 33},
        {"ShiftDrRead", settings("shiftdr"), spi({0x9F}, 24), true, "8:0xf9 24:0x0 1:0x0", 1},
        {"ShiftDrWrite", settings("shiftdr"), spi({0x06}), false, "8:0x60", 1},
        {"ShiftDrWithoutDelay", settings("shiftdr", 0u), spi({0x9F}, 24), true, "8:0xf9 24:0x0", 0},
        {"Direct", settings("direct"), spi({0x9F}, 24), true, "8:0xf9 24:0x0", 0},
    };
    for (const FrameCase& row : cases) {
        const auto bridge = makeBridge(row.settings);
        BitBuffer dr;
        bridge->encode(row.mosi, row.reads, dr);
        EXPECT_EQ(text(dr), text(fields(row.dr))) << row.name;
        EXPECT_EQ(bridge->misoOffset(), row.misoOffset) << row.name;
        EXPECT_EQ(bridge->selectsInstruction(), std::string(row.settings.name) != "direct") << row.name;
    }
}

// The reply OpenOCD gave for that ID read, field by field:
// 01 ffffffff ff 01 1802f7. MISO bits 8..31 are the ID EF 40 18.
TEST(Bridge, DecodesTheIdFromAJtagSpiReply) {
    const BitBuffer tdo = fields("1:0x01 32:0xffffffff 8:0xff 1:0x01 24:0x1802f7");
    BitBuffer miso;
    makeBridge(settings("jtagspi"))->decode(tdo.data(), 32, miso);
    EXPECT_EQ(text(miso).substr(8), text(spi({0xEF, 0x40, 0x18})));
}

TEST(Bridge, RefusesUnknownBridgesAndEmptyTransfers) {
    EXPECT_THROW(makeBridge(settings("usbblaster")), std::invalid_argument);
    BitBuffer dr;
    EXPECT_THROW(makeBridge(settings("jtagspi"))->encode(BitBuffer{}, false, dr), std::invalid_argument);
}

TEST(JtagChain, ParsesTheBridgesPlace) {
    unsigned ir = 0;
    JtagChain chain = parseJtagChain("[6]", ir);
    EXPECT_EQ(ir, 6u);
    EXPECT_EQ(chain.tapCount(), 1u);
    chain = parseJtagChain("8,5,[10],4", ir);
    EXPECT_EQ(ir, 10u);
    EXPECT_EQ(chain.irBitsBefore(), 13u);
    EXPECT_EQ(chain.irBitsAfter(), 4u);
    EXPECT_EQ(chain.tapsBefore(), 2u);
    EXPECT_EQ(chain.tapsAfter(), 1u);
    for (const char* bad : {"6", "[6],[6]", "[0]", "[65]", "8,,[6]", "x,[6]", "[6", ""})
        EXPECT_THROW(parseJtagChain(bad, ir), std::invalid_argument) << bad;
}

// copyBits at every alignment against a bit-by-bit copy, on random data.
TEST(BitBuffer, CopyBitsAgreesWithABitByBitCopy) {
    std::mt19937 random(20261206);
    for (int round = 0; round < 2000; ++round) {
        std::vector<std::uint8_t> src(40), dst(40), expected;
        for (auto& byte : src) byte = static_cast<std::uint8_t>(random());
        for (auto& byte : dst) byte = static_cast<std::uint8_t>(random());
        expected = dst;
        const std::size_t srcBegin = random() % 100, dstBegin = random() % 100, count = random() % 200;
        for (std::size_t i = 0; i < count; ++i) {
            const bool bit = (src[(srcBegin + i) / 8] >> ((srcBegin + i) % 8)) & 1;
            auto& byte = expected[(dstBegin + i) / 8];
            const auto mask = static_cast<std::uint8_t>(1u << ((dstBegin + i) % 8));
            byte = bit ? static_cast<std::uint8_t>(byte | mask) : static_cast<std::uint8_t>(byte & ~mask);
        }
        copyBits(dst.data(), dstBegin, src.data(), srcBegin, count);
        ASSERT_EQ(dst, expected) << "src " << srcBegin << " dst " << dstBegin << " count " << count;
    }
}

}  // namespace
}  // namespace vorant::ports::jtag::test
