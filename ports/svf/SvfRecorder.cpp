#include "ports/svf/SvfRecorder.h"

#include "host/VorantException.h"

#include "ports/svf/SvfError.h"
#include "ports/svf/SvfHex.h"
#include "ports/svf/SvfParser.h"
#include "ports/svf/SvfSeconds.h"

#include <algorithm>
#include <cstdio>
#include <ctime>
#include <sstream>
#include <utility>

namespace vorant::svf {
namespace {

// The buffer is written out whenever it grows past this.
constexpr std::size_t kFlushThreshold = 256 * 1024;

// Set-up statements every SVF player knows: no test reset line, both scan
// kinds end in Run-Test/Idle, the TAP is walked through reset to idle, and
// no header or trailer bits surround the scans.
constexpr const char* kSetup =
    "TRST OFF;\n"
    "ENDIR IDLE;\n"
    "ENDDR IDLE;\n"
    "STATE RESET;\n"
    "STATE IDLE;\n"
    "HDR 0;\n"
    "HIR 0;\n"
    "TDR 0;\n"
    "TIR 0;\n";

// A name inside a one-line comment must not break the line.
std::string oneLine(std::string text) {
    std::replace(text.begin(), text.end(), '\n', ' ');
    std::replace(text.begin(), text.end(), '\r', ' ');
    return text;
}

std::string joinedPreamble(const std::vector<std::string>& lines) {
    std::string text;
    for (const std::string& line : lines) {
        text += line;
        if (text.empty() || text.back() != '\n') text += '\n';
    }
    return text;
}

// A broken preamble would make every recorded file unplayable; refuse it
// before anything is created.
std::filesystem::path checkedTarget(std::filesystem::path target, const SvfRecorderOptions& options) {
    if (!options.preamble.empty()) {
        std::istringstream text(joinedPreamble(options.preamble));
        SvfParser parser(text);
        SvfStatement statement;
        try {
            while (parser.next(statement)) {
            }
        } catch (const SvfParseError& error) {
            throw SvfError("cannot write '" + target.string() + "': preamble line " +
                           std::to_string(error.line()) + ": " + error.reason());
        }
    }
    return target;
}

// The bridge as port keys, so a player can set up the same board.
std::string bridgeKeysText(const ports::jtag::BridgeSettings& settings) {
    char instruction[24];
    std::snprintf(instruction, sizeof instruction, "0x%llx", static_cast<unsigned long long>(settings.instruction));
    std::string text = "bridge=" + settings.name + ",ir=" + instruction + ",irlen=" + std::to_string(settings.irLength);
    if (settings.misoDelay) text += ",delay=" + std::to_string(*settings.misoDelay);
    if (settings.chain.tapCount() > 1) text += ",chain=" + ports::jtag::formatJtagChain(settings.chain, settings.irLength);
    return text;
}

std::string utcDate() {
    const std::time_t now = std::time(nullptr);
    const std::tm* utc = std::gmtime(&now);
    char text[32] = "";
    if (utc != nullptr) std::strftime(text, sizeof text, "%Y-%m-%d %H:%M:%SZ", utc);
    return text;
}

// The first `bits` bits of a vector, zeros where the vector is shorter.
void appendClipped(BitBuffer& out, const RLBitVec* vector, std::size_t bits) {
    const std::size_t available = vector == nullptr ? 0 : std::min(bits, vector->length());
    if (available > 0) out.append(vector->data(), available);
    out.appendZeros(bits - available);
}

}  // namespace

SvfRecorder::SvfRecorder(std::filesystem::path target, SvfRecorderOptions options) try
    : file_(checkedTarget(std::move(target), options)), bridge_(options.bridge), tckHz_(options.tckHz) {
    buffer_.reserve(kFlushThreshold + 64 * 1024);
    writeHeader(options);
    flushBuffer();
} catch (const VorantException& error) {
    throw SvfError(std::string("cannot write an SVF file: ") + error.what());
}

SvfRecorder::~SvfRecorder() = default;

void SvfRecorder::writeHeader(const SvfRecorderOptions& options) {
    if (!options.toolName.empty()) buffer_ += "// SVF written by " + oneLine(options.toolName) + "\n";
    if (!options.partName.empty()) buffer_ += "// Part: " + oneLine(options.partName) + "\n";
    if (options.timestamp) buffer_ += "// Date: " + utcDate() + "\n";
    if (bridge_ == nullptr)
        buffer_ += "// One SDR per SPI transaction: chip select is asserted for the length of each SDR.\n";
    else
        buffer_ += "// One SDR per SPI transaction, framed for the " + bridge_->name() + " bridge.\n" +
                   std::string(kBridgeLinePrefix) + bridgeKeysText(options.bridgeSettings) + "\n";
    buffer_ += kSetup;
    if (bridge_ != nullptr) writeBridgeSelection(options);
    buffer_ += joinedPreamble(options.preamble);
}

namespace {

// A scan of `bits` bits all set to `ones`, as an SVF TDI value; nothing
// for none, as the set-up already cleared every header and trailer.
std::string constantScan(const char* command, std::size_t bits, bool ones) {
    if (bits == 0) return {};
    std::string line = std::string(command) + " " + std::to_string(bits);
    {
        BitBuffer value;
        value.assign(bits, ones);
        line += " TDI (";
        appendSvfHex(line, value.data(), bits, SvfRecorder::kDigitsPerLine);
        line += ")";
    }
    return line + ";\n";
}

}  // namespace

// The other TAPs of the chain sit in BYPASS (an all-ones instruction, one
// bypass bit each); SVF's header is shifted first, so it covers the TAPs
// between the bridge and TDO.
void SvfRecorder::writeBridgeSelection(const SvfRecorderOptions& options) {
    const ports::jtag::BridgeSettings& settings = options.bridgeSettings;
    const ports::jtag::JtagChain& chain = settings.chain;
    buffer_ += constantScan("HIR", chain.irBitsAfter(), true);
    buffer_ += constantScan("TIR", chain.irBitsBefore(), true);
    buffer_ += constantScan("HDR", chain.tapsAfter(), false);
    buffer_ += constantScan("TDR", chain.tapsBefore(), false);
    if (!bridge_->selectsInstruction()) return;
    BitBuffer instruction;
    instruction.assign(settings.irLength, false);
    for (unsigned k = 0; k < settings.irLength && k < 64; ++k)
        instruction.setBit(k, (settings.instruction >> k) & 1u);
    buffer_ += "SIR " + std::to_string(settings.irLength) + " TDI (";
    appendSvfHex(buffer_, instruction.data(), settings.irLength, kDigitsPerLine);
    buffer_ += ");\n";
}

void SvfRecorder::comment(const char* text) {
    if (text == nullptr || !usable()) return;
    writeCommentLines(text);
    flushIfFull();
}

void SvfRecorder::writeCommentLines(const char* text) {
    std::string& out = framer_.transactionOpen() ? heldComments_ : buffer_;
    // Every line of the text becomes a comment line of its own, so a text
    // with line breaks can never turn into statements.
    std::string_view rest(text);
    while (!rest.empty()) {
        const std::size_t end = std::min(rest.find('\n'), rest.size());
        std::string_view line = rest.substr(0, end);
        rest.remove_prefix(std::min(end + 1, rest.size()));
        while (!line.empty() && line.back() == '\r') line.remove_suffix(1);
        if (line.empty()) continue;
        if (line.substr(0, 2) != "//" && line.front() != '!') out += "//";
        out += line;
        out += '\n';
        ++totals_.commentCount;
    }
}

bool SvfRecorder::shift(int stage, RLBitVec* tdi, RLBitVec* /*tdiMask*/, RLBitVec* tdo, RLBitVec* tdoMask) {
    if (!usable()) return false;
    // A refused shift records nothing, as the simulator refuses it.
    const ports::FramingFault fault = framer_.shift(stage, tdi, tdo, tdoMask);
    if (fault != ports::FramingFault::None) {
        refusal_ = "SVF recorder: " + ports::describeFramingFault(fault, stage);
        return false;
    }
    flushIfFull();
    return usable();
}

bool SvfRecorder::shiftWrite(int stage, RLBitVec* tdi, int /*reserved*/) {
    return shift(stage, tdi, nullptr, nullptr, nullptr);
}

bool SvfRecorder::wait(int time, bool /*microseconds: always true*/) {
    if (!usable()) return false;
    // The wait comes after the deselect: a status write only starts when
    // chip select rises.
    framer_.closeOpenTransaction();
    if (time < 0) {
        refusal_ = "SVF recorder: wait of a negative time (" + std::to_string(time) + " us)";
        return false;
    }
    if (time > 0) writeRunTest(static_cast<std::uint64_t>(time));
    flushIfFull();
    return usable();
}

bool SvfRecorder::isCancelled(int /*level*/) { return cancelRequested_.load() || file_.failed(); }

const char* SvfRecorder::failureReason() {
    if (!file_.failed()) return refusal_.empty() ? nullptr : refusal_.c_str();
    failureReason_ = file_.target().string() + " could not be written (is the disk full?)";
    return failureReason_.c_str();
}

void SvfRecorder::select() {}

// The recorder captures nothing: tdo always holds the bits expected.
void SvfRecorder::shiftBits(const RLBitVec& tdi, RLBitVec* tdo, const RLBitVec* tdoMask, bool /*capture*/) {
    const std::size_t bits = tdi.length();
    const std::size_t before = tdi_.size();
    tdi_.append(tdi.data(), bits);
    const bool masked = tdoMask != nullptr && anyBitSet(tdoMask->data(), std::min(bits, tdoMask->length()));
    if (masked && !compares_) {
        // Shifts before the first compared one compare nothing.
        compares_ = true;
        tdo_.assign(before, false);
        mask_.assign(before, false);
    }
    if (masked) {
        appendClipped(tdo_, tdo, bits);
        appendClipped(mask_, tdoMask, bits);
    } else if (compares_) {
        tdo_.appendZeros(bits);
        mask_.appendZeros(bits);
    }
}

void SvfRecorder::deselect() {
    if (!tdi_.empty()) writeSdr();
    compares_ = false;
    tdi_.clear();
    tdo_.clear();
    mask_.clear();
    buffer_ += heldComments_;
    heldComments_.clear();
}

void SvfRecorder::writeRunTest(std::uint64_t microseconds) {
    totals_.runTestMicroseconds += microseconds;
    if (!tckHz_) {
        buffer_ += "RUNTEST " + formatSvfSeconds(microseconds) + " SEC;\n";
        ++totals_.runTestCount;
        return;
    }
    // Whole cycles, rounded up: a wait may run long, never short.
    const std::uint64_t hz = *tckHz_;
    std::uint64_t cycles = (microseconds * hz + 999'999) / 1'000'000;
    std::uint64_t secondsLeft = microseconds;
    do {
        const std::uint64_t part = std::min(cycles, kMaxRunTestCycles);
        const std::uint64_t partUs = cycles <= kMaxRunTestCycles ? secondsLeft : part * 1'000'000 / hz;
        buffer_ += "RUNTEST " + std::to_string(part) + " TCK " + formatSvfSeconds(partUs) + " SEC;\n";
        ++totals_.runTestCount;
        cycles -= part;
        secondsLeft -= std::min(secondsLeft, partUs);
    } while (cycles > 0);
}

void SvfRecorder::writeSdr() {
    const BitBuffer* tdi = &tdi_;
    const BitBuffer* tdo = &tdo_;
    const BitBuffer* mask = &mask_;
    if (bridge_ != nullptr) {
        // The bridge frames the MOSI bits; what is compared moves to where
        // the bridge returns MISO.
        bridge_->encode(tdi_, compares_, dr_);
        tdi = &dr_;
        if (compares_) {
            const std::size_t offset = bridge_->misoOffset();
            for (auto [from, to] : {std::pair{&tdo_, &drTdo_}, std::pair{&mask_, &drMask_}}) {
                to->assign(dr_.size(), false);
                ports::copyBits(to->data(), offset, from->data(), 0, std::min(from->size(), dr_.size() - offset));
            }
            tdo = &drTdo_;
            mask = &drMask_;
        }
    }
    const std::size_t bits = tdi->size();
    buffer_ += "SDR ";
    buffer_ += std::to_string(bits);
    buffer_ += " TDI (";
    appendSvfHex(buffer_, tdi->data(), bits, kDigitsPerLine);
    buffer_ += ')';
    if (compares_) {
        buffer_ += " TDO (";
        appendSvfHex(buffer_, tdo->data(), bits, kDigitsPerLine);
        buffer_ += ") MASK (";
        appendSvfHex(buffer_, mask->data(), bits, kDigitsPerLine);
        buffer_ += ')';
    }
    buffer_ += ";\n";
    ++totals_.sdrCount;
    totals_.sdrBits += bits;
}

void SvfRecorder::flushIfFull() {
    if (buffer_.size() >= kFlushThreshold) flushBuffer();
}

void SvfRecorder::flushBuffer() {
    file_.write(buffer_);
    buffer_.clear();
}

void SvfRecorder::finish() {
    if (finished_) throw SvfError("'" + target().string() + "' is already finished");
    framer_.closeOpenTransaction();
    flushBuffer();
    finished_ = true;
    std::string error;
    if (!file_.commit(error)) throw SvfError(error);
}

}  // namespace vorant::svf
