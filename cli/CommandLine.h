#pragma once
#include "cli/OperationRequest.h"
#include "cli/PortChoice.h"

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace vorant::cli {

// The chip the simulator plays when --part auto leaves it open.
inline constexpr const char* kDefaultSimulatedChip = "W25Q128JV";

// The tool's own options, given before or after the operation.
struct ToolOptions {
    std::string part = "auto";         // a part name, or "auto": identify by JEDEC ID
    PortChoice port;                     // default: a fresh simulated chip
    std::optional<std::string> chip;   // the simulated chip, when not the --part
    std::vector<std::string> partFiles;
    int index = 0;
    std::optional<int> dataWidth;      // 1 or 4 when given
    std::optional<std::uint32_t> clockHz;
    bool debug = false;
    bool quiet = false;
    std::vector<std::string> simFaults;

    // The part comes from the chip: by its ID (auto) or built from its SFDP
    // table (sfdp).
    bool autoPart() const { return part == "auto" || part == "sfdp"; }
    bool sfdpPart() const { return part == "sfdp"; }
};

struct CommandLine {
    enum class Action { Run, ShowHelp, ShowVersion };
    Action action = Action::Run;
    ToolOptions options;
    OperationRequest request;
    std::string helpText;  // filled for ShowHelp
};

// Parses the whole command line. Global options (--xxx) may stand before
// or after the operation; single-dash tokens after the operation are the
// operation's own switches. Throws UsageError with a one-line message.
CommandLine parseCommandLine(const std::vector<std::string>& arguments);

// The version line.
std::string versionText();

}  // namespace vorant::cli
