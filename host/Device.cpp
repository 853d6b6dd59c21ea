#include "Device.h"

#include "BitReversal.h"
#include "Port_MsgManData.h"
#include "VorantException.h"

#include <array>

#ifndef VORANT_REVISION
#  define VORANT_REVISION "unversioned"
#endif

namespace {

constexpr const char* kSource = "host/Device";

NullScanPort& nullPort() {
    static NullScanPort port;
    return port;
}

constexpr std::array<std::uint32_t, 256> makeCrcTable() {
    std::array<std::uint32_t, 256> table{};
    for (std::uint32_t n = 0; n < 256; ++n) {
        std::uint32_t c = n;
        for (int k = 0; k < 8; ++k) c = (c & 1u) ? 0xEDB88320u ^ (c >> 1) : c >> 1;
        table[n] = c;
    }
    return table;
}
constexpr auto kCrcTable = makeCrcTable();

// Folds a vector's bytes, in flash order, into a running CRC. A captured
// storage byte is the flash byte bit-reversed.
std::uint32_t foldVector(std::uint32_t crc, const RLBitVec* vector, int bits) {
    if (!vector || bits <= 0) return crc;
    const std::size_t usable = std::min<std::size_t>(static_cast<std::size_t>(bits), vector->length());
    const std::size_t bytes = usable / 8;
    crc = ~crc;
    for (std::size_t i = 0; i < bytes; ++i)
        crc = kCrcTable[(crc ^ vorant::kReversedBits[vector->data()[i]]) & 0xFFu] ^ (crc >> 8);
    return ~crc;
}

}  // namespace

std::uint32_t crc32Update(std::uint32_t crc, const unsigned char* bytes, std::size_t count) {
    crc = ~crc;
    for (std::size_t i = 0; i < count; ++i) crc = kCrcTable[(crc ^ bytes[i]) & 0xFFu] ^ (crc >> 8);
    return ~crc;
}

// ---- DeviceOperation: every operation is unsupported until a device says otherwise.

bool DeviceOperation::notSupported(int index, const char* operation) {
    Port_MsgManData::createObject("Vorant", kSource, __LINE__, VORANT_REVISION)
        .issueError("'%d': This device does not support the operation '%s'.\n", index, operation);
    return false;
}

bool DeviceOperation::program(int index, UT_CMDARGS*) { return notSupported(index, "program"); }
bool DeviceOperation::verify(int index, UT_CMDARGS*) { return notSupported(index, "verify"); }
bool DeviceOperation::erase(int index, UT_CMDARGS*) { return notSupported(index, "erase"); }
bool DeviceOperation::readIdcode(int index, bool) { return notSupported(index, "readIdcode"); }
bool DeviceOperation::checkIdcode(int index) { return notSupported(index, "checkIdcode"); }
bool DeviceOperation::validateInstance(int index) { return notSupported(index, "validateInstance"); }
bool DeviceOperation::blankCheck(int index, UT_CMDARGS*) { return notSupported(index, "blankCheck"); }
bool DeviceOperation::readbackToFile(int index, UT_CMDARGS*) { return notSupported(index, "readbackToFile"); }
bool DeviceOperation::checksum(int index, UT_CMDARGS*) { return notSupported(index, "checksum"); }
DeviceOperation::~DeviceOperation() = default;
int DeviceOperation::getOperationProgressCount(const char*, UT_CMDARGS*) { return 0; }
bool DeviceOperation::releaseFromStandBy(int index, UT_CMDARGS*) { return notSupported(index, "releaseFromStandBy"); }
bool DeviceOperation::spienable(int index, UT_CMDARGS*) { return notSupported(index, "spienable"); }
bool DeviceOperation::spidisable(int index, UT_CMDARGS*) { return notSupported(index, "spidisable"); }
bool DeviceOperation::readDeviceStatus(int index, UT_CMDARGS*) { return notSupported(index, "readDeviceStatus"); }
bool DeviceOperation::compensate(int index) { return notSupported(index, "compensate"); }

// ---- Device

Device::Device(const char* partName) : partName_(partName ? partName : ""), port_(&nullPort()) {
    if (!ConstraintsManager::instance().hasPart(partName_))
        throw VorantException("unknown part '" + partName_ + "'");
}

Device::~Device() = default;

void Device::setAttribute(DeviceNS::ATTRIBUTE attribute, const char* value, bool) {
    if (value)
        attributes_[attribute] = value;
    else
        attributes_.erase(attribute);
}

const char* Device::getAttribute(DeviceNS::ATTRIBUTE attribute) const {
    auto it = attributes_.find(attribute);
    return it == attributes_.end() ? nullptr : it->second.c_str();
}

CifReader* Device::getCifReader(const char*) const { return cifReader_; }

void Device::setScanPort(ScanPort* port) { port_ = port ? port : &nullPort(); }

bool Device::rowChecksum(int index, RLBitVec* first, int firstBits, RLBitVec* second, int secondBits, bool final,
                         int& sum1, int& sum2, int, int) {
    sum1 = static_cast<int>(foldVector(static_cast<std::uint32_t>(sum1), first, firstBits));
    sum2 = static_cast<int>(foldVector(static_cast<std::uint32_t>(sum2), second, secondBits));
    if (!final) return true;
    const auto fileSum = static_cast<unsigned>(sum1), deviceSum = static_cast<unsigned>(sum2);
    auto message = [&]() -> Port_MsgManData& {
        return Port_MsgManData::createObject("Vorant", kSource, __LINE__, VORANT_REVISION);
    };
    message().issueStatus("'%d': Checksum (CRC-32) of the configuration data: 0x%08X\n", index, fileSum);
    message().issueStatus("'%d': Checksum (CRC-32) of the device contents:    0x%08X\n", index, deviceSum);
    if (fileSum == deviceSum) {
        message().issueStatus("'%d': Checksums match.\n", index);
        return true;
    }
    message().issueError("'%d': Checksums differ.\n", index);
    return false;
}

// ---- SPIDevice

SPIDevice::SPIDevice(const char* partName) : Device(partName) {}

unsigned char SPIDevice::swapBits(unsigned char value) { return vorant::kReversedBits[value]; }
