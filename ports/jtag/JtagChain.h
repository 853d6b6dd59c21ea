#pragma once
// Where the bridge's TAP sits in a scan chain: the instruction-register
// lengths of the other TAPs, which stay in BYPASS while the bridge works.
// "Before" TAPs sit between TDI and the bridge's TAP, "after" TAPs between
// it and TDO.

#include <cstddef>
#include <string>
#include <vector>

namespace vorant::ports::jtag {

struct JtagChain {
    std::vector<unsigned> irLengthsBefore;
    std::vector<unsigned> irLengthsAfter;

    std::size_t tapsBefore() const { return irLengthsBefore.size(); }
    std::size_t tapsAfter() const { return irLengthsAfter.size(); }
    std::size_t tapCount() const { return 1 + tapsBefore() + tapsAfter(); }
    std::size_t irBitsBefore() const;
    std::size_t irBitsAfter() const;
};

// Parses a chain written from TDI to TDO as IR lengths with the bridge's TAP
// in brackets: "[6]" alone, "8,[6],4" between two others. Throws
// std::invalid_argument with the reason; the bridge's own IR length is
// returned through `bridgeIrLength`.
JtagChain parseJtagChain(const std::string& text, unsigned& bridgeIrLength);
// The chain written back with ':' between the TAPs ("8:[6]:4"), as it can
// stand inside a --port address.
std::string formatJtagChain(const JtagChain& chain, unsigned bridgeIrLength);

}  // namespace vorant::ports::jtag
