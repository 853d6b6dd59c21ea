#include "cli/ExecutablePath.h"

#ifdef _WIN32
#include <windows.h>

#include <vector>
#else
#include <system_error>
#endif

namespace vorant::cli {

std::filesystem::path executableDirectory() {
#ifdef _WIN32
    std::vector<wchar_t> buffer(MAX_PATH);
    for (;;) {
        const DWORD length = GetModuleFileNameW(nullptr, buffer.data(), static_cast<DWORD>(buffer.size()));
        if (length == 0) return {};
        if (length < buffer.size()) return std::filesystem::path(std::wstring(buffer.data(), length)).parent_path();
        buffer.resize(buffer.size() * 2);  // the path was cut: try a larger buffer
    }
#else
    std::error_code error;
    const std::filesystem::path self = std::filesystem::read_symlink("/proc/self/exe", error);
    if (error) return {};
    return self.parent_path();
#endif
}

}  // namespace vorant::cli
