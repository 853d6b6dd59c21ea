// The tool's own jobs, run through the built binary on the flash simulator:
// identification, exit statuses, a flash kept in a file, Ctrl-C, SFDP and
// the parts listing, parts users add.
#include "ToolTestFixture.h"

#include <sstream>

namespace vorant::cli::test {
namespace {

struct AutoCase { const char* chip, *operation; int status; const char* text, *answer; };
class AutoPart : public ToolTest, public ::testing::WithParamInterface<AutoCase> {};

TEST_P(AutoPart, IdentifiesTheChipOrAsksForThePart) {
    const Result result = run({"--chip", GetParam().chip, GetParam().operation});
    EXPECT_EQ(result.status, GetParam().status) << result.text();
    EXPECT_TRUE(has(result.out + result.err, GetParam().text)) << result.text();
    EXPECT_TRUE(has(result.out + result.err, GetParam().answer)) << result.text();
}

INSTANTIATE_TEST_SUITE_P(ShippedParts, AutoPart, ::testing::Values(
    AutoCase{"W25Q16JV", "idcode", 0, "Identified W25Q16JV by its JEDEC ID EF4015.", "IDCODE is 'EF4015'"},
    // A part that identifies itself with RES: its device reads the signature.
    AutoCase{"M25P16", "signature", 0, "Identified M25P16 by its JEDEC ID 202015.", "IDCODE is '14'"},
    // Two parts answer 20BA18: the tool names both and wants --part.
    AutoCase{"N25Q128A", "idcode", 2, "(MT25QL128ABA, N25Q128A); choose one with --part NAME", "20BA18"}));

TEST_F(ToolTest, RunsGiveTheirExitStatusAndAFileFlashKeepsItsContents) {
    write("image.bin", randomBytes(4099, 14));
    const struct { Args args; int status; const char* text; } runs[] = {
        {kSim + Args{"program", "image.bin", "-e"}, 0, "'0': Programming Flash."},
        {kSim + Args{"verify", "image.bin"}, 0, "'0': Verification completed."},
        {kSim + Args{"blankcheck"}, 1, "'0': Part is not blank."},  // the verdict, not the run, decides
        {{"--part", "W25Q16JV", "verify", "image.bin"}, 1, "Failed at address, 0"},  // a fresh flash
        {kSim + Args{"erase"}, 0, "'0': Erasing Device."},
        {kSim + Args{"blankcheck"}, 0, "'0': Part is blank."},
        // A cancelled check gives no verdict; --quiet still says why a run failed.
        {kSim + Args{"--sim-fault", "cancel-after=2", "blankcheck"}, 1, "vorant-spi: cancelled by the user"},
        {kSim + Args{"--quiet", "verify", "image.bin"}, 1, "vorant-spi: verify failed"},
        // The rate counts only the phase that moved the data.
        {kSim + Args{"program", "image.bin", "-e", "-v"}, 0, " simulated (erase 5.000 s, program "},
    };
    for (const auto& step : runs) {
        const Result result = run(step.args);
        EXPECT_EQ(result.status, step.status) << result.text();
        EXPECT_TRUE(has(result.out + result.err, step.text)) << step.text << "\n" << result.text();
    }
}

TEST_F(ToolTest, CtrlCCancelsALongOperation) {
    // The erase keeps the chip busy for half an hour of simulated time and
    // is polled every microsecond: in real time only the signal ends it.
    write("slow.toml", userPart("TEST_SLOW_ERASE", "EF40EE",
                                {{"BULKERASE_WAITTIME", "0"}, {"BULKERASE_WAITTIME_INC", "1"},
                                 {"BULKERASE_MAXWAITTIME", "2000000000"}, {"SIM_BULK_ERASE_US", "2000000000"}}));
    Child tool({"--parts", "slow.toml", "--part", "TEST_SLOW_ERASE", "erase"}, dir, root);
    const auto erasing = [&] { return has(tool.out(), "Erasing Device") || tool.ended(); };
    ASSERT_TRUE(Child::until(erasing, std::chrono::seconds(30)));
    tool.signal(SIGINT);
    const Result result = tool.finish(std::chrono::seconds(30));
    EXPECT_EQ(result.status, 1) << result.text();
    EXPECT_TRUE(result.err.ends_with("\nvorant-spi: cancelled by the user\n")) << result.text();
}

TEST_F(ToolTest, SfdpShowsTheChipsTableDecodedOrSaysItHasNone) {
    // The simulated W25Q128JV serves the area read from a real chip.
    const Result real = ok({"--part", "W25Q128JV", "--chip", "W25Q128JV", "sfdp"});
    EXPECT_TRUE(has(real.out, "Erase type 2: 32768 bytes, opcode 52h, typical 128 ms, maximum 1792 ms")) << real.text();
    const Result old = run({"--chip", "M25P16", "sfdp"});
    EXPECT_EQ(old.status, 1) << old.text();
    EXPECT_TRUE(has(old.err, "the chip's SFDP area cannot be used: no SFDP signature")) << old.text();
    const Result recording = run({"--part", "W25Q16JV", "--port", "svf:job.svf", "sfdp"});
    EXPECT_EQ(recording.status, 2) << recording.text();
    EXPECT_FALSE(fs::exists(dir / "job.svf"));
}

// The listing's first column, one name a line.
std::vector<std::string> listedParts(const std::string& out) {
    std::vector<std::string> names;
    std::istringstream lines(out);
    std::string line;
    std::getline(lines, line);  // header
    while (std::getline(lines, line)) names.push_back(line.substr(0, line.find(' ')));
    return names;
}

TEST_F(ToolTest, PartsListsEveryPartAndFilters) {
    const Result all = ok({"parts"});
    EXPECT_TRUE(has(all.out, "PART") && has(all.out, "VENDOR") && has(all.out, "SUPPORT") && has(all.out, "SOURCE"));
    EXPECT_GE(listedParts(all.out).size(), 200u);

    const std::pair<Args, std::vector<std::string>> filters[] = {
        {{"parts", "--id", "ef4018"}, {"W25Q128FV", "W25Q128JV"}},
        {{"parts", "--vendor", "micron", "--size", "128Mbit"},
         {"M25P128", "MT25QL128ABA", "MT25QU128ABA", "N25Q128A", "N25Q128A11"}},
        {{"parts", "W25Q*JV", "--size", "32MiB"}, {"W25Q256JV"}},
    };
    for (const auto& [args, expected] : filters) EXPECT_EQ(listedParts(ok(args).out), expected) << args[1];
    const std::string x4 = ok({"parts", "W25Q128JV"}).out;
    EXPECT_TRUE(has(x4, "x4,unlock  reference table")) << x4;
    const Result none = run({"parts", "--vendor", "nobody"});
    EXPECT_EQ(none.status, 1);
    EXPECT_TRUE(has(none.err, "no part matches '*' --vendor nobody")) << none.text();
}

TEST_F(ToolTest, PartSfdpBuildsAPartFromTheChipPrintsItAndProgramsWithIt) {
    const std::string image = randomBytes(5001, 23);
    write("image.bin", image);
    const Result built = ok({"--part", "sfdp", "--chip", "W25Q64JV", "--port", "sim:flash.bin", "program", "image.bin",
                             "-e", "-v"});
    EXPECT_TRUE(has(built.out, "Identified SFDP_EF4017 by its JEDEC ID EF4017 and its SFDP table")) << built.text();
    // The printed entry, saved as a file, loads and drives the same chip.
    const auto from = built.out.find("# Built by"), to = built.out.find("INFO: Identified");
    ASSERT_TRUE(from != std::string::npos && to != std::string::npos) << built.text();
    write("saved.toml", built.out.substr(from, to - from));
    ok({"--parts", "saved.toml", "--part", "sfdp_ef4017", "--chip", "W25Q64JV", "--port", "sim:flash.bin", "verify",
        "image.bin"});
    // A chip older than SFDP cannot describe itself.
    const Result old = run({"--part", "sfdp", "--chip", "M25P16", "--port", "sim:old.bin", "program", "image.bin"});
    EXPECT_EQ(old.status, 2) << old.text();
    EXPECT_TRUE(has(old.err, "(JEDEC ID 202015) has no usable SFDP table (no SFDP signature")) << old.text();
}

TEST_F(ToolTest, AFolderOfUserPartsLoadsAndAReplacedPartIsAnnounced) {
    fs::create_directories(dir / "mine");
    write("mine/a.toml", userPart("my_flash_a", "EF40AB"));
    // Same name as a shipped part in another letter case: it replaces it.
    write("mine/b.toml", userPart("w25q16jv", "EF4015", {{"DEVICE_SIZE", "16777216"}}));
    const Result result = ok({"--parts", "mine", "--chip", "My_Flash_A", "--part", "MY_FLASH_A", "--port",
                              "sim:flash.bin", "idcode"});
    EXPECT_TRUE(has(result.out, "INFO: part w25q16jv from ")) << result.text();
    EXPECT_TRUE(has(result.out, "replaces the one from ")) << result.text();
    EXPECT_TRUE(has(result.out, "EF40AB")) << result.text();
}

}  // namespace
}  // namespace vorant::cli::test
