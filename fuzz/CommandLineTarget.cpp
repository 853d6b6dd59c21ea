#include "fuzz/FuzzTargets.h"

#include "cli/CommandLine.h"
#include "cli/UsageError.h"

#include <string>
#include <vector>

namespace vorant::fuzz {

void fuzzCommandLine(const std::uint8_t* data, std::size_t size) {
    // A NUL ends an argument, as in a real argv, so no argument holds one.
    std::vector<std::string> arguments(1);
    for (std::size_t i = 0; i < size; ++i) {
        if (data[i] == 0) arguments.emplace_back();
        else arguments.back().push_back(static_cast<char>(data[i]));
    }
    if (size == 0) arguments.clear();
    try {
        cli::parseCommandLine(arguments);
    } catch (const cli::UsageError&) {
    }
}

}  // namespace vorant::fuzz
