// The whole tool over the FTDI cable, with the MPSSE double behind the
// seam and a simulated W25Q128JV behind the double.

#include "ports/sim/FlashModel.h"
#include "tests/cables/InProcessTool.h"
#include "tests/doubles/FakeMpsse.h"
#include "tests/support/TestParts.h"

#include <algorithm>
#include <fstream>
#include <functional>
#include <random>

namespace vorant::cables::test {
namespace {

using ports::ftdi::FtdiUsbFailure;
using vorant::test::FakeFtdiUsb;
using vorant::test::FakeMpsse;
using Args = std::vector<std::string>;

std::string randomBytes(std::size_t count, unsigned seed) {
    std::mt19937 generator(seed);
    std::string bytes(count, '\0');
    for (char& byte : bytes) byte = static_cast<char>(generator() >> 24);
    return bytes;
}

class FtdiTool : public ::testing::Test {
protected:
    static void SetUpTestSuite() { vorant::test::loadShippedParts(); }
    void SetUp() override {
        mpsse.faults.leftoverState = true;
        usb.devices = {FakeFtdiUsb::ft232h()};
        std::ofstream(dir.path() / "image.bin", std::ios::binary) << image;
    }
    void TearDown() override { EXPECT_EQ(mpsse.misuse, std::vector<std::string>{}); }
    ToolRun run(const Args& args) { return runToolInProcess(args, dir.path()); }
    std::string flashBytes(std::size_t count) const {
        return std::string(flash.memory().begin(), flash.memory().begin() + static_cast<std::ptrdiff_t>(count));
    }

    ScratchFolder dir;
    const std::string image = randomBytes(100'000, 7);
    sim::FlashModel flash{sim::FlashConfig::fromPartDatabase("W25Q128JV")};
    FakeMpsse mpsse{flash};
    FakeFtdiUsb usb{&mpsse};
};

// One flash through a session of runs, each checked by what it left; no
// reply may wait for the latency timer.
TEST_F(FtdiTool, IdentifiesProgramsReadsBackAndSetsQuadEnable) {
    mpsse.keepLog = mpsse.keepWrites = false;  // a 16 MiB readback
    const auto ok = [this](const Args& args) {
        const ToolRun result = run(args);
        EXPECT_EQ(result.status, 0) << result.text();
        EXPECT_EQ(mpsse.latencyWaits(), 0u) << result.text();
        return result;
    };
    EXPECT_TRUE(has(ok({"--port", "ftdi", "--part", "auto", "idcode"}).out, "EF4018"));
    ok({"--port", "ftdi", "--part", "auto", "program", "image.bin", "-e", "-v"});
    EXPECT_TRUE(flashBytes(image.size()) == image);
    ok({"--port", "ftdi,serial=FT4ABC12,speed=30M", "--part", "W25Q128JV", "readback", "-f", "out.bin"});
    EXPECT_TRUE(slurp(dir.path() / "out.bin") == flashBytes(flash.memory().size()));
    EXPECT_EQ(mpsse.sckHz(), 30e6);
    EXPECT_FALSE(ok({"--port", "ftdi", "--part", "W25Q128JV", "status"}).out.empty());
    ok({"--port", "ftdi", "--part", "W25Q128JV", "qe", "set"});
    EXPECT_EQ(flash.status2() & 0x02, 0x02);
}

// Whatever goes wrong with the cable: exit 1 with one line naming the
// cause, never success; where the cable cannot be opened nothing reaches
// the seam.
TEST_F(FtdiTool, ACableThatFailsIsOneClearErrorNeverSuccess) {
    struct Case {
        const char* name;
        std::function<void(FakeMpsse&, FakeFtdiUsb&)> arrange;
        Args args;
        std::string message;
        bool reachesTheSeam;
    };
    const Args program = {"--port", "ftdi", "--part", "W25Q128JV", "program", "image.bin", "-e", "-v"};
    const Args idcode = {"--port", "ftdi", "--part", "auto", "idcode"};
    const Case cases[] = {
        {"absent", [](FakeMpsse&, FakeFtdiUsb& u) { u.devices.clear(); }, idcode,
         "no FTDI device found (looked for 0403:6014 (FT232H), 0403:6010 (FT2232H), 0403:6011 (FT4232H))", false},
        {"no permission",
         [](FakeMpsse&, FakeFtdiUsb& u) {
             u.openFailure = FtdiUsbFailure::Permission;
             u.openFailureDetail = "no permission to open it";
         },
         idcode,
         "no permission to open it; add the udev rule SUBSYSTEM==\"usb\", ATTR{idVendor}==\"0403\", "
         "ATTR{idProduct}==\"6014\", MODE=\"0660\", GROUP=\"plugdev\"",
         false},
        {"claimed by ftdi_sio", [](FakeMpsse&, FakeFtdiUsb& u) { u.openFailure = FtdiUsbFailure::Busy; }, idcode,
         "the kernel's ftdi_sio driver holds it", false},
        {"two devices", [](FakeMpsse&, FakeFtdiUsb& u) { u.devices.push_back(FakeFtdiUsb::ft232h("FT9XYZ")); }, idcode,
         "2 FTDI devices found (ftdi:0403:6014,serial=FT4ABC12; ftdi:0403:6014,serial=FT9XYZ); say which with serial=",
         false},
        {"no such serial",
         [](FakeMpsse&, FakeFtdiUsb&) {},
         {"--port", "ftdi,serial=NOPE", "idcode"},
         "no FTDI device with serial NOPE",
         false},
        {"not an MPSSE engine", [](FakeMpsse& m, FakeFtdiUsb&) { m.faults.noMpsse = true; }, idcode,
         "did not answer as an MPSSE engine: opcode AA should come back as FA AA, but nothing came back", true},
        // Read 1 is the engine check at open; read 2 the ID.
        {"short reply", [](FakeMpsse& m, FakeFtdiUsb&) { m.faults.shortReplyAtRead = 2; }, idcode,
         "a short or late reply from the FTDI device: 4 of the 5 bytes expected", true},
        {"reply out of step", [](FakeMpsse& m, FakeFtdiUsb&) { m.faults.strayByteAtRead = 2; }, idcode,
         "a malformed reply from the FTDI device: it should end in FA AA but ends in 18 FA", true},
        // A status poll that fails leaves the bus failed: the device stops
        // polling and names the reply, never a time-out.
        {"short reply while polling", [](FakeMpsse& m, FakeFtdiUsb&) { m.faults.shortReplyAtRead = 8; }, program,
         "a short or late reply from the FTDI device", true},
        {"unplugged while programming", [](FakeMpsse& m, FakeFtdiUsb&) { m.faults.vanishAfterWrites = 40; }, program,
         "the FTDI device is gone from USB", true},
    };
    for (const Case& c : cases) {
        FakeMpsse device{flash};
        FakeFtdiUsb fakeUsb{&device};
        fakeUsb.devices = {FakeFtdiUsb::ft232h()};
        c.arrange(device, fakeUsb);
        const ToolRun result = run(c.args);
        EXPECT_EQ(result.status, 1) << c.name << "\n" << result.text();
        EXPECT_TRUE(has(result.err, c.message)) << c.name << "\n" << result.text();
        EXPECT_FALSE(has(result.out + result.err, "succeeded")) << c.name << "\n" << result.text();
        // A cable that failed is never taken for a chip that stayed busy.
        EXPECT_FALSE(has(result.err, "exceeded the allocated time")) << c.name << "\n" << result.text();
        EXPECT_EQ(device.writeCount() > 0, c.reachesTheSeam) << c.name;
        if (!c.reachesTheSeam) {
            EXPECT_EQ(std::count(result.err.begin(), result.err.end(), '\n'), 1) << c.name << "\n" << result.text();
        }
        EXPECT_EQ(device.misuse, std::vector<std::string>{}) << c.name;
    }
}

TEST_F(FtdiTool, PortsListsTheDevicesWithTheirSerials) {
    usb.devices.push_back(FakeFtdiUsb::ft232h("FT9XYZ"));
    usb.devices.back().id.product = 0x6010;
    usb.devices.back().chip = ports::ftdi::FtdiChip::FT2232H;
    usb.devices.back().description = "Dual RS232-HS";
    const ToolRun result = run({"ports"});
    EXPECT_EQ(result.status, 0) << result.text();
    EXPECT_TRUE(has(result.out, "ftdi:0403:6014,serial=FT4ABC12 FT232H 'Single RS232-HS', serial FT4ABC12\n"))
        << result.text();
    EXPECT_TRUE(has(result.out,
                    "ftdi:0403:6010,serial=FT9XYZ FT2232H 'Dual RS232-HS', serial FT9XYZ, "
                    "interfaces A and B\n"))
        << result.text();
}

// A channel the chip does not have is the user's mistake: exit 2, nothing
// opened.
TEST_F(FtdiTool, AnFt232hHasNoInterfaceB) {
    const ToolRun result = run({"--port", "ftdi,interface=B", "idcode"});
    EXPECT_EQ(result.status, 2) << result.text();
    EXPECT_TRUE(has(result.err, "has one channel, A")) << result.text();
    EXPECT_EQ(usb.log, std::vector<std::string>{"list 0403:6014 0403:6010 0403:6011"});
}

}  // namespace
}  // namespace vorant::cables::test
