// The device's configuration, the SPI command layer, identification and the
// status registers, as the scan port and the user see them.

#include "PluginTestSupport.h"

namespace vorant::test::plugin {
namespace {

using Frame = PluginTest;

TEST_P(Frame, NewDeviceReadsTheEnvironmentAtConstruction) {
    setenv("QRX_VORANT_SKIPIDCODECHECK", "", 1);  // defined, even empty, counts
    setenv("QRX_VORANT_ENV_DONT_USE_POLLING", "0", 1);
    auto configured = makeDevice();  // makeDevice clears the environment right after construction
    EXPECT_TRUE(configured->skipIdCheck());
    EXPECT_FALSE(configured->usesPolling());

    // Copy assignment carries a run's x4 decision too (the tables carry the rest).
    auto x4 = makeDevice({{"X4_READ", "TRUE"}}, false, false, "X4");
    MemoryImage image(patternBytes(8));
    x4->setConfigData(&image);
    x4->setAttribute(DeviceNS::ATTR_DATA_WIDTH, "4", true);
    ASSERT_TRUE(x4->program(0, nullptr));
    EXPECT_FALSE(configured->x4Programming());
    *configured = *x4;
    EXPECT_TRUE(configured->x4Programming());
}

int enable(Type1SPIDevice& d, UT_CMDARGS*) { return d.spienable(0, nullptr); }
int disable(Type1SPIDevice& d, UT_CMDARGS*) { return d.spidisable(0, nullptr); }
int release(Type1SPIDevice& d, UT_CMDARGS*) { return d.releaseFromStandBy(0, nullptr); }
int unlock(Type1SPIDevice& d, UT_CMDARGS*) { return d.unlockStatusRegister(0, nullptr); }
Operation bit(const char* name) { return [=](auto& d, auto*) { return int(d.readStatus(0, name)); }; }
Operation poll(int maxWait, int step) { return [=](auto& d, auto*) { return int(d.checkStatus(0, maxWait, step)); }; }
Operation quadEnable(bool set) { return [=](auto& d, auto*) { return int(d.writeQuadEnableBit(0, nullptr, set)); }; }

// Write enable and disable, release, the status read (0: not set, 1: WIP,
// 2: WEL) and its polling, the unlock and the Quad Enable write.
TEST_P(Frame, CommandLayer) {
    const Lines read = statusRead(), release5 = {loading("read sig"), "shift 0 " + kReadSignature, "wait 5"};
    const Lines unlocked = statusWrite(2, "00000000"), both = concat({read, statusRead(kReadStatus2)});
    const Row rows[] = {
        {"write enable", enable, 1, writeEnable()},
        {"write disable", disable, 1, writeDisable()},
        {"a 9-bit enable fails with its shift", enable, 0, Lines{loading("write enable"), "shiftWrite 0 000001101"},
         {.fileMode = true, .failShifts = {1}}, {{"ENABLE_INSTRUCTION", "000001101"}}},
        {.name = "release", .run = release, .stream = release5, .vectors = {{0, "1x8|0x8|0x8"}}},
        {"release waits after a failed shift", release, 0, release5, {.failShifts = {1}}},
        {"release, failed wait", release, 0, release5, {.failWaits = {1}}},
        // WIP (status bit 0) is the last bit captured.
        {.name = "wip of 0x01", .run = bit("wip"), .stream = read, .script = {.status1 = 0x01},
         .vectors = {{0, "1x8|0x8|0x8"}, {1, "1x8|0x8|1x8"}}},
        {"Wel of 0x02", bit("Wel"), 2, read, {.status1 = 0x02}},
        {"wel of 0xFD", bit("wel"), 0, read, {.status1 = 0xFD}},
        {"'wip ' of 0x03", bit("wip "), 0, read, {.status1 = 0x03}},
        // A read that failed tells nothing: the flash counts as busy, and
        // its latch is not known to be set.
        {"wip of a failed read", bit("wip"), 1, read, {.failShifts = {2}}},
        {"wel of a failed read", bit("wel"), 0, read, {.failShifts = {1}, .status1 = 0x02}},
        {"polling goes on past a failed read", poll(10, 5), 1, concat({busyPoll(5), read}), {.failShifts = {2}}},
        {"polling, a failed read to the end", poll(10, 5), 0, repeat(busyPoll(5), 3), {.failShifts = {1, 3, 5}}},
        // A lost cable ends the polling at its first failed read.
        {"polling, lost cable", poll(1000, 5), 0, read, {.failShifts = {1}, .failureLosesCable = true}},
        {"polling, limit 0, idle", poll(0, 5), 1, read},
        {"polling, limit 0, busy", poll(0, 5), 0, busyPoll(5), {.busyReads = 99}},
        {"polling 10/5, busy", poll(10, 5), 0, repeat(busyPoll(5), 3), {.busyReads = 99}},
        {"polling 10/5, idle at last", poll(10, 5), 1, concat({repeat(busyPoll(5), 2), read}), {.busyReads = 2}},
        {"polling, waits adding up to the limit", poll(10, 10), 1, concat({busyPoll(10), read}), {.busyReads = 1}},
        {"polling, negative limit", poll(-1, 5), 0, Lines{}, {.busyReads = 99}},
        {"polling, cancel", poll(1000, 5), 0, repeat(busyPoll(5), 2), {.cancelFrom = 2, .busyReads = 99}},
        // INSTRUCTION_LENGTH zero bits left open after 'write SR'; the wait closes the transaction.
        {"unlock", unlock, 1, unlocked},
        {"unlock, 0 bits", unlock, 1, statusWrite(2, ""), {}, {{"INSTRUCTION_LENGTH", "0"}}},
        {"unlock, -4 bits", unlock, 1, statusWrite(2, ""), {}, {{"INSTRUCTION_LENGTH", "-4"}}},
        {"unlock, failed write SR", unlock, 0, unlocked, {.failShifts = {2}}},
        {"Quad Enable set, raw 0x00 -> 0x40", quadEnable(true), 1, quadEnableWrite(0x00, 0x02, false)},
        {"Quad Enable clear, raw 0xFF -> 0xBF", quadEnable(false), 1, quadEnableWrite(0x9C, 0xFD, false),
         {.status1 = 0x9C, .status2 = 0xFF}},
        // Register 2 compared under the cached byte: every bit but Quad Enable.
        {.name = "Quad Enable in file mode", .run = quadEnable(true), .stream = quadEnableWrite(0x00, 0x02, true),
         .script = {.fileMode = true}, .vectors = {{1, "1x8|0x8|1x8"}, {3, "1x8|0x8|11111101"}}},
        {"Quad Enable, register 1 unread", quadEnable(true), 0, read, {.failShifts = {2}}},
        {"Quad Enable, register 2 unread", quadEnable(true), 0, both, {.failShifts = {3}}},
        {"Quad Enable, 15-bit register", quadEnable(true), 0, Lines{}, {}, {{"STATUS_REGISTER_LENGTH", "15"}}},
        {"Quad Enable, 8-bit register in file mode", quadEnable(false), 0, Lines{}, {.fileMode = true},
         {{"STATUS_REGISTER_LENGTH", "8"}}},
    };
    for (const Row& row : rows) check(row);
}

// What the check says: the ID read, a failed read, the verdict.
Lines said(const std::string& id, bool passes) {
    return {"'0': IDCODE is '" + id + "' (in hex).\n", passes ? "'0': ID Check passed.\n " : "'0': ID Check failed.\n"};
}
// A read that failed shows no ID at all: the capture holds only what it was
// preloaded with.
Lines unread(const std::string& what) {
    return {"'0': " + what + " could not be read.\n", "Read ID Code failed.\n ", "'0': ID Check failed.\n"};
}

// validateInstance: one read-ID scan to compensate, then the ID or signature
// read and the check. A failed read fails the check even when the capture
// holds the expected ID, and shows no ID. A flag is set by "TRUE" in any letter case only.
TEST_P(Frame, Identification) {
    const Lines compensation = {loading("read id"), "shift 0 " + kReadId};
    const Lines id = concat({compensation, {loading("read id"), "shift 0 " + kReadId, "shift 1 " + kReadId,
                                            "shift 12 " + std::string(24, '1')}});
    const Lines sig = concat({compensation, {loading("read sig"), "shift 1 " + kReadSignature,
                                             "shift 2 " + std::string(24, '1'), "shift 12 11111111", "wait 5"}});
    const Lines failed = {"The operation did not complete successfully.\n"};
    const Properties res = {{"USE_RES", "TRUE"}, {"IDCODE", "14"}};
    const Row rows[] = {
        // IDCODE as the expected bits: "EF4018" is EF 40 18, each MSB first.
        {.name = "ID", .stream = id, .status = said("EF4018", true),
         .vectors = {{1, "1x8|0x8|0x8"}, {2, "1x8|0x8|0x8"}, {3, "1x24|" + wireBits(0xEF4018, 24) + "|1x24"}}},
        {"lower-case IDCODE", {}, 1, id, {}, {{"IDCODE", "ef4018"}}, said("EF4018", true)},
        {.name = "other ID", .result = 0, .stream = id, .status = said("EF4017", false), .info = failed,
         .flashId = 0xEF4017},
        {.name = "bit order", .result = 0, .stream = id, .changes = {{"IDCODE", "000001"}},
         .status = said("800000", false), .info = failed, .flashId = 0x800000},
        {"failed ID capture", {}, 0, id, {.failShifts = {4}}, {}, unread("IDCODE"), {}, failed},
        {.name = "signature", .stream = sig, .changes = res, .status = said("14", true),
         .vectors = {{1, "1x8|0x8|0x8"}, {2, "1x24|0x24|0x24"}, {3, "1x8|00010100|1x8"}}},
        {"USE_RES 'tRuE'", {}, 1, sig, {}, {{"USE_RES", "tRuE"}, {"IDCODE", "14"}}, said("14", true)},
        {.name = "other signature", .result = 0, .stream = sig, .changes = res, .status = said("13", false),
         .info = failed, .signature = 0x13},
        {"failed signature wait", {}, 0, sig, {.failWaits = {1}}, res, unread("Electronic signature"), {}, failed},
        {.name = "skipped", .stream = compensation, .status = {"'0': Idcode check skipped.\n"}, .skipId = true},
    };
    for (Row row : rows) {
        // The attribute holds the ID the check shows, empty after a failed
        // read, nothing when the check was skipped.
        const bool shown = row.status[0].rfind("'0': IDCODE is '", 0) == 0;
        const std::string text = shown ? row.status[0].substr(16, row.status[0].find('\'', 16) - 16) : "";
        row.value = row.skipId ? nullptr : text.c_str();
        row.attribute = DeviceNS::ATTR_IDCODE;
        check(row, [](auto& d, auto*) { return int(d.validateInstance(0)); });
    }
}

// The contents line, then a line per labelled status bit from bit
// STATUS_REGISTER_LENGTH - 1 down ("LABEL=bit ..."), as "%-50s:%10d\n".
Lines shown(const std::string& contents, const char* bits) {
    Lines out = {"TINY Status Register Contents = " + contents + ".\n"};
    std::istringstream in(bits);
    for (std::string entry; in >> entry;) {
        char line[96];
        const std::size_t equals = entry.find('=');
        std::snprintf(line, sizeof line, "%-50s:%10d\n", entry.substr(0, equals).c_str(), entry[equals + 1] - '0');
        out.push_back(line);
    }
    return out;
}

TEST_P(Frame, StatusRegisterDisplay) {
    const Lines both = concat({statusRead(kReadStatus1), statusRead(kReadStatus2)}), zeros = shown("0x0000", "");
    const Properties none = {{"STATUS_REGISTER_LENGTH", "0"}};
    const Row rows[] = {
        // The raw bytes read are the registers bit-reversed: status bit 0 is storage bit 7.
        {.name = "16 bits, bit 10 NOT_VALID", .stream = both, .script = {.status1 = 0x9C, .status2 = 0x42},
         .status = shown("0x429C", "SUS=0 CMP=1 LB3=0 LB2=0 LB1=0 QE=1 SRL=0 SRP=1 SEC=0 TB=0 BP2=1 BP1=1 BP0=1 "
                                   "WEL=0 BUSY=0"),
         .debug = {"Status Register Read Instruction = 00000101, Contents =  0x39.\n",
                   "Status Register Read Instruction = 00110101, Contents =  0x42.\n"}},
        {"8 bits show register 2", {}, 1, both, {.status1 = 0xFF, .status2 = 0x82}, {{"STATUS_REGISTER_LENGTH", "8"}},
         shown("0x82FF", "SRP=1 SEC=0 TB=0 BP2=0 BP1=0 BP0=0 WEL=1 BUSY=0")},
        {"lines past the sixteenth show 0", {}, 1, both, {.status1 = 0xFF, .status2 = 0xFF},
         {{"STATUS_REGISTER_LENGTH", "18"}, {"STATUS_LOCATION_16", "EXTRA16"}, {"STATUS_LOCATION_17", "EXTRA17"}},
         shown("0xFFFF", "EXTRA17=1 EXTRA16=1 SUS=1 CMP=1 LB3=1 LB2=1 LB1=1 QE=1 SRL=1 SRP=1 SEC=1 TB=1 BP2=1 "
                         "BP1=1 BP0=1 WEL=0 BUSY=0")},
        // The lookup of a missing label throws: that line alone is skipped.
        {"missing label, hidden label in any case", {}, 1, both, {.status1 = 0x10},
         {{"STATUS_LOCATION_11", "not_Valid"}, {"STATUS_LOCATION_5", kAbsent}},
         shown("0x0010", "SUS=0 CMP=0 LB3=0 LB2=0 QE=0 SRL=0 SRP=0 SEC=0 BP2=1 BP1=0 BP0=0 WEL=0 BUSY=0")},
        {"no length", {}, 1, both, {}, none, zeros},
        {"READ_STATUS_ENABLED 'TRUE '", {}, 1, Lines{}, {}, {{"READ_STATUS_ENABLED", "TRUE "}}},
        {"disabled", {}, 1, Lines{}, {}, {{"READ_STATUS_ENABLED", "FALSE"}}},
        {"file mode", {}, 1, Lines{}, {.fileMode = true}},
        {"register 2 unread", {}, 0, both, {.failShifts = {4}}, {}, {"'0': Error reading Status Register - 2.\n"}},
    };
    for (Row row : rows) {
        row.changes.emplace("READ_STATUS_ENABLED", "TRUE");
        // The host's device-status request is the display.
        check(row, [](auto& d, auto*) { return int(d.readDeviceStatus(0, nullptr)); });
    }
}

INSTANTIATE_TEST_SUITE_P(Plugin, Frame, ::testing::Bool(), asMadeOrCopied);

}  // namespace
}  // namespace vorant::test::plugin
