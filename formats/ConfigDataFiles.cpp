#include "formats/ConfigDataFiles.h"

#include "formats/BinaryImage.h"
#include "formats/BinaryWriter.h"
#include "formats/FormatError.h"
#include "formats/InputFile.h"
#include "formats/IntelHexImage.h"
#include "formats/IntelHexWriter.h"
#include "formats/SRecordImage.h"
#include "formats/SRecordWriter.h"

#include <filesystem>
#include <istream>
#include <stdexcept>

namespace vorant::formats {

const std::vector<ImageFormatInfo>& imageFormats() {
    static const std::vector<ImageFormatInfo> table = {
        {ImageFormat::Binary, "bin", {".bin", ".img", ".rom"}},
        {ImageFormat::IntelHex, "ihex", {".hex", ".mcs"}},
        {ImageFormat::SRecord, "srec", {".srec", ".s19", ".s28", ".s37", ".mot"}},
    };
    return table;
}

const ImageFormatInfo& formatInfo(ImageFormat format) {
    for (const ImageFormatInfo& info : imageFormats())
        if (info.format == format) return info;
    throw std::logic_error("an image format without a row");
}

std::optional<ImageFormat> formatNamed(const std::string& name) {
    for (const ImageFormatInfo& info : imageFormats())
        if (name == info.name) return info.format;
    return std::nullopt;
}

std::string lowerCaseExtension(const std::string& path) {
    std::string extension = std::filesystem::path(path).extension().string();
    for (char& c : extension) {
        if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
    }
    return extension;
}

std::optional<ImageFormat> formatOfExtension(const std::string& path) {
    const std::string extension = lowerCaseExtension(path);
    for (const ImageFormatInfo& info : imageFormats())
        for (const std::string& known : info.extensions)
            if (extension == known) return info.format;
    return std::nullopt;
}

namespace {

// The first line that is not blank decides: ':' starts Intel HEX, 'S' and a
// digit an S-record file.
std::optional<ImageFormat> formatOfContent(std::istream& in) {
    std::string line;
    while (std::getline(in, line)) {
        const std::size_t first = line.find_first_not_of(" \t\r");
        if (first == std::string::npos) continue;
        if (line[first] == ':') return ImageFormat::IntelHex;
        if (line[first] == 'S' && first + 1 < line.size() && line[first + 1] >= '0' && line[first + 1] <= '9')
            return ImageFormat::SRecord;
        return std::nullopt;
    }
    return std::nullopt;
}

std::string formatNames() {
    std::string names;
    for (const ImageFormatInfo& info : imageFormats()) names += (names.empty() ? "" : "|") + std::string(info.name);
    return names;
}

}  // namespace

ImageFormat imageFormatOf(const std::string& path, const ImageOptions& options) {
    if (options.format) return *options.format;
    if (const auto byExtension = formatOfExtension(path)) return *byExtension;
    InputFile file = openInputFile(path);
    if (const auto byContent = formatOfContent(file.stream)) return *byContent;
    throw FormatError(path + ": the format is not known from the name and the content is neither Intel HEX nor "
                             "S-records; name it with --format " + formatNames());
}

FlashImage loadFlashImage(const std::string& path, const ImageOptions& options) {
    // An empty file is reported as such before any format looks at it.
    if (openInputFile(path).size == 0) throw FormatError(path + ": empty image: the file is empty");
    const ImageFormat format = imageFormatOf(path, options);
    if (options.offset && format != ImageFormat::Binary)
        throw FormatError(path + ": --offset places a binary image; " + formatInfo(format).name +
                          " files carry their own addresses");
    FlashImage image = format == ImageFormat::IntelHex  ? readIntelHexImage(path)
                       : format == ImageFormat::SRecord ? readSRecordImage(path)
                                                        : readBinaryImage(path, options.offset.value_or(0));
    if (image.empty()) throw FormatError(path + ": empty image: the file holds no data records");
    return image;
}

std::unique_ptr<ConfigDataReader> openConfigData(const std::string& path, const ImageOptions& options) {
    return std::make_unique<FlashImage>(loadFlashImage(path, options));
}

std::unique_ptr<ConfigDataWriter> openConfigDataWriter(const std::string& path, int hexBytesPerRecord,
                                                       std::optional<ImageFormat> format) {
    switch (format.value_or(formatOfExtension(path).value_or(ImageFormat::Binary))) {
    case ImageFormat::IntelHex:
        return std::make_unique<IntelHexWriter>(path, IntelHexLayout{hexBytesPerRecord, lowerCaseExtension(path) == ".mcs"});
    case ImageFormat::SRecord: return std::make_unique<SRecordWriter>(path);
    case ImageFormat::Binary: break;
    }
    return std::make_unique<BinaryWriter>(path);
}

void registerStandardFormats(int hexBytesPerRecord, std::optional<ImageFormat> forced) {
    // A bad record size fails here, at start-up, not at the first readback.
    if (hexBytesPerRecord != 16 && hexBytesPerRecord != 32) {
        throw std::invalid_argument("Intel HEX records hold 16 or 32 data bytes, not " +
                                    std::to_string(hexBytesPerRecord));
    }
    // Each factory writes what the table (or --format) says for its name, so
    // the host's choice by extension is final.
    const ConfigDataWriter::Factory factory = [hexBytesPerRecord, forced](const std::string& fileName)
        -> std::unique_ptr<ConfigDataWriter> {
        try {
            return openConfigDataWriter(fileName, hexBytesPerRecord, forced);
        } catch (const FormatError&) {
            return nullptr;
        }
    };
    ConfigDataWriter::registerFormat("", factory);
    for (const ImageFormatInfo& info : imageFormats())
        for (const std::string& extension : info.extensions) ConfigDataWriter::registerFormat(extension, factory);
}

}  // namespace vorant::formats
