#include "ports/wire/TransactionFramer.h"

#include "host/ScanPort.h"

namespace vorant::ports {

std::string describeFramingFault(FramingFault fault, int stage) {
    switch (fault) {
    case FramingFault::None: return {};
    case FramingFault::NoTdi: return "shift without bits to drive";
    case FramingFault::NothingOpen: return "shift stage " + std::to_string(stage) + " without an open transaction";
    case FramingFault::UnknownStage: return "unknown shift stage " + std::to_string(stage);
    }
    return {};
}

void TransactionFramer::open() {
    closeOpenTransaction();
    open_ = true;
    sink_.select();
}

void TransactionFramer::closeOpenTransaction() {
    if (!open_) return;
    // Counted closed first: a sink that throws must not be deselected twice.
    open_ = false;
    sink_.deselect();
}

FramingFault TransactionFramer::shift(int stage, const RLBitVec* tdi, RLBitVec* tdo, const RLBitVec* tdoMask) {
    const bool opens = stage == ScanStage::kWhole || stage == ScanStage::kOpen;
    const bool continues =
        stage == ScanStage::kContinue || stage == ScanStage::kClose || stage == ScanStage::kCaptureClose;
    if (!opens && !continues) return FramingFault::UnknownStage;
    if (tdi == nullptr) return FramingFault::NoTdi;
    if (continues && !open_) return FramingFault::NothingOpen;

    if (opens) open();
    try {
        sink_.shiftBits(*tdi, tdo, tdoMask, stage == ScanStage::kCaptureClose);
    } catch (...) {
        open_ = false;
        throw;
    }
    if (stage != ScanStage::kOpen && stage != ScanStage::kContinue) closeOpenTransaction();
    return FramingFault::None;
}

}  // namespace vorant::ports
