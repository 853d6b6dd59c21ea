// A readback or recording either replaces its target whole or leaves it
// exactly as it was; what a name resolves to decides how it is written.
#include "host/AtomicOutputFile.h"
#include "host/OutputTarget.h"
#include "host/PendingOutputs.h"
#include "host/VorantException.h"
#include "tests/support/ScratchFolder.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <sys/stat.h>
#include <unistd.h>

namespace {

namespace fs = std::filesystem;

std::string contents(const fs::path& file) {
    std::ifstream in(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

class AtomicOutput : public ::testing::Test {
protected:
    void SetUp() override { std::ofstream(folder / "old.bin") << "earlier contents"; }
    std::size_t entries() const { return scratch.entries(); }
    vorant::test::ScratchFolder scratch;
    const fs::path& folder = scratch.path();
};

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

TEST_F(AtomicOutput, NamesResolveToWhatAWriteWouldReach) {
    fs::create_directory(folder / "real");
    std::ofstream(folder / "real" / "file.bin") << "x";
    fs::create_symlink("real/file.bin", folder / "link");
    fs::create_symlink("link", folder / "link-to-link");
    fs::create_symlink("real/later.bin", folder / "dangling");
    fs::create_symlink("loop-b", folder / "loop-a");
    fs::create_symlink("loop-a", folder / "loop-b");
    fs::create_symlink("real", folder / "folder-link");
    ASSERT_EQ(mkfifo((folder / "fifo").c_str(), 0600), 0);
    using vorant::OutputDelivery;
    const struct { fs::path name; OutputDelivery delivery; fs::path path; const char* error; } cases[] = {
        {folder / "old.bin", OutputDelivery::Replace, folder / "old.bin", ""},
        {folder / "new.bin", OutputDelivery::Replace, folder / "new.bin", ""},
        {folder / "link", OutputDelivery::Replace, folder / "real/file.bin", ""},
        {folder / "link-to-link", OutputDelivery::Replace, folder / "real/file.bin", ""},
        {folder / "dangling", OutputDelivery::Replace, folder / "real/later.bin", ""},
        {folder / "fifo", OutputDelivery::Direct, folder / "fifo", ""},
        {"/dev/null", OutputDelivery::Direct, "/dev/null", ""},
        {"-", OutputDelivery::StandardOutput, "-", ""},
        {folder / "loop-a", OutputDelivery::Replace, "", "too many levels of symbolic links"},
        {folder / "folder-link", OutputDelivery::Replace, "", "is a directory"},
        {folder / "missing" / "x.bin", OutputDelivery::Replace, "", "does not exist"},
    };
    for (const auto& c : cases) {
        try {
            const vorant::OutputTarget target = vorant::resolveOutputTarget(c.name);
            EXPECT_TRUE(*c.error == '\0') << c.name << " was accepted";
            EXPECT_EQ(target.delivery, c.delivery) << c.name;
            EXPECT_EQ(target.path, c.path) << c.name;
        } catch (const VorantException& e) {
            EXPECT_NE(*c.error, '\0') << c.name << ": " << e.what();
            EXPECT_NE(std::string(e.what()).find(c.error), std::string::npos) << e.what();
        }
    }
}

// The target changes only at a commit, and then whole, never leaving a
// temporary file: not when the file is abandoned, and a closed file waits
// unpublished until the host commits or discards it.
TEST_F(AtomicOutput, TheTargetChangesOnlyAtACommit) {
    { vorant::AtomicOutputFile file(folder / "old.bin"); file.write("half a"); }
    EXPECT_EQ(contents(folder / "old.bin"), "earlier contents");
    EXPECT_EQ(entries(), 1u);
    std::string error;
    vorant::AtomicOutputFile direct(folder / "new.bin");
    ASSERT_TRUE(direct.write("direct contents") && direct.commit(error)) << error;
    EXPECT_EQ(contents(folder / "new.bin"), "direct contents");
    for (const bool succeeded : {false, true}) {
        auto file = std::make_unique<vorant::AtomicOutputFile>(folder / "old.bin");
        ASSERT_TRUE(file->write("new contents"));
        ASSERT_TRUE(file->close(error)) << error;
        vorant::PendingOutputs::add(std::move(file));
        EXPECT_EQ(contents(folder / "old.bin"), "earlier contents");
        if (succeeded) {
            EXPECT_TRUE(vorant::PendingOutputs::commitAll().empty());
        } else {
            EXPECT_EQ(vorant::PendingOutputs::discardAll(), 1u);
        }
        EXPECT_EQ(contents(folder / "old.bin"), succeeded ? "new contents" : "earlier contents");
        EXPECT_EQ(entries(), 2u);
        EXPECT_EQ(vorant::PendingOutputs::count(), 0u);
    }
}

}  // namespace
