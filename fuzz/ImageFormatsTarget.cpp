#include "fuzz/FuzzTargets.h"

#include "formats/FormatError.h"
#include "formats/SRecordImage.h"
#include "formats/SfdpTable.h"

#include <sstream>
#include <stdexcept>
#include <string>

namespace vorant::fuzz {

void fuzzSRecords(const std::uint8_t* data, std::size_t size) {
    std::istringstream in(std::string(reinterpret_cast<const char*>(data), size));
    // A lower ceiling than the reader's own keeps each run fast.
    constexpr std::uint64_t kCeilingBytes = 4 << 20;
    try {
        const formats::FlashImage image = formats::parseSRecords(in, "fuzz.srec", kCeilingBytes);
        if (image.byteSize() > kCeilingBytes) throw std::logic_error("the image passed its ceiling");
        std::uint64_t end = 0;
        for (const formats::ImageRange& range : image.ranges()) {
            if (range.bytes.empty() || range.address < end) throw std::logic_error("ranges empty or out of order");
            end = range.end();
        }
    } catch (const formats::FormatError&) {
    }
}

void fuzzSfdp(const std::uint8_t* data, std::size_t size) {
    try {
        const formats::SfdpTable table = formats::decodeSfdp(std::vector<std::uint8_t>(data, data + size));
        for (const auto& erase : table.eraseTypes)
            if (erase.sizeBytes == 0) throw std::logic_error("an erase type of 0 bytes passed as valid");
    } catch (const formats::SfdpError&) {
    }
}

}  // namespace vorant::fuzz
