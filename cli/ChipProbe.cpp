#include "cli/ChipProbe.h"

#include "host/RLBitVec.h"

namespace vorant::cli {

namespace {

// An instruction text as a shift vector: character j drives bit j.
RLBitVec instructionBits(const std::string& instruction) {
    RLBitVec bits(instruction.size(), false);
    for (std::size_t j = 0; j < instruction.size(); ++j) bits.setBit(j, instruction[j] == '1');
    return bits;
}

// Captured bits back to bytes: the first bit received is the most
// significant bit of the first byte.
std::vector<std::uint8_t> capturedBytes(const RLBitVec& capture, std::size_t count) {
    std::vector<std::uint8_t> bytes(count, 0);
    for (std::size_t i = 0; i < count * 8; ++i)
        if (capture.getBit(i)) bytes[i / 8] = static_cast<std::uint8_t>(bytes[i / 8] | (0x80u >> (i % 8)));
    return bytes;
}

}  // namespace

std::optional<std::vector<std::uint8_t>> ChipProbe::read(const std::string& instruction, std::size_t count) {
    RLBitVec opcode = instructionBits(instruction);
    RLBitVec opcodeOnes(opcode.length(), true), opcodeZeros(opcode.length(), false);
    RLBitVec capture(count * 8, false), captureOnes(count * 8, true);
    const bool opened = port_.shift(ScanStage::kOpen, &opcode, &opcodeOnes, &opcodeZeros, &opcodeZeros);
    const bool captured = port_.shift(ScanStage::kCaptureClose, &capture, &captureOnes, &capture, &captureOnes);
    if (!opened || !captured) return std::nullopt;
    return capturedBytes(capture, count);
}

std::optional<std::uint8_t> ChipProbe::readRegister(const std::string& instruction) {
    const auto bytes = read(instruction, 1);
    if (!bytes) return std::nullopt;
    return bytes->front();
}

std::string hexText(const std::vector<std::uint8_t>& bytes) {
    static const char kDigits[] = "0123456789ABCDEF";
    std::string text;
    for (std::uint8_t byte : bytes) {
        text += kDigits[byte >> 4];
        text += kDigits[byte & 0x0F];
    }
    return text;
}

}  // namespace vorant::cli
