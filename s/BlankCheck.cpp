// Blank check: reads the whole flash page by page and stops at the first
// page that is not all ones. The verdict goes to the host as attribute 28
// ("TRUE"/"FALSE"), set only when the check reached one.

#include "s/DeviceMessages.h"
#include "s/ReadCommandFrame.h"
#include "s/Type1SPIDevice.h"

#include "host/ScanPort.h"

#include <cstdint>

bool Type1SPIDevice::blankCheck(int index, UT_CMDARGS* args) {
    // Pages advance by whole bytes; a page under one byte would never
    // advance the address (or, at 0 bits, the count).
    if (pageSize_ / 8 <= 0) {
        DEVICE_MESSAGE().issueError(
            "'%d': Blank check terminated, PAGE_SIZE (%d bits) is smaller than one byte.\n", index,
            pageSize_);
        return false;
    }

    bool result = spienable(index, args);

    const std::size_t pageBits = static_cast<std::size_t>(pageSize_);
    vorant::device::ReadCommandFrame readCommand(readInstruction_, readSize_, pageAddressStartIndex_, addressSize_);
    // Ones go out and are expected back. The loop only goes on after an
    // all-ones page, so the vector is all ones again at every read.
    RLBitVec capture(pageBits, true);
    RLBitVec pageOnes(pageBits, true);

    DEVICE_MESSAGE().issueStatus("'%d': Performing blank check on device...\n", index);

    const unsigned addressStep = static_cast<unsigned>(pageSize_ / 8);
    unsigned address = 0;
    std::int64_t bitsRead = 0;  // wide: a flash near 2^31 bits must not overflow the count
    bool blank = true;
    bool cancelled = false;
    if (deviceSize_ > 0) {
        do {
            bitsRead += pageSize_;
            bool read = readCommand.open(port(), address, "//Loading device with 'read' instruction.\n");
            read = port().shift(ScanStage::kCaptureClose, &capture, &pageOnes, &capture, &pageOnes) && read;
            // The capture starts all ones, so a page that was not read would
            // pass for blank: it ends the check without a verdict.
            if (!read) {
                DEVICE_MESSAGE().issueError(
                    "'%d': Blank check terminated, the page at address 0x%X could not be read.\n", index, address);
                return false;
            }
            if (capture.uniformValue() != 0xFFFFFFFFu) {
                blank = false;
                break;
            }
            address += addressStep;
            cancelled = port().isCancelled(2);
        } while (bitsRead < deviceSize_ && !cancelled);
    }

    if (!blank) {
        DEVICE_MESSAGE().issueStatus("Failed at address, %d\n", static_cast<int>(address));
        DEVICE_MESSAGE().issueStatus("'%d': Part is not blank.\n", index);
        setAttribute(DeviceNS::ATTR_BLANK, "FALSE", true);
        return result;
    }
    // Only a check that read every page without a failed scan is a verdict.
    if (cancelled && bitsRead < deviceSize_) {
        DEVICE_MESSAGE().issueStatus("'%d': Blank check cancelled.\n", index);
        return false;
    }
    if (!result) {
        DEVICE_MESSAGE().issueError("'%d': Blank check failed, a scan to the device did not succeed.\n", index);
        return false;
    }
    DEVICE_MESSAGE().issueStatus("'%d': Part is blank.\n", index);
    setAttribute(DeviceNS::ATTR_BLANK, "TRUE", true);
    return result;
}
