#pragma once
// The Serial Flash Discoverable Parameters a chip answers to 5Ah, decoded:
// the header, the parameter headers and the parts of the Basic Flash
// Parameter Table (and of the 4-byte address instruction table) that tell
// how to erase, program and address the chip. A pure decoder: bytes in,
// table out, no I/O.

#include <cstdint>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

namespace vorant::formats {

// A table that cannot be what it claims: the message says which field.
class SfdpError : public std::runtime_error {
public:
    explicit SfdpError(const std::string& message) : std::runtime_error(message) {}
};

struct SfdpParameterHeader {
    std::uint16_t id = 0;  // MSB:LSB, 0xFF00 for the basic table
    int majorRevision = 0, minorRevision = 0;
    std::uint32_t lengthDwords = 0;
    std::uint32_t pointer = 0;  // byte address in the SFDP area
};

// One erase the chip offers. Types are kept in table order (1..4), which is
// not size order.
struct SfdpEraseType {
    int type = 0;                 // 1..4
    std::uint32_t sizeBytes = 0;
    std::uint8_t opcode = 0;
    std::optional<std::uint8_t> opcode4;         // 4-byte address form, from the 4BAIT
    std::optional<std::uint32_t> typicalMs;      // rev 1.5+ tables
    std::optional<std::uint32_t> maximumMs;
};

enum class SfdpAddressing { ThreeByteOnly, ThreeOrFourByte, FourByteOnly, Reserved };

struct SfdpTable {
    int majorRevision = 0, minorRevision = 0;
    std::vector<SfdpParameterHeader> headers;  // exactly the counted ones
    SfdpParameterHeader basic;                 // the basic table used
    std::uint64_t densityBytes = 0;
    SfdpAddressing addressing = SfdpAddressing::ThreeByteOnly;
    std::optional<std::uint8_t> erase4kOpcode;  // DWORD 1, when 4 KiB erase is flagged uniform
    std::vector<SfdpEraseType> eraseTypes;
    // Present in basic tables of 11 DWORDs or more (revision 1.5 layout).
    std::optional<std::uint32_t> pageBytes;
    std::optional<std::uint32_t> pageProgramTypicalUs, pageProgramMaximumUs;
    std::optional<std::uint64_t> chipEraseTypicalMs, chipEraseMaximumMs;
    // DWORD 15 bits 22:20 (15 DWORDs or more): the Quad Enable requirement.
    std::optional<int> quadEnableRequirement;
    // DWORD 14 (14 DWORDs or more): deep power-down opcodes, when supported.
    std::optional<std::uint8_t> deepPowerDownOpcode, releaseOpcode;
    // The 4-byte address instruction table, when the chip has one.
    bool hasFourByteTable = false;
    bool fourByteRead = false, fourByteFastRead = false, fourBytePageProgram = false;

    // The erase type of the given size, or nothing.
    const SfdpEraseType* eraseOfSize(std::uint32_t bytes) const;
};

// Decodes an SFDP area read from address 0. Throws SfdpError for a table
// that is malformed (signature, revision, a header or table past the end of
// the bytes, a zero length) or that lies (density 0, no erase type, an erase
// larger than the chip).
SfdpTable decodeSfdp(const std::vector<std::uint8_t>& bytes);

// The table as text, one fact a line, for `vorant-spi sfdp`.
std::string describeSfdp(const SfdpTable& table);

}  // namespace vorant::formats
