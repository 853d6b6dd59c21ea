#pragma once
// The seam between the OpenOCD port and the operating system: one
// connection to OpenOCD's Tcl RPC server. A request is one Tcl line, the
// reply the result text; the 0x1a that ends each on the wire is the
// implementation's business. Tests replace it with a double that speaks
// the published protocol.

#include <chrono>
#include <cstdint>
#include <memory>
#include <string>

namespace vorant::ports::openocd {

class TclRpcIo {
public:
    virtual ~TclRpcIo() = default;
    // Sends one request and waits up to `timeout` for its reply. False
    // when the connection failed; error() says how.
    virtual bool request(const std::string& line, std::string& reply, std::chrono::milliseconds timeout) = 0;
    // True once the connection is gone for good.
    virtual bool closed() const = 0;
    virtual const std::string& error() const = 0;
};

// A TCP connection to host:port. Returns null with `error` set when no
// connection could be made within `timeout`.
std::unique_ptr<TclRpcIo> connectTclRpc(const std::string& host, std::uint16_t port,
                                        std::chrono::milliseconds timeout, std::string& error);

}  // namespace vorant::ports::openocd
