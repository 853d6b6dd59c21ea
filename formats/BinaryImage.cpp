#include "formats/BinaryImage.h"

#include "formats/FormatError.h"
#include "formats/InputFile.h"

#include <vector>

namespace vorant::formats {

FlashImage readBinaryImage(const std::string& path, std::uint64_t offset) {
    InputFile file = openInputFile(path);
    if (offset + file.size > kLargestFlashBytes) {
        throw FormatError(path + ": " + std::to_string(file.size) + " bytes from offset " + std::to_string(offset) +
                          " reach past the largest flash there is (" + std::to_string(kLargestFlashBytes) +
                          " bytes)");
    }
    std::vector<unsigned char> bytes(static_cast<std::size_t>(file.size));
    if (!bytes.empty()) {
        file.stream.read(reinterpret_cast<char*>(bytes.data()), static_cast<std::streamsize>(bytes.size()));
        if (file.stream.gcount() != static_cast<std::streamsize>(bytes.size())) {
            throw FormatError(path + ": read error after " + std::to_string(file.stream.gcount()) +
                              " of " + std::to_string(bytes.size()) + " bytes");
        }
    }
    return FlashImage(std::vector<ImageRange>{ImageRange{offset, std::move(bytes)}});
}

}  // namespace vorant::formats
