#pragma once
#include "formats/FlashImage.h"
#include "host/ConfigData.h"

#include <memory>
#include <string>

namespace vorant::formats {

// The file formats, picked from the file name's extension, ignoring case:
// ".hex" and ".mcs" are Intel HEX, everything else (".bin" included, and no
// extension) is raw binary.
enum class ConfigDataFormat { Binary, IntelHex };
ConfigDataFormat formatOfFile(const std::string& path);
// The lower-case extension with its dot, "" when there is none.
std::string lowerCaseExtension(const std::string& path);

// Reads a configuration data file into memory. Throws FormatError naming
// the file (and the line, for Intel HEX) when it is missing, unreadable,
// malformed, too large, or holds no data at all ("empty image").
FlashImage loadFlashImage(const std::string& path);
// The same behind the host's reader interface.
std::unique_ptr<ConfigDataReader> openConfigData(const std::string& path);

// A readback writer for path in the format its extension names: ".mcs"
// Intel HEX with CRLF lines, ".hex" Intel HEX with LF lines, anything else
// raw binary. hexBytesPerRecord (16 or 32) applies to Intel HEX. Throws
// FormatError naming the file when it cannot be written; nothing is created
// then. The CLI can call this first to report why a readback target is
// unusable, since the host's CreateWriter only answers null.
std::unique_ptr<ConfigDataWriter> openConfigDataWriter(const std::string& path, int hexBytesPerRecord = 16);

// Registers the writers with ConfigDataWriter::registerFormat: ".bin" and ""
// binary, ".hex" Intel HEX (LF), ".mcs" Intel HEX (CRLF). The factories
// answer null, creating nothing, when a file cannot be written.
void registerStandardFormats(int hexBytesPerRecord = 16);

}  // namespace vorant::formats
