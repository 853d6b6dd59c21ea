#pragma once
#include "formats/FlashImage.h"

#include <cstdint>
#include <istream>
#include <string>

namespace vorant::formats {

// The highest extent a HEX image may reach: the largest flash there is.
inline constexpr std::uint64_t kMaxIntelHexImageBytes = kLargestFlashBytes;

// Intel HEX (.hex, .mcs) into an image of the address ranges its records name.
//
// Records taken: 00 data, 01 end of file, 02 extended segment address,
// 04 extended linear address; 03 and 05 (start addresses) are accepted and
// ignored. Every record's checksum is enforced. Data after an 02 record wrap
// inside their 64 KiB segment; after an 04 record (or none) they run on
// linearly. Holes, and the space below the first record, read 0xFF.
//
// Blank lines and trailing white space (CR of CRLF files included) are
// ignored. Errors, each a FormatError "<file>:<line>: <reason>":
//   - a line that does not start with ':'
//   - an odd number of hex digits, or a character that is not a hex digit
//   - a record shorter than its five fixed bytes
//   - a byte count that disagrees with the digits on the line
//   - a checksum mismatch
//   - an unknown record type, or an 01/02/04 record of the wrong length
//   - a record after the end-of-file record
//   - data overlapping data of an earlier record
//   - data reaching past kMaxIntelHexImageBytes
//   - a file that ends without an end-of-file record (names its last line)
//
// The records are collected first and the ranges built once the whole file
// is accepted; memory follows the data, so a small file naming a far
// address costs no memory.
FlashImage readIntelHexImage(const std::string& path);

// The same from a stream; sourceName stands for the file in messages, and
// data past maxImageBytes are refused.
FlashImage parseIntelHex(std::istream& in, const std::string& sourceName,
                         std::uint64_t maxImageBytes = kMaxIntelHexImageBytes);

}  // namespace vorant::formats
