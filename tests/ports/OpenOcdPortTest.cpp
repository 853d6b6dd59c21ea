// The OpenOCD port over the Tcl RPC double (which drives a simulated board
// the way OpenOCD would): the request lines, the round trips a page costs,
// and every bad reply an error, never data.

#include "ports/PortError.h"
#include "ports/jtag/board/BoardModel.h"
#include "ports/openocd/OpenOcdPort.h"
#include "tests/doubles/FakeTclRpc.h"

#include <gtest/gtest.h>

namespace vorant::ports::openocd::test {
namespace {

using vorant::test::FakeTclRpc;

sim::FlashConfig smallChip() {
    sim::FlashConfig config;
    config.partName = "SMALL";
    config.sizeBytes = 64 * 1024;
    config.jedecId[0] = 0xEF, config.jedecId[1] = 0x40, config.jedecId[2] = 0x18;
    config.pageProgramUs = 400;
    return config;
}

RLBitVec wire(std::initializer_list<std::uint8_t> bytes) {
    RLBitVec v(bytes.size() * 8, false);
    std::size_t i = 0;
    for (std::uint8_t byte : bytes)
        for (int k = 7; k >= 0; --k) v.setBit(i++, (byte >> k) & 1);
    return v;
}

std::string text(const RLBitVec& v) {
    std::string out;
    for (std::size_t i = 0; i < v.length(); ++i) out += v.getBit(i) ? '1' : '0';
    return out;
}

struct Rig {
    sim::FlashModel flash{smallChip()};
    jtag::BoardModel board{flash, jtag::BoardSettings{}};
    FakeTclRpc* rpc = nullptr;
    std::unique_ptr<OpenOcdPort> port;

    explicit Rig(const std::string& keys = "") {
        auto io = std::make_unique<FakeTclRpc>(board);
        rpc = io.get();
        PortAddress address;
        address.text = "openocd" + keys;
        address.kind = "openocd";
        const std::size_t equals = keys.find('=');
        if (!keys.empty()) address.keys = {{keys.substr(1, equals - 1), keys.substr(equals + 1)}};
        port = std::make_unique<OpenOcdPort>(std::move(io), address, "OpenOCD at test");
    }
    ScanPort& scan() { return port->scan(); }
    // A status read: 05h at stage 1, 8 bits captured into ones.
    std::string status() {
        RLBitVec opcode = wire({0x05}), tdi(8, false), tdo(8, true);
        EXPECT_TRUE(scan().shiftWrite(ScanStage::kOpen, &opcode, 0));
        if (!scan().shift(ScanStage::kCaptureClose, &tdi, nullptr, &tdo, nullptr)) return "failed";
        return text(tdo);
    }
};

TEST(OpenOcdPort, APageCostsOneRoundTripBeyondItsPolls) {
    Rig rig;
    ASSERT_EQ(rig.rpc->log.size(), 2u);
    EXPECT_EQ(rig.rpc->log[0], "list [catch {jtag names} r] $r");
    EXPECT_EQ(rig.rpc->log[1], "list [catch {scan_chain} r] $r");
    for (int page = 0; page < 3; ++page) {
        const std::size_t before = rig.rpc->log.size();
        RLBitVec wren = wire({0x06}), program = wire({0x02, 0x00, static_cast<std::uint8_t>(page), 0x00, 0xA5});
        ASSERT_TRUE(rig.scan().shiftWrite(ScanStage::kWhole, &wren, 0));
        ASSERT_TRUE(rig.scan().shiftWrite(ScanStage::kWhole, &program, 0));
        ASSERT_TRUE(rig.scan().wait(400, true));
        EXPECT_EQ(rig.rpc->log.size(), before) << "nothing that needs no answer goes out alone";
        EXPECT_EQ(rig.status(), "00000000") << "the page is done and WEL is clear";
        EXPECT_EQ(rig.rpc->log.size(), before + 1) << "one request per page";
    }
    // The first request selects the bridge, then the page's scans, its
    // sleep (in whole milliseconds) and the status read.
    EXPECT_EQ(rig.rpc->log[2].rfind("list [catch {irscan fpga.tap 0x2; drscan fpga.tap 41 0x", 0), 0u) << rig.rpc->log[2];
    EXPECT_NE(rig.rpc->log[2].find("; sleep 1; drscan fpga.tap 50 0x"), std::string::npos) << rig.rpc->log[2];
    EXPECT_EQ(rig.rpc->log[3].find("irscan"), std::string::npos) << "the instruction stays selected";
    EXPECT_EQ(rig.flash.memory()[0x200], 0xA5);
}

TEST(OpenOcdPort, ABadReplyIsAnErrorNeverData) {
    const std::pair<std::string, const char*> replies[] = {
        {"not a reply", "malformed reply"},
        {"0 0000000001802F", "not 14 hex digits"},  // upper case: not what drscan prints
        {"0 ffff", "not 14 hex digits"},  // too short for the 50-bit scan
        {"1 {drscan: jtag execute failed}", "OpenOCD: drscan: jtag execute failed"},
        {"-4 {Tap: fpga.tap unknown\n}", "OpenOCD: Tap: fpga.tap unknown"},
    };
    for (const auto& [reply, reason] : replies) {
        Rig rig;
        rig.rpc->garbleAtRequest = 3;
        rig.rpc->garbledReply = reply;
        EXPECT_EQ(rig.status(), "failed") << reply;
        const char* why = rig.scan().failureReason();
        ASSERT_NE(why, nullptr) << reply;
        EXPECT_NE(std::string(why).find(reason), std::string::npos) << why;
        EXPECT_FALSE(rig.scan().connectionLost()) << reply;
        // After an error the bridge is selected again before the next scan.
        EXPECT_EQ(rig.status(), "00000000") << reply;
        EXPECT_NE(rig.rpc->log.back().find("irscan fpga.tap 0x2"), std::string::npos) << reply;
    }
}

TEST(OpenOcdPort, ALostConnectionIsALostCable) {
    Rig rig;
    rig.rpc->closeAtRequest = 3;
    EXPECT_EQ(rig.status(), "failed");
    EXPECT_TRUE(rig.scan().connectionLost());
    EXPECT_TRUE(rig.scan().isCancelled(2)) << "nothing is worth polling on a lost cable";
    EXPECT_NE(std::string(rig.scan().failureReason()).find("OpenOCD closed the connection"), std::string::npos);
}

// A bridge instruction of another length than the TAP's IR, or a TAP that
// is not there: the port is unavailable, and says what OpenOCD has.
TEST(OpenOcdPort, RefusesATapItCannotDrive) {
    const std::pair<const char*, const char*> cases[] = {
        {",irlen=8", "OpenOCD declares fpga.tap with a 6-bit IR, but the bridge's instruction has 8 bits"},
        {",tap=cpu.tap", "OpenOCD has no TAP 'cpu.tap' (it has fpga.tap)"},
    };
    for (const auto& [keys, message] : cases) {
        try {
            Rig rig(keys);
            ADD_FAILURE() << keys << " was accepted";
        } catch (const PortError& error) {
            EXPECT_EQ(error.kind(), PortError::Kind::Unavailable);
            EXPECT_NE(std::string(error.what()).find(message), std::string::npos) << error.what();
        }
    }
}

// A scan field that is not drscan's own print of that many bits is
// refused, never read as data.
TEST(OpenOcdSink, RefusesAFieldOfAnotherShape) {
    BitBuffer out;
    ASSERT_TRUE(parseDrscanField("2468acf134", 40, out));
    EXPECT_EQ(drscanValue(out), "0x2468acf134");
    for (const char* bad : {"2468ACF134", "2468acf13", "0x68acf134", "2468acf1340", "2468acg134", ""})
        EXPECT_FALSE(parseDrscanField(bad, 40, out)) << bad;
}

}  // namespace
}  // namespace vorant::ports::openocd::test
