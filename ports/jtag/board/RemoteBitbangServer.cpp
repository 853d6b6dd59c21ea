#include "ports/jtag/board/RemoteBitbangServer.h"

#include "ports/jtag/board/RemoteBitbangSession.h"

#include <arpa/inet.h>
#include <cerrno>
#include <cstring>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <poll.h>
#include <stdexcept>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

namespace vorant::ports::jtag {

namespace {

// Room for the characters of many long scans at once.
constexpr int kReceiveWindowBytes = 32 * 1024 * 1024;

std::string systemError(const std::string& what) { return what + ": " + std::strerror(errno); }

bool sendAll(int fd, const std::string& bytes) {
    std::size_t sent = 0;
    while (sent < bytes.size()) {
        const ssize_t n = ::send(fd, bytes.data() + sent, bytes.size() - sent, MSG_NOSIGNAL);
        if (n < 0 && errno == EINTR) continue;
        if (n <= 0) return false;
        sent += static_cast<std::size_t>(n);
    }
    return true;
}

}  // namespace

RemoteBitbangServer::RemoteBitbangServer(BoardModel& board, const std::string& host, std::uint16_t port,
                                         const std::string& unixPath)
    : board_(board), unixPath_(unixPath), started_(std::chrono::steady_clock::now()),
      flashAtStart_(board.flash().now()) {
    if (!unixPath.empty()) {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        if (unixPath.size() >= sizeof address.sun_path) throw std::runtime_error(unixPath + ": the socket path is too long");
        std::memcpy(address.sun_path, unixPath.c_str(), unixPath.size() + 1);
        listener_ = ::socket(AF_UNIX, SOCK_STREAM, 0);
        ::unlink(unixPath.c_str());
        if (listener_ < 0 || ::bind(listener_, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0 ||
            ::listen(listener_, 1) != 0)
            throw std::runtime_error(systemError("cannot listen on " + unixPath));
        return;
    }
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(port);
    if (::inet_pton(AF_INET, host.c_str(), &address.sin_addr) != 1)
        throw std::runtime_error(host + " is not an IPv4 address; give one such as 127.0.0.1");
    listener_ = ::socket(AF_INET, SOCK_STREAM, 0);
    const int yes = 1;
    if (listener_ >= 0) ::setsockopt(listener_, SOL_SOCKET, SO_REUSEADDR, &yes, sizeof yes);
    // OpenOCD's remote_bitbang writes without waiting and gives up when the
    // socket is full (EAGAIN), which a board slower than its adapter (a
    // sanitizer build, a loaded machine) would otherwise cause during a long
    // SVF run. A large receive window, set before the connection is
    // accepted so the window scale allows it, takes whole runs of scans.
    if (listener_ >= 0) {
        const int window = kReceiveWindowBytes;
        if (::setsockopt(listener_, SOL_SOCKET, SO_RCVBUFFORCE, &window, sizeof window) != 0)
            ::setsockopt(listener_, SOL_SOCKET, SO_RCVBUF, &window, sizeof window);
    }
    if (listener_ < 0 || ::bind(listener_, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0 ||
        ::listen(listener_, 1) != 0)
        throw std::runtime_error(systemError("cannot listen on " + host + ":" + std::to_string(port)));
    socklen_t length = sizeof address;
    ::getsockname(listener_, reinterpret_cast<sockaddr*>(&address), &length);
    port_ = ntohs(address.sin_port);
}

RemoteBitbangServer::~RemoteBitbangServer() {
    if (listener_ >= 0) ::close(listener_);
    if (!unixPath_.empty()) ::unlink(unixPath_.c_str());
}

// Whichever says more: TCK cycles or the wall clock.
void RemoteBitbangServer::catchUpWithWallTime() {
    const auto wall = static_cast<std::uint64_t>(
        std::chrono::duration_cast<std::chrono::nanoseconds>(std::chrono::steady_clock::now() - started_).count());
    const std::uint64_t simulated = board_.flash().now() - flashAtStart_;
    if (wall > simulated) board_.flash().advance(wall - simulated);
}

void RemoteBitbangServer::serve(const std::atomic<bool>& stop, bool once) {
    while (!stop.load()) {
        pollfd waiting{listener_, POLLIN, 0};
        if (::poll(&waiting, 1, 200) <= 0) continue;
        const int fd = ::accept(listener_, nullptr, nullptr);
        if (fd < 0) continue;
        const int yes = 1;
        ::setsockopt(fd, IPPROTO_TCP, TCP_NODELAY, &yes, sizeof yes);
        serveConnection(fd);
        ::close(fd);
        if (once) return;
    }
}

void RemoteBitbangServer::serveConnection(int fd) {
    RemoteBitbangSession session(board_);
    char buffer[4096];
    std::string reply;
    for (;;) {
        const ssize_t n = ::recv(fd, buffer, sizeof buffer, 0);
        if (n < 0 && errno == EINTR) continue;
        if (n <= 0) return;  // the adapter closed the connection
        catchUpWithWallTime();
        reply.clear();
        for (ssize_t k = 0; k < n; ++k) {
            const RemoteBitbangSession::Step step = session.feed(buffer[k], reply);
            if (step == RemoteBitbangSession::Step::Quit) {
                sendAll(fd, reply);
                return;
            }
            if (step == RemoteBitbangSession::Step::Malformed) {
                sendAll(fd, reply);
                std::fprintf(stderr, "vorant-board: %s; closing the connection\n", session.error().c_str());
                return;
            }
        }
        if (!reply.empty() && !sendAll(fd, reply)) return;
    }
}

}  // namespace vorant::ports::jtag
