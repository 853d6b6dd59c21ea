// Identification: reading the 24-bit ID code or the 8-bit electronic
// signature, and checking it against the part's expected IDCODE.

#include "s/Type1SPIDevice.h"

#include "host/Hex2Bit.h"
#include "host/ScanPort.h"
#include "host/UT_STR.h"
#include "s/DeviceMessages.h"

namespace {

constexpr int kIdCodeBits = 24;
constexpr int kSignatureDummyBits = 24;
constexpr int kSignatureBits = 8;

}  // namespace

// The capture vector starts out holding the expected ID: whatever it holds
// after the scans is taken as the ID read.
bool Type1SPIDevice::readIdcode(int index, bool display) {
    if (skipIdCodeCheck_) return true;

    const std::unique_ptr<RLBitVec> instruction = instructionFrame(identificationInstruction_);
    const std::size_t instructionBits = instruction->length();
    RLBitVec instructionOnes(instructionBits, true);
    RLBitVec instructionZeros(instructionBits, false);
    RLBitVec idOnes(kIdCodeBits, true);
    const std::unique_ptr<RLBitVec> capture =
        Hex2Bit::convertHexString2BitVec(idCode_.c_str(), kIdCodeBits, true, false, false);

    port().comment("//Loading device with 'read id' instruction.\n");
    bool ok = port().shift(ScanStage::kWhole, instruction.get(), &instructionOnes, &instructionZeros,
                           &instructionZeros);
    ok = port().shift(ScanStage::kOpen, instruction.get(), &instructionOnes, &instructionZeros,
                      &instructionZeros) && ok;
    ok = port().shift(ScanStage::kCaptureClose, &idOnes, &idOnes, capture.get(), &idOnes) && ok;

    // The capture was preloaded with the expected ID: after a failed read it
    // holds that, not an answer of the flash.
    if (!ok) {
        if (display) DEVICE_MESSAGE().issueStatus("'%d': IDCODE could not be read.\n", index);
        setAttribute(DeviceNS::ATTR_IDCODE, "", true);
        return false;
    }
    // The text belongs to the host's text pool.
    const char* idText = Hex2Bit::convertBinData2HexString(capture->data(), kIdCodeBits, true, false);
    if (display) DEVICE_MESSAGE().issueStatus("'%d': IDCODE is '%s' (in hex).\n", index, idText);
    setAttribute(DeviceNS::ATTR_IDCODE, idText, true);
    return true;
}

bool Type1SPIDevice::readElectronicSignature(int index, bool display) {
    if (skipIdCodeCheck_) return true;

    const std::unique_ptr<RLBitVec> instruction = instructionFrame(readSignatureInstruction_);
    const std::size_t instructionBits = instruction->length();
    RLBitVec instructionOnes(instructionBits, true);
    RLBitVec instructionZeros(instructionBits, false);
    RLBitVec dummyOnes(kSignatureDummyBits, true);
    RLBitVec dummyZeros(kSignatureDummyBits, false);
    RLBitVec signatureOnes(kSignatureBits, true);
    const std::unique_ptr<RLBitVec> capture =
        Hex2Bit::convertHexString2BitVec(idCode_.c_str(), kSignatureBits, true, false, false);

    port().comment("//Loading device with 'read sig' instruction.\n");
    bool ok = port().shift(ScanStage::kOpen, instruction.get(), &instructionOnes, &instructionZeros,
                           &instructionZeros);
    ok = port().shift(ScanStage::kContinue, &dummyOnes, &dummyOnes, &dummyZeros, &dummyZeros) && ok;
    ok = port().shift(ScanStage::kCaptureClose, &signatureOnes, &signatureOnes, capture.get(),
                      &signatureOnes) && ok;
    ok = port().wait(releaseFromStandbyMaxWaitTime_, true) && ok;

    if (!ok) {
        if (display) DEVICE_MESSAGE().issueStatus("'%d': Electronic signature could not be read.\n", index);
        setAttribute(DeviceNS::ATTR_IDCODE, "", true);
        return false;
    }
    const char* signatureText =
        Hex2Bit::convertBinData2HexString(capture->data(), kSignatureBits, true, false);
    if (display) DEVICE_MESSAGE().issueStatus("'%d': IDCODE is '%s' (in hex).\n", index, signatureText);
    setAttribute(DeviceNS::ATTR_IDCODE, signatureText, true);
    return true;
}

// A failed read fails the check: a flash that never answered is never
// taken for the right one.
bool Type1SPIDevice::checkIdcode(int index) {
    const bool read = useRes_ ? readElectronicSignature(index, true) : readIdcode(index, true);
    if (!read) DEVICE_MESSAGE().issueStatus("Read ID Code failed.\n ");

    if (skipIdCodeCheck_) {
        DEVICE_MESSAGE().issueStatus("'%d': Idcode check skipped.\n", index);
        return true;
    }

    if (read && UT_STR::ICompare(idCode_.c_str(), getAttribute(DeviceNS::ATTR_IDCODE)) == 0) {
        DEVICE_MESSAGE().issueStatus("'%d': ID Check passed.\n ", index);
        return true;
    }

    DEVICE_MESSAGE().issueStatus("'%d': ID Check failed.\n", index);
    DEVICE_MESSAGE().issueInfo("The operation did not complete successfully.\n");
    return false;
}

// One stand-alone read-ID scan ahead of the check; its outcome does not
// matter.
bool Type1SPIDevice::compensate(int /*index*/) {
    const std::unique_ptr<RLBitVec> instruction = instructionFrame(identificationInstruction_);
    const std::size_t instructionBits = instruction->length();
    RLBitVec instructionOnes(instructionBits, true);
    RLBitVec instructionZeros(instructionBits, false);

    port().comment("//Loading device with 'read id' instruction.\n");
    port().shift(ScanStage::kWhole, instruction.get(), &instructionOnes, &instructionZeros,
                 &instructionZeros);
    return true;
}

bool Type1SPIDevice::validateInstance(int index) {
    compensate(index);
    return checkIdcode(index);
}
