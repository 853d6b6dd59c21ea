#pragma once
// The SPI serial flash device: every flash operation becomes shift vectors
// for the host's scan port, with every opcode, size and wait taken from the
// part database at construction.

#include "host/Device.h"
#include "host/PortString.h"

#include <cstdint>
#include <memory>

#if defined(VORANT_PLUGIN_BUILDING)
#  define VORANT_PLUGIN_API VORANT_EXPORT
#else
#  define VORANT_PLUGIN_API VORANT_IMPORT
#endif

class UT_CMDARGS;
class ConfigDataReader;
namespace vorant::device {
struct BlockEraseType;
}  // namespace vorant::device

namespace VORANT_TYPE1SPINS {
enum RESULT { NOT_SET = 0, WIP_SET = 1, WEL_SET = 2 };
}  // namespace VORANT_TYPE1SPINS

class VORANT_PLUGIN_API Type1SPIDevice : public SPIDevice {
public:
    explicit Type1SPIDevice(const char* partName);
    Type1SPIDevice(const Type1SPIDevice&) = default;
    Type1SPIDevice& operator=(const Type1SPIDevice& other);

    // Overrides, in the order of the table of virtual operations.
    bool program(int index, UT_CMDARGS* args) override;
    bool verify(int index, UT_CMDARGS* args) override;
    bool erase(int index, UT_CMDARGS* args) override;
    bool readIdcode(int index, bool display) override;
    bool checkIdcode(int index) override;
    bool validateInstance(int index) override;
    bool blankCheck(int index, UT_CMDARGS* args) override;
    bool readbackToFile(int index, UT_CMDARGS* args) override;
    bool checksum(int index, UT_CMDARGS* args) override;
    ~Type1SPIDevice() override;
    int getOperationProgressCount(const char* operation, UT_CMDARGS* args) override;
    bool releaseFromStandBy(int index, UT_CMDARGS* args) override;
    bool spienable(int index, UT_CMDARGS* args) override;
    bool spidisable(int index, UT_CMDARGS* args) override;
    bool readDeviceStatus(int index, UT_CMDARGS* args) override;
    bool compensate(int index) override;

    // Operations this device adds, after all inherited ones.
    // The verify and checksum engine: "CHECKSUM" (any case) selects checksum
    // mode, any other name or null verify mode.
    virtual bool verify(int index, UT_CMDARGS* args, const char* operation);
    virtual bool checkStatus(int index, int maxWait, int step);
    virtual VORANT_TYPE1SPINS::RESULT readStatus(int index, const char* bitName);
    virtual bool readElectronicSignature(int index, bool display);
    // Programs only what the configuration data cover: each block they
    // touch is read, left alone when it already holds the data, else erased
    // with the largest erase that fits and rewritten with the data and the
    // bytes around them it held; pages that end up all 0xFF are not sent.
    // "-v"/"-verify" reads every rewritten block back. In file mode nothing
    // can be read: every block is erased and only the data are written, so
    // data that cover a block only in part are refused unless
    // "-wholeblocks" accepts that the rest of such blocks is erased.
    virtual bool programBlocks(int index, UT_CMDARGS* args);

    bool displayStatusRegisterBits(int index);
    bool unlockStatusRegister(int index, UT_CMDARGS* args);
    bool writeQuadEnableBit(int index, UT_CMDARGS* args, bool set);

    // Read-only views of the state tests and hosts may inspect.
    bool skipIdCheck() const { return skipIdCodeCheck_; }
    bool usesPolling() const { return dontUsePolling_ == nullptr; }
    bool x4Programming() const { return x4Programming_; }
    unsigned char cachedStatusByte() const { return cachedStatus_; }

protected:
    bool readStatusRegister(Port::StringBase<char> instruction, unsigned char* value);

    // The instruction frame of a bare instruction: the '0'/'1' text as a
    // vector as long as the text, first character first on the wire.
    static std::unique_ptr<RLBitVec> instructionFrame(const Port::StringBase<char>& instruction);

private:
    void init(const char* partName);

    // How the last checkStatus ended, so a caller can name the cause
    // without asking the port again.
    enum class PollEnd { Idle, TimedOut, Cancelled, ConnectionLost };
    PollEnd lastPollEnd_ = PollEnd::Idle;

    // One page program of a prepared frame (address and data in it), its
    // waits and, on a cable, its polling.
    enum class PageOutcome { Written, NotSent, TimedOut, Cancelled, ConnectionLost };
    PageOutcome writePage(int index, UT_CMDARGS* args, RLBitVec& frame, bool fileMode);
    void reportPageFailure(int index, PageOutcome outcome, unsigned address);
    bool finishProgramming(int index, UT_CMDARGS* args, bool result);
    ConfigDataReader* dataToProgram(int index);
    // Write enable, the block erase with its address, the wait and, on a
    // cable, the polling; true when the erase is proven done (or, without
    // polling, waited out).
    bool eraseBlock(int index, UT_CMDARGS* args, const vorant::device::BlockEraseType& type, unsigned address,
                    bool fileMode);

    // Polling switch: QRX_VORANT_ENV_DONT_USE_POLLING's text, not owned.
    const char* dontUsePolling_ = nullptr;

    // The sixteen configuration texts.
    Port::StringBase<char> enableInstruction_;
    Port::StringBase<char> disableInstruction_;
    Port::StringBase<char> identificationInstruction_;
    Port::StringBase<char> readStatusInstruction_;
    Port::StringBase<char> readStatus2Instruction_;
    Port::StringBase<char> writeStatusInstruction_;
    Port::StringBase<char> readInstruction_;
    Port::StringBase<char> fastReadInstruction_;
    Port::StringBase<char> pageProgramInstruction_;
    Port::StringBase<char> sectorEraseInstruction_;
    Port::StringBase<char> bulkEraseInstruction_;
    Port::StringBase<char> deepDownInstruction_;
    Port::StringBase<char> releaseInstruction_;
    Port::StringBase<char> readSignatureInstruction_;
    Port::StringBase<char> writeSrInstruction_;
    Port::StringBase<char> idCode_;

    // The numeric configuration and the erase progress pair.
    std::int32_t programWaitTimeInc_ = 0;
    std::int32_t bulkEraseWaitTimeInc_ = 0;
    std::int32_t writeStatusWaitTime_ = 0;
    std::int32_t sectorEraseWaitTime_ = 0;
    std::int32_t addressSize_ = 0;
    std::int32_t readSize_ = 0;
    std::int32_t pageSize_ = 0;
    std::int32_t dataStartIndex_ = 0;
    std::int32_t pageAddressStartIndex_ = 0;
    std::int32_t totalShiftSize_ = 0;
    std::int32_t programMaxWaitTime_ = 0;
    std::int32_t programWaitTime_ = 0;
    std::int32_t bulkEraseWaitTime_ = 0;
    std::int32_t progressEraseWaitTimeInc_ = 0;
    std::int32_t bulkEraseMaxWaitTime_ = 0;
    std::int32_t wrsrMaxWaitTime_ = 0;
    std::int32_t progressEraseWaitTime_ = 0;      // erase progress pair: first wait
    std::int32_t progressEraseMaxWaitTime_ = 0;   // erase progress pair: limit
    std::int32_t deviceSize_ = 0;
    std::int32_t instructionLength_ = 0;
    std::int32_t statusRegisterLength_ = 0;
    std::int32_t releaseFromStandbyMaxWaitTime_ = 0;

    // Flags and the cached status byte.
    bool skipIdCodeCheck_ = false;
    bool useRes_ = false;
    bool useUnlockSr_ = false;
    bool readStatusEnabled_ = false;
    bool x4Programming_ = false;
    bool x2Read_ = false;
    bool x4Read_ = false;
    unsigned char cachedStatus_ = 0xFF;
};

extern "C" VORANT_PLUGIN_API Type1SPIDevice* create_type1_spi_device(const char* partName);
