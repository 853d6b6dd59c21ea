#include "formats/InputFile.h"

#include "formats/FormatError.h"

#include <cerrno>
#include <cstring>
#include <filesystem>

namespace vorant::formats {

InputFile openInputFile(const std::string& path) {
    namespace fs = std::filesystem;
    std::error_code ec;
    const fs::file_status status = fs::status(path, ec);
    if (!fs::exists(status)) throw FormatError(path + ": no such file");
    if (fs::is_directory(status)) throw FormatError(path + ": is a directory, not a data file");

    InputFile file;
    errno = 0;
    file.stream.open(path, std::ios::in | std::ios::binary);
    if (!file.stream) {
        const std::string reason = errno != 0 ? std::strerror(errno) : "cannot be opened";
        throw FormatError(path + ": cannot open for reading: " + reason);
    }
    file.size = fs::file_size(path, ec);
    if (ec) throw FormatError(path + ": cannot read its size: " + ec.message());
    return file;
}

}  // namespace vorant::formats
