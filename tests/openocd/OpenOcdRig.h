#pragma once
// The simulated board and a real OpenOCD wired to it over remote_bitbang,
// each a child process on free loopback ports, every wait bounded, both
// ended by pid. Tests skip, saying why, where no openocd is installed.

#include "tests/cli/ToolTestFixture.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>

namespace vorant::openocd::test {

using cli::test::Args;
using cli::test::binDir;
using cli::test::operator+;
using cli::test::Child;
using cli::test::Result;
using cli::test::has;
namespace fs = std::filesystem;

// A program whose output and errors share one log file, stopped (SIGTERM
// first, so the board keeps its flash file) when it goes.
struct Process : Child {
    Process(const std::string& program, Args args, const fs::path& dir, const fs::path& log)
        : Child(program, std::move(args), dir, log, log) {}
    ~Process() { stop(); }
    std::string log() const { return out(); }
};

inline bool openOcdInstalled() { return std::system("command -v openocd >/dev/null 2>&1") == 0; }

inline fs::path quickParts() { return fs::path(VORANT_TEST_DATA_DIR) / "parts" / "quick.toml"; }

// A loopback port nobody listens on right now.
inline int freePort() {
    const int fd = socket(AF_INET, SOCK_STREAM, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    bind(fd, reinterpret_cast<sockaddr*>(&address), sizeof address);
    socklen_t length = sizeof address;
    getsockname(fd, reinterpret_cast<sockaddr*>(&address), &length);
    close(fd);
    return ntohs(address.sin_port);
}

// A connection to a loopback port; -1 when nobody listens there.
inline int connectLoopback(int port) {
    const int fd = socket(AF_INET, SOCK_STREAM, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(static_cast<std::uint16_t>(port));
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    if (connect(fd, reinterpret_cast<sockaddr*>(&address), sizeof address) == 0) return fd;
    close(fd);
    return -1;
}

inline bool accepts(int port) {
    const int fd = connectLoopback(port);
    if (fd >= 0) close(fd);
    return fd >= 0;
}

// The port in the board's first line, "listening on 127.0.0.1:PORT".
inline int listeningPort(const std::string& log) { return std::stoi(log.substr(log.rfind(':', log.find('\n')) + 1)); }

class OpenOcdRig : public cli::test::ToolTest {
protected:
    void SetUp() override {
        if (!openOcdInstalled()) GTEST_SKIP() << "openocd is not installed (scripts/install-deps.sh installs it)";
    }
    void TearDown() override {
        openocd_.reset();
        board_.reset();
    }

    // The board with `part` (a part with short waits by default) keeping
    // its flash in flash.bin.
    void startBoard(const std::string& part = "TEST_QUICK25") {
        board_ = std::make_unique<Process>(
            (binDir() / "vorant-board").string(),
            Args{"--parts", quickParts().string(), "--part", part, "--flash", "flash.bin"}, dir, root / "board.log");
        ASSERT_TRUE(Child::until([this] { return board_->log().find('\n') != std::string::npos || !board_->running(); },
                                 std::chrono::seconds(10)))
            << "the board did not start";
        ASSERT_EQ(board_->log().rfind("listening on 127.0.0.1:", 0), 0u) << board_->log();
        boardPort_ = listeningPort(board_->log());
    }

    // OpenOCD with remote_bitbang to the board, its Tcl server on a free
    // port, then `commands` (each a line of its configuration).
    void startOpenOcd(const Args& commands = {}, bool waitForTcl = true) {
        tclPort_ = freePort();
        std::string config = "adapter driver remote_bitbang\nremote_bitbang host 127.0.0.1\n"
                             "remote_bitbang port " + std::to_string(boardPort_) + "\n"
                             "jtag newtap fpga tap -irlen 6 -expected-id 0x0362d093\n"
                             "gdb_port disabled\ntelnet_port disabled\ntcl_port " + std::to_string(tclPort_) + "\n";
        for (const std::string& line : commands) config += line + "\n";
        cli::test::put(root / "board.cfg", config);
        openocd_ = std::make_unique<Process>("openocd", Args{"-f", (root / "board.cfg").string()}, dir, root / "openocd.log");
        if (!waitForTcl) return;
        ASSERT_TRUE(Child::until([this] { return accepts(tclPort_) || !openocd_->running(); }, std::chrono::seconds(15)))
            << openocd_->log();
        ASSERT_TRUE(openocd_->running()) << openocd_->log();
    }

    // OpenOCD running a configuration to its end (shutdown); its log.
    std::string runOpenOcdScript(const Args& commands) {
        startOpenOcd(commands, false);
        const bool ended = Child::until([this] { return !openocd_->running(); }, std::chrono::seconds(60));
        EXPECT_TRUE(ended) << "openocd did not finish its script";
        const std::string log = openocd_->log();
        openocd_.reset();
        return log;
    }

    Args viaOpenOcd(const Args& args) const {
        return Args{"--parts", quickParts().string(), "--port", "openocd:127.0.0.1:" + std::to_string(tclPort_)} + args;
    }
    // The board's flash file, read once the board has ended.
    std::string boardFlash() {
        board_.reset();
        return read("flash.bin");
    }

    std::unique_ptr<Process> board_, openocd_;
    int boardPort_ = 0, tclPort_ = 0;
};

}  // namespace vorant::openocd::test
