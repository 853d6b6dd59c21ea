// vorant-spi and OpenOCD's own tools against the simulated board, through
// the real openocd: the live port, OpenOCD's jtagspi flash driver (a peer's
// client agreeing with the board's bridge model), and OpenOCD's svf player
// on a jtagspi recording.
#include "tests/openocd/OpenOcdRig.h"

namespace vorant::openocd::test {
namespace {

using cli::test::randomBytes;

constexpr std::size_t kImageBytes = 200000;

TEST_F(OpenOcdRig, VorantSpiProgramsTheBoardThroughOpenOcd) {
    startBoard();
    startOpenOcd();
    const std::string image = randomBytes(kImageBytes, 7);
    write("image.bin", image);

    Result id = ok(viaOpenOcd({"idcode"}));
    EXPECT_TRUE(has(id.out, "Identified TEST_QUICK25 by its JEDEC ID EF40A1")) << id.text();
    ok(viaOpenOcd({"program", "image.bin", "-e", "-v"}));
    Result status = ok(viaOpenOcd({"status"}));
    EXPECT_TRUE(has(status.out, "TEST_QUICK25 Status Register Contents = 0x0000")) << status.text();
    ok(viaOpenOcd({"readback", "-f", "out.bin"}));
    EXPECT_TRUE(read("out.bin").substr(0, kImageBytes) == image);
    const Result blank = run(viaOpenOcd({"blankcheck"}));
    EXPECT_EQ(blank.status, 1) << "a programmed flash is not blank, whatever the port\n" << blank.text();

    openocd_.reset();
    EXPECT_TRUE(boardFlash().substr(0, kImageBytes) == image);
}

TEST_F(OpenOcdRig, OpenOcdsJtagspiDriverReadsWhatTheBoardHolds) {
    const std::string image = randomBytes(4096, 8);
    write("image.bin", image);
    // The flash file is made on the in-process board; OpenOCD then reads it.
    // OpenOCD's driver knows the part by its ID.
    ok({"--part", "W25Q16JV", "--port", "board:flash.bin", "program", "image.bin"});
    startBoard("W25Q16JV");
    const std::string log = runOpenOcdScript({
        "target create fpga.proxy testee -chain-position fpga.tap",
        "flash bank fpga.flash jtagspi 0 0 0 0 fpga.proxy 0x02",
        "init",
        "flash probe 0",
        "echo \"ID: [jtagspi cmd 0 3 0x9f]\"",
        "flash read_bank 0 read.bin 0 4096",
        "shutdown",
    });
    EXPECT_TRUE(has(log, "9f -> ef 40 15")) << log;
    EXPECT_TRUE(read("read.bin") == image) << log;
}

TEST_F(OpenOcdRig, OpenOcdsSvfPlaysAJtagspiRecording) {
    const std::string image = randomBytes(kImageBytes, 9);
    write("image.bin", image);
    ok({"--parts", quickParts().string(), "--part", "TEST_QUICK25", "--port", "svf:job.svf", "program", "image.bin",
        "-e", "-v"});
    ASSERT_TRUE(has(read("job.svf"), "// Bridge: bridge=jtagspi")) << "recordings default to jtagspi";

    startBoard();
    const std::string log = runOpenOcdScript(
        {"init", "if {[catch {svf -tap fpga.tap job.svf quiet} e]} {echo \"SVF FAILED: $e\"} else {echo \"SVF PLAYED\"}",
         "shutdown"});
    EXPECT_FALSE(has(log, "tdo check error")) << log;
    EXPECT_TRUE(has(log, "SVF PLAYED")) << log;
    EXPECT_TRUE(boardFlash().substr(0, kImageBytes) == image);

}

// Each cause is named in one line, the exit status is 1, nothing succeeds.
TEST_F(OpenOcdRig, NamesWhyTheCableFailed) {
    const int nobody = freePort();
    Result refused = run({"--port", "openocd:127.0.0.1:" + std::to_string(nobody), "idcode"});
    EXPECT_EQ(refused.status, 1) << refused.text();
    EXPECT_TRUE(has(refused.err, "cannot connect to OpenOCD at 127.0.0.1:" + std::to_string(nobody))) << refused.text();

    startBoard();
    startOpenOcd();
    // The board goes away in the middle of a program.
    write("image.bin", randomBytes(kImageBytes, 10));
    Child program(viaOpenOcd({"program", "image.bin", "-e"}), dir, root);
    std::this_thread::sleep_for(std::chrono::milliseconds(600));
    board_->signal(SIGKILL);
    const Result vanished = program.finish(std::chrono::seconds(60));
    EXPECT_EQ(vanished.status, 1) << vanished.text();
    EXPECT_FALSE(has(vanished.err, "succeeded")) << vanished.text();
    EXPECT_TRUE(has(vanished.err, "OpenOCD")) << vanished.text();
}

// The board refuses a stream that is not remote_bitbang: a message, the
// connection closed, and the board still serving the next adapter. No
// OpenOCD needed.
class BoardServer : public cli::test::ToolTest {};

std::string exchange(int port, const std::string& bytes) {
    const int fd = connectLoopback(port);
    if (fd < 0) return "no connection";
    timeval limit{5, 0};
    setsockopt(fd, SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
    send(fd, bytes.data(), bytes.size(), MSG_NOSIGNAL);
    std::string reply;
    char buffer[256];
    for (ssize_t n; (n = recv(fd, buffer, sizeof buffer, 0)) > 0;) reply.append(buffer, static_cast<std::size_t>(n));
    close(fd);
    return reply;  // complete once the board closed the connection
}

TEST_F(BoardServer, RefusesMalformedInputAndServesTheNextAdapter) {
    Process board((binDir() / "vorant-board").string(), Args{"--part", "W25Q16JV"}, dir, root / "board.log");
    ASSERT_TRUE(Child::until([&] { return board.log().find('\n') != std::string::npos; }, std::chrono::seconds(10)));
    const int port = listeningPort(board.log());

    EXPECT_EQ(exchange(port, "0R4R\x01" "0R"), "11") << "the answers before the bad byte, then the end";
    ASSERT_TRUE(Child::until([&] { return board.log().find("unexpected byte 0x01") != std::string::npos; },
                             std::chrono::seconds(5)))
        << board.log();
    EXPECT_TRUE(has(board.log(), "vorant-board: unexpected byte 0x01 at byte 5 of the remote_bitbang stream; "
                                 "closing the connection"))
        << board.log();
    EXPECT_TRUE(board.running());
    EXPECT_EQ(exchange(port, "0RQ"), "1") << "a new adapter is served";
}

}  // namespace
}  // namespace vorant::openocd::test
