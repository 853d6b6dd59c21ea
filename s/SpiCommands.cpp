// The small SPI transfers the memory operations are built from: write
// enable and disable, the busy-bit read and its polling loop, and the
// release from deep power-down.

#include "s/Type1SPIDevice.h"

#include "host/Hex2Bit.h"
#include "host/ScanPort.h"
#include "host/Port_MsgManData.h"
#include "host/UT_STR.h"

namespace {

// A status bit counted from the end of the capture: the flash shifts its
// status register out most significant bit first, so bit 0 (write in
// progress) is the last bit captured. A capture too short to hold the bit
// reads as clear.
bool capturedStatusBit(const RLBitVec& capture, std::size_t statusBit) {
    return statusBit < capture.length() && capture.testBit(statusBit);
}

}  // namespace

std::unique_ptr<RLBitVec> Type1SPIDevice::instructionFrame(const Port::StringBase<char>& instruction) {
    return Hex2Bit::convertBinString2BitVec(instruction.c_str(), static_cast<int>(instruction.length()),
                                            true);
}

bool Type1SPIDevice::spienable(int /*index*/, UT_CMDARGS* /*args*/) {
    const std::unique_ptr<RLBitVec> instruction = instructionFrame(enableInstruction_);
    port().comment("//Loading device with 'write enable' instruction.\n");
    return port().shiftWrite(ScanStage::kWhole, instruction.get(), 0);
}

bool Type1SPIDevice::spidisable(int /*index*/, UT_CMDARGS* /*args*/) {
    const std::unique_ptr<RLBitVec> instruction = instructionFrame(disableInstruction_);
    port().comment("//Loading device with 'write disable' instruction.\n");
    return port().shiftWrite(ScanStage::kWhole, instruction.get(), 0);
}

// A read that failed tells nothing about the flash, so it counts as busy:
// taking it for idle would send the next write enable and page to a flash
// still programming, which ignores both.
VORANT_TYPE1SPINS::RESULT Type1SPIDevice::readStatus(int index, const char* bitName) {
    const std::size_t bits = readStatusInstruction_.length();
    RLBitVec capture(bits, false);
    const std::unique_ptr<RLBitVec> instruction = instructionFrame(readStatusInstruction_);
    RLBitVec ones1(bits, true), ones2(bits, true), ones3(bits, true);
    RLBitVec zeros1(bits, false), zeros2(bits, false);

    port().comment("//Loading device with 'read status' instruction.\n");
    const bool opened = port().shift(ScanStage::kOpen, instruction.get(), &ones1, &zeros1, &zeros2);
    const bool captured = port().shift(ScanStage::kCaptureClose, &capture, &ones2, &capture, &ones3);
    const bool read = opened && captured;
    if (!read) {
        const char* reason = port().failureReason();
        Port_MsgManData::debugStub("'%d': The status read failed (%s); the flash counts as busy.\n", index,
                                   reason != nullptr ? reason : "no reason given");
    }

    if (UT_STR::ICompare(bitName, "wip") == 0) {
        if (!read) return VORANT_TYPE1SPINS::WIP_SET;
        return capturedStatusBit(capture, 0) ? VORANT_TYPE1SPINS::WIP_SET : VORANT_TYPE1SPINS::NOT_SET;
    }
    // An unread latch is not known to be set.
    if (UT_STR::ICompare(bitName, "wel") == 0)
        return read && capturedStatusBit(capture, 1) ? VORANT_TYPE1SPINS::WEL_SET : VORANT_TYPE1SPINS::NOT_SET;
    return VORANT_TYPE1SPINS::NOT_SET;
}

// Reads first and waits only while the flash is busy, so a flash that is
// already idle costs one read. The time-out is declared as soon as the
// waits add up to more than maxWait, without a last read. A cable that is
// gone ends the polling at once: every further read would fail as well.
bool Type1SPIDevice::checkStatus(int index, int maxWait, int step) {
    lastPollEnd_ = PollEnd::TimedOut;
    if (maxWait < 0) return false;
    long long elapsed = 0;  // wide, so adding steps can never overflow
    for (;;) {
        if (readStatus(index, "WIP") == VORANT_TYPE1SPINS::NOT_SET) {
            lastPollEnd_ = PollEnd::Idle;
            return true;
        }
        if (port().connectionLost()) {
            lastPollEnd_ = PollEnd::ConnectionLost;
            return false;
        }
        port().wait(step, true);
        elapsed += step;
        if (port().isCancelled(2)) {
            lastPollEnd_ = PollEnd::Cancelled;
            return false;
        }
        if (elapsed > maxWait) return false;
    }
}

// The read-signature instruction also wakes the flash from deep power-down;
// the part's release time is waited even when the shift failed.
bool Type1SPIDevice::releaseFromStandBy(int /*index*/, UT_CMDARGS* /*args*/) {
    const std::unique_ptr<RLBitVec> instruction = instructionFrame(readSignatureInstruction_);
    const std::size_t bits = instruction->length();
    RLBitVec ones(bits, true), zeros1(bits, false), zeros2(bits, false);

    port().comment("//Loading device with 'read sig' instruction.\n");
    const bool shifted = port().shift(ScanStage::kWhole, instruction.get(), &ones, &zeros1, &zeros2);
    const bool waited = port().wait(releaseFromStandbyMaxWaitTime_, true);
    return shifted && waited;
}
