#pragma once
// Helpers for the simulator tests: small hand-made parts, a byte-level SPI
// master for driving a FlashModel directly, and shift vectors built from
// and decoded into wire bytes (with this file's own bit code).

#include "host/RLBitVec.h"
#include "ports/sim/FlashModel.h"

#include <cstdint>
#include <initializer_list>
#include <string>
#include <vector>

namespace vorant::sim::test {

using Bytes = std::vector<std::uint8_t>;

// A 64 KiB part with 256-byte pages and 4 KiB sectors, W25Q-like
// registers (QE in register 2 bit 1, two-byte status write) and short busy
// times.
inline FlashConfig smallPart() {
    FlashConfig c;
    c.partName = "SMALL";
    c.sizeBytes = 64 * 1024;
    c.pageBytes = 256;
    c.addressBytes = 3;
    c.jedecId[0] = 0xEF;
    c.jedecId[1] = 0x40;
    c.jedecId[2] = 0x10;
    c.hasSignature = true;
    c.signature = 0x13;
    c.opReadStatus2 = 0x35;
    c.sectorBytes = 4096;
    c.qe = QeLocation::Sr2Bit1;
    c.writeStatusTakesTwoBytes = true;
    c.pageProgramUs = 700;
    c.bulkEraseUs = 40000;
    c.sectorEraseUs = 45000;
    c.writeStatusUs = 10000;
    c.releaseUs = 3;
    c.status2WritableMask = 0x7B;
    return c;
}

constexpr std::uint64_t us(std::uint64_t microseconds) { return microseconds * 1000; }

inline Bytes addressBytes(std::uint32_t address, int count) {
    Bytes out;
    for (int i = count - 1; i >= 0; --i) out.push_back(static_cast<std::uint8_t>(address >> (8 * i)));
    return out;
}

// One transaction: select, the command bytes, `answerBytes` more bytes of
// 0x00, deselect. Returns MISO of the answer bytes only.
inline Bytes transact(FlashModel& chip, const Bytes& command, std::size_t answerBytes = 0) {
    chip.select();
    for (std::uint8_t b : command) chip.clockByte(b);
    Bytes answer;
    for (std::size_t i = 0; i < answerBytes; ++i) answer.push_back(chip.clockByte(0x00));
    chip.deselect();
    return answer;
}

inline Bytes spi(FlashModel& chip, std::initializer_list<std::uint8_t> command, std::size_t answerBytes = 0) {
    return transact(chip, Bytes(command), answerBytes);
}

inline std::uint8_t readStatus1(FlashModel& chip) { return spi(chip, {0x05}, 1)[0]; }
inline void writeEnable(FlashModel& chip) { spi(chip, {0x06}); }

inline void pageProgram(FlashModel& chip, std::uint32_t address, const Bytes& data, std::uint8_t opcode = 0x02,
                        int addressLength = 3) {
    Bytes command{opcode};
    for (std::uint8_t b : addressBytes(address, addressLength)) command.push_back(b);
    command.insert(command.end(), data.begin(), data.end());
    transact(chip, command);
}

inline Bytes readArray(FlashModel& chip, std::uint32_t address, std::size_t n, std::uint8_t opcode = 0x03,
                       int addressLength = 3) {
    Bytes command{opcode};
    for (std::uint8_t b : addressBytes(address, addressLength)) command.push_back(b);
    return transact(chip, command, n);
}

// Write enable, the page program, and time for it to finish.
inline void programPage(FlashModel& chip, std::uint32_t address, const Bytes& data) {
    writeEnable(chip);
    pageProgram(chip, address, data);
    chip.advance(us(chip.config().pageProgramUs));
}

// --- shift vectors ---------------------------------------------------------

inline std::uint8_t mirror(std::uint8_t value) {
    std::uint8_t out = 0;
    for (int bit = 0; bit < 8; ++bit)
        if (value & (1 << bit)) out = static_cast<std::uint8_t>(out | (0x80 >> bit));
    return out;
}

// A vector whose wire bits are these bytes, MSB first.
inline RLBitVec wireVector(const Bytes& bytes) {
    RLBitVec v(bytes.size() * 8, false);
    for (std::size_t i = 0; i < bytes.size(); ++i) v.data()[i] = mirror(bytes[i]);
    return v;
}

// A vector of `bits` wire bits given as a '0'/'1' text, first bit first.
inline RLBitVec bitVector(const std::string& bits) {
    RLBitVec v(bits.size(), false);
    for (std::size_t i = 0; i < bits.size(); ++i)
        if (bits[i] == '1') v.data()[i / 8] = static_cast<std::uint8_t>(v.data()[i / 8] | (1 << (i % 8)));
    return v;
}

// The wire bytes a vector carries (whole bytes only).
inline Bytes wireBytes(const RLBitVec& v) {
    Bytes out;
    for (std::size_t i = 0; i < v.length() / 8; ++i) out.push_back(mirror(v.data()[i]));
    return out;
}

// The vector's bits as text, bit 0 first.
inline std::string bitText(const RLBitVec& v) {
    std::string out;
    for (std::size_t i = 0; i < v.length(); ++i) out += ((v.data()[i / 8] >> (i % 8)) & 1) ? '1' : '0';
    return out;
}

}  // namespace vorant::sim::test
