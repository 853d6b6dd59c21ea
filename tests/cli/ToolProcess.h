#pragma once
// Runs the built vorant-spi ($VORANT_BIN_DIR/vorant-spi) as a child
// process with its output captured in files, so tests see exactly what a
// user sees: the exit status, stdout and stderr.

#include <chrono>
#include <filesystem>
#include <string>
#include <sys/types.h>
#include <vector>

namespace vorant::cli::test {

struct ToolResult {
    int exitStatus = -1;  // -1 when the child ended by a signal
    int signal = 0;       // the signal that ended it, if any
    std::string out;
    std::string err;

    // Non-empty lines of stderr.
    std::vector<std::string> errorLines() const;
    // Everything, for failure messages.
    std::string transcript() const;
};

// The vorant-spi executable under test.
std::filesystem::path toolPath();

// Runs the tool in `workDirectory` and waits for it (bounded: a run that
// outlives `limit` is killed and reported as a failure of the test).
ToolResult runTool(const std::vector<std::string>& arguments, const std::filesystem::path& workDirectory,
                   std::chrono::seconds limit = std::chrono::seconds(60));

// A tool run that a test interacts with while it runs.
class RunningTool {
public:
    RunningTool(const std::vector<std::string>& arguments, const std::filesystem::path& workDirectory);
    ~RunningTool();
    RunningTool(const RunningTool&) = delete;
    RunningTool& operator=(const RunningTool&) = delete;

    // Waits until stdout holds `text`; false when the child ended or the
    // time ran out first.
    bool waitForOutput(const std::string& text, std::chrono::milliseconds limit);
    void sendSignal(int signal);
    // Waits for the end (killing the child after `limit`).
    ToolResult finish(std::chrono::milliseconds limit);

private:
    std::string readFile(const std::filesystem::path& file) const;

    std::filesystem::path outFile_, errFile_;
    pid_t pid_ = -1;
    bool ended_ = false;
    int rawStatus_ = 0;
};

}  // namespace vorant::cli::test
