// The spidev cable over its double: the transfer lists of a write enable
// and a status read byte for byte, the node's setup and what it refuses,
// transactions the driver would not take or that fail, and discovery.

#include "host/RLBitVec.h"
#include "host/ScanPort.h"
#include "ports/PortError.h"
#include "ports/PortTable.h"
#include "ports/sim/FlashModel.h"
#include "ports/spidev/SpidevPort.h"
#include "tests/doubles/FakeSpidev.h"
#include "tests/support/TestParts.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <functional>
#include <unistd.h>

namespace vorant::ports::test {
namespace {

using vorant::test::FakeSpidev;
using vorant::test::FakeSpidevNode;

const std::string& chip() {
    static const std::string name = vorant::test::addTestPart("TEST_SPIDEV", vorant::test::w25q128Properties());
    return name;
}

class SpidevPortTest : public ::testing::Test {
protected:
    std::unique_ptr<Port> open(const std::string& address) {
        return findPort("spidev")->open(parsePortAddress(address), PortContext{});
    }
    bool send(ScanPort& port, int stage, std::vector<unsigned char> wireBytes) {
        RLBitVec tdi(wireBytes.data(), wireBytes.size() * 8);
        return port.shiftWrite(stage, &tdi, 0);
    }
    std::vector<std::string> messages() const {
        std::vector<std::string> lines;
        for (const std::string& line : node.device.log)
            if (line.rfind("msg", 0) == 0) lines.push_back(line);
        return lines;
    }

    sim::FlashModel flash{sim::FlashConfig::fromPartDatabase(chip())};
    FakeSpidevNode node{&flash};
};

// 06h alone, then 05h and one byte read with zeros out: each one message,
// chip select held across its transfers; the node set up before them.
TEST_F(SpidevPortTest, AWriteEnableAndAStatusReadAreOneMessageEach) {
    std::unique_ptr<Port> port = open("spidev:/dev/spidev0.0");
    ASSERT_TRUE(send(port->scan(), ScanStage::kWhole, {0x06}));
    ASSERT_TRUE(send(port->scan(), ScanStage::kOpen, {0x05}));
    RLBitVec tdi(8, false), tdo(8, true), mask(8, false);
    ASSERT_TRUE(port->scan().shift(ScanStage::kCaptureClose, &tdi, nullptr, &tdo, &mask));
    EXPECT_EQ(node.device.log, std::vector<std::string>({"set mode 0", "get mode", "set bits 8", "get bits",
                                                         "set speed 10000000", "get speed", "msg 06", "msg 05 | <1"}));
    EXPECT_EQ(node.device.chipSelects, 2u);
    const unsigned char wel = 0x02;
    EXPECT_EQ(tdo.data()[0], RLBitVec(&wel, 8).data()[0]) << "the write enable latch, read back in scan order";
    EXPECT_EQ(node.opened, std::vector<std::string>({"/dev/spidev0.0"}));
}

struct OpenCase {
    const char* name;
    const char* address;
    std::function<void(FakeSpidevNode&)> shape;
    const char* refusal;  // empty: it opens
    PortError::Kind kind = PortError::Kind::Unavailable;
};

// What the port takes and refuses at open; a refused open sends no message
// and a bad key does not even open the node.
TEST_F(SpidevPortTest, OpensWhatAFlashCanUseAndRefusesTheRest) {
    const OpenCase cases[] = {
        {"a GPIO chip select reads back CS_HIGH", "spidev:/dev/spidev0.0",
         [](FakeSpidevNode& n) { n.device.forcedModeBits = 0x04; }, ""},
        {"speed in kHz", "spidev:/dev/spidev0.0,speed=500k", nullptr, ""},
        {"no bufsiz to read: the default", "spidev:/dev/spidev0.0",
         [](FakeSpidevNode& n) { n.device.bufsiz.reset(); }, ""},
        {"speed not a number", "spidev:/dev/spidev0.0,speed=fast", nullptr, "speed=fast is not a speed",
         PortError::Kind::BadRequest},
        {"speed of nothing", "spidev:/dev/spidev0.0,speed=0", nullptr, "speed=0 is not a speed",
         PortError::Kind::BadRequest},
        {"speed past 200 MHz", "spidev:/dev/spidev0.0,speed=201M", nullptr, "speed=201M is not a speed",
         PortError::Kind::BadRequest},
        {"absent node", "spidev:/dev/spidev9.0", [](FakeSpidevNode& n) { n.openError = ENOENT; },
         "cannot open /dev/spidev9.0: No such file or directory; enable the SPI controller"},
        {"no permission", "spidev:/dev/spidev0.0", [](FakeSpidevNode& n) { n.openError = EACCES; },
         "SUBSYSTEM==\"spidev\", GROUP=\"spi\", MODE=\"0660\""},
        {"not a spidev node", "spidev:/dev/ttyS0", [](FakeSpidevNode& n) { n.device.notSpidev = true; },
         "/dev/ttyS0 is not a spidev device (SPI_IOC_WR_MODE"},
        {"controller refuses the speed", "spidev:/dev/spidev0.0,speed=1000",
         [](FakeSpidevNode& n) { n.device.controllerMinHz = 4000; }, "the SPI controller refuses speed=1000 Hz"},
        {"driver keeps LSB first", "spidev:/dev/spidev0.0", [](FakeSpidevNode& n) { n.device.forcedModeBits = 0x08; },
         "keeps SPI mode bits 0x08"},
        {"buffer below a page program", "spidev:/dev/spidev0.0", [](FakeSpidevNode& n) { n.device.bufsiz = 200; },
         "spidev.bufsiz) is 200 bytes, below the 264 of a page program with its command; raise it with the kernel "
         "parameter spidev.bufsiz=4096"},
    };
    for (const OpenCase& row : cases) {
        SCOPED_TRACE(row.name);
        node.device = FakeSpidev(&flash);
        node.openError = 0;
        node.opened.clear();
        if (row.shape) row.shape(node);
        if (*row.refusal == '\0') {
            EXPECT_NO_THROW(open(row.address));
            continue;
        }
        try {
            open(row.address);
            ADD_FAILURE() << "opened";
        } catch (const PortError& error) {
            EXPECT_EQ(error.kind(), row.kind);
            EXPECT_NE(std::string(error.what()).find(row.refusal), std::string::npos) << error.what();
            EXPECT_EQ(std::string(error.what()).rfind(std::string("--port ") + row.address, 0), 0u) << error.what();
        }
        EXPECT_EQ(node.device.messages, 0u);
        if (row.kind == PortError::Kind::BadRequest) { EXPECT_TRUE(node.opened.empty()); }
    }
}

struct FailureCase {
    const char* name;
    std::function<void(FakeSpidev&)> shape;
    std::size_t bytes;  // of the transaction after a write enable
    const char* reason;
    bool lost;
};

// A transaction the driver would not take, or one that fails: the shift
// says why, and only a device that is gone is lost.
TEST_F(SpidevPortTest, AFailedTransactionSaysWhyAndOnlyAVanishedDeviceIsLost) {
    const FailureCase cases[] = {
        {"larger than bufsiz", [](FakeSpidev& d) { d.bufsiz = 300; }, 301,
         "a transaction of 301 bytes is larger than the spidev driver's buffer (spidev.bufsiz, 300 bytes); raise it "
         "with the kernel parameter spidev.bufsiz=4096",
         false},
        // 264 bytes fit the plain sum, but not the kernel's aligned share.
        {"EMSGSIZE from the driver", [](FakeSpidev& d) { d.bufsiz = 264; }, 264, "spidev.bufsiz=4096", false},
        {"controller error", [](FakeSpidev& d) { d.failAtMessage = 2; }, 4,
         "spidev:/dev/spidev0.0: SPI_IOC_MESSAGE failed: Input/output error", false},
        {"device gone", [](FakeSpidev& d) { d.vanishAfterMessages = 1; }, 4,
         "SPI_IOC_MESSAGE failed: Cannot send after transport endpoint shutdown; the SPI device is gone", true},
        {"device gone, ENODEV",
         [](FakeSpidev& d) {
             d.vanishAfterMessages = 1;
             d.vanishErrno = ENODEV;
         },
         4, "No such device; the SPI device is gone", true},
        {"a wrong byte count", [](FakeSpidev& d) { d.miscountAtMessage = 2; }, 4,
         "SPI_IOC_MESSAGE moved 3 bytes of a 4-byte transaction; the reply is not used", false},
    };
    for (const FailureCase& row : cases) {
        SCOPED_TRACE(row.name);
        node.device = FakeSpidev(&flash);
        row.shape(node.device);
        std::unique_ptr<Port> port = open("spidev:/dev/spidev0.0");
        ScanPort& scan = port->scan();
        ASSERT_TRUE(send(scan, ScanStage::kWhole, {0x06}));
        std::vector<unsigned char> command = {0x02, 0x00, 0x00, 0x00};
        ASSERT_TRUE(send(scan, ScanStage::kOpen, command));
        EXPECT_FALSE(send(scan, ScanStage::kClose, std::vector<unsigned char>(row.bytes - command.size(), 0x5A)));
        ASSERT_NE(scan.failureReason(), nullptr);
        EXPECT_NE(std::string(scan.failureReason()).find(row.reason), std::string::npos) << scan.failureReason();
        EXPECT_EQ(scan.connectionLost(), row.lost);
        EXPECT_EQ(send(scan, ScanStage::kWhole, {0x04}), !row.lost) << "the next transaction";
        EXPECT_EQ(scan.wait(10, true), !row.lost);
    }
}

// The real seam, where no SPI hardware is needed to reach it: a node that
// is not there, and one of another driver.
TEST(SpidevOnLinux, RefusesAnAbsentNodeAndANodeOfAnotherDriver) {
    const std::pair<const char*, const char*> cases[] = {
        {"spidev:/dev/vorant-no-such-spidev", "cannot open /dev/vorant-no-such-spidev: No such file or directory"},
        {"spidev:/dev/null", "/dev/null is not a spidev device (SPI_IOC_WR_MODE: Inappropriate ioctl for device)"},
    };
    for (const auto& [address, refusal] : cases) {
        try {
            findPort("spidev")->open(parsePortAddress(address), PortContext{});
            ADD_FAILURE() << address << " opened";
        } catch (const PortError& error) {
            EXPECT_EQ(error.kind(), PortError::Kind::Unavailable);
            EXPECT_NE(std::string(error.what()).find(refusal), std::string::npos) << error.what();
        }
    }
}

TEST(SpidevDiscovery, ListsTheNodesByBusAndChipSelect) {
    namespace fs = std::filesystem;
    const fs::path dir = fs::temp_directory_path() / ("vorant-spidev-dev-" + std::to_string(getpid()));
    fs::remove_all(dir);
    fs::create_directories(dir);
    for (const char* name : {"spidev1.0", "spidev0.1", "spidev10.2", "spidev0.0", "spidev", "spidevX.0", "ttyS0"})
        std::ofstream(dir / name).put('\0');
    std::vector<std::string> found;
    for (const FoundCable& cable : spidev::findSpidevNodes(dir))
        found.push_back(cable.address + " " + cable.description);
    const std::string at = "spidev:" + dir.string() + "/";
    EXPECT_EQ(found, std::vector<std::string>({at + "spidev0.0 SPI bus 0, chip select 0",
                                               at + "spidev0.1 SPI bus 0, chip select 1",
                                               at + "spidev1.0 SPI bus 1, chip select 0",
                                               at + "spidev10.2 SPI bus 10, chip select 2"}));
    EXPECT_TRUE(spidev::findSpidevNodes(dir / "absent").empty());
    fs::remove_all(dir);
}

}  // namespace
}  // namespace vorant::ports::test
