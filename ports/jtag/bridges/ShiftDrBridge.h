#pragma once
// The bridge whose chip select follows Shift-DR ("shiftdr"): every DR bit
// is an SPI clock with MOSI = TDI, and TDO is MISO registered on TCK, so
// MISO arrives `delay` clocks late (1 by default; 0 for the native modes
// that read without delay). A read scan runs on by the delay, which costs
// extra clocks of the read command only; a write is never lengthened.

#include "ports/jtag/Bridge.h"

namespace vorant::ports::jtag {

class ShiftDrBridge final : public Bridge {
public:
    explicit ShiftDrBridge(const BridgeSettings& settings) : delay_(settings.misoDelay.value_or(1)) {}
    std::string name() const override { return "shiftdr"; }
    void encode(const BitBuffer& mosi, bool reads, BitBuffer& dr) const override;
    std::size_t misoOffset() const override { return delay_; }

private:
    std::size_t delay_;
};

}  // namespace vorant::ports::jtag
