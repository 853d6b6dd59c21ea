#pragma once
// Shared set-up of the plug-in tests: a small test part, in-memory
// configuration data, a recording readback writer, the stream fragments the
// operations are built from, and the table row every operation test checks:
// one operation on a fresh device of the part, wired to a scripted
// recording port, and what it must return, put on the wire and say.

#include "host/MessageSinks.h"
#include "host/UT_CMDARGS.h"
#include "s/Type1SPIDevice.h"
#include "tests/support/RecordingScanPort.h"
#include "tests/support/ReferenceCrc32.h"
#include "tests/support/TestParts.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <optional>
#include <sstream>

namespace vorant::test::plugin {

using Bytes = std::vector<std::uint8_t>;
using Lines = std::vector<std::string>;

// Opcodes of the test part, as shifted (MSB first).
inline const std::string kWriteEnable = "00000110", kWriteDisable = "00000100", kReadId = "10011111",
                         kReadStatus1 = "00000101", kReadStatus2 = "00110101", kWriteSr = "00000001",
                         kReadSignature = "10101011", kBulkErase = "11000111", kRead = "00000011",
                         kPageProgram = "00000010";
inline const std::string kQuadEnableFileComment =
    "comment // The previous SDR scan only masks the Quad Enable bit and assumes that the other bits in the Status "
    "Register-2 are all zeros. If this SDR scan fails, the mask and data must be modified to reflect the real states "
    "of these bits.\n";
inline const std::string kAbsent = "<absent>";  // a property value that removes the key

// A 4-page part of 8-byte pages: 24-bit address at bit 8, data at bit 32, a
// 96-bit page-program frame, ID EF4018. Unlock, register display and x4 are
// off so streams stay short; rows switch them on where they matter.
inline Properties tinyPart() {
    Properties p = w25q128Properties();
    for (const char* key : {"READ_STATUS_ENABLED", "USE_UNLOCKSR", "X4_READ"}) p[key] = "FALSE";
    p["PAGE_SIZE"] = "64", p["DEVICE_SIZE"] = "256", p["TOTAL_SHIFT_SIZE"] = "96";
    return p;
}

// `value` in `bits` bits, most significant bit first (wire order).
inline std::string wireBits(std::uint32_t value, int bits) {
    std::string text;
    for (int bit = bits - 1; bit >= 0; --bit) text += ((value >> bit) & 1u) ? '1' : '0';
    return text;
}
inline std::string wireBytes(const Bytes& bytes) {
    std::string text;
    for (std::uint8_t byte : bytes) text += wireBits(byte, 8);
    return text;
}
// Bytes 0x10, 0x11, ... from offset `from`: every page of the test data differs.
inline Bytes patternBytes(std::size_t count, std::size_t from = 0) {
    Bytes bytes(count);
    for (std::size_t i = 0; i < count; ++i) bytes[i] = static_cast<std::uint8_t>(0x10 + from + i);
    return bytes;
}
inline Lines concat(std::initializer_list<Lines> parts) {
    Lines all;
    for (const Lines& part : parts) all.insert(all.end(), part.begin(), part.end());
    return all;
}
inline Lines repeat(const Lines& part, int times) { return times ? concat({part, repeat(part, times - 1)}) : Lines{}; }

// Stream fragments.
inline std::string loading(const std::string& what) {
    return "comment //Loading device with '" + what + "' instruction.\n";
}
inline Lines writeEnable() { return {loading("write enable"), "shiftWrite 0 " + kWriteEnable}; }
inline Lines writeDisable() { return {loading("write disable"), "shiftWrite 0 " + kWriteDisable}; }
inline Lines statusRead(const std::string& instruction = kReadStatus1) {
    return {loading("read status"), "shift 1 " + instruction, "shift 12 00000000"};
}
inline Lines busyPoll(int step) { return concat({statusRead(), {"wait " + std::to_string(step), "isCancelled 2"}}); }
// Write enable, 'write SR' opened, `data` shifted with `dataStage`, the wait.
inline Lines statusWrite(int dataStage, const std::string& data) {
    return concat({writeEnable(), {loading("write SR"), "shiftWrite 1 " + kWriteSr,
                                   "shiftWrite " + std::to_string(dataStage) + " " + data, "wait 22500"}});
}
// Both registers read, then written back as `register1` and `register2`
// (register values).
inline Lines quadEnableWrite(unsigned register1, unsigned register2, bool fileMode) {
    const Lines comment = fileMode ? Lines{kQuadEnableFileComment} : Lines{};
    return concat({statusRead(), statusRead(kReadStatus2), comment,
                   statusWrite(3, wireBits(register1, 8) + wireBits(register2, 8))});
}
// One page read: the read frame of a byte address, then a capture of `sent`.
inline Lines pageRead(const std::string& comment, std::size_t address, const std::string& sent) {
    const std::string frame = kRead + wireBits(static_cast<std::uint32_t>(address), 24);
    return {loading(comment), "shift 1 " + frame, "shift 12 " + sent, "isCancelled 2"};
}

// Configuration data held in memory. Chunks are page-sized, the buffer of a
// short last chunk padded with 0xFF to the bits asked for; each chunk
// reports baseAddress plus its offset.
class MemoryImage : public ConfigDataReader {
public:
    explicit MemoryImage(Bytes bytes, int baseAddress = 0) : bytes_(std::move(bytes)), base_(baseAddress) {}
    unsigned dataSize() override { return reportedBits ? reportedBits : static_cast<unsigned>(8 * bytes_.size()); }
    void rewind() override { position_ = 0; }
    int next(const char** data, int* address, int maxBits) override {
        const std::size_t bits = std::min((bytes_.size() - position_) * 8, static_cast<std::size_t>(maxBits));
        buffer_.assign((static_cast<std::size_t>(maxBits) + 7) / 8, 0xFF);
        std::copy_n(bytes_.begin() + static_cast<long>(position_), (bits + 7) / 8, buffer_.begin());
        *data = reinterpret_cast<const char*>(buffer_.data());
        *address = base_ + static_cast<int>(position_);
        position_ += bits / 8;
        return static_cast<int>(bits);
    }
    unsigned reportedBits = 0;  // a size to report instead of the real one (0: the real one)

private:
    Bytes bytes_, buffer_;
    int base_;
    std::size_t position_ = 0;
};

// A readback writer that logs what it is asked to do, beyond its own life:
// "begin", "write <offset> <bits> <reserved>", "end", "destroyed".
struct WriterLog {
    std::string fileName{};
    Lines calls{};
    std::vector<Bytes> pages{};
    bool failWrite = false;
};
struct RecordingWriter : ConfigDataWriter {
    explicit RecordingWriter(WriterLog& log) : log(log) {}
    ~RecordingWriter() override { log.calls.push_back("destroyed"); }
    bool beginWrite() override { return log.calls.emplace_back("begin"), true; }
    bool endWrite() override { return log.calls.emplace_back("end"), true; }
    bool writeData(const unsigned char* data, int offset, int bits, int reserved) override {
        using std::to_string;
        log.calls.push_back("write " + to_string(offset) + " " + to_string(bits) + " " + to_string(reserved));
        log.pages.emplace_back(data, data + (bits + 7) / 8);
        return !log.failWrite;
    }
    WriterLog& log;
};

// How a row scripts the port: file mode, failing calls (1-based), a cancel
// from the given query on, and the flash's two status registers (register
// values), register 1 answering busy for its first busyReads reads.
struct PortScript {
    bool fileMode = false;
    std::vector<int> failShifts{}, failWaits{};
    int cancelFrom = 0;
    bool failureLosesCable = false;
    int busyReads = 0;
    unsigned status1 = 0, status2 = 0;
};

using Operation = std::function<int(Type1SPIDevice&, UT_CMDARGS*)>;
inline const std::string kSums = "<the checksum report>";  // a status line standing for checksumLines()

// One operation on a fresh device and port, and what it must do. Short rows
// give the fields in order (name, run, result, stream, script, changes,
// status, errors, info, tokens, dataBytes); others name them.
struct Row {
    const char* name = "";
    Operation run{};  // unset: the table's operation
    int result = 1;
    std::optional<Lines> stream{};  // the scan lines exactly; unchecked when absent
    PortScript script{};
    Properties changes{};
    Lines status{}, errors{}, info{};  // every message of the kind, exactly
    Lines tokens{};                    // the switches the operation gets
    // dataBytes: configuration data (patternBytes), -1: none assigned; flip: a
    // flash byte with bit 0 flipped (the flash holds the data, then 0xFF);
    // pages: pages the readback writer got, -1: no writer made; base: the
    // address the reader gives its first chunk.
    int dataBytes = -1, flip = -1, pages = -1, base = 0;
    const char* value = nullptr;  // attribute `attribute` afterwards; null: unset
    DeviceNS::ATTRIBUTE attribute = DeviceNS::ATTR_BLANK;
    // tdiMask|tdo|tdoMask of the n-th shift, in expand()'s notation.
    std::vector<std::pair<std::size_t, std::string>> vectors{};
    Lines debug{};  // checked when given
    bool noPolling = false, skipId = false, failWrite = false;
    unsigned reportedBits = 0, flashId = 0xEF4018, signature = 0x14;
    const char* fileName = "out.memtest";
};

// "1x8|0x8|00010100" -> "11111111 00000000 00010100": vectors separated by
// '|', each written as <bit>x<count> or as its bits.
inline std::string expand(const std::string& pattern) {
    std::string out, v;
    for (std::istringstream in(pattern); std::getline(in, v, '|');) {
        const std::size_t x = v.find('x');
        out += (out.empty() ? "" : " ") + (x == std::string::npos ? v : std::string(std::stoul(v.substr(x + 1)), v[0]));
    }
    return out;
}
// The checksum report of `data` against the flash: the reference CRC-32 of
// the data and of as many flash bytes.
inline Lines checksumLines(const Bytes& data, const Bytes& flash) {
    const std::string dataSum = referenceCrc32Text(data.data(), data.size());
    const std::string flashSum = referenceCrc32Text(flash.data(), data.size());
    Lines out = {"All Checksum calculations are performed on the address range spanned by the configuration file.\n",
                 "'0': Checksum (CRC-32) of the configuration data: " + dataSum + "\n",
                 "'0': Checksum (CRC-32) of the device contents:    " + flashSum + "\n"};
    if (dataSum == flashSum) out.push_back("'0': Checksums match.\n");
    return out;
}
// A flash answering the status reads as `s` says (WIP in the last bit
// captured), the read-ID instruction with `id`, the read-signature
// instruction with `signature`, and page reads from `flash`, wrapping.
inline RecordingScanPort::Responder flashResponder(const PortScript& s, Bytes flash, unsigned id, unsigned signature) {
    return [=, busy = s.busyReads](const std::string& opening, std::size_t bits) mutable -> std::string {
        if (opening == kReadStatus2) return wireBits(s.status2, 8);
        if (opening == kReadStatus1) return wireBits(busy-- > 0 ? s.status1 | 1u : s.status1, 8);
        if (opening == kReadId) return wireBits(id, 24);
        if (opening == kReadSignature) return wireBits(signature, 8);
        if (opening.size() < 32 || opening.compare(0, 8, kRead) != 0) return {};
        const std::size_t address = std::stoul(opening.substr(8, 24), nullptr, 2);
        std::string text;
        for (std::size_t i = address; text.size() < bits; ++i) text += wireBits(flash[i % flash.size()], 8);
        return text;
    };
}

// Every test runs twice: on devices as made, and (GetParam()) on devices
// copy-assigned from them over a device of a part that differs in every
// value, so that copy assignment must carry all that any test depends on.
class PluginTest : public ::testing::TestWithParam<bool> {
protected:
    // Readback files named *.memtest go to the recording writer; *.nowrite
    // files cannot be created.
    void SetUp() override {
        clearEnvironment();
        ConfigDataWriter::registerFormat(".memtest", [this](const std::string& fileName) {
            writer.fileName = fileName;
            return std::unique_ptr<ConfigDataWriter>(std::make_unique<RecordingWriter>(writer));
        });
        ConfigDataWriter::registerFormat(".nowrite", [](auto&) { return std::unique_ptr<ConfigDataWriter>(); });
    }
    void TearDown() override { clearEnvironment(); }
    static void clearEnvironment() {
        unsetenv("QRX_VORANT_ENV_DONT_USE_POLLING");
        unsetenv("QRX_VORANT_SKIPIDCODECHECK");
    }

    // A device of the tiny part with `changes` applied, registered as `name`
    // and wired to this test's port, made with the polling or skip-ID switch
    // set when asked; or a copy of it.
    std::unique_ptr<Type1SPIDevice> makeDevice(const Properties& changes = {}, bool noPolling = false,
                                               bool skipId = false, const std::string& name = "TINY") {
        auto device = construct(changes, noPolling, skipId, name);
        if (!GetParam()) return device;
        Properties other = w25q128Properties();  // every instruction and number changed
        for (auto& [key, value] : other)
            if (key.find("INSTRUCTION") != std::string::npos || std::isdigit(value[0])) value = "1" + value;
        auto copy = construct(other, false, false, "OTHER");
        *copy = *device;
        return copy;
    }
    std::unique_ptr<Type1SPIDevice> construct(const Properties& changes, bool noPolling, bool skipId,
                                              const std::string& name) {
        Properties properties = tinyPart();
        for (const auto& [key, value] : changes)
            if (value == kAbsent) properties.erase(key);
            else properties[key] = value;
        addTestPart(name, properties);
        if (noPolling) setenv("QRX_VORANT_ENV_DONT_USE_POLLING", "1", 1);
        if (skipId) setenv("QRX_VORANT_SKIPIDCODECHECK", "1", 1);
        auto device = std::make_unique<Type1SPIDevice>(name.c_str());
        clearEnvironment();
        device->setScanPort(&port);
        return device;
    }
    void check(const Row& row, const Operation& tableOperation = {}) {
        SCOPED_TRACE(row.name);
        auto device = makeDevice(row.changes, row.noPolling, row.skipId);
        const Bytes data = patternBytes(static_cast<std::size_t>(std::max(row.dataBytes, 0)));
        Bytes flash = data;
        flash.resize(32, 0xFF);
        if (row.flip >= 0) flash[static_cast<std::size_t>(row.flip)] ^= 0x01;
        port = RecordingScanPort();  // fresh, scripted, answering as flashResponder
        sink.clear();
        port.responder = flashResponder(row.script, flash, row.flashId, row.signature);
        port.fileMode = row.script.fileMode;
        port.failingShifts = row.script.failShifts;
        port.failingWaits = row.script.failWaits;
        port.cancelFromQuery = row.script.cancelFrom;
        port.failureLosesCable = row.script.failureLosesCable;
        MemoryImage image(data, row.base);
        image.reportedBits = row.reportedBits;
        if (row.dataBytes >= 0) device->setConfigData(&image);
        writer = {.failWrite = row.failWrite};
        UT_CMDARGS args(row.tokens);
        EXPECT_EQ((row.run ? row.run : tableOperation)(*device, &args), row.result);

        EXPECT_EQ(row.stream ? port.lines(false) : Lines{}, row.stream.value_or(Lines{}));
        Lines status;
        for (const std::string& line : row.status)
            status = concat({status, line == kSums ? checksumLines(data, flash) : Lines{line}});
        EXPECT_EQ(sink.texts(MessageKind::Status), status);
        EXPECT_EQ(sink.texts(MessageKind::Error), row.errors);
        EXPECT_EQ(sink.texts(MessageKind::Info), row.info);
        EXPECT_EQ(row.debug.empty() ? row.debug : sink.texts(MessageKind::Debug), row.debug);
        const char* value = device->getAttribute(row.attribute);
        EXPECT_EQ(std::string(value ? value : "unset"), row.value ? row.value : "unset");
        Lines calls = row.pages < 0 ? Lines{} : Lines{"begin"};
        for (int p = 0; p < row.pages; ++p) calls.push_back("write " + std::to_string(8 * p) + " 64 0");
        EXPECT_EQ(writer.calls, row.pages < 0 ? calls : concat({calls, {"end", "destroyed"}}));
        EXPECT_EQ(row.pages < 0 ? row.fileName : writer.fileName, row.fileName);
        for (std::size_t p = 0; row.errors.empty() && p < writer.pages.size(); ++p) {
            Bytes captured;  // a page as captured: each flash byte bit-reversed
            for (std::size_t i = 8 * p; i < 8 * p + 8; ++i) captured.push_back(SPIDevice::swapBits(flash[i]));
            EXPECT_EQ(writer.pages[p], captured);
        }
        std::vector<const ScanEvent*> shifts;  // shift and shiftWrite calls
        for (const ScanEvent& e : port.events)
            if (e.line.rfind("shift", 0) == 0) shifts.push_back(&e);
        for (const auto& [index, pattern] : row.vectors) {
            ASSERT_LT(index, shifts.size());
            const ScanEvent& e = *shifts[index];
            EXPECT_EQ(e.tdiMask + " " + e.tdo + " " + e.tdoMask, expand(pattern));
        }
        EXPECT_EQ(device->cachedStatusByte(), 0xFF);  // a file-mode compare mask lives for one read only
    }

    CapturingSink sink;
    ScopedSink scopedSink{&sink};
    RecordingScanPort port;
    WriterLog writer;
};

inline std::string asMadeOrCopied(const ::testing::TestParamInfo<bool>& info) {
    return info.param ? "ThroughACopy" : "AsMade";
}

}  // namespace vorant::test::plugin
