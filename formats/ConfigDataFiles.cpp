#include "formats/ConfigDataFiles.h"

#include "formats/BinaryImage.h"
#include "formats/BinaryWriter.h"
#include "formats/FormatError.h"
#include "formats/InputFile.h"
#include "formats/IntelHexImage.h"
#include "formats/IntelHexWriter.h"

#include <filesystem>
#include <stdexcept>

namespace vorant::formats {

std::string lowerCaseExtension(const std::string& path) {
    std::string extension = std::filesystem::path(path).extension().string();
    for (char& c : extension) {
        if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
    }
    return extension;
}

ConfigDataFormat formatOfFile(const std::string& path) {
    const std::string extension = lowerCaseExtension(path);
    return extension == ".hex" || extension == ".mcs" ? ConfigDataFormat::IntelHex : ConfigDataFormat::Binary;
}

FlashImage loadFlashImage(const std::string& path) {
    // An empty file is reported as such before any format looks at it.
    if (openInputFile(path).size == 0) throw FormatError(path + ": empty image: the file is empty");
    FlashImage image = formatOfFile(path) == ConfigDataFormat::IntelHex ? readIntelHexImage(path)
                                                                         : readBinaryImage(path);
    if (image.empty()) throw FormatError(path + ": empty image: the file holds no data records");
    return image;
}

std::unique_ptr<ConfigDataReader> openConfigData(const std::string& path) {
    return std::make_unique<FlashImage>(loadFlashImage(path));
}

std::unique_ptr<ConfigDataWriter> openConfigDataWriter(const std::string& path, int hexBytesPerRecord) {
    if (formatOfFile(path) == ConfigDataFormat::Binary) return std::make_unique<BinaryWriter>(path);
    const bool crlf = lowerCaseExtension(path) == ".mcs";
    return std::make_unique<IntelHexWriter>(path, IntelHexLayout{hexBytesPerRecord, crlf});
}

namespace {

// Each registered extension gets a factory of its own fixed format, so the
// host's choice by extension is final.
template <typename MakeWriter>
ConfigDataWriter::Factory nullOnFailure(MakeWriter makeWriter) {
    return [makeWriter](const std::string& fileName) -> std::unique_ptr<ConfigDataWriter> {
        try {
            return makeWriter(fileName);
        } catch (const FormatError&) {
            return nullptr;
        }
    };
}

}  // namespace

void registerStandardFormats(int hexBytesPerRecord) {
    // A bad record size fails here, at start-up, not at the first readback.
    if (hexBytesPerRecord != 16 && hexBytesPerRecord != 32) {
        throw std::invalid_argument("Intel HEX records hold 16 or 32 data bytes, not " +
                                    std::to_string(hexBytesPerRecord));
    }
    const auto binary = nullOnFailure([](const std::string& fileName) {
        return std::make_unique<BinaryWriter>(fileName);
    });
    const auto hexWithLineEnd = [hexBytesPerRecord](bool crlf) {
        return nullOnFailure([layout = IntelHexLayout{hexBytesPerRecord, crlf}](const std::string& fileName) {
            return std::make_unique<IntelHexWriter>(fileName, layout);
        });
    };
    ConfigDataWriter::registerFormat(".bin", binary);
    ConfigDataWriter::registerFormat("", binary);
    ConfigDataWriter::registerFormat(".hex", hexWithLineEnd(false));
    ConfigDataWriter::registerFormat(".mcs", hexWithLineEnd(true));
}

}  // namespace vorant::formats
