#pragma once
#include "ConfigData.h"
#include "ConstraintsManager.h"
#include "HostExport.h"
#include "RLBitVec.h"
#include "ScanPort.h"

#include <map>
#include <string>

class UT_CMDARGS;

namespace DeviceNS {
enum ATTRIBUTE {
    ATTR_IDCODE = 10,      // last ID read, hexadecimal text
    ATTR_BLANK = 28,       // "TRUE" or "FALSE"
    ATTR_DATA_WIDTH = 80,  // data width; "4" selects x4
};
}  // namespace DeviceNS

// The operations a host drives a device through, in their fixed table order.
// Every default reports that the device does not support it and returns
// false.
class VORANT_HOST_API DeviceOperation {
public:
    virtual bool program(int index, UT_CMDARGS* args);
    virtual bool verify(int index, UT_CMDARGS* args);
    virtual bool erase(int index, UT_CMDARGS* args);
    virtual bool readIdcode(int index, bool display);
    virtual bool checkIdcode(int index);
    virtual bool validateInstance(int index);
    virtual bool blankCheck(int index, UT_CMDARGS* args);
    virtual bool readbackToFile(int index, UT_CMDARGS* args);
    virtual bool checksum(int index, UT_CMDARGS* args);
    virtual ~DeviceOperation();
    virtual int getOperationProgressCount(const char* operation, UT_CMDARGS* args);
    virtual bool releaseFromStandBy(int index, UT_CMDARGS* args);
    virtual bool spienable(int index, UT_CMDARGS* args);
    virtual bool spidisable(int index, UT_CMDARGS* args);
    virtual bool readDeviceStatus(int index, UT_CMDARGS* args);
    virtual bool compensate(int index);

protected:
    bool notSupported(int index, const char* operation);
};

// A device on the host's chain: its part name, attribute store,
// configuration data, and the host-owned scan port.
class VORANT_HOST_API Device : public DeviceOperation {
public:
    // Throws VorantException when the part database does not know partName.
    explicit Device(const char* partName);
    Device(const Device&) = default;
    Device& operator=(const Device&) = default;
    ~Device() override;

    const char* getPartName() const { return partName_.c_str(); }

    // Attributes: setAttribute copies the text.
    void setAttribute(DeviceNS::ATTRIBUTE attribute, const char* value, bool);
    const char* getAttribute(DeviceNS::ATTRIBUTE attribute) const;

    // Host-side wiring (not owned).
    void setConfigData(ConfigDataReader* reader) { configData_ = reader; }
    ConfigDataReader* getConfigData() const { return configData_; }
    void setCifReader(CifReader* reader) { cifReader_ = reader; }
    CifReader* getCifReader(const char* name) const;
    // Hands the device its port; null gives back the failing null port.
    void setScanPort(ScanPort* port);
    ScanPort* getScanPort() const { return port_; }

    // Checksum accumulator: both sums are CRC-32 (the zlib polynomial) of
    // the bytes in flash order, carried between calls in sum1 (first
    // vector) and sum2 (second vector). The final call reports both sums and
    // answers whether they match; null vectors with a length of 0 add
    // nothing.
    bool rowChecksum(int index, RLBitVec* first, int firstBits, RLBitVec* second, int secondBits,
                     bool final, int& sum1, int& sum2, int, int);

protected:
    ConstraintsManager& constraints() const { return ConstraintsManager::instance(); }
    ScanPort& port() const { return *port_; }

private:
    std::string partName_;
    std::map<int, std::string> attributes_;
    ConfigDataReader* configData_ = nullptr;
    CifReader* cifReader_ = nullptr;
    ScanPort* port_;
};

class VORANT_HOST_API SPIDevice : public Device {
public:
    explicit SPIDevice(const char* partName);
    // Reverses the bit order of a byte: a captured byte becomes the register
    // value the flash sent.
    static unsigned char swapBits(unsigned char value);
};

// CRC-32 (reflected 0xEDB88320, as zlib's crc32): continues crc over bytes.
VORANT_HOST_API std::uint32_t crc32Update(std::uint32_t crc, const unsigned char* bytes,
                                          std::size_t count);
