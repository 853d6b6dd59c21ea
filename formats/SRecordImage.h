#pragma once
#include "formats/FlashImage.h"

#include <cstdint>
#include <istream>
#include <string>

namespace vorant::formats {

// Motorola S-records (.srec, .s19, .s28, .s37, .mot) into an image of the
// address ranges their data records name.
//
// Records taken: S1/S2/S3 data at 16-, 24- and 32-bit addresses (one file
// may mix them; an address is never cut to its record's width), S0 header
// (its text ignored), S5/S6 record counts (checked against the data records
// before them), S7/S8/S9 ends (the start address ignored; nothing may follow
// but blank lines). Every checksum is enforced. Lower-case digits, CR LF
// endings and a last line without an end are accepted.
//
// Errors, each a FormatError "<file>:<line>: <reason>": a line that is not
// 'S' and a type digit, an odd number or a non-hex digit, a count that
// disagrees with the line or leaves no room for the address, a checksum
// mismatch, the reserved S4, a wrong S5/S6 count, data overlapping earlier
// data, data past maxImageBytes, a record after the end record, and a file
// with no data record at all.
FlashImage readSRecordImage(const std::string& path);
FlashImage parseSRecords(std::istream& in, const std::string& sourceName,
                         std::uint64_t maxImageBytes = kLargestFlashBytes);

}  // namespace vorant::formats
