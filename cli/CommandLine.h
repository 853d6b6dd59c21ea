#pragma once
#include "cli/OperationRequest.h"
#include "formats/ConfigDataFiles.h"
#include "ports/PortAddress.h"

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
    // Where the scans go: the port table's row `port.kind`.
    ports::PortAddress port{.text = "sim", .kind = "sim"};
    std::optional<std::string> chip;   // the simulated chip, when not the --part
    std::vector<std::string> partFiles;
    int index = 0;
    std::optional<int> dataWidth;      // 1 or 4 when given
    std::optional<std::uint32_t> clockHz;
    bool debug = false;
    bool quiet = false;
    bool force = false;  // write to a chip that answers another ID
    // program: no erase at all, no verify, and (for a recording) erase
    // blocks the image covers only in part.
    bool noErase = false, noVerify = false, eraseWholeBlocks = false;
    bool allMismatches = false;  // play: report every mismatch, not stop at the first
    bool wholeSpan = false;      // verify, checksum: every page from address 0, holes included
    std::vector<std::string> simFaults;
    formats::ImageOptions image;  // --format and --offset

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
