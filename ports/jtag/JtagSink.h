#pragma once
// Where a JTAG port's scans go: a live adapter (OpenOCD), a simulated
// board. Every call ends in Run-Test/Idle. A call that fails returns false
// and leaves its reason in error().

#include "ports/wire/BitBuffer.h"

#include <cstdint>
#include <string>

namespace vorant::ports::jtag {

class JtagSink {
public:
    virtual ~JtagSink() = default;
    // Shifts `bits` bits of `value` into the instruction register of the
    // bridge's TAP (the others in BYPASS).
    virtual bool irScan(unsigned bits, std::uint64_t value) = 0;
    // One DR scan of the bridge's TAP; with `tdo` its TDO comes back there.
    virtual bool drScan(const BitBuffer& tdi, BitBuffer* tdo) = 0;
    // Lets `microseconds` pass with the TAP in Run-Test/Idle.
    virtual bool idle(std::uint64_t microseconds) = 0;
    // True when the TAP may have been reset since the last irScan (the
    // instruction must then be selected again).
    virtual bool tapMayHaveReset() { return false; }
    // True once the adapter is gone for good.
    virtual bool lost() const { return false; }
    virtual const std::string& error() const = 0;
};

}  // namespace vorant::ports::jtag
