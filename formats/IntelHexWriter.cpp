#include "formats/IntelHexWriter.h"


#include <algorithm>
#include <cstdio>
#include <stdexcept>

namespace vorant::formats {
namespace {

constexpr char kHexDigits[] = "0123456789ABCDEF";
constexpr std::size_t kTextFlushSize = 64 * 1024;

// Checked before the output file is created.
const std::string& withValidLayout(const std::string& path, const IntelHexLayout& layout) {
    if (layout.bytesPerRecord != 16 && layout.bytesPerRecord != 32) {
        throw std::invalid_argument("Intel HEX records hold 16 or 32 data bytes, not " +
                                    std::to_string(layout.bytesPerRecord));
    }
    return path;
}

}  // namespace

// Each record covers one aligned block of bytesPerRecord; a block never
// crosses a 64 KiB bound, so no record needs two upper addresses.
IntelHexWriter::IntelHexWriter(const std::string& path, IntelHexLayout layout)
    : RecordFileWriter(withValidLayout(path, layout), static_cast<std::size_t>(layout.bytesPerRecord), "Intel HEX"),
      lineEnd_(layout.crlf ? "\r\n" : "\n") {
    text_.reserve(kTextFlushSize + 128);
}

void IntelHexWriter::appendByte(unsigned value) {
    text_ += kHexDigits[(value >> 4) & 0xF];
    text_ += kHexDigits[value & 0xF];
    checksum_ += value;
}

void IntelHexWriter::appendRecord(unsigned char type, unsigned address, const unsigned char* data,
                                  std::size_t count) {
    checksum_ = 0;
    text_ += ':';
    appendByte(static_cast<unsigned>(count));
    appendByte((address >> 8) & 0xFF);
    appendByte(address & 0xFF);
    appendByte(type);
    for (std::size_t i = 0; i < count; ++i) appendByte(data[i]);
    appendByte((0x100 - (checksum_ & 0xFF)) & 0xFF);
    text_ += lineEnd_;
}

void IntelHexWriter::emitRecord(std::uint64_t address, const unsigned char* bytes, std::size_t count) {
    const auto upper = static_cast<long long>(address >> 16);
    if (upper != upperAddress_) {
        const unsigned char segment[2] = {static_cast<unsigned char>(upper >> 8),
                                          static_cast<unsigned char>(upper)};
        appendRecord(0x04, 0, segment, 2);
        upperAddress_ = upper;
    }
    appendRecord(0x00, static_cast<unsigned>(address & 0xFFFF), bytes, count);
}

bool IntelHexWriter::writeText() {
    out().write(text_.data(), static_cast<std::streamsize>(text_.size()));
    text_.clear();
    return checkStream();
}

bool IntelHexWriter::afterData() { return text_.size() < kTextFlushSize || writeText(); }

bool IntelHexWriter::finishData() {
    flushRecord();
    appendRecord(0x01, 0, nullptr, 0);
    return writeText();
}

}  // namespace vorant::formats
