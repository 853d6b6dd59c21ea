#pragma once
// OpenOCD as a JTAG sink, through its Tcl RPC server: irscan and drscan on
// one TAP, sleep for waits. What needs no answer (the instruction, scans
// whose TDO nobody reads, sleeps) is queued and goes out in one request
// with the next scan that is read, or at flush(); every request is wrapped
// in `catch`, so an OpenOCD error comes back as its text. A reply that is
// not what the command gives is an error, never data.

#include "ports/jtag/JtagSink.h"
#include "ports/openocd/TclRpcIo.h"

#include <cstdint>
#include <string>

namespace vorant::ports::openocd {

struct OpenOcdStats {
    std::uint64_t requests = 0;  // round trips
    std::uint64_t commands = 0;
};

class OpenOcdSink final : public jtag::JtagSink {
public:
    OpenOcdSink(TclRpcIo& io, std::string tap) : io_(io), tap_(std::move(tap)) {}

    bool irScan(unsigned bits, std::uint64_t value) override;
    bool drScan(const BitBuffer& tdi, BitBuffer* tdo) override;
    bool idle(std::uint64_t microseconds) override;
    bool tapMayHaveReset() override { return mayHaveReset_; }
    bool lost() const override { return io_.closed(); }
    const std::string& error() const override { return error_; }

    // Sends what is queued. False when it failed (error() says why).
    bool flush();
    // One command on its own, its result in `result`.
    bool run(const std::string& command, std::string& result);
    const OpenOcdStats& stats() const { return stats_; }

private:
    void queue(const std::string& command);
    bool send(std::string& result);
    bool fail(const std::string& why);

    TclRpcIo& io_;
    std::string tap_;
    std::string queued_;
    std::uint64_t queuedSleepMs_ = 0;
    bool mayHaveReset_ = false;
    std::string error_;
    OpenOcdStats stats_;
};

// The value text OpenOCD's drscan takes: "0x" and hex digits, most
// significant first, bit 0 of the buffer the lowest bit.
std::string drscanValue(const BitBuffer& bits);
// A drscan reply field of `bits` bits (2 * ceil(bits / 8) lower-case hex
// digits) into a buffer; false when the text is anything else.
bool parseDrscanField(const std::string& text, std::size_t bits, BitBuffer& out);
// "0 result" or "CODE {message}" from `list [catch {...} r] $r`: true and
// the result for code 0; false and the message otherwise; false with an
// empty code when the reply has no such form.
bool parseCaughtReply(const std::string& reply, std::string& code, std::string& text);

}  // namespace vorant::ports::openocd
