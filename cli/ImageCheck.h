#pragma once
#include "formats/ConfigDataFiles.h"
#include "host/ConfigData.h"

#include <memory>
#include <string>

namespace vorant::cli {

// Opens the configuration data of program, verify and checksum: binary
// (at --offset), Intel HEX or S-records, by --format, extension or content.
// Throws UsageError naming the file when it is missing, unreadable, empty,
// malformed or of no known format.
std::unique_ptr<ConfigDataReader> openImage(const std::string& path, const formats::ImageOptions& options = {});

// Throws UsageError when the image reaches past the end of the part.
void checkImageFits(ConfigDataReader& image, const std::string& path, const std::string& partName);

// Throws UsageError when the readback file cannot be written (its folder
// is missing, it is a folder, ...). Creates nothing.
void checkReadbackTarget(const std::string& path);

}  // namespace vorant::cli
