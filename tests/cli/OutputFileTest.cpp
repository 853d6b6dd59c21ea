// Output files that never destroy anything: a readback or a recording
// replaces its file only when the run succeeded, a recording through a link
// replaces its target, standard output carries only the data, and a reader
// that goes away does not stop a job half-way.
#include "ToolTestFixture.h"

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

TEST_F(OutputFiles, ReadbackToStandardOutputKeepsTheStatusLinesOutOfTheData) {
    const std::string flash = programmedFlash();
    // "-", and a name for the file standard output already is.
    for (const std::string& name : {std::string("-"), (root / "out").string(), std::string("/dev/stdout")}) {
        const Result result = ok(kSim + Args{"readback", "-f", name});
        EXPECT_TRUE(result.out == flash) << name << ": " << result.out.size() << " bytes on stdout";
        EXPECT_TRUE(has(result.err, "'0': Reaback completed successfully.")) << name << "\n" << result.err;
    }
}

TEST_F(OutputFiles, AFailedReadbackLeavesAnExistingFileAsItWasAndCreatesNone) {
    programmedFlash();
    for (const char* fault : {"fail-shift=40", "cancel-after=3"}) {
        for (const bool existing : {true, false}) {
            SCOPED_TRACE(std::string(fault) + (existing ? " over a file" : ""));
            fs::remove(dir / "out.hex");
            if (existing) write("out.hex", "an earlier dump");
            const Result result = run(kSim + Args{"--sim-fault", fault, "readback", "-f", "out.hex"});
            EXPECT_EQ(result.status, 1) << result.text();
            EXPECT_TRUE(has(result.out, "INFO: Nothing was written: out.hex is written only when the readback succeeds.\n"))
                << result.text();
            if (existing) {
                EXPECT_EQ(read("out.hex"), "an earlier dump");
            }
            EXPECT_EQ(leftovers({"flash.bin", "image.bin"}), existing ? Args{"out.hex"} : Args{});
        }
    }
}

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
