// Verify and checksum share one engine: both read the flash back over the
// range the configuration data cover, one chunk per page from address 0.
// Verify compares each page with its chunk and stops at the first
// difference; checksum feeds both to the host's checksum accumulator.

#include "s/DeviceMessages.h"
#include "s/ReadCommandFrame.h"
#include "s/Type1SPIDevice.h"

#include "host/ConfigData.h"
#include "host/ScanPort.h"
#include "host/UT_CMDARGS.h"
#include "host/UT_STR.h"

namespace {

bool switchGiven(const UT_CMDARGS* args, const char* name) {
    return args != nullptr && args->getsw(name, 0) != nullptr;
}

}  // namespace

bool Type1SPIDevice::verify(int index, UT_CMDARGS* args) { return verify(index, args, "VERIFY"); }

bool Type1SPIDevice::checksum(int index, UT_CMDARGS* args) { return verify(index, args, "CHECKSUM"); }

bool Type1SPIDevice::verify(int index, UT_CMDARGS* args, const char* operation) {
    const bool checksumMode = UT_STR::IMatch(operation, "CHECKSUM") != 0;
    // A verify started by program (with "-v"/"-verify") leaves the register
    // display to program.
    const bool showStatus = !(switchGiven(args, "-v") || switchGiven(args, "-verify"));
    const char* operationName = checksumMode ? "Checksum" : "Verification";
    // "-ranges": only the bytes the data hold, read where they lie, instead
    // of every page from address 0 (holes included).
    const bool ranges = switchGiven(args, "-ranges");

    ConfigDataReader* reader = getConfigData();
    if (reader == nullptr) {
        DEVICE_MESSAGE().issueInfo(
            "'%d': %s terminated, please assign a configuration Bitstream before attempting this "
            "operation.\n",
            index, operationName);
        return false;
    }
    // Pages advance by whole bytes; a page under one byte would read
    // address 0 over and over.
    if (pageSize_ / 8 <= 0) {
        DEVICE_MESSAGE().issueError("'%d': %s terminated, PAGE_SIZE (%d bits) is smaller than one byte.\n",
                                    index, operationName, pageSize_);
        return false;
    }

    const std::size_t pageBits = static_cast<std::size_t>(pageSize_);
    vorant::device::ReadCommandFrame readCommand(readInstruction_, readSize_, pageAddressStartIndex_, addressSize_);
    RLBitVec dataTdiMask(pageBits, true);
    RLBitVec dataTdoMask(pageBits, true);

    DEVICE_MESSAGE().issueStatus("'%d': Reading device contents...\n", index);
    reader->rewind();

    // The last pair lives to the end: the final checksum call gets it.
    std::unique_ptr<RLBitVec> reference;
    std::unique_ptr<RLBitVec> capture;
    bool result = true;
    bool cancelled = false;
    const int addressStep = pageSize_ / 8;
    unsigned address = 0;
    int firstSum = 0;
    int secondSum = 0;

    const char* chunk = nullptr;
    int readerAddress = 0;
    auto nextChunk = [&] {
        return ranges ? reader->nextPiece(&chunk, &readerAddress, pageSize_) : reader->next(&chunk, &readerAddress, pageSize_);
    };
    int delivered = nextChunk();
    while (delivered > 0 && !cancelled) {
        // Only the bits delivered are compared: a short last chunk reads and
        // compares a short page.
        const auto* bytes = reinterpret_cast<const unsigned char*>(chunk);
        reference = std::make_unique<RLBitVec>(bytes, static_cast<std::size_t>(delivered));
        capture = std::make_unique<RLBitVec>(bytes, static_cast<std::size_t>(delivered));

        const unsigned readAt = ranges ? static_cast<unsigned>(readerAddress) : address;
        bool read = readCommand.open(port(), readAt, "//Loading device with 'read ' instruction.\n");
        read = port().shift(ScanStage::kCaptureClose, capture.get(), &dataTdiMask, capture.get(), &dataTdoMask) &&
               read;
        // The capture starts as a copy of the file's page, so a page that was
        // not read would compare equal: it ends the run without a verdict.
        if (!read) {
            DEVICE_MESSAGE().issueError("'%d': %s terminated, the page at address 0x%X could not be read.\n", index,
                                        operationName, static_cast<unsigned>(readerAddress));
            return false;
        }
        address += static_cast<unsigned>(addressStep);

        if (checksumMode) {
            rowChecksum(index, reference.get(), static_cast<int>(reference->length()), capture.get(),
                        static_cast<int>(capture->length()), false, firstSum, secondSum, 0, 0);
        } else if (!reference->equals(*capture)) {
            DEVICE_MESSAGE().issueStatus("Failed at address, %d\n", readerAddress);
            DEVICE_MESSAGE().issueStatus("'%d': Verification Terminated\n", index);
            return false;
        }

        cancelled = port().isCancelled(2);
        delivered = nextChunk();
    }
    // A cancel that came after the last chunk left nothing unread.
    const bool stoppedEarly = cancelled && delivered > 0;

    DEVICE_MESSAGE().issueStatus("done.\n");
    if (stoppedEarly) {
        // Part of the range was never read: no verdict and no sums.
        DEVICE_MESSAGE().issueStatus("'%d': %s cancelled.\n", index, operationName);
        result = false;
    } else if (checksumMode) {
        if (ranges)
            DEVICE_MESSAGE().issueStatus(
                "All Checksum calculations are performed on the bytes the configuration file holds, in address order "
                "(its gaps left out).\n");
        else
            DEVICE_MESSAGE().issueStatus(
                "All Checksum calculations are performed on the address range spanned by the configuration "
                "file.\n");
        result = rowChecksum(index, reference.get(), 0, capture.get(), 0, true, firstSum, secondSum, 0, 0) &&
                 result;
    } else {
        DEVICE_MESSAGE().issueStatus("'%d': Verification completed.\n", index);
    }

    if (showStatus) displayStatusRegisterBits(index);
    return result;
}
