#include "cli/SameFile.h"

#include <filesystem>
#include <system_error>

namespace vorant::cli {

bool sameFile(const std::string& first, const std::string& second) {
    if (first.empty() || second.empty()) return false;
    std::error_code error;
    if (std::filesystem::exists(first, error) && std::filesystem::exists(second, error)) {
        const bool equivalent = std::filesystem::equivalent(first, second, error);
        return !error && equivalent;
    }
    const auto normalFirst = std::filesystem::weakly_canonical(first, error);
    if (error) return false;
    const auto normalSecond = std::filesystem::weakly_canonical(second, error);
    return !error && normalFirst == normalSecond;
}

}  // namespace vorant::cli
