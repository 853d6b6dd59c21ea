#pragma once
// The ideal bridge ("direct"): chip select is asserted for the length of
// each DR scan and MISO bit i is TDO bit i. No instruction selects it. This
// is the recorder's first format, kept as it was.

#include "ports/jtag/Bridge.h"

namespace vorant::ports::jtag {

class DirectBridge final : public Bridge {
public:
    std::string name() const override { return "direct"; }
    bool selectsInstruction() const override { return false; }
    void encode(const BitBuffer& mosi, bool, BitBuffer& dr) const override { dr = mosi; }
    std::size_t misoOffset() const override { return 0; }
};

}  // namespace vorant::ports::jtag
