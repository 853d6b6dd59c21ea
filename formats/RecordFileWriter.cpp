#include "formats/RecordFileWriter.h"

#include "formats/BitReversal.h"
#include "formats/HexText.h"

#include <algorithm>
#include <cstdio>

namespace vorant::formats {

RecordFileWriter::RecordFileWriter(const std::string& target, std::size_t recordBytes, std::string formatName)
    : AtomicFileWriter(target), recordBytes_(recordBytes), formatName_(std::move(formatName)) {
    pending_.reserve(recordBytes_);
}

void RecordFileWriter::flushRecord() {
    if (pending_.empty()) return;
    emitRecord(recordAddress_, pending_.data(), pending_.size());
    pending_.clear();
}

bool RecordFileWriter::writeData(const unsigned char* data, int offset, int bits, int /*reserved*/) {
    std::size_t count = 0;
    if (!acceptData(data, offset, bits, count)) return false;
    if (count == 0) return true;
    auto address = static_cast<std::uint64_t>(offset);
    if (address < nextAddress_) {
        return fail(targetName() + ": data at " + hexNumber(address, 8) + " arrive below data already written (up to " +
                    hexNumber(nextAddress_ - 1, 8) + "); " + formatName_ + " output takes data in ascending order");
    }
    if (!acceptRange(address, count)) return false;
    if (address != nextAddress_) flushRecord();

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
    return afterData();
}

}  // namespace vorant::formats
