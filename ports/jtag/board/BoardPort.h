#pragma once
// The simulated JTAG board as a port of the port table: "board[:FILE]"
// with the bridge keys. The device's transactions go through the same JTAG
// port a live adapter uses, over the bridge encoder, into the board's TAP
// and bridge model, onto the simulated flash. The flash keeps its memory in
// FILE between runs, as with "sim:FILE".

#include "ports/Port.h"
#include "ports/PortTable.h"
#include "ports/jtag/JtagPort.h"
#include "ports/jtag/board/BoardModel.h"
#include "ports/jtag/board/BoardSink.h"
#include "ports/sim/FlashModel.h"

#include <memory>
#include <string>

namespace vorant::ports::jtag {

// The board a bridge setting describes: the same instruction, IR length
// and delay. Throws PortError (BadRequest) for a chain of several TAPs.
BoardSettings boardFor(const BridgeSettings& bridge, const PortAddress& address);

class BoardPort final : public Port {
public:
    BoardPort(const PortAddress& address, const PortContext& context);
    ScanPort& scan() override { return *port_; }
    std::optional<std::uint64_t> busNanoseconds() const override;
    void abandon() override;

    BoardModel& board() { return *board_; }
    JtagPort& jtag() { return *port_; }

private:
    std::unique_ptr<sim::FlashModel> flash_;
    std::unique_ptr<BoardModel> board_;
    std::unique_ptr<BoardSink> sink_;
    std::unique_ptr<JtagPort> port_;
    std::string createdBackingFile_;
};

const PortInfo& boardPortInfo();

}  // namespace vorant::ports::jtag
