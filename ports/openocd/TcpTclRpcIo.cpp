#include "ports/openocd/TclRpcIo.h"

#include <cerrno>
#include <cstring>
#include <netdb.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

namespace vorant::ports::openocd {

namespace {

constexpr char kEnd = 0x1a;

class TcpTclRpcIo final : public TclRpcIo {
public:
    explicit TcpTclRpcIo(int fd) : fd_(fd) {}
    ~TcpTclRpcIo() override { ::close(fd_); }

    bool request(const std::string& line, std::string& reply, std::chrono::milliseconds timeout) override {
        if (closed_) return false;
        std::string out = line;
        out += kEnd;
        std::size_t sent = 0;
        while (sent < out.size()) {
            const ssize_t n = ::send(fd_, out.data() + sent, out.size() - sent, MSG_NOSIGNAL);
            if (n < 0 && errno == EINTR) continue;
            if (n <= 0) return lose("sending to OpenOCD failed: " + std::string(std::strerror(errno)));
            sent += static_cast<std::size_t>(n);
        }
        const auto deadline = std::chrono::steady_clock::now() + timeout;
        reply.clear();
        for (;;) {
            const std::size_t end = pending_.find(kEnd);
            if (end != std::string::npos) {
                reply = pending_.substr(0, end);
                pending_.erase(0, end + 1);
                return true;
            }
            const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(deadline - std::chrono::steady_clock::now());
            if (left.count() <= 0) return lose("OpenOCD did not answer within " + std::to_string(timeout.count()) + " ms");
            pollfd waiting{fd_, POLLIN, 0};
            const int ready = ::poll(&waiting, 1, static_cast<int>(left.count()));
            if (ready < 0 && errno == EINTR) continue;
            if (ready <= 0) continue;
            char buffer[65536];
            const ssize_t n = ::recv(fd_, buffer, sizeof buffer, 0);
            if (n < 0 && errno == EINTR) continue;
            if (n == 0) return lose("OpenOCD closed the connection");
            if (n < 0) return lose("reading from OpenOCD failed: " + std::string(std::strerror(errno)));
            pending_.append(buffer, static_cast<std::size_t>(n));
        }
    }
    bool closed() const override { return closed_; }
    const std::string& error() const override { return error_; }

private:
    bool lose(const std::string& why) {
        closed_ = true;
        error_ = why;
        return false;
    }

    int fd_;
    bool closed_ = false;
    std::string pending_;
    std::string error_;
};

}  // namespace

std::unique_ptr<TclRpcIo> connectTclRpc(const std::string& host, std::uint16_t port,
                                        std::chrono::milliseconds timeout, std::string& error) {
    addrinfo hints{};
    hints.ai_family = AF_UNSPEC;
    hints.ai_socktype = SOCK_STREAM;
    addrinfo* found = nullptr;
    const int status = ::getaddrinfo(host.c_str(), std::to_string(port).c_str(), &hints, &found);
    if (status != 0) {
        error = "cannot resolve " + host + ": " + ::gai_strerror(status);
        return nullptr;
    }
    error = "no address to connect to";
    for (addrinfo* at = found; at != nullptr; at = at->ai_next) {
        const int fd = ::socket(at->ai_family, at->ai_socktype, at->ai_protocol);
        if (fd < 0) continue;
        // A refused or unreachable port answers at once; the timeout only
        // bounds a host that does not answer at all.
        int flags = 1;
        ::setsockopt(fd, IPPROTO_TCP, TCP_NODELAY, &flags, sizeof flags);
        timeval limit{static_cast<time_t>(timeout.count() / 1000), static_cast<suseconds_t>(timeout.count() % 1000 * 1000)};
        ::setsockopt(fd, SOL_SOCKET, SO_SNDTIMEO, &limit, sizeof limit);
        if (::connect(fd, at->ai_addr, at->ai_addrlen) == 0) {
            ::freeaddrinfo(found);
            return std::make_unique<TcpTclRpcIo>(fd);
        }
        error = std::strerror(errno);
        ::close(fd);
    }
    ::freeaddrinfo(found);
    return nullptr;
}

}  // namespace vorant::ports::openocd
