#pragma once
#include <string>

namespace vorant::cli {

// Where the scans go: the flash simulator (its memory optionally kept in a
// file between runs) or an SVF recording.
struct PortChoice {
    enum class Kind { Simulator, SvfRecorder };
    Kind kind = Kind::Simulator;
    // The simulator's backing file ("" for a fresh chip every run), or the
    // SVF file to record.
    std::string file;

    bool isSimulator() const { return kind == Kind::Simulator; }
};

// Parses "sim", "sim:FILE" or "svf:FILE". Throws UsageError otherwise.
PortChoice parsePortChoice(const std::string& text);

}  // namespace vorant::cli
