#pragma once
// The sixteen states of a JTAG TAP controller and the move TMS makes on a
// rising TCK edge.

namespace vorant::ports::jtag {

enum class TapState {
    TestLogicReset, RunTestIdle,
    SelectDrScan, CaptureDr, ShiftDr, Exit1Dr, PauseDr, Exit2Dr, UpdateDr,
    SelectIrScan, CaptureIr, ShiftIr, Exit1Ir, PauseIr, Exit2Ir, UpdateIr,
};

TapState nextTapState(TapState state, bool tms);
const char* tapStateName(TapState state);

}  // namespace vorant::ports::jtag
