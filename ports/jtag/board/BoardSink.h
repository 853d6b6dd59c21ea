#pragma once
// The simulated board as a JTAG sink: the in-process twin of an adapter
// wired to a real board.

#include "ports/jtag/JtagSink.h"
#include "ports/jtag/board/BoardModel.h"

namespace vorant::ports::jtag {

class BoardSink final : public JtagSink {
public:
    explicit BoardSink(BoardModel& board);
    // Checks the IR capture pattern (...01) as adapters do at start: a
    // wrong IR length shows there.
    bool irScan(unsigned bits, std::uint64_t value) override;
    bool drScan(const BitBuffer& tdi, BitBuffer* tdo) override;
    bool idle(std::uint64_t microseconds) override;
    const std::string& error() const override { return error_; }

private:
    BoardModel& board_;
    BitBuffer scratch_;
    std::string error_;
};

}  // namespace vorant::ports::jtag
