#include "ports/jtag/board/BoardPort.h"

#include "host/VorantException.h"
#include "ports/PortError.h"
#include "ports/sim/FlashFileAdvice.h"
#include "ports/jtag/BridgeKeys.h"
#include "ports/sim/FaultOption.h"
#include "ports/sim/SimPort.h"

#include <filesystem>
#include <stdexcept>
#include <system_error>

namespace vorant::ports::jtag {

namespace {

[[noreturn]] void refuse(const std::string& message) { throw PortError(PortError::Kind::BadRequest, message); }

}  // namespace

BoardSettings boardFor(const BridgeSettings& bridge, const PortAddress& address) {
    BoardSettings board;
    board.bridge = bridge.name;
    board.irLength = bridge.irLength;
    board.userInstruction = bridge.instruction;
    board.chain = bridge.chain;
    // The host's delay counts every clock between MISO and TDO; on the
    // board each other TAP's bypass register is one of them, the bridge's
    // own registers the rest.
    const unsigned others = static_cast<unsigned>(bridge.chain.tapCount() - 1);
    const unsigned delay = bridge.misoDelay.value_or(bridge.name == "direct" ? 0 : bridge.name == "jtagspi" ? others + 1 : 1);
    if (delay < others)
        refuse("--port " + address.text + ": delay=" + std::to_string(delay) + " is less than the " +
               std::to_string(others) + " other TAPs of the chain delay MISO");
    board.misoDelay = delay - others;
    if (address.keys.count("tck-hz"))
        board.tckHz = static_cast<std::uint32_t>(keyNumber(address, "tck-hz", 1'000'000'000));
    if (board.tckHz == 0) refuse("--port " + address.text + ": tck-hz=0; give 1 to 1000000000");
    if (address.keys.count("idcode")) board.idcode = static_cast<std::uint32_t>(keyNumber(address, "idcode", 0xFFFFFFFF));
    return board;
}

BoardPort::BoardPort(const PortAddress& address, const PortContext& context) {
    const BridgeSettings bridge = bridgeSettings(address, "jtagspi");
    const BoardSettings boardSettings = boardFor(bridge, address);
    const auto [config, faults] = sim::simulatedChip(context);
    // The board's chip takes its faults; the simulator port's own (failing
    // calls, a lost cable, a cancel) have no place on a board.
    if (faults.failShiftAt || faults.failAllShifts || faults.failWaitAt || faults.failAllWaits ||
        faults.cancelAfterPages >= 0 || faults.failShiftAtPage || faults.failWaitAtPage || faults.disconnectAtShift)
        refuse("--port " + address.text + ": the board takes the chip's faults only (stuck-busy, stuck-bit, "
               "protected, deep-power-down, status-locked); the port's faults need --port sim");
    std::error_code error;
    const std::string& file = address.path;
    const bool fileExisted = !file.empty() && std::filesystem::exists(file, error);
    try {
        flash_ = std::make_unique<sim::FlashModel>(config, faults, file);
    } catch (const VorantException& problem) {
        refuse(std::string(problem.what()) + "; " + sim::flashFileAdvice(problem));
    }
    if (!file.empty() && !fileExisted) createdBackingFile_ = file;
    board_ = std::make_unique<BoardModel>(*flash_, boardSettings);
    sink_ = std::make_unique<BoardSink>(*board_);
    port_ = std::make_unique<JtagPort>("simulated board", makeBridge(bridge), bridge, *sink_);
}

std::optional<std::uint64_t> BoardPort::busNanoseconds() const {
    if (!flash_) return std::nullopt;
    return flash_->now();
}

void BoardPort::abandon() {
    port_.reset();
    sink_.reset();
    board_.reset();
    flash_.reset();
    if (!createdBackingFile_.empty()) {
        std::error_code ignored;
        std::filesystem::remove(createdBackingFile_, ignored);
        createdBackingFile_.clear();
    }
}

const PortInfo& boardPortInfo() {
    static const PortInfo row = [] {
        PortInfo info;
        info.name = "board";
        info.synopsis = {
            {"board", "a simulated JTAG board: a TAP and a bridge (default jtagspi) in front of a simulated chip"},
            {"board:FILE", "the same board, its flash's memory and status registers kept in FILE"},
        };
        info.path = PathUse::Optional;
        info.pathName = "FILE";
        info.keys = bridgeKeys();
        info.keys.push_back({"tck-hz", "HZ", "the board's TCK frequency (default 10000000)"});
        info.keys.push_back({"idcode", "VALUE", "the TAP's IDCODE (default 0x0362d093)"});
        info.caps = {.readsBack = true, .records = false, .simulatesChip = true, .hasBusClock = false,
                     .takesSimFaults = true};
        info.open = [](const PortAddress& address, const PortContext& context) -> std::unique_ptr<Port> {
            return std::make_unique<BoardPort>(address, context);
        };
        return info;
    }();
    return row;
}

}  // namespace vorant::ports::jtag
