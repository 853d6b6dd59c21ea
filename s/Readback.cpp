// Readback: reads the whole flash, page by page, into the file named by
// "-f"/"-file" through the host's configuration data writer. Pages are
// handed over as captured; the writer puts each byte back in flash order.

#include "s/DeviceMessages.h"
#include "s/ReadCommandFrame.h"
#include "s/Type1SPIDevice.h"

#include "host/ConfigData.h"
#include "host/ScanPort.h"
#include "host/UT_CMDARGS.h"
#include "host/UT_STR.h"

#include <cstdint>

namespace {

// The file name a switch carries; null when it is absent or names none.
const char* fileNameOf(const UT_CMDARGS& args, const char* switchName) {
    const UT_CMDSWINFO* fileSwitch = args.getsw(switchName, 0);
    if (fileSwitch == nullptr) return nullptr;
    const char* name = fileSwitch->getargtxt(0);
    return (name != nullptr && *name != '\0') ? name : nullptr;
}

// The file name of "-f", else of "-file"; null when neither names one.
const char* readbackFileName(const UT_CMDARGS* args) {
    if (args == nullptr) return nullptr;
    const char* name = fileNameOf(*args, "-f");
    return name != nullptr ? name : fileNameOf(*args, "-file");
}

}  // namespace

bool Type1SPIDevice::readbackToFile(int index, UT_CMDARGS* args) {
    const char* givenName = readbackFileName(args);
    if (givenName == nullptr) {
        DEVICE_MESSAGE().issueStatus("'%d': No file name specified...\n", index);
        DEVICE_MESSAGE().issueStatus("'%d': Readback terminated\n", index);
        return false;
    }
    // Pages advance by whole bytes; a page under one byte would never
    // advance the address (or, at 0 bits, the count).
    if (pageSize_ / 8 <= 0) {
        DEVICE_MESSAGE().issueError("'%d': Readback terminated, PAGE_SIZE (%d bits) is smaller than one byte.\n",
                                    index, pageSize_);
        return false;
    }
    const char* fileName = UT_STR::Dup(givenName);

    // The writer comes first, so a file that cannot be written costs no scan.
    const std::unique_ptr<ConfigDataWriter> writer(
        ConfigDataWriter::CreateWriter(fileName, getPartName(), nullptr));
    if (!writer) {
        DEVICE_MESSAGE().issueError("'%d': Readback terminated, the file '%s' cannot be written.\n", index,
                                    fileName);
        return false;
    }
    bool written = writer->beginWrite();

    bool result = spienable(index, args);

    const std::size_t pageBits = static_cast<std::size_t>(pageSize_);
    vorant::device::ReadCommandFrame readCommand(readInstruction_, readSize_, pageAddressStartIndex_, addressSize_);
    // Also the data sent out: each page's read shifts out the page before it
    // (zeros for the first), which the flash ignores.
    RLBitVec capture(pageBits, false);
    RLBitVec pageOnes(pageBits, true);

    DEVICE_MESSAGE().issueStatus("'%d': Performing readback on device...\n", index);
    port().comment("//Performing readback.\n");

    const int addressStep = pageSize_ / 8;
    const int captureBits = static_cast<int>(capture.length());
    unsigned address = 0;
    int fileOffset = 0;
    std::int64_t bitsCovered = 0;  // wide: a flash near 2^31 bits must not overflow the count
    bool cancelled = false;
    bool pageFailed = false;
    if (deviceSize_ > 0) {
        // The last page is read whole even when it reaches past DEVICE_SIZE.
        do {
            bitsCovered += pageSize_;
            bool read = readCommand.open(port(), address, "//Loading device with 'read' instruction.\n");
            read = port().shift(ScanStage::kCaptureClose, &capture, &pageOnes, &capture, &pageOnes) && read;
            // A page that was not read would go into the file as a copy of
            // the page before it.
            if (!read) {
                DEVICE_MESSAGE().issueError("'%d': Readback terminated, the page at address 0x%X could not be read.\n",
                                            index, address);
                pageFailed = true;
                break;
            }
            written &= writer->writeData(capture.data(), fileOffset, captureBits, 0);
            fileOffset += addressStep;
            address += static_cast<unsigned>(addressStep);
            cancelled = port().isCancelled(2);
        } while (!cancelled && bitsCovered < deviceSize_);
    }
    written &= writer->endWrite();

    // The pages read are in the file whatever happened; only a complete,
    // clean run is reported as a success.
    const bool stoppedEarly = cancelled && bitsCovered < deviceSize_;
    if (stoppedEarly) DEVICE_MESSAGE().issueStatus("'%d': Readback cancelled.\n", index);
    if (!result && !pageFailed)
        DEVICE_MESSAGE().issueError("'%d': Readback failed, a scan to the device did not succeed.\n", index);
    result = result && !pageFailed;
    if (!written)
        DEVICE_MESSAGE().issueError("'%d': Readback failed, the file '%s' could not be written.\n", index,
                                    fileName);
    if (result && written && !stoppedEarly) {
        DEVICE_MESSAGE().issueStatus("'%d': Reaback completed successfully.\n", index);
        return true;
    }
    return false;
}
