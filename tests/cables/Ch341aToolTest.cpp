// vorant-spi through a CH341A, the whole command line in-process with the
// programmer's double behind the USB seam and a simulated W25Q128JV on its
// socket.

#include "ports/ch341a/Ch341Io.h"
#include "ports/sim/FlashModel.h"
#include "tests/cables/InProcessTool.h"
#include "tests/doubles/FakeCh341a.h"
#include "tests/support/TestParts.h"

#include <gtest/gtest.h>

#include <fstream>
#include <functional>
#include <random>

namespace vorant::cables::test {
namespace {

using ports::ch341a::Ch341Device;
using ports::ch341a::Ch341Opening;
using ports::ch341a::OpenRefusal;

class Ch341aTool : public ::testing::Test {
protected:
    void SetUp() override {
        vorant::test::loadShippedParts();
        flash = std::make_unique<sim::FlashModel>(sim::FlashConfig::fromPartDatabase("W25Q128JV"));
        device = std::make_unique<vorant::test::FakeCh341a>(*flash);
        saved = ports::ch341a::ch341Usb();
        ports::ch341a::ch341Usb() = {
            [this] { return present; },
            [this](const Ch341Device&) {
                ++opens;
                if (refusal != OpenRefusal::None) return Ch341Opening{nullptr, refusal, "LIBUSB_ERROR_X: as told"};
                return Ch341Opening{device->connect(), OpenRefusal::None, {}};
            },
        };
    }
    void TearDown() override { ports::ch341a::ch341Usb() = saved; }

    ToolRun run(std::vector<std::string> args) { return runToolInProcess(std::move(args), scratch.path()); }
    void writeImage(std::size_t bytes) {
        std::mt19937 random(7);
        image.resize(bytes);
        for (char& byte : image) byte = static_cast<char>(random());
        std::ofstream(scratch.path() / "image.bin", std::ios::binary) << image;
    }

    ScratchFolder scratch;
    std::unique_ptr<sim::FlashModel> flash;
    std::unique_ptr<vorant::test::FakeCh341a> device;
    ports::ch341a::Ch341Usb saved;
    std::vector<Ch341Device> present{{1, 5, "USB UART-LPT"}};
    OpenRefusal refusal = OpenRefusal::None;
    int opens = 0;
    std::string image;
};

TEST_F(Ch341aTool, IdentifiesProgramsReadsBackAndSetsQuadEnable) {
    ToolRun result = run({"--port", "ch341a", "--part", "auto", "idcode"});
    ASSERT_EQ(result.status, 0) << result.text();
    EXPECT_TRUE(has(result.out, "EF4018")) << result.text();

    writeImage(100000);
    result = run({"--port", "ch341a:001:005", "--part", "W25Q128JV", "program", "image.bin", "-e", "-v"});
    ASSERT_EQ(result.status, 0) << result.text();
    EXPECT_EQ(std::string(flash->memory().begin(), flash->memory().begin() + 100000), image);

    result = run({"--port", "ch341a", "--part", "W25Q128JV", "readback", "-f", "out.bin"});
    ASSERT_EQ(result.status, 0) << result.text();
    EXPECT_TRUE(slurp(scratch.path() / "out.bin") == std::string(flash->memory().begin(), flash->memory().end()));

    result = run({"--port", "ch341a", "--part", "W25Q128JV", "status"});
    ASSERT_EQ(result.status, 0) << result.text();

    result = run({"--port", "ch341a", "--part", "W25Q128JV", "qe", "set"});
    ASSERT_EQ(result.status, 0) << result.text();
    EXPECT_EQ(flash->status2() & 0x02, 0x02);
    EXPECT_TRUE(device->refusal.empty()) << device->refusal;
    EXPECT_FALSE(device->chipSelected());
}

// What must stop a run: exit status and one cause, never a success, and
// nothing sent where the programmer could not be opened.
TEST_F(Ch341aTool, AFailureStopsTheRunAndSaysWhy) {
    struct Row {
        const char* name;
        std::vector<std::string> args;
        std::function<void()> setUp;
        int status;
        std::string message;
        bool reachesDevice;
    };
    const std::vector<std::string> idcode = {"--port", "ch341a", "--part", "auto", "idcode"};
    const Row rows[] = {
        {"malformed answer", idcode,
         [this] {
             device->answerFaultAtSpiPacket = 1;
             device->answerSizeChange = 2;
         },
         1, "the CH341A answered an SPI packet of 1 bytes with 3 bytes", true},
        {"unplugged while programming",
         {"--port", "ch341a", "--part", "W25Q128JV", "program", "image.bin", "-e", "-v"},
         [this] { device->vanishAtPacket = 2000; }, 1, "the CH341A is gone (unplugged?): LIBUSB_ERROR_NO_DEVICE",
         true},
        {"absent", idcode, [this] { present.clear(); }, 1,
         "--port ch341a: cannot open a CH341A: none is plugged in (no USB device 1a86:5512)", false},
        {"not at that address", {"--port", "ch341a:2:9", "--part", "auto", "idcode"}, [] {}, 1,
         "there is none at USB bus 2 address 9 (found: ch341a:1:5)", false},
        {"several without an address", idcode, [this] { present.push_back({3, 2, ""}); }, 2,
         "cannot choose a CH341A: 2 are plugged in (ch341a:1:5, ch341a:3:2)", false},
        {"no permission", idcode, [this] { refusal = OpenRefusal::NoPermission; }, 1,
         R"(no permission (LIBUSB_ERROR_X: as told); add the udev rule SUBSYSTEM=="usb", ATTR{idVendor}=="1a86", )"
         R"(ATTR{idProduct}=="5512", MODE="0660", GROUP="plugdev")",
         true},
        {"busy", idcode, [this] { refusal = OpenRefusal::Busy; }, 1, "another program or driver holds it", true},
    };
    writeImage(100000);
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        flash = std::make_unique<sim::FlashModel>(sim::FlashConfig::fromPartDatabase("W25Q128JV"));
        device = std::make_unique<vorant::test::FakeCh341a>(*flash);
        present = {{1, 5, "USB UART-LPT"}};
        refusal = OpenRefusal::None;
        opens = 0;
        row.setUp();
        const ToolRun result = run(row.args);
        EXPECT_EQ(result.status, row.status) << result.text();
        const std::size_t first = result.err.find(row.message);
        EXPECT_NE(first, std::string::npos) << result.text();
        EXPECT_EQ(result.err.find(row.message, first + 1), std::string::npos) << "said twice\n" << result.text();
        EXPECT_FALSE(has(result.text(), "succeeded")) << result.text();
        EXPECT_FALSE(has(result.out, "EF4018")) << "a broken answer passed for an ID";
        if (!row.reachesDevice) { EXPECT_EQ(opens, 0); }
        if (!row.reachesDevice || refusal != OpenRefusal::None) { EXPECT_TRUE(device->transfers.empty()); }
    }
}

TEST_F(Ch341aTool, PortsListsEachProgrammer) {
    present.push_back({3, 2, ""});
    const ToolRun result = run({"ports"});
    ASSERT_EQ(result.status, 0) << result.text();
    EXPECT_TRUE(has(result.out, "ch341a:1:5") && has(result.out, "\"USB UART-LPT\"")) << result.out;
    EXPECT_TRUE(has(result.out, "ch341a:3:2")) << result.out;
    EXPECT_EQ(opens, 0);
}

}  // namespace
}  // namespace vorant::cables::test
