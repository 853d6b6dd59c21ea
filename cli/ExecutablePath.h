#pragma once
#include <filesystem>

namespace vorant::cli {

// The folder of the running executable; empty when the system cannot say.
std::filesystem::path executableDirectory();

}  // namespace vorant::cli
