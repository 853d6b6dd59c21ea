#pragma once
// Why a port could not be opened or completed, as one line of the form
// "what is wrong; what to do".

#include <stdexcept>
#include <string>

namespace vorant::ports {

class PortError : public std::runtime_error {
public:
    enum class Kind {
        // The address, an option or a file the user named is wrong: nothing
        // was sent or created.
        BadRequest,
        // The cable, server or output is not there or went away.
        Unavailable,
    };
    PortError(Kind kind, const std::string& message) : std::runtime_error(message), kind_(kind) {}
    Kind kind() const { return kind_; }

private:
    Kind kind_;
};

}  // namespace vorant::ports
