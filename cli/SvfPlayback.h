#pragma once
#include "cli/CommandLine.h"

#include <string>

namespace vorant::cli {

// `play FILE.svf`: plays a recording on a simulated chip (fresh, or the
// one kept in the --port sim:FILE backing file) and reports every mismatch
// with its line. Returns the exit status: 0 without mismatches, 1 with.
// Throws UsageError for a port other than the simulator, an unknown chip,
// a missing or malformed file.
int playRecording(const ToolOptions& options, const std::string& svfFile);

// The chip the simulator plays for these options: --chip, else --part,
// else the default chip when the part is left to identification.
std::string simulatedChipName(const ToolOptions& options);

}  // namespace vorant::cli
