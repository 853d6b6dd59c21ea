#include "cli/DeviceRun.h"

#include "cli/CancelSignal.h"
#include "cli/ChipChecks.h"
#include "cli/ImageCheck.h"
#include "cli/InstructionOpcode.h"
#include "cli/OutputSettlement.h"
#include "cli/PartIdentification.h"
#include "cli/PortSession.h"
#include "cli/ProgressAwareSink.h"
#include "cli/ProgressDisplay.h"
#include "cli/ProgressPort.h"
#include "cli/SfdpOperation.h"
#include "cli/SfdpPart.h"
#include "cli/ToolFailure.h"
#include "cli/RunSummary.h"
#include "cli/SameFile.h"
#include "cli/SvfPlayback.h"
#include "cli/Terminal.h"
#include "cli/Tool.h"
#include "cli/ToolMessages.h"
#include "cli/UsageError.h"
#include "formats/ConfigDataFiles.h"
#include "formats/FlashImage.h"
#include "formats/FixedWidthCif.h"
#include "host/ConstraintsManager.h"
#include "host/UT_STR.h"
#include "host/VorantException.h"
#include "ports/PortError.h"
#include "ports/PortTable.h"
#include "s/Type1SPIDevice.h"

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <optional>

namespace vorant::cli {

namespace {

// Whether the port can carry out the request, decided by what it can do.
void checkPortFitsRequest(const ToolOptions& options, const OperationInfo& info, const ports::PortCaps& caps) {
    checkPortOptions(options);
    const std::string port = "--port " + options.port.kind;
    if (caps.readsBack) return;
    if (options.autoPart())
        throw UsageError(port + " reads nothing back, so it cannot identify the chip; name the part with --part NAME");
    if (!info.recordable)
        throw UsageError("'" + std::string(info.name) + "' answers from what it reads, and " + port +
                         " reads nothing; run it on a port that reads the chip, such as --port sim");
}

// The port's own file must not double as the operation's file: a readback
// would replace the simulated flash's backing file under it, and a
// recording would replace the image it was made from.
void checkFilesApart(const ToolOptions& options, const OperationInfo& info, const ports::PortCaps& caps,
                     const std::string& file) {
    const std::string& portFile = options.port.path;
    if (file.empty() || portFile.empty() || !sameFile(file, portFile)) return;
    if (info.operation == Operation::Readback)
        throw UsageError("the readback file " + file + " is the port's own file (--port " + options.port.text +
                         "); choose another name");
    if (caps.records)
        throw UsageError("the recording " + portFile + " would replace the image " + file +
                         "; record into another file");
}

void checkPartKnown(const std::string& name, const char* what) {
    if (!ConstraintsManager::instance().hasPart(name))
        throw UsageError(std::string("unknown ") + what + " '" + name +
                         "'; 'vorant-spi parts' lists the known parts, --parts FILE adds your own");
}

// The Quad Enable write reads both status registers and writes them back
// with one 01h of two bytes, changing register 2 bit 1. Only parts whose
// X4_READ is "TRUE" keep Quad Enable there; on the others the second byte
// lands in another register (on some, a configuration register with
// one-time bits), so the tool sends no such write to them.
void checkQuadEnableWritable(const std::string& part, const OperationRequest& request) {
    const bool qe = request.info->operation == Operation::QuadEnable;
    const auto& tokens = request.switchTokens;
    if (!qe && std::find(tokens.begin(), tokens.end(), "-qebit") == tokens.end()) return;
    ConstraintsManager& database = ConstraintsManager::instance();
    if (database.hasProperty(part, "X4_READ") &&
        UT_STR::ICompare(database.getDeviceStringProperty(part.c_str(), "X4_READ"), "TRUE") == 0)
        return;
    const std::string asked = qe ? "'qe " + request.operands.at(0) + "'" : "-qebit";
    throw UsageError(part + " has no Quad Enable bit vorant-spi can write (its X4_READ is not TRUE); " + asked +
                     " is refused and nothing was written to the flash");
}

std::unique_ptr<Type1SPIDevice> createDevice(const std::string& partName) {
    try {
        std::unique_ptr<Type1SPIDevice> device(create_type1_spi_device(partName.c_str()));
        if (!device) throw std::runtime_error("out of memory creating the device for " + partName);
        return device;
    } catch (const VorantException& error) {
        throw UsageError("part " + partName + " cannot be used: " + error.what() + "; fix its part file");
    }
}

std::optional<unsigned char> partOpcode(const std::string& part, const char* key) {
    ConstraintsManager& database = ConstraintsManager::instance();
    if (!database.hasProperty(part, key)) return std::nullopt;
    return opcodeOfInstruction(database.getDeviceStringProperty(part.c_str(), key));
}

long long partNumber(const std::string& part, const char* key) {
    ConstraintsManager& database = ConstraintsManager::instance();
    if (!database.hasProperty(part, key)) return 0;
    try {
        return database.getDeviceLongProperty(part.c_str(), key);
    } catch (const VorantException&) {
        return 0;
    }
}

ProgressPlan progressPlan(Type1SPIDevice& device, const OperationInfo& info, UT_CMDARGS& args,
                          const std::string& part, ConfigDataReader* image) {
    ProgressPlan plan;
    plan.pageProgramOpcode = partOpcode(part, "PAGEPROGRAM_INSTRUCTION");
    plan.readOpcode = partOpcode(part, "READ_INSTRUCTION");
    plan.bulkEraseOpcode = partOpcode(part, "BULKERASE_INSTRUCTION");
    const long long pageBits = partNumber(part, "PAGE_SIZE");
    plan.pageBytes = pageBits > 0 ? static_cast<std::size_t>(pageBits / 8) : 0;
    plan.eraseStepMicroseconds = partNumber(part, "PROGRESS_ERASE_WAITTIME_INC");
    plan.eraseSteps = std::max(0, device.getOperationProgressCount("erase", nullptr));

    if (!info.progressName.empty()) {
        const std::string name(info.progressName);
        plan.totalSteps = std::max(0, device.getOperationProgressCount(name.c_str(), &args));
    } else if (info.operation == Operation::Checksum && image != nullptr && pageBits > 0) {
        // The device counts no steps for a checksum: it reads the pages the
        // image covers.
        plan.totalSteps = (static_cast<long long>(image->dataSize()) + pageBits - 1) / pageBits;
    }
    return plan;
}

bool hasSwitch(const OperationRequest& request, std::initializer_list<const char*> names) {
    for (const char* name : names)
        if (std::find(request.switchTokens.begin(), request.switchTokens.end(), name) != request.switchTokens.end())
            return true;
    return false;
}

// program erases the blocks the image covers and writes them, unless -e
// asks for the whole-chip erase (and every page from address 0) or
// --no-erase for no erase at all; either way it verifies unless told not to.
bool programsBlocks(const OperationRequest& request, const ToolOptions& options) {
    return request.info->operation == Operation::Program && !options.noErase && !hasSwitch(request, {"-e", "-erase"});
}

UT_CMDARGS deviceArguments(const OperationRequest& request, const ToolOptions& options) {
    const Operation operation = request.info->operation;
    // Verify and checksum cover what the image holds unless asked for the
    // span from address 0; the checksum is then the image's own CRC.
    if ((operation == Operation::Verify || operation == Operation::Checksum) && !options.wholeSpan) {
        std::vector<std::string> tokens = request.operands;
        tokens.insert(tokens.end(), request.switchTokens.begin(), request.switchTokens.end());
        tokens.push_back("-ranges");
        return UT_CMDARGS(tokens);
    }
    if (operation != Operation::Program) return request.deviceArguments();
    std::vector<std::string> tokens = request.operands;
    tokens.insert(tokens.end(), request.switchTokens.begin(), request.switchTokens.end());
    if (!options.noVerify && !hasSwitch(request, {"-v", "-verify"})) tokens.push_back("-v");
    if (options.eraseWholeBlocks) tokens.push_back("-wholeblocks");
    return UT_CMDARGS(tokens);
}

bool invoke(Type1SPIDevice& device, const OperationRequest& request, const ToolOptions& options, UT_CMDARGS& args,
            int index) {
    if (programsBlocks(request, options)) return device.programBlocks(index, &args);
    DeviceOperation& operations = device;  // the virtual operations, as any host drives them
    switch (request.info->operation) {
    case Operation::Program: return operations.program(index, &args);
    case Operation::Verify: return operations.verify(index, &args);
    case Operation::Checksum: return operations.checksum(index, &args);
    case Operation::Erase: return operations.erase(index, &args);
    case Operation::BlankCheck: return operations.blankCheck(index, &args);
    case Operation::Readback: return operations.readbackToFile(index, &args);
    case Operation::IdCode: return operations.readIdcode(index, true);
    case Operation::Signature: return device.readElectronicSignature(index, true);
    case Operation::Validate: return operations.validateInstance(index);
    case Operation::Status: return operations.readDeviceStatus(index, &args);
    case Operation::Release: return operations.releaseFromStandBy(index, &args);
    // The two operations outside the table of virtual operations.
    case Operation::Unlock: return device.unlockStatusRegister(index, &args);
    case Operation::QuadEnable: return device.writeQuadEnableBit(index, &args, request.operands.at(0) == "set");
    case Operation::Sfdp: return showSfdp(*device.getScanPort());  // the tool reads it, not the plug-in
    case Operation::Parts:
    case Operation::Ports:
    case Operation::Play: break;
    }
    return false;
}

std::string joined(const std::vector<std::string>& names) {
    std::string text;
    for (const std::string& name : names) text += (text.empty() ? "" : ", ") + name;
    return text;
}

// Device attributes that carry the answer of some operations. false when
// the answer shows that no chip answered.
bool reportAnswer(Type1SPIDevice& device, const OperationInfo& info) {
    if (info.operation != Operation::IdCode) return true;
    const char* id = device.getAttribute(DeviceNS::ATTR_IDCODE);
    if (id == nullptr || *id == '\0') return true;
    if (!chipAnswered(id)) {
        toolError(std::string("no chip answered the ID read (it read ") + id +
                  "): check the connection, or wake a chip in deep power-down with 'release'");
        return false;
    }
    const std::vector<std::string> parts = ConstraintsManager::instance().partsWithId(id);
    toolInfo(parts.empty() ? std::string("No known part has the JEDEC ID ") + id + "."
                           : std::string("JEDEC ID ") + id + " belongs to: " + joined(parts) + ".");
    return true;
}

// The byte a part's electronic signature read answers: RES_SIGNATURE, or
// the IDCODE of a part identified by its signature; empty when the part has
// no signature or no instruction to read it.
std::string expectedSignature(const std::string& part) {
    ConstraintsManager& database = ConstraintsManager::instance();
    auto text = [&](const char* key) {
        return database.hasProperty(part, key) ? std::string(database.getDeviceStringProperty(part.c_str(), key))
                                               : std::string();
    };
    if (text("READSIGNATURE_INSTRUCTION").empty()) return {};
    if (!text("RES_SIGNATURE").empty()) return text("RES_SIGNATURE");
    if (UT_STR::ICompare(text("USE_RES").c_str(), "TRUE") == 0) return text("IDCODE");
    return {};
}

void checkSignatureKnown(const std::string& part, const OperationInfo& info) {
    if (info.operation == Operation::Signature && expectedSignature(part).empty())
        throw ToolFailure(part + " has no electronic signature to read (no RES_SIGNATURE or no "
                                "READSIGNATURE_INSTRUCTION in its part entry); read its JEDEC ID with 'idcode'");
}

// What the tool checks on a cable before an operation that writes. With
// --part auto the identification has already read the ID. --force, or the
// plug-in's own switch QRX_VORANT_SKIPIDCODECHECK, lets a write go to a
// chip that answers another ID.
WriteCheck writeCheckFor(Operation operation, bool identified, bool force) {
    WriteCheck check;
    check.idMustMatch = !force && std::getenv("QRX_VORANT_SKIPIDCODECHECK") == nullptr;
    switch (operation) {
    case Operation::Program:
    case Operation::Erase:
        check.noBlockProtection = true;
        [[fallthrough]];
    case Operation::Unlock:
    case Operation::QuadEnable: check.chipMustAnswer = !identified; break;
    default: break;
    }
    return check;
}

// A recording cannot read a block to keep what lies around an image in it:
// programming block by block, it would erase those bytes. Says so before
// anything is recorded, with the two ways on.
void checkWholeBlocksForRecording(ConfigDataReader& image, const std::string& file, const std::string& part) {
    const auto* ranges = dynamic_cast<const formats::FlashImage*>(&image);
    ConstraintsManager& database = ConstraintsManager::instance();
    if (ranges == nullptr || !database.hasProperty(part, "SECTOR_SIZE")) return;
    const auto sector = static_cast<std::uint64_t>(database.getDeviceLongProperty(part.c_str(), "SECTOR_SIZE"));
    if (sector == 0) return;
    for (const formats::ImageRange& range : ranges->ranges()) {
        if (range.address % sector == 0 && range.end() % sector == 0) continue;
        const std::uint64_t edge = range.address % sector != 0 ? range.address : range.end();
        char address[24];
        std::snprintf(address, sizeof address, "0x%llX", static_cast<unsigned long long>(edge / sector * sector));
        throw UsageError(file + " covers the block at " + address +
                         " only in part, and a recording cannot read the rest of it to keep it; give "
                         "--erase-whole-blocks to accept that it is erased, or -e for the whole-chip erase");
    }
}

// Everything a run needs before its first scan, checked in the order that
// keeps a refused run free of side effects: options, part, files, then the
// port and (for --part auto) the identification over it.
struct PreparedRun {
    std::string file;  // the operation's image or readback file
    std::unique_ptr<ConfigDataReader> image;
    std::unique_ptr<PortSession> session;
    std::string part;
    std::unique_ptr<Type1SPIDevice> device;
};

PreparedRun prepareRun(const ToolOptions& options, const OperationRequest& request) {
    const OperationInfo& info = *request.info;
    const ports::PortInfo* row = ports::findPort(options.port.kind);
    if (row == nullptr) throw UsageError("unknown port '" + options.port.kind + "'; the ports are " + ports::portNames());
    const ports::PortCaps& caps = row->caps;
    checkPortFitsRequest(options, info, caps);
    if (!options.autoPart()) {
        checkPartKnown(options.part, "part");
        checkQuadEnableWritable(options.part, request);
    }
    const std::string chip = simulatedChipName(options);
    if (caps.simulatesChip) checkPartKnown(chip, "chip");

    // Files before the port: a bad file costs no scan and creates nothing.
    PreparedRun run;
    formats::registerStandardFormats(16, options.image.format);
    run.file = request.fileOperand();
    checkFilesApart(options, info, caps, run.file);
    if (info.operand == OperandKind::ImageFile) run.image = openImage(run.file, options.image);
    if (info.operation == Operation::Readback) checkReadbackTarget(run.file);
    if (run.image && !options.autoPart()) checkImageFits(*run.image, run.file, options.part);
    if (run.image && !caps.readsBack && programsBlocks(request, options) && !options.eraseWholeBlocks)
        checkWholeBlocksForRecording(*run.image, run.file, options.part);

    run.session = PortSession::open(options, options.autoPart() ? std::string() : options.part);
    run.part = options.part;
    std::optional<Identification> identification;
    try {
        if (options.autoPart()) {
            if (options.sfdpPart()) {
                identification.emplace();
                identification->partName = partFromChipSfdp(run.session->port(), identification->jedecId);
                identification->decidedBy = "its SFDP table (the entry above)";
            } else {
                identification = identifyPart(run.session->port(), options.index);
            }
            run.part = identification->partName;
            checkQuadEnableWritable(run.part, request);
            if (run.image) checkImageFits(*run.image, run.file, run.part);
        }
        checkSignatureKnown(run.part, info);
        run.device = createDevice(run.part);
        // A recording has no chip to ask: it opens with the ID check, which
        // its player makes before anything is erased.
        const WriteCheck check = writeCheckFor(info.operation, identification.has_value(), options.force);
        if (!run.session->port().outputMode())
            checkChipBeforeWrite(run.session->port(), run.part, check);
        else if (check.chipMustAnswer && check.idMustMatch && !recordIdCheck(run.session->port(), run.part))
            throw ToolFailure("the recording could not take its ID check");
    } catch (...) {
        run.session->abandon();
        throw;
    }
    if (identification)
        toolInfo("Identified " + run.part + " by its JEDEC ID " + identification->jedecId +
                 (identification->decidedBy.empty() ? "" : " and " + identification->decidedBy) + ".");
    return run;
}

// Whether the operation wrote Quad Enable, and to what: qe set|clear,
// program leaving an x4 part in x4 mode, erase clearing it (with -qebit,
// and always on a part with X4_READ).
std::optional<bool> quadEnableWritten(const OperationRequest& request, Type1SPIDevice& device,
                                      const std::string& part) {
    const auto& tokens = request.switchTokens;
    const bool qebit = std::find(tokens.begin(), tokens.end(), "-qebit") != tokens.end();
    ConstraintsManager& database = ConstraintsManager::instance();
    const bool x4Part = database.hasProperty(part, "X4_READ") &&
                        UT_STR::ICompare(database.getDeviceStringProperty(part.c_str(), "X4_READ"), "TRUE") == 0;
    switch (request.info->operation) {
    case Operation::QuadEnable: return request.operands.at(0) == "set";
    case Operation::Program:
        if (device.x4Programming()) return true;
        return std::nullopt;
    case Operation::Erase:
        if (qebit || x4Part) return false;
        return std::nullopt;
    default: return std::nullopt;
    }
}

// The signature read against the part's: the answer of 'signature'.
bool signatureMatches(Type1SPIDevice& device, const std::string& part) {
    const std::string expected = expectedSignature(part);
    const char* read = device.getAttribute(DeviceNS::ATTR_IDCODE);
    const std::string got = read != nullptr ? read : "";
    if (UT_STR::ICompare(got.c_str(), expected.c_str()) == 0) {
        toolInfo("Electronic signature " + got + " is " + part + "'s.");
        return true;
    }
    toolError("the electronic signature read is " + got + ", but " + part + "'s is " + expected);
    return false;
}

// A recording appears only when the operation succeeded; otherwise it is
// dropped and an older file of the same name stays as it was.
void finishRecording(PortSession& session, const std::string& target, int& status, RunFigures& figures) {
    if (!session.caps().records) return;
    if (status != kExitSuccess) {
        const bool streamed = session.writesInPlace();
        session.abandon();
        toolInfo(streamed ? streamedOutputNote(target, "recording")
                          : "Nothing was recorded: " + target + " is written only when the operation succeeds.");
        return;
    }
    try {
        session.commit();
        figures.recordedFile = target;
    } catch (const ports::PortError& error) {
        toolError(std::string("the recording could not be completed: ") + error.what());
        status = kExitFailure;
        figures.outcome = RunOutcome::Failed;
    }
}

}  // namespace

int runDeviceOperation(const ToolOptions& options, const OperationRequest& request, ProgressAwareSink& sink) {
    const OperationInfo& info = *request.info;
    PreparedRun run = prepareRun(options, request);
    Type1SPIDevice& device = *run.device;

    formats::FixedWidthCif cif(options.dataWidth.value_or(1));
    device.setConfigData(run.image.get());
    device.setCifReader(&cif);
    if (options.dataWidth)
        device.setAttribute(DeviceNS::ATTR_DATA_WIDTH, std::to_string(*options.dataWidth).c_str(), true);
    UT_CMDARGS args = deviceArguments(request, options);

    // Without polling nothing on the cable proves that a page or an erase
    // finished: say so before the run, not after it.
    const bool writes = info.operation == Operation::Program || info.operation == Operation::Erase;
    if (writes && !device.usesPolling() && !run.session->port().outputMode())
        toolInfo("Busy polling is off (QRX_VORANT_ENV_DONT_USE_POLLING is set): program and erase only wait their "
                 "fixed times, and only -v can prove the result.");
    // The status lines of these operations are their answer: --quiet keeps them.
    const bool answers = info.operation == Operation::IdCode || info.operation == Operation::Signature ||
                         info.operation == Operation::Status;
    if (options.quiet && answers) sink.setQuiet(false);

    CancelSignal cancelSignal;
    ProgressPlan plan = progressPlan(device, info, args, run.part, run.image.get());
    // Block by block, how many pages are read and written depends on what
    // the chip holds: a spinner, not a bar that lies.
    if (programsBlocks(request, options)) plan.totalSteps = 0;
    ProgressPort progressPort(run.session->port(), plan,
                              &CancelSignal::flag());
    progressPort.setPhaseClock(run.session->phaseClock());
    device.setScanPort(&progressPort);

    std::optional<ProgressDisplay> display;
    const bool wantsProgress = !info.progressName.empty() || info.operation == Operation::Checksum;
    if (wantsProgress && !options.quiet && isTerminal(stderr)) {
        display.emplace(stderr, std::string(info.name));
        progressPort.setListener(&*display);
        sink.setDisplay(&*display);
        display->progressed(0, progressPort.totalSteps());
    }

    const auto started = std::chrono::steady_clock::now();
    bool result = false;
    try {
        result = invoke(device, request, options, args, options.index);
    } catch (const std::exception& error) {
        toolError(std::string("the operation stopped: ") + error.what());
        result = false;
    }
    // A live port may still hold writes it batched: they go out now, and a
    // failure there fails the run.
    std::string commitError;
    if (!run.session->caps().records) {
        try {
            run.session->commit();
        } catch (const ports::PortError& error) {
            commitError = error.what();
            toolError(commitError);
            result = false;
        }
    }
    // Every operation that stops early for a cancel returns false; one that
    // saw the cancel only after its last page (or after an erase that no
    // cancel can stop) finished its job, and its result stands.
    // A port that lost its cable (a recorder whose file can no longer be
    // written also answers cancel queries) failed the run; nobody cancelled it.
    const bool portLost = progressPort.connectionLost();
    const bool cancelled = progressPort.cancelSeen() && !portLost && !result;
    result = result && !portLost;
    // The port's own words for what went wrong: the device's messages name
    // only what it could see (a time-out, an erase that did not complete).
    if (!result && !cancelled) {
        // Said once: a cable that failed also fails the final flush.
        if (const char* reason = progressPort.failureReason(); reason != nullptr && reason != commitError)
            toolError(reason);
    }
    if (result && !cancelled && !run.session->port().outputMode()) {
        try {
            if (const std::optional<bool> qe = quadEnableWritten(request, device, run.part))
                checkQuadEnableAfterWrite(run.session->port(), run.part, *qe);
        } catch (const ToolFailure& problem) {
            toolError(problem.what());
            result = false;
        }
    }
    if (result && info.operation == Operation::Signature) result = signatureMatches(device, run.part);
    if (options.quiet && answers) sink.setQuiet(true);

    RunFigures figures;
    figures.operation = std::string(info.name);
    figures.wallSeconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - started).count();
    figures.simulatedNanoseconds = run.session->simulatedNanoseconds();
    figures.bytes = progressPort.dataBytes();
    const bool compares = info.operation == Operation::Program || info.operation == Operation::Verify;
    figures.phases = progressPort.phaseFigures(compares ? "verify" : "read");
    figures.outcome = cancelled ? RunOutcome::Cancelled : result ? RunOutcome::Succeeded : RunOutcome::Failed;

    int status = result && !cancelled ? kExitSuccess : kExitFailure;
    // The device answers a blank check's verdict in an attribute; its
    // result only says whether the check ran. A recording reads nothing, so
    // it has no verdict: the played file checks. Every port that reads the
    // chip back has one.
    if (status == kExitSuccess && info.operation == Operation::BlankCheck && !run.session->port().outputMode()) {
        const char* blank = device.getAttribute(DeviceNS::ATTR_BLANK);
        const bool isBlank = blank != nullptr && UT_STR::ICompare(blank, "TRUE") == 0;
        status = isBlank ? kExitSuccess : kExitFailure;
        figures.verdict = isBlank ? "found the flash blank" : "found the flash not blank";
    }
    if (status == kExitSuccess && !reportAnswer(device, info)) {
        status = kExitFailure;
        figures.outcome = RunOutcome::Failed;
    }

    if (display) {
        if (status == kExitSuccess) display->complete();
        else display->stop();
        sink.setDisplay(nullptr);
        progressPort.setListener(nullptr);
    }
    finishRecording(*run.session, options.port.path, status, figures);
    settleOutputFiles(info, run.file, status, figures);

    if (!options.quiet) {
        printRunSummary(figures);
    } else if (status != kExitSuccess && !cancelled) {
        // --quiet hides the status lines that explain a failed verify or a
        // non-blank flash; one line still says what happened.
        std::fprintf(stderr, "vorant-spi: %s %s\n", figures.operation.c_str(),
                     figures.verdict.empty() ? "failed" : figures.verdict.c_str());
    }
    if (cancelled) {
        std::fflush(stdout);
        std::fputs("vorant-spi: cancelled by the user\n", stderr);
    }
    return status;
}

}  // namespace vorant::cli
