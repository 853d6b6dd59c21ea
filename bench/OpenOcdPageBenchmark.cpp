// The cost of a page through OpenOCD: vorant-board and Debian's openocd
// (remote_bitbang) on loopback ports, then page programs the way the
// plug-in sends them (write enable, page program, the typical wait, status
// polls until the chip is idle) through the OpenOCD port. Prints the wall
// time per page, that time minus the chip's busy time, and the Tcl round
// trips per page, polls apart.
//
//   vorant-openocd-bench [PAGES]      (default 500; needs openocd on PATH)
//
// On the 2-core development machine (OpenOCD 0.12, 300 pages):
//   wall time per page 2.40 ms, minus the 0.4 ms busy time 2.00 ms;
//   1.00 status poll and 1.00 Tcl round trip per page.
// The round-trip target (at most 2 per page beyond busy polling) holds; the
// overhead target (under 1 ms) does not: OpenOCD sleeps in whole
// milliseconds, so the 0.4 ms wait costs 1 ms, and remote_bitbang moves
// each of the page's 2113 DR bits as three bytes through the board.
#include "cli/PartDatabaseSetup.h"
#include "host/RLBitVec.h"
#include "host/ScanPort.h"
#include "ports/PortAddress.h"
#include "ports/openocd/OpenOcdPort.h"

#include <arpa/inet.h>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <fcntl.h>
#include <filesystem>
#include <fstream>
#include <netinet/in.h>
#include <string>
#include <sys/socket.h>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>
#include <vector>

namespace {

namespace fs = std::filesystem;
using Clock = std::chrono::steady_clock;

constexpr unsigned kPageProgramUs = 400;  // W25Q16JV's typical page program, as the board simulates it

pid_t start(std::vector<std::string> args, const fs::path& log) {
    std::vector<char*> argv;
    for (std::string& arg : args) argv.push_back(arg.data());
    argv.push_back(nullptr);
    const pid_t pid = fork();
    if (pid != 0) return pid;
    const int out = creat(log.c_str(), 0600);
    if (out < 0 || dup2(out, 1) < 0 || dup2(out, 2) < 0) _exit(126);
    execvp(argv[0], argv.data());
    _exit(127);
}

void stop(pid_t pid) {
    if (pid <= 0) return;
    kill(pid, SIGTERM);
    for (int k = 0; k < 200; ++k) {
        if (waitpid(pid, nullptr, WNOHANG) == pid) return;
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
    kill(pid, SIGKILL);
    waitpid(pid, nullptr, 0);
}

int freePort() {
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

std::string slurp(const fs::path& file) {
    std::ifstream in(file);
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

RLBitVec wire(const std::vector<std::uint8_t>& bytes) {
    RLBitVec v(bytes.size() * 8, false);
    std::size_t i = 0;
    for (std::uint8_t byte : bytes)
        for (int k = 7; k >= 0; --k) v.setBit(i++, (byte >> k) & 1);
    return v;
}

// One status read; true while the chip is busy (WIP is the last bit).
bool busy(ScanPort& port, bool& ok) {
    RLBitVec opcode = wire({0x05}), tdi(8, false), tdo(8, true);
    ok = port.shiftWrite(ScanStage::kOpen, &opcode, 0) &&
         port.shift(ScanStage::kCaptureClose, &tdi, nullptr, &tdo, nullptr);
    return tdo.getBit(7);
}

}  // namespace

int main(int argc, char** argv) {
    const int pages = argc > 1 ? std::atoi(argv[1]) : 500;
    if (std::system("command -v openocd >/dev/null 2>&1") != 0) {
        std::fprintf(stderr, "openocd is not installed; nothing to measure\n");
        return 1;
    }
    const fs::path bin = fs::read_symlink("/proc/self/exe").parent_path();
    const fs::path dir = fs::temp_directory_path() / ("vorant-openocd-bench-" + std::to_string(getpid()));
    fs::create_directories(dir);

    vorant::cli::loadPartDatabase({});
    const pid_t board = start({(bin / "vorant-board").string(), "--part", "W25Q16JV"}, dir / "board.log");
    int boardPort = 0;
    for (int k = 0; k < 500 && boardPort == 0; ++k) {
        const std::string log = slurp(dir / "board.log");
        if (log.rfind("listening on 127.0.0.1:", 0) == 0 && log.find('\n') != std::string::npos)
            boardPort = std::stoi(log.substr(log.rfind(':', log.find('\n')) + 1));
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
    const int tclPort = freePort();
    std::ofstream(dir / "board.cfg") << "adapter driver remote_bitbang\nremote_bitbang host 127.0.0.1\n"
                                     << "remote_bitbang port " << boardPort << "\n"
                                     << "jtag newtap fpga tap -irlen 6 -expected-id 0x0362d093\n"
                                     << "gdb_port disabled\ntelnet_port disabled\ntcl_port " << tclPort << "\n";
    const pid_t openocd = start({"openocd", "-f", (dir / "board.cfg").string()}, dir / "openocd.log");

    std::unique_ptr<vorant::ports::openocd::TclRpcIo> io;
    std::string error;
    for (int k = 0; k < 500 && !io; ++k) {
        io = vorant::ports::openocd::connectTclRpc("127.0.0.1", static_cast<std::uint16_t>(tclPort),
                                                   std::chrono::milliseconds(1000), error);
        if (!io) std::this_thread::sleep_for(std::chrono::milliseconds(20));
    }
    int status = 0;
    if (!io || boardPort == 0) {
        std::fprintf(stderr, "could not start the board and OpenOCD: %s\n", error.c_str());
        status = 1;
    } else {
        vorant::ports::PortAddress address;
        address.text = address.kind = "openocd";
        vorant::ports::openocd::OpenOcdPort port(std::move(io), address, "OpenOCD");
        ScanPort& scan = port.scan();
        bool ok = true;
        busy(scan, ok);  // selects the bridge outside the timed part
        const auto requestsBefore = port.sink().stats().requests;
        std::uint64_t polls = 0;
        std::vector<std::uint8_t> page(4 + 256, 0x5A);
        const auto started = Clock::now();
        for (int p = 0; p < pages && ok; ++p) {
            const unsigned address24 = static_cast<unsigned>(p) * 256u;
            page[0] = 0x02, page[1] = static_cast<std::uint8_t>(address24 >> 16),
            page[2] = static_cast<std::uint8_t>(address24 >> 8), page[3] = 0;
            RLBitVec wren = wire({0x06}), program = wire(page);
            ok = scan.shiftWrite(ScanStage::kWhole, &wren, 0) && scan.shiftWrite(ScanStage::kWhole, &program, 0) &&
                 scan.wait(static_cast<int>(kPageProgramUs), true);
            for (bool more = true; ok && more; ++polls) more = busy(scan, ok);
        }
        const double seconds = std::chrono::duration<double>(Clock::now() - started).count();
        const auto requests = port.sink().stats().requests - requestsBefore;
        if (!ok) {
            std::fprintf(stderr, "a page failed: %s\n", scan.failureReason() ? scan.failureReason() : "?");
            status = 1;
        } else {
            const double perPageMs = seconds * 1e3 / pages;
            std::printf("pages                         %d (256 bytes, W25Q16JV, jtagspi, remote_bitbang board)\n", pages);
            std::printf("wall time per page            %.3f ms\n", perPageMs);
            std::printf("  minus busy time (%.1f ms)   %.3f ms\n", kPageProgramUs / 1e3, perPageMs - kPageProgramUs / 1e3);
            std::printf("status polls per page         %.2f\n", static_cast<double>(polls) / pages);
            std::printf("Tcl round trips per page      %.2f (%.2f beyond the polls after the first)\n",
                        static_cast<double>(requests) / pages,
                        static_cast<double>(requests) / pages - (static_cast<double>(polls) / pages - 1));
        }
    }
    stop(openocd);
    stop(board);
    fs::remove_all(dir);
    return status;
}
