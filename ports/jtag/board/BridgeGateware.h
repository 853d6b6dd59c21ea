#pragma once
// The logic of a JTAG-to-SPI bridge as a board carries it, driven by the
// TAP: what it does with TDI while its instruction is selected and the TAP
// shifts DR, and what it puts on TDO. Written from the bridges' behaviour
// on the wire, apart from the host's encoders: a framing mistake on one
// side then shows as a failed transfer instead of passing both ways.
//
// SPI clocks happen on the falling TCK edge in Shift-DR with the TDI the
// next rising edge samples; MISO goes through `delay` registers to TDO.

#include "ports/sim/FlashModel.h"

#include <deque>
#include <memory>
#include <string>

namespace vorant::ports::jtag {

class BridgeGateware {
public:
    BridgeGateware(sim::FlashModel& flash, unsigned delay) : flash_(flash), delay_(delay) {}
    virtual ~BridgeGateware() = default;

    // Capture-DR with the bridge's instruction.
    virtual void capture() = 0;
    // A falling TCK edge in Shift-DR; tdi is what the next rising edge samples.
    virtual void shiftClock(bool tdi) = 0;
    // The rising edge that leaves Shift-DR.
    virtual void leaveShift() = 0;
    // Update-DR.
    virtual void update() = 0;
    bool tdo() const { return tdo_; }

protected:
    // One SPI clock; TDO then shows MISO from `delay` clocks before.
    void spiClock(bool mosi);
    // A clock while chip select is high: the registers still move.
    void idleClock();
    void deselect();

    sim::FlashModel& flash_;

private:
    void pushMiso(bool miso);

    unsigned delay_;
    std::deque<bool> pipeline_;
    bool tdo_ = true;
};

// "jtagspi", "shiftdr" or "direct" (shiftdr without delay, selected by any
// instruction). Throws std::invalid_argument for other names.
std::unique_ptr<BridgeGateware> makeGateware(const std::string& bridge, sim::FlashModel& flash, unsigned delay);

}  // namespace vorant::ports::jtag
