#include "ports/SimulatedPlayback.h"

#include "host/VorantException.h"
#include "ports/PortError.h"
#include "ports/jtag/BridgeKeys.h"
#include "ports/jtag/board/BoardPort.h"
#include "ports/jtag/board/BoardSvfPlayer.h"
#include "ports/sim/SimPort.h"
#include "ports/svf/SvfRecorder.h"

#include <fstream>

namespace vorant::ports {

namespace {

// The part's flash with the context's faults and the address's file.
std::unique_ptr<sim::FlashModel> openFlash(const PortAddress& address, const PortContext& context) {
    const auto [config, faults] = sim::simulatedChip(context);
    // A flash file that does not fit is the caller's VorantException.
    return std::make_unique<sim::FlashModel>(config, faults, address.path);
}

}  // namespace

std::map<std::string, std::string> recordedBridgeKeys(const std::string& svfFile) {
    std::map<std::string, std::string> keys;
    std::ifstream in(svfFile, std::ios::binary);
    const std::string prefix = svf::kBridgeLinePrefix;
    // The header comments come first; the bridge line is among them.
    for (std::string line; std::getline(in, line) && line.rfind("//", 0) == 0;) {
        if (line.rfind(prefix, 0) != 0) continue;
        std::string rest = line.substr(prefix.size());
        while (!rest.empty() && (rest.back() == '\r' || rest.back() == ' ')) rest.pop_back();
        std::size_t start = 0;
        while (start < rest.size()) {
            const std::size_t end = std::min(rest.find(',', start), rest.size());
            const std::string item = rest.substr(start, end - start);
            const std::size_t equals = item.find('=');
            if (equals != std::string::npos) keys.emplace(item.substr(0, equals), item.substr(equals + 1));
            start = end + 1;
        }
        break;
    }
    return keys;
}

svf::SvfPlayResult playOnBoard(const PortAddress& address, const PortContext& context, const std::string& svfFile) {
    PortAddress board = address;
    for (const auto& [key, value] : recordedBridgeKeys(svfFile)) board.keys.emplace(key, value);
    const jtag::BridgeSettings bridge = jtag::bridgeSettings(board, "jtagspi");
    const jtag::BoardSettings settings = jtag::boardFor(bridge, board);
    auto flash = openFlash(board, context);
    jtag::BoardModel model(*flash, settings);
    jtag::BoardSvfPlayer player(model, !context.allMismatches);
    return player.playFile(svfFile);
}

svf::SvfPlayResult playOnSimulator(const PortAddress& address, const PortContext& context,
                                   const std::string& svfFile) {
    const auto recorded = recordedBridgeKeys(svfFile);
    const auto bridge = recorded.find("bridge");
    if (bridge != recorded.end() && bridge->second != "direct") return playOnBoard(address, context, svfFile);
    auto flash = openFlash(address, context);
    svf::SvfPlayerOptions options;
    if (context.clockHz) options.spiClockHz = *context.clockHz;
    options.stopAtFirstMismatch = !context.allMismatches;
    svf::SvfPlayer player(*flash, options);
    return player.playFile(svfFile);
}

}  // namespace vorant::ports
