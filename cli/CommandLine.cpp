#include "cli/CommandLine.h"

#include "cli/UsageError.h"
#include "cli/WholeNumberOption.h"
#include "host/UT_STR.h"
#include "ports/PortError.h"
#include "ports/PortTable.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <cstdint>
#include <limits>
#include <map>
#include <sstream>

namespace vorant::cli {

namespace {

constexpr long long kMaxIndex = 9999;
constexpr long long kMaxClockHz = 1'000'000'000;
constexpr const char* kHelpHint = "run 'vorant-spi --help' for the options and operations";

std::string operationsHelp() {
    std::ostringstream text;
    text << "Operations:\n";
    for (const OperationInfo& info : operationCatalog())
        text << "  " << info.synopsis << "\n      " << info.purpose << "\n";
    text << "\nPorts (--port KIND[:PATH][,KEY=VALUE...]):\n" << ports::portHelp()
         <<             "\nReadback files (readback -f FILE):\n"
            "  FILE appears only when the readback succeeds: a failed or cancelled readback\n"
            "  leaves no file and leaves an existing FILE untouched. Through a symbolic link\n"
            "  the file it points to is replaced. A FIFO or a device is written as the data\n"
            "  come. '-' writes raw binary to standard output; the status lines then go to\n"
            "  stderr.\n"
            "\nPart database:\n"
            "  The shipped part files are loaded from the first folder that exists of\n"
            "    1. $VORANT_PARTS_DIR (when set, it must be a folder),\n"
            "    2. the folder 'parts' beside the vorant-spi executable,\n"
            "    3. the source tree's parts folder it was built from,\n"
            "  then every --parts FILE or FOLDER (its *.toml files), in order; a later\n"
            "  part of the same name wins, with a notice. Part names ignore letter case.\n"
            "  --part auto reads the JEDEC ID and picks the one part that has it (where\n"
            "  several share it, the one the chip's SFDP table fits); --part sfdp builds\n"
            "  a part from the chip's ID and SFDP table and prints it. The\n"
            "  simulator then plays --chip, by default "
         << kDefaultSimulatedChip
         << ".\n"
            "\nExit status:\n"
            "  0  the operation succeeded (blankcheck: the flash is blank)\n"
            "  1  the operation failed, the flash is not blank, a played file mismatched,\n"
            "     or the run was cancelled (Ctrl-C; press it twice to quit at once)\n"
            "  2  usage error: bad option, file, part or value; nothing was done\n"
            "\nExamples:\n"
            "  vorant-spi --port sim:flash.bin program image.bin -e -v\n"
            "  vorant-spi --port sim:flash.bin readback -f out.bin\n"
            "  vorant-spi --part W25Q64JV --port svf:job.svf program image.mcs -e -v\n"
            "  vorant-spi --part W25Q64JV play job.svf\n";
    return text.str();
}

// The usage line names the operation, which CLI11 does not know about.
class HelpFormatter : public CLI::Formatter {
public:
    std::string make_usage(const CLI::App*, std::string) const override {
        return "\nUsage: vorant-spi [options] OPERATION [operands and switches] [options]\n";
    }
};

struct ParsedValues {
    std::string part = "auto";
    std::string port = "sim";
    std::string chip;
    std::vector<std::string> partFiles;
    // Numbers are kept as typed: CLI11 would clamp a number too large for
    // its type, and the message must quote what the user gave.
    std::string index = "0";
    std::string dataWidth;
    std::string clockHz;
    std::string offset;
    std::string format;
    bool dataWidthGiven = false, clockGiven = false, offsetGiven = false;
    bool debug = false, quiet = false, version = false, force = false;
    bool noErase = false, noVerify = false, eraseWholeBlocks = false, allMismatches = false, wholeSpan = false;
    std::vector<std::string> simFaults;
    // Every key of the port table's rows, also accepted as --KEY VALUE.
    std::map<std::string, std::string> portKeys;
    std::vector<std::string> portKeysGiven;
};

void defineOptions(CLI::App& app, ParsedValues& values) {
    app.set_help_flag("-h,--help", "Show this help and exit");
    app.add_flag("--version", values.version, "Show the version and exit");
    app.add_option("--part", values.part,
                   "The flash part, 'auto' to identify it by its JEDEC ID (and SFDP where the ID is shared), or "
                   "'sfdp' to build it from the chip's SFDP table (default: auto; the SVF port needs a name)")
        ->type_name("NAME|auto|sfdp");
    app.add_option("--port", values.port, "Where the scans go: " + ports::portNames() + " (default: sim; see Ports)")
        ->type_name("PORT");
    app.add_option("--chip", values.chip,
                   "The part the simulator plays (default: --part, or " + std::string(kDefaultSimulatedChip) +
                       " with --part auto)")
        ->type_name("NAME");
    app.add_option("--parts", values.partFiles, "Load extra part files (a file, or a folder of *.toml) after the shipped ones (repeatable)")
        ->type_name("FILE|DIR")
        ->expected(1)
        ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll);
    app.add_option("--index", values.index, "The device's position, as shown in messages (default: 0)")
        ->type_name("N");
    app.add_option("--data-width", values.dataWidth,
                   "Data width the flash is read with afterwards: 4 leaves Quad Enable set where the part "
                   "supports it (default: 1)")
        ->type_name("1|4");
    app.add_option("--clock", values.clockHz, "SPI clock of the simulator in Hz (default: 50000000)")
        ->type_name("HZ");
    app.add_option("--offset", values.offset, "Flash address a binary image starts at (default: 0)")
        ->type_name("ADDR");
    app.add_option("--format", values.format,
                   "Format of the image or readback file, whatever its name says: bin, ihex or srec (default: "
                   "from the extension, else from the content)")
        ->type_name("bin|ihex|srec");
    app.add_flag("--force", values.force,
                 "Write to a chip whose JEDEC ID is not the part's (the check before every write is skipped)");
    app.add_flag("--no-erase", values.noErase, "program: erase nothing, write the image's pages as they are");
    app.add_flag("--no-verify", values.noVerify, "program: do not read the image back");
    app.add_flag("--erase-whole-blocks", values.eraseWholeBlocks,
                 "program into a recording: erase blocks the image covers only in part (a recording cannot keep "
                 "their other bytes)");
    app.add_flag("--all-mismatches", values.allMismatches,
                 "play: go on past the first TDO mismatch and report every one (default: stop at the first)");
    app.add_flag("--whole-span", values.wholeSpan,
                 "verify, checksum: every page from address 0 to the image's end, holes included (default: only "
                 "the bytes the image holds)");
    app.add_flag("--debug", values.debug, "Show debug traces");
    app.add_flag("--quiet", values.quiet, "Show only errors: no status lines, progress or summary");
    // The ports' own keys: the tool knows them only from the port table.
    for (const ports::PortInfo& row : ports::portTable()) {
        for (const ports::PortKey& key : row.keys) {
            if (values.portKeys.count(key.name)) continue;
            app.add_option("--" + key.name, values.portKeys[key.name], key.purpose + " (as ," + key.name + "= in --port)")
                ->type_name(key.valueName)
                ->group("Port options (where the port takes them)");
        }
    }
    // For tests and demonstrations: faults the simulated chip injects.
    app.add_option("--sim-fault", values.simFaults, "")
        ->expected(1)
        ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll)
        ->group("");
}

// Whether `token` is an option that takes its value from the next token.
bool consumesNextToken(CLI::App& app, const std::string& token) {
    if (token.find('=') != std::string::npos) return false;
    const CLI::Option* option = app.get_option_no_throw(token);
    return option != nullptr && option->get_items_expected_min() > 0;
}

bool isLongOption(const std::string& token) { return token.size() > 2 && token.compare(0, 2, "--") == 0; }

struct SplitArguments {
    std::vector<std::string> global;
    std::string operation;
    std::vector<std::string> operationTokens;
};

// A long switch the operation's row declares (parts --id) is the
// operation's, not the tool's.
bool operationDeclares(const std::string& operation, const std::string& token) {
    const OperationInfo* info = findOperation(operation);
    if (info == nullptr) return false;
    for (const SwitchInfo& sw : info->switches)
        if (sw.name == token) return true;
    return false;
}

// Options before the operation are the tool's; after it, long options are
// still the tool's (unless the operation declares them) and everything else
// belongs to the operation.
SplitArguments splitArguments(CLI::App& app, const std::vector<std::string>& arguments) {
    SplitArguments split;
    bool operationSeen = false;
    for (std::size_t i = 0; i < arguments.size(); ++i) {
        const std::string& token = arguments[i];
        const bool global = operationSeen ? isLongOption(token) && !operationDeclares(split.operation, token)
                                          : (token.size() > 1 && token[0] == '-');
        if (global) {
            split.global.push_back(token);
            if (consumesNextToken(app, token) && i + 1 < arguments.size()) split.global.push_back(arguments[++i]);
        } else if (!operationSeen) {
            split.operation = token;
            operationSeen = true;
        } else {
            split.operationTokens.push_back(token);
        }
    }
    return split;
}

ToolOptions toolOptions(const ParsedValues& values) {
    ToolOptions options;
    options.part = values.part;
    if (options.part.empty()) throw UsageError("--part needs a part name or 'auto'");
    if (UT_STR::ICompare(options.part.c_str(), "auto") == 0) options.part = "auto";
    if (UT_STR::ICompare(options.part.c_str(), "sfdp") == 0) options.part = "sfdp";
    try {
        options.port = ports::parsePortAddress(values.port);
        const ports::PortInfo& row = *ports::findPort(options.port.kind);
        for (const std::string& key : values.portKeysGiven) {
            if (!row.takesKey(key))
                throw UsageError("--" + key + " does not apply to --port " + row.name);
            if (options.port.keys.count(key))
                throw UsageError("--" + key + " and ," + key + "= in --port are both given; give one");
            options.port.keys[key] = values.portKeys.at(key);
        }
        ports::checkPortAddress(options.port, row);
    } catch (const ports::PortError& error) {
        throw UsageError(error.what());
    }
    if (!values.chip.empty()) options.chip = values.chip;
    options.partFiles = values.partFiles;
    options.index = static_cast<int>(
        wholeNumberOption("--index", values.index, 0, kMaxIndex, "give 0 to " + std::to_string(kMaxIndex)));
    if (values.dataWidthGiven) {
        const long long width = wholeNumberOption("--data-width", values.dataWidth, 1, 4, "give 1 or 4");
        if (width != 1 && width != 4)
            throw UsageError("--data-width " + values.dataWidth + " is not supported; give 1 or 4");
        options.dataWidth = static_cast<int>(width);
    }
    if (values.clockGiven) {
        options.clockHz = static_cast<std::uint32_t>(wholeNumberOption(
            "--clock", values.clockHz, 1, kMaxClockHz, "give 1 to " + std::to_string(kMaxClockHz) + " Hz"));
    }
    if (values.offsetGiven) {
        options.image.offset = static_cast<std::uint64_t>(
            wholeNumberOption("--offset", values.offset, 0, static_cast<long long>(formats::kLargestFlashBytes) - 1,
                              "give an address below the largest flash (0x10000000)"));
    }
    if (!values.format.empty()) {
        options.image.format = formats::formatNamed(values.format);
        if (!options.image.format) throw UsageError("--format " + values.format + " is not known; give bin, ihex or srec");
    }
    options.debug = values.debug;
    options.quiet = values.quiet;
    options.force = values.force;
    options.noErase = values.noErase;
    options.noVerify = values.noVerify;
    options.eraseWholeBlocks = values.eraseWholeBlocks;
    options.allMismatches = values.allMismatches;
    options.wholeSpan = values.wholeSpan;
    options.simFaults = values.simFaults;
    return options;
}

}  // namespace

std::string versionText() { return std::string("vorant-spi ") + VORANT_TOOL_VERSION; }

CommandLine parseCommandLine(const std::vector<std::string>& arguments) {
    CLI::App app{"vorant-spi: programs SPI NOR flash through the Type 1 SPI device plug-in.", "vorant-spi"};
    app.formatter(std::make_shared<HelpFormatter>());
    ParsedValues values;
    defineOptions(app, values);
    app.footer(operationsHelp());

    CommandLine result;
    const SplitArguments split = splitArguments(app, arguments);
    try {
        std::vector<std::string> reversed(split.global.rbegin(), split.global.rend());
        app.parse(reversed);
    } catch (const CLI::CallForHelp&) {
        result.action = CommandLine::Action::ShowHelp;
        result.helpText = app.help();
        return result;
    } catch (const CLI::ParseError& error) {
        std::string message = error.what();
        while (!message.empty() && (message.back() == '\n' || message.back() == ' ')) message.pop_back();
        throw UsageError(message + "; " + kHelpHint);
    }
    values.dataWidthGiven = app.count("--data-width") > 0;
    values.clockGiven = app.count("--clock") > 0;
    values.offsetGiven = app.count("--offset") > 0;
    for (const auto& [key, value] : values.portKeys)
        if (app.count("--" + key) > 0) values.portKeysGiven.push_back(key);
    if (values.version) {
        result.action = CommandLine::Action::ShowVersion;
        return result;
    }
    if (split.operation.empty()) throw UsageError(std::string("no operation given; ") + kHelpHint);
    const OperationInfo* info = findOperation(split.operation);
    if (info == nullptr)
        throw UsageError("unknown operation '" + split.operation + "'; the operations are " + operationNames());

    result.options = toolOptions(values);
    result.request = parseOperationTokens(*info, split.operationTokens);
    return result;
}

}  // namespace vorant::cli
