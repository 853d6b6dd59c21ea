#pragma once
// Shared set-up of the memory-operation tests: a small test part, in-memory
// configuration data, a recording readback writer, a fixed CIF data width,
// a responder that answers reads from a flash image, and the stream
// fragments the operations are built from.

#include "host/ConfigData.h"
#include "host/MessageSinks.h"
#include "host/UT_CMDARGS.h"
#include "s/Type1SPIDevice.h"
#include "tests/support/RecordingScanPort.h"
#include "tests/support/TestParts.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

namespace vorant::test::memory {

using Bytes = std::vector<std::uint8_t>;
using Lines = std::vector<std::string>;

// A 4-page part of 8-byte pages: 24-bit address at bit 8, data at bit 32,
// a 96-bit page-program frame. Unlock, register display and x4 are off so
// streams stay short; tests switch them on where they matter.
inline Properties tinyPartProperties() {
    Properties p = w25q128Properties();
    p["PAGE_SIZE"] = "64";
    p["DEVICE_SIZE"] = "256";
    p["TOTAL_SHIFT_SIZE"] = "96";
    p["READ_STATUS_ENABLED"] = "FALSE";
    p["USE_UNLOCKSR"] = "FALSE";
    p["X4_READ"] = "FALSE";
    return p;
}

// Instruction texts and stream fragments of the test part.
inline const std::string kWriteEnable = "00000110";
inline const std::string kWriteDisable = "00000100";
inline const std::string kReadStatus1 = "00000101";
inline const std::string kReadStatus2 = "00110101";
inline const std::string kWriteSr = "00000001";
inline const std::string kBulkErase = "11000111";
inline const std::string kRead = "00000011";
inline const std::string kPageProgram = "00000010";

inline const std::string kCommentWriteEnable = "comment //Loading device with 'write enable' instruction.\n";
inline const std::string kCommentWriteDisable = "comment //Loading device with 'write disable' instruction.\n";
inline const std::string kCommentReadStatus = "comment //Loading device with 'read status' instruction.\n";
inline const std::string kCommentWriteSr = "comment //Loading device with 'write SR' instruction.\n";
inline const std::string kCommentErase = "comment //Loading device with 'erase' instruction.\n";
inline const std::string kCommentPageProgram = "comment //Loading device with 'page program' instruction.\n";
inline const std::string kCommentRead = "comment //Loading device with 'read' instruction.\n";
inline const std::string kCommentVerifyRead = "comment //Loading device with 'read ' instruction.\n";

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
inline Bytes slice(const Bytes& bytes, std::size_t from, std::size_t count) {
    return Bytes(bytes.begin() + static_cast<long>(from), bytes.begin() + static_cast<long>(from + count));
}
// Bytes 0x10, 0x11, ... : every page of the test data differs.
inline Bytes patternBytes(std::size_t count, std::uint8_t first = 0x10) {
    Bytes bytes(count);
    for (std::size_t i = 0; i < count; ++i) bytes[i] = static_cast<std::uint8_t>(first + i);
    return bytes;
}

inline Lines concat(std::initializer_list<Lines> parts) {
    Lines all;
    for (const Lines& part : parts) all.insert(all.end(), part.begin(), part.end());
    return all;
}
inline Lines tail(const Lines& lines, std::size_t count) {
    return Lines(lines.end() - static_cast<long>(std::min(count, lines.size())), lines.end());
}
inline Lines writeEnable() { return {kCommentWriteEnable, "shiftWrite 0 " + kWriteEnable}; }
inline Lines writeDisable() { return {kCommentWriteDisable, "shiftWrite 0 " + kWriteDisable}; }
inline Lines statusRead(const std::string& instruction = kReadStatus1) {
    return {kCommentReadStatus, "shift 1 " + instruction, "shift 12 00000000"};
}
// The read-command frame of the test part for a byte address.
inline std::string readFrame(std::uint32_t address) { return kRead + wireBits(address, 24); }

// Configuration data held in memory. Chunks are page-sized, the buffer of a
// short last chunk padded with 0xFF to the bits asked for; each chunk
// reports baseAddress plus its offset.
class MemoryImage : public ConfigDataReader {
public:
    explicit MemoryImage(Bytes bytes, int baseAddress = 0) : bytes_(std::move(bytes)), base_(baseAddress) {}

    unsigned dataSize() override {
        return reportedBits_ ? *reportedBits_ : static_cast<unsigned>(bytes_.size() * 8);
    }
    void rewind() override {
        ++rewinds;
        position_ = 0;
    }
    int next(const char** data, int* address, int maxBits) override {
        ++nextCalls;
        const std::size_t remainingBits = (bytes_.size() - position_) * 8;
        const std::size_t bits = std::min<std::size_t>(remainingBits, static_cast<std::size_t>(maxBits));
        if (bits == 0) return 0;
        buffer_.assign((static_cast<std::size_t>(maxBits) + 7) / 8, 0xFF);
        std::copy_n(bytes_.begin() + static_cast<long>(position_), (bits + 7) / 8, buffer_.begin());
        *data = reinterpret_cast<const char*>(buffer_.data());
        *address = base_ + static_cast<int>(position_);
        position_ += bits / 8;
        return static_cast<int>(bits);
    }

    void reportBits(unsigned bits) { reportedBits_ = std::make_unique<unsigned>(bits); }
    int rewinds = 0;
    int nextCalls = 0;

private:
    Bytes bytes_;
    int base_;
    std::size_t position_ = 0;
    Bytes buffer_;
    std::unique_ptr<unsigned> reportedBits_;
};

class FixedWidthCif : public CifReader {
public:
    explicit FixedWidthCif(int width) : width_(width) {}
    int getDataWidth() override { return width_; }

private:
    int width_;
};

// What the recording writer was asked to do, kept beyond the writer's life.
struct WriterLog {
    struct Page {
        int offset;
        int bits;
        Bytes data;
        int reserved;
    };
    std::string fileName;
    Lines calls;  // "begin", "write <offset> <bits>", "end", "destroyed"
    std::vector<Page> pages;
    bool failBegin = false, failWrite = false, failEnd = false;
};

class RecordingWriter : public ConfigDataWriter {
public:
    explicit RecordingWriter(std::shared_ptr<WriterLog> log) : log_(std::move(log)) {}
    ~RecordingWriter() override { log_->calls.push_back("destroyed"); }
    bool beginWrite() override {
        log_->calls.push_back("begin");
        return !log_->failBegin;
    }
    bool writeData(const unsigned char* data, int offset, int bits, int reserved) override {
        log_->calls.push_back("write " + std::to_string(offset) + " " + std::to_string(bits));
        log_->pages.push_back({offset, bits, Bytes(data, data + (bits + 7) / 8), reserved});
        return !log_->failWrite;
    }
    bool endWrite() override {
        log_->calls.push_back("end");
        return !log_->failEnd;
    }

private:
    std::shared_ptr<WriterLog> log_;
};

// Readback files named *.memtest go to a recording writer; *.nowrite files
// cannot be created.
inline std::shared_ptr<WriterLog> registerRecordingWriter() {
    auto log = std::make_shared<WriterLog>();
    ConfigDataWriter::registerFormat(".memtest", [log](const std::string& fileName) {
        log->fileName = fileName;
        return std::unique_ptr<ConfigDataWriter>(std::make_unique<RecordingWriter>(log));
    });
    ConfigDataWriter::registerFormat(".nowrite",
                                     [](const std::string&) { return std::unique_ptr<ConfigDataWriter>(); });
    return log;
}

// Answers page reads of the test part from a flash image: decodes the
// 24-bit address of the read frame and returns the bytes from there, MSB
// first, wrapping at the end. Other openings capture zeros.
inline RecordingScanPort::Responder flashResponder(Bytes flash) {
    return [flash = std::move(flash)](const std::string& opening, std::size_t bits) -> std::string {
        if (opening.size() < 32 || opening.compare(0, 8, kRead) != 0) return {};
        std::uint32_t address = 0;
        for (int k = 0; k < 24; ++k) address = (address << 1) | (opening[8 + k] == '1' ? 1u : 0u);
        std::string text;
        for (std::size_t i = 0; text.size() < bits; ++i)
            text += wireBits(flash[(address + i) % flash.size()], 8);
        text.resize(bits);
        return text;
    };
}

inline std::unique_ptr<UT_CMDARGS> switches(const Lines& tokens) {
    return std::make_unique<UT_CMDARGS>(tokens);
}

class MemoryTest : public ::testing::Test {
protected:
    void SetUp() override { unsetenv("QRX_VORANT_ENV_DONT_USE_POLLING"); }
    void TearDown() override { unsetenv("QRX_VORANT_ENV_DONT_USE_POLLING"); }

    // A device of the tiny part with `changes` applied, wired to this
    // test's port. Each device gets its own part name, so tests never see
    // each other's parts.
    std::unique_ptr<Type1SPIDevice> makeDevice(const Properties& changes = {}) {
        Properties properties = tinyPartProperties();
        for (const auto& [key, value] : changes) properties[key] = value;
        const std::string name = "MEMORY_TEST_" + std::to_string(++partCounter_);
        addTestPart(name, properties);
        auto device = std::make_unique<Type1SPIDevice>(name.c_str());
        device->setScanPort(&port);
        return device;
    }
    std::unique_ptr<Type1SPIDevice> makeDeviceWithoutPolling(const Properties& changes = {}) {
        setenv("QRX_VORANT_ENV_DONT_USE_POLLING", "1", 1);
        auto device = makeDevice(changes);
        unsetenv("QRX_VORANT_ENV_DONT_USE_POLLING");
        return device;
    }

    Lines status() const { return sink.texts(MessageKind::Status); }
    Lines info() const { return sink.texts(MessageKind::Info); }
    Lines errors() const { return sink.texts(MessageKind::Error); }
    Lines debug() const { return sink.texts(MessageKind::Debug); }
    // The shift and shiftWrite events, in order.
    std::vector<ScanEvent> shifts() const {
        std::vector<ScanEvent> out;
        for (const ScanEvent& event : port.events)
            if (event.kind == ScanEvent::Kind::Shift || event.kind == ScanEvent::Kind::ShiftWrite)
                out.push_back(event);
        return out;
    }
    std::size_t scanCount() const { return port.scanLines().size(); }

    CapturingSink sink;
    ScopedSink scopedSink{&sink};
    RecordingScanPort port;

private:
    static inline int partCounter_ = 0;
};

}  // namespace vorant::test::memory
