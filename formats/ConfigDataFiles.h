#pragma once
#include "formats/FlashImage.h"
#include "host/ConfigData.h"

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace vorant::formats {

enum class ImageFormat { Binary, IntelHex, SRecord };

// One row per image format: the name --format takes, the extensions that
// pick it (lower case, with the dot), how a file of it reads.
struct ImageFormatInfo {
    ImageFormat format;
    const char* name;
    std::vector<std::string> extensions;
};
const std::vector<ImageFormatInfo>& imageFormats();
const ImageFormatInfo& formatInfo(ImageFormat format);
// "bin", "ihex", "srec"; nothing for another name.
std::optional<ImageFormat> formatNamed(const std::string& name);
// The format a known extension names; nothing for another or none.
std::optional<ImageFormat> formatOfExtension(const std::string& path);
// The lower-case extension with its dot, "" when there is none.
std::string lowerCaseExtension(const std::string& path);

// How an image file is to be read.
struct ImageOptions {
    std::optional<ImageFormat> format;  // --format: always wins
    std::optional<std::uint64_t> offset;  // --offset: where a binary image starts
};

// The format of an image file: the given one, else the extension's, else
// the content's (a first line starting with ':' is Intel HEX, with 'S' and
// a digit an S-record file). Throws FormatError when nothing decides.
ImageFormat imageFormatOf(const std::string& path, const ImageOptions& options = {});

// Reads an image file into memory. Throws FormatError naming the file (and
// the line, for text formats) when it is missing, unreadable, malformed, of
// no known format, holds no data at all ("empty image"), or given an offset
// it cannot take (text formats carry their own addresses).
FlashImage loadFlashImage(const std::string& path, const ImageOptions& options = {});
// The same behind the host's reader interface.
std::unique_ptr<ConfigDataReader> openConfigData(const std::string& path, const ImageOptions& options = {});

// A readback writer for path in `format`, or in the format its extension
// names (raw binary for an unknown one): ".mcs" Intel HEX with CRLF lines,
// ".hex" Intel HEX with LF lines, S-records for the S-record extensions.
// hexBytesPerRecord (16 or 32) applies to Intel HEX. Throws FormatError
// naming the file when it cannot be written; nothing is created then.
std::unique_ptr<ConfigDataWriter> openConfigDataWriter(const std::string& path, int hexBytesPerRecord = 16,
                                                       std::optional<ImageFormat> format = std::nullopt);

// Registers the writers with ConfigDataWriter::registerFormat for every
// extension of the table, and "" as binary. With `forced`, every extension
// writes that format. The factories answer null, creating nothing, when a
// file cannot be written.
void registerStandardFormats(int hexBytesPerRecord = 16, std::optional<ImageFormat> forced = std::nullopt);

}  // namespace vorant::formats
