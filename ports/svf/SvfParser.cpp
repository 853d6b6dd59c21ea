#include "ports/svf/SvfParser.h"

#include "ports/svf/SvfError.h"
#include "ports/svf/SvfHex.h"

#include <algorithm>
#include <cctype>
#include <cmath>
#include <cstdlib>
#include <sstream>

namespace vorant::svf {
namespace {

std::string upper(std::string_view text) {
    std::string result(text);
    for (char& c : result) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
    return result;
}

constexpr std::string_view kStates[] = {
    "RESET",   "IDLE",    "DRSELECT", "DRCAPTURE", "DRSHIFT", "DREXIT1", "DRPAUSE", "DREXIT2",
    "DRUPDATE", "IRSELECT", "IRCAPTURE", "IRSHIFT", "IREXIT1", "IRPAUSE", "IREXIT2", "IRUPDATE",
};
constexpr std::string_view kStableStates[] = {"RESET", "IDLE", "DRPAUSE", "IRPAUSE"};

template <std::size_t N>
bool contains(const std::string_view (&list)[N], std::string_view name) {
    return std::find(std::begin(list), std::end(list), name) != std::end(list);
}

// Times longer than this are surely typing errors; they would also overflow
// the nanosecond clocks downstream.
constexpr double kMaxSeconds = 1e6;
constexpr double kMaxClockCount = 1e15;
constexpr double kMaxFrequency = 1e12;

// A decimal number: digits, one optional fraction, an optional exponent.
// Refuses what strtod would also take (hex floats, "inf", "nan").
bool parseReal(const std::string& text, double& value) {
    if (text.empty()) return false;
    for (char c : text)
        if (!std::isdigit(static_cast<unsigned char>(c)) && c != '.' && c != 'e' && c != 'E' && c != '+' && c != '-')
            return false;
    char* end = nullptr;
    value = std::strtod(text.c_str(), &end);
    return end == text.c_str() + text.size() && std::isfinite(value) && value >= 0;
}

bool parseLength(const std::string& text, std::uint64_t& value) {
    if (text.empty() || text.size() > 18) return false;
    value = 0;
    for (char c : text) {
        if (!std::isdigit(static_cast<unsigned char>(c))) return false;
        value = value * 10 + static_cast<std::uint64_t>(c - '0');
    }
    return true;
}

bool isNumberLike(const std::string& text) {
    return !text.empty() && (std::isdigit(static_cast<unsigned char>(text[0])) || text[0] == '.');
}

}  // namespace

void SvfParser::fail(const SvfToken& at, const std::string& reason) const { throw SvfParseError(at.line, reason); }

bool SvfParser::readStatement() {
    tokenCount_ = 0;
    for (;;) {
        if (tokens_.size() == tokenCount_) tokens_.emplace_back();
        SvfToken& token = tokens_[tokenCount_];
        tokenizer_.next(token);
        if (token.kind == SvfToken::Kind::End) {
            if (tokenCount_ == 0) return false;
            throw SvfParseError(tokens_[0].line, "missing ';': the statement is not ended before the end of the file");
        }
        if (token.kind == SvfToken::Kind::Semicolon) {
            if (tokenCount_ == 0) fail(token, "empty statement: ';' without a command");
            statementLine_ = tokens_[0].line;
            return true;
        }
        ++tokenCount_;
    }
}

const SvfToken& SvfParser::wordAt(std::size_t index, std::string_view context, std::string_view what) {
    if (index >= tokenCount_) fail(tokens_[0], std::string(context) + ": missing " + std::string(what));
    const SvfToken& token = tokens_[index];
    if (token.kind != SvfToken::Kind::Word)
        fail(token, std::string(context) + ": expected " + std::string(what) + ", found a value in parentheses");
    return token;
}

bool SvfParser::next(SvfStatement& statement) {
    if (!readStatement()) return false;
    const SvfToken& first = tokens_[0];
    if (first.kind != SvfToken::Kind::Word) fail(first, "a statement must start with a command, not a value");
    const std::string name = upper(first.text);
    statement.line = statementLine_;
    statement.words.clear();
    statement.frequencyHz = 0;

    static constexpr std::pair<std::string_view, SvfCommand> kScans[] = {
        {"SDR", SvfCommand::Sdr}, {"SIR", SvfCommand::Sir}, {"HDR", SvfCommand::Hdr},
        {"HIR", SvfCommand::Hir}, {"TDR", SvfCommand::Tdr}, {"TIR", SvfCommand::Tir},
    };
    for (const auto& [scanName, command] : kScans) {
        if (name == scanName) {
            statement.command = command;
            parseScan(statement, scanName);
            return true;
        }
    }
    if (name == "RUNTEST") {
        statement.command = SvfCommand::RunTest;
        parseRunTest(statement);
    } else if (name == "ENDDR" || name == "ENDIR") {
        statement.command = name == "ENDDR" ? SvfCommand::EndDr : SvfCommand::EndIr;
        parseStateList(statement, name, true);
    } else if (name == "STATE") {
        statement.command = SvfCommand::State;
        parseStateList(statement, name, false);
    } else if (name == "TRST") {
        statement.command = SvfCommand::Trst;
        parseTrst(statement);
    } else if (name == "FREQUENCY") {
        statement.command = SvfCommand::Frequency;
        parseFrequency(statement);
    } else if (name == "PIO" || name == "PIOMAP") {
        fail(first, "unsupported command '" + first.text + "'");
    } else {
        fail(first, "unknown command '" + first.text + "'");
    }
    return true;
}

void SvfParser::parseScan(SvfStatement& statement, std::string_view name) {
    const std::string context(name);
    const SvfToken& lengthToken = wordAt(1, context, "length");
    std::uint64_t length = 0;
    if (!isNumberLike(lengthToken.text)) fail(lengthToken, context + ": missing length before '" + lengthToken.text + "'");
    if (!parseLength(lengthToken.text, length)) fail(lengthToken, context + ": bad length '" + lengthToken.text + "'");
    if (length > kMaxScanBits)
        fail(lengthToken, context + ": length " + lengthToken.text + " is longer than the longest scan accepted (" +
                              std::to_string(kMaxScanBits) + " bits, far more than a flash transaction needs)");
    const auto bits = static_cast<std::size_t>(length);

    SvfScan& scan = statement.scan;
    scan.length = bits;
    scan.compare = false;
    bool hasTdi = false, hasMask = false, hasSmask = false;
    for (std::size_t i = 2; i < tokenCount_; i += 2) {
        const SvfToken& keyToken = wordAt(i, context, "TDI, TDO, MASK or SMASK");
        const std::string key = upper(keyToken.text);
        BitBuffer* target = nullptr;
        bool* seen = nullptr;
        if (key == "TDI") {
            target = &scan.tdi;
            seen = &hasTdi;
        } else if (key == "TDO") {
            target = &scan.tdo;
            seen = &scan.compare;
        } else if (key == "MASK") {
            target = &scan.mask;
            seen = &hasMask;
        } else if (key == "SMASK") {
            target = &scan.smask;
            seen = &hasSmask;
        } else {
            fail(keyToken, context + ": unexpected '" + keyToken.text + "'");
        }
        if (*seen) fail(keyToken, context + ": " + key + " is given twice");
        if (i + 1 >= tokenCount_ || tokens_[i + 1].kind != SvfToken::Kind::Value)
            fail(keyToken, context + ": " + key + " needs a value in parentheses");
        const SvfToken& value = tokens_[i + 1];
        if (value.text.empty()) fail(value, context + ": " + key + " value is empty");
        if (value.badCharacter >= 0)
            throw SvfParseError(value.badCharacterLine, "bad hex digit " + describeCharacter(value.badCharacter));
        if (auto error = parseSvfHex(value.text, bits, *target)) fail(value, context + " " + key + ": " + *error);
        *seen = true;
    }

    StickyScan& sticky = sticky_[static_cast<std::size_t>(statement.command)];
    const bool sameLength = sticky.defined && sticky.length == bits;
    if (!hasTdi) {
        if (sameLength)
            scan.tdi = sticky.tdi;
        else if (bits == 0)
            scan.tdi.clear();
        else
            fail(tokens_[0], context + ": missing TDI (required when the length changes)");
    }
    if (!hasMask) {
        if (sameLength) scan.mask = sticky.mask;
        else scan.mask.assign(bits, true);
    }
    if (!hasSmask) {
        if (sameLength) scan.smask = sticky.smask;
        else scan.smask.assign(bits, true);
    }
    if (!scan.compare) scan.tdo.clear();
    sticky.defined = true;
    sticky.length = bits;
    if (hasTdi || !sameLength) sticky.tdi = scan.tdi;
    if (hasMask || !sameLength) sticky.mask = scan.mask;
    if (hasSmask || !sameLength) sticky.smask = scan.smask;
}

void SvfParser::parseRunTest(SvfStatement& statement) {
    SvfRunTest& run = statement.runTest;
    run = SvfRunTest{};
    std::size_t i = 1;
    auto word = [&](std::size_t index) { return upper(wordAt(index, "RUNTEST", "a word").text); };
    if (i < tokenCount_ && contains(kStates, word(i))) {
        run.runState = word(i);
        if (!contains(kStableStates, run.runState)) fail(tokens_[i], "RUNTEST: " + run.runState + " is not a stable state");
        ++i;
    }
    auto number = [&](std::size_t index, double limit) {
        double value = 0;
        const SvfToken& token = tokens_[index];
        if (!parseReal(token.text, value)) fail(token, "RUNTEST: bad number '" + token.text + "'");
        if (value > limit) fail(token, "RUNTEST: " + token.text + " is out of range");
        return value;
    };
    // [run_count TCK|SCK]
    if (i + 1 < tokenCount_ && isNumberLike(wordAt(i, "RUNTEST", "a number").text)) {
        const std::string unit = word(i + 1);
        if (unit == "TCK" || unit == "SCK") {
            run.clockCount = static_cast<std::uint64_t>(std::llround(number(i, kMaxClockCount)));
            run.hasClockCount = true;
            run.systemClock = unit == "SCK";
            i += 2;
        }
    }
    // [min_time SEC [MAXIMUM max_time SEC]]
    if (i + 1 < tokenCount_ && isNumberLike(wordAt(i, "RUNTEST", "a number").text)) {
        if (word(i + 1) != "SEC") fail(tokens_[i + 1], "RUNTEST: expected TCK, SCK or SEC after " + tokens_[i].text);
        run.minSeconds = number(i, kMaxSeconds);
        run.hasMinTime = true;
        i += 2;
        if (i < tokenCount_ && word(i) == "MAXIMUM") {
            if (i + 2 >= tokenCount_ || word(i + 2) != "SEC") fail(tokens_[i], "RUNTEST: MAXIMUM needs a time in SEC");
            wordAt(i + 1, "RUNTEST", "a number");
            run.maxSeconds = number(i + 1, kMaxSeconds);
            run.hasMaxTime = true;
            i += 3;
        }
    }
    if (i < tokenCount_ && word(i) == "ENDSTATE") {
        if (i + 1 >= tokenCount_) fail(tokens_[i], "RUNTEST: ENDSTATE needs a state");
        run.endState = word(i + 1);
        if (!contains(kStableStates, run.endState))
            fail(tokens_[i + 1], "RUNTEST: '" + tokens_[i + 1].text + "' is not a stable state");
        i += 2;
    }
    if (i < tokenCount_) {
        const SvfToken& extra = tokens_[i];
        if (extra.kind == SvfToken::Kind::Word && isNumberLike(extra.text))
            fail(extra, "RUNTEST: '" + extra.text + "' needs a unit (TCK, SCK or SEC)");
        fail(extra, extra.kind == SvfToken::Kind::Value ? "RUNTEST: unexpected value in parentheses"
                                                         : "RUNTEST: unexpected '" + extra.text + "'");
    }
    if (!run.hasClockCount && !run.hasMinTime) fail(tokens_[0], "RUNTEST: needs a clock count or a time");
}

void SvfParser::parseStateList(SvfStatement& statement, std::string_view name, bool single) {
    const std::string context(name);
    if (tokenCount_ < 2) fail(tokens_[0], context + ": missing state");
    if (single && tokenCount_ > 2) fail(tokens_[2], context + ": takes one state");
    for (std::size_t i = 1; i < tokenCount_; ++i) {
        const SvfToken& token = wordAt(i, context, "a state");
        const std::string state = upper(token.text);
        if (!contains(kStates, state)) fail(token, context + ": unknown state '" + token.text + "'");
        statement.words.push_back(state);
    }
    if (!contains(kStableStates, statement.words.back()))
        fail(tokens_[tokenCount_ - 1], context + ": " + statement.words.back() + " is not a stable state");
}

void SvfParser::parseTrst(SvfStatement& statement) {
    if (tokenCount_ != 2) fail(tokens_[0], "TRST: takes one mode (ON, OFF, Z or ABSENT)");
    const std::string mode = upper(wordAt(1, "TRST", "a mode").text);
    if (mode != "ON" && mode != "OFF" && mode != "Z" && mode != "ABSENT")
        fail(tokens_[1], "TRST: unknown mode '" + tokens_[1].text + "'");
    statement.words.push_back(mode);
}

void SvfParser::parseFrequency(SvfStatement& statement) {
    if (tokenCount_ == 1) return;  // back to the full speed of the cable
    if (tokenCount_ != 3 || upper(wordAt(2, "FREQUENCY", "HZ").text) != "HZ")
        fail(tokens_[0], "FREQUENCY: expected a frequency in HZ");
    const SvfToken& value = wordAt(1, "FREQUENCY", "a frequency");
    double hz = 0;
    if (!parseReal(value.text, hz) || hz <= 0 || hz > kMaxFrequency)
        fail(value, "FREQUENCY: bad frequency '" + value.text + "'");
    statement.frequencyHz = hz;
}

std::vector<SvfStatement> parseSvfText(std::string_view text) {
    std::istringstream in{std::string(text)};
    SvfParser parser(in);
    std::vector<SvfStatement> statements;
    SvfStatement statement;
    while (parser.next(statement)) statements.push_back(statement);
    return statements;
}

}  // namespace vorant::svf
