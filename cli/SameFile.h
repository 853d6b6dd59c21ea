#pragma once
#include <string>

namespace vorant::cli {

// Whether two names lead to the same file: the same existing file (links
// and different spellings included), or, where one does not exist yet, the
// same normalised path.
bool sameFile(const std::string& first, const std::string& second);

}  // namespace vorant::cli
