#pragma once
#include "host/ScanPort.h"

#include <string>

namespace vorant::cli {

// What the tool checks on a cable before an operation writes to the chip.
struct WriteCheck {
    // Read the ID first: a chip that answers nothing (deep power-down, no
    // chip) would turn an erase into a time-out of minutes.
    bool chipMustAnswer = false;
    // ... and answer the part's own JEDEC ID: a write meant for another
    // chip (another size, other opcodes) would ruin this one.
    bool idMustMatch = false;
    // Refuse a set block-protect bit: on a part whose operations do not
    // clear them (no USE_UNLOCKSR) the chip would ignore every write.
    bool noBlockProtection = false;
};

// Runs the check on `port` for `part`. Throws ToolFailure with a line that
// names the cause and the operation that mends it.
void checkChipBeforeWrite(ScanPort& port, const std::string& part, const WriteCheck& check);

// The same check for a recording: an ID read whose expected answer is the
// part's JEDEC ID, so a player stops on another chip before anything is
// erased. Parts without a JEDEC ID record nothing. False when the port
// refused the scan.
bool recordIdCheck(ScanPort& port, const std::string& part);

// Reads status register 2 back after an operation that wrote Quad Enable
// and throws ToolFailure when the bit is not what was asked.
void checkQuadEnableAfterWrite(ScanPort& port, const std::string& part, bool expectedSet);

}  // namespace vorant::cli
