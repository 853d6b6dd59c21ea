#pragma once
#include <string>

namespace vorant::cli {

// The tool's own messages, through the message manager like the device's,
// so the installed sink applies the same rules (--quiet, "INFO: ",
// "ERROR: " on stderr).
void toolStatus(const std::string& text);
void toolInfo(const std::string& text);
void toolError(const std::string& text);

}  // namespace vorant::cli
