// Progress steps per operation name; never a scan, a message or a division
// by zero.

#include "MemoryTestDoubles.h"

namespace vorant::test::memory {
namespace {

using ProgressCount = MemoryTest;

struct CountCase {
    const char* name;
    Properties changes;
    bool withData;  // 20 bytes: 160 bits, one 96-bit frame
    const char* operation;
    Lines tokens;
    bool nullArgs;
    int expected;
    friend void PrintTo(const CountCase& c, std::ostream* os) { *os << c.name; }
};

class ProgressCounts : public ProgressCount, public ::testing::WithParamInterface<CountCase> {};

// The tiny part: 4 pages; erase (300000000 - 40000000) / 2000000 = 130 steps.
TEST_P(ProgressCounts, CountsTheStepsOfEachOperation) {
    const CountCase& c = GetParam();
    auto device = makeDevice(c.changes);
    MemoryImage image(patternBytes(20));
    if (c.withData) device->setConfigData(&image);
    auto args = switches(c.tokens);

    EXPECT_EQ(device->getOperationProgressCount(c.operation, c.nullArgs ? nullptr : args.get()), c.expected);
    EXPECT_TRUE(port.events.empty());
    EXPECT_TRUE(sink.messages().empty());
}

INSTANTIATE_TEST_SUITE_P(
    Operations, ProgressCounts,
    ::testing::Values(
        CountCase{"ProgramWithNullArgs", {}, true, "program", {}, true, 1},
        CountCase{"ProgramWithoutSwitches", {}, true, "program", {}, false, 1},
        CountCase{"ProgramEraseVerify", {}, true, "program", {"-e", "-v"}, false, 1 + 130 + 4},
        CountCase{"ProgramLongSwitches", {}, true, "PROGRAM", {"-erase", "-verify"}, false, 1 + 130 + 4},
        CountCase{"ProgramWithoutData", {}, false, "program", {"-e"}, false, 130},
        CountCase{"ProgramZeroFrame", {{"TOTAL_SHIFT_SIZE", "0"}}, true, "program", {"-v"}, false, 4},
        CountCase{"Verify", {}, true, "verify", {}, true, 4},
        CountCase{"Erase", {}, true, "erase", {}, true, 130},
        CountCase{"BlankCheck", {}, true, "BlankCheck", {}, true, 4},
        CountCase{"Readback", {}, true, "readbacktofile", {}, true, 4},
        CountCase{"PagesTruncated", {{"DEVICE_SIZE", "100"}}, true, "blankcheck", {}, true, 1},
        // The erase pair is (BULKERASE_WAITTIME, BULKERASE_MAXWAITTIME); a limit below the
        // first wait gives a negative term, which still adds to program.
        CountCase{"EraseLimitBelowWait",
                  {{"BULKERASE_WAITTIME", "25"}, {"BULKERASE_MAXWAITTIME", "10"}, {"PROGRESS_ERASE_WAITTIME_INC", "2"}},
                  true, "program", {"-e"}, false, 1 - 7},
        CountCase{"ZeroEraseStep", {{"PROGRESS_ERASE_WAITTIME_INC", "0"}}, true, "erase", {}, true, 0},
        CountCase{"ZeroPageSize", {{"PAGE_SIZE", "0"}}, true, "readbacktofile", {}, true, 0},
        CountCase{"NegativePageSize", {{"PAGE_SIZE", "-64"}}, true, "verify", {}, true, 0},
        CountCase{"UnknownName", {}, true, "checksum", {}, true, 0},
        CountCase{"NullName", {}, true, nullptr, {}, true, 0}),
    [](const auto& info) { return std::string(info.param.name); });

}  // namespace
}  // namespace vorant::test::memory
