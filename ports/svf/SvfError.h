#pragma once
// Errors of the SVF components: a file that cannot be written or read, and
// malformed SVF text (with the line it was found on).

#include <cstddef>
#include <stdexcept>
#include <string>

namespace vorant::svf {

class SvfError : public std::runtime_error {
public:
    explicit SvfError(const std::string& what) : std::runtime_error(what) {}
};

// "line 12: bad hex digit 'G'". line() is 1-based.
class SvfParseError : public SvfError {
public:
    SvfParseError(std::size_t line, const std::string& reason)
        : SvfError("line " + std::to_string(line) + ": " + reason), line_(line), reason_(reason) {}

    std::size_t line() const { return line_; }
    const std::string& reason() const { return reason_; }

private:
    std::size_t line_;
    std::string reason_;
};

}  // namespace vorant::svf
