// The tool's argument handling: what reaches the device and what is turned
// away before anything runs.
#include "cli/CommandLine.h"
#include "cli/PortChoice.h"
#include "cli/SimFaultOption.h"
#include "cli/UsageError.h"

#include <gtest/gtest.h>

#include <sstream>

namespace vorant::cli {
namespace {

std::vector<std::string> words(const std::string& line) {
    std::istringstream stream(line);
    std::vector<std::string> tokens;
    for (std::string token; stream >> token;) tokens.push_back(token);
    return tokens;
}

struct AcceptedCase {
    const char* line;
    const char* operation;
    const char* part;
    PortChoice::Kind port;
    const char* portFile;
    const char* operands;  // space separated
    const char* switches;  // the tokens the device gets after the operands
};

class AcceptedCommandLine : public ::testing::TestWithParam<AcceptedCase> {};

TEST_P(AcceptedCommandLine, SortsGlobalOptionsOperandsAndSwitches) {
    const AcceptedCase& c = GetParam();
    const CommandLine command = parseCommandLine(words(c.line));
    ASSERT_EQ(command.action, CommandLine::Action::Run);
    EXPECT_EQ(command.request.info->name, c.operation);
    EXPECT_EQ(command.options.part, c.part);
    EXPECT_EQ(command.options.port.kind, c.port);
    EXPECT_EQ(command.options.port.file, c.portFile);
    EXPECT_EQ(command.request.operands, words(c.operands));
    EXPECT_EQ(command.request.switchTokens, words(c.switches));
}

INSTANTIATE_TEST_SUITE_P(
    Lines, AcceptedCommandLine,
    ::testing::Values(
        AcceptedCase{"program image.bin -e -v", "program", "auto", PortChoice::Kind::Simulator, "", "image.bin", "-e -v"},
        // An operand after a switch stays an operand: -e takes no argument.
        AcceptedCase{"program -e image.bin -verify", "program", "auto", PortChoice::Kind::Simulator, "", "image.bin",
                     "-e -verify"},
        AcceptedCase{"--part W25Q16JV --port svf:job.svf program a.mcs -erase", "program", "W25Q16JV",
                     PortChoice::Kind::SvfRecorder, "job.svf", "a.mcs", "-erase"},
        // Global options may follow the operation.
        AcceptedCase{"readback -f out.bin --part M25P16 --port sim:flash.bin", "readback", "M25P16",
                     PortChoice::Kind::Simulator, "flash.bin", "", "-f out.bin"},
        AcceptedCase{"--port=sim:C:\\flash.bin --part=AUTO erase -qebit", "erase", "auto", PortChoice::Kind::Simulator,
                     "C:\\flash.bin", "", "-qebit"},
        AcceptedCase{"qe clear", "qe", "auto", PortChoice::Kind::Simulator, "", "clear", ""},
        AcceptedCase{"parts W25*", "parts", "auto", PortChoice::Kind::Simulator, "", "W25*", ""},
        AcceptedCase{"--quiet --debug play job.svf", "play", "auto", PortChoice::Kind::Simulator, "", "job.svf", ""}));

TEST(CommandLine, ReadsNumericAndRepeatableOptions) {
    const CommandLine command = parseCommandLine(
        words("--index 3 --data-width 4 --clock 100000000 --parts a.toml --parts b.toml --sim-fault stuck-busy "
              "--sim-fault cancel-after=2 --chip W25Q16JV --quiet idcode"));
    const ToolOptions& options = command.options;
    EXPECT_EQ(options.index, 3);
    EXPECT_EQ(options.dataWidth, 4);
    EXPECT_EQ(options.clockHz, 100000000u);
    EXPECT_EQ(options.partFiles, (std::vector<std::string>{"a.toml", "b.toml"}));
    EXPECT_EQ(options.simFaults, (std::vector<std::string>{"stuck-busy", "cancel-after=2"}));
    EXPECT_EQ(options.chip, "W25Q16JV");
    EXPECT_TRUE(options.quiet);
    EXPECT_FALSE(options.dataWidth == std::nullopt);
}

TEST(CommandLine, HelpAndVersionNeedNoOperation) {
    EXPECT_EQ(parseCommandLine(words("--help")).action, CommandLine::Action::ShowHelp);
    EXPECT_NE(parseCommandLine(words("--help")).helpText.find("readback -f FILE"), std::string::npos);
    EXPECT_EQ(parseCommandLine(words("--version")).action, CommandLine::Action::ShowVersion);
}

TEST(CommandLine, DeviceArgumentsKeepOperandsApartFromSwitches) {
    const CommandLine command = parseCommandLine(words("program -v image.bin -e"));
    const UT_CMDARGS args = command.request.deviceArguments();
    ASSERT_EQ(args.positional().size(), 1u);
    EXPECT_EQ(args.positional()[0], "image.bin");
    ASSERT_NE(args.getsw("-v", 0), nullptr);
    EXPECT_EQ(args.getsw("-v", 0)->argCount(), 0);
    EXPECT_NE(args.getsw("-e", 0), nullptr);
}

TEST(CommandLine, ReadbackFileIsTheOneTheDeviceUses) {
    // The device takes "-f" before "-file", and the first "-f" of several.
    EXPECT_EQ(parseCommandLine(words("readback -file b.bin -f a.bin")).request.fileOperand(), "a.bin");
    EXPECT_EQ(parseCommandLine(words("readback -f a.bin -f c.bin")).request.fileOperand(), "a.bin");
    EXPECT_EQ(parseCommandLine(words("readback -file b.bin")).request.fileOperand(), "b.bin");
}

struct RejectedCase {
    const char* line;
    const char* messagePart;
};

class RejectedCommandLine : public ::testing::TestWithParam<RejectedCase> {};

TEST_P(RejectedCommandLine, IsAUsageErrorThatSaysWhy) {
    const RejectedCase& c = GetParam();
    try {
        parseCommandLine(words(c.line));
        FAIL() << "accepted: " << c.line;
    } catch (const UsageError& error) {
        const std::string message = error.what();
        EXPECT_NE(message.find(c.messagePart), std::string::npos) << message;
        EXPECT_EQ(message.find('\n'), std::string::npos) << "one line: " << message;
    }
}

INSTANTIATE_TEST_SUITE_P(
    Lines, RejectedCommandLine,
    ::testing::Values(RejectedCase{"", "no operation"}, RejectedCase{"--quiet", "no operation"},
                      RejectedCase{"frobnicate", "unknown operation 'frobnicate'"},
                      RejectedCase{"--bogus idcode", "--bogus"}, RejectedCase{"-e program x.bin", "-e"},
                      RejectedCase{"program", "needs an image file"},
                      RejectedCase{"program a.bin b.bin", "one image file"},
                      RejectedCase{"program a.bin -x", "unknown switch '-x'"},
                      RejectedCase{"program a.bin -f out.bin", "unknown switch '-f'"},
                      RejectedCase{"readback", "needs the output file"},
                      RejectedCase{"readback -f", "'-f' needs a file name"},
                      RejectedCase{"readback -f -v", "'-f' needs a file name"},
                      RejectedCase{"readback out.bin", "takes no operand"},
                      RejectedCase{"erase now", "takes no operand"}, RejectedCase{"qe", "'set' or 'clear'"},
                      RejectedCase{"qe on", "'set' or 'clear'"}, RejectedCase{"play", "one SVF file"},
                      RejectedCase{"parts a b", "at most one pattern"},
                      RejectedCase{"--index -1 idcode", "--index"}, RejectedCase{"--index x idcode", "--index"},
                      RejectedCase{"--data-width 2 idcode", "give 1 or 4"},
                      RejectedCase{"--clock 0 idcode", "--clock 0"},
                      RejectedCase{"--clock 5000000000 idcode", "--clock"},
                      RejectedCase{"--port usb idcode", "unknown port 'usb'"},
                      RejectedCase{"--port svf: erase", "--port svf:FILE"},
                      RejectedCase{"--port sim: erase", "file name"},
                      RejectedCase{"--part= idcode", "--part"},
                      RejectedCase{"--sim-fault melt idcode", "unknown fault"}));

struct PortCase {
    const char* text;
    PortChoice::Kind kind;
    const char* file;
};

class PortChoiceParsing : public ::testing::TestWithParam<PortCase> {};

TEST_P(PortChoiceParsing, NamesKindAndFile) {
    const PortChoice info = parsePortChoice(GetParam().text);
    EXPECT_EQ(info.kind, GetParam().kind);
    EXPECT_EQ(info.file, GetParam().file);
}

INSTANTIATE_TEST_SUITE_P(Texts, PortChoiceParsing,
                         ::testing::Values(PortCase{"sim", PortChoice::Kind::Simulator, ""},
                                           PortCase{"sim:f.bin", PortChoice::Kind::Simulator, "f.bin"},
                                           PortCase{"sim:dir/a:b.bin", PortChoice::Kind::Simulator, "dir/a:b.bin"},
                                           PortCase{"svf:out/job.svf", PortChoice::Kind::SvfRecorder, "out/job.svf"}));

TEST(PortChoiceParsing, RejectsOtherPorts) {
    for (const char* text : {"", "svf", "svf:", "sim:", "jtag:x", "SIM"})
        EXPECT_THROW(parsePortChoice(text), UsageError) << text;
}

TEST(SimFaults, BuildThePlanTheyName) {
    const sim::FaultPlan plan = simFaultPlan({"stuck-busy", "protected", "deep-power-down", "cancel-after=7",
                                              "stuck-bit=0x1F0:0x81:0x80", "stuck-bit=16:4", "fail-shift=3",
                                              "fail-wait=0x10"});
    EXPECT_TRUE(plan.stuckBusy);
    EXPECT_TRUE(plan.protectAtPowerOn);
    EXPECT_TRUE(plan.startInDeepPowerDown);
    EXPECT_EQ(plan.cancelAfterQueries, 7);
    ASSERT_EQ(plan.stuckBits.size(), 2u);
    EXPECT_EQ(plan.stuckBits[0].address, 0x1F0u);
    EXPECT_EQ(plan.stuckBits[0].mask, 0x81);
    EXPECT_EQ(plan.stuckBits[0].value, 0x80);
    EXPECT_EQ(plan.stuckBits[1].address, 16u);
    EXPECT_EQ(plan.stuckBits[1].mask, 4);
    EXPECT_EQ(plan.stuckBits[1].value, 0);
    EXPECT_EQ(plan.failShiftAt, 3);
    EXPECT_EQ(plan.failWaitAt, 16);
}

TEST(SimFaults, RejectMalformedFaults) {
    for (const char* text : {"", "melt", "cancel-after", "cancel-after=", "cancel-after=-1", "cancel-after=x",
                             "cancel-after=99999999999", "stuck-bit=16", "stuck-bit=16:0", "stuck-bit=16:0x100",
                             "stuck-bit=x:1", "stuck-bit=16:1:256", "stuck-busy=1", "fail-shift=0", "fail-wait=0"}) {
        sim::FaultPlan plan;
        EXPECT_THROW(addSimFault(plan, text), UsageError) << text;
    }
}

}  // namespace
}  // namespace vorant::cli
