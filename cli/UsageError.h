#pragma once
#include <stdexcept>
#include <string>

namespace vorant::cli {

// A problem with what the user asked for (option, file, part, value),
// found before anything reached the flash. The message is one line that
// says what to do; the tool prints it and exits with status 2.
class UsageError : public std::runtime_error {
public:
    explicit UsageError(const std::string& message) : std::runtime_error(message) {}
};

}  // namespace vorant::cli
