// The device's life: the factory, construction from the part database,
// copy assignment and destruction.

#include "s/Type1SPIDevice.h"

#include "host/UT_STR.h"

#include <new>

namespace {

// A flag property is set only by the text "TRUE", in any letter case.
bool isTrueText(const char* text) { return UT_STR::ICompare(text, "TRUE") == 0; }

}  // namespace

extern "C" Type1SPIDevice* create_type1_spi_device(const char* partName) {
    return new (std::nothrow) Type1SPIDevice(partName);
}

Type1SPIDevice::Type1SPIDevice(const char* partName) : SPIDevice(partName) {
    init(partName);
    // The environment is read once per device, after the configuration: a
    // later change affects only devices created afterwards.
    dontUsePolling_ = Port_Env::GetEnv("QRX_VORANT_ENV_DONT_USE_POLLING");
    x4Programming_ = false;
    skipIdCodeCheck_ = Port_Env::GetEnv("QRX_VORANT_SKIPIDCODECHECK") != nullptr;
}

Type1SPIDevice::~Type1SPIDevice() = default;

Type1SPIDevice& Type1SPIDevice::operator=(const Type1SPIDevice& other) {
    SPIDevice::operator=(other);

    dontUsePolling_ = other.dontUsePolling_;

    enableInstruction_ = other.enableInstruction_;
    disableInstruction_ = other.disableInstruction_;
    identificationInstruction_ = other.identificationInstruction_;
    readStatusInstruction_ = other.readStatusInstruction_;
    readStatus2Instruction_ = other.readStatus2Instruction_;
    writeStatusInstruction_ = other.writeStatusInstruction_;
    readInstruction_ = other.readInstruction_;
    fastReadInstruction_ = other.fastReadInstruction_;
    pageProgramInstruction_ = other.pageProgramInstruction_;
    sectorEraseInstruction_ = other.sectorEraseInstruction_;
    bulkEraseInstruction_ = other.bulkEraseInstruction_;
    deepDownInstruction_ = other.deepDownInstruction_;
    releaseInstruction_ = other.releaseInstruction_;
    readSignatureInstruction_ = other.readSignatureInstruction_;
    writeSrInstruction_ = other.writeSrInstruction_;
    idCode_ = other.idCode_;

    programWaitTimeInc_ = other.programWaitTimeInc_;
    bulkEraseWaitTimeInc_ = other.bulkEraseWaitTimeInc_;
    writeStatusWaitTime_ = other.writeStatusWaitTime_;
    sectorEraseWaitTime_ = other.sectorEraseWaitTime_;
    addressSize_ = other.addressSize_;
    readSize_ = other.readSize_;
    pageSize_ = other.pageSize_;
    dataStartIndex_ = other.dataStartIndex_;
    pageAddressStartIndex_ = other.pageAddressStartIndex_;
    totalShiftSize_ = other.totalShiftSize_;
    programMaxWaitTime_ = other.programMaxWaitTime_;
    programWaitTime_ = other.programWaitTime_;
    bulkEraseWaitTime_ = other.bulkEraseWaitTime_;
    progressEraseWaitTimeInc_ = other.progressEraseWaitTimeInc_;
    bulkEraseMaxWaitTime_ = other.bulkEraseMaxWaitTime_;
    wrsrMaxWaitTime_ = other.wrsrMaxWaitTime_;
    progressEraseWaitTime_ = other.progressEraseWaitTime_;
    progressEraseMaxWaitTime_ = other.progressEraseMaxWaitTime_;
    deviceSize_ = other.deviceSize_;
    instructionLength_ = other.instructionLength_;
    statusRegisterLength_ = other.statusRegisterLength_;
    releaseFromStandbyMaxWaitTime_ = other.releaseFromStandbyMaxWaitTime_;

    skipIdCodeCheck_ = other.skipIdCodeCheck_;
    useRes_ = other.useRes_;
    useUnlockSr_ = other.useUnlockSr_;
    readStatusEnabled_ = other.readStatusEnabled_;
    x4Programming_ = other.x4Programming_;
    x2Read_ = other.x2Read_;
    x4Read_ = other.x4Read_;
    cachedStatus_ = other.cachedStatus_;
    return *this;
}

// Reads the whole configuration once, in the database's key order; no value
// is checked here (the part database validates part files when it loads
// them).
void Type1SPIDevice::init(const char* partName) {
    ConstraintsManager& database = constraints();
    auto text = [&](const char* key, Port::StringBase<char>& field) {
        field = database.getDeviceStringProperty(partName, key);
    };
    auto number = [&](const char* key, std::int32_t& field) {
        field = database.getDeviceLongProperty(partName, key);
    };
    auto flag = [&](const char* key, bool& field) {
        field = isTrueText(database.getDeviceStringProperty(partName, key));
    };

    text("ENABLE_INSTRUCTION", enableInstruction_);
    text("DISABLE_INSTRUCTION", disableInstruction_);
    text("IDENTIFICATION_INSTRUCTION", identificationInstruction_);
    text("READSTATUS_INSTRUCTION", readStatusInstruction_);
    text("READSTATUS2_INSTRUCTION", readStatus2Instruction_);
    text("WRITESTATUS_INSTRUCTION", writeStatusInstruction_);
    text("READ_INSTRUCTION", readInstruction_);
    text("FASTREAD_INSTRUCTION", fastReadInstruction_);
    text("PAGEPROGRAM_INSTRUCTION", pageProgramInstruction_);
    text("SECTORERASE_INSTRUCTION", sectorEraseInstruction_);
    text("BULKERASE_INSTRUCTION", bulkEraseInstruction_);
    text("DEEPDOWN_INSTRUCTION", deepDownInstruction_);
    text("RELEASE_INSTRUCTION", releaseInstruction_);
    text("READSIGNATURE_INSTRUCTION", readSignatureInstruction_);
    text("WRITESR_INSTRUCTION", writeSrInstruction_);
    number("PROGRAM_WAITTIME_INC", programWaitTimeInc_);
    number("BULKERASE_WAITTIME_INC", bulkEraseWaitTimeInc_);
    number("WRITESTATUS_WAITTIME", writeStatusWaitTime_);
    number("SECTORERASE_WAITTIME", sectorEraseWaitTime_);
    number("ADDRESS_SIZE", addressSize_);
    number("READ_SIZE", readSize_);
    number("PAGE_SIZE", pageSize_);
    number("DATA_START_INDEX", dataStartIndex_);
    number("PAGE_ADDRESS_START_INDEX", pageAddressStartIndex_);
    number("TOTAL_SHIFT_SIZE", totalShiftSize_);
    number("PROGRAM_MAXWAITTIME", programMaxWaitTime_);
    number("PROGRAM_WAITTIME", programWaitTime_);
    number("BULKERASE_WAITTIME", bulkEraseWaitTime_);
    number("PROGRESS_ERASE_WAITTIME_INC", progressEraseWaitTimeInc_);
    number("BULKERASE_MAXWAITTIME", bulkEraseMaxWaitTime_);
    number("WRSR_MAXWAITTIME", wrsrMaxWaitTime_);

    // Progress accounting keeps its own copy of the erase times.
    progressEraseWaitTime_ = bulkEraseWaitTime_;
    progressEraseMaxWaitTime_ = bulkEraseMaxWaitTime_;

    number("DEVICE_SIZE", deviceSize_);
    text("IDCODE", idCode_);

    useRes_ = false;
    useUnlockSr_ = false;
    number("INSTRUCTION_LENGTH", instructionLength_);
    flag("USE_RES", useRes_);
    flag("USE_UNLOCKSR", useUnlockSr_);
    readStatusEnabled_ = false;
    flag("READ_STATUS_ENABLED", readStatusEnabled_);
    x2Read_ = false;
    flag("X2_READ", x2Read_);
    x4Read_ = false;
    flag("X4_READ", x4Read_);
    number("STATUS_REGISTER_LENGTH", statusRegisterLength_);
    number("RELEASE_FROM_STANDBY_MAX_WAITTIME", releaseFromStandbyMaxWaitTime_);

    cachedStatus_ = 0xFF;  // no cached value
}
