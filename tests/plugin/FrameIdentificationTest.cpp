// Identification: the ID code and signature reads, the ID check and the
// instance validation, as scans and as messages.

#include "FrameFixture.h"

#include <cstdio>

namespace vorant::test::frame {
namespace {

using FrameIdentification = FrameTest;

const std::string kOnes24(24, '1');
const std::string kZeros24(24, '0');

// A flash answering the ID code to the read-ID instruction and the
// signature to the read-signature instruction.
RecordingScanPort::Responder flashAnswering(unsigned id, unsigned signature) {
    return [=](const std::string& opening, std::size_t) -> std::string {
        if (opening == kReadId) return wireByte(id >> 16) + wireByte((id >> 8) & 0xFF) + wireByte(id & 0xFF);
        if (opening == kReadSignature) return wireByte(signature);
        return std::string();
    };
}

Properties signaturePart() { return m25p16Properties(); }  // USE_RES, IDCODE "14"

TEST_F(FrameIdentification, ReadIdShiftsTheInstructionTwiceThenCaptures24Bits) {
    auto device = makeDevice();
    port.responder = flashAnswering(0xEF4018, 0x17);
    EXPECT_TRUE(device->readIdcode(3, false));
    EXPECT_EQ(port.lines(), (std::vector<std::string>{kCommentReadId, "shift 0 " + kReadId,
                                                      "shift 1 " + kReadId, "shift 12 " + kOnes24}));
    for (int i : {1, 2}) {
        EXPECT_EQ(port.events[i].tdiMask, "11111111");
        EXPECT_EQ(port.events[i].tdo, "00000000");
        EXPECT_EQ(port.events[i].tdoMask, "00000000");
    }
    const ScanEvent& capture = port.events[3];
    EXPECT_EQ(capture.tdiMask, kOnes24);
    EXPECT_EQ(capture.tdoMask, kOnes24);
    // The expected bits are IDCODE in wire order: EF 40 18, each MSB first.
    EXPECT_EQ(capture.tdo, "111011110100000000011000");
    EXPECT_TRUE(statusTexts().empty());
}

TEST_F(FrameIdentification, IdReadBecomesHexTextInTheAttributeAndTheMessage) {
    const struct {
        unsigned id;
        const char* text;
    } cases[] = {{0xEF4018, "EF4018"}, {0xC22018, "C22018"}, {0x000001, "000001"}, {0x800000, "800000"}};
    auto device = makeDevice();
    for (const auto& c : cases) {
        SCOPED_TRACE(c.text);
        sink.clear();
        port.responder = flashAnswering(c.id, 0);
        EXPECT_TRUE(device->readIdcode(3, true));
        EXPECT_STREQ(device->getAttribute(DeviceNS::ATTR_IDCODE), c.text);
        EXPECT_EQ(statusTexts(), std::vector<std::string>{std::string("'3': IDCODE is '") + c.text + "' (in hex).\n"});
    }
}

TEST_F(FrameIdentification, CheckComparesTheIdReadWithIdcodeIgnoringLetterCase) {
    const struct {
        const char* idcode;
        unsigned flashId;
        bool passes;
    } cases[] = {
        {"EF4018", 0xEF4018, true},
        {"ef4018", 0xEF4018, true},
        {"Ef4018", 0xEF4018, true},
        {"EF4018", 0xEF4017, false},
        {"C22018", 0xEF4018, false},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.idcode);
        Properties properties = w25q128Properties();
        properties["IDCODE"] = c.idcode;
        auto device = makeDevice(properties);
        sink.clear();
        port.responder = flashAnswering(c.flashId, 0);
        EXPECT_EQ(device->checkIdcode(2), c.passes);
        char answered[16];
        std::snprintf(answered, sizeof answered, "%06X", c.flashId);
        std::vector<std::string> expected = {std::string("'2': IDCODE is '") + answered + "' (in hex).\n"};
        if (c.passes) {
            expected.push_back("'2': ID Check passed.\n ");
            EXPECT_TRUE(infoTexts().empty());
        } else {
            expected.push_back("'2': ID Check failed.\n");
            EXPECT_EQ(infoTexts(), std::vector<std::string>{"The operation did not complete successfully.\n"});
        }
        EXPECT_EQ(statusTexts(), expected);
    }
}

TEST_F(FrameIdentification, AFlashThatCapturesNothingReportsTheExpectedId) {
    auto device = makeDevice();  // no responder: the capture keeps IDCODE
    EXPECT_TRUE(device->checkIdcode(0));
    EXPECT_STREQ(device->getAttribute(DeviceNS::ATTR_IDCODE), "EF4018");
}

TEST_F(FrameIdentification, AFailedReadFailsTheCheckEvenThoughTheCaptureHoldsTheExpectedId) {
    const struct {
        const char* what;
        bool useRes;
        std::vector<int> failingShifts;
        std::vector<int> failingWaits;
    } cases[] = {
        {"first id shift", false, {1}, {}},
        {"opening id shift", false, {2}, {}},
        {"id capture", false, {3}, {}},
        {"signature dummy shift", true, {2}, {}},
        {"signature release wait", true, {}, {1}},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.what);
        auto device = c.useRes ? makeDevice(signaturePart(), "FRAME_RES") : makeDevice();
        RecordingScanPort fresh;
        fresh.failingShifts = c.failingShifts;
        fresh.failingWaits = c.failingWaits;
        device->setScanPort(&fresh);
        sink.clear();
        EXPECT_FALSE(device->checkIdcode(5));
        const std::string idText = c.useRes ? "14" : "EF4018";
        // The read still stores what the capture holds.
        EXPECT_STREQ(device->getAttribute(DeviceNS::ATTR_IDCODE), idText.c_str());
        EXPECT_EQ(statusTexts(), (std::vector<std::string>{"'5': IDCODE is '" + idText + "' (in hex).\n",
                                                           "Read ID Code failed.\n ",
                                                           "'5': ID Check failed.\n"}));
        EXPECT_EQ(infoTexts(), std::vector<std::string>{"The operation did not complete successfully.\n"});
    }
}

TEST_F(FrameIdentification, SignatureReadOpensSkipsDummyBitsCapturesEightAndWaits) {
    auto device = makeDevice(signaturePart(), "FRAME_RES");
    port.responder = flashAnswering(0, 0x14);
    EXPECT_TRUE(device->readElectronicSignature(1, false));
    EXPECT_EQ(port.lines(), (std::vector<std::string>{kCommentReadSig, "shift 1 " + kReadSignature,
                                                      "shift 2 " + kOnes24, "shift 12 11111111", "wait 45"}));
    EXPECT_EQ(port.events[1].tdo, "00000000");
    EXPECT_EQ(port.events[1].tdoMask, "00000000");
    EXPECT_EQ(port.events[2].tdiMask, kOnes24);
    EXPECT_EQ(port.events[2].tdo, kZeros24);
    EXPECT_EQ(port.events[2].tdoMask, kZeros24);
    EXPECT_EQ(port.events[3].tdo, "00010100");  // expected signature 0x14
    EXPECT_EQ(port.events[3].tdoMask, "11111111");
    EXPECT_STREQ(device->getAttribute(DeviceNS::ATTR_IDCODE), "14");
    EXPECT_TRUE(sink.messages().empty());
}

TEST_F(FrameIdentification, SignatureCheckPassesOnlyOnTheSameText) {
    const struct {
        unsigned signature;
        bool passes;
    } cases[] = {{0x14, true}, {0x13, false}, {0x00, false}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.signature);
        auto device = makeDevice(signaturePart(), "FRAME_RES");
        port.clear();
        sink.clear();
        port.responder = flashAnswering(0xEF4018, c.signature);
        EXPECT_EQ(device->checkIdcode(1), c.passes);
        ASSERT_FALSE(statusTexts().empty());
        EXPECT_EQ(statusTexts().back(), c.passes ? "'1': ID Check passed.\n " : "'1': ID Check failed.\n");
    }
}

TEST_F(FrameIdentification, ValidationRunsTheCompensationScanFirst) {
    const std::vector<std::string> compensation = {kCommentReadId, "shift 0 " + kReadId};
    {
        auto device = makeDevice();
        port.responder = flashAnswering(0xEF4018, 0);
        EXPECT_TRUE(device->validateInstance(0));
        std::vector<std::string> expected = compensation;
        for (const std::string& line : {kCommentReadId, "shift 0 " + kReadId, "shift 1 " + kReadId,
                                        "shift 12 " + kOnes24})
            expected.push_back(line);
        EXPECT_EQ(port.lines(), expected);

        // The compensation scan's outcome does not count.
        port.clear();
        port.failingShifts = {1};
        EXPECT_TRUE(device->validateInstance(0));
        EXPECT_TRUE(device->compensate(0));
        port.failingShifts.clear();
    }
    port.clear();
    {
        auto device = makeDevice(signaturePart(), "FRAME_RES");
        port.responder = flashAnswering(0xEF4018, 0x14);
        EXPECT_TRUE(device->validateInstance(0));
        std::vector<std::string> expected = compensation;  // read-ID even for a signature part
        for (const std::string& line : {kCommentReadSig, "shift 1 " + kReadSignature, "shift 2 " + kOnes24,
                                        std::string("shift 12 11111111"), std::string("wait 45")})
            expected.push_back(line);
        EXPECT_EQ(port.lines(), expected);
    }
}

TEST_F(FrameIdentification, SkippingTheCheckLeavesOnlyTheCompensationScan) {
    setenv("QRX_VORANT_SKIPIDCODECHECK", "0", 1);
    for (bool useRes : {false, true}) {
        SCOPED_TRACE(useRes ? "signature part" : "id part");
        auto device = useRes ? makeDevice(signaturePart(), "FRAME_RES") : makeDevice();
        port.clear();
        sink.clear();
        EXPECT_TRUE(device->readIdcode(7, true));
        EXPECT_TRUE(device->readElectronicSignature(7, true));
        EXPECT_TRUE(port.events.empty());
        EXPECT_TRUE(sink.messages().empty());
        EXPECT_EQ(device->getAttribute(DeviceNS::ATTR_IDCODE), nullptr);

        EXPECT_TRUE(device->validateInstance(7));
        EXPECT_EQ(port.lines(), (std::vector<std::string>{kCommentReadId, "shift 0 " + kReadId}));
        EXPECT_EQ(statusTexts(), std::vector<std::string>{"'7': Idcode check skipped.\n"});
    }
}

}  // namespace
}  // namespace vorant::test::frame
