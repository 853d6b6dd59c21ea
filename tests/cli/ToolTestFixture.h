#pragma once
// Runs the built vorant-spi as a child process in a scratch folder, as a
// user runs it: exit status, stdout and stderr are what the tests see.
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <fcntl.h>
#include <filesystem>
#include <fstream>
#include <functional>
#include <map>
#include <random>
#include <sstream>
#include <string>
#include <sys/resource.h>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>
#include <vector>

namespace vorant::cli::test {

namespace fs = std::filesystem;
using Args = std::vector<std::string>;
inline Args operator+(Args a, const Args& b) { a.insert(a.end(), b.begin(), b.end()); return a; }

// Files are compared as byte strings.
inline std::string slurp(const fs::path& file) {
    std::ifstream in(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}
inline void put(const fs::path& file, const std::string& bytes) { std::ofstream(file, std::ios::binary) << bytes; }
inline std::string randomBytes(std::size_t count, unsigned seed) {
    std::mt19937 generator(seed);
    std::string bytes(count, '\0');
    for (char& byte : bytes) byte = static_cast<char>(generator() >> 24);
    return bytes;
}
inline bool has(const std::string& text, const std::string& part) { return text.find(part) != std::string::npos; }

struct Result {
    int status = -1, signal = 0;  // status -1: ended by `signal`, or killed at the time limit
    std::string out, err;
    Args errLines() const {
        Args lines;
        std::istringstream in(err);
        for (std::string line; std::getline(in, line);) if (!line.empty()) lines.push_back(line);
        return lines;
    }
    std::string text() const {
        return "exit " + std::to_string(status) + "/" + std::to_string(signal) + "\n" + out + err;
    }
};

// The folder of the built programs: set by ctest, else beside this test program.
inline fs::path binDir() {
    const char* bin = std::getenv("VORANT_BIN_DIR");
    return bin ? fs::path(bin) : fs::read_symlink("/proc/self/exe").parent_path();
}

// A program running in `dir`, its standard output and error in files (one
// file when both paths are the same), or its standard output on `stdoutFd`
// when one is given; ended by pid. A file size limit makes every write past
// it fail, as on a full disk.
class Child {
public:
    Child(const std::string& program, Args args, const fs::path& dir, const fs::path& out, const fs::path& err,
          rlim_t fileLimit = RLIM_INFINITY, int stdoutFd = -1)
        : out_(out), err_(err) {
        args.insert(args.begin(), program);
        std::vector<char*> argv;
        for (std::string& arg : args) argv.push_back(arg.data());
        argv.push_back(nullptr);
        pid_ = fork();
        if (pid_ != 0) return;
        const int in = open("/dev/null", O_RDONLY), errFd = creat(err_.c_str(), 0600);
        const int outFd = stdoutFd >= 0 ? stdoutFd : out_ == err_ ? errFd : creat(out_.c_str(), 0600);
        const rlimit limit{fileLimit, fileLimit};
        if (in < 0 || outFd < 0 || errFd < 0 || dup2(in, 0) < 0 || dup2(outFd, 1) < 0 || dup2(errFd, 2) < 0 ||
            chdir(dir.c_str()) != 0 || setrlimit(RLIMIT_FSIZE, &limit) != 0)
            _exit(126);
        std::signal(SIGINT, SIG_DFL);
        std::signal(SIGPIPE, SIG_DFL);  // as a shell starts it: the tool must ignore SIGPIPE itself
        std::signal(SIGXFSZ, SIG_IGN);
        execvp(argv[0], argv.data());
        _exit(127);
    }
    // vorant-spi, its output in `logDir`.
    Child(Args args, const fs::path& dir, const fs::path& logDir, rlim_t fileLimit = RLIM_INFINITY, int stdoutFd = -1)
        : Child((binDir() / "vorant-spi").string(), std::move(args), dir, logDir / "out", logDir / "err", fileLimit,
                stdoutFd) {}
    ~Child() {
        if (pid_ <= 0) return;
        kill(pid_, SIGKILL);
        waitpid(pid_, nullptr, 0);
    }
    std::string out() const { return slurp(out_); }
    // Polls `done` until it holds or `limit` passes.
    static bool until(const std::function<bool()>& done, std::chrono::seconds limit) {
        for (auto end = std::chrono::steady_clock::now() + limit; !done();)
            if (std::chrono::steady_clock::now() > end) return false;
            else std::this_thread::sleep_for(std::chrono::milliseconds(2));
        return true;
    }
    bool ended() {
        if (pid_ > 0 && waitpid(pid_, &raw_, WNOHANG) == pid_) pid_ = 0;
        return pid_ <= 0;
    }
    bool running() { return !ended(); }
    void signal(int number) { if (pid_ > 0) kill(pid_, number); }
    // SIGTERM, then SIGKILL when it has not ended within two seconds.
    void stop() {
        signal(SIGTERM);
        if (!until([this] { return ended(); }, std::chrono::seconds(2))) signal(SIGKILL);
    }
    // Waits for the end; a child still running after `limit` is killed.
    Result finish(std::chrono::seconds limit = std::chrono::seconds(60)) {
        Result result;
        if (!until([this] { return ended(); }, limit)) {
            kill(pid_, SIGKILL);
            waitpid(pid_, nullptr, 0);
            pid_ = 0;
            result.err = "killed at the time limit\n";
        } else if (WIFEXITED(raw_)) result.status = WEXITSTATUS(raw_);
        else result.signal = WTERMSIG(raw_);
        result.out = slurp(out_);
        if (err_ != out_) result.err += slurp(err_);
        return result;
    }

private:
    fs::path out_, err_;
    pid_t pid_ = -1;
    int raw_ = 127 << 8;  // a failed fork reads as exit status 127
};

class ToolTest : public ::testing::Test {
protected:
    ToolTest() {
        std::string name = (fs::temp_directory_path() / "vorant-cli-XXXXXX").string();
        root = mkdtemp(name.data());
        dir = root / "work";
        fs::create_directory(dir);
    }
    ~ToolTest() override { fs::remove_all(root); }
    Result run(const Args& args, rlim_t limit = RLIM_INFINITY) { return Child(args, dir, root, limit).finish(); }
    Result ok(const Args& args) {
        Result result = run(args);
        EXPECT_EQ(result.status, 0) << result.text();
        return result;
    }
    std::string read(const std::string& name) const { return slurp(dir / name); }
    void write(const std::string& name, const std::string& bytes) const { put(dir / name, bytes); }

    fs::path root, dir;  // the tool runs in dir; its captured output goes to root
};

inline const Args kSim{"--part", "W25Q16JV", "--port", "sim:flash.bin"};
inline constexpr std::size_t kSimBytes = 2 * 1024 * 1024;
// What a readback of the 2 MiB flash holds after `data` went in at `offset`.
inline std::string flashWith(const std::string& data, std::size_t offset = 0) {
    return std::string(kSimBytes, '\xff').replace(offset, data.size(), data);
}
// The flash bytes of a flash file, without its status trailer.
inline std::string flashBytes(const std::string& file) { return file.substr(0, kSimBytes); }
inline bool srecCat(const std::string& arguments) {
    return std::system(("srec_cat " + arguments + " >/dev/null 2>&1").c_str()) == 0;
}

// A part a user adds with --parts: the shipped Winbond family with 2 MiB
// and the ID `id`; `keys` add or replace keys (TOML values; "" drops one).
inline std::string userPart(const std::string& name, const std::string& id,
                            std::map<std::string, std::string> keys = {}) {
    std::map<std::string, std::string> all{
        {"extends", "\"WINBOND_W25Q\""}, {"JEDEC_ID", "\"" + id + "\""}, {"IDCODE", "\"" + id + "\""},
        {"DEVICE_SIZE", "16777216"}, {"WRSR_BITS", "8"}, {"X4_READ", "\"FALSE\""}, {"PROGRAM_WAITTIME", "400"},
        {"PROGRAM_WAITTIME_INC", "40"}, {"PROGRAM_MAXWAITTIME", "4500"}, {"BULKERASE_WAITTIME", "5000000"},
        {"BULKERASE_WAITTIME_INC", "500000"}, {"BULKERASE_MAXWAITTIME", "37500000"},
        {"PROGRESS_ERASE_WAITTIME_INC", "325000"}};
    for (const auto& [key, value] : keys) all[key] = value;
    std::string text = "[part." + name + "]\n";
    for (const auto& [key, value] : all) if (!value.empty()) text += key + " = " + value + "\n";
    return text;
}

}  // namespace vorant::cli::test
