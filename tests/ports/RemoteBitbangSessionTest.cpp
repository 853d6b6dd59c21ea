// remote_bitbang sessions as OpenOCD speaks them, each a byte transcript
// written from the protocol (a cycle is '0'+tms*2+tdi, then 'R' when TDO is
// read, then '4'+tms*2+tdi), and the answers the board must give.

#include "ports/jtag/board/RemoteBitbangSession.h"

#include <gtest/gtest.h>

#include <sstream>

namespace vorant::ports::jtag::test {
namespace {

// Cycles written as their TMS and TDI bits, space apart ("10": TMS 1,
// TDI 0); a trailing 'r' reads TDO in that cycle.
std::string cycles(const std::string& text) {
    std::string bytes;
    std::istringstream words(text);
    for (std::string cycle; words >> cycle;) {
        const int tms = cycle[0] - '0', tdi = cycle[1] - '0';
        bytes += static_cast<char>('0' + tms * 2 + tdi);
        if (cycle.size() > 2 && cycle[2] == 'r') bytes += 'R';
        bytes += static_cast<char>('4' + tms * 2 + tdi);
    }
    return bytes;
}

sim::FlashConfig tinyChip() {
    sim::FlashConfig config;
    config.partName = "TINY";
    config.sizeBytes = 4096;
    return config;
}

// Reset, Idle, Select-DR, Capture-DR, then 32 reads of IDCODE.
std::string idcodeRead() {
    std::string text = "10 10 10 10 10 00 10 00 00 ";
    for (int k = 0; k < 32; ++k) text += k == 31 ? "10r " : "00r ";
    return cycles(text);
}

TEST(RemoteBitbangSession, AnswersEachReadWithTdo) {
    struct Case {
        const char* name;
        std::string bytes;
        std::string reply;
        RemoteBitbangSession::Step last;
    };
    const Case cases[] = {
        // 0x0362D093, least significant bit first.
        {"IdcodeAfterReset", idcodeRead(), "11001001000010110100011011000000", RemoteBitbangSession::Step::Continue},
        {"BlinkAndResetLinesAnswerNothing", "BbrsR", "1", RemoteBitbangSession::Step::Continue},
        {"Quit", "RQ", "1", RemoteBitbangSession::Step::Quit},
        {"Malformed", "0R\n", "1", RemoteBitbangSession::Step::Malformed},
    };
    for (const Case& row : cases) {
        sim::FlashModel flash(tinyChip());
        BoardModel board(flash, BoardSettings{});
        RemoteBitbangSession session(board);
        std::string reply;
        RemoteBitbangSession::Step step = RemoteBitbangSession::Step::Continue;
        for (char byte : row.bytes) {
            step = session.feed(byte, reply);
            if (step != RemoteBitbangSession::Step::Continue) break;
        }
        EXPECT_EQ(reply, row.reply) << row.name;
        EXPECT_EQ(step, row.last) << row.name;
    }
}

TEST(RemoteBitbangSession, NamesTheMalformedByteAndTrstResetsTheTap) {
    sim::FlashModel flash(tinyChip());
    BoardModel board(flash, BoardSettings{});
    RemoteBitbangSession session(board);
    std::string reply;
    for (char byte : cycles("10 00 10 10 00 00")) session.feed(byte, reply);  // into Shift-IR
    EXPECT_EQ(board.state(), TapState::ShiftIr);
    session.feed('t', reply);
    EXPECT_EQ(board.state(), TapState::TestLogicReset);
    EXPECT_EQ(session.feed('x', reply), RemoteBitbangSession::Step::Malformed);
    EXPECT_EQ(session.error(), "unexpected byte 0x78 at byte 14 of the remote_bitbang stream");
}

}  // namespace
}  // namespace vorant::ports::jtag::test
