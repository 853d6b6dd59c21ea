#pragma once
#include <stdexcept>
#include <string>

namespace vorant::cli {

// The chip on the cable cannot take the operation (it does not answer, or
// its protection would make a write change nothing), found before the
// operation's first scan. Not a usage error: the request was sound, the
// chip is not. The tool prints the line and exits with status 1.
class RunRefused : public std::runtime_error {
public:
    explicit RunRefused(const std::string& message) : std::runtime_error(message) {}
};

}  // namespace vorant::cli
