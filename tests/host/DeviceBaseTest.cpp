#include "host/Device.h"
#include "host/MessageSinks.h"
#include "host/VorantException.h"
#include "tests/support/TestParts.h"

#include <gtest/gtest.h>

#include <cstring>

namespace {

class DeviceBase : public ::testing::Test {
protected:
    void SetUp() override { vorant::test::addTestPart("BASEPART", vorant::test::w25q128Properties()); }
};

TEST_F(DeviceBase, UnsupportedOperationsSayItAndFail) {
    vorant::CapturingSink sink;
    vorant::ScopedSink scope(&sink);
    SPIDevice device("BASEPART");
    DeviceOperation& operations = device;
    EXPECT_FALSE(operations.program(2, nullptr));
    EXPECT_EQ(operations.getOperationProgressCount("program", nullptr), 0);
    EXPECT_EQ(sink.texts(MessageKind::Error),
              std::vector<std::string>{"'2': This device does not support the operation 'program'.\n"});
}

TEST_F(DeviceBase, WithoutAPortEveryTransferFailsAndCancelStopsLoops) {
    SPIDevice device("BASEPART");
    RLBitVec v(8, false);
    EXPECT_FALSE(device.getScanPort()->shift(0, &v, &v, &v, &v));
    EXPECT_TRUE(device.getScanPort()->isCancelled(2));
}

TEST_F(DeviceBase, RowChecksumIsCrc32OfTheBytesInFlashOrder) {
    vorant::CapturingSink sink;
    vorant::ScopedSink scope(&sink);
    SPIDevice device("BASEPART");
    const char* text = "123456789";
    const auto* bytes = reinterpret_cast<const unsigned char*>(text);
    // The file page is built from bytes; the flash page as captured.
    RLBitVec filePart1(bytes, 40), filePart2(bytes + 5, 32);
    RLBitVec flashPart1(bytes, 40), flashPart2(bytes + 5, 32);
    flashPart2.setBit(0, !flashPart2.getBit(0));
    int sum1 = 0, sum2 = 0;
    EXPECT_TRUE(device.rowChecksum(0, &filePart1, 40, &flashPart1, 40, false, sum1, sum2, 0, 0));
    EXPECT_TRUE(device.rowChecksum(0, &filePart2, 32, &flashPart2, 32, false, sum1, sum2, 0, 0));
    EXPECT_EQ(static_cast<unsigned>(sum1), 0xCBF43926u) << "the standard CRC-32 check value";
    EXPECT_EQ(static_cast<unsigned>(sum1), crc32Update(0, bytes, 9));
    EXPECT_FALSE(device.rowChecksum(0, nullptr, 0, nullptr, 0, true, sum1, sum2, 0, 0));
    EXPECT_EQ(sink.texts(MessageKind::Error), std::vector<std::string>{"'0': Checksums differ.\n"});
    int empty1 = 0, empty2 = 0;
    EXPECT_TRUE(device.rowChecksum(0, nullptr, 0, nullptr, 0, true, empty1, empty2, 0, 0));
}

}  // namespace
