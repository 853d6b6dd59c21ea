#pragma once
#include <stdexcept>
#include <string>

namespace vorant::formats {

// A configuration data file that cannot be read or written. The message
// names the file and, for text formats, the line at fault.
class FormatError : public std::runtime_error {
public:
    explicit FormatError(const std::string& message) : std::runtime_error(message) {}
};

}  // namespace vorant::formats
