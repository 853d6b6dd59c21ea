#include "formats/SRecordWriter.h"

#include "formats/ConfigDataFiles.h"
#include "formats/HexText.h"

#include <algorithm>
#include <cstdio>

namespace vorant::formats {
namespace {

constexpr char kHexDigits[] = "0123456789ABCDEF";
constexpr std::size_t kRecordBytes = 32;
constexpr std::size_t kTextFlushSize = 64 * 1024;
constexpr char kHeader[] = "vorant-spi readback";

int dataTypeOf(const std::string& path) {
    const std::string extension = lowerCaseExtension(path);
    if (extension == ".s19") return 1;
    if (extension == ".s28") return 2;
    return 3;
}

}  // namespace

SRecordWriter::SRecordWriter(const std::string& path)
    : RecordFileWriter(path, kRecordBytes, "S-record"), dataType_(dataTypeOf(path)), addressBytes_(dataType_ + 1) {
    appendRecord(0, 0, 2, reinterpret_cast<const unsigned char*>(kHeader), sizeof kHeader - 1);
}

void SRecordWriter::appendByte(unsigned value) {
    text_ += kHexDigits[(value >> 4) & 0xF];
    text_ += kHexDigits[value & 0xF];
    sum_ += value;
}

void SRecordWriter::appendRecord(int type, std::uint64_t address, int addressBytes, const unsigned char* data,
                                 std::size_t count) {
    sum_ = 0;
    text_ += 'S';
    text_ += static_cast<char>('0' + type);
    appendByte(static_cast<unsigned>(count) + static_cast<unsigned>(addressBytes) + 1);
    for (int shift = 8 * (addressBytes - 1); shift >= 0; shift -= 8) appendByte((address >> shift) & 0xFF);
    for (std::size_t i = 0; i < count; ++i) appendByte(data[i]);
    appendByte(0xFF - (sum_ & 0xFF));
    text_ += '\n';
}

void SRecordWriter::emitRecord(std::uint64_t address, const unsigned char* bytes, std::size_t count) {
    appendRecord(dataType_, address, addressBytes_, bytes, count);
    ++records_;
}

bool SRecordWriter::writeText() {
    out().write(text_.data(), static_cast<std::streamsize>(text_.size()));
    text_.clear();
    return checkStream();
}

bool SRecordWriter::acceptRange(std::uint64_t address, std::size_t count) {
    const std::uint64_t reach = std::uint64_t{1} << (8 * addressBytes_);
    if (address + count <= reach) return true;
    return fail(targetName() + ": data up to " + hexNumber(address + count - 1) + " do not fit S" +
                std::to_string(dataType_) + " records (they reach " + hexNumber(reach - 1) +
                "); name the file .s37 or .srec");
}

bool SRecordWriter::afterData() { return text_.size() < kTextFlushSize || writeText(); }

bool SRecordWriter::finishData() {
    flushRecord();
    // The count in the narrowest record it fits; the end record of the
    // data records' width (S7 for S3, S8 for S2, S9 for S1).
    if (records_ <= 0xFFFF) appendRecord(5, records_, 2, nullptr, 0);
    else if (records_ <= 0xFFFFFF) appendRecord(6, records_, 3, nullptr, 0);
    appendRecord(10 - dataType_, 0, addressBytes_, nullptr, 0);
    return writeText();
}

}  // namespace vorant::formats
