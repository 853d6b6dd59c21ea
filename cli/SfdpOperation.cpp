#include "cli/SfdpOperation.h"

#include "cli/ChipProbe.h"
#include "cli/ToolMessages.h"
#include "formats/SfdpTable.h"

#include <algorithm>
#include <sstream>

namespace vorant::cli {

namespace {

// 5Ah, address 000000, one dummy byte: the answer starts at SFDP byte 0.
const std::string kReadSfdpFromStart = "01011010" + std::string(24, '0') + std::string(8, '0');
// More than any real table needs; a chip answering junk cannot make the
// tool read without end.
constexpr std::size_t kLargestArea = 4096;

}  // namespace

std::optional<std::vector<std::uint8_t>> readSfdpArea(ScanPort& port) {
    ChipProbe probe(port);
    // The header and the first parameter header: the least a table holds.
    auto header = probe.read(kReadSfdpFromStart, 16);
    if (!header) return std::nullopt;
    // A chip without SFDP answers something else (all ones, mostly): these
    // bytes are then the whole answer, and the decoder says what is wrong.
    // Reading on would fetch the largest area of junk, more than a cable
    // such as spidev (4 KiB buffer) moves in one transaction.
    if (!std::equal(header->begin(), header->begin() + 4, "SFDP")) return header;
    const std::size_t headerBytes = 8 + 8 * (static_cast<std::size_t>((*header)[6]) + 1);
    auto headers = probe.read(kReadSfdpFromStart, headerBytes);
    if (!headers) return std::nullopt;
    // The end of the furthest table a header points to.
    std::size_t end = headerBytes;
    for (std::size_t at = 8; at + 8 <= headerBytes; at += 8) {
        const std::size_t pointer = (*headers)[at + 4] | (*headers)[at + 5] << 8 | (*headers)[at + 6] << 16;
        end = std::max(end, pointer + 4 * static_cast<std::size_t>((*headers)[at + 3]));
    }
    return probe.read(kReadSfdpFromStart, std::min(end, kLargestArea));
}

bool showSfdp(ScanPort& port) {
    const auto area = readSfdpArea(port);
    if (!area) {
        toolError("the SFDP area could not be read over the port");
        return false;
    }
    try {
        std::istringstream lines(formats::describeSfdp(formats::decodeSfdp(*area)));
        for (std::string line; std::getline(lines, line);) toolStatus(line);
        return true;
    } catch (const formats::SfdpError& error) {
        toolError(std::string("the chip's SFDP area cannot be used: ") + error.what());
        return false;
    }
}

}  // namespace vorant::cli
