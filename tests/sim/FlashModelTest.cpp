// The flash model as a chip: commands driven byte by byte on the wire.

#include "ports/sim/FlashModel.h"
#include "tests/sim/SimTestSupport.h"

#include "host/VorantException.h"

#include <gtest/gtest.h>

#include <random>

namespace vorant::sim::test {
namespace {

constexpr std::uint8_t kWip = 0x01, kWel = 0x02;

// Every command that alters the array or the registers is ignored without
// the write enable latch.
TEST(FlashModel, CommandsNeedingTheLatchAreIgnoredWithoutIt) {
    struct Case {
        const char* name;
        Bytes command;
    };
    const Case cases[] = {
        {"page program", {0x02, 0x00, 0x01, 0x00, 0x12, 0x34}},
        {"sector erase", {0x20, 0x00, 0x00, 0x00}},
        {"bulk erase", {0xC7}},
        {"write status", {0x01, 0x1C, 0x02}},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        FlashModel chip(smallPart());
        chip.memory()[0] = 0x00;  // something an erase would change
        writeEnable(chip);
        spi(chip, {0x04});  // write disable clears the latch again
        transact(chip, c.command);
        EXPECT_FALSE(chip.busy());
        EXPECT_EQ(chip.status1(), 0x00);
        EXPECT_EQ(chip.status2(), 0x00);
        EXPECT_EQ(chip.memory()[0], 0x00);
        EXPECT_EQ(chip.memory()[0x100], 0xFF);
    }
}

TEST(FlashModel, ProgramClearsBitsOnlyAndIgnoresOnes) {
    FlashModel chip(smallPart());
    programPage(chip, 0x100, {0xF0, 0x0F, 0xAA});
    programPage(chip, 0x100, {0x3C, 0xFF, 0x55});
    EXPECT_EQ(readArray(chip, 0x100, 4), (Bytes{0x30, 0x0F, 0x00, 0xFF}));
}

TEST(FlashModel, PageProgramWrapsAtThePageEnd) {
    FlashModel chip(smallPart());
    programPage(chip, 0x1FE, {0x01, 0x02, 0x03, 0x04});
    EXPECT_EQ(readArray(chip, 0x1FE, 2), (Bytes{0x01, 0x02}));
    EXPECT_EQ(readArray(chip, 0x100, 3), (Bytes{0x03, 0x04, 0xFF}));
    EXPECT_EQ(chip.memory()[0x200], 0xFF) << "the next page is untouched";
}

TEST(FlashModel, MoreThanAPageOfDataKeepsTheLastBytesSent) {
    FlashModel chip(smallPart());
    Bytes data(256 + 2, 0xFF);
    data[0] = 0x00;    // overwritten in the page buffer by data[256]
    data[1] = 0x00;    // overwritten by data[257]
    data[2] = 0x5A;
    data[256] = 0xA1;
    data[257] = 0xFF;
    programPage(chip, 0x300, data);
    EXPECT_EQ(readArray(chip, 0x300, 3), (Bytes{0xA1, 0xFF, 0x5A}));
}

TEST(FlashModel, EraseCommandsSetTheirRangeToFF) {
    struct Case {
        const char* name;
        Bytes command;
        std::uint32_t first, end;  // erased range
    };
    const Case cases[] = {
        {"sector erase, address inside the sector", {0x20, 0x00, 0x12, 0x34}, 0x1000, 0x2000},
        {"bulk erase", {0xC7}, 0, 64 * 1024},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        FlashModel chip(smallPart());
        std::fill(chip.memory().begin(), chip.memory().end(), std::uint8_t{0x00});
        writeEnable(chip);
        transact(chip, c.command);
        EXPECT_TRUE(chip.busy());
        for (std::uint32_t a = 0; a < chip.memory().size(); ++a) {
            const std::uint8_t expected = (a >= c.first && a < c.end) ? 0xFF : 0x00;
            ASSERT_EQ(chip.memory()[a], expected) << "address " << a;
        }
    }
}

TEST(FlashModel, BlockProtectionMakesProgramAndEraseDoNothing) {
    const Bytes commands[] = {{0x02, 0x00, 0x00, 0x00, 0x00}, {0x20, 0x00, 0x00, 0x00}, {0xC7}};
    for (const Bytes& command : commands) {
        SCOPED_TRACE(static_cast<int>(command[0]));
        FlashModel chip(smallPart());
        chip.memory()[1] = 0x00;
        chip.setStatus(0x04, 0x00);  // BP0
        writeEnable(chip);
        transact(chip, command);
        EXPECT_FALSE(chip.busy());
        EXPECT_EQ(chip.memory()[0], 0xFF);
        EXPECT_EQ(chip.memory()[1], 0x00);
        EXPECT_EQ(readStatus1(chip), 0x04) << "the latch is reset, the protection stays";
    }
}

TEST(FlashModel, WhileBusyOnlyStatusReadsAnswer) {
    FlashModel chip(smallPart());
    chip.memory()[0] = 0x42;
    writeEnable(chip);
    pageProgram(chip, 0x100, {0x00});
    const std::uint64_t start = chip.now();
    ASSERT_TRUE(chip.busy());

    EXPECT_EQ(readStatus1(chip), kWip | kWel);
    EXPECT_EQ(spi(chip, {0x35}, 1)[0], 0x00) << "status register 2 reads while busy";
    EXPECT_EQ(readArray(chip, 0, 2), (Bytes{0xFF, 0xFF})) << "read ignored";
    EXPECT_EQ(spi(chip, {0x9F}, 3), (Bytes{0xFF, 0xFF, 0xFF})) << "ID read ignored";
    spi(chip, {0x04});  // write disable ignored
    EXPECT_EQ(readStatus1(chip), kWip | kWel);
    pageProgram(chip, 0x200, {0x00});  // ignored
    spi(chip, {0xB9});                 // deep power-down ignored
    EXPECT_FALSE(chip.inDeepPowerDown());

    chip.advance(start + us(700) - 1 - chip.now());
    EXPECT_TRUE(chip.busy());
    chip.advance(1);
    EXPECT_FALSE(chip.busy());
    EXPECT_EQ(readStatus1(chip), 0x00) << "WIP and WEL clear at completion";
    EXPECT_EQ(readArray(chip, 0, 1)[0], 0x42);
    EXPECT_EQ(chip.memory()[0x100], 0x00);
    EXPECT_EQ(chip.memory()[0x200], 0xFF);
}

TEST(FlashModel, BusyLastsExactlyTheConfiguredTime) {
    struct Case {
        const char* name;
        Bytes command;
        std::uint32_t busyUs;
    };
    const FlashConfig part = smallPart();
    const Case cases[] = {
        {"page program", {0x02, 0, 0, 0, 0x00}, part.pageProgramUs},
        {"sector erase", {0x20, 0, 0, 0}, part.sectorEraseUs},
        {"bulk erase", {0xC7}, part.bulkEraseUs},
        {"write status", {0x01, 0x00}, part.writeStatusUs},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        FlashModel chip(part);
        chip.setClockHz(1'000'000'000);  // 1 ns per bit keeps the arithmetic simple
        writeEnable(chip);
        chip.select();
        for (std::uint8_t b : c.command) chip.clockByte(b);
        chip.deselect();
        const std::uint64_t start = chip.now();
        EXPECT_EQ(chip.status1() & (kWip | kWel), kWip | kWel) << "the latch stays set while busy";
        chip.advance(us(c.busyUs) - 1);
        EXPECT_TRUE(chip.busy());
        chip.advance(1);
        EXPECT_FALSE(chip.busy());
        EXPECT_EQ(chip.status1() & (kWip | kWel), 0);
        EXPECT_EQ(chip.now() - start, us(c.busyUs));
    }
}

// A status read repeats the register and shows WIP live: the busy time
// can run out in the middle of one long read.
TEST(FlashModel, StatusReadRepeatsAndFollowsTheBusyBit) {
    FlashModel chip(smallPart());
    chip.setClockHz(1'000'000);  // 8 us per byte
    writeEnable(chip);
    pageProgram(chip, 0, {0x00});
    chip.select();
    chip.clockByte(0x05);
    int busyReads = 0;
    for (int i = 0; i < 200; ++i) {
        const std::uint8_t status = chip.clockByte(0x00);
        if (status & kWip) {
            ++busyReads;
            EXPECT_EQ(status, kWip | kWel);
        } else {
            EXPECT_EQ(status, 0x00);
        }
    }
    chip.deselect();
    EXPECT_GT(busyReads, 80);   // 700 us at 8 us per byte: about 87 reads
    EXPECT_LT(busyReads, 95);
}

TEST(FlashModel, DeepPowerDownIgnoresAllButRelease) {
    FlashModel chip(smallPart());
    chip.setClockHz(8'000'000);  // 1 us per byte
    spi(chip, {0xB9});
    ASSERT_TRUE(chip.inDeepPowerDown());
    EXPECT_EQ(spi(chip, {0x9F}, 3), (Bytes{0xFF, 0xFF, 0xFF}));
    EXPECT_EQ(readStatus1(chip), 0xFF);
    writeEnable(chip);
    EXPECT_FALSE(chip.writeEnabled());

    // The release answers the signature even before it wakes the chip.
    EXPECT_EQ(spi(chip, {0xAB, 0, 0, 0}, 2), (Bytes{0x13, 0x13}));
    EXPECT_TRUE(chip.inDeepPowerDown()) << "still waking up";
    EXPECT_EQ(spi(chip, {0x9F}, 1)[0], 0xFF) << "2 us after the release: 3 us not over";
    chip.advance(us(1));
    EXPECT_FALSE(chip.inDeepPowerDown());
    EXPECT_EQ(spi(chip, {0x9F}, 3), (Bytes{0xEF, 0x40, 0x10}));
}

TEST(FlashModel, DeepPowerDownNeedsACompleteOpcodeAlone) {
    FlashModel chip(smallPart());
    spi(chip, {0xB9, 0x00});  // a byte too many
    EXPECT_FALSE(chip.inDeepPowerDown());
    chip.select();
    for (int bit = 0; bit < 8; ++bit) chip.clockBit(((0xB9 >> (7 - bit)) & 1) != 0);
    chip.clockBit(false);  // deselect off a byte boundary
    chip.deselect();
    EXPECT_FALSE(chip.inDeepPowerDown());
}

TEST(FlashModel, IdentificationAnswers) {
    struct Case {
        const char* name;
        bool hasSignature;
        Bytes command;
        std::size_t answerBytes;
        Bytes expected;
    };
    const Case cases[] = {
        {"RDID repeats its three bytes", true, {0x9F}, 7, {0xEF, 0x40, 0x10, 0xEF, 0x40, 0x10, 0xEF}},
        {"signature after three dummy bytes, repeated", true, {0xAB, 0x00, 0x00, 0x00}, 3, {0x13, 0x13, 0x13}},
        {"no signature: MISO stays high", false, {0xAB, 0x00, 0x00, 0x00}, 2, {0xFF, 0xFF}},
        {"signature not before the dummy bytes end", true, {0xAB}, 4, {0xFF, 0xFF, 0xFF, 0x13}},
        {"unknown opcode", true, {0x77}, 3, {0xFF, 0xFF, 0xFF}},
        {"register 2", true, {0x35}, 2, {0x00, 0x00}},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        FlashConfig part = smallPart();
        part.hasSignature = c.hasSignature;
        FlashModel chip(part);
        chip.select();
        Bytes misoDuringCommand;
        for (std::uint8_t b : c.command) misoDuringCommand.push_back(chip.clockByte(b));
        Bytes answer;
        for (std::size_t i = 0; i < c.answerBytes; ++i) answer.push_back(chip.clockByte(0x00));
        chip.deselect();
        EXPECT_EQ(answer, c.expected);
        EXPECT_EQ(misoDuringCommand, Bytes(c.command.size(), 0xFF)) << "MISO is high while a command comes in";
    }
}

TEST(FlashModel, ReadsRunAcrossPagesAndWrapAtTheEnd) {
    FlashModel chip(smallPart());
    for (std::size_t a = 0; a < chip.memory().size(); ++a) chip.memory()[a] = static_cast<std::uint8_t>(a * 7);
    const std::uint32_t last = 64 * 1024 - 2;
    EXPECT_EQ(readArray(chip, 0xFE, 4), (Bytes{0xFE * 7 & 0xFF, 0xFF * 7 & 0xFF, 0x00, 0x07}));
    EXPECT_EQ(readArray(chip, last, 4), (Bytes{static_cast<std::uint8_t>(last * 7),
                                               static_cast<std::uint8_t>((last + 1) * 7), 0x00, 0x07}));
    // Fast read: one dummy byte after the address.
    EXPECT_EQ(transact(chip, {0x0B, 0x00, 0x00, 0x01, 0xAA}, 2), (Bytes{0x07, 0x0E}));
    // Address bits above the array are ignored.
    EXPECT_EQ(readArray(chip, 0x010002, 1), (Bytes{0x0E}));
}

TEST(FlashModel, FourByteAddressPartKnowsNativeAndLegacyOpcodes) {
    FlashConfig part = smallPart();
    part.sizeBytes = 32 * 1024 * 1024;
    part.addressBytes = 4;
    part.opRead = 0x13;
    part.opFastRead = 0x0C;
    part.opPageProgram = 0x12;
    part.opSectorErase = 0x21;
    FlashModel chip(part);
    const std::uint32_t high = 0x01234500;  // above 16 MiB

    writeEnable(chip);
    pageProgram(chip, high, {0x11, 0x22}, 0x12, 4);
    chip.advance(us(700));
    EXPECT_EQ(chip.memory()[high], 0x11);
    EXPECT_EQ(readArray(chip, high, 2, 0x13, 4), (Bytes{0x11, 0x22}));
    EXPECT_EQ(transact(chip, {0x0C, 0x01, 0x23, 0x45, 0x01, 0x00}, 1), (Bytes{0x22}));

    // Legacy opcodes take three address bytes: the same low 24 bits reach
    // the low 16 MiB.
    writeEnable(chip);
    pageProgram(chip, high & 0xFFFFFF, {0x33}, 0x02, 3);
    chip.advance(us(700));
    EXPECT_EQ(chip.memory()[high & 0xFFFFFF], 0x33);
    EXPECT_EQ(chip.memory()[high], 0x11);
    EXPECT_EQ(readArray(chip, high & 0xFFFFFF, 1, 0x03, 3), (Bytes{0x33}));

    // Native 4 KiB erase with four address bytes.
    writeEnable(chip);
    transact(chip, {0x21, 0x01, 0x23, 0x40, 0x00});
    chip.advance(us(part.sectorEraseUs));
    EXPECT_EQ(chip.memory()[high], 0xFF);
    EXPECT_EQ(chip.memory()[high & 0xFFFFFF], 0x33);
}

TEST(FlashModel, ThreeByteAddressPartDoesNotKnowFourByteOpcodes) {
    FlashModel chip(smallPart());
    chip.memory()[0] = 0x5A;
    EXPECT_EQ(readArray(chip, 0, 1, 0x13, 4), (Bytes{0xFF}));
    writeEnable(chip);
    pageProgram(chip, 0x100, {0x00}, 0x12, 4);
    EXPECT_FALSE(chip.busy());
}

TEST(FlashModel, StatusWrites) {
    struct Case {
        const char* name;
        QeLocation qe;
        bool twoBytes;
        std::uint8_t status1Before, status2Before;
        Bytes data;
        std::uint8_t status1After, status2After;
    };
    const Case cases[] = {
        {"two bytes set both registers", QeLocation::Sr2Bit1, true, 0x1C, 0x00, {0x00, 0x02}, 0x00, 0x02},
        {"one byte keeps register 2 (QE kept)", QeLocation::Sr2Bit1, true, 0x1C, 0x02, {0x00}, 0x00, 0x02},
        {"two bytes clear QE", QeLocation::Sr2Bit1, true, 0x00, 0x02, {0x00, 0x00}, 0x00, 0x00},
        {"part taking one byte ignores the second", QeLocation::None, false, 0x1C, 0x00, {0x00, 0x02}, 0x00, 0x00},
        {"WIP and WEL are not writable", QeLocation::Sr2Bit1, true, 0x00, 0x00, {0x03}, 0x00, 0x00},
        {"QE in register 1 bit 6 by one byte", QeLocation::Sr1Bit6, false, 0x00, 0x00, {0x40}, 0x40, 0x00},
        {"read-only bits of register 2 stay", QeLocation::Sr2Bit1, true, 0x00, 0x80, {0x00, 0x04}, 0x00, 0x80},
        {"extra bytes are ignored", QeLocation::Sr2Bit1, true, 0x00, 0x00, {0x08, 0x02, 0xFF}, 0x08, 0x02},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        FlashConfig part = smallPart();
        part.qe = c.qe;
        part.writeStatusTakesTwoBytes = c.twoBytes;
        FlashModel chip(part);
        chip.setStatus(c.status1Before, c.status2Before);
        writeEnable(chip);
        Bytes command{0x01};
        command.insert(command.end(), c.data.begin(), c.data.end());
        transact(chip, command);
        EXPECT_EQ(chip.status1(), c.status1After | kWip | kWel) << "new values at deselect, busy";
        chip.advance(us(part.writeStatusUs));
        EXPECT_EQ(chip.status1(), c.status1After);
        EXPECT_EQ(chip.status2(), c.status2After);
    }
}

TEST(FlashModel, StatusRegister2ReadOnlyWhereThePartHasOne) {
    FlashConfig part = smallPart();
    part.opReadStatus2 = -1;
    part.qe = QeLocation::None;
    part.writeStatusTakesTwoBytes = false;
    FlashModel chip(part);
    chip.setStatus(0x1C, 0x00);
    EXPECT_EQ(spi(chip, {0x35}, 1)[0], 0xFF) << "35h is unknown to this part";
    // A part naming 05h as its register-2 read reads register 1 again.
    part.opReadStatus2 = 0x05;
    FlashModel other(part);
    other.setStatus(0x1C, 0x00);
    EXPECT_EQ(spi(other, {0x05}, 1)[0], 0x1C);
}

TEST(FlashModel, WriteCommandsEndingOffAByteBoundaryAreNotExecuted) {
    const Bytes commands[] = {{0x02, 0x00, 0x00, 0x00, 0x00}, {0x20, 0x00, 0x00, 0x00}, {0xC7}, {0x01, 0x1C}};
    for (const Bytes& command : commands) {
        SCOPED_TRACE(static_cast<int>(command[0]));
        FlashModel chip(smallPart());
        chip.memory()[0] = 0x0F;
        writeEnable(chip);
        chip.select();
        for (std::uint8_t b : command) chip.clockByte(b);
        chip.clockBit(true);
        chip.deselect();
        EXPECT_FALSE(chip.busy());
        EXPECT_EQ(chip.memory()[0], 0x0F);
        EXPECT_EQ(chip.status1(), kWel);
    }
}

// clockByte and clockBytes must be indistinguishable from eight clockBit
// calls per byte, whatever the command and wherever a byte boundary falls.
TEST(FlashModel, ByteAndBitClockingAreEquivalent) {
    std::mt19937 random(12345);
    const Bytes opcodes = {0x06, 0x04, 0x9F, 0x05, 0x35, 0x01, 0x03, 0x0B, 0x02, 0x20, 0xC7, 0xB9, 0xAB, 0x77};
    for (int round = 0; round < 40; ++round) {
        SCOPED_TRACE(round);
        FlashModel byBits(smallPart()), byBytes(smallPart()), byRuns(smallPart());
        for (FlashModel* chip : {&byBits, &byBytes, &byRuns}) {
            for (std::size_t a = 0; a < chip->memory().size(); a += 97) chip->memory()[a] = static_cast<std::uint8_t>(a);
        }
        for (int transaction = 0; transaction < 30; ++transaction) {
            Bytes stream{opcodes[random() % opcodes.size()]};
            const std::size_t length = random() % 300;
            stream.push_back(0x00);
            stream.push_back(static_cast<std::uint8_t>(random() % 2));
            for (std::size_t i = 0; i < length; ++i) stream.push_back(static_cast<std::uint8_t>(random()));
            const std::size_t extraBits = random() % 3 == 0 ? random() % 8 : 0;
            const std::uint64_t gap = random() % 2000 * 1000;

            Bytes outBits, outBytes, outRuns(stream.size());
            byBits.select();
            byBytes.select();
            byRuns.select();
            for (std::uint8_t b : stream) {
                std::uint8_t out = 0;
                for (int bit = 7; bit >= 0; --bit)
                    out = static_cast<std::uint8_t>(out << 1 | (byBits.clockBit(((b >> bit) & 1) != 0) ? 1 : 0));
                outBits.push_back(out);
                outBytes.push_back(byBytes.clockByte(b));
            }
            byRuns.clockBytes(stream.data(), outRuns.data(), stream.size());
            for (std::size_t bit = 0; bit < extraBits; ++bit) {
                const bool mosi = (bit & 1) != 0;
                const bool miso = byBits.clockBit(mosi);
                EXPECT_EQ(miso, byBytes.clockBit(mosi));
                EXPECT_EQ(miso, byRuns.clockBit(mosi));
            }
            byBits.deselect();
            byBytes.deselect();
            byRuns.deselect();
            ASSERT_EQ(outBits, outBytes);
            ASSERT_EQ(outBits, outRuns);
            for (FlashModel* chip : {&byBits, &byBytes, &byRuns}) chip->advance(gap);
            ASSERT_EQ(byBits.memory(), byBytes.memory());
            ASSERT_EQ(byBits.memory(), byRuns.memory());
            ASSERT_EQ(byBits.status1(), byBytes.status1());
            ASSERT_EQ(byBits.status1(), byRuns.status1());
            ASSERT_EQ(byBits.status2(), byRuns.status2());
            ASSERT_EQ(byBits.inDeepPowerDown(), byRuns.inDeepPowerDown());
            ASSERT_EQ(byBits.now(), byBytes.now());
            ASSERT_EQ(byBits.now(), byRuns.now());
        }
    }
}

// A byte stream that starts mid-byte: clockByte must still decode the
// opcode from the right bits.
TEST(FlashModel, ClockByteAfterOddBitsFollowsTheBitPhase) {
    FlashModel chip(smallPart());
    chip.select();
    // RDID (9Fh) as 3 bits then 5 bits, then the answer by bytes.
    for (bool bit : {true, false, false}) chip.clockBit(bit);
    for (bool bit : {true, true, true, true, true}) chip.clockBit(bit);
    EXPECT_EQ(chip.clockByte(0x00), 0xEF);
    // Now straddle: 4 bits, then a byte, then 4 bits: 0x40 then 0x10.
    std::uint8_t first = 0;
    for (int i = 0; i < 4; ++i) first = static_cast<std::uint8_t>(first << 1 | (chip.clockBit(false) ? 1 : 0));
    const std::uint8_t middle = chip.clockByte(0x00);
    std::uint8_t last = 0;
    for (int i = 0; i < 4; ++i) last = static_cast<std::uint8_t>(last << 1 | (chip.clockBit(false) ? 1 : 0));
    chip.deselect();
    EXPECT_EQ(first, 0x4);
    EXPECT_EQ(middle, 0x01);
    EXPECT_EQ(last, 0x0);
}

TEST(FlashModelFaults, StuckBusyNeverClears) {
    FaultPlan faults;
    faults.stuckBusy = true;
    FlashModel chip(smallPart(), faults);
    writeEnable(chip);
    pageProgram(chip, 0, {0x00});
    chip.advance(us(1'000'000'000));
    EXPECT_EQ(readStatus1(chip), kWip | kWel);
    EXPECT_EQ(chip.memory()[0], 0x00) << "the program itself happened";
}

TEST(FlashModelFaults, StuckBitsReadAsFixedValues) {
    FaultPlan faults;
    faults.stuckBits = {{0x10, 0x81, 0x01}};  // bit 7 reads 0, bit 0 reads 1
    FlashModel chip(smallPart(), faults);
    EXPECT_EQ(readArray(chip, 0x0F, 3), (Bytes{0xFF, 0x7F, 0xFF}));
    programPage(chip, 0x10, {0x00});
    EXPECT_EQ(readArray(chip, 0x10, 1), (Bytes{0x01}));
    EXPECT_EQ(chip.memory()[0x10], 0x00) << "the array holds what was programmed";
}

TEST(FlashModelFaults, PowerOnStates) {
    FaultPlan protect;
    protect.protectAtPowerOn = true;
    FlashModel protectedChip(smallPart(), protect);
    EXPECT_EQ(readStatus1(protectedChip), 0x1C);

    FaultPlan sleeping;
    sleeping.startInDeepPowerDown = true;
    FlashModel sleepingChip(smallPart(), sleeping);
    EXPECT_TRUE(sleepingChip.inDeepPowerDown());
    EXPECT_EQ(spi(sleepingChip, {0x9F}, 1)[0], 0xFF);
    spi(sleepingChip, {0xAB});
    sleepingChip.advance(us(3));
    EXPECT_EQ(spi(sleepingChip, {0x9F}, 1)[0], 0xEF);
}

TEST(FlashModel, RejectsUnusableConfigurations) {
    struct Case {
        const char* name;
        void (*change)(FlashConfig&);
    };
    const Case cases[] = {
        {"size 0", [](FlashConfig& c) { c.sizeBytes = 0; }},
        {"page 0", [](FlashConfig& c) { c.pageBytes = 0; }},
        {"page larger than the array", [](FlashConfig& c) { c.pageBytes = c.sizeBytes * 2; }},
        {"size not whole pages", [](FlashConfig& c) { c.sizeBytes += 1; }},
        {"sector 0", [](FlashConfig& c) { c.sectorBytes = 0; }},
        {"2-byte addresses", [](FlashConfig& c) { c.addressBytes = 2; }},
        {"opcode beyond a byte", [](FlashConfig& c) { c.opRead = 0x100; }},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        FlashConfig part = smallPart();
        c.change(part);
        EXPECT_THROW(FlashModel chip(part), VorantException);
    }
    FaultPlan faults;
    faults.stuckBits = {{64 * 1024, 1, 0}};
    EXPECT_THROW(FlashModel chip(smallPart(), faults), VorantException);
    FlashModel chip(smallPart());
    EXPECT_THROW(chip.setClockHz(0), VorantException);
}

}  // namespace
}  // namespace vorant::sim::test
