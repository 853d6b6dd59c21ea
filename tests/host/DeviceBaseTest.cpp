#include "host/Device.h"
#include "host/MessageSinks.h"
#include "tests/support/TestParts.h"

#include <gtest/gtest.h>


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

}  // namespace
