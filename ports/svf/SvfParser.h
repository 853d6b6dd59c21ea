#pragma once
// Reads SVF one statement at a time (a file of any size is never held in
// memory). Keywords are case-insensitive, statements may span lines, hex
// values may be wrapped over lines. Sticky values follow the SVF rules, for
// each scan kind (SDR, SIR, HDR, HIR, TDR, TIR) on its own: TDI, MASK and
// SMASK carry over while the length stays the same; after a length change
// TDI must be given and MASK and SMASK default to all ones; TDO applies only
// to the statement that names it.
//
// Malformed input throws SvfParseError with the line and the reason; the
// parser is not usable after that.

#include "ports/svf/SvfStatement.h"
#include "ports/svf/SvfTokenizer.h"

#include <array>
#include <istream>
#include <string_view>
#include <vector>

namespace vorant::svf {

class SvfParser {
public:
    explicit SvfParser(std::istream& in) : tokenizer_(in) {}

    // The next statement, false at the end of the input.
    bool next(SvfStatement& statement);

    // The longest scan accepted: 1 Mibit. A flash transaction is one page
    // and its command (a few thousand bits, bridge headers included), so
    // this is far more than any needs, yet it keeps the buffers of a scan
    // small: a tiny file of huge lengths must not take gigabytes. Longer
    // lengths are refused, with their line, before anything is allocated.
    static constexpr std::size_t kMaxScanBits = std::size_t{1} << 20;

private:
    struct StickyScan {
        bool defined = false;
        std::size_t length = 0;
        BitBuffer tdi, mask, smask;
    };

    bool readStatement();
    void parseScan(SvfStatement& statement, std::string_view name);
    void parseRunTest(SvfStatement& statement);
    void parseStateList(SvfStatement& statement, std::string_view name, bool single);
    void parseTrst(SvfStatement& statement);
    void parseFrequency(SvfStatement& statement);
    [[noreturn]] void fail(const SvfToken& at, const std::string& reason) const;
    const SvfToken& wordAt(std::size_t index, std::string_view context, std::string_view what);

    SvfTokenizer tokenizer_;
    // The tokens of the current statement, without its semicolon; reused so
    // the value strings keep their capacity.
    std::vector<SvfToken> tokens_;
    std::size_t tokenCount_ = 0;
    std::size_t statementLine_ = 0;
    std::array<StickyScan, 6> sticky_;
};

// Parses a whole text; for tests and small inputs.
std::vector<SvfStatement> parseSvfText(std::string_view text);

}  // namespace vorant::svf
