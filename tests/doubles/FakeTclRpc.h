#pragma once
// OpenOCD's Tcl RPC server as a test double, written from its published
// behaviour and never from the port's code: each request must be
// `list [catch {CMD; CMD...} r] $r`; irscan, drscan (one field, 0x value),
// sleep and `jtag names` act on a simulated board pin by pin; the
// reply is "0 RESULT" or "1 {MESSAGE}" as OpenOCD gives them. Every request
// is logged as one line, and faults can be scripted.

#include "ports/jtag/board/BoardModel.h"
#include "ports/openocd/TclRpcIo.h"

#include <string>
#include <vector>

namespace vorant::test {

class FakeTclRpc final : public ports::openocd::TclRpcIo {
public:
    explicit FakeTclRpc(ports::jtag::BoardModel& board, std::string tap = "fpga.tap");

    bool request(const std::string& line, std::string& reply, std::chrono::milliseconds timeout) override;
    bool closed() const override { return closed_; }
    const std::string& error() const override { return error_; }

    // The requests as sent, one line each.
    std::vector<std::string> log;
    // Scripting: the request (1-based) from which the connection is gone;
    // a reply text to give instead of the real one at that request.
    int closeAtRequest = 0;
    int garbleAtRequest = 0;
    std::string garbledReply = "not a reply";

private:
    // Runs one command; false with the message when OpenOCD would fail it.
    bool execute(const std::string& command, std::string& result);

    ports::jtag::BoardModel& board_;
    std::string tap_;
    bool closed_ = false;
    std::string error_;
};

}  // namespace vorant::test
