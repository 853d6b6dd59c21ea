#pragma once
#include <cstdint>
#include <fstream>
#include <string>

namespace vorant::formats {

// An open configuration data file and its size in bytes.
struct InputFile {
    std::ifstream stream;
    std::uintmax_t size = 0;
};

// Opens path for reading in binary mode. A missing file, a directory, or a
// file that cannot be opened gives a FormatError that names the file.
InputFile openInputFile(const std::string& path);

}  // namespace vorant::formats
