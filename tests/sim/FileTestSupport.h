#pragma once
// Helpers of the simulator's backing-file tests: a private scratch folder,
// and a piece of code run in a child process under a file size limit, so
// writes past it fail as on a full disk without limiting the test itself.

#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <filesystem>
#include <functional>
#include <random>
#include <string>
#include <sys/resource.h>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>
#include <vector>

namespace vorant::sim::test {

// A fresh temporary folder, removed with everything in it.
class ScratchFolder {
public:
    ScratchFolder() {
        std::random_device random;
        namespace fs = std::filesystem;
        while (!fs::create_directory(path_ = fs::temp_directory_path() / ("vorant-sim-" + std::to_string(random())))) {
        }
    }
    ~ScratchFolder() {
        std::error_code ignored;
        std::filesystem::remove_all(path_, ignored);
    }
    ScratchFolder(const ScratchFolder&) = delete;
    ScratchFolder& operator=(const ScratchFolder&) = delete;

    std::string file(const std::string& name) const { return (path_ / name).string(); }
    // The names in the folder, hidden ones included, sorted.
    std::vector<std::string> names() const {
        std::vector<std::string> all;
        for (const auto& entry : std::filesystem::directory_iterator(path_)) all.push_back(entry.path().filename());
        std::sort(all.begin(), all.end());
        return all;
    }

private:
    std::filesystem::path path_;
};

// Runs `body` in a forked child whose files may not grow past `limitBytes`
// (SIGXFSZ ignored, so such a write fails with EFBIG), and gives back the
// text it returned. Waits at most 30 s, then kills the child; "" when it
// died or hung.
inline std::string inLimitedChild(rlim_t limitBytes, const std::function<std::string()>& body) {
    int channel[2];
    if (pipe(channel) != 0) return "";
    const pid_t pid = fork();
    if (pid == 0) {
        close(channel[0]);
        std::signal(SIGXFSZ, SIG_IGN);
        const rlimit limit{limitBytes, limitBytes};
        const std::string text = setrlimit(RLIMIT_FSIZE, &limit) == 0 ? body() : "setrlimit failed";
        const bool sent = write(channel[1], text.data(), text.size()) == static_cast<ssize_t>(text.size());
        _exit(sent ? 0 : 1);
    }
    close(channel[1]);
    std::string text;
    int status = 0;
    bool ended = pid < 0;
    for (auto end = std::chrono::steady_clock::now() + std::chrono::seconds(30); !ended;) {
        ended = waitpid(pid, &status, WNOHANG) == pid;
        if (!ended && std::chrono::steady_clock::now() > end) {
            kill(pid, SIGKILL);
            waitpid(pid, &status, 0);
            close(channel[0]);
            return "";
        }
        if (!ended) std::this_thread::sleep_for(std::chrono::milliseconds(2));
    }
    char buffer[4096];
    for (ssize_t n; (n = read(channel[0], buffer, sizeof buffer)) > 0;) text.append(buffer, static_cast<std::size_t>(n));
    close(channel[0]);
    return text;
}

}  // namespace vorant::sim::test
