#pragma once
// One SVF statement as the parser delivers it, with the sticky values of the
// SVF rules already applied: a scan always carries its full TDI, MASK and
// SMASK; TDO only when the statement named it.

#include "ports/svf/BitBuffer.h"

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace vorant::svf {

enum class SvfCommand { Sdr, Sir, Hdr, Hir, Tdr, Tir, EndDr, EndIr, State, Trst, Frequency, RunTest };

// SDR, SIR and the header/trailer scans. Every buffer is `length` bits long;
// tdo is empty unless compare is set.
struct SvfScan {
    std::size_t length = 0;
    BitBuffer tdi, tdo, mask, smask;
    bool compare = false;
};

struct SvfRunTest {
    std::string runState;  // empty: the current one
    std::uint64_t clockCount = 0;
    bool hasClockCount = false;
    bool systemClock = false;  // SCK instead of TCK
    double minSeconds = 0;
    bool hasMinTime = false;
    double maxSeconds = 0;
    bool hasMaxTime = false;
    std::string endState;  // empty: unchanged
};

struct SvfStatement {
    SvfCommand command = SvfCommand::Sdr;
    std::size_t line = 0;  // where the statement starts
    SvfScan scan;          // SDR, SIR, HDR, HIR, TDR, TIR
    SvfRunTest runTest;    // RUNTEST
    // STATE (the path), ENDDR and ENDIR (one state), TRST (the mode):
    // upper-case names.
    std::vector<std::string> words;
    double frequencyHz = 0;  // FREQUENCY; 0 when it named no frequency
};

}  // namespace vorant::svf
