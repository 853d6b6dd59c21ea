// What every port of the port table promises the device, whatever carries
// the scans: one suite, one instance per port (and per cable double as
// cables arrive). A port that reads the chip back must answer the ID of the
// chip behind it; one that records must leave tdo as the device gave it.

#include "host/RLBitVec.h"
#include "host/ScanPort.h"
#include "ports/Port.h"
#include "ports/PortTable.h"
#include "ports/jtag/board/BoardModel.h"
#include "ports/openocd/OpenOcdPort.h"
#include "ports/sim/FlashModel.h"
#include "tests/doubles/FakeTclRpc.h"
#if VORANT_HAVE_SPIDEV
#include "tests/doubles/FakeSpidev.h"
#endif
#if VORANT_HAVE_FTDI
#include "tests/doubles/FakeMpsse.h"
#endif
#if VORANT_HAVE_CH341A
#include "ports/ch341a/Ch341aPort.h"
#include "tests/doubles/FakeCh341a.h"
#endif
#include "tests/support/TestParts.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <functional>
#include <memory>
#include <string>
#include <unistd.h>

namespace vorant::ports::test {
namespace {

namespace fs = std::filesystem;

// The chip behind every port that reads back: JEDEC ID EF 40 18.
const std::string& conformancePart() {
    static const std::string name = vorant::test::addTestPart("TEST_CONFORMANCE", vorant::test::w25q128Properties());
    return name;
}

// An instance that opens its port itself (over a double) instead of
// through the table's row.
template <class Instance>
concept OpensItself = requires(const PortContext& context) { Instance::open(context); };

// Each instance opens its port the way the tool does, through its row;
// a cable's instance opens it over its double instead of the OS.
struct SimInstance {
    static constexpr const char* kAddress = "sim:flash.bin";
    static constexpr bool kReadsBack = true;
};
struct SvfInstance {
    static constexpr const char* kAddress = "svf:job.svf";
    static constexpr bool kReadsBack = false;
};

template <class Instance>
class ScanPortConformance : public ::testing::Test {
protected:
    void SetUp() override {
        dir_ = fs::temp_directory_path() /
               ("vorant-conformance-" + std::to_string(getpid()) + "-" +
                ::testing::UnitTest::GetInstance()->current_test_info()->name());
        fs::remove_all(dir_);
        fs::create_directories(dir_);
        address_ = parsePortAddress(Instance::kAddress);
        address_.path = (dir_ / address_.path).string();
        address_.text = address_.kind + ":" + address_.path;
        row_ = findPort(address_.kind);
        ASSERT_NE(row_, nullptr);
        port_ = open();
    }
    void TearDown() override {
        port_.reset();
        fs::remove_all(dir_);
    }
    std::unique_ptr<Port> open() {
        PortContext context;
        context.toolName = "conformance";
        context.partName = conformancePart();
        context.chipName = conformancePart();
        if constexpr (OpensItself<Instance>) return Instance::open(context);
        else return row_->open(address_, context);
    }
    ScanPort& scan() { return port_->scan(); }
    bool send(int stage, const std::string& bits) {
        RLBitVec tdi = vector(bits);
        return scan().shiftWrite(stage, &tdi, 0);
    }
    static RLBitVec vector(const std::string& bits) {
        RLBitVec v(bits.size(), false);
        for (std::size_t i = 0; i < bits.size(); ++i) v.setBit(i, bits[i] == '1');
        return v;
    }
    static std::string text(const RLBitVec& v) {
        std::string out;
        for (std::size_t i = 0; i < v.length(); ++i) out += v.getBit(i) ? '1' : '0';
        return out;
    }

    fs::path dir_;
    PortAddress address_;
    const PortInfo* row_ = nullptr;
    std::unique_ptr<Port> port_;
};

struct BoardJtagSpiInstance {
    static constexpr const char* kAddress = "board:flash.bin";
    static constexpr bool kReadsBack = true;
};
struct BoardInAChainInstance {
    static constexpr const char* kAddress = "board:flash.bin,chain=8:[6]:4";
    static constexpr bool kReadsBack = true;
};
struct BoardShiftDrInstance {
    static constexpr const char* kAddress = "board:flash.bin,bridge=shiftdr,delay=2";
    static constexpr bool kReadsBack = true;
};

// OpenOCD's Tcl server as the double gives it, a board behind it.
class OpenOcdOverDouble final : public Port {
public:
    explicit OpenOcdOverDouble(const std::string& chip)
        : flash_(sim::FlashConfig::fromPartDatabase(chip)), board_(flash_, jtag::BoardSettings{}) {
        PortAddress address;
        address.text = address.kind = "openocd";
        port_ = std::make_unique<openocd::OpenOcdPort>(std::make_unique<vorant::test::FakeTclRpc>(board_), address,
                                                       "OpenOCD double");
    }
    ScanPort& scan() override { return port_->scan(); }

private:
    sim::FlashModel flash_;
    jtag::BoardModel board_;
    std::unique_ptr<openocd::OpenOcdPort> port_;
};
struct OpenOcdInstance {
    static constexpr const char* kAddress = "openocd";
    static constexpr bool kReadsBack = true;
    static std::unique_ptr<Port> open(const PortContext& context) {
        return std::make_unique<OpenOcdOverDouble>(context.chipName);
    }
};

#if VORANT_HAVE_SPIDEV
// The spidev row opened with its double behind the node (put there for
// the open only: the suite opens a port while the last one still lives).
class SpidevOverDouble final : public Port {
public:
    explicit SpidevOverDouble(const PortContext& context)
        : flash_(sim::FlashConfig::fromPartDatabase(context.chipName)), device_(&flash_) {
        spidev::SpidevIoOpener& opener = spidev::spidevIoOpener();
        const spidev::SpidevIoOpener saved = opener;
        opener = [this](const std::string&, int&) { return device_.handle(); };
        try {
            port_ = findPort("spidev")->open(parsePortAddress("spidev:/dev/spidev0.0"), context);
        } catch (...) {
            opener = saved;
            throw;
        }
        opener = saved;
    }
    ScanPort& scan() override { return port_->scan(); }

private:
    sim::FlashModel flash_;
    vorant::test::FakeSpidev device_;
    std::unique_ptr<Port> port_;
};
struct SpidevInstance {
    static constexpr const char* kAddress = "spidev:/dev/spidev0.0";
    static constexpr bool kReadsBack = true;
    static std::unique_ptr<Port> open(const PortContext& context) {
        return std::make_unique<SpidevOverDouble>(context);
    }
};
#define VORANT_SPIDEV_INSTANCE , SpidevInstance
#else
#define VORANT_SPIDEV_INSTANCE
#endif

#if VORANT_HAVE_FTDI
// The FTDI cable through its row, with the MPSSE double behind the seam;
// the engine starts as another program left it.
class FtdiOverDouble final : public Port {
public:
    explicit FtdiOverDouble(const PortContext& context)
        : flash_(sim::FlashConfig::fromPartDatabase(context.chipName)), mpsse_(flash_), usb_(&mpsse_) {
        mpsse_.faults.leftoverState = true;
        usb_.devices = {vorant::test::FakeFtdiUsb::ft232h()};
        port_ = findPort("ftdi")->open(parsePortAddress("ftdi"), context);
    }
    ~FtdiOverDouble() override { EXPECT_EQ(mpsse_.misuse, std::vector<std::string>{}); }
    ScanPort& scan() override { return port_->scan(); }

private:
    sim::FlashModel flash_;
    vorant::test::FakeMpsse mpsse_;
    vorant::test::FakeFtdiUsb usb_;
    std::unique_ptr<Port> port_;
};
struct FtdiInstance {
    static constexpr const char* kAddress = "ftdi";
    static constexpr bool kReadsBack = true;
    static std::unique_ptr<Port> open(const PortContext& context) { return std::make_unique<FtdiOverDouble>(context); }
};
#define VORANT_FTDI_INSTANCE , FtdiInstance
#else
#define VORANT_FTDI_INSTANCE
#endif

#if VORANT_HAVE_CH341A
// A CH341A programmer as its double gives it, the chip on its socket.
class Ch341aOverDouble final : public Port {
public:
    explicit Ch341aOverDouble(const std::string& chip)
        : flash_(sim::FlashConfig::fromPartDatabase(chip)), device_(flash_),
          cable_(ch341a::openCh341aCable(device_.connect(), "ch341a:1:5")) {}
    ScanPort& scan() override { return cable_->scan(); }

private:
    sim::FlashModel flash_;
    vorant::test::FakeCh341a device_;
    std::unique_ptr<Port> cable_;
};
struct Ch341aInstance {
    static constexpr const char* kAddress = "ch341a";
    static constexpr bool kReadsBack = true;
    static std::unique_ptr<Port> open(const PortContext& context) {
        return std::make_unique<Ch341aOverDouble>(context.chipName);
    }
};
#define VORANT_CH341A_INSTANCE , Ch341aInstance
#else
#define VORANT_CH341A_INSTANCE
#endif

using Instances =
    ::testing::Types<SimInstance, SvfInstance, BoardJtagSpiInstance, BoardInAChainInstance, BoardShiftDrInstance,
                     OpenOcdInstance VORANT_SPIDEV_INSTANCE VORANT_FTDI_INSTANCE VORANT_CH341A_INSTANCE>;
TYPED_TEST_SUITE(ScanPortConformance, Instances);

TYPED_TEST(ScanPortConformance, StartsHealthyAndSaysWhatItIs) {
    EXPECT_EQ(this->scan().outputMode(), !TypeParam::kReadsBack);
    EXPECT_EQ(this->row_->caps.readsBack, TypeParam::kReadsBack);
    EXPECT_EQ(this->scan().failureReason(), nullptr);
    EXPECT_FALSE(this->scan().connectionLost());
    EXPECT_FALSE(this->scan().isCancelled(2));
}

// Refused calls fail, say why, and do not take the cable with them.
TYPED_TEST(ScanPortConformance, RefusesWhatCannotBeFramedAndSaysWhy) {
    const std::pair<const char*, std::function<bool(ScanPort&)>> refused[] = {
        {"continue with nothing open", [this](ScanPort&) { return this->send(ScanStage::kContinue, "00000000"); }},
        {"close with nothing open", [this](ScanPort&) { return this->send(ScanStage::kClose, "00000000"); }},
        {"capture with nothing open", [this](ScanPort&) { return this->send(ScanStage::kCaptureClose, "00000000"); }},
        {"unknown stage", [this](ScanPort&) { return this->send(7, "00000110"); }},
        {"no tdi", [](ScanPort& port) { return port.shift(ScanStage::kWhole, nullptr, nullptr, nullptr, nullptr); }},
        {"negative wait", [](ScanPort& port) { return port.wait(-1, true); }},
        {"a wait closes the transaction",
         [this](ScanPort& port) {
             EXPECT_TRUE(this->send(ScanStage::kOpen, "00000101"));
             EXPECT_TRUE(port.wait(0, true));
             return this->send(ScanStage::kContinue, "00000000");
         }},
    };
    for (const auto& [name, call] : refused) {
        this->port_ = this->open();
        EXPECT_FALSE(call(this->scan())) << name;
        EXPECT_NE(this->scan().failureReason(), nullptr) << name;
        EXPECT_FALSE(this->scan().connectionLost()) << name;
        EXPECT_TRUE(this->send(ScanStage::kWhole, "00000110")) << name << ": the port must go on working";
    }
}

// The ID read as the device makes it: opcode 9Fh at stage 1, then 24 bits
// captured at stage 12. tdo comes in as all ones (what an absent chip
// answers), so a port that captures nothing cannot pass for one that does.
TYPED_TEST(ScanPortConformance, AnswersAnIdReadFromTheChipOrLeavesTdoAlone) {
    ASSERT_TRUE(this->send(ScanStage::kOpen, "10011111"));
    RLBitVec tdi(24, false), tdo(24, true), mask(24, false);
    ASSERT_TRUE(this->scan().shift(ScanStage::kCaptureClose, &tdi, nullptr, &tdo, &mask));
    const std::string id = "111011110100000000011000";  // EF 40 18, MSB first
    EXPECT_EQ(this->text(tdo), TypeParam::kReadsBack ? id : std::string(24, '1'));
}

// The unlock leaves a status write open; the wait must deselect before its
// time passes, so the chip is not busy afterwards.
TYPED_TEST(ScanPortConformance, AWaitEndsAnOpenStatusWriteBeforeItsTime) {
    ASSERT_TRUE(this->send(ScanStage::kWhole, "00000110"));
    ASSERT_TRUE(this->send(ScanStage::kOpen, "00000001"));
    ASSERT_TRUE(this->send(ScanStage::kContinue, "00000000"));
    ASSERT_TRUE(this->scan().wait(20000, true));
    ASSERT_TRUE(this->send(ScanStage::kOpen, "00000101"));
    RLBitVec tdi(8, false), tdo(8, true), mask(8, false);
    ASSERT_TRUE(this->scan().shift(ScanStage::kCaptureClose, &tdi, nullptr, &tdo, &mask));
    if (TypeParam::kReadsBack) {
        EXPECT_EQ(this->text(tdo), "00000000") << "busy or write-enabled after the wait";
    }
}

// A run given up leaves nothing behind: no recording, no flash file made
// for it.
TYPED_TEST(ScanPortConformance, AbandonLeavesNoFile) {
    ASSERT_TRUE(this->send(ScanStage::kWhole, "00000110"));
    this->port_->abandon();
    this->port_.reset();
    EXPECT_TRUE(fs::is_empty(this->dir_)) << fs::directory_iterator(this->dir_)->path();
}

}  // namespace
}  // namespace vorant::ports::test
