#pragma once
#include <stdexcept>
#include <string>

namespace vorant::cli {

// A run that cannot do what was asked although the command line and its
// files are in order: a recording with nothing to play, a chip that does
// not answer or whose protection would make a write change nothing. Found
// before anything was written. The message is one line; the tool prints it
// and exits with status 1.
class ToolFailure : public std::runtime_error {
public:
    explicit ToolFailure(const std::string& message) : std::runtime_error(message) {}
};

}  // namespace vorant::cli
