// Blank check: the page reads over the whole flash, the page test, and the
// verdict in messages and attribute 28, given only when there is one.

#include "MemoryTestDoubles.h"

namespace vorant::test::memory {
namespace {

using BlankCheck = MemoryTest;

const std::string kOnes64(64, '1');

Lines blankPageRead(std::uint32_t address) {
    return {kCommentRead, "shift 1 " + readFrame(address), "shift 12 " + kOnes64, "isCancelled 2"};
}

TEST_F(BlankCheck, ErasedFlashReadsEveryPageAndIsBlank) {
    auto device = makeDevice();
    EXPECT_TRUE(device->blankCheck(4, nullptr));
    EXPECT_EQ(port.scanLines(), concat({writeEnable(), blankPageRead(0), blankPageRead(8), blankPageRead(16),
                                        blankPageRead(24)}));
    EXPECT_EQ(status(), (Lines{"'4': Performing blank check on device...\n", "'4': Part is blank.\n"}));
    ASSERT_NE(device->getAttribute(DeviceNS::ATTR_BLANK), nullptr);
    EXPECT_STREQ(device->getAttribute(DeviceNS::ATTR_BLANK), "TRUE");

    const std::vector<ScanEvent> reads = shifts();
    EXPECT_EQ(reads[1].tdiMask, std::string(32, '1'));
    EXPECT_EQ(reads[1].tdo, std::string(32, '0'));
    EXPECT_EQ(reads[1].tdoMask, std::string(32, '0'));
    EXPECT_EQ(reads[2].tdiMask, kOnes64);
    EXPECT_EQ(reads[2].tdo, kOnes64);  // ones are the expected bits
    EXPECT_EQ(reads[2].tdoMask, kOnes64);
}

struct VerdictCase {
    const char* name;
    Properties changes;
    int zeroBitInPage;  // -1: the flash is erased
    std::vector<int> failingShifts;
    int cancelFromQuery;
    bool result;
    const char* attribute;  // null: not set
    Lines messages;
    Lines errorMessages;
    std::size_t pagesRead;
    friend void PrintTo(const VerdictCase& c, std::ostream* os) { *os << c.name; }
};

class BlankCheckVerdicts : public BlankCheck, public ::testing::WithParamInterface<VerdictCase> {};

TEST_P(BlankCheckVerdicts, GivesTheVerdictOnlyWhenTheCheckReachedOne) {
    const VerdictCase& c = GetParam();
    auto device = makeDevice(c.changes);
    Bytes flash(32, 0xFF);
    if (c.zeroBitInPage >= 0) flash[static_cast<std::size_t>(8 * c.zeroBitInPage + 5)] = 0xFB;
    port.responder = flashResponder(flash);
    port.failingShifts = c.failingShifts;
    port.cancelFromQuery = c.cancelFromQuery;

    EXPECT_EQ(device->blankCheck(0, nullptr), c.result);
    EXPECT_EQ(status(), c.messages);
    EXPECT_EQ(errors(), c.errorMessages);
    const char* attribute = device->getAttribute(DeviceNS::ATTR_BLANK);
    EXPECT_EQ(attribute ? std::string(attribute) : "unset", c.attribute ? c.attribute : "unset");
    EXPECT_EQ(port.count(ScanEvent::Kind::Shift), 2 * c.pagesRead);
    if (c.messages.empty()) {
        EXPECT_TRUE(port.events.empty());  // refused: not even the write enable
    }
}

const std::string kStart = "'0': Performing blank check on device...\n";
const char* const kFailedRead = "'0': Blank check failed, a scan to the device did not succeed.\n";

INSTANTIATE_TEST_SUITE_P(
    Outcomes, BlankCheckVerdicts,
    ::testing::Values(
        VerdictCase{"ZeroBitInThirdPage", {}, 2, {}, 0, true, "FALSE",
                    {kStart, "Failed at address, 16\n", "'0': Part is not blank.\n"}, {}, 3},
        // Shift 2 is the first page's read command: the verdict stands, the result shows the failed read.
        VerdictCase{"NotBlankAfterAFailedRead", {}, 2, {2}, 0, false, "FALSE",
                    {kStart, "Failed at address, 16\n", "'0': Part is not blank.\n"}, {}, 3},
        VerdictCase{"BlankAfterAFailedRead", {}, -1, {3}, 0, false, nullptr, {kStart}, {kFailedRead}, 4},
        VerdictCase{"FailedWriteEnable", {}, -1, {1}, 0, false, nullptr, {kStart}, {kFailedRead}, 4},
        VerdictCase{"CancelAfterTheFirstPage", {}, -1, {}, 1, false, nullptr,
                    {kStart, "'0': Blank check cancelled.\n"}, {}, 1},
        VerdictCase{"CancelAfterTheLastPage", {}, -1, {}, 4, true, "TRUE", {kStart, "'0': Part is blank.\n"}, {}, 4},
        VerdictCase{"EmptyDevice", {{"DEVICE_SIZE", "0"}}, -1, {}, 0, true, "TRUE",
                    {kStart, "'0': Part is blank.\n"}, {}, 0},
        // 100 bits: the second page is read whole.
        VerdictCase{"DeviceSizeNotAPageMultiple", {{"DEVICE_SIZE", "100"}}, -1, {}, 0, true, "TRUE",
                    {kStart, "'0': Part is blank.\n"}, {}, 2},
        VerdictCase{"PageSizeZero", {{"PAGE_SIZE", "0"}}, -1, {}, 0, false, nullptr, {},
                    {"'0': Blank check terminated, PAGE_SIZE (0 bits) is smaller than one byte.\n"}, 0},
        VerdictCase{"PageSizeBelowOneByte", {{"PAGE_SIZE", "7"}}, -1, {}, 0, false, nullptr, {},
                    {"'0': Blank check terminated, PAGE_SIZE (7 bits) is smaller than one byte.\n"}, 0},
        VerdictCase{"NegativePageSize", {{"PAGE_SIZE", "-64"}}, -1, {}, 0, false, nullptr, {},
                    {"'0': Blank check terminated, PAGE_SIZE (-64 bits) is smaller than one byte.\n"}, 0}),
    [](const auto& info) { return std::string(info.param.name); });

}  // namespace
}  // namespace vorant::test::memory
