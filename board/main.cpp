// vorant-board: a simulated JTAG board with a SPI flash behind a bridge,
// served over OpenOCD's remote_bitbang protocol. Point OpenOCD at it with
//   adapter driver remote_bitbang; remote_bitbang host 127.0.0.1;
//   remote_bitbang port PORT; jtag newtap fpga tap -irlen 6 -expected-id 0x0362d093
// It prints "listening on HOST:PORT" once it accepts connections.

#include "cli/PartDatabaseSetup.h"
#include "cli/UsageError.h"
#include "host/VorantException.h"
#include "ports/jtag/board/BoardModel.h"
#include "ports/jtag/board/RemoteBitbangServer.h"
#include "ports/sim/FlashModel.h"

#include <CLI/CLI.hpp>

#include <atomic>
#include <csignal>
#include <cstdio>
#include <exception>

namespace {

std::atomic<bool> stopRequested{false};

void requestStop(int) { stopRequested.store(true); }

}  // namespace

int main(int argc, char** argv) {
    CLI::App app{"vorant-board: a simulated JTAG board with a SPI flash, served over remote_bitbang.", "vorant-board"};
    std::string part = "W25Q128JV", flashFile, host = "127.0.0.1", unixPath, bridge = "jtagspi";
    std::vector<std::string> partFiles;
    unsigned port = 0, irLength = 6, delay = 1;
    std::uint64_t instruction = 0x02, idcode = 0x0362D093;
    std::uint32_t tckHz = 10'000'000;
    bool once = false;
    app.add_option("--part", part, "The flash part on the board (default W25Q128JV)");
    app.add_option("--parts", partFiles, "Load extra part files after the shipped ones (repeatable)")
        ->expected(1)
        ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll);
    app.add_option("--flash", flashFile, "Keep the flash's memory and status registers in this file");
    app.add_option("--host", host, "The IPv4 address to listen on (default 127.0.0.1)");
    app.add_option("--port", port, "The TCP port to listen on (default 0: any free port)");
    app.add_option("--unix", unixPath, "Listen on this Unix socket instead of TCP");
    app.add_option("--bridge", bridge, "The bridge: jtagspi, shiftdr or direct (default jtagspi)");
    app.add_option("--irlen", irLength, "The TAP's IR length (default 6)");
    app.add_option("--ir", instruction, "The bridge's user instruction (default 0x02)");
    app.add_option("--idcode", idcode, "The TAP's IDCODE (default 0x0362d093)");
    app.add_option("--delay", delay, "Clocks MISO comes back late (default 1)");
    app.add_option("--tck-hz", tckHz, "The TCK frequency the flash counts time in (default 10000000)");
    app.add_flag("--once", once, "Stop when the first connection ends");
    CLI11_PARSE(app, argc, argv);

    try {
        vorant::cli::loadPartDatabase(partFiles);
        vorant::sim::FlashModel flash(vorant::sim::FlashConfig::fromPartDatabase(part), {}, flashFile);
        vorant::ports::jtag::BoardSettings settings;
        settings.bridge = bridge;
        settings.irLength = irLength;
        settings.userInstruction = instruction;
        settings.idcode = static_cast<std::uint32_t>(idcode);
        settings.misoDelay = delay;
        settings.tckHz = tckHz;
        vorant::ports::jtag::BoardModel board(flash, settings);
        vorant::ports::jtag::RemoteBitbangServer server(board, host, static_cast<std::uint16_t>(port), unixPath);
        std::signal(SIGTERM, requestStop);
        std::signal(SIGINT, requestStop);
        std::signal(SIGPIPE, SIG_IGN);
        if (unixPath.empty()) std::printf("listening on %s:%u\n", host.c_str(), server.port());
        else std::printf("listening on %s\n", unixPath.c_str());
        std::fflush(stdout);
        server.serve(stopRequested, once);
    } catch (const vorant::cli::UsageError& error) {
        std::fprintf(stderr, "vorant-board: %s\n", error.what());
        return 2;
    } catch (const std::exception& error) {
        std::fprintf(stderr, "vorant-board: %s\n", error.what());
        return 1;
    }
    return 0;
}
