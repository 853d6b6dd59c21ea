// The device's construction: what it reads from the part database and the
// environment, and what copy assignment carries over.

#include "FrameFixture.h"

#include "host/ConstraintsManager.h"
#include "host/VorantException.h"

namespace vorant::test::frame {
namespace {

using FrameConfiguration = FrameTest;

// Every operation of this layer that works from configuration alone, so two
// devices can be compared by what they put on the wire and say.
std::vector<std::string> wireAndMessagesOf(Type1SPIDevice& device, RecordingScanPort& port,
                                           CapturingSink& sink) {
    port.clear();
    sink.clear();
    port.scriptStatus(kReadStatus1, 1, 0x00);
    device.spienable(1, nullptr);
    device.spidisable(1, nullptr);
    device.releaseFromStandBy(1, nullptr);
    device.readStatus(1, "wip");
    device.checkStatus(1, 10, 5);
    device.validateInstance(1);
    device.displayStatusRegisterBits(1);
    device.unlockStatusRegister(1, nullptr);
    device.writeQuadEnableBit(1, nullptr, true);
    std::vector<std::string> out = port.lines();
    for (const Message& message : sink.messages()) out.push_back(message.text);
    out.push_back("erase progress " + std::to_string(device.getOperationProgressCount("erase", nullptr)));
    return out;
}

TEST_F(FrameConfiguration, FlagIsSetOnlyByTrueInAnyLetterCase) {
    const struct {
        const char* text;
        bool expected;
    } cases[] = {
        {"TRUE", true}, {"true", true}, {"True", true}, {"tRuE", true},
        {"TRUE ", false}, {"TRUE1", false}, {" TRUE", false}, {"FALSE", false}, {"", false}, {"1", false},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(std::string("flag text '") + c.text + "'");
        // READ_STATUS_ENABLED decides whether the display reads anything;
        // USE_RES whether identification reads the signature (an 8-bit
        // IDCODE suits both reads).
        Properties properties = m25p16Properties();
        properties["READ_STATUS_ENABLED"] = c.text;
        properties["USE_RES"] = c.text;
        auto device = makeDevice(properties);

        port.clear();
        device->displayStatusRegisterBits(0);
        EXPECT_EQ(port.count(ScanEvent::Kind::Shift) > 0, c.expected);

        port.clear();
        device->checkIdcode(0);
        ASSERT_FALSE(port.lines().empty());
        EXPECT_EQ(port.lines().front(), c.expected ? kCommentReadSig : kCommentReadId);
    }
}

TEST_F(FrameConfiguration, NewDeviceReadsTheEnvironmentOnceWhateverItsValue) {
    setenv("QRX_VORANT_SKIPIDCODECHECK", "", 1);  // defined, even empty, counts
    setenv("QRX_VORANT_ENV_DONT_USE_POLLING", "0", 1);
    auto configured = makeDevice();
    EXPECT_TRUE(configured->skipIdCheck());
    EXPECT_FALSE(configured->usesPolling());

    clearDeviceEnvironment();
    EXPECT_TRUE(configured->skipIdCheck());
    EXPECT_FALSE(configured->usesPolling());

    auto plain = makeDevice();
    EXPECT_FALSE(plain->skipIdCheck());
    EXPECT_TRUE(plain->usesPolling());
    EXPECT_EQ(plain->cachedStatusByte(), 0xFF);  // no cached value yet
    EXPECT_FALSE(plain->x4Programming());

    setenv("QRX_VORANT_SKIPIDCODECHECK", "1", 1);
    setenv("QRX_VORANT_ENV_DONT_USE_POLLING", "1", 1);
    EXPECT_FALSE(plain->skipIdCheck());
    EXPECT_TRUE(plain->usesPolling());
}

TEST_F(FrameConfiguration, EveryOneOfTheFortyOneKeysIsRequired) {
    const std::vector<std::string>& keys = ConstraintsManager::deviceKeys();
    ASSERT_EQ(keys.size(), 41u);
    for (const std::string& key : keys) {
        SCOPED_TRACE(key);
        Properties properties = w25q128Properties();
        ASSERT_EQ(properties.erase(key), 1u);
        addTestPart("FRAME_MISSING_KEY", properties);
        EXPECT_THROW(Type1SPIDevice("FRAME_MISSING_KEY"), VorantException);
    }
}

TEST_F(FrameConfiguration, HeldButUnusedPropertiesChangeNoScan) {
    auto reference = makeDevice(w25q128Properties(), "FRAME_HELD_A");
    const std::vector<std::string> expected = wireAndMessagesOf(*reference, port, sink);

    Properties changed = w25q128Properties();
    changed["WRITESTATUS_INSTRUCTION"] = "11111111";
    changed["FASTREAD_INSTRUCTION"] = "11111111";
    changed["SECTORERASE_INSTRUCTION"] = "11111111";
    changed["DEEPDOWN_INSTRUCTION"] = "11111111";
    changed["RELEASE_INSTRUCTION"] = "11111111";
    changed["WRITESTATUS_WAITTIME"] = "1";
    changed["SECTORERASE_WAITTIME"] = "1";
    changed["X2_READ"] = "TRUE";
    auto other = makeDevice(changed, "FRAME_HELD_A");
    EXPECT_EQ(wireAndMessagesOf(*other, port, sink), expected);
}

TEST_F(FrameConfiguration, CopyAssignmentCarriesEveryFieldOver) {
    // The source differs from the target in every value this layer uses,
    // and in its environment.
    Properties source = m25p16Properties();
    source["ENABLE_INSTRUCTION"] = "0000011000";
    source["DISABLE_INSTRUCTION"] = "0000010000";
    source["IDENTIFICATION_INSTRUCTION"] = "1001111100";
    source["READSTATUS_INSTRUCTION"] = "0000010100";
    source["READSTATUS2_INSTRUCTION"] = "0011010100";
    source["READSIGNATURE_INSTRUCTION"] = "1010101100";
    source["WRITESR_INSTRUCTION"] = "0000000100";
    source["WRSR_MAXWAITTIME"] = "123";
    source["INSTRUCTION_LENGTH"] = "12";
    source["STATUS_REGISTER_LENGTH"] = "24";
    source["READ_STATUS_ENABLED"] = "TrUe";
    source["BULKERASE_WAITTIME"] = "777";
    source["BULKERASE_MAXWAITTIME"] = "7777";
    source["PROGRESS_ERASE_WAITTIME_INC"] = "7";
    for (int i = 16; i < 24; ++i) source["STATUS_LOCATION_" + std::to_string(i)] = "HIGH" + std::to_string(i);
    setenv("QRX_VORANT_ENV_DONT_USE_POLLING", "1", 1);
    auto original = makeDevice(source, "FRAME_COPY_SOURCE");
    clearDeviceEnvironment();
    auto copy = makeDevice(w25q128Properties(), "FRAME_COPY_TARGET");

    *copy = *original;

    EXPECT_STREQ(copy->getPartName(), "FRAME_COPY_SOURCE");
    EXPECT_EQ(copy->usesPolling(), original->usesPolling());
    EXPECT_EQ(copy->skipIdCheck(), original->skipIdCheck());
    EXPECT_EQ(copy->x4Programming(), original->x4Programming());
    EXPECT_EQ(copy->cachedStatusByte(), original->cachedStatusByte());
    EXPECT_EQ(wireAndMessagesOf(*copy, port, sink), wireAndMessagesOf(*original, port, sink));

    // The skip-ID-check flag travels too.
    setenv("QRX_VORANT_SKIPIDCODECHECK", "yes", 1);
    auto skipping = makeDevice(source, "FRAME_COPY_SOURCE");
    *copy = *skipping;
    EXPECT_TRUE(copy->skipIdCheck());
}

TEST_F(FrameConfiguration, FactoryCreatesADeviceAndPassesDatabaseErrorsOn) {
    addTestPart("FRAME_FACTORY", w25q128Properties());
    std::unique_ptr<DeviceOperation> device(create_type1_spi_device("FRAME_FACTORY"));
    ASSERT_NE(device, nullptr);
    EXPECT_STREQ(static_cast<Type1SPIDevice*>(device.get())->getPartName(), "FRAME_FACTORY");
    EXPECT_THROW(create_type1_spi_device("FRAME_NO_SUCH_PART"), VorantException);
}

}  // namespace
}  // namespace vorant::test::frame
