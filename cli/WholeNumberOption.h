#pragma once
#include <string>

namespace vorant::cli {

// The value of a numeric option, decimal or 0x-prefixed hexadecimal,
// checked against its range. `text` is what
// the user typed; every refusal quotes it as typed, so a number too large
// for any integer type is not shown as some other number. `allowed` says
// what to give instead ("give 1 to 1000000000 Hz"). Throws UsageError.
long long wholeNumberOption(const std::string& option, const std::string& text, long long lowest, long long highest,
                            const std::string& allowed);

}  // namespace vorant::cli
