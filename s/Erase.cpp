// Bulk erase of the whole flash: optional unlock, write enable, the erase
// instruction, a fixed wait and (on a cable, unless switched off) busy
// polling, then the optional Quad Enable clear, the register display and the
// write disable.

#include "s/DeviceMessages.h"
#include "s/Type1SPIDevice.h"

#include "host/ScanPort.h"
#include "host/UT_CMDARGS.h"

namespace {

bool switchGiven(const UT_CMDARGS* args, const char* name) {
    return args != nullptr && args->getsw(name, 0) != nullptr;
}

}  // namespace

bool Type1SPIDevice::erase(int index, UT_CMDARGS* args) {
    // A failed unlock is not fatal: protected memory shows up in the verify.
    if (useUnlockSr_) unlockStatusRegister(index, args);

    const bool enabled = spienable(index, args);

    // A recording cannot poll, so it waits the longest time the erase may take.
    const bool fileMode = port().outputMode();
    const int fixedWait = fileMode ? bulkEraseMaxWaitTime_ : bulkEraseWaitTime_;
    // program erases with "-e"/"-erase" and shows the registers itself.
    const bool showRegisters = !(switchGiven(args, "-e") || switchGiven(args, "-erase"));

    const std::unique_ptr<RLBitVec> instruction = instructionFrame(bulkEraseInstruction_);
    const std::size_t bits = instruction->length();
    RLBitVec tdiMask(bits, true);
    RLBitVec tdo(bits, false);
    RLBitVec tdoMask(bits, false);

    DEVICE_MESSAGE().issueStatus("'%d': Erasing Device.\n", index);
    port().comment("//Loading device with 'erase' instruction.\n");
    const bool sent = port().shift(ScanStage::kWhole, instruction.get(), &tdiMask, &tdo, &tdoMask) && enabled;
    // Without its write enable or its instruction the flash never started
    // erasing, and polling would find it idle at once.
    if (!sent) {
        DEVICE_MESSAGE().issueError("'%d': Erase did not start, the erase instruction could not be sent to the device.\n",
                                    index);
        spidisable(index, args);
        return false;
    }
    const bool waited = port().wait(fixedWait, true);

    if (!fileMode && usesPolling()) {
        // Polling proves the end of the erase, whatever the fixed wait did.
        if (!checkStatus(index, bulkEraseMaxWaitTime_, bulkEraseWaitTimeInc_)) {
            DEVICE_MESSAGE().issueError("'%d': Erase did not complete.\n", index);
            Port_MsgManData::debugStub("'%d': Device has exceeded the allocated time.\n", index);
            spidisable(index, args);
            return false;
        }
        port().isCancelled(2);  // the erase is complete; a cancel now changes nothing
    } else if (!waited) {
        // Nothing but the wait stands for the erase's end here.
        DEVICE_MESSAGE().issueError("'%d': Erase did not complete, the wait for it failed.\n", index);
        spidisable(index, args);
        return false;
    }

    bool result = true;
    // An erased flash is left in x1 mode: the Quad Enable bit is cleared.
    if (switchGiven(args, "-qebit") || x4Read_) {
        result = writeQuadEnableBit(index, args, false);
        if (!result) DEVICE_MESSAGE().issueError("'%d': The Quad Enable bit could not be cleared.\n", index);
    }
    if (showRegisters) displayStatusRegisterBits(index);

    const bool disabled = spidisable(index, args);
    return disabled && result;
}
