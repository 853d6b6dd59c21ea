#include "formats/IntelHexImage.h"

#include "formats/AddressRanges.h"
#include "formats/FormatError.h"
#include "formats/RecordLines.h"
#include "formats/HexText.h"
#include "formats/InputFile.h"

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <vector>

namespace vorant::formats {
namespace {

enum RecordType : unsigned char {
    kData = 0x00,
    kEndOfFile = 0x01,
    kExtendedSegmentAddress = 0x02,
    kStartSegmentAddress = 0x03,
    kExtendedLinearAddress = 0x04,
    kStartLinearAddress = 0x05,
};

std::string describeCharacter(char c) {
    const auto code = static_cast<unsigned char>(c);
    if (code >= 0x21 && code < 0x7F) return std::string("'") + c + "'";
    return "byte " + hexNumber(code, 2);
}

class IntelHexParser {
public:
    IntelHexParser(const std::string& sourceName, std::uint64_t maxImageBytes)
        : sourceName_(sourceName), maxImageBytes_(maxImageBytes) {}

    FlashImage parse(std::istream& in) {
        forEachRecordLine(in, sourceName_, lineNumber_,
                          [this](const std::string& line, std::size_t length) { parseLine(line, length); });
        if (!sawEndOfFile_) {
            fail(lineNumber_, "the file ends without an end-of-file record (type 01)");
        }
        return FlashImage(layOut());
    }

private:
    [[noreturn]] void fail(std::size_t line, const std::string& reason) const {
        throw FormatError(sourceName_ + ":" + std::to_string(line) + ": " + reason);
    }

    void parseLine(const std::string& line, std::size_t length) {
        if (sawEndOfFile_) fail(lineNumber_, "record after the end-of-file record");
        if (line[0] != ':') {
            fail(lineNumber_, "a record starts with ':', this line starts with " + describeCharacter(line[0]));
        }
        decodeRecord(line.data() + 1, length - 1);
        handleRecord();
    }

    void decodeRecord(const char* digits, std::size_t digitCount) {
        if (digitCount % 2 != 0) {
            fail(lineNumber_, "odd number of hex digits (" + std::to_string(digitCount) + ")");
        }
        record_.resize(digitCount / 2);
        for (std::size_t i = 0; i < record_.size(); ++i) {
            const int high = hexDigitValue(digits[2 * i]);
            const int low = hexDigitValue(digits[2 * i + 1]);
            if (high < 0 || low < 0) {
                const std::size_t bad = high < 0 ? 2 * i : 2 * i + 1;
                fail(lineNumber_, "bad hex digit " + describeCharacter(digits[bad]) + " at column " +
                                      std::to_string(bad + 2));
            }
            record_[i] = static_cast<unsigned char>(high << 4 | low);
        }
        if (record_.size() < 5) {
            fail(lineNumber_, "record too short: " + std::to_string(record_.size()) +
                                  " bytes where count, address, type and checksum alone take 5");
        }
        const std::size_t declared = record_[0];
        if (declared + 5 != record_.size()) {
            fail(lineNumber_, "length mismatch: the byte count says " + std::to_string(declared) +
                                  " data bytes, the line holds " + std::to_string(record_.size() - 5));
        }
        unsigned sum = 0;
        for (std::size_t i = 0; i + 1 < record_.size(); ++i) sum += record_[i];
        const unsigned expected = (0x100 - (sum & 0xFF)) & 0xFF;
        if (record_.back() != expected) {
            fail(lineNumber_, "checksum mismatch: the record says " + hexNumber(record_.back(), 2) +
                                  ", its bytes need " + hexNumber(expected, 2));
        }
    }

    void handleRecord() {
        const unsigned char count = record_[0];
        const unsigned offset = static_cast<unsigned>(record_[1]) << 8 | record_[2];
        const unsigned char type = record_[3];
        const unsigned char* payload = record_.data() + 4;
        switch (type) {
        case kData:
            placeData(offset, payload, count);
            break;
        case kEndOfFile:
            requireCount(count, 0, "an end-of-file record");
            sawEndOfFile_ = true;
            break;
        case kExtendedSegmentAddress:
            requireCount(count, 2, "an extended segment address record");
            base_ = static_cast<std::uint64_t>(payload[0] << 8 | payload[1]) << 4;
            segmented_ = true;
            break;
        case kExtendedLinearAddress:
            requireCount(count, 2, "an extended linear address record");
            base_ = static_cast<std::uint64_t>(payload[0] << 8 | payload[1]) << 16;
            segmented_ = false;
            break;
        case kStartSegmentAddress:
        case kStartLinearAddress:
            break;  // an execution start address means nothing to a flash image
        default:
            fail(lineNumber_, "unknown record type " + hexNumber(type, 2));
        }
    }

    void requireCount(unsigned count, unsigned wanted, const char* what) const {
        if (count != wanted) {
            fail(lineNumber_, std::string(what) + " carries " + std::to_string(wanted) + " data bytes, not " +
                                  std::to_string(count));
        }
    }

    void placeData(unsigned offset, const unsigned char* data, std::size_t count) {
        if (segmented_ && offset + count > 0x10000) {
            // The offset wraps inside the segment.
            const std::size_t first = 0x10000 - offset;
            placeRun(base_ + offset, data, first);
            placeRun(base_, data + first, count - first);
        } else {
            placeRun(base_ + offset, data, count);
        }
    }

    // Keeps a run of data bytes; the image is laid out only once the whole
    // file is accepted, so memory follows the file's size, not its highest
    // address, until then.
    void placeRun(std::uint64_t start, const unsigned char* data, std::size_t count) {
        if (count == 0) return;
        const std::uint64_t end = start + count;
        if (end > maxImageBytes_) {
            fail(lineNumber_, "data at " + hexNumber(start, 8) + " reach past " + hexNumber(maxImageBytes_, 8) +
                                  ", the end of the largest supported image");
        }
        if (covered_.overlaps(start, end)) {
            fail(lineNumber_, "data at " + hexNumber(start, 8) + ".." + hexNumber(end - 1, 8) +
                                  " overlap data of an earlier record");
        }
        covered_.add(start, end);
        if (!runs_.empty() && runs_.back().address + runs_.back().count == start) {
            runs_.back().count += count;  // records in ascending order stay one run
        } else {
            runs_.push_back(Run{start, data_.size(), count});
        }
        data_.insert(data_.end(), data, data + count);
        extent_ = std::max(extent_, end);
    }

    // The records' data as address ranges; the image joins touching ones.
    std::vector<ImageRange> layOut() {
        std::vector<ImageRange> ranges;
        ranges.reserve(runs_.size());
        for (const Run& run : runs_) {
            const auto first = data_.begin() + static_cast<std::ptrdiff_t>(run.offset);
            ranges.push_back(ImageRange{run.address, std::vector<unsigned char>(first, first + static_cast<std::ptrdiff_t>(run.count))});
        }
        data_ = {};
        runs_ = {};
        return ranges;
    }

    // Data bytes bound for [address, address + count), kept at `offset` of data_.
    struct Run {
        std::uint64_t address;
        std::size_t offset;
        std::size_t count;
    };

    const std::string sourceName_;
    const std::uint64_t maxImageBytes_;
    std::size_t lineNumber_ = 0;
    bool sawEndOfFile_ = false;
    bool segmented_ = false;
    std::uint64_t base_ = 0;
    std::vector<unsigned char> record_;
    std::vector<unsigned char> data_;  // every data byte, in file order
    std::vector<Run> runs_;
    std::uint64_t extent_ = 0;  // one past the highest data address
    AddressRanges covered_;
};

}  // namespace

FlashImage parseIntelHex(std::istream& in, const std::string& sourceName, std::uint64_t maxImageBytes) {
    return IntelHexParser(sourceName, maxImageBytes).parse(in);
}

FlashImage readIntelHexImage(const std::string& path) {
    InputFile file = openInputFile(path);
    return parseIntelHex(file.stream, path);
}

}  // namespace vorant::formats
