#pragma once
// OpenOCD's remote_bitbang protocol, one byte at a time, on a simulated
// board. Knows nothing of sockets: the server feeds it what arrives and
// sends back what it answers.
//   '0'..'7'  TCK, TMS, TDI = bits 2, 1, 0
//   'R'       read TDO: answer '0' or '1'
//   'r' 's' 't' 'u'  reset lines (TRST, SRST) = 00, 01, 10, 11; TRST
//             resets the TAP
//   'B' 'b'   blink on/off
//   'Q'       quit

#include "ports/jtag/board/BoardModel.h"

#include <cstdint>
#include <string>

namespace vorant::ports::jtag {

class RemoteBitbangSession {
public:
    enum class Step { Continue, Quit, Malformed };

    explicit RemoteBitbangSession(BoardModel& board) : board_(board) {}

    // One byte from the adapter; a TDO answer is appended to `reply`. After
    // Malformed, error() says what came and the session should be closed.
    Step feed(char byte, std::string& reply);
    const std::string& error() const { return error_; }
    std::uint64_t bytesFed() const { return bytes_; }

private:
    BoardModel& board_;
    std::uint64_t bytes_ = 0;
    std::string error_;
};

}  // namespace vorant::ports::jtag
