// Page programming from the assigned configuration data: checks the data
// against the part, optionally unlocks and erases, writes every chunk as one
// page-program scan at consecutive addresses from 0, optionally verifies,
// then leaves the flash in x1 or x4 mode and write-disabled.

#include "s/DeviceMessages.h"
#include "s/Type1SPIDevice.h"

#include "host/ConfigData.h"
#include "host/ScanPort.h"
#include "host/UT_CMDARGS.h"
#include "host/UT_STR.h"

#include <cstdint>

namespace {

bool switchGiven(const UT_CMDARGS* args, const char* name) {
    return args != nullptr && args->getsw(name, 0) != nullptr;
}

}  // namespace

bool Type1SPIDevice::program(int index, UT_CMDARGS* args) {
    const bool fileMode = port().outputMode();

    // Every refusal comes before the first scan: a refused "program -e" must
    // not have wiped the flash already.
    ConfigDataReader* reader = dataToProgram(index);
    if (reader == nullptr) return false;
    // Pages advance by whole bytes; a page under one byte would rewrite
    // address 0 over and over.
    if (pageSize_ / 8 <= 0) {
        DEVICE_MESSAGE().issueError(
            "'%d': Programming terminated, PAGE_SIZE (%d bits) is smaller than one byte.\n", index,
            pageSize_);
        return false;
    }
    // Data past the end of the flash would wrap the page address and
    // overwrite its start.
    const unsigned dataBits = reader->dataSize();
    if (static_cast<std::int64_t>(dataBits) > deviceSize_) {
        DEVICE_MESSAGE().issueError(
            "'%d': The configuration data (%u bits) are larger than the device (%d bits).\n", index,
            dataBits, deviceSize_);
        return false;
    }

    bool result = true;
    if (useUnlockSr_) result = unlockStatusRegister(index, args);
    if (switchGiven(args, "-e") || switchGiven(args, "-erase")) {
        result = erase(index, args);
        // Pages written over data the erase left behind would hold neither
        // the old contents nor the new.
        if (!result) {
            DEVICE_MESSAGE().issueError(
                "'%d': Programming terminated, the erase did not complete; no page was written.\n", index);
            return false;
        }
    }

    const std::size_t frameBits = static_cast<std::size_t>(totalShiftSize_);
    reader->rewind();
    DEVICE_MESSAGE().issueStatus("'%d': Programming Flash.\n", index);
    // One frame for the whole run: only the address and data fields change
    // from page to page.
    RLBitVec frame(frameBits, false);
    frame.updateBitField(pageProgramInstruction_.c_str(), 0);

    const int addressStep = pageSize_ / 8;
    unsigned address = 0;
    bool cancelled = false;
    for (;;) {
        const char* chunk = nullptr;
        int chunkAddress = 0;  // pages go to consecutive addresses, whatever the reader says
        const int delivered = reader->next(&chunk, &chunkAddress, pageSize_);
        if (delivered <= 0 || cancelled) break;

        frame.updateBitField(address, pageAddressStartIndex_, addressSize_, true);
        // A short last chunk still fills the whole data field from the
        // reader's padded buffer.
        frame.updateBitField(chunk, dataStartIndex_, pageSize_, true);

        const PageOutcome outcome = writePage(index, args, frame, fileMode);
        if (outcome == PageOutcome::Cancelled) {
            cancelled = true;  // while the page was still being written
            break;
        }
        if (outcome != PageOutcome::Written) {
            reportPageFailure(index, outcome, address);
            spidisable(index, args);
            return false;
        }
        address += static_cast<unsigned>(addressStep);
        cancelled = port().isCancelled(2);
    }

    if (cancelled) {
        // The flash holds only part of the data: neither verify it nor switch
        // it to x4 reading.
        DEVICE_MESSAGE().issueStatus("'%d': Programming cancelled.\n", index);
        result = false;
    }

    if (result && (switchGiven(args, "-v") || switchGiven(args, "-verify"))) result = verify(index, args);

    return finishProgramming(index, args, result);
}

// The configuration data to program; without any, says so and gives null.
ConfigDataReader* Type1SPIDevice::dataToProgram(int index) {
    ConfigDataReader* reader = getConfigData();
    if (reader == nullptr) {
        DEVICE_MESSAGE().issueInfo(
            "'%d':Programming terminated, Please assign a configuration Bitstream before attempting "
            "this operation\n",
            index);
    }
    return reader;
}

// A page the port could not send is not in the flash: going on would end in
// a misleading time-out, or in a flash with a hole.
Type1SPIDevice::PageOutcome Type1SPIDevice::writePage(int index, UT_CMDARGS* args, RLBitVec& frame, bool fileMode) {
    const std::size_t frameBits = frame.length();
    RLBitVec tdiMask(frameBits, true);
    RLBitVec tdo(frameBits, false);
    RLBitVec tdoMask(frameBits, false);
    bool sent = spienable(index, args);
    port().comment("//Loading device with 'page program' instruction.\n");
    sent = port().shift(ScanStage::kWhole, &frame, &tdiMask, &tdo, &tdoMask) && sent;
    sent = port().wait(0, true) && sent;
    // A recording cannot poll: it waits the longest a page may take.
    sent = port().wait(fileMode ? programMaxWaitTime_ : programWaitTime_, true) && sent;
    if (!sent) return PageOutcome::NotSent;
    if (fileMode || !usesPolling() || checkStatus(index, programMaxWaitTime_, programWaitTimeInc_))
        return PageOutcome::Written;
    switch (lastPollEnd_) {
    case PollEnd::ConnectionLost: return PageOutcome::ConnectionLost;
    case PollEnd::Cancelled: return PageOutcome::Cancelled;
    default: return PageOutcome::TimedOut;
    }
}

void Type1SPIDevice::reportPageFailure(int index, PageOutcome outcome, unsigned address) {
    switch (outcome) {
    case PageOutcome::NotSent:
        DEVICE_MESSAGE().issueError(
            "'%d': Programming terminated, the page at address 0x%X could not be sent to the device.\n", index,
            address);
        break;
    case PageOutcome::ConnectionLost:
        DEVICE_MESSAGE().issueError(
            "'%d': Programming terminated at address 0x%X, the connection to the device was lost.\n", index, address);
        break;
    case PageOutcome::TimedOut:
        DEVICE_MESSAGE().issueError("'%d': Device has exceeded the allocated time.\n", index);
        break;
    default: break;
    }
}

// The end of every programming run: on success the flash is left in x4 or
// x1 mode and its registers shown; a write disable always closes the run.
bool Type1SPIDevice::finishProgramming(int index, UT_CMDARGS* args, bool result) {
    if (result) {
        x4Programming_ = false;
        if (const char* dataWidth = getAttribute(DeviceNS::ATTR_DATA_WIDTH)) {
            x4Programming_ = UT_STR::ICompare(dataWidth, "4") == 0 && x4Read_;
        } else if (CifReader* cif = getCifReader(nullptr)) {
            x4Programming_ = cif->getDataWidth() == 4 && x4Read_;
        }

        if (x4Programming_) {
            DEVICE_MESSAGE().issueStatus("'%d':Programming in x4 mode.\n", index);
            // A flash left without Quad Enable cannot be read four bits wide.
            result = writeQuadEnableBit(index, args, true) && result;
        } else {
            DEVICE_MESSAGE().issueStatus("'%d':Programming in x1 mode.\n", index);
        }
        displayStatusRegisterBits(index);
    }

    const bool disabled = spidisable(index, args);
    return disabled && result;
}
