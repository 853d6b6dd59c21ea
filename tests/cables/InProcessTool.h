#pragma once
// Runs vorant-spi's whole command line inside the test program, so a cable
// opened through the port table meets the double a test has put behind
// its seam. Output is captured; the run happens in a scratch folder.

#include "cli/Tool.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <unistd.h>
#include <vector>

namespace vorant::cables::test {

struct ToolRun {
    int status = -1;
    std::string out, err;
    std::string text() const { return "exit " + std::to_string(status) + "\n" + out + err; }
};

inline bool has(const std::string& text, const std::string& part) { return text.find(part) != std::string::npos; }

inline std::string slurp(const std::filesystem::path& file) {
    std::ifstream in(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

// A scratch folder per test process and test, removed at the end.
class ScratchFolder {
public:
    ScratchFolder() {
        path_ = std::filesystem::temp_directory_path() /
                ("vorant-cable-" + std::to_string(getpid()) + "-" +
                 ::testing::UnitTest::GetInstance()->current_test_info()->name());
        std::filesystem::remove_all(path_);
        std::filesystem::create_directories(path_);
    }
    ~ScratchFolder() { std::filesystem::remove_all(path_); }
    const std::filesystem::path& path() const { return path_; }

private:
    std::filesystem::path path_;
};

// "vorant-spi ARGS" in `dir`; --quiet is added so the progress display
// stays out of the captured text.
inline ToolRun runToolInProcess(std::vector<std::string> args, const std::filesystem::path& dir) {
    args.insert(args.begin(), {"vorant-spi", "--quiet"});
    std::vector<char*> argv;
    for (std::string& arg : args) argv.push_back(arg.data());
    argv.push_back(nullptr);
    const std::filesystem::path before = std::filesystem::current_path();
    std::filesystem::current_path(dir);
    ToolRun run;
    ::testing::internal::CaptureStdout();
    ::testing::internal::CaptureStderr();
    run.status = cli::runTool(static_cast<int>(args.size()), argv.data());
    run.out = ::testing::internal::GetCapturedStdout();
    run.err = ::testing::internal::GetCapturedStderr();
    std::filesystem::current_path(before);
    return run;
}

}  // namespace vorant::cables::test
