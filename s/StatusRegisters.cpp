// The two status registers: reading one, showing both bit by bit, clearing
// the protection bits, and writing the Quad Enable bit.

#include "s/Type1SPIDevice.h"

#include "host/Hex2Bit.h"
#include "host/ScanPort.h"
#include "host/UT_STR.h"
#include "host/VorantException.h"
#include "s/DeviceMessages.h"

#include <algorithm>

namespace {

// Quad Enable is bit 1 of status register 2; captured MSB first, it sits
// under 0x40 of the raw byte.
constexpr unsigned char kRawQuadEnable = 0x40;
constexpr unsigned char kNoCachedStatus = 0xFF;
// The Quad Enable write carries register 1 and register 2, a byte each.
constexpr std::int32_t kBothRegistersBits = 16;

// A vector length from a configured bit count; a negative count means an
// empty field rather than a vector of 2^64 bits.
std::size_t fieldBits(std::int32_t bits) { return static_cast<std::size_t>(std::max<std::int32_t>(bits, 0)); }

}  // namespace

// Returns the raw byte as captured (first bit received in bit 0, so the
// register value bit-reversed). In file mode a cached status byte becomes
// the compare mask, so the recorded read checks only the bits it selects.
bool Type1SPIDevice::readStatusRegister(Port::StringBase<char> instruction, unsigned char* value) {
    const std::size_t bits = instruction.length();
    const std::unique_ptr<RLBitVec> frame = instructionFrame(instruction);
    RLBitVec capture(bits, false);
    RLBitVec ones1(bits, true), ones2(bits, true);
    RLBitVec zeros1(bits, false), zeros2(bits, false);
    RLBitVec compareMask(bits, true);

    if (port().outputMode() && cachedStatus_ != kNoCachedStatus)
        Hex2Bit::convertInt2BitVec(cachedStatus_, static_cast<int>(bits), &compareMask, false);

    port().comment("//Loading device with 'read status' instruction.\n");
    bool ok = port().shift(ScanStage::kOpen, frame.get(), &ones1, &zeros1, &zeros2);
    ok = port().shift(ScanStage::kCaptureClose, &capture, &ones2, &capture, &compareMask) && ok;

    *value = capture.byteLength() > 0 ? capture.data()[0] : 0;
    Port_MsgManData::debugStub("Status Register Read Instruction = %s, Contents =  0x%02X.\n",
                               instruction.c_str(), static_cast<unsigned>(*value));
    return ok;
}

// The contents line shows register 2 in bits 15..8 and register 1 in bits
// 7..0; the bit lines then walk the contents from bit 15 down, one line per
// configured status bit, labelled from the part database.
bool Type1SPIDevice::displayStatusRegisterBits(int index) {
    if (port().outputMode()) return true;  // nothing can be read back from a file
    if (!readStatusEnabled_) return true;

    unsigned char raw = 0;
    if (!readStatusRegister(readStatusInstruction_, &raw)) {
        DEVICE_MESSAGE().issueStatus("'%d': Error reading Status Register - 1.\n", index);
        return false;
    }
    const unsigned low = swapBits(raw);
    if (!readStatusRegister(readStatus2Instruction_, &raw)) {
        DEVICE_MESSAGE().issueStatus("'%d': Error reading Status Register - 2.\n", index);
        return false;
    }
    const unsigned contents = (static_cast<unsigned>(swapBits(raw)) << 8) | low;
    DEVICE_MESSAGE().issueStatus("%s Status Register Contents = 0x%04X.\n", getPartName(), contents);

    unsigned mask = 0x8000;
    for (int bit = statusRegisterLength_ - 1; bit >= 0; --bit, mask >>= 1) {
        Port::StringBase<char> key;
        key.doFormat("STATUS_LOCATION_%d", bit);
        Port::StringBase<char> label;
        try {
            label = constraints().getDeviceStringProperty(getPartName(), key.c_str());
        } catch (VorantException&) {
            continue;  // an unlabelled bit gets no line; its mask position is still used up
        }
        if (UT_STR::IMatch(label.c_str(), "NOT_VALID") != 0) continue;
        DEVICE_MESSAGE().issueStatus("%-50s:%10d\n", label.c_str(), (contents & mask) != 0 ? 1 : 0);
    }
    return true;
}

bool Type1SPIDevice::readDeviceStatus(int index, UT_CMDARGS* /*args*/) {
    return displayStatusRegisterBits(index);
}

// Clears the protection bits: 'write SR' followed by INSTRUCTION_LENGTH zero
// bits. The transaction is left open; the wait closes it, which is what
// starts the status write on the flash.
bool Type1SPIDevice::unlockStatusRegister(int index, UT_CMDARGS* args) {
    bool ok = spienable(index, args);
    const std::unique_ptr<RLBitVec> frame = instructionFrame(writeSrInstruction_);
    RLBitVec zeroData(fieldBits(instructionLength_), false);

    port().comment("//Loading device with 'write SR' instruction.\n");
    ok = port().shiftWrite(ScanStage::kOpen, frame.get(), 0) && ok;
    ok = port().shiftWrite(ScanStage::kContinue, &zeroData, 0) && ok;
    ok = port().wait(wrsrMaxWaitTime_, true) && ok;
    return ok;
}

// Reads both registers and writes them back with the Quad Enable bit set or
// cleared. Both reads must succeed: writing a guessed register 1 could
// change the block protection. In file mode nothing is read back, so the
// recorded register-2 read compares every bit but Quad Enable against zero,
// and a comment in the file says so.
bool Type1SPIDevice::writeQuadEnableBit(int index, UT_CMDARGS* args, bool set) {
    if (statusRegisterLength_ < kBothRegistersBits) {
        Port_MsgManData::debugStub(
            "Quad Enable write refused: STATUS_REGISTER_LENGTH %d cannot hold both status registers.\n",
            static_cast<int>(statusRegisterLength_));
        return false;
    }

    const std::unique_ptr<RLBitVec> frame = instructionFrame(writeSrInstruction_);
    RLBitVec registers(fieldBits(statusRegisterLength_), false);
    unsigned char register1 = 0;
    unsigned char register2 = 0;

    if (!readStatusRegister(readStatusInstruction_, &register1)) return false;

    if (port().outputMode()) cachedStatus_ &= static_cast<unsigned char>(~kRawQuadEnable);
    bool register2Read = false;
    try {
        register2Read = readStatusRegister(readStatus2Instruction_, &register2);
    } catch (...) {
        cachedStatus_ = kNoCachedStatus;  // the mask is for this one read only
        throw;
    }
    if (port().outputMode()) {
        port().comment(
            "// The previous SDR scan only masks the Quad Enable bit and assumes that the other bits in "
            "the Status Register-2 are all zeros. If this SDR scan fails, the mask and data must be "
            "modified to reflect the real states of these bits.\n");
        cachedStatus_ = kNoCachedStatus;
    }
    if (!register2Read) return false;

    registers.data()[0] = register1;
    registers.data()[1] = set ? static_cast<unsigned char>(register2 | kRawQuadEnable)
                              : static_cast<unsigned char>(register2 & ~kRawQuadEnable);

    bool ok = spienable(index, args);
    port().comment("//Loading device with 'write SR' instruction.\n");
    ok = port().shiftWrite(ScanStage::kOpen, frame.get(), 0) && ok;
    ok = port().shiftWrite(ScanStage::kClose, &registers, 0) && ok;
    ok = port().wait(wrsrMaxWaitTime_, true) && ok;
    return ok;
}
