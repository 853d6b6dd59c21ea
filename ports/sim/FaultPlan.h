#pragma once
// Faults the simulated flash and its scan port can inject, for tests and
// demonstrations. A default-constructed plan injects nothing.

#include <cstdint>
#include <vector>

namespace vorant::sim {

// A byte whose `mask` bits always read as the matching bits of `value`,
// whatever was programmed or erased: a damaged cell, so verify fails there.
struct StuckBits {
    std::uint32_t address = 0;
    std::uint8_t mask = 0;
    std::uint8_t value = 0;
};

struct FaultPlan {
    // --- The chip (FlashModel) ---

    // Once a program, erase or status write sets WIP it never clears (the
    // operation's effect on the array and registers still happens).
    bool stuckBusy = false;
    // Bits that read as fixed values; memory() keeps what was written, only
    // the answers on the wire are affected.
    std::vector<StuckBits> stuckBits;
    // The block-protect bits of status register 1 are all set at power-on.
    bool protectAtPowerOn = false;
    // The chip powers up in deep power-down: only the release/signature
    // command is answered.
    bool startInDeepPowerDown = false;
    // Status register writes are ignored, as on a chip whose write-protect
    // pin is held low with its status register protected: the write is
    // accepted on the wire and changes nothing.
    bool statusWriteLocked = false;

    // --- The scan port (SimScanPort) ---

    // Calls to shift and shiftWrite are counted together from 1. The call
    // numbered failShiftAt fails (0: none); failAllShifts fails every one.
    // A failed shift puts nothing on the wire and leaves tdo alone.
    int failShiftAt = 0;
    bool failAllShifts = false;
    // Calls to wait are counted from 1. The call numbered failWaitAt fails
    // (0: none); failAllWaits fails every one. A failed wait still closes an
    // open transaction but lets no time pass.
    int failWaitAt = 0;
    bool failAllWaits = false;
    // A page transaction is one that opens with the page-program, read or
    // fast-read opcode and carries more than the opcode: one page written
    // or read. Counted from 1 as they open.
    //
    // isCancelled answers true once cancelAfterPages page transactions have
    // been made, as if the user pressed Ctrl-C right after that page.
    // Negative: never. 0: from the first query.
    int cancelAfterPages = -1;
    // The shift that opens page transaction failShiftAtPage fails (0: none).
    int failShiftAtPage = 0;
    // The first wait after page transaction failWaitAtPage opened fails
    // (0: none).
    int failWaitAtPage = 0;
    // The cable is lost at shift call disconnectAtShift: that call and
    // every shift and wait after it fail, and connectionLost() answers true
    // (0: never).
    int disconnectAtShift = 0;
};

}  // namespace vorant::sim
