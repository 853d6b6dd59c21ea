// vorant-spi through a CH341A, the whole command line in-process with the
// programmer's double behind the USB seam and a simulated W25Q128JV on its
// socket: identification, program and verify, readback, status and the
// Quad Enable write; then what must stop a run: a malformed answer, an
// unplug, a programmer that is absent, refused or not chosen.

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

std::string slurp(const std::filesystem::path& file) {
    std::ifstream in(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
}

bool has(const std::string& text, const std::string& part) { return text.find(part) != std::string::npos; }

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

// What a row may change before its run.
struct Setting {
    vorant::test::FakeCh341a& device;
    std::vector<Ch341Device>& present;
    OpenRefusal& refusal;
};

struct FailureRow {
    const char* name;
    std::vector<std::string> args;
    std::function<void(Setting)> setUp;
    int status;
    std::string message;
    bool reachesDevice;
};

void PrintTo(const FailureRow& row, std::ostream* out) { *out << row.name; }

class Ch341aToolFailure : public Ch341aTool, public ::testing::WithParamInterface<FailureRow> {};

TEST_P(Ch341aToolFailure, StopsTheRunAndSaysWhy) {
    writeImage(100000);
    GetParam().setUp({*device, present, refusal});
    const ToolRun result = run(GetParam().args);
    EXPECT_EQ(result.status, GetParam().status) << result.text();
    EXPECT_TRUE(has(result.err, GetParam().message)) << result.text();
    // The cause is said once.
    const std::size_t first = result.err.find(GetParam().message);
    EXPECT_EQ(result.err.find(GetParam().message, first + 1), std::string::npos) << result.text();
    EXPECT_FALSE(has(result.text(), "succeeded")) << result.text();
    EXPECT_FALSE(has(result.out, "EF4018")) << "a broken answer passed for an ID";
    if (!GetParam().reachesDevice) {
        EXPECT_EQ(opens, 0);
    }
    if (!GetParam().reachesDevice || refusal != OpenRefusal::None) {
        EXPECT_TRUE(device->transfers.empty());
    }
}

const std::vector<std::string> kIdcode = {"--port", "ch341a", "--part", "auto", "idcode"};

// clang-format off
INSTANTIATE_TEST_SUITE_P(Rows, Ch341aToolFailure, ::testing::Values(
    FailureRow{"MalformedAnswer", kIdcode, [](Setting s) {
                   s.device.answerFaultAtSpiPacket = 1;
                   s.device.answerSizeChange = 2;
               }, 1, "the CH341A answered an SPI packet of 1 bytes with 3 bytes", true},
    FailureRow{"UnpluggedWhileProgramming",
               {"--port", "ch341a", "--part", "W25Q128JV", "program", "image.bin", "-e", "-v"},
               [](Setting s) { s.device.vanishAtPacket = 2000; }, 1,
               "the CH341A is gone (unplugged?): LIBUSB_ERROR_NO_DEVICE", true},
    FailureRow{"Absent", kIdcode, [](Setting s) { s.present.clear(); }, 1,
               "--port ch341a: cannot open a CH341A: none is plugged in (no USB device 1a86:5512)", false},
    FailureRow{"NotAtThatAddress", {"--port", "ch341a:2:9", "--part", "auto", "idcode"}, [](Setting) {}, 1,
               "there is none at USB bus 2 address 9 (found: ch341a:1:5)", false},
    FailureRow{"SeveralWithoutAnAddress", kIdcode, [](Setting s) { s.present.push_back({3, 2, ""}); }, 2,
               "cannot choose a CH341A: 2 are plugged in (ch341a:1:5, ch341a:3:2)", false},
    FailureRow{"NoPermission", kIdcode, [](Setting s) { s.refusal = OpenRefusal::NoPermission; }, 1,
               R"(no permission (LIBUSB_ERROR_X: as told); add the udev rule SUBSYSTEM=="usb", ATTR{idVendor}=="1a86", )"
               R"(ATTR{idProduct}=="5512", MODE="0660", GROUP="plugdev")", true},
    FailureRow{"Busy", kIdcode, [](Setting s) { s.refusal = OpenRefusal::Busy; }, 1,
               "another program or driver holds it", true}),
    [](const auto& info) { return std::string(info.param.name); });
// clang-format on

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
