// A readback or recording either replaces its target whole or leaves it
// exactly as it was.
#include "host/AtomicOutputFile.h"
#include "host/VorantException.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <iterator>

namespace {

namespace fs = std::filesystem;

std::string contents(const fs::path& file) {
    std::ifstream in(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

class AtomicOutput : public ::testing::Test {
protected:
    void SetUp() override {
        folder = fs::temp_directory_path() / ("vorant-atomic-" + std::to_string(::testing::UnitTest::GetInstance()->random_seed()));
        fs::remove_all(folder);
        fs::create_directories(folder);
        std::ofstream(folder / "old.bin") << "earlier contents";
    }
    void TearDown() override {
        fs::permissions(folder / "old.bin", fs::perms::owner_all, fs::perm_options::add);
        fs::remove_all(folder);
    }
    std::size_t entries() const { return static_cast<std::size_t>(std::distance(fs::directory_iterator(folder), {})); }
    fs::path folder;
};

TEST_F(AtomicOutput, CommitReplacesTheTargetWhole) {
    vorant::AtomicOutputFile file(folder / "old.bin");
    ASSERT_TRUE(file.write("new contents"));
    EXPECT_EQ(contents(folder / "old.bin"), "earlier contents") << "nothing shows before the commit";
    std::string error;
    ASSERT_TRUE(file.commit(error)) << error;
    EXPECT_EQ(contents(folder / "old.bin"), "new contents");
    EXPECT_EQ(entries(), 1u) << "no temporary file is left";
}

TEST_F(AtomicOutput, AnAbandonedFileLeavesTheTargetAsItWas) {
    { vorant::AtomicOutputFile file(folder / "old.bin"); file.write("half a"); }
    EXPECT_EQ(contents(folder / "old.bin"), "earlier contents");
    EXPECT_EQ(entries(), 1u);
}

TEST_F(AtomicOutput, UnwritableTargetsAreRefusedCreatingNothing) {
    fs::permissions(folder / "old.bin", fs::perms::owner_write | fs::perms::group_write | fs::perms::others_write,
                    fs::perm_options::remove);
    fs::create_directory(folder / "taken");
    const std::pair<fs::path, const char*> cases[] = {
        {folder / "old.bin", "read-only"}, {folder / "taken", "is a directory"},
        {folder / "missing" / "x.bin", "does not exist"}, {fs::path(), "no output file name"}};
    for (const auto& [target, reason] : cases) {
        try {
            vorant::AtomicOutputFile file(target);
            ADD_FAILURE() << target << " was accepted";
        } catch (const VorantException& e) {
            EXPECT_NE(std::string(e.what()).find(reason), std::string::npos) << e.what();
        }
    }
    EXPECT_EQ(contents(folder / "old.bin"), "earlier contents");
    EXPECT_EQ(entries(), 2u);
}

}  // namespace
