#pragma once
// The bscan_spi bridge ("jtagspi"): a DR scan carries a marker bit 1, a
// 32-bit length (SPI clocks - 1, most significant bit first), then the SPI
// bits; the bridge holds chip select for length + 1 clocks. MISO reaches
// TDO one clock late for each TAP in the chain, so a read scan runs on by
// that many bits.

#include "ports/jtag/Bridge.h"

namespace vorant::ports::jtag {

class JtagSpiBridge final : public Bridge {
public:
    static constexpr std::size_t kHeaderBits = 1 + 32;

    explicit JtagSpiBridge(const BridgeSettings& settings);
    std::string name() const override { return "jtagspi"; }
    void encode(const BitBuffer& mosi, bool reads, BitBuffer& dr) const override;
    std::size_t misoOffset() const override { return kHeaderBits + delay_; }

private:
    std::size_t delay_;
};

}  // namespace vorant::ports::jtag
