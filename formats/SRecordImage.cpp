#include "formats/SRecordImage.h"

#include "formats/AddressRanges.h"
#include "formats/FormatError.h"
#include "formats/RecordLines.h"
#include "formats/HexText.h"
#include "formats/InputFile.h"

#include <cstdio>
#include <vector>

namespace vorant::formats {
namespace {

// Address bytes of each record type; 0 for the reserved S4.
constexpr int kAddressBytes[10] = {2, 2, 3, 4, 0, 2, 3, 4, 3, 2};

class SRecordParser {
public:
    SRecordParser(const std::string& sourceName, std::uint64_t maxImageBytes)
        : sourceName_(sourceName), maxImageBytes_(maxImageBytes) {}

    FlashImage parse(std::istream& in) {
        forEachRecordLine(in, sourceName_, lineNumber_,
                          [this](const std::string& line, std::size_t length) { parseLine(line, length); });
        if (ranges_.empty()) fail(lineNumber_, "no data record (S1, S2 or S3) in the file");
        return FlashImage(std::move(ranges_));
    }

private:
    [[noreturn]] void fail(std::size_t line, const std::string& reason) const {
        throw FormatError(sourceName_ + ":" + std::to_string(line) + ": " + reason);
    }

    void parseLine(const std::string& line, std::size_t length) {
        if (ended_) fail(lineNumber_, "record after the end record (S7, S8 or S9)");
        if (length < 2 || line[0] != 'S' || line[1] < '0' || line[1] > '9')
            fail(lineNumber_, "a record starts with 'S' and a type digit");
        const int type = line[1] - '0';
        if (type == 4) fail(lineNumber_, "S4 is a reserved record type");
        decodeBytes(line, length);
        checkRecord(type);
        handleRecord(type);
    }

    void decodeBytes(const std::string& line, std::size_t length) {
        if ((length - 2) % 2 != 0) fail(lineNumber_, "an odd number of hex digits");
        bytes_.clear();
        for (std::size_t i = 2; i < length; i += 2) {
            const int high = hexDigitValue(line[i]), low = hexDigitValue(line[i + 1]);
            if (high < 0 || low < 0) fail(lineNumber_, "a character that is not a hex digit at column " +
                                                           std::to_string(high < 0 ? i + 1 : i + 2));
            bytes_.push_back(static_cast<unsigned char>(high * 16 + low));
        }
    }

    void checkRecord(int type) {
        if (bytes_.empty()) fail(lineNumber_, "no byte count");
        const std::size_t count = bytes_[0];
        if (count != bytes_.size() - 1)
            fail(lineNumber_, "the count says " + std::to_string(count) + " bytes follow, the line holds " +
                                  std::to_string(bytes_.size() - 1));
        if (count < static_cast<std::size_t>(kAddressBytes[type]) + 1)
            fail(lineNumber_, "a count of " + std::to_string(count) + " leaves no room for the address and checksum");
        unsigned sum = 0;
        for (unsigned char byte : bytes_) sum += byte;
        if ((sum & 0xFF) != 0xFF) fail(lineNumber_, "checksum mismatch");
    }

    void handleRecord(int type) {
        const int addressBytes = kAddressBytes[type];
        std::uint64_t address = 0;
        for (int i = 0; i < addressBytes; ++i) address = address << 8 | bytes_[1 + static_cast<std::size_t>(i)];
        const std::size_t dataStart = 1 + static_cast<std::size_t>(addressBytes);
        const std::size_t dataCount = bytes_.size() - dataStart - 1;
        switch (type) {
        case 1:
        case 2:
        case 3: addData(address, dataStart, dataCount); break;
        case 5:
        case 6:
            if (address != dataRecords_ % (std::uint64_t{1} << (8 * addressBytes)))
                fail(lineNumber_, "the count record says " + std::to_string(address) + " data records, " +
                                      std::to_string(dataRecords_) + " came before it");
            break;
        case 7:
        case 8:
        case 9: ended_ = true; break;
        default: break;  // S0: a header whose text means nothing to a flash
        }
    }

    void addData(std::uint64_t address, std::size_t dataStart, std::size_t count) {
        ++dataRecords_;
        if (count == 0) return;
        const std::uint64_t end = address + count;
        if (end > maxImageBytes_)
            fail(lineNumber_, "data at " + hexNumber(address) + " reach past " + hexNumber(maxImageBytes_));
        if (covered_.overlaps(address, end))
            fail(lineNumber_, "data at " + hexNumber(address) + " overlap data of an earlier record");
        covered_.add(address, end);
        const auto first = bytes_.begin() + static_cast<std::ptrdiff_t>(dataStart);
        if (!ranges_.empty() && ranges_.back().end() == address) {
            ranges_.back().bytes.insert(ranges_.back().bytes.end(), first, first + static_cast<std::ptrdiff_t>(count));
        } else {
            ranges_.push_back(ImageRange{address, std::vector<unsigned char>(first, first + static_cast<std::ptrdiff_t>(count))});
        }
    }

    const std::string sourceName_;
    const std::uint64_t maxImageBytes_;
    std::size_t lineNumber_ = 0;
    std::vector<unsigned char> bytes_;
    std::vector<ImageRange> ranges_;
    AddressRanges covered_;
    std::uint64_t dataRecords_ = 0;
    bool ended_ = false;
};

}  // namespace

FlashImage parseSRecords(std::istream& in, const std::string& sourceName, std::uint64_t maxImageBytes) {
    return SRecordParser(sourceName, maxImageBytes).parse(in);
}

FlashImage readSRecordImage(const std::string& path) {
    InputFile file = openInputFile(path);
    return parseSRecords(file.stream, path);
}

}  // namespace vorant::formats
