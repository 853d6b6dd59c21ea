#pragma once
// Plays SVF on a simulated board, statement by statement as a JTAG adapter
// would: SIR and SDR (with their headers and trailers) shifted through the
// TAP, TDO compared under MASK, RUNTEST as TCK cycles in Run-Test/Idle (at
// least its clock count, at least its time at the board's TCK frequency).
// A recording for any bridge plays here exactly as on a board with that
// bridge. Scans end in Run-Test/Idle; STATE knows RESET and IDLE.

#include "ports/jtag/board/BoardModel.h"
#include "ports/svf/SvfPlayer.h"
#include "ports/svf/SvfStatement.h"

#include <filesystem>

namespace vorant::ports::jtag {

class BoardSvfPlayer {
public:
    // stopAtFirstMismatch: as svf::SvfPlayerOptions says.
    explicit BoardSvfPlayer(BoardModel& board, bool stopAtFirstMismatch = true)
        : board_(board), stopAtFirstMismatch_(stopAtFirstMismatch) {}

    // Checks the whole file first: a malformed one throws SvfParseError
    // and plays nothing. A file that cannot be read throws SvfError.
    svf::SvfPlayResult playFile(const std::filesystem::path& file);
    svf::SvfPlayResult playText(const std::string& text);

private:
    void play(std::istream& in, svf::SvfPlayResult& result);
    void playStatement(const svf::SvfStatement& statement, svf::SvfPlayResult& result);
    void playScan(const svf::SvfStatement& statement, svf::SvfPlayResult& result);

    BoardModel& board_;
    bool stopAtFirstMismatch_;
    // The header and trailer bits of each scan kind (HDR, HIR, TDR, TIR).
    svf::SvfScan headerDr_, headerIr_, trailerDr_, trailerIr_;
};

}  // namespace vorant::ports::jtag
