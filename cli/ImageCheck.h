#pragma once
#include "host/ConfigData.h"

#include <memory>
#include <string>

namespace vorant::cli {

// Registers the readback writers and opens the configuration data of
// program, verify and checksum (.bin raw, .hex/.mcs Intel HEX). Throws
// UsageError naming the file when it is missing, unreadable, empty or
// malformed.
std::unique_ptr<ConfigDataReader> openImage(const std::string& path);

// Throws UsageError when the image reaches past the end of the part.
void checkImageFits(ConfigDataReader& image, const std::string& path, const std::string& partName);

// Throws UsageError when the readback file cannot be written (its folder
// is missing, it is a folder, ...). Creates nothing.
void checkReadbackTarget(const std::string& path);

}  // namespace vorant::cli
