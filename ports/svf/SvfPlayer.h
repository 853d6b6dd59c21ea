#pragma once
// Plays SVF against the flash simulator: each SDR is one SPI transaction
// (chip select, every TDI bit in order from bit 0, deselect), RUNTEST lets
// simulated time pass, and TDO is compared under MASK with what the flash
// sent back. Each SPI clock costs simulated time too. Instruction-register
// and header/trailer scans, TRST, STATE and END states belong to a user's
// bridge and are accepted and ignored.
//
// This is how a recorded file is proven: record, play on a fresh simulated
// flash, compare the flash with the image.

#include "ports/sim/FlashModel.h"
#include "ports/svf/BitBuffer.h"
#include "ports/svf/SvfParser.h"
#include "ports/svf/SvfStatement.h"

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <string>
#include <string_view>
#include <vector>

namespace vorant::svf {

struct SvfPlayerOptions {
    // The SPI clock: each shifted bit costs the flash one period of it.
    // RUNTEST clock counts use it too unless the file sets a FREQUENCY.
    std::uint32_t spiClockHz = 50'000'000;
    // Stop at the first mismatch, as a production player does: what comes
    // after it was recorded for a chip this one is not (or is no longer).
    bool stopAtFirstMismatch = true;
};

// One SDR whose captured bits differ from TDO under MASK.
struct SvfMismatch {
    std::size_t line = 0;      // where the SDR starts
    std::size_t firstBit = 0;  // first differing bit of the scan (bit 0 first shifted)
    std::size_t bitCount = 0;  // differing bits under MASK
    // The byte of the scan that holds firstBit, as on the wire (its first
    // bit is the most significant).
    std::uint8_t expectedByte = 0;
    std::uint8_t capturedByte = 0;

    std::string describe() const;
};

struct SvfPlayResult {
    std::uint64_t statements = 0;
    std::uint64_t sdrCount = 0;
    std::uint64_t sdrBits = 0;
    std::uint64_t comparedSdrs = 0;
    std::uint64_t runTestCount = 0;
    // Simulated time spent clocking bits and waiting in RUNTEST.
    std::uint64_t busNanoseconds = 0;
    std::uint64_t waitNanoseconds = 0;
    std::vector<SvfMismatch> mismatches;
    // The statements after the first mismatch were not played.
    bool stoppedEarly = false;

    bool passed() const { return mismatches.empty(); }
};

class SvfPlayer {
public:
    explicit SvfPlayer(sim::FlashModel& flash, SvfPlayerOptions options = {});

    // Sets the flash's SPI clock to options.spiClockHz at the start of each
    // play. Reads the whole file once to check it, then plays it: a malformed file
    // throws SvfParseError and leaves the flash untouched. A file that cannot
    // be read throws SvfError.
    SvfPlayResult playFile(const std::filesystem::path& file);
    // The same two passes over a text.
    SvfPlayResult playText(std::string_view text);
    // Plays statements as the parser delivers them. A parse error throws
    // after the statements before it were played.
    SvfPlayResult play(SvfParser& parser);

    // One statement; adds to `result`.
    void playStatement(const SvfStatement& statement, SvfPlayResult& result);

private:
    void playSdr(const SvfStatement& statement, SvfPlayResult& result);
    void playRunTest(const SvfRunTest& run, SvfPlayResult& result);
    void compare(const SvfStatement& statement, SvfPlayResult& result) const;
    void reset();

    sim::FlashModel& flash_;
    SvfPlayerOptions options_;
    double tckHz_ = 0;  // from FREQUENCY; 0 means the SPI clock
    BitBuffer captured_;
    std::vector<std::uint8_t> wireOut_, wireIn_;
};

}  // namespace vorant::svf
