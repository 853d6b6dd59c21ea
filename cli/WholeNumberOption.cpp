#include "cli/WholeNumberOption.h"

#include "cli/UsageError.h"

#include <charconv>
#include <system_error>

namespace vorant::cli {

long long wholeNumberOption(const std::string& option, const std::string& text, long long lowest, long long highest,
                            const std::string& allowed) {
    long long value = 0;
    const char* const end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, value);
    const bool number = !text.empty() && stop == end && error != std::errc::invalid_argument;
    if (!number) throw UsageError(option + " " + text + " is not a whole number; " + allowed);
    if (error == std::errc::result_out_of_range || value < lowest || value > highest)
        throw UsageError(option + " " + text + " is out of range; " + allowed);
    return value;
}

}  // namespace vorant::cli
