#include "formats/SfdpTable.h"

#include <cstdio>
#include <sstream>

namespace vorant::formats {

namespace {

constexpr std::uint16_t kBasicTableId = 0xFF00;
constexpr std::uint16_t kFourByteTableId = 0xFF84;
// The first revision's basic table: density (DWORD 2) and the erase types
// (DWORDs 8 and 9) are all this decoder cannot do without.
constexpr std::uint32_t kShortestBasicTable = 9;

std::string hex(std::uint32_t value, int digits) {
    char text[16];
    std::snprintf(text, sizeof text, "%0*X", digits, static_cast<unsigned>(value));
    return text;
}

class SfdpReader {
public:
    explicit SfdpReader(const std::vector<std::uint8_t>& bytes) : bytes_(bytes) {}

    std::uint32_t dword(std::uint32_t address) const {
        return static_cast<std::uint32_t>(bytes_[address]) | static_cast<std::uint32_t>(bytes_[address + 1]) << 8 |
               static_cast<std::uint32_t>(bytes_[address + 2]) << 16 |
               static_cast<std::uint32_t>(bytes_[address + 3]) << 24;
    }

    // The DWORDs of one parameter table; the table must lie within the bytes.
    std::vector<std::uint32_t> table(const SfdpParameterHeader& header, const char* name) const {
        if (header.lengthDwords == 0) throw SfdpError(std::string(name) + " has a length of 0 DWORDs");
        const std::uint64_t end = header.pointer + 4ull * header.lengthDwords;
        if (end > bytes_.size())
            throw SfdpError(std::string(name) + " at 0x" + hex(header.pointer, 6) + " (" +
                            std::to_string(header.lengthDwords) + " DWORDs) runs past the " +
                            std::to_string(bytes_.size()) + " bytes read");
        std::vector<std::uint32_t> dwords;
        for (std::uint32_t i = 0; i < header.lengthDwords; ++i) dwords.push_back(dword(header.pointer + 4 * i));
        return dwords;
    }

private:
    const std::vector<std::uint8_t>& bytes_;
};

std::uint32_t field(std::uint32_t value, int low, int bits) { return (value >> low) & ((1u << bits) - 1); }

void decodeEraseTimes(std::uint32_t dw10, SfdpTable& table) {
    const std::uint32_t factor = 2 * (field(dw10, 0, 4) + 1);
    static const std::uint32_t kUnitMs[] = {1, 16, 128, 1000};
    for (SfdpEraseType& erase : table.eraseTypes) {
        const std::uint32_t time = field(dw10, 4 + 7 * (erase.type - 1), 7);
        erase.typicalMs = (field(time, 0, 5) + 1) * kUnitMs[field(time, 5, 2)];
        erase.maximumMs = *erase.typicalMs * factor;
    }
}

void decodeProgramAndChipErase(std::uint32_t dw11, SfdpTable& table) {
    const std::uint32_t factor = 2 * (field(dw11, 0, 4) + 1);
    table.pageBytes = 1u << field(dw11, 4, 4);
    table.pageProgramTypicalUs = (field(dw11, 8, 5) + 1) * (field(dw11, 13, 1) ? 64u : 8u);
    table.pageProgramMaximumUs = *table.pageProgramTypicalUs * factor;
    static const std::uint64_t kUnitMs[] = {16, 256, 4000, 64000};
    table.chipEraseTypicalMs = (field(dw11, 24, 5) + 1) * kUnitMs[field(dw11, 29, 2)];
    table.chipEraseMaximumMs = *table.chipEraseTypicalMs * factor;
}

void decodeBasicTable(const std::vector<std::uint32_t>& dw, SfdpTable& table) {
    if (dw.size() < kShortestBasicTable)
        throw SfdpError("the basic flash parameter table has " + std::to_string(dw.size()) +
                        " DWORDs, fewer than the 9 of the first revision");
    // DWORD numbers below follow the standard's numbering from 1.
    const std::uint32_t dw1 = dw[0], dw2 = dw[1];
    if (field(dw1, 0, 2) == 1) table.erase4kOpcode = static_cast<std::uint8_t>(field(dw1, 8, 8));
    table.addressing = static_cast<SfdpAddressing>(field(dw1, 17, 2));

    if (dw2 & 0x80000000u) {
        const std::uint32_t exponent = dw2 & 0x7FFFFFFFu;
        if (exponent < 3 || exponent > 63)
            throw SfdpError("the density 2^" + std::to_string(exponent) + " bits is not a whole number of bytes");
        table.densityBytes = 1ull << (exponent - 3);
    } else {
        table.densityBytes = (static_cast<std::uint64_t>(dw2) + 1) / 8;
    }
    if (table.densityBytes == 0) throw SfdpError("the density is 0");

    for (int type = 1; type <= 4; ++type) {
        const std::uint32_t half = field(dw[type <= 2 ? 7 : 8], type % 2 ? 0 : 16, 16);
        const std::uint32_t exponent = field(half, 0, 8);
        if (exponent == 0) continue;  // type absent, whatever its opcode byte says
        // An erase size is kept in 32 bits: a larger one fits no chip here.
        if (exponent > 31 || (1ull << exponent) > table.densityBytes)
            throw SfdpError("erase type " + std::to_string(type) + " of 2^" + std::to_string(exponent) +
                            " bytes is larger than the chip or than 4 GiB");
        SfdpEraseType erase;
        erase.type = type;
        erase.sizeBytes = static_cast<std::uint32_t>(1ull << exponent);
        erase.opcode = static_cast<std::uint8_t>(field(half, 8, 8));
        table.eraseTypes.push_back(erase);
    }
    if (table.eraseTypes.empty()) throw SfdpError("the basic flash parameter table lists no erase type");

    // Later fields by the table's length, not by its revision: real tables
    // claim an old revision with a long layout.
    if (dw.size() >= 10) decodeEraseTimes(dw[9], table);
    if (dw.size() >= 11) decodeProgramAndChipErase(dw[10], table);
    if (dw.size() >= 14 && !(dw[13] & 0x80000000u)) {
        table.deepPowerDownOpcode = static_cast<std::uint8_t>(field(dw[13], 23, 8));
        table.releaseOpcode = static_cast<std::uint8_t>(field(dw[13], 15, 8));
    }
    if (dw.size() >= 15) table.quadEnableRequirement = static_cast<int>(field(dw[14], 20, 3));
}

void decodeFourByteTable(const std::vector<std::uint32_t>& dw, SfdpTable& table) {
    if (dw.size() < 2) return;  // too short to say anything: as if absent
    table.hasFourByteTable = true;
    table.fourByteRead = dw[0] & (1u << 0);
    table.fourByteFastRead = dw[0] & (1u << 1);
    table.fourBytePageProgram = dw[0] & (1u << 6);
    for (SfdpEraseType& erase : table.eraseTypes)
        if (dw[0] & (1u << (8 + erase.type)))
            erase.opcode4 = static_cast<std::uint8_t>(field(dw[1], 8 * (erase.type - 1), 8));
}

const char* addressingText(SfdpAddressing addressing) {
    switch (addressing) {
    case SfdpAddressing::ThreeByteOnly: return "3-byte only";
    case SfdpAddressing::ThreeOrFourByte: return "3- or 4-byte";
    case SfdpAddressing::FourByteOnly: return "4-byte only";
    case SfdpAddressing::Reserved: break;
    }
    return "reserved value";
}

const char* quadEnableText(int requirement) {
    switch (requirement) {
    case 0: return "no Quad Enable bit";
    case 1: return "register 2 bit 1, written with a two-byte 01h (a one-byte 01h clears register 2)";
    case 2: return "register 1 bit 6, written with a one-byte 01h";
    case 3: return "register 2 bit 7, written with 3Eh and read with 3Fh";
    case 4: return "register 2 bit 1, written with a two-byte 01h (a one-byte 01h leaves register 2)";
    case 5: return "register 2 bit 1, read with 35h, written with a two-byte 01h";
    case 6: return "register 2 bit 1, read with 35h, written alone with 31h";
    default: return "reserved value";
    }
}

}  // namespace

const SfdpEraseType* SfdpTable::eraseOfSize(std::uint32_t bytes) const {
    for (const SfdpEraseType& erase : eraseTypes)
        if (erase.sizeBytes == bytes) return &erase;
    return nullptr;
}

SfdpTable decodeSfdp(const std::vector<std::uint8_t>& bytes) {
    if (bytes.size() < 16) throw SfdpError("only " + std::to_string(bytes.size()) + " bytes, too few for an SFDP header");
    if (bytes[0] != 'S' || bytes[1] != 'F' || bytes[2] != 'D' || bytes[3] != 'P')
        throw SfdpError("no SFDP signature (read " + hex(bytes[0], 2) + " " + hex(bytes[1], 2) + " " +
                        hex(bytes[2], 2) + " " + hex(bytes[3], 2) + ")");
    SfdpTable table;
    table.minorRevision = bytes[4];
    table.majorRevision = bytes[5];
    if (table.majorRevision != 1)
        throw SfdpError("SFDP major revision " + std::to_string(table.majorRevision) + " is not 1");
    const std::size_t count = static_cast<std::size_t>(bytes[6]) + 1;
    if (8 + 8 * count > bytes.size())
        throw SfdpError(std::to_string(count) + " parameter headers overrun the " + std::to_string(bytes.size()) +
                        " bytes read");

    SfdpReader reader(bytes);
    for (std::size_t i = 0; i < count; ++i) {
        const std::size_t at = 8 + 8 * i;
        SfdpParameterHeader header;
        header.id = static_cast<std::uint16_t>(bytes[at + 7] << 8 | bytes[at]);
        header.minorRevision = bytes[at + 1];
        header.majorRevision = bytes[at + 2];
        header.lengthDwords = bytes[at + 3];
        header.pointer = reader.dword(at + 4) & 0xFFFFFFu;
        table.headers.push_back(header);
    }
    // Header 0 is the basic table (older chips leave its ID's high byte
    // unset); a later basic table of a higher revision supersedes it.
    if ((table.headers[0].id & 0xFF) != 0x00)
        throw SfdpError("parameter header 0 is not the basic flash parameter table (ID " + hex(table.headers[0].id, 4) +
                        ")");
    table.basic = table.headers[0];
    for (std::size_t i = 1; i < count; ++i) {
        const SfdpParameterHeader& header = table.headers[i];
        if (header.id == kBasicTableId && header.majorRevision == 1 &&
            (header.minorRevision > table.basic.minorRevision ||
             (header.minorRevision == table.basic.minorRevision && header.lengthDwords > table.basic.lengthDwords)))
            table.basic = header;
    }
    decodeBasicTable(reader.table(table.basic, "the basic flash parameter table"), table);
    for (const SfdpParameterHeader& header : table.headers)
        if (header.id == kFourByteTableId)
            decodeFourByteTable(reader.table(header, "the 4-byte address instruction table"), table);
    return table;
}

std::string describeSfdp(const SfdpTable& table) {
    std::ostringstream out;
    out << "SFDP revision " << table.majorRevision << "." << table.minorRevision << ", " << table.headers.size()
        << " parameter table" << (table.headers.size() == 1 ? "" : "s") << "\n";
    for (const SfdpParameterHeader& header : table.headers)
        out << "  table " << hex(header.id, 4) << " revision " << header.majorRevision << "." << header.minorRevision
            << ", " << header.lengthDwords << " DWORDs at 0x" << hex(header.pointer, 6) << "\n";
    out << "Density: " << table.densityBytes << " bytes\n";
    out << "Addressing: " << addressingText(table.addressing) << "\n";
    for (const SfdpEraseType& erase : table.eraseTypes) {
        out << "Erase type " << erase.type << ": " << erase.sizeBytes << " bytes, opcode " << hex(erase.opcode, 2) << "h";
        if (erase.opcode4) out << " (4-byte " << hex(*erase.opcode4, 2) << "h)";
        if (erase.typicalMs) out << ", typical " << *erase.typicalMs << " ms, maximum " << *erase.maximumMs << " ms";
        out << "\n";
    }
    if (table.pageBytes) {
        out << "Page: " << *table.pageBytes << " bytes, program typical " << *table.pageProgramTypicalUs
            << " us, maximum " << *table.pageProgramMaximumUs << " us\n";
        out << "Chip erase: typical " << *table.chipEraseTypicalMs << " ms, maximum " << *table.chipEraseMaximumMs
            << " ms\n";
    } else {
        out << "Page size and times: not in this table (before revision 1.5)\n";
    }
    if (table.quadEnableRequirement)
        out << "Quad Enable: " << quadEnableText(*table.quadEnableRequirement) << " (requirement "
            << *table.quadEnableRequirement << ")\n";
    if (table.deepPowerDownOpcode)
        out << "Deep power-down: " << hex(*table.deepPowerDownOpcode, 2) << "h, release " << hex(*table.releaseOpcode, 2)
            << "h\n";
    if (table.hasFourByteTable)
        out << "4-byte opcodes: read " << (table.fourByteRead ? "13h" : "none") << ", page program "
            << (table.fourBytePageProgram ? "12h" : "none") << "\n";
    return out.str();
}

}  // namespace vorant::formats
