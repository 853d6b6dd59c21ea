// vorant-spi over the spidev cable, the whole command line in-process with
// the spidev double behind the node and a simulated W25Q128JV on its bus.

#include "ports/sim/FlashModel.h"
#include "tests/cables/InProcessTool.h"
#include "tests/doubles/FakeSpidev.h"
#include "tests/support/TestParts.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <fstream>
#include <functional>
#include <iterator>
#include <random>

namespace vorant::cables::test {
namespace {

using vorant::test::FakeSpidev;
using vorant::test::FakeSpidevNode;

class SpidevTool : public ::testing::Test {
protected:
    static void SetUpTestSuite() { vorant::test::loadShippedParts(); }

    ToolRun run(std::vector<std::string> args) {
        args.insert(args.begin(), {"--port", "spidev:/dev/spidev0.0"});
        return runToolInProcess(std::move(args), scratch.path());
    }
    std::vector<std::uint8_t> image(std::size_t bytes) {
        std::vector<std::uint8_t> data(bytes);
        std::mt19937 random(7);
        for (std::uint8_t& byte : data) byte = static_cast<std::uint8_t>(random());
        std::ofstream(scratch.path() / "image.bin", std::ios::binary)
            .write(reinterpret_cast<const char*>(data.data()), static_cast<std::streamsize>(data.size()));
        return data;
    }
    std::vector<std::uint8_t> slurp(const std::string& name) {
        std::ifstream in(scratch.path() / name, std::ios::binary);
        return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
    }
    static std::size_t count(const std::string& text, const std::string& what) {
        std::size_t n = 0;
        for (std::size_t at = text.find(what); at != std::string::npos; at = text.find(what, at + 1)) ++n;
        return n;
    }

    ScratchFolder scratch;
    sim::FlashModel flash{sim::FlashConfig::fromPartDatabase("W25Q128JV")};
    FakeSpidevNode node{&flash};
};

struct Answer {
    const char* name;
    std::vector<std::string> args;
    const char* says;
    std::function<bool(const sim::FlashModel&)> flashAfter;
};

TEST_F(SpidevTool, AnswersFromTheChip) {
    const Answer answers[] = {
        {"idcode", {"--part", "auto", "idcode"}, "IDCODE is 'EF4018'", nullptr},
        {"status", {"--part", "auto", "status"}, "W25Q128JV Status Register Contents = 0x0000", nullptr},
        {"qe set", {"--part", "W25Q128JV", "qe", "set"}, "",
         [](const sim::FlashModel& f) { return (f.status2() & 0x02) != 0; }},
    };
    for (const Answer& answer : answers) {
        SCOPED_TRACE(answer.name);
        const ToolRun result = run(answer.args);
        EXPECT_EQ(result.status, 0) << result.text();
        EXPECT_NE(result.out.find(answer.says), std::string::npos) << result.text();
        if (answer.flashAfter) { EXPECT_TRUE(answer.flashAfter(flash)); }
    }
}

// Program, verify and read back through transfer lists; one message per
// transaction is what the double counts.
TEST_F(SpidevTool, ProgramsVerifiesAndReadsBack) {
    const std::vector<std::uint8_t> data = image(100'000);
    const ToolRun programmed = run({"--part", "auto", "program", "image.bin", "-e", "-v"});
    ASSERT_EQ(programmed.status, 0) << programmed.text();
    std::vector<std::uint8_t> expected(flash.memory().size(), 0xFF);
    std::copy(data.begin(), data.end(), expected.begin());
    EXPECT_TRUE(flash.memory() == expected);
    EXPECT_EQ(node.device.messages, node.device.chipSelects);

    flash.memory()[16 * 1024 * 1024 - 1] = 0x42;  // something past the image, so the whole chip is read
    const ToolRun readback = run({"--part", "auto", "readback", "-f", "out.bin"});
    ASSERT_EQ(readback.status, 0) << readback.text();
    EXPECT_TRUE(slurp("out.bin") == flash.memory());
    EXPECT_EQ(node.opened.size(), 2u);
}

// A chip older than SFDP answers 5Ah with ones; --part auto must still
// tell it from its younger twin, in transactions spidev's buffer takes.
TEST_F(SpidevTool, IdentifiesAChipOlderThanSfdp) {
    sim::FlashModel oldChip(sim::FlashConfig::fromPartDatabase("MX25L3206E"));
    FakeSpidevNode oldNode(&oldChip);
    const ToolRun result = run({"--part", "auto", "idcode"});
    EXPECT_EQ(result.status, 0) << result.text();
    EXPECT_NE(result.out.find("IDCODE is 'C22016'"), std::string::npos) << result.text();
}

struct Failure {
    const char* name;
    std::function<void(FakeSpidevNode&)> shape;
    std::vector<std::string> args;
    const char* cause;
    bool reachesTheBus;
};

// Every failure is exit 1 with its cause named, never a success; a cable
// that cannot be opened sends nothing.
TEST_F(SpidevTool, FailuresEndTheRunWithTheirCause) {
    image(100'000);
    const std::vector<std::string> program = {"--part", "W25Q128JV", "program", "image.bin", "-e", "-v"};
    const Failure failures[] = {
        {"unplugged during program", [](FakeSpidevNode& n) { n.device.vanishAfterMessages = 900; }, program,
         "the SPI device is gone", true},
        {"a wrong byte count in the ID read", [](FakeSpidevNode& n) { n.device.miscountAtMessage = 1; },
         {"--part", "auto", "idcode"}, "the reply is not used", true},
        {"no chip on the bus", [](FakeSpidevNode& n) { n.device = FakeSpidev(nullptr); }, {"--part", "auto", "idcode"},
         "no chip answered the JEDEC ID read (it read FFFFFF", true},
        {"absent node", [](FakeSpidevNode& n) { n.openError = ENOENT; }, program, "cannot open /dev/spidev0.0", false},
    };
    for (const Failure& failure : failures) {
        SCOPED_TRACE(failure.name);
        node.device = FakeSpidev(&flash);
        node.openError = 0;
        failure.shape(node);
        const ToolRun result = run(failure.args);
        EXPECT_EQ(result.status, 1) << result.text();
        EXPECT_NE(result.err.find(failure.cause), std::string::npos) << result.text();
        EXPECT_EQ(result.text().find("succeeded"), std::string::npos) << result.text();
        EXPECT_EQ(node.device.messages > 0, failure.reachesTheBus) << result.text();
        if (!failure.reachesTheBus) { EXPECT_EQ(count(result.err, "\n"), 1u) << result.text(); }
    }
}

}  // namespace
}  // namespace vorant::cables::test
