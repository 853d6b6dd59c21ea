#include "ports/jtag/bridges/JtagSpiBridge.h"

#include <stdexcept>

namespace vorant::ports::jtag {

JtagSpiBridge::JtagSpiBridge(const BridgeSettings& settings)
    : delay_(settings.misoDelay.value_or(static_cast<unsigned>(settings.chain.tapCount()))) {}

void JtagSpiBridge::encode(const BitBuffer& mosi, bool reads, BitBuffer& dr) const {
    const std::size_t spiBits = mosi.size();
    if (spiBits == 0 || spiBits > 0x100000000ull)
        throw std::invalid_argument("a jtagspi transfer holds 1 to 2^32 bits, not " + std::to_string(spiBits));
    const std::uint64_t length = spiBits - 1;
    // Marker and length in one 33-bit field: the length goes out most
    // significant bit first, so its bit 31 is scan bit 1.
    std::uint8_t header[5] = {1, 0, 0, 0, 0};
    for (unsigned k = 0; k < 32; ++k) {
        const std::size_t scanBit = 1 + k;
        if ((length >> (31 - k)) & 1u) header[scanBit / 8] |= static_cast<std::uint8_t>(1u << (scanBit % 8));
    }
    dr.clear();
    dr.append(header, kHeaderBits);
    dr.append(mosi.data(), spiBits);
    if (reads) dr.appendZeros(delay_);
}

}  // namespace vorant::ports::jtag
