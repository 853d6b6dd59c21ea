#include "ports/svf/SvfSeconds.h"

namespace vorant::svf {

std::string formatSvfSeconds(std::uint64_t microseconds) {
    if (microseconds == 0) return "0.0E+00";
    const std::string digits = std::to_string(microseconds);
    const long exponent = static_cast<long>(digits.size()) - 1 - 6;
    // Significant digits after the first, without trailing zeros; at least
    // one digit follows the point.
    std::size_t fractionEnd = digits.find_last_not_of('0') + 1;
    if (fractionEnd < 2) fractionEnd = 2;
    std::string text;
    text.push_back(digits[0]);
    text.push_back('.');
    for (std::size_t i = 1; i < fractionEnd; ++i) text.push_back(i < digits.size() ? digits[i] : '0');
    text.push_back('E');
    text.push_back(exponent < 0 ? '-' : '+');
    const long magnitude = exponent < 0 ? -exponent : exponent;
    if (magnitude < 10) text.push_back('0');
    text += std::to_string(magnitude);
    return text;
}

}  // namespace vorant::svf
