#pragma once
#include "ports/sim/FaultPlan.h"

#include <string>
#include <vector>

namespace vorant::cli {

// Adds one fault, as given to the hidden --sim-fault option, to a plan:
//   stuck-busy            the chip never leaves busy after a write
//   cancel-after=N        the port reports a cancel after N pages/polls
//   stuck-bit=ADDR:MASK[:VALUE]  bits of a byte read as VALUE (default 0)
//   protected             block protection set at power-on
//   deep-power-down       the chip starts in deep power-down
//   fail-shift=N          the N-th shift fails
//   fail-wait=N           the N-th wait fails
// Numbers are decimal or 0x hex. Throws UsageError for anything else.
void addSimFault(sim::FaultPlan& plan, const std::string& text);

sim::FaultPlan simFaultPlan(const std::vector<std::string>& texts);

}  // namespace vorant::cli
