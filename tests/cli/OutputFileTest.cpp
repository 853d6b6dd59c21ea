// Output files that never destroy anything: a readback or a recording
// replaces its file only when the run succeeded; links are written through,
// devices, FIFOs and standard output are written in place and stay what
// they are; a reader that goes away does not stop a job half-way.
#include "ToolTestFixture.h"

#include <sys/stat.h>

namespace vorant::cli::test {
namespace {

class OutputFiles : public ToolTest {
protected:
    // A flash file holding an image, and the readback it gives.
    std::string programmedFlash() {
        const std::string image = randomBytes(70001, 23);
        write("image.bin", image);
        ok(kSim + Args{"program", "image.bin", "-e"});
        return flashWith(image);
    }
    // Files under dir other than the ones given: a temporary file left over.
    Args leftovers(const Args& expected) const {
        Args found;
        for (const auto& entry : fs::recursive_directory_iterator(dir)) {
            const std::string name = fs::relative(entry.path(), dir).string();
            if (std::find(expected.begin(), expected.end(), name) == expected.end()) found.push_back(name);
        }
        return found;
    }
};

TEST_F(OutputFiles, ReadbackThroughALinkReplacesTheFileItPointsToAndKeepsTheLink) {
    const std::string flash = programmedFlash();
    fs::create_directory(dir / "keep");
    write("keep/real.bin", "an earlier dump");
    fs::create_symlink("keep/real.bin", dir / "link.bin");
    fs::create_symlink("keep/new.bin", dir / "dangling.bin");
    for (const char* name : {"link.bin", "dangling.bin"}) ok(kSim + Args{"readback", "-f", name});
    EXPECT_TRUE(fs::is_symlink(dir / "link.bin") && fs::is_symlink(dir / "dangling.bin"));
    EXPECT_TRUE(read("keep/real.bin") == flash && read("keep/new.bin") == flash);
    EXPECT_EQ(leftovers({"flash.bin", "image.bin", "link.bin", "dangling.bin", "keep", "keep/real.bin",
                         "keep/new.bin"}),
              Args{});
}

TEST_F(OutputFiles, ReadbackToAFifoStreamsToItsReaderAndLeavesAFifo) {
    const std::string flash = programmedFlash();
    ASSERT_EQ(mkfifo((dir / "pipe").c_str(), 0600), 0);
    Child cat("cat", {"pipe"}, dir, root / "from-fifo", root / "cat.err");
    ok(kSim + Args{"readback", "-f", "pipe"});
    ASSERT_EQ(cat.finish(std::chrono::seconds(30)).status, 0);
    EXPECT_TRUE(slurp(root / "from-fifo") == flash);
    EXPECT_TRUE(fs::is_fifo(dir / "pipe"));
}

TEST_F(OutputFiles, ReadbackToStandardOutputKeepsTheStatusLinesOutOfTheData) {
    const std::string flash = programmedFlash();
    // "-", and a name for the file standard output already is.
    for (const std::string& name : {std::string("-"), (root / "out").string(), std::string("/dev/stdout")}) {
        const Result result = ok(kSim + Args{"readback", "-f", name});
        EXPECT_TRUE(result.out == flash) << name << ": " << result.out.size() << " bytes on stdout";
        EXPECT_TRUE(has(result.err, "'0': Reaback completed successfully.")) << name << "\n" << result.err;
    }
}

TEST_F(OutputFiles, DevNullStaysACharacterDeviceForARootUser) {
    if (geteuid() != 0) GTEST_SKIP() << "only root could replace /dev/null";
    programmedFlash();
    ok(kSim + Args{"readback", "-f", "/dev/null"});
    ok({"--part", "W25Q16JV", "--port", "svf:/dev/null", "erase"});
    EXPECT_TRUE(fs::is_character_file("/dev/null"));
}

struct FailedCase { const char* name; const char* fault; bool existing; };
class FailedReadback : public OutputFiles, public ::testing::WithParamInterface<FailedCase> {};

TEST_P(FailedReadback, LeavesAnExistingFileAsItWasAndCreatesNone) {
    programmedFlash();
    if (GetParam().existing) write("out.hex", "an earlier dump");
    const Result result = run(kSim + Args{"--sim-fault", GetParam().fault, "readback", "-f", "out.hex"});
    EXPECT_EQ(result.status, 1) << result.text();
    EXPECT_TRUE(has(result.out, "INFO: Nothing was written: out.hex is written only when the readback succeeds.\n"))
        << result.text();
    if (GetParam().existing) {
        EXPECT_EQ(read("out.hex"), "an earlier dump");
    }
    EXPECT_EQ(leftovers({"flash.bin", "image.bin"}), GetParam().existing ? Args{"out.hex"} : Args{});
}

INSTANTIATE_TEST_SUITE_P(Faults, FailedReadback, ::testing::Values(
    FailedCase{"ReadFaultOverAFile", "fail-shift=40", true},
    FailedCase{"ReadFault", "fail-shift=40", false},
    FailedCase{"CancelOverAFile", "cancel-after=3", true},
    FailedCase{"Cancel", "cancel-after=3", false}),
    [](const auto& info) { return std::string(info.param.name); });

TEST_F(OutputFiles, RecordingThroughALinkReplacesItsTargetOnlyWhenItSucceeds) {
    write("image.bin", randomBytes(70001, 29));  // some 600 KiB of SVF
    fs::create_directory(dir / "jobs");
    write("jobs/real.svf", "// an older recording\n");
    fs::create_symlink("jobs/real.svf", dir / "job.svf");
    const auto record = [](const char* file) {
        return Args{"--part", "W25Q16JV", "--port", std::string("svf:") + file, "program", "image.bin", "-e"};
    };
    // Writes past 64 KiB fail, as on a full disk.
    const Result full = run(record("job.svf"), 64 * 1024);
    EXPECT_EQ(full.status, 1) << full.text();
    EXPECT_TRUE(has(full.err, "ERROR: job.svf could not be written (is the disk full?)\n")) << full.text();
    EXPECT_EQ(read("jobs/real.svf"), "// an older recording\n");
    ok(record("job.svf"));
    ok(record("plain.svf"));
    EXPECT_TRUE(fs::is_symlink(dir / "job.svf"));
    EXPECT_TRUE(read("jobs/real.svf") == read("plain.svf"));
    EXPECT_EQ(leftovers({"image.bin", "jobs", "jobs/real.svf", "job.svf", "plain.svf"}), Args{});
}

TEST_F(OutputFiles, AClosedStandardOutputDoesNotStopAJobHalfWay) {
    const std::string image = randomBytes(70001, 31);
    write("image.bin", image);
    int ends[2];
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    close(ends[0]);  // the reader is gone before the first line: every write to stdout fails
    Child tool(kSim + Args{"program", "image.bin", "-e", "-v"}, dir, root, RLIM_INFINITY, ends[1]);
    close(ends[1]);
    const Result result = tool.finish();
    EXPECT_EQ(result.status, 0) << result.text();
    EXPECT_TRUE(has(result.err, "vorant-spi: program succeeded")) << result.text();
    ok(kSim + Args{"verify", "image.bin"});
}

}  // namespace
}  // namespace vorant::cli::test
