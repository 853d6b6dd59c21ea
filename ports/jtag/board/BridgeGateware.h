#pragma once
// The logic of a JTAG-to-SPI bridge as a board carries it, driven by the
// TAP: what it does with TDI while its instruction is selected and the TAP
// shifts DR, and what it puts on TDO. Written from the bridges' behaviour
// on the wire, apart from the host's encoders: a framing mistake on one
// side then shows as a failed transfer instead of passing both ways.
//
// A Shift-DR clock of the TAP is an SPI clock (MOSI = TDI) on its rising
// edge, and TDO shows MISO from `delay` clocks before. With no delay MISO
// reaches TDO within the same clock, before its rising edge: the board
// then clocks the bridge as soon as TDO is read (and at the rising edge
// when nobody reads it).

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
    // One TCK in Shift-DR with this TDI.
    virtual void shiftClock(bool tdi) = 0;
    // The rising edge that leaves Shift-DR.
    virtual void leaveShift() = 0;
    // Update-DR.
    virtual void update() = 0;
    bool tdo() const { return tdo_; }
    // MISO goes straight to TDO: the clock must happen when TDO is read.
    bool clocksBeforeTdo() const { return delay_ == 0; }

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
    // MISO bits on their way to TDO: delay - 1 registers after the one
    // that drives TDO.
    std::deque<bool> pipeline_;
    bool tdo_ = true;
};

// "jtagspi", "shiftdr" or "direct" (shiftdr without delay, selected by any
// instruction). Throws std::invalid_argument for other names.
std::unique_ptr<BridgeGateware> makeGateware(const std::string& bridge, sim::FlashModel& flash, unsigned delay);

}  // namespace vorant::ports::jtag
