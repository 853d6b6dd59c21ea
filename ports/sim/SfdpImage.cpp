#include "ports/sim/SfdpImage.h"

#include <algorithm>

namespace vorant::sim {

namespace {

constexpr std::uint32_t kBasicTableAt = 0x30;           // after the two parameter headers
constexpr std::uint32_t kBasicTableDwords = 16;
constexpr std::uint32_t kFourByteTableAt = kBasicTableAt + 4 * kBasicTableDwords;
// Each maximum time is published as typical x 2 x (factor + 1): x8.
constexpr std::uint32_t kMaximumFactorField = 3;

void putDword(std::vector<std::uint8_t>& out, std::uint32_t at, std::uint32_t value) {
    for (int i = 0; i < 4; ++i) out[at + i] = static_cast<std::uint8_t>(value >> (8 * i));
}

int log2Of(std::uint32_t value) {
    int n = 0;
    while ((1u << (n + 1)) <= value) ++n;
    return n;
}

// A time as (count - 1) and a unit index: the smallest unit whose count of
// at most `countLimit` covers `amount` (rounded up).
std::uint32_t timeField(std::uint64_t amount, const std::vector<std::uint64_t>& units, int countBits) {
    const std::uint64_t countLimit = 1ull << countBits;
    for (std::size_t unit = 0; unit < units.size(); ++unit) {
        const std::uint64_t count = std::max<std::uint64_t>(1, (amount + units[unit] - 1) / units[unit]);
        if (count <= countLimit || unit + 1 == units.size())
            return static_cast<std::uint32_t>(std::min(count, countLimit) - 1) |
                   static_cast<std::uint32_t>(unit) << countBits;
    }
    return 0;
}

// The 3-byte form of a 4-byte-address erase opcode.
int threeByteErase(int opcode) {
    if (opcode == 0x21) return 0x20;
    if (opcode == 0xDC) return 0xD8;
    if (opcode == 0x5C) return 0x52;
    return opcode;
}

}  // namespace

std::vector<std::uint8_t> sfdpImageFor(const FlashConfig& config) {
    const bool fourByte = config.addressBytes == 4;
    std::vector<std::uint8_t> out(kFourByteTableAt + (fourByte ? 8 : 0), 0xFF);
    const std::uint8_t header[8] = {'S', 'F', 'D', 'P', 6, 1, static_cast<std::uint8_t>(fourByte ? 1 : 0), 0xFF};
    std::copy(std::begin(header), std::end(header), out.begin());
    const std::uint8_t basic[8] = {0x00, 6, 1, kBasicTableDwords, kBasicTableAt, 0, 0, 0xFF};
    std::copy(std::begin(basic), std::end(basic), out.begin() + 8);
    if (fourByte) {
        const std::uint8_t table[8] = {0x84, 0, 1, 2, kFourByteTableAt, 0, 0, 0xFF};
        std::copy(std::begin(table), std::end(table), out.begin() + 16);
    }

    const int erase = threeByteErase(config.opSectorErase);
    const bool uniform4k = config.sectorBytes == 4096;
    std::uint32_t dw[kBasicTableDwords + 1] = {};  // dw[1] .. dw[16], as the standard numbers them
    dw[1] = (uniform4k ? 0x1u : 0x3u) | 0x4u | 0xE0u | static_cast<std::uint32_t>(uniform4k ? erase : 0xFF) << 8 |
            (fourByte ? 0x1u : 0x0u) << 17 | 0xFF800000u;
    dw[2] = config.sizeBytes * 8u - 1u;
    dw[5] = 0xFFFFFFEEu;  // no 2-2-2 or 4-4-4 reads
    dw[6] = dw[7] = 0xFFFF0000u;
    // One erase type: the part's smallest erase.
    dw[8] = static_cast<std::uint32_t>(log2Of(config.sectorBytes)) | static_cast<std::uint32_t>(erase) << 8;
    dw[9] = 0;
    dw[10] = kMaximumFactorField | timeField((config.sectorEraseUs + 999) / 1000, {1, 16, 128, 1000}, 5) << 4;
    dw[11] = kMaximumFactorField | static_cast<std::uint32_t>(log2Of(config.pageBytes)) << 4 |
             timeField(config.pageProgramUs, {8, 64}, 5) << 8 |
             timeField((config.bulkEraseUs + 999) / 1000, {16, 256, 4000, 64000}, 5) << 24;
    dw[12] = dw[13] = 0xFFFFFFFFu;  // no suspend and resume
    dw[14] = config.opDeepPowerDown >= 0 && config.opReleaseSignature >= 0
                 ? static_cast<std::uint32_t>(config.opDeepPowerDown) << 23 |
                       static_cast<std::uint32_t>(config.opReleaseSignature) << 15 | 0x4u
                 : 0x80000000u | 0x4u;
    // Quad Enable requirement, bits 22:20.
    std::uint32_t requirement = 0;  // no QE bit
    if (config.qe == QeLocation::Sr1Bit6) requirement = 2;
    else if (config.qe == QeLocation::Sr2Bit1) requirement = config.writeStatusTakesTwoBytes ? 5 : 6;
    dw[15] = requirement << 20;
    dw[16] = fourByte ? 1u << 29 : 0u;  // the dedicated 4-byte opcodes
    for (std::uint32_t i = 1; i <= kBasicTableDwords; ++i) putDword(out, kBasicTableAt + 4 * (i - 1), dw[i]);

    if (fourByte) {
        // Read 13h, fast read 0Ch, page program 12h, erase type 1.
        putDword(out, kFourByteTableAt, 1u << 0 | 1u << 1 | 1u << 6 | 1u << 9);
        putDword(out, kFourByteTableAt + 4, 0xFFFFFF00u | static_cast<std::uint32_t>(config.opSectorErase));
    }
    return out;
}

}  // namespace vorant::sim
