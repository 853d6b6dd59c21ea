// The memory operations as the scan port and the user see them: bulk erase,
// page programming, verify and checksum, blank check, readback and the
// progress counts.

#include "PluginTestSupport.h"

namespace vorant::test::plugin {
namespace {

using Memory = PluginTest;

int checksum(Type1SPIDevice& d, UT_CMDARGS* args) { return d.checksum(0, args); }
Operation verifyNamed(const char* name) { return [=](auto& d, auto* args) { return int(d.verify(0, args, name)); }; }
// Program with attribute 80 set to `width` (unless null) and a CIF reader of
// data width `cifWidth` (unless 0).
Operation programWidth(const char* width, int cifWidth) {
    return [=](Type1SPIDevice& d, UT_CMDARGS* args) {
        struct Cif : CifReader {
            int width = 0;
            int getDataWidth() override { return width; }
        } cif;
        cif.width = cifWidth;
        if (width) d.setAttribute(DeviceNS::ATTR_DATA_WIDTH, width, true);
        if (cifWidth) d.setCifReader(&cif);
        return int(d.program(0, args));
    };
}

Lines eraseStart(int wait) {
    return concat({writeEnable(), {loading("erase"), "shift 0 " + kBulkErase, "wait " + std::to_string(wait)}});
}
const Lines kDisplay = concat({statusRead(kReadStatus1), statusRead(kReadStatus2)});
const Lines kIdlePoll = concat({statusRead(), {"isCancelled 2"}});
const Lines kFilePage = {"wait 4500", "isCancelled 2"};  // what follows a page's "wait 0" in file mode
const Lines kNoScan = {}, kUnlock = statusWrite(2, "00000000");
const PortScript kFile = {.fileMode = true};
// A display of both registers reading 0, on a part without bit lines.
const Properties kShort = {{"READ_STATUS_ENABLED", "TRUE"}, {"STATUS_REGISTER_LENGTH", "0"}};
const std::string kContents = "TINY Status Register Contents = 0x0000.\n";
Lines withoutLast(Lines lines) {
    lines.pop_back();
    return lines;
}

TEST_P(Memory, Erase) {
    const Properties x4 = {{"X4_READ", "TRUE"}};
    const Properties all = {{"BULKERASE_MAXWAITTIME", "8000000"}, {"X4_READ", "TRUE"}, {"READ_STATUS_ENABLED", "TRUE"}};
    const Lines start = {"'0': Erasing Device.\n"}, notComplete = {"'0': Erase did not complete.\n"};
    const Lines exceeded = {"'0': Device has exceeded the allocated time.\n"};
    const Lines cleared = concat({eraseStart(300000000), quadEnableWrite(0x1C, 0x00, true), writeDisable()});
    const Lines file = concat({eraseStart(300000000), writeDisable()});
    const PortScript qe = {.fileMode = true, .status1 = 0x1C, .status2 = 0x02};
    const Row rows[] = {
        {.name = "cable", .stream = concat({eraseStart(40000000), busyPoll(4000000), kIdlePoll, writeDisable()}),
         .script = {.busyReads = 1}, .status = start},
        {.name = "polling switched off", .stream = concat({eraseStart(40000000), writeDisable()}),
         .script = {.busyReads = 1}, .status = start, .noPolling = true},
        {.name = "file mode", .stream = file, .script = {.fileMode = true, .busyReads = 1}, .status = start,
         .vectors = {{1, "1x8|0x8|0x8"}}},
        // Busy past the limit 8000000 in steps of 4000000: the error and a
        // write disable, neither Quad Enable clear nor display.
        {.name = "time-out", .result = 0,
         .stream = concat({eraseStart(40000000), repeat(busyPoll(4000000), 3), writeDisable()}),
         .script = {.busyReads = 99}, .changes = all, .status = start, .errors = notComplete, .debug = exceeded},
        // Without its instruction the flash never started: no polling, which
        // would find it idle at once.
        {.name = "erase instruction not sent", .result = 0,
         .stream = concat({withoutLast(eraseStart(40000000)), writeDisable()}),
         .script = {.failShifts = {2}}, .status = start,
         .errors = {"'0': Erase did not start, the erase instruction could not be sent to the device.\n"}},
        {.name = "write enable not sent", .result = 0,
         .stream = concat({withoutLast(eraseStart(40000000)), writeDisable()}),
         .script = {.failShifts = {1}}, .status = start,
         .errors = {"'0': Erase did not start, the erase instruction could not be sent to the device.\n"}},
        // With polling off only the wait stands for the erase's end.
        {.name = "failed wait without polling", .result = 0, .stream = concat({eraseStart(40000000), writeDisable()}),
         .script = {.failWaits = {1}}, .status = start,
         .errors = {"'0': Erase did not complete, the wait for it failed.\n"}, .noPolling = true},
        // With polling, the polling proves the end whatever the wait did.
        {.name = "failed wait, idle at the poll", .stream = concat({eraseStart(40000000), kIdlePoll, writeDisable()}),
         .script = {.failWaits = {1}}, .status = start},
        {.name = "Quad Enable not cleared", .result = 0,
         .stream = concat({eraseStart(300000000), quadEnableWrite(0x1C, 0x00, true), writeDisable()}),
         .script = {.fileMode = true, .failWaits = {2}, .status1 = 0x1C, .status2 = 0x02}, .changes = x4,
         .status = start, .errors = {"'0': The Quad Enable bit could not be cleared.\n"}},
        // The Quad Enable bit cleared, register 1 written back as read.
        {.name = "-qebit", .stream = cleared, .script = qe, .status = start, .tokens = {"-qebit"}},
        {.name = "X4_READ", .stream = cleared, .script = qe, .changes = x4, .status = start},
        // "-e" (program's erase) drops the register display and nothing else.
        {.name = "display", .stream = concat({eraseStart(40000000), kIdlePoll, kDisplay, writeDisable()}),
         .changes = kShort, .status = {start[0], kContents}},
        {.name = "-e", .stream = concat({eraseStart(40000000), kIdlePoll, writeDisable()}), .changes = kShort,
         .status = start, .tokens = {"-e"}},
    };
    for (const Row& row : rows) check(row, [](auto& d, auto* args) { return int(d.erase(0, args)); });
}

// Page `index` of the pattern data as programmed: the frame (a short last
// chunk padded with 0xFF), its wait 0, then `after`. With `gaps`, the
// address starts at bit 10 and the data at bit 40 of a 112-bit frame.
Lines page(std::size_t index, const Lines& after = kFilePage, std::size_t bytes = 8, bool gaps = false) {
    Bytes data = patternBytes(bytes, 8 * index);
    data.resize(8, 0xFF);
    const std::string address = wireBits(static_cast<std::uint32_t>(8 * index), 24);
    const std::string frame = gaps ? kPageProgram + "00" + address + "000000" + wireBytes(data) + "00000000"
                                   : kPageProgram + address + wireBytes(data);
    return concat({writeEnable(), {loading("page program"), "shift 0 " + frame, "wait 0"}, after});
}
Lines verifyRead(std::size_t index, std::size_t bytes = 8) {
    return pageRead("read ", 8 * index, wireBytes(patternBytes(bytes, 8 * index)));
}

TEST_P(Memory, Program) {
    const Lines x1 = {"'0': Programming Flash.\n", "'0':Programming in x1 mode.\n"};
    const Lines x4Status = {x1[0], "'0':Programming in x4 mode.\n"};
    const Lines verified = {"'0': Reading device contents...\n", "done.\n", "'0': Verification completed.\n"};
    const Lines onePage = concat({page(0), writeDisable()});
    const Lines x4Page = concat({page(0), quadEnableWrite(0x00, 0x02, true), writeDisable()});
    const Properties x4 = {{"X4_READ", "TRUE"}}, unlock = {{"USE_UNLOCKSR", "TRUE"}};
    const Lines both = {"-e", "-v"};  // refused before any scan: no unlock, no erase, no verify
    const Properties gaps = {{"PAGE_ADDRESS_START_INDEX", "10"}, {"DATA_START_INDEX", "40"},
                             {"TOTAL_SHIFT_SIZE", "112"}};
    const std::string tooLarge = " bits) are larger than the device (256 bits).\n";
    const Row rows[] = {
        {.name = "cable", .stream = concat({page(0, concat({{"wait 700"}, busyPoll(70), kIdlePoll})), writeDisable()}),
         .script = {.busyReads = 1}, .status = x1, .dataBytes = 8},
        {.name = "polling switched off", .stream = concat({page(0, {"wait 700", "isCancelled 2"}), writeDisable()}),
         .script = {.busyReads = 1}, .status = x1, .dataBytes = 8, .noPolling = true},
        {.name = "file mode", .stream = onePage, .script = kFile, .status = x1, .dataBytes = 8},
        // Fields at their start indices, gap bits 0; a short last chunk fills the
        // page from the reader's padded buffer; the reader's addresses play no part.
        {.name = "gaps, short last chunk",
         .stream = concat({page(0, kFilePage, 8, true), page(1, kFilePage, 8, true), page(2, kFilePage, 4, true),
                           writeDisable()}),
         .script = kFile, .changes = gaps, .status = x1, .dataBytes = 20, .base = 0x1000,
         .vectors = {{1, "1x112|0x112|0x112"}}},
        {.name = "whole flash", .stream = concat({page(0), page(1), page(2), page(3), writeDisable()}), .script = kFile,
         .status = x1, .dataBytes = 32},
        // USE_UNLOCKSR: program unlocks, and so does its erase (without its display) before the pages; the
        // verify comes after them.
        {.name = "unlock, -e -v",
         .stream =
             concat({kUnlock, kUnlock, eraseStart(300000000), writeDisable(), page(0), verifyRead(0), writeDisable()}),
         .script = kFile, .changes = unlock, .status = concat({{"'0': Erasing Device.\n", x1[0]}, verified, {x1[1]}}),
         .tokens = both, .dataBytes = 8},
        {.name = "empty data", .stream = writeDisable(), .status = concat({{x1[0]}, verified, {x1[1]}}),
         .tokens = {"-verify"}, .dataBytes = 0},
        // x4 needs X4_READ and a data width of 4, from attribute 80 before the CIF reader.
        {.name = "attribute 4", .run = programWidth("4", 0), .stream = x4Page, .script = kFile, .changes = x4,
         .status = x4Status, .dataBytes = 8},
        {.name = "attribute 4 without X4_READ", .run = programWidth("4", 0), .stream = onePage, .script = kFile,
         .status = x1, .dataBytes = 8},
        {.name = "CIF 4", .run = programWidth(nullptr, 4), .stream = x4Page, .script = kFile, .changes = x4,
         .status = x4Status, .dataBytes = 8},
        {.name = "CIF 1", .run = programWidth(nullptr, 1), .stream = onePage, .script = kFile, .changes = x4,
         .status = x1, .dataBytes = 8},
        {.name = "attribute 1 before CIF 4", .run = programWidth("1", 4), .stream = onePage, .script = kFile,
         .changes = x4, .status = x1, .dataBytes = 8},
        {.name = "failed Quad Enable write", .run = programWidth("4", 0), .result = 0, .stream = x4Page,
         .script = {.fileMode = true, .failWaits = {3}}, .changes = x4, .status = x4Status, .dataBytes = 8},
        {.name = "no data", .result = 0, .stream = kNoScan, .changes = unlock,
         .info = {"'0':Programming terminated, Please assign a configuration Bitstream before attempting this "
                  "operation\n"},
         .tokens = both},
        {.name = "data one byte over", .result = 0, .stream = kNoScan, .changes = unlock,
         .errors = {"'0': The configuration data (264" + tooLarge}, .tokens = both, .dataBytes = 33},
        {.name = "data size at the top of its range", .result = 0, .stream = kNoScan, .changes = unlock,
         .errors = {"'0': The configuration data (4294967295" + tooLarge}, .tokens = both, .dataBytes = 8,
         .reportedBits = 0xFFFFFFFFu},
        {.name = "PAGE_SIZE 4", .result = 0, .stream = kNoScan,
         .changes = {{"USE_UNLOCKSR", "TRUE"}, {"PAGE_SIZE", "4"}},
         .errors = {"'0': Programming terminated, PAGE_SIZE (4 bits) is smaller than one byte.\n"}, .tokens = both,
         .dataBytes = 8},
        // A page busy past PROGRAM_MAXWAITTIME ends the run: no further page, no x1/x4 step.
        {.name = "time-out", .result = 0,
         .stream = concat({page(0, concat({{"wait 700"}, repeat(busyPoll(70), 3)})), writeDisable()}),
         .script = {.busyReads = 99}, .changes = {{"PROGRAM_MAXWAITTIME", "140"}}, .status = {x1[0]},
         .errors = {"'0': Device has exceeded the allocated time.\n"}, .dataBytes = 16},
        // A page the port could not send ends the run at once, naming it.
        {.name = "page not sent", .result = 0, .stream = concat({page(0, {"wait 700"}), writeDisable()}),
         .script = {.failShifts = {2}}, .status = {x1[0]},
         .errors = {"'0': Programming terminated, the page at address 0x0 could not be sent to the device.\n"},
         .dataBytes = 16},
        {.name = "second page's wait failed", .result = 0,
         .stream = concat({page(0, concat({{"wait 700"}, kIdlePoll})), page(1, {"wait 700"}), writeDisable()}),
         .script = {.failWaits = {4}}, .status = {x1[0]},
         .errors = {"'0': Programming terminated, the page at address 0x8 could not be sent to the device.\n"},
         .dataBytes = 16},
        // A lost cable ends the polling, and the run, at once.
        {.name = "lost cable while polling", .result = 0,
         .stream = concat({page(0, concat({{"wait 700"}, statusRead()})), writeDisable()}),
         .script = {.failShifts = {3}, .failureLosesCable = true}, .status = {x1[0]},
         .errors = {"'0': Programming terminated at address 0x0, the connection to the device was lost.\n"},
         .dataBytes = 16},
        // A cancel while a page is still busy: cancelled, not timed out.
        {.name = "cancel while polling", .result = 0,
         .stream = concat({page(0, concat({{"wait 700"}, busyPoll(70)})), writeDisable()}),
         .script = {.cancelFrom = 1, .busyReads = 99}, .status = {x1[0], "'0': Programming cancelled.\n"},
         .dataBytes = 16},
        // A failed erase: no page is written over what it left.
        {.name = "failed erase", .result = 0,
         .stream = concat({eraseStart(40000000), repeat(busyPoll(4000000), 3), writeDisable()}),
         .script = {.busyReads = 99},
         .changes = {{"BULKERASE_MAXWAITTIME", "8000000"}}, .status = {"'0': Erasing Device.\n"},
         .errors = {"'0': Erase did not complete.\n",
                    "'0': Programming terminated, the erase did not complete; no page was written.\n"},
         .tokens = {"-e"}, .dataBytes = 16},
        // A cancel between pages: no further page, no verify, no x4 step, but the write disable.
        {.name = "cancel", .run = programWidth("4", 0), .result = 0, .stream = onePage,
         .script = {.fileMode = true, .cancelFrom = 1}, .changes = x4,
         .status = {x1[0], "'0': Programming cancelled.\n"}, .tokens = {"-v"}, .dataBytes = 24},
    };
    for (const Row& row : rows) check(row, [](auto& d, auto* args) { return int(d.program(0, args)); });
}

// Block programming in file mode: nothing can be read, so every block the
// data touch is erased (with its longest wait), only where "-wholeblocks"
// accepts it for blocks covered in part, and only the pages holding data
// are written; "-v" records reads that compare with what each block should
// hold. The tiny part gets 16-byte sectors and 32-byte blocks.
TEST_P(Memory, ProgramBlocks) {
    const Properties blocks = {{"SECTOR_SIZE", "16"}, {"SECTORERASE_MAXWAITTIME", "600"},
                               {"BLOCKERASE32_INSTRUCTION", "01010010"}, {"BLOCKERASE32_SIZE", "32"},
                               {"BLOCKERASE32_WAITTIME", "120"}, {"BLOCKERASE32_MAXWAITTIME", "2400"}};
    const Lines erase32 = concat({writeEnable(), {loading("block erase"), "shift 0 01010010" + std::string(24, '0'),
                                                  "wait 2400"}});
    const Lines written = concat({erase32, page(0), page(1), page(2, kFilePage, 4)});
    Lines verified = written;
    for (std::size_t p = 0; p < 4; ++p) {
        Bytes expected = p < 2 ? patternBytes(8, 8 * p) : p == 2 ? patternBytes(4, 16) : Bytes{};
        expected.resize(8, 0xFF);
        const Lines read = pageRead("read", 8 * p, wireBytes(expected));
        verified.insert(verified.end(), read.begin(), read.end() - 1);  // no cancel query between reads
    }
    const std::string start = "'0': Programming Flash.\n", x1 = "'0':Programming in x1 mode.\n";
    auto run = [](auto& d, auto* args) { return int(d.programBlocks(0, args)); };
    const Row rows[] = {
        {.name = "20 bytes: one 32-byte block, three pages", .run = run, .stream = concat({written, writeDisable()}),
         .script = kFile, .changes = blocks,
         .status = {start, "'0': 1 block erased, 3 pages written, 0 blocks held the data already.\n", x1},
         .tokens = {"-wholeblocks"}, .dataBytes = 20},
        // The rest of a block the data cover in part cannot be read to keep it.
        {.name = "a block covered in part", .run = run, .result = 0, .stream = kNoScan, .script = kFile,
         .changes = blocks,
         .errors = {"'0': Programming terminated, the data cover the block at address 0x10 only in part, and a "
                    "recording cannot read the rest of it to keep it.\n"},
         .dataBytes = 20},
        {.name = "-v records reads that compare", .run = run, .stream = concat({verified, writeDisable()}),
         .script = kFile, .changes = blocks,
         .status = {start, "'0': 1 block erased, 3 pages written, 0 blocks held the data already.\n",
                    "'0': Verification completed.\n", x1},
         .tokens = {"-v", "-wholeblocks"}, .dataBytes = 20},
        {.name = "no erase smaller than the chip", .run = run, .result = 0, .stream = kNoScan, .script = kFile,
         .changes = {{"SECTOR_SIZE", kAbsent}},
         .errors = {"'0': Programming terminated, the part names no erase smaller than the chip "
                    "(SECTORERASE_INSTRUCTION and SECTOR_SIZE); erase the whole chip instead.\n"},
         .dataBytes = 20},
    };
    for (const Row& row : rows) check(row);
}

// Verify reads the data's range page by page from address 0 and stops at
// the first page that differs; checksum reads it all and hands both sides to
// the checksum accumulator.
TEST_P(Memory, VerifyAndChecksum) {
    const std::string reading = "'0': Reading device contents...\n";
    const Lines completed = {reading, "done.\n", "'0': Verification completed.\n"}, sums = {reading, "done.\n", kSums};
    const Lines threePages = concat({verifyRead(0), verifyRead(1), verifyRead(2, 4)});
    const std::string noData =
        " terminated, please assign a configuration Bitstream before attempting this operation.\n";
    const std::string pageSize = " terminated, PAGE_SIZE (0 bits) is smaller than one byte.\n";
    const Properties zeroPage = {{"PAGE_SIZE", "0"}};
    const Row rows[] = {
        // 2.5 pages; the short last page is compared as far as the data go (the flash differs after).
        {.name = "three pages", .stream = threePages, .status = completed, .dataBytes = 20, .flip = 21, .base = 0x400,
         .vectors = {{0, "1x32|0x32|0x32"}, {1, "1x64|" + wireBytes(patternBytes(8)) + "|1x64"}}},
        {.name = "stops at the first difference with the reader's address", .result = 0,
         .stream = withoutLast(concat({verifyRead(0), verifyRead(1)})), .changes = kShort,
         .status = {reading, "Failed at address, 264\n", "'0': Verification Terminated\n"}, .dataBytes = 24,
         .flip = 12, .base = 0x100},
        {.name = "cancel with data left", .result = 0, .stream = verifyRead(0), .script = {.cancelFrom = 1},
         .status = {reading, "done.\n", "'0': Verification cancelled.\n"}, .dataBytes = 20},
        {.name = "cancel after the last page", .stream = verifyRead(0), .script = {.cancelFrom = 1},
         .status = completed, .dataBytes = 8},
        {.name = "stand-alone, empty data", .stream = kDisplay, .changes = kShort,
         .status = concat({completed, {kContents}}), .dataBytes = 0},
        {.name = "-v leaves the display to program", .stream = kNoScan, .changes = kShort, .status = completed,
         .tokens = {"-v"}, .dataBytes = 0},
        {.name = "null name", .run = verifyNamed(nullptr), .stream = kNoScan, .status = completed, .dataBytes = 0},
        {.name = "'checksum'", .run = verifyNamed("checksum"), .stream = kNoScan, .status = sums, .dataBytes = 0},
        {.name = "checksum, matching", .run = checksum, .stream = threePages, .status = sums, .dataBytes = 20},
        {.name = "checksum, differing", .run = checksum, .result = 0, .status = sums,
         .errors = {"'0': Checksums differ.\n"}, .dataBytes = 20, .flip = 3},
        {.name = "checksum, empty data", .run = checksum, .stream = kNoScan, .status = sums, .dataBytes = 0},
        // The capture starts as a copy of the file's page: a page that was
        // not read ends the run with its address, no "done.", no verdict.
        {.name = "verify, failed read", .result = 0, .stream = concat({verifyRead(0), withoutLast(verifyRead(1))}),
         .script = {.failShifts = {4}}, .status = {reading},
         .errors = {"'0': Verification terminated, the page at address 0x108 could not be read.\n"}, .dataBytes = 20,
         .base = 0x100},
        {.name = "checksum, failed read", .run = checksum, .result = 0, .stream = withoutLast(verifyRead(0)),
         .script = {.failShifts = {1}}, .status = {reading},
         .errors = {"'0': Checksum terminated, the page at address 0x0 could not be read.\n"}, .dataBytes = 20},
        // A cancelled checksum covers part of the range: no sums.
        {.name = "checksum cancelled", .run = checksum, .result = 0, .stream = verifyRead(0),
         .script = {.cancelFrom = 1}, .status = {reading, "done.\n", "'0': Checksum cancelled.\n"}, .dataBytes = 20},
        {.name = "verify without data", .result = 0, .stream = kNoScan, .changes = kShort,
         .info = {"'0': Verification" + noData}},
        {.name = "verify, PAGE_SIZE 0", .result = 0, .stream = kNoScan, .changes = zeroPage,
         .errors = {"'0': Verification" + pageSize}, .dataBytes = 8},
    };
    for (const Row& row : rows) check(row, [](auto& d, auto* args) { return int(d.verify(0, args)); });
}

// Blank check: the whole flash, page by page; the verdict in attribute 28,
// given only when the check reached one.
Lines blankReads(int pages) {
    Lines out = writeEnable();
    for (std::size_t p = 0; p < static_cast<std::size_t>(pages); ++p)
        out = concat({out, pageRead("read", 8 * p, std::string(64, '1'))});
    return out;
}

TEST_P(Memory, BlankCheck) {
    const std::string start = "'0': Performing blank check on device...\n";
    const Lines blank = {start, "'0': Part is blank.\n"};
    const Lines notBlank = {start, "Failed at address, 16\n", "'0': Part is not blank.\n"};
    const Row rows[] = {
        {.name = "erased", .stream = blankReads(4), .status = blank, .value = "TRUE",
         .vectors = {{1, "1x32|0x32|0x32"}, {2, "1x64|1x64|1x64"}}},
        {.name = "a zero bit in the third page", .stream = withoutLast(blankReads(3)), .status = notBlank,
         .flip = 21, .value = "FALSE"},
        // A page that was not read ends the check without a verdict: its
        // capture still holds the ones it started with.
        {.name = "failed read command", .result = 0, .stream = withoutLast(blankReads(1)),
         .script = {.failShifts = {2}}, .status = {start},
         .errors = {"'0': Blank check terminated, the page at address 0x0 could not be read.\n"}},
        {.name = "failed capture of the second page", .result = 0, .stream = withoutLast(blankReads(2)),
         .script = {.failShifts = {5}}, .status = {start},
         .errors = {"'0': Blank check terminated, the page at address 0x8 could not be read.\n"}},
        // A failed write enable does not hide a verdict the reads reached.
        {.name = "not blank after a failed write enable", .result = 0, .stream = withoutLast(blankReads(3)),
         .script = {.failShifts = {1}}, .status = notBlank, .flip = 21, .value = "FALSE"},
        {.name = "cancel after the first page", .result = 0, .stream = blankReads(1), .script = {.cancelFrom = 1},
         .status = {start, "'0': Blank check cancelled.\n"}},
        {.name = "cancel after the last page", .stream = blankReads(4), .script = {.cancelFrom = 4}, .status = blank,
         .value = "TRUE"},
        {.name = "PAGE_SIZE 7", .result = 0, .stream = kNoScan, .changes = {{"PAGE_SIZE", "7"}},
         .errors = {"'0': Blank check terminated, PAGE_SIZE (7 bits) is smaller than one byte.\n"}},
    };
    for (const Row& row : rows) check(row, [](auto& d, auto* args) { return int(d.blankCheck(0, args)); });
}

// Readback: every page to the writer at its byte offset, as captured (the
// pattern data are the flash here); each data shift sends out the page
// before it. What counts as a success: the pages read are in the file
// whatever happened. Refusals come before any scan.
TEST_P(Memory, Readback) {
    const std::string start = "'0': Performing readback on device...\n";
    const Lines done = {start, "'0': Reaback completed successfully.\n"}, out = {"-f", "out.memtest"};
    const Lines noName = {"'0': No file name specified...\n", "'0': Readback terminated\n"};
    const Properties empty = {{"DEVICE_SIZE", "0"}};
    const std::string zeros64(64, '0');
    Lines whole = concat({writeEnable(), {"comment //Performing readback.\n"}});
    for (std::size_t n = 0; n < 4; ++n)
        whole = concat({whole, pageRead("read", 8 * n, n ? wireBytes(patternBytes(8, 8 * n - 8)) : zeros64)});
    const Row rows[] = {
        {.name = "whole flash", .stream = whole, .status = done, .tokens = out, .dataBytes = 32, .pages = 4,
         .vectors = {{2, "1x64|0x64|1x64"}}},
        {.name = "empty device", .changes = empty, .status = done, .tokens = out, .pages = 0},
        {.name = "-f before -file", .changes = empty, .status = done,
         .tokens = {"-file", "long.memtest", "-f", "short.memtest"}, .pages = 0, .fileName = "short.memtest"},
        {"no switches", [](auto& d, auto*) { return int(d.readbackToFile(0, nullptr)); }, 0, kNoScan,
         {}, {}, noName},
        {.name = "-f alone", .result = 0, .stream = kNoScan, .status = noName, .tokens = {"-f"}},
        {.name = "file cannot be written", .result = 0, .stream = kNoScan,
         .errors = {"'0': Readback terminated, the file 'locked.nowrite' cannot be written.\n"},
         .tokens = {"-f", "locked.nowrite"}},
        {.name = "PAGE_SIZE 0", .result = 0, .stream = kNoScan, .changes = {{"PAGE_SIZE", "0"}},
         .errors = {"'0': Readback terminated, PAGE_SIZE (0 bits) is smaller than one byte.\n"}, .tokens = out},
        // A page that was not read ends the readback: it would go into the
        // file as a copy of the page before it.
        {.name = "failed read", .result = 0, .script = {.failShifts = {5}}, .status = {start},
         .errors = {"'0': Readback terminated, the page at address 0x8 could not be read.\n"}, .tokens = out,
         .pages = 1},
        {.name = "failed write enable", .result = 0, .script = {.failShifts = {1}}, .status = {start},
         .errors = {"'0': Readback failed, a scan to the device did not succeed.\n"}, .tokens = out, .pages = 4},
        {.name = "cancel after the first page", .result = 0, .script = {.cancelFrom = 1},
         .status = {start, "'0': Readback cancelled.\n"}, .tokens = out, .pages = 1},
        {.name = "cancel after the last page", .script = {.cancelFrom = 4}, .status = done, .tokens = out, .pages = 4},
        {.name = "failed file write", .result = 0, .status = {start},
         .errors = {"'0': Readback failed, the file 'out.memtest' could not be written.\n"}, .tokens = out, .pages = 4,
         .failWrite = true},
    };
    for (const Row& row : rows) check(row, [](auto& d, auto* args) { return int(d.readbackToFile(0, args)); });
}

// Progress steps per operation name; never a scan, a message or a division
// by zero. The tiny part: 4 pages; erase (300000000 - 40000000) / 2000000 =
// 130 steps; 20 bytes of data are one 96-bit frame.
TEST_P(Memory, ProgressCounts) {
    const struct {
        const char* operation;
        Lines tokens;
        int expected;
        Properties changes = {};
        bool withData = true;
    } cases[] = {
        {"program", {}, 1}, {"program", {"-e", "-v"}, 1 + 130 + 4}, {"PROGRAM", {"-erase", "-verify"}, 1 + 130 + 4},
        {"program", {"-e"}, 130, {}, false}, {"program", {"-v"}, 4, {{"TOTAL_SHIFT_SIZE", "0"}}}, {"verify", {}, 4},
        {"erase", {}, 130}, {"BlankCheck", {}, 4}, {"readbacktofile", {}, 4}, {"checksum", {}, 0}, {nullptr, {}, 0},
        {"blankcheck", {}, 1, {{"DEVICE_SIZE", "100"}}}, {"erase", {}, 0, {{"PROGRESS_ERASE_WAITTIME_INC", "0"}}},
        {"readbacktofile", {}, 0, {{"PAGE_SIZE", "0"}}}, {"verify", {}, 0, {{"PAGE_SIZE", "-64"}}},
        // The erase pair is (BULKERASE_WAITTIME, BULKERASE_MAXWAITTIME); a
        // limit below the first wait gives a negative term, which still adds.
        {"program", {"-e"}, 1 - 7,
         {{"BULKERASE_WAITTIME", "25"}, {"BULKERASE_MAXWAITTIME", "10"}, {"PROGRESS_ERASE_WAITTIME_INC", "2"}}},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(std::string(c.operation ? c.operation : "null") + " " + std::to_string(c.expected));
        auto device = makeDevice(c.changes);
        MemoryImage image(patternBytes(20));
        if (c.withData) device->setConfigData(&image);
        UT_CMDARGS args(c.tokens);
        EXPECT_EQ(device->getOperationProgressCount(c.operation, c.tokens.empty() ? nullptr : &args), c.expected);
    }
    EXPECT_TRUE(port.events.empty());
    EXPECT_TRUE(sink.messages().empty());
}

INSTANTIATE_TEST_SUITE_P(Plugin, Memory, ::testing::Bool(), asMadeOrCopied);

}  // namespace
}  // namespace vorant::test::plugin
