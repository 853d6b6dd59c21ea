#pragma once
// A scan port that records every transfer as SVF instead of playing it.
//
// One SDR per SPI transaction: all shifts from chip select to deselect are
// joined into one scan (the convention for hardware is that chip select is
// asserted for the length of each SDR). TDI is always written; TDO and MASK
// only when the transaction compares something. Waits become RUNTEST
// statements, comments SVF comments. The text is streamed through a buffer
// into a temporary file that finish() renames onto the target, so a run
// that fails or is cancelled leaves no half-written file behind.

#include "host/RLBitVec.h"
#include "host/ScanPort.h"
#include "host/AtomicOutputFile.h"
#include "ports/jtag/Bridge.h"
#include "ports/svf/BitBuffer.h"
#include "ports/wire/TransactionFramer.h"

#include <atomic>
#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace vorant::svf {

// The header comment of a bridge recording that names its bridge as port
// keys: "// Bridge: bridge=jtagspi,ir=0x2,irlen=6".
inline constexpr const char* kBridgeLinePrefix = "// Bridge: ";

struct SvfRecorderOptions {
    // Named in the header comments when not empty.
    std::string toolName;
    std::string partName;
    // Adds the recording date (UTC) to the header. Off by default so the
    // same run always gives the same file.
    bool timestamp = false;
    // Lines written as they are after the set-up statements, for example an
    // SIR that selects the user's SPI bridge.
    std::vector<std::string> preamble;
    // The JTAG-to-SPI bridge the recording is for: its instruction is
    // selected once after the set-up (with the other TAPs of the chain in
    // BYPASS through HIR/TIR/HDR/TDR), and each transaction becomes its DR
    // scan. Null: the ideal bridge of the first format (no SIR, TDO at the
    // SPI bits).
    std::shared_ptr<const ports::jtag::Bridge> bridge;
    ports::jtag::BridgeSettings bridgeSettings;
    // With a TCK frequency every wait states its TCK cycles as well as its
    // seconds, so it holds on a board that counts clocks. A wait longer than
    // 2^31 - 1 cycles is split, as players read the count into an int.
    std::optional<std::uint32_t> tckHz;
};

struct SvfRecorderTotals {
    std::uint64_t sdrCount = 0;
    std::uint64_t sdrBits = 0;
    std::uint64_t runTestCount = 0;
    std::uint64_t runTestMicroseconds = 0;
    std::uint64_t commentCount = 0;
};

class SvfRecorder final : public ScanPort, private ports::TransactionSink {
public:
    // Opens the temporary file and writes the header. Throws SvfError naming
    // the file when it cannot be written; nothing is created then.
    explicit SvfRecorder(std::filesystem::path target, SvfRecorderOptions options = {});
    // Without finish() the temporary file is removed.
    ~SvfRecorder() override;
    SvfRecorder(const SvfRecorder&) = delete;
    SvfRecorder& operator=(const SvfRecorder&) = delete;

    bool outputMode() override { return true; }
    void comment(const char* text) override;
    bool shift(int stage, RLBitVec* tdi, RLBitVec* tdiMask, RLBitVec* tdo, RLBitVec* tdoMask) override;
    bool shiftWrite(int stage, RLBitVec* tdi, int reserved) override;
    // Stages 2, 3 and 12 without an open transaction, unknown stages and a
    // null tdi fail and record nothing. tdo is left as it came (the file
    // captures nothing).
    // Closes an open transaction; a non-zero time becomes a RUNTEST.
    bool wait(int time, bool microseconds) override;
    // True once requestCancel() was called, or when the file can no longer
    // be written (nothing more could be recorded).
    bool isCancelled(int level) override;
    // Once the file cannot be written, every further call fails: the
    // recording is as good as an unplugged cable.
    const char* failureReason() override;
    bool connectionLost() override { return file_.failed(); }

    // Cancel from another thread or a signal handler: requestCancel(), or
    // store true into cancelFlag() (lock-free).
    void requestCancel() { cancelRequested_.store(true); }
    void clearCancel() { cancelRequested_.store(false); }
    std::atomic<bool>& cancelFlag() { return cancelRequested_; }

    // Closes an open transaction, writes the rest and renames the file onto
    // the target. Throws SvfError when the file could not be written
    // completely; the target is then left untouched.
    void finish();
    bool finished() const { return finished_; }

    const SvfRecorderTotals& totals() const { return totals_; }
    const std::filesystem::path& target() const { return file_.target(); }
    // False when the target is not a regular file (a FIFO, a device,
    // standard output): it is written as the recording goes.
    bool replacesTarget() const { return file_.replacesTarget(); }

    // Hex digits per line of a wrapped value.
    static constexpr std::size_t kDigitsPerLine = 128;
    // The most TCK cycles one RUNTEST states.
    static constexpr std::uint64_t kMaxRunTestCycles = 0x7FFFFFFF;

private:
    bool usable() const { return !finished_ && !file_.failed(); }
    void writeHeader(const SvfRecorderOptions& options);
    // --- ports::TransactionSink: a transaction is joined into one SDR ---
    void select() override;
    void shiftBits(const RLBitVec& tdi, RLBitVec* tdo, const RLBitVec* tdoMask, bool capture) override;
    void deselect() override;
    void writeSdr();
    void writeRunTest(std::uint64_t microseconds);
    void writeBridgeSelection(const SvfRecorderOptions& options);
    void writeCommentLines(const char* text);
    void flushIfFull();
    void flushBuffer();

    vorant::AtomicOutputFile file_;
    std::string buffer_;
    ports::TransactionFramer framer_{*this};
    // The transaction being joined. tdo_ and mask_ are only kept once a
    // shift of it has a mask bit set (compares_).
    bool compares_ = false;
    BitBuffer tdi_, tdo_, mask_;
    std::shared_ptr<const ports::jtag::Bridge> bridge_;
    std::optional<std::uint32_t> tckHz_;
    BitBuffer dr_, drTdo_, drMask_;  // the DR scan of a transaction
    // Comments that arrive while a transaction is open follow its SDR.
    std::string heldComments_;
    std::atomic<bool> cancelRequested_{false};
    bool finished_ = false;
    SvfRecorderTotals totals_;
    std::string failureReason_;
    std::string refusal_;  // why the last refused shift or wait was refused
};

}  // namespace vorant::svf
