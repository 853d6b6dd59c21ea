#include "ToolProcess.h"

#include <cstdlib>
#include <fcntl.h>
#include <fstream>
#include <iterator>
#include <signal.h>
#include <sstream>
#include <stdexcept>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>

extern char** environ;

namespace vorant::cli::test {

namespace {

int uniqueNumber() {
    static int counter = 0;
    return ++counter;
}

void fillResult(ToolResult& result, int rawStatus) {
    if (WIFEXITED(rawStatus)) result.exitStatus = WEXITSTATUS(rawStatus);
    if (WIFSIGNALED(rawStatus)) result.signal = WTERMSIG(rawStatus);
}

}  // namespace

std::vector<std::string> ToolResult::errorLines() const {
    std::vector<std::string> lines;
    std::istringstream stream(err);
    for (std::string line; std::getline(stream, line);)
        if (!line.empty()) lines.push_back(line);
    return lines;
}

std::string ToolResult::transcript() const {
    return "exit status " + std::to_string(exitStatus) + (signal ? " (signal " + std::to_string(signal) + ")" : "") +
           "\n--- stdout\n" + out + "--- stderr\n" + err;
}

std::filesystem::path toolPath() {
    const char* binDir = std::getenv("VORANT_BIN_DIR");
    if (binDir == nullptr || *binDir == '\0')
        throw std::runtime_error("VORANT_BIN_DIR is not set: run the tests through ctest");
    return std::filesystem::path(binDir) / "vorant-spi";
}

RunningTool::RunningTool(const std::vector<std::string>& arguments, const std::filesystem::path& workDirectory) {
    const std::string tag = std::to_string(getpid()) + "-" + std::to_string(uniqueNumber());
    outFile_ = std::filesystem::temp_directory_path() / ("vorant-cli-out-" + tag);
    errFile_ = std::filesystem::temp_directory_path() / ("vorant-cli-err-" + tag);

    const std::string program = toolPath().string();
    std::vector<std::string> argvStrings{program};
    argvStrings.insert(argvStrings.end(), arguments.begin(), arguments.end());
    std::vector<char*> argv;
    for (std::string& text : argvStrings) argv.push_back(text.data());
    argv.push_back(nullptr);

    // fork/exec: the child needs its own working folder and descriptors.
    pid_ = fork();
    if (pid_ < 0) throw std::runtime_error("fork failed");
    if (pid_ == 0) {
        const int in = open("/dev/null", O_RDONLY);
        const int out = open(outFile_.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
        const int err = open(errFile_.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
        if (in < 0 || out < 0 || err < 0 || dup2(in, 0) < 0 || dup2(out, 1) < 0 || dup2(err, 2) < 0) _exit(126);
        if (chdir(workDirectory.c_str()) != 0) _exit(126);
        // SIGINT must reach the tool's own handler, whatever the test
        // runner set.
        signal(SIGINT, SIG_DFL);
        execve(program.c_str(), argv.data(), environ);
        _exit(127);
    }
}

RunningTool::~RunningTool() {
    if (!ended_ && pid_ > 0) {
        kill(pid_, SIGKILL);
        waitpid(pid_, &rawStatus_, 0);
    }
    std::error_code ignored;
    std::filesystem::remove(outFile_, ignored);
    std::filesystem::remove(errFile_, ignored);
}

std::string RunningTool::readFile(const std::filesystem::path& file) const {
    std::ifstream in(file, std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

bool RunningTool::waitForOutput(const std::string& text, std::chrono::milliseconds limit) {
    const auto deadline = std::chrono::steady_clock::now() + limit;
    while (std::chrono::steady_clock::now() < deadline) {
        if (readFile(outFile_).find(text) != std::string::npos) return true;
        if (!ended_ && waitpid(pid_, &rawStatus_, WNOHANG) == pid_) ended_ = true;
        if (ended_) return readFile(outFile_).find(text) != std::string::npos;
        std::this_thread::sleep_for(std::chrono::milliseconds(2));
    }
    return false;
}

void RunningTool::sendSignal(int signalNumber) {
    if (!ended_) kill(pid_, signalNumber);
}

ToolResult RunningTool::finish(std::chrono::milliseconds limit) {
    const auto deadline = std::chrono::steady_clock::now() + limit;
    while (!ended_) {
        if (waitpid(pid_, &rawStatus_, WNOHANG) == pid_) {
            ended_ = true;
            break;
        }
        if (std::chrono::steady_clock::now() >= deadline) {
            kill(pid_, SIGKILL);
            waitpid(pid_, &rawStatus_, 0);
            ended_ = true;
            ToolResult timedOut;
            timedOut.err = "the tool did not end within the time limit and was killed\n" + readFile(errFile_);
            timedOut.out = readFile(outFile_);
            return timedOut;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(2));
    }
    ToolResult result;
    fillResult(result, rawStatus_);
    result.out = readFile(outFile_);
    result.err = readFile(errFile_);
    return result;
}

ToolResult runTool(const std::vector<std::string>& arguments, const std::filesystem::path& workDirectory,
                   std::chrono::seconds limit) {
    RunningTool tool(arguments, workDirectory);
    return tool.finish(limit);
}

}  // namespace vorant::cli::test
