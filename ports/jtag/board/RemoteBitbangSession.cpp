#include "ports/jtag/board/RemoteBitbangSession.h"

#include <cstdio>

namespace vorant::ports::jtag {

RemoteBitbangSession::Step RemoteBitbangSession::feed(char byte, std::string& reply) {
    ++bytes_;
    if (byte >= '0' && byte <= '7') {
        const int pins = byte - '0';
        board_.setPins((pins & 4) != 0, (pins & 2) != 0, (pins & 1) != 0);
        return Step::Continue;
    }
    switch (byte) {
    case 'R': reply += board_.tdo() ? '1' : '0'; return Step::Continue;
    case 'r':
    case 's': return Step::Continue;  // TRST released; SRST has no target here
    case 't':
    case 'u': board_.resetTap(); return Step::Continue;
    case 'B':
    case 'b': return Step::Continue;
    case 'Q': return Step::Quit;
    default: {
        char text[64];
        std::snprintf(text, sizeof text, "unexpected byte 0x%02X at byte %llu of the remote_bitbang stream",
                      static_cast<unsigned>(static_cast<unsigned char>(byte)), static_cast<unsigned long long>(bytes_));
        error_ = text;
        return Step::Malformed;
    }
    }
}

}  // namespace vorant::ports::jtag
