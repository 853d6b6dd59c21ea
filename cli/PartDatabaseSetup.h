#pragma once
#include <filesystem>
#include <string>
#include <vector>

namespace vorant::cli {

// Where the shipped part files are found, first match wins:
//   1. $VORANT_PARTS_DIR, when set (an explicit choice: it must be a folder);
//   2. <folder of the executable>/parts (the build and an install put the
//      part files there);
//   3. the source tree's parts folder the tool was built from.
// Throws UsageError when none is usable.
std::filesystem::path shippedPartsDirectory();

// Loads the shipped parts, then every extra file (or every *.toml of an
// extra folder) in order, into the process-wide part database; a part that
// replaces one of an earlier file is reported with one info line. Must run before any device exists: a device
// reads its whole configuration when it is built. Throws UsageError naming
// the file, part and key of the first invalid part.
void loadPartDatabase(const std::vector<std::string>& extraPartFiles);

}  // namespace vorant::cli
