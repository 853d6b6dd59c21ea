// Reading SVF (sticky values, RUNTEST forms, malformed text) and playing
// it on the flash simulator with every mismatch reported.

#include "ports/svf/SvfError.h"
#include "ports/svf/SvfHex.h"
#include "ports/svf/SvfPlayer.h"

#include <gtest/gtest.h>

#include <sstream>
#include <tuple>

namespace vorant::svf {
namespace {

std::string hexOf(const BitBuffer& bits) {
    std::string text;
    appendSvfHex(text, bits.data(), bits.size(), 1 << 20);
    return text;
}

// TDI, MASK and SMASK stick per scan kind until the length changes; TDO
// never sticks. Keywords in any case, comments, statements over lines.
TEST(SvfParser, KeepsStickyValuesPerScanKind) {
    std::string got;  // per statement: line, length, TDI, TDO (- when none), MASK, SMASK
    for (const SvfStatement& s : parseSvfText("sdr 8 tdi (6\n0) // one\n mask (0F) smask (F0);\n"
                                              "SDR 8 TDO (05);! two\n"
                                              "SDR 8;\n"
                                              "SIR 6 TDI (01);SDR 8 TDI (11) MASK (33);\n"
                                              "SDR 8;\n"
                                              "SDR 4 TDI (1);\n"
                                              "SIR 6;\n")) {
        got += std::to_string(s.line) + ": " + std::to_string(s.scan.length) + " " + hexOf(s.scan.tdi) + " " +
               (s.scan.compare ? hexOf(s.scan.tdo) : "-") + " " + hexOf(s.scan.mask) + " " + hexOf(s.scan.smask) + "|";
    }
    EXPECT_EQ(got, "1: 8 60 - 0F F0|4: 8 60 05 0F F0|5: 8 60 - 0F F0|6: 6 01 - 3F 3F|6: 8 11 - 33 F0|7: 8 11 - 33 F0|"
                   "8: 4 1 - F F|9: 6 01 - 3F 3F|");
}

// Clock count (or -), minimum and maximum time (or -), run/end state.
TEST(SvfParser, ReadsTheRunTestForms) {
    const std::pair<const char*, const char*> cases[] = {
        {"runtest idle 100 tck 1e-3 sec;", "100 TCK 0.001 - IDLE/"},
        {"RUNTEST 0.0015 SEC MAXIMUM 2 SEC ENDSTATE IDLE;", "- 0.0015 2 /IDLE"},
        {"RUNTEST DRPAUSE 10 SCK ENDSTATE RESET;", "10 SCK - - DRPAUSE/RESET"},
        {"RUNTEST 4.0E+01 SEC;", "- 40 - /"},
    };
    for (const auto& [text, expected] : cases) {
        const SvfRunTest r = parseSvfText(text).at(0).runTest;
        std::ostringstream got;
        got << (r.hasClockCount ? std::to_string(r.clockCount) + (r.systemClock ? " SCK" : " TCK") : "-") << " ";
        (r.hasMinTime ? got << r.minSeconds : got << "-") << " ";
        (r.hasMaxTime ? got << r.maxSeconds : got << "-") << " " << r.runState << "/" << r.endState;
        EXPECT_EQ(got.str(), expected) << text;
    }
}

TEST(SvfParser, RefusesMalformedTextWithLineAndReason) {
    const std::tuple<const char*, std::size_t, const char*> cases[] = {
        {"\n\nSDR 8\n TDI (6\nG);", 5, "bad hex digit 'G'"},
        {"SDR 8 TDI (60;\nSDR 8 TDI (60);", 1, "unbalanced parentheses: ';' inside a value (missing ')')"},
        {"SDR 8 TDI (60\n\n", 1, "unbalanced parentheses: '(' is never closed"},
        {"SDR 8 TDI 60);", 1, "unbalanced parentheses: ')' without '('"},
        {"SDR 6 TDI (40);", 1, "SDR TDI: value has set bits beyond its length of 6 bits"},
        {"SDR 8 TDI (60);\nSDR 8 TDI (60)", 2, "missing ';': the statement is not ended before the end of the file"},
        {"SDR 8 TDI (60);\n\nFOO 8;", 3, "unknown command 'FOO'"},
        {"PIO (HL);", 1, "unsupported command 'PIO'"},
        {"SDR TDI (60);", 1, "SDR: missing length before 'TDI'"},
        {"SDR 8 TDI (00);\nSDR 16;", 2, "SDR: missing TDI (required when the length changes)"},
        {"SDR 8 TDI (00) TDI (01);", 1, "SDR: TDI is given twice"},
        {"RUNTEST 100;", 1, "RUNTEST: '100' needs a unit (TCK, SCK or SEC)"},
        {"RUNTEST 1 SEC ENDSTATE DRSHIFT;", 1, "RUNTEST: 'DRSHIFT' is not a stable state"},
        {";", 1, "empty statement: ';' without a command"},
        // Lengths past 1 Mibit are refused before their buffers exist.
        {"SIR 1048577 TDI (0);", 1,
         "SIR: length 1048577 is longer than the longest scan accepted (1048576 bits, far more than a flash "
         "transaction needs)"},
    };
    for (const auto& [text, line, reason] : cases) {
        std::string message = "accepted";
        try {
            parseSvfText(text);
        } catch (const SvfParseError& error) {
            message = error.what();
        }
        EXPECT_EQ(message, "line " + std::to_string(line) + ": " + reason) << text;
    }
}

TEST(SvfPlayer, StopsAtTheFirstMismatchOrReportsEveryOneWithItsLine) {
    sim::FlashConfig config;
    config.sizeBytes = 64 * 1024;
    config.jedecId[0] = 0xEF, config.jedecId[1] = 0x40, config.jedecId[2] = 0x18;
    sim::FlashModel flash(config);
    // The ID read (9Fh) answers EF 40 18. Line 3 expects EF 40 19, lines 4
    // and 5 a wrong first byte (line 5 masks it), line 6 a wrong bit 17 of
    // a 20-bit read, past the last whole byte.
    const std::string text =
        "// read the ID\n"
        "SDR 32 TDI (000000F9) TDO (1802F700) MASK (FFFFFF00);\n"
        "SDR 32 TDI (000000F9) TDO (9802F700);\n"
        "SDR 32 TDI (000000F9) TDO (1802F600) MASK (FFFFFF00);\n"
        "SDR 32 TDI (000000F9) TDO (1802F600) MASK (FFFF0000);\n"
        "SDR 20 TDI (000F9) TDO (0F700) MASK (FFF00);\n";
    // By default the first mismatch ends the play, as on a production player.
    const SvfPlayResult first = SvfPlayer(flash).playText(text);
    EXPECT_EQ(first.comparedSdrs, 2u);
    ASSERT_EQ(first.mismatches.size(), 1u);
    EXPECT_EQ(first.mismatches[0].line, 3u);
    EXPECT_TRUE(first.stoppedEarly);

    SvfPlayerOptions every;
    every.stopAtFirstMismatch = false;
    const SvfPlayResult result = SvfPlayer(flash, every).playText(text);
    EXPECT_FALSE(result.stoppedEarly);
    EXPECT_EQ(result.comparedSdrs, 5u);
    std::string described;
    for (const SvfMismatch& mismatch : result.mismatches) described += mismatch.describe() + "\n";
    EXPECT_EQ(described,
              "line 3: 1 bit differs from TDO under MASK, first at bit 31 (scan byte 3: expected 0x19, read 0x18)\n"
              "line 4: 1 bit differs from TDO under MASK, first at bit 8 (scan byte 1: expected 0x6F, read 0xEF)\n"
              "line 6: 1 bit differs from TDO under MASK, first at bit 17 (scan byte 2: expected 0x00, read 0x40)\n");
}

}  // namespace
}  // namespace vorant::svf
