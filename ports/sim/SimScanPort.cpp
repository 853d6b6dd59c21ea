#include "ports/sim/SimScanPort.h"

#include "ports/sim/WireByteOrder.h"

#include <algorithm>
#include <array>
#include <exception>

namespace vorant::sim {

namespace {

static_assert(std::atomic<bool>::is_always_lock_free, "the cancel flag must be usable from a signal handler");

constexpr std::size_t kChunkBytes = 4096;

}  // namespace

SimScanPort::SimScanPort(FlashConfig config, FaultPlan faults, const std::string& backingFile)
    : model_(std::move(config), faults, backingFile), faults_(std::move(faults)) {}

bool SimScanPort::fail(const std::string& why) {
    lastError_ = "simulated cable: " + why;
    return false;
}

bool SimScanPort::opensPageTransaction(int stage, const RLBitVec* tdi) const {
    if ((stage != ScanStage::kWhole && stage != ScanStage::kOpen) || tdi == nullptr || tdi->length() <= 8)
        return false;
    return model_.movesPageData(kWireMirror[tdi->data()[0]]);
}

bool SimScanPort::shiftFails(int stage, const RLBitVec* tdi) {
    const std::string call = "shift call " + std::to_string(stats_.shiftCalls);
    if (faults_.disconnectAtShift > 0 && stats_.shiftCalls >= static_cast<std::uint64_t>(faults_.disconnectAtShift)) {
        // The first failure says what happened; the ones after it follow.
        if (!disconnected_) fail(call + " failed: the simulated cable was unplugged (injected fault)");
        disconnected_ = true;
        return true;
    }
    if (opensPageTransaction(stage, tdi)) {
        ++pageTransactions_;
        if (faults_.failWaitAtPage > 0 && pageTransactions_ == static_cast<std::uint64_t>(faults_.failWaitAtPage))
            failWaitFromCall_ = stats_.waitCalls + 1;
        if (faults_.failShiftAtPage > 0 && pageTransactions_ == static_cast<std::uint64_t>(faults_.failShiftAtPage)) {
            fail(call + " (page transaction " + std::to_string(pageTransactions_) + ") failed (injected fault)");
            return true;
        }
    }
    if (faults_.failAllShifts ||
        (faults_.failShiftAt > 0 && stats_.shiftCalls == static_cast<std::uint64_t>(faults_.failShiftAt))) {
        fail(call + " failed (injected fault)");
        return true;
    }
    return false;
}

void SimScanPort::select() {
    model_.select();
    ++stats_.transactions;
}

void SimScanPort::shiftBits(const RLBitVec& tdi, RLBitVec* tdo, const RLBitVec*, bool capture) {
    clock(tdi, capture ? tdo : nullptr);
}

void SimScanPort::deselect() { model_.deselect(); }

bool SimScanPort::shift(int stage, RLBitVec* tdi, RLBitVec*, RLBitVec* tdo, RLBitVec*) {
    const bool ok = shiftOnce(stage, tdi, tdo);
    lastCallFailed_ = !ok;
    return ok;
}

bool SimScanPort::shiftOnce(int stage, RLBitVec* tdi, RLBitVec* tdo) {
    ++stats_.shiftCalls;
    if (shiftFails(stage, tdi)) return false;
    try {
        const ports::FramingFault fault = framer_.shift(stage, tdi, tdo, nullptr);
        // A continuing shift after a failed opening one: the opening shift's
        // reason is the one worth keeping.
        if (fault == ports::FramingFault::NothingOpen && lastCallFailed_) return false;
        if (fault != ports::FramingFault::None) return fail(ports::describeFramingFault(fault, stage));
        return true;
    } catch (const std::exception& error) {
        return fail(error.what());
    }
}

bool SimScanPort::shiftWrite(int stage, RLBitVec* tdi, int) { return shift(stage, tdi, nullptr, nullptr, nullptr); }

bool SimScanPort::transaction(const RLBitVec& tdi, RLBitVec* captured) {
    ++stats_.shiftCalls;
    if (shiftFails(ScanStage::kWhole, &tdi)) return false;
    try {
        framer_.closeOpenTransaction();
        select();
        clock(tdi, captured);
        deselect();
        return true;
    } catch (const std::exception& error) {
        return fail(error.what());
    }
}

bool SimScanPort::wait(int time, bool) {
    ++stats_.waitCalls;
    try {
        framer_.closeOpenTransaction();
    } catch (const std::exception& error) {
        return fail(error.what());
    }
    if (disconnected_) return false;
    if (faults_.failAllWaits ||
        (faults_.failWaitAt > 0 && stats_.waitCalls == static_cast<std::uint64_t>(faults_.failWaitAt)) ||
        stats_.waitCalls == failWaitFromCall_)
        return fail("wait call " + std::to_string(stats_.waitCalls) + " failed (injected fault)");
    if (time < 0) return fail("wait of a negative time (" + std::to_string(time) + " us)");
    model_.advance(static_cast<std::uint64_t>(time) * 1000u);
    return true;
}

bool SimScanPort::isCancelled(int) {
    ++stats_.cancelQueries;
    if (faults_.cancelAfterPages >= 0 && pageTransactions_ >= static_cast<std::uint64_t>(faults_.cancelAfterPages))
        return true;
    return cancel_.load();
}

SimStats SimScanPort::stats() const {
    SimStats stats = stats_;
    stats.simulatedNs = model_.now();
    return stats;
}

// Clocks the bits of tdi onto the chip, storing MISO into the first
// captureBits bits of captured. captured may be tdi itself: every storage
// byte is read before the same byte is written.
void SimScanPort::clock(const RLBitVec& tdi, RLBitVec* captured) {
    const std::size_t bits = tdi.length();
    const std::size_t wholeBytes = bits / 8;
    const std::size_t tailBits = bits % 8;
    const std::size_t captureBits = captured ? std::min(captured->length(), bits) : 0;
    const std::size_t captureWholeBytes = captureBits / 8;
    const std::uint8_t* in = tdi.data();
    std::uint8_t* out = captured ? captured->data() : nullptr;

    // Stores a received wire byte into storage byte `index` where it lies
    // within the captured bits.
    auto store = [&](std::size_t index, std::uint8_t wireByte) {
        if (index < captureWholeBytes) {
            out[index] = kWireMirror[wireByte];
        } else if (index * 8 < captureBits) {
            const auto keep = static_cast<std::uint8_t>((1u << (captureBits - index * 8)) - 1);
            out[index] = static_cast<std::uint8_t>((out[index] & ~keep) | (kWireMirror[wireByte] & keep));
        }
    };

    std::uint8_t wire[kChunkBytes];
    std::uint8_t received[kChunkBytes];
    for (std::size_t done = 0; done < wholeBytes;) {
        const std::size_t n = std::min(kChunkBytes, wholeBytes - done);
        for (std::size_t k = 0; k < n; ++k) wire[k] = kWireMirror[in[done + k]];
        const bool capturing = done * 8 < captureBits;
        model_.clockBytes(wire, capturing ? received : nullptr, n);
        if (capturing) {
            for (std::size_t k = 0; k < n; ++k) store(done + k, received[k]);
        }
        done += n;
    }

    if (tailBits) {
        const std::uint8_t tailIn = in[wholeBytes];
        for (std::size_t bit = 0; bit < tailBits; ++bit) {
            const bool miso = model_.clockBit(((tailIn >> bit) & 1) != 0);
            const std::size_t index = wholeBytes * 8 + bit;
            if (index < captureBits) {
                const auto mask = static_cast<std::uint8_t>(1u << bit);
                out[wholeBytes] = miso ? static_cast<std::uint8_t>(out[wholeBytes] | mask)
                                       : static_cast<std::uint8_t>(out[wholeBytes] & ~mask);
            }
        }
    }
    stats_.bitsShifted += bits;
}

}  // namespace vorant::sim
