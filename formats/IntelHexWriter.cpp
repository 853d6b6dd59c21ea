#include "formats/IntelHexWriter.h"

#include "formats/BitReversal.h"

#include <algorithm>
#include <cstdio>
#include <stdexcept>

namespace vorant::formats {
namespace {

constexpr char kHexDigits[] = "0123456789ABCDEF";
constexpr std::size_t kTextFlushSize = 64 * 1024;

std::string hexNumber(std::uint64_t value) {
    char text[24];
    std::snprintf(text, sizeof text, "0x%08llX", static_cast<unsigned long long>(value));
    return text;
}

// Checked before the output file is created.
const std::string& withValidLayout(const std::string& path, const IntelHexLayout& layout) {
    if (layout.bytesPerRecord != 16 && layout.bytesPerRecord != 32) {
        throw std::invalid_argument("Intel HEX records hold 16 or 32 data bytes, not " +
                                    std::to_string(layout.bytesPerRecord));
    }
    return path;
}

}  // namespace

IntelHexWriter::IntelHexWriter(const std::string& path, IntelHexLayout layout)
    : AtomicFileWriter(withValidLayout(path, layout)),
      recordBytes_(static_cast<std::size_t>(layout.bytesPerRecord)),
      lineEnd_(layout.crlf ? "\r\n" : "\n") {
    pending_.reserve(recordBytes_);
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

void IntelHexWriter::flushRecord() {
    if (pending_.empty()) return;
    const auto upper = static_cast<long long>(recordAddress_ >> 16);
    if (upper != upperAddress_) {
        const unsigned char segment[2] = {static_cast<unsigned char>(upper >> 8),
                                          static_cast<unsigned char>(upper)};
        appendRecord(0x04, 0, segment, 2);
        upperAddress_ = upper;
    }
    appendRecord(0x00, static_cast<unsigned>(recordAddress_ & 0xFFFF), pending_.data(), pending_.size());
    pending_.clear();
}

bool IntelHexWriter::writeText() {
    out().write(text_.data(), static_cast<std::streamsize>(text_.size()));
    text_.clear();
    return checkStream();
}

bool IntelHexWriter::writeData(const unsigned char* data, int offset, int bits, int /*reserved*/) {
    std::size_t count = 0;
    if (!acceptData(data, offset, bits, count)) return false;
    if (count == 0) return true;
    auto address = static_cast<std::uint64_t>(offset);
    if (address < nextAddress_) {
        return fail(targetName() + ": data at " + hexNumber(address) + " arrive below data already written (up to " +
                    hexNumber(nextAddress_ - 1) + "); Intel HEX output takes data in ascending order");
    }
    if (address != nextAddress_) flushRecord();

    // Each record covers one aligned block of recordBytes_; a block never
    // crosses a 64 KiB bound, so no record needs two upper addresses.
    while (count > 0) {
        if (pending_.empty()) recordAddress_ = address;
        const std::uint64_t blockEnd = (address / recordBytes_ + 1) * recordBytes_;
        const auto take = static_cast<std::size_t>(std::min<std::uint64_t>(count, blockEnd - address));
        const std::size_t filled = pending_.size();
        pending_.resize(filled + take);
        reverseBitsOfEachByte(data, take, pending_.data() + filled);
        data += take;
        count -= take;
        address += take;
        if (address == blockEnd) flushRecord();
    }
    nextAddress_ = address;
    return text_.size() < kTextFlushSize || writeText();
}

bool IntelHexWriter::finishData() {
    flushRecord();
    appendRecord(0x01, 0, nullptr, 0);
    return writeText();
}

}  // namespace vorant::formats
