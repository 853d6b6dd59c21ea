#pragma once
// Reads a whole SVF text only to check it, before anything is played, and
// tells what it holds: a file that plays nothing can be refused as such.

#include <cstdint>
#include <filesystem>
#include <istream>

namespace vorant::svf {

struct SvfContents {
    std::uint64_t statements = 0;
    // SDR and SIR statements that shift at least one bit.
    std::uint64_t scans = 0;
};

// Throws SvfParseError for malformed text.
SvfContents checkSvf(std::istream& in);
// The same for a file: a parse error names the file after its reason, and a
// file that cannot be read throws SvfError.
SvfContents checkSvfFile(const std::filesystem::path& file);

}  // namespace vorant::svf
