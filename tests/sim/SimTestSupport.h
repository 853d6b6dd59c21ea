#pragma once
// Helpers of the simulator tests: a small hand-made part, and shift vectors
// built from bit texts or wire bytes and read back as bit text, with this
// file's own bit code (never the plug-in's).

#include "host/RLBitVec.h"
#include "ports/sim/FlashModel.h"

#include <cstdint>
#include <string>
#include <vector>

namespace vorant::sim::test {

using Bytes = std::vector<std::uint8_t>;
constexpr std::uint8_t kWip = 0x01, kWel = 0x02;

// 64 KiB, 256-byte pages, 4 KiB sectors, EF 40 10, signature 13h, QE in
// register 2 bit 1 written by a two-byte 01h; busy 700 us for a page,
// 45 ms for a sector, 40 ms for the array, 10 ms for a status write.
inline FlashConfig smallPart() {
    FlashConfig c;
    c.partName = "SMALL";
    c.sizeBytes = 64 * 1024;
    c.jedecId[0] = 0xEF, c.jedecId[1] = 0x40, c.jedecId[2] = 0x10;
    c.hasSignature = true, c.signature = 0x13;
    c.opReadStatus2 = 0x35;
    c.qe = QeLocation::Sr2Bit1, c.writeStatusTakesTwoBytes = true;
    c.sectorEraseUs = 45000;
    c.status2WritableMask = 0x7B;
    return c;
}

// "02 000100 A5" -> 02 00 01 00 A5 (spaces between bytes only).
inline Bytes hexBytes(const std::string& text) {
    Bytes out;
    for (std::size_t i = 0; i < text.size(); ++i)
        if (text[i] != ' ') out.push_back(static_cast<std::uint8_t>(std::stoi(text.substr(i++, 2), nullptr, 16)));
    return out;
}

// A vector of these bits, given as '0'/'1' text, first bit first.
inline RLBitVec bitVector(const std::string& text) {
    RLBitVec v(text.size(), false);
    for (std::size_t i = 0; i < text.size(); ++i)
        if (text[i] == '1') v.data()[i / 8] |= static_cast<std::uint8_t>(1 << (i % 8));
    return v;
}

// A vector whose wire bits are these bytes, each MSB first.
inline RLBitVec wireVector(const Bytes& bytes) {
    std::string text;
    for (std::uint8_t b : bytes)
        for (int k = 7; k >= 0; --k) text += (b >> k) & 1 ? '1' : '0';
    return bitVector(text);
}

// The vector's bits as '0'/'1' text, first bit first.
inline std::string bitText(const RLBitVec& v) {
    std::string out;
    for (std::size_t i = 0; i < v.length(); ++i) out += ((v.data()[i / 8] >> (i % 8)) & 1) ? '1' : '0';
    return out;
}

}  // namespace vorant::sim::test
