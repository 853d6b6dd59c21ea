#pragma once
// Serves a simulated board over remote_bitbang on a TCP port of the
// loopback (or any) interface, or on a Unix socket: one adapter at a time,
// each connection a fresh session on the same board. Between bursts of
// traffic the flash catches up with wall time, so a host that sleeps
// instead of clocking still sees busy times pass.

#include "ports/jtag/board/BoardModel.h"

#include <atomic>
#include <chrono>
#include <cstdint>
#include <string>

namespace vorant::ports::jtag {

class RemoteBitbangServer {
public:
    // Listens on host:port (port 0: any free port), or on a Unix socket
    // when unixPath is not empty. Throws std::runtime_error naming the
    // address when it cannot.
    RemoteBitbangServer(BoardModel& board, const std::string& host, std::uint16_t port, const std::string& unixPath);
    ~RemoteBitbangServer();
    RemoteBitbangServer(const RemoteBitbangServer&) = delete;
    RemoteBitbangServer& operator=(const RemoteBitbangServer&) = delete;

    // The port actually listened on (0 for a Unix socket).
    std::uint16_t port() const { return port_; }
    // Serves connections until `stop` is set, or after the first one ends
    // when `once`. Problems with one connection are reported on stderr and
    // end that connection only.
    void serve(const std::atomic<bool>& stop, bool once);

private:
    void serveConnection(int fd);
    void catchUpWithWallTime();

    BoardModel& board_;
    int listener_ = -1;
    std::uint16_t port_ = 0;
    std::string unixPath_;
    std::chrono::steady_clock::time_point started_;
    std::uint64_t flashAtStart_ = 0;
};

}  // namespace vorant::ports::jtag
