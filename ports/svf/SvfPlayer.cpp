#include "ports/svf/SvfPlayer.h"

#include "ports/sim/WireByteOrder.h"

#include "ports/svf/SvfError.h"
#include "ports/svf/SvfFileCheck.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cmath>
#include <fstream>
#include <sstream>

namespace vorant::svf {
namespace {

std::string hexByte(std::uint8_t value) {
    const char* digits = "0123456789ABCDEF";
    return std::string("0x") + digits[value >> 4] + digits[value & 0xF];
}

}  // namespace

std::string SvfMismatch::describe() const {
    return "line " + std::to_string(line) + ": " + std::to_string(bitCount) +
           (bitCount == 1 ? " bit differs" : " bits differ") + " from TDO under MASK, first at bit " +
           std::to_string(firstBit) + " (scan byte " + std::to_string(firstBit / 8) + ": expected " +
           hexByte(expectedByte) + ", read " + hexByte(capturedByte) + ")";
}

SvfPlayer::SvfPlayer(sim::FlashModel& flash, SvfPlayerOptions options) : flash_(flash), options_(options) {
    if (options_.spiClockHz == 0) throw SvfError("the SPI clock of the SVF player must not be 0 Hz");
}

void SvfPlayer::reset() {
    tckHz_ = 0;
    flash_.setClockHz(options_.spiClockHz);
}

SvfPlayResult SvfPlayer::playFile(const std::filesystem::path& file) {
    checkSvfFile(file);
    std::ifstream in(file, std::ios::binary);
    if (!in) throw SvfError("cannot read '" + file.string() + "'");
    SvfParser parser(in);
    return play(parser);
}

SvfPlayResult SvfPlayer::playText(std::string_view text) {
    std::istringstream check{std::string(text)};
    checkSvf(check);
    std::istringstream in{std::string(text)};
    SvfParser parser(in);
    return play(parser);
}

SvfPlayResult SvfPlayer::play(SvfParser& parser) {
    reset();
    SvfPlayResult result;
    SvfStatement statement;
    while (parser.next(statement)) {
        playStatement(statement, result);
        if (options_.stopAtFirstMismatch && !result.mismatches.empty()) {
            result.stoppedEarly = parser.next(statement);
            break;
        }
    }
    return result;
}

void SvfPlayer::playStatement(const SvfStatement& statement, SvfPlayResult& result) {
    ++result.statements;
    switch (statement.command) {
    case SvfCommand::Sdr:
        playSdr(statement, result);
        break;
    case SvfCommand::RunTest:
        playRunTest(statement.runTest, result);
        break;
    case SvfCommand::Frequency:
        tckHz_ = statement.frequencyHz;
        break;
    default:
        // SIR, HDR, HIR, TDR, TIR, STATE, TRST, ENDDR, ENDIR: the bridge's.
        break;
    }
}

void SvfPlayer::playSdr(const SvfStatement& statement, SvfPlayResult& result) {
    const SvfScan& scan = statement.scan;
    const std::size_t bits = scan.length;
    if (bits == 0) return;
    ++result.sdrCount;
    result.sdrBits += bits;

    captured_.assign(bits, false);
    const std::uint8_t* mosi = scan.tdi.data();
    std::uint8_t* miso = captured_.data();
    const std::size_t wholeBytes = bits / 8;
    wireOut_.resize(wholeBytes);
    wireIn_.resize(wholeBytes);
    for (std::size_t k = 0; k < wholeBytes; ++k) wireOut_[k] = sim::kWireMirror[mosi[k]];

    const std::uint64_t start = flash_.now();
    flash_.select();
    flash_.clockBytes(wireOut_.data(), wireIn_.data(), wholeBytes);
    for (std::size_t i = wholeBytes * 8; i < bits; ++i) captured_.setBit(i, flash_.clockBit(scan.tdi.bit(i)));
    flash_.deselect();
    result.busNanoseconds += flash_.now() - start;
    for (std::size_t k = 0; k < wholeBytes; ++k) miso[k] = sim::kWireMirror[wireIn_[k]];

    if (scan.compare) {
        ++result.comparedSdrs;
        compare(statement, result);
    }
}

void SvfPlayer::compare(const SvfStatement& statement, SvfPlayResult& result) const {
    const SvfScan& scan = statement.scan;
    const std::uint8_t* captured = captured_.data();
    const std::uint8_t* expected = scan.tdo.data();
    const std::uint8_t* mask = scan.mask.data();
    SvfMismatch mismatch;
    for (std::size_t k = 0; k < captured_.byteSize(); ++k) {
        const unsigned differing = (captured[k] ^ expected[k]) & mask[k];
        if (differing == 0) continue;
        if (mismatch.bitCount == 0) {
            mismatch.firstBit = k * 8 + static_cast<std::size_t>(std::countr_zero(differing));
            mismatch.expectedByte = sim::kWireMirror[expected[k]];
            mismatch.capturedByte = sim::kWireMirror[captured[k]];
        }
        mismatch.bitCount += static_cast<std::size_t>(std::popcount(differing));
    }
    if (mismatch.bitCount == 0) return;
    mismatch.line = statement.line;
    result.mismatches.push_back(mismatch);
}

void SvfPlayer::playRunTest(const SvfRunTest& run, SvfPlayResult& result) {
    ++result.runTestCount;
    // Both conditions must hold: the clock count at the test clock (the
    // system clock of SCK counts is unknown here and taken to be the same)
    // and the minimum time.
    double nanoseconds = 0;
    if (run.hasClockCount) {
        const double hz = tckHz_ > 0 ? tckHz_ : static_cast<double>(options_.spiClockHz);
        nanoseconds = static_cast<double>(run.clockCount) * 1e9 / hz;
    }
    if (run.hasMinTime) nanoseconds = std::max(nanoseconds, run.minSeconds * 1e9);
    // A count at a crawling FREQUENCY could exceed any clock; a few decades
    // of simulated time are as good as forever.
    nanoseconds = std::min(nanoseconds, 1e18);
    const auto wait = static_cast<std::uint64_t>(std::llround(nanoseconds));
    flash_.advance(wait);
    result.waitNanoseconds += wait;
}

}  // namespace vorant::svf
