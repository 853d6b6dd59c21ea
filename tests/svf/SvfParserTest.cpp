// What the parser accepts (the recorder's output and the common SVF forms,
// with the sticky-value rules) and how it refuses malformed text.

#include "ports/svf/SvfError.h"
#include "ports/svf/SvfHex.h"
#include "ports/svf/SvfParser.h"

#include <gtest/gtest.h>

namespace vorant::svf {
namespace {

std::string hexOf(const BitBuffer& bits) {
    std::string text;
    appendSvfHex(text, bits.data(), bits.size(), 1 << 20);
    return text;
}

TEST(SvfParser, ReadsCommentsCaseAndStatementsOverLines) {
    const auto statements = parseSvfText(
        "! a comment\n"
        "// another\n"
        "sdr 16 tdi (00\n"
        "   a0) // trailing comment\n"
        "  TDO (0000)\n"
        "  mask (ff00);   ! done\n"
        "SDR 8 TDI (60);SIR 6 TDI (3f);\n");
    ASSERT_EQ(statements.size(), 3u);
    const SvfScan& scan = statements[0].scan;
    EXPECT_EQ(statements[0].command, SvfCommand::Sdr);
    EXPECT_EQ(statements[0].line, 3u);
    EXPECT_EQ(scan.length, 16u);
    EXPECT_EQ(hexOf(scan.tdi), "00A0");
    EXPECT_TRUE(scan.compare);
    EXPECT_EQ(hexOf(scan.tdo), "0000");
    EXPECT_EQ(hexOf(scan.mask), "FF00");
    EXPECT_EQ(hexOf(scan.smask), "FFFF");
    EXPECT_EQ(statements[1].line, 7u);
    EXPECT_EQ(statements[2].command, SvfCommand::Sir);
    EXPECT_EQ(statements[2].line, 7u);
    EXPECT_EQ(hexOf(statements[2].scan.tdi), "3F");
}

TEST(SvfParser, AppliesStickyValuesPerScanKind) {
    const auto s = parseSvfText(
        "SDR 8 TDI (60) MASK (0F) SMASK (F0);\n"  // 0
        "SDR 8 TDO (05);\n"                       // 1: TDI, MASK, SMASK carried over
        "SDR 8;\n"                                // 2: TDO is not sticky
        "SIR 6 TDI (01);\n"                       // 3: SIR has its own memory
        "SDR 8 TDI (11) MASK (33);\n"             // 4
        "SDR 8;\n"                                // 5: the new MASK sticks
        "SDR 4 TDI (1);\n"                        // 6: new length: masks all ones
        "SDR 0;\n"                                // 7: no TDI needed for nothing
        "SIR 6;\n");                              // 8
    ASSERT_EQ(s.size(), 9u);
    EXPECT_EQ(hexOf(s[1].scan.tdi), "60");
    EXPECT_EQ(hexOf(s[1].scan.mask), "0F");
    EXPECT_EQ(hexOf(s[1].scan.smask), "F0");
    EXPECT_TRUE(s[1].scan.compare);
    EXPECT_EQ(hexOf(s[1].scan.tdo), "05");
    EXPECT_FALSE(s[2].scan.compare);
    EXPECT_EQ(hexOf(s[2].scan.tdi), "60");
    EXPECT_EQ(hexOf(s[5].scan.tdi), "11");
    EXPECT_EQ(hexOf(s[5].scan.mask), "33");
    EXPECT_EQ(hexOf(s[5].scan.smask), "F0");
    EXPECT_EQ(hexOf(s[6].scan.mask), "F");
    EXPECT_EQ(hexOf(s[6].scan.smask), "F");
    EXPECT_EQ(s[7].scan.length, 0u);
    EXPECT_EQ(hexOf(s[8].scan.tdi), "01");
}

TEST(SvfParser, ReadsTheRunTestForms) {
    struct Case {
        const char* text;
        bool hasCount;
        std::uint64_t count;
        bool systemClock;
        bool hasMin;
        double minSeconds;
        bool hasMax;
        double maxSeconds;
        const char* runState;
        const char* endState;
    };
    const Case cases[] = {
        {"RUNTEST 1.5E-03 SEC;", false, 0, false, true, 1.5e-3, false, 0, "", ""},
        {"RUNTEST 1000 TCK;", true, 1000, false, false, 0, false, 0, "", ""},
        {"runtest idle 100 tck 1e-3 sec;", true, 100, false, true, 1e-3, false, 0, "IDLE", ""},
        {"RUNTEST 0.0015 SEC MAXIMUM 2 SEC ENDSTATE IDLE;", false, 0, false, true, 0.0015, true, 2, "", "IDLE"},
        {"RUNTEST DRPAUSE 10 SCK ENDSTATE RESET;", true, 10, true, false, 0, false, 0, "DRPAUSE", "RESET"},
        {"RUNTEST 4.0E+01 SEC;", false, 0, false, true, 40, false, 0, "", ""},
    };
    for (const Case& c : cases) {
        const auto statements = parseSvfText(c.text);
        ASSERT_EQ(statements.size(), 1u) << c.text;
        const SvfRunTest& run = statements[0].runTest;
        EXPECT_EQ(statements[0].command, SvfCommand::RunTest);
        EXPECT_EQ(run.hasClockCount, c.hasCount) << c.text;
        EXPECT_EQ(run.clockCount, c.count) << c.text;
        EXPECT_EQ(run.systemClock, c.systemClock) << c.text;
        EXPECT_EQ(run.hasMinTime, c.hasMin) << c.text;
        EXPECT_DOUBLE_EQ(run.minSeconds, c.minSeconds) << c.text;
        EXPECT_EQ(run.hasMaxTime, c.hasMax) << c.text;
        EXPECT_DOUBLE_EQ(run.maxSeconds, c.maxSeconds) << c.text;
        EXPECT_EQ(run.runState, c.runState) << c.text;
        EXPECT_EQ(run.endState, c.endState) << c.text;
    }
}

TEST(SvfParser, ReadsTheSetUpStatements) {
    const auto s = parseSvfText(
        "TRST OFF; ENDIR IDLE; ENDDR DRPAUSE; STATE RESET IDLE; HDR 0; HIR 0; TDR 0; TIR 0;\n"
        "FREQUENCY 1E6 HZ; FREQUENCY; trst absent;\n");
    ASSERT_EQ(s.size(), 11u);
    EXPECT_EQ(s[0].command, SvfCommand::Trst);
    EXPECT_EQ(s[0].words, std::vector<std::string>{"OFF"});
    EXPECT_EQ(s[2].command, SvfCommand::EndDr);
    EXPECT_EQ(s[2].words, std::vector<std::string>{"DRPAUSE"});
    EXPECT_EQ(s[3].words, (std::vector<std::string>{"RESET", "IDLE"}));
    EXPECT_EQ(s[4].command, SvfCommand::Hdr);
    EXPECT_EQ(s[8].command, SvfCommand::Frequency);
    EXPECT_DOUBLE_EQ(s[8].frequencyHz, 1e6);
    EXPECT_DOUBLE_EQ(s[9].frequencyHz, 0);
    EXPECT_EQ(s[10].words, std::vector<std::string>{"ABSENT"});
}

TEST(SvfParser, RefusesMalformedTextWithLineAndReason) {
    struct Case {
        const char* text;
        std::size_t line;
        const char* reason;
    };
    const Case cases[] = {
        {"SDR 8 TDI (6G);", 1, "bad hex digit 'G'"},
        {"\n\nSDR 8\n TDI (6\nG);", 5, "bad hex digit 'G'"},
        {"SDR 8 TDI (60;\nSDR 8 TDI (60);", 1, "unbalanced parentheses: ';' inside a value (missing ')')"},
        {"SDR 8 TDI (6\n0\n\x07);", 3, "bad hex digit byte 0x07"},
        {"SDR 8 TDI (60\n\n", 1, "unbalanced parentheses: '(' is never closed"},
        {"SDR 8 TDI ((60));", 1, "unbalanced parentheses: '(' inside a value"},
        {"SDR 8 TDI 60);", 1, "unbalanced parentheses: ')' without '('"},
        {"SDR 8 TDI (160);", 1, "SDR TDI: value has set bits beyond its length of 8 bits"},
        {"SDR 6 TDI (40);", 1, "SDR TDI: value has set bits beyond its length of 6 bits"},
        {"SDR 8 TDI (60);\nSDR 8 TDI (60)", 2, "missing ';': the statement is not ended before the end of the file"},
        {"SDR 8 TDI (60);\n\nFOO 8;", 3, "unknown command 'FOO'"},
        {"PIO (HL);", 1, "unsupported command 'PIO'"},
        {"SDR;", 1, "SDR: missing length"},
        {"SDR TDI (60);", 1, "SDR: missing length before 'TDI'"},
        {"SIR (60);", 1, "SIR: expected length, found a value in parentheses"},
        {"SDR 8 TDI (00);\nSDR 16;", 2, "SDR: missing TDI (required when the length changes)"},
        {"SDR 8 TDO (00);", 1, "SDR: missing TDI (required when the length changes)"},
        {"SDR 8 TDI (00) TDI (01);", 1, "SDR: TDI is given twice"},
        {"SDR 8 TDI (00) TDO;", 1, "SDR: TDO needs a value in parentheses"},
        {"SDR 8 TDI ();", 1, "SDR: TDI value is empty"},
        {"SDR 8 TDX (00);", 1, "SDR: unexpected 'TDX'"},
        {"SDR 999999999999 TDI (0);", 1, "SDR: length 999999999999 is longer than the longest supported scan (268435456 bits)"},
        {"RUNTEST;", 1, "RUNTEST: needs a clock count or a time"},
        {"RUNTEST 100;", 1, "RUNTEST: '100' needs a unit (TCK, SCK or SEC)"},
        {"RUNTEST 1 MIN;", 1, "RUNTEST: expected TCK, SCK or SEC after 1"},
        {"RUNTEST 0x10 SEC;", 1, "RUNTEST: bad number '0x10'"},
        {"RUNTEST 1E9 SEC;", 1, "RUNTEST: 1E9 is out of range"},
        {"RUNTEST 1 SEC MAXIMUM 2;", 1, "RUNTEST: MAXIMUM needs a time in SEC"},
        {"RUNTEST 1 SEC ENDSTATE DRSHIFT;", 1, "RUNTEST: 'DRSHIFT' is not a stable state"},
        {"ENDDR DRSHIFT;", 1, "ENDDR: DRSHIFT is not a stable state"},
        {"ENDIR IDLE RESET;", 1, "ENDIR: takes one state"},
        {"STATE NOWHERE;", 1, "STATE: unknown state 'NOWHERE'"},
        {"TRST MAYBE;", 1, "TRST: unknown mode 'MAYBE'"},
        {"FREQUENCY 0 HZ;", 1, "FREQUENCY: bad frequency '0'"},
        {"FREQUENCY 1E6;", 1, "FREQUENCY: expected a frequency in HZ"},
        {";", 1, "empty statement: ';' without a command"},
        {"(60);", 1, "a statement must start with a command, not a value"},
        {"SDR 8 TDI (60) / ;", 1, "SDR: unexpected '/'"},
    };
    for (const Case& c : cases) {
        try {
            parseSvfText(c.text);
            ADD_FAILURE() << "accepted: " << c.text;
        } catch (const SvfParseError& error) {
            EXPECT_EQ(error.line(), c.line) << c.text;
            EXPECT_EQ(error.reason(), c.reason) << c.text;
            EXPECT_EQ(std::string(error.what()), "line " + std::to_string(c.line) + ": " + c.reason);
        }
    }
}

TEST(SvfParser, ReadsValuesLongerThanItsBuffer) {
    // A value that spans many buffer fills and lines keeps every digit.
    std::string digits;
    for (int i = 0; i < 40000; ++i) digits += "0123456789ABCDEF"[i % 16];
    std::string wrapped;
    for (std::size_t i = 0; i < digits.size(); i += 128) wrapped += digits.substr(i, 128) + "\n";
    const auto statements = parseSvfText("SDR 160000 TDI (\n" + wrapped + ");");
    ASSERT_EQ(statements.size(), 1u);
    EXPECT_EQ(hexOf(statements[0].scan.tdi), digits);
}

}  // namespace
}  // namespace vorant::svf
