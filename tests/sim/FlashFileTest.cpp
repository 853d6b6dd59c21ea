// A simulated flash keeps its contents and non-volatile status bits in a
// file between runs.

#include "ports/sim/FlashFile.h"
#include "ports/sim/FlashModel.h"
#include "tests/sim/SimTestSupport.h"

#include "host/VorantException.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <iterator>

namespace vorant::sim::test {
namespace {

namespace fs = std::filesystem;

class FlashFileTest : public ::testing::Test {
protected:
    void SetUp() override {
        const auto* info = ::testing::UnitTest::GetInstance()->current_test_info();
        dir_ = fs::temp_directory_path() / (std::string("vorant-sim-") + info->name());
        fs::remove_all(dir_);
        fs::create_directories(dir_);
        path_ = (dir_ / "flash.bin").string();
    }
    void TearDown() override { fs::remove_all(dir_); }

    static Bytes contents(const std::string& path) {
        std::ifstream in(path, std::ios::binary);
        return Bytes(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
    }
    static void writeFile(const std::string& path, const Bytes& bytes) {
        std::ofstream out(path, std::ios::binary | std::ios::trunc);
        out.write(reinterpret_cast<const char*>(bytes.data()), static_cast<std::streamsize>(bytes.size()));
    }

    fs::path dir_;
    std::string path_;
};

TEST_F(FlashFileTest, ANewFileStartsErased) {
    { FlashModel chip(smallPart(), FaultPlan{}, path_); }
    const Bytes file = contents(path_);
    ASSERT_EQ(file.size(), 64u * 1024 + FlashFile::kTrailerBytes);
    EXPECT_EQ(Bytes(file.begin(), file.begin() + 64 * 1024), Bytes(64 * 1024, 0xFF));
    EXPECT_EQ(std::string(file.begin() + 64 * 1024, file.begin() + 64 * 1024 + 8), "VSIMFLSH");
}

TEST_F(FlashFileTest, ContentsAndStatusSurviveToTheNextInstance) {
    {
        FlashModel chip(smallPart(), FaultPlan{}, path_);
        programPage(chip, 0x1200, {0x12, 0x34, 0x56});
        writeEnable(chip);
        spi(chip, {0x01, 0x1C, 0x02});  // protection and QE
        chip.advance(us(10000));
        // Written through already, before the model goes away.
        const Bytes file = contents(path_);
        EXPECT_EQ(file[0x1200], 0x12);
        EXPECT_EQ(file[64 * 1024 + 8], 0x1C);
        EXPECT_EQ(file[64 * 1024 + 9], 0x02);
    }
    FlashModel again(smallPart(), FaultPlan{}, path_);
    EXPECT_EQ(readArray(again, 0x1200, 4), (Bytes{0x12, 0x34, 0x56, 0xFF}));
    EXPECT_EQ(again.status1(), 0x1C) << "no WEL after power-up";
    EXPECT_EQ(again.status2(), 0x02);
}

TEST_F(FlashFileTest, ErasesAreWrittenThrough) {
    {
        FlashModel chip(smallPart(), FaultPlan{}, path_);
        programPage(chip, 0x0000, {0x00});
        programPage(chip, 0x2000, {0x00});
        writeEnable(chip);
        spi(chip, {0x20, 0x00, 0x20, 0x00});
        chip.advance(us(45000));
    }
    const Bytes file = contents(path_);
    EXPECT_EQ(file[0x0000], 0x00);
    EXPECT_EQ(file[0x2000], 0xFF);
}

TEST_F(FlashFileTest, AnEmptyFileIsInitialised) {
    writeFile(path_, {});
    FlashModel chip(smallPart(), FaultPlan{}, path_);
    EXPECT_EQ(contents(path_).size(), 64u * 1024 + FlashFile::kTrailerBytes);
}

TEST_F(FlashFileTest, UnusableFilesAreRefusedAndLeftAsTheyWere) {
    struct Case {
        const char* name;
        Bytes bytes;
    };
    Bytes noTrailer(64 * 1024 + FlashFile::kTrailerBytes, 0xFF);
    const Case cases[] = {
        {"a raw image without trailer", Bytes(64 * 1024, 0x00)},
        {"a file of another part's size", Bytes(128 * 1024 + FlashFile::kTrailerBytes, 0x00)},
        {"the right size but no trailer", noTrailer},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        writeFile(path_, c.bytes);
        try {
            FlashModel chip(smallPart(), FaultPlan{}, path_);
            ADD_FAILURE() << "accepted";
        } catch (const VorantException& error) {
            EXPECT_NE(std::string(error.what()).find(path_), std::string::npos) << error.what();
        }
        EXPECT_EQ(contents(path_), c.bytes);
    }
}

TEST_F(FlashFileTest, APathThatIsNoFileIsRefused) {
    EXPECT_THROW(FlashModel(smallPart(), FaultPlan{}, dir_.string()), VorantException);
    EXPECT_THROW(FlashModel(smallPart(), FaultPlan{}, (dir_ / "missing" / "flash.bin").string()), VorantException);
}

}  // namespace
}  // namespace vorant::sim::test
