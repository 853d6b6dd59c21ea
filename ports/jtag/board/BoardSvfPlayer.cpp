#include "ports/jtag/board/BoardSvfPlayer.h"

#include "ports/jtag/board/BoardScans.h"
#include "ports/svf/SvfError.h"
#include "ports/svf/SvfParser.h"

#include <bit>
#include <cmath>
#include <fstream>
#include <sstream>

namespace vorant::ports::jtag {

namespace {

std::uint8_t mirrored(std::uint8_t byte) {
    std::uint8_t out = 0;
    for (int k = 0; k < 8; ++k)
        if (byte & (1u << k)) out |= static_cast<std::uint8_t>(0x80u >> k);
    return out;
}

// Header first (it travels furthest, towards TDO), then the scan, then
// the trailer.
void appendScan(BitBuffer& out, const svf::SvfScan& scan) { out.append(scan.tdi.data(), scan.length); }

}  // namespace

svf::SvfPlayResult BoardSvfPlayer::playFile(const std::filesystem::path& file) {
    svf::SvfPlayResult result;
    for (int pass = 0; pass < 2; ++pass) {
        std::ifstream in(file, std::ios::binary);
        if (!in) throw svf::SvfError("cannot read '" + file.string() + "'");
        if (pass == 0) {
            svf::SvfParser parser(in);
            svf::SvfStatement statement;
            while (parser.next(statement)) {
            }
        } else {
            play(in, result);
        }
    }
    return result;
}

svf::SvfPlayResult BoardSvfPlayer::playText(const std::string& text) {
    svf::parseSvfText(text);
    std::istringstream in(text);
    svf::SvfPlayResult result;
    play(in, result);
    return result;
}

void BoardSvfPlayer::play(std::istream& in, svf::SvfPlayResult& result) {
    svf::SvfParser parser(in);
    svf::SvfStatement statement;
    headerDr_ = headerIr_ = trailerDr_ = trailerIr_ = svf::SvfScan{};
    while (parser.next(statement)) {
        ++result.statements;
        playStatement(statement, result);
        if (stopAtFirstMismatch_ && !result.mismatches.empty()) {
            result.stoppedEarly = parser.next(statement);
            break;
        }
    }
}

void BoardSvfPlayer::playStatement(const svf::SvfStatement& statement, svf::SvfPlayResult& result) {
    using svf::SvfCommand;
    switch (statement.command) {
    case SvfCommand::Sdr:
    case SvfCommand::Sir: playScan(statement, result); return;
    case SvfCommand::Hdr: headerDr_ = statement.scan; return;
    case SvfCommand::Hir: headerIr_ = statement.scan; return;
    case SvfCommand::Tdr: trailerDr_ = statement.scan; return;
    case SvfCommand::Tir: trailerIr_ = statement.scan; return;
    case SvfCommand::Trst:
        if (!statement.words.empty() && statement.words[0] == "ON") board_.resetTap();
        return;
    case SvfCommand::State:
        for (const std::string& state : statement.words) {
            if (state == "RESET") {
                for (int k = 0; k < 5; ++k) board_.cycle(true, false);
            } else if (state == "IDLE") {
                if (board_.state() != TapState::RunTestIdle) board_.cycle(false, false);
            } else {
                throw svf::SvfError("line " + std::to_string(statement.line) + ": the board walks to RESET and IDLE only, not " + state);
            }
        }
        return;
    case SvfCommand::EndDr:
    case SvfCommand::EndIr:
        if (!statement.words.empty() && statement.words[0] != "IDLE")
            throw svf::SvfError("line " + std::to_string(statement.line) + ": the board ends scans in IDLE only");
        return;
    case SvfCommand::Frequency: return;  // the board keeps its own TCK
    case SvfCommand::RunTest: {
        ++result.runTestCount;
        const svf::SvfRunTest& run = statement.runTest;
        const double hz = board_.settings().tckHz;
        std::uint64_t cycles = run.hasClockCount ? run.clockCount : 0;
        if (run.hasMinTime) cycles = std::max(cycles, static_cast<std::uint64_t>(std::ceil(run.minSeconds * hz)));
        const std::uint64_t before = board_.flash().now();
        runIdle(board_, cycles);
        result.waitNanoseconds += board_.flash().now() - before;
        return;
    }
    }
}

void BoardSvfPlayer::playScan(const svf::SvfStatement& statement, svf::SvfPlayResult& result) {
    const bool dr = statement.command == svf::SvfCommand::Sdr;
    const svf::SvfScan& scan = statement.scan;
    const svf::SvfScan& header = dr ? headerDr_ : headerIr_;
    const svf::SvfScan& trailer = dr ? trailerDr_ : trailerIr_;
    BitBuffer bits, tdo;
    appendScan(bits, header);
    appendScan(bits, scan);
    appendScan(bits, trailer);
    const std::uint64_t before = board_.flash().now();
    if (dr) scanDr(board_, bits, tdo);
    else scanIr(board_, bits, tdo);
    result.busNanoseconds += board_.flash().now() - before;
    if (dr) {
        ++result.sdrCount;
        result.sdrBits += scan.length;
    }
    if (!scan.compare) return;
    if (dr) ++result.comparedSdrs;
    // The scan's own bits sit after the header's.
    BitBuffer captured;
    captured.appendRange(tdo.data(), header.length, scan.length);
    svf::SvfMismatch mismatch;
    for (std::size_t k = 0; k < captured.byteSize(); ++k) {
        const unsigned differing = (captured.data()[k] ^ scan.tdo.data()[k]) & scan.mask.data()[k];
        if (differing == 0) continue;
        if (mismatch.bitCount == 0) {
            mismatch.firstBit = k * 8 + static_cast<std::size_t>(std::countr_zero(differing));
            mismatch.expectedByte = mirrored(scan.tdo.data()[k]);
            mismatch.capturedByte = mirrored(captured.data()[k]);
        }
        mismatch.bitCount += static_cast<std::size_t>(std::popcount(differing));
    }
    if (mismatch.bitCount == 0) return;
    mismatch.line = statement.line;
    result.mismatches.push_back(mismatch);
}

}  // namespace vorant::ports::jtag
