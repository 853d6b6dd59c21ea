// Bad input: one clear error line, a status that says what went wrong, and
// nothing changes: no file is created or changed, the simulated flash
// included (a refused run sends it nothing).
#include "ToolTestFixture.h"

namespace vorant::cli::test {
namespace {

// fileLimit: files of the run may not grow past it, as on a full disk.
struct BadCase { const char* name; Args args; int status; std::string message; rlim_t fileLimit = RLIM_INFINITY; };

class BadInput : public ToolTest, public ::testing::WithParamInterface<BadCase> {
protected:
    std::map<std::string, std::string> snapshot() const {
        std::map<std::string, std::string> all;
        for (const auto& entry : fs::recursive_directory_iterator(dir))
            if (entry.is_regular_file()) all[entry.path().string()] = slurp(entry.path());
        return all;
    }
};

TEST_P(BadInput, IsRefusedWithOneLineAndChangesNothing) {
    if (std::string(GetParam().name) == "UnreadableImage" && geteuid() == 0) GTEST_SKIP() << "root reads every file";
    write("image.bin", randomBytes(5001, 41));
    ok(kSim + Args{"program", "image.bin", "-e"});  // a simulated flash that holds something
    write("empty.bin", "");
    write("big.bin", randomBytes(kSimBytes + 1, 42));
    write("locked.bin", "x");
    fs::permissions(dir / "locked.bin", fs::perms::none);
    write("data.hex", ":0100020042BB\n:00000001FF\n");
    write("blob.dat", std::string("\x7F" "ELF\x02\x01", 6));
    write("bad.hex", ":020000040000FA\n:10000000000102030405060708090A0B0C0D0E0F78\n:10001000GG\n:00000001FF\n");
    write("old.svf", "// an older recording\n");
    write("huge.svf", "SDR 8 TDI (00);\nSDR 268435456 TDI (0);\nSDR 268435456 TDI (0);\n");
    write("lacking.toml", userPart("TEST_LACKING", "EF40B1", {{"PROGRAM_WAITTIME_INC", ""}}));
    write("invalid.toml", userPart("TEST_ODD_PAGE", "EF40B2", {{"PAGE_SIZE", "2047"}, {"TOTAL_SHIFT_SIZE", "2079"}}));
    write("misspelt.toml", userPart("TEST_MISSPELT", "EF40B3", {{"PROGRAM_WAITIME", "400"}}));
    write("backwards.toml", userPart("TEST_BACKWARDS", "EF40B4", {{"PROGRAM_MAXWAITTIME", "300"}}));
    fs::create_directories(dir / "noparts");
    write("noparts/readme.txt", "part files go here\n");
    const auto before = snapshot();

    const Result result = run(GetParam().args, GetParam().fileLimit);
    EXPECT_EQ(result.status, GetParam().status) << result.text();
    ASSERT_EQ(result.errLines().size(), 1u) << result.text();
    EXPECT_EQ(result.errLines()[0].rfind("vorant-spi: ", 0), 0u) << result.text();
    EXPECT_TRUE(has(result.err, GetParam().message)) << result.text();
    EXPECT_EQ(result.out, "");
    EXPECT_TRUE(snapshot() == before) << "a file was created or changed";
}

const std::string kNoQe = " has no Quad Enable bit vorant-spi can write";

INSTANTIATE_TEST_SUITE_P(Cases, BadInput, ::testing::Values(
    BadCase{"MissingImage", kSim + Args{"program", "nothere.bin", "-e"}, 2, "nothere.bin"},
    BadCase{"EmptyImage", kSim + Args{"program", "empty.bin", "-e"}, 2, "empty.bin"},
    BadCase{"UnreadableImage", kSim + Args{"program", "locked.bin", "-e"}, 2, "locked.bin"},
    BadCase{"MalformedHexLine", kSim + Args{"program", "bad.hex", "-e"}, 2, "bad.hex:3"},
    BadCase{"OffsetForAFileWithAddresses", kSim + Args{"--offset", "0x10", "program", "data.hex"}, 2,
            "files carry their own addresses"},
    BadCase{"ImageOfUnknownKind", kSim + Args{"program", "blob.dat"}, 2, "name it with --format bin|ihex|srec"},
    BadCase{"UnknownFormat", kSim + Args{"--format", "elf", "program", "image.bin"}, 2, "--format elf is not known"},
    BadCase{"ImageOffsetPastTheEnd", kSim + Args{"--offset", "0x1FFFFF", "program", "image.bin"}, 2, "reaches address"},
    BadCase{"BinaryReadAsHex", kSim + Args{"--format", "ihex", "program", "image.bin"}, 2, "starts with ':'"},
    BadCase{"ImageLargerThanThePart", kSim + Args{"program", "big.bin", "-e"}, 2, "W25Q16JV holds 2 MiB"},
    BadCase{"ImageLargerThanTheIdentifiedPart", {"--chip", "W25Q16JV", "--port", "sim:new.bin", "program", "big.bin"},
            2, "W25Q16JV holds 2 MiB"},
    BadCase{"UnknownPart", {"--part", "NO_SUCH_PART", "--port", "sim:flash.bin", "erase"}, 2,
            "unknown part 'NO_SUCH_PART'"},
    BadCase{"PartFileWithAMisspeltKey", {"--parts", "misspelt.toml", "--part", "TEST_MISSPELT", "erase"}, 2,
            "misspelt.toml: part TEST_MISSPELT: PROGRAM_WAITIME: unknown key; did you mean 'PROGRAM_WAITTIME'?"},
    BadCase{"PartFolderWithoutPartFiles", {"--parts", "noparts", "--part", "W25Q16JV", "erase"}, 2,
            "no part files (*.toml) in the folder"},
    BadCase{"PartsSizeThatIsNoSize", {"parts", "--size", "16 parsecs"}, 2, "--size 16 parsecs is not a size"},
    BadCase{"RecordingIntoAMissingFolder", {"--part", "W25Q16JV", "--port", "svf:no/job.svf", "erase"}, 2,
            "no/job.svf"},
    BadCase{"RecordingNeedsAPartName", {"--port", "svf:job.svf", "program", "image.bin"}, 2, "--part NAME"},
    // 5001 bytes end inside their second 4 KiB block, which a recording
    // cannot read to keep.
    BadCase{"RecordingCoversABlockInPart", {"--part", "W25Q16JV", "--port", "svf:job.svf", "program", "image.bin"}, 2,
            "image.bin covers the block at 0x1000 only in part, and a recording cannot read the rest of it to keep "
            "it; give --erase-whole-blocks"},
    BadCase{"RecordingOverItsOwnImage", {"--part", "W25Q16JV", "--port", "svf:image.bin", "program", "image.bin"}, 2,
            "would replace the image image.bin"},
    BadCase{"RecordingOfABadImageKeepsTheOldFile",
            {"--part", "W25Q16JV", "--port", "svf:old.svf", "program", "big.bin"}, 2, "big.bin"},
    BadCase{"ReadbackWithoutFile", kSim + Args{"readback"}, 2, "-f FILE"},
    BadCase{"ReadbackFileIsASwitch", kSim + Args{"readback", "-f", "-v"}, 2, "'-f' needs a file name"},
    BadCase{"ReadbackFileGivenTwice", kSim + Args{"readback", "-f", "a.bin", "-f", "b.bin"}, 2, "'-f' is given twice"},
    // Numbers are quoted as typed, also those no integer type holds.
    BadCase{"ClockPastEveryInteger", kSim + Args{"--clock", "99999999999999999999", "erase"}, 2,
            "--clock 99999999999999999999 is out of range; give 1 to 1000000000 Hz"},
    BadCase{"DataWidthOfTwo", kSim + Args{"--data-width", "2", "erase"}, 2, "--data-width 2 is not supported"},
    // The device writes the -f file when -file is given too: the tool must check that one.
    BadCase{"ReadbackOntoTheFlashFile", kSim + Args{"readback", "-file", "out.bin", "-f", "./flash.bin"}, 2,
            "own file"},
    BadCase{"FlashFileOfAnotherChip", {"--part", "W25Q32JV", "--port", "sim:flash.bin", "erase"}, 2, "flash.bin"},
    BadCase{"FlashFileOnAFullDisk", {"--part", "W25Q16JV", "--port", "sim:new.bin", "erase"}, 2,
            "flash file 'new.bin' cannot be created: the file size limit is reached after 65536 of its 2097168 bytes; "
            "no file was made; make room on the disk", 64 * 1024},
    BadCase{"SharedIdCreatesNoFlashFile", {"--chip", "N25Q128A", "--port", "sim:new.bin", "erase"}, 2, "N25Q128A"},
    // A file readable but holding nothing to play is a failure, not a success.
    BadCase{"PlayingAFileWithoutScans", {"--port", "sim:new.bin", "play", "old.svf"}, 1,
            "vorant-spi: old.svf: no scan to play (the file holds no SDR or SIR that shifts a bit); nothing was played"},
    BadCase{"PlayingAScanLongerThan1Mibit", {"--port", "sim:new.bin", "play", "huge.svf"}, 2,
            "huge.svf: line 2: SDR: length 268435456 is longer than the longest scan accepted (1048576 bits"},
    BadCase{"UnknownOperation", kSim + Args{"frobnicate"}, 2, "unknown operation 'frobnicate'"},
    // Quad Enable writes only where it is register 2 bit 1 written by 01h with two bytes.
    BadCase{"QeSet", kSim + Args{"qe", "set"}, 2, "W25Q16JV" + kNoQe},
    BadCase{"EraseQebitOnAnIdentifiedChip", {"--chip", "MX25L25645G", "--port", "sim:new.bin", "erase", "-qebit"}, 2,
            "MX25L25645G" + kNoQe},
    // The port table decides: an unknown port, a key the port does not take,
    // options for a port that has no use for them.
    BadCase{"UnknownPort", {"--port", "usb:0", "erase"}, 2, "unknown port 'usb'; the ports are sim, svf"},
    BadCase{"ClockOnARecording", {"--part", "W25Q16JV", "--port", "svf:job.svf", "--clock", "1000", "erase"}, 2,
            "--clock sets the simulator's clock and does not apply to --port svf"},
    BadCase{"FaultOnARecording", {"--part", "W25Q16JV", "--port", "svf:job.svf", "--sim-fault", "stuck-busy", "erase"},
            2, "--sim-fault applies to the simulator only"},
    BadCase{"BridgeOnTheSimulator", kSim + Args{"--bridge", "jtagspi", "erase"}, 2,
            "--bridge does not apply to --port sim"},
    BadCase{"UnknownBridge", {"--part", "W25Q16JV", "--port", "svf:job.svf", "--bridge", "usb", "erase"}, 2,
            "unknown bridge 'usb'; the bridges are jtagspi, shiftdr, direct"},
    BadCase{"BridgeKeyGivenTwice",
            {"--part", "W25Q16JV", "--port", "svf:job.svf,bridge=shiftdr", "--bridge", "jtagspi", "erase"}, 2,
            "--bridge and ,bridge= in --port are both given"},
    BadCase{"ChainWithoutTheBridge", {"--part", "W25Q16JV", "--port", "svf:job.svf", "--chain", "8,6", "erase"}, 2,
            "no TAP in brackets"},
    BadCase{"InstructionWiderThanTheIr",
            {"--part", "W25Q16JV", "--port", "svf:job.svf,bridge=jtagspi,irlen=4,ir=0x22", "erase"}, 2,
            "ir=0x22 is out of range; give 0 to 15"},
    BadCase{"OpenOcdPortNumberOutOfRange", {"--port", "openocd:localhost:99999", "idcode"}, 2,
            "'99999' is not a TCP port; give 1 to 65535"},
    BadCase{"ChipOnOpenOcd", {"--port", "openocd", "--chip", "W25Q16JV", "idcode"}, 2,
            "--chip names the simulated chip and does not apply to --port openocd"},
    // The FTDI cable refuses a wrong address before it looks at USB.
    BadCase{"FtdiInterfaceWithoutMpsse", {"--port", "ftdi,interface=C", "idcode"}, 2,
            "interface=C: channel C has no MPSSE engine (on an FT4232H only A and B have one); give interface=A or B"},
    BadCase{"FtdiChipSelectOnMosi", {"--port", "ftdi,cs=ADBUS1", "idcode"}, 2,
            "cs=ADBUS1: ADBUS1 is MOSI; chip select goes on ADBUS3 to ADBUS7"},
    BadCase{"FtdiSpeedAbove30MHz", {"--port", "ftdi", "--speed", "31M", "idcode"}, 2,
            "speed=31M is out of range; give 458 to 30000000 Hz"},
    BadCase{"FtdiMalformedVidPid", {"--port", "ftdi:0403-6014", "idcode"}, 2,
            "'0403-6014' is not VID:PID; give the USB vendor and product ids in hexadecimal, such as 0403:6014"},
    BadCase{"PortFaultOnTheBoard", {"--port", "board:board.bin", "--sim-fault", "fail-shift=3", "erase"}, 2,
            "the board takes the chip's faults only"},
    BadCase{"ShiftDrInAChain",
            {"--part", "W25Q16JV", "--port", "svf:job.svf", "--bridge", "shiftdr", "--chain", "8,[6]", "erase"}, 2,
            "bridge=shiftdr cannot share a chain with other TAPs"},
    BadCase{"PlayOnARecording", {"--part", "W25Q16JV", "--port", "svf:job.svf", "play", "old.svf"}, 2,
            "--port svf has none of; use --port sim or --port board"},
    BadCase{"StatusFromARecording", {"--part", "W25Q16JV", "--port", "svf:job.svf", "status"}, 2,
            "reads nothing; run it on a port that reads the chip"}),
    [](const auto& info) { return std::string(info.param.name); });

#if VORANT_HAVE_CH341A
// The CH341A's clock is the chip's, so its address takes no key; its path
// is BUS:ADDR. Both are refused before USB is looked at.
INSTANTIATE_TEST_SUITE_P(Ch341a, BadInput, ::testing::Values(
    BadCase{"Ch341aClock", {"--port", "ch341a", "--clock", "1000000", "idcode"}, 2,
            "--clock sets the simulator's clock and does not apply to --port ch341a"},
    BadCase{"Ch341aAddressWithoutDevice", {"--port", "ch341a:1", "idcode"}, 2, "'1' is not BUS:ADDR"}),
    [](const auto& info) { return std::string(info.param.name); });
#endif

}  // namespace
}  // namespace vorant::cli::test
