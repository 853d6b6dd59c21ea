#pragma once
// A simulated JTAG board: one TAP (IDCODE, BYPASS and a bridge's user
// instruction) with a SPI flash behind the bridge, optionally between other
// TAPs of a chain, driven pin by pin as a
// JTAG adapter drives a real one. Time on the flash advances one TCK
// period per cycle, so a board that only counts clocks (an SVF run whose
// waits arrive as TCK cycles) still sees busy times pass.

#include "ports/jtag/JtagChain.h"
#include "ports/jtag/board/BridgeGateware.h"
#include "ports/jtag/board/TapState.h"
#include "ports/sim/FlashModel.h"

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace vorant::ports::jtag {

struct BoardSettings {
    std::string bridge = "jtagspi";
    unsigned irLength = 6;
    std::uint64_t userInstruction = 0x02;
    std::uint64_t idcodeInstruction = 0x09;
    std::uint32_t idcode = 0x0362D093;
    unsigned misoDelay = 1;
    std::uint32_t tckHz = 10'000'000;
    // Other TAPs on the chain, in BYPASS-only form: an IR of their length
    // that captures ...01, and a one-bit DR.
    JtagChain chain;
};

class BoardModel {
public:
    // The board drives `flash` (owned by the caller). Throws
    // std::invalid_argument for unusable settings.
    BoardModel(sim::FlashModel& flash, BoardSettings settings);

    // The adapter's pins. A rising TCK edge clocks the TAP (and the bridge
    // in Shift-DR); TDO is what the adapter reads before that edge.
    void setPins(bool tck, bool tms, bool tdi);
    bool tdo();
    // TRST: the TAP goes to Test-Logic-Reset.
    void resetTap();

    // One whole TCK cycle as adapters drive it (TCK low with TMS and TDI,
    // read TDO, TCK high); returns TDO.
    bool cycle(bool tms, bool tdi);
    // `count` cycles with TMS low in Run-Test/Idle, at once: only time
    // passes. (Elsewhere they are clocked one by one.)
    void idleCycles(std::uint64_t count);

    TapState state() const { return state_; }
    std::uint64_t instruction() const { return ir_; }
    std::uint64_t tckCycles() const { return cycles_; }
    sim::FlashModel& flash() { return flash_; }
    const BoardSettings& settings() const { return settings_; }

private:
    struct OtherTap {
        unsigned irLength;
        std::uint64_t irShift = 0;
        bool bypass = false;
    };

    void risingEdge(bool tms, bool tdi);
    bool bridgeSelected() const;
    bool otherTdo(const OtherTap& tap) const;
    void clockOther(OtherTap& tap, bool tdi) const;
    // TDI and TDO of the bridge's own TAP, inside the chain.
    bool bridgeTapTdi() const;
    bool bridgeTapTdo();

    sim::FlashModel& flash_;
    BoardSettings settings_;
    std::vector<OtherTap> before_, after_;  // TDI side first
    std::unique_ptr<BridgeGateware> bridge_;
    std::uint64_t tckPeriodPs_;

    TapState state_ = TapState::TestLogicReset;
    bool tck_ = false;
    std::uint64_t ir_;
    std::uint64_t irShift_ = 0;
    std::uint64_t drShift_ = 0;  // IDCODE or BYPASS while they are selected
    bool tdi_ = false;
    bool bridgeClockedThisCycle_ = false;
    std::uint64_t cycles_ = 0;
    std::uint64_t owedPs_ = 0;  // TCK time not yet handed to the flash
};

}  // namespace vorant::ports::jtag
