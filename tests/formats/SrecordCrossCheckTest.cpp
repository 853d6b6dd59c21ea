// Cross-checks against srec_cat, an independent Intel HEX implementation:
// its files must read as it converts them, and ours must convert back to
// the data written. Skipped where srec_cat is not installed.
#include "formats/ConfigDataFiles.h"
#include "tests/formats/FormatsTestFiles.h"

#include <gtest/gtest.h>

#include <cstdlib>

namespace vorant::formats {
namespace {
using testing::Bytes;

bool srecCatAvailable() {
    static const bool available = std::system("srec_cat -VERSion > /dev/null 2>&1") == 0;
    return available;
}

void runSrecCat(const std::string& arguments) {
    const std::string command = "srec_cat " + arguments + " 2>&1";
    ASSERT_EQ(std::system(command.c_str()), 0) << command;
}

std::string quoted(const std::string& path) {
    return "'" + path + "'";
}

struct SrecCatInput {
    const char* name;
    const char* fileName;
    std::size_t offset;
    std::size_t size;
    const char* outputOptions;
};
void PrintTo(const SrecCatInput& value, std::ostream* out) { *out << value.name; }

class ReaderAgreesWithSrecCat : public ::testing::TestWithParam<SrecCatInput> {
protected:
    void SetUp() override {
        if (!srecCatAvailable()) GTEST_SKIP() << "srec_cat is not on PATH";
    }
};

TEST_P(ReaderAgreesWithSrecCat, SameImageAsItsBinaryConversion) {
    const auto& param = GetParam();
    testing::ScratchDirectory dir;
    const std::string input = dir.file("in.bin");
    const std::string hex = dir.file(param.fileName);
    const std::string back = dir.file("back.bin");
    testing::writeFile(input, testing::randomBytes(param.size, static_cast<unsigned>(param.offset + param.size)));

    runSrecCat(quoted(input) + " -binary -offset " + std::to_string(param.offset) + " -o " + quoted(hex) + " -intel " +
               param.outputOptions);
    // Our image starts at address 0 with 0xFF below the first record.
    runSrecCat(quoted(hex) + " -intel -fill 0xFF 0 " + std::to_string(param.offset + param.size) + " -o " +
               quoted(back) + " -binary");

    EXPECT_EQ(loadFlashImage(hex).bytes(), testing::readFile(back));
}

INSTANTIATE_TEST_SUITE_P(
    Layouts, ReaderAgreesWithSrecCat,
    ::testing::Values(SrecCatInput{"DefaultRecords", "out.mcs", 0x1000, 5000, ""},
                      SrecCatInput{"SixteenByteRecords", "out.hex", 0x1000, 5001, "-Output_Block_Size 16"},
                      SrecCatInput{"LinearAddressesAcross64KiB", "out.mcs", 0xFFF0, 0x20003, ""},
                      SrecCatInput{"SegmentAddresses", "out.hex", 0x1F000, 70000, "-address-length=3"},
                      SrecCatInput{"AtZero", "out.hex", 0, 4096, "-Output_Block_Size 32"}),
    [](const auto& info) { return std::string(info.param.name); });

struct OurOutput {
    const char* name;
    const char* fileName;
    int bytesPerRecord;
    int offset;
    std::size_t size;
};
void PrintTo(const OurOutput& value, std::ostream* out) { *out << value.name; }

class SrecCatReadsOurOutput : public ::testing::TestWithParam<OurOutput> {
protected:
    void SetUp() override {
        if (!srecCatAvailable()) GTEST_SKIP() << "srec_cat is not on PATH";
    }
};

TEST_P(SrecCatReadsOurOutput, ConvertsBackToTheDataWritten) {
    const auto& param = GetParam();
    testing::ScratchDirectory dir;
    const std::string hex = dir.file(param.fileName);
    const std::string back = dir.file("back.bin");
    const Bytes flash = testing::randomBytes(param.size, 99);
    const Bytes capture = testing::captured(flash);

    auto writer = openConfigDataWriter(hex, param.bytesPerRecord);
    for (std::size_t start = 0; start < capture.size(); start += 256) {
        const std::size_t count = std::min<std::size_t>(256, capture.size() - start);
        ASSERT_TRUE(writer->writeData(capture.data() + start, param.offset + static_cast<int>(start),
                                      static_cast<int>(count * 8), 0));
    }
    ASSERT_TRUE(writer->endWrite());

    runSrecCat(quoted(hex) + " -intel -offset -" + std::to_string(param.offset) + " -o " + quoted(back) + " -binary");
    EXPECT_EQ(testing::readFile(back), flash);
}

INSTANTIATE_TEST_SUITE_P(
    Layouts, SrecCatReadsOurOutput,
    ::testing::Values(OurOutput{"McsSixteen", "ours.mcs", 16, 0, 0x20000 + 77},
                      OurOutput{"HexThirtyTwo", "ours.hex", 32, 0, 0x20000 + 77},
                      OurOutput{"WithOffset", "ours.mcs", 16, 0x1F000, 0x3000}),
    [](const auto& info) { return std::string(info.param.name); });

}  // namespace
}  // namespace vorant::formats
