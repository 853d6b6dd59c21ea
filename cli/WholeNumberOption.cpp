#include "cli/WholeNumberOption.h"

#include "cli/UsageError.h"

#include <charconv>
#include <system_error>

namespace vorant::cli {

long long wholeNumberOption(const std::string& option, const std::string& text, long long lowest, long long highest,
                            const std::string& allowed) {
    long long value = 0;
    // Addresses are given in hexadecimal as often as not: "0x10000".
    const bool hex = text.size() > 2 && text[0] == '0' && (text[1] == 'x' || text[1] == 'X');
    const char* const begin = text.data() + (hex ? 2 : 0);
    const char* const end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(begin, end, value, hex ? 16 : 10);
    const bool number = begin != end && stop == end && error != std::errc::invalid_argument;
    if (!number) throw UsageError(option + " " + text + " is not a whole number; " + allowed);
    if (error == std::errc::result_out_of_range || value < lowest || value > highest)
        throw UsageError(option + " " + text + " is out of range; " + allowed);
    return value;
}

}  // namespace vorant::cli
