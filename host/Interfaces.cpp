// Out-of-line destructors of the host's interfaces, and the registry of
// configuration data file formats behind ConfigDataWriter::CreateWriter.
#include "ConfigData.h"
#include "ScanPort.h"

#include <algorithm>
#include <cctype>
#include <filesystem>
#include <map>
#include <mutex>

ScanPort::~ScanPort() = default;
const char* ScanPort::failureReason() { return nullptr; }
bool ScanPort::connectionLost() { return false; }
ConfigDataReader::~ConfigDataReader() = default;
int ConfigDataReader::nextPiece(const char** data, int* address, int maxBits) { return next(data, address, maxBits); }
ConfigDataWriter::~ConfigDataWriter() = default;
CifReader::~CifReader() = default;

namespace {

struct FormatRegistry {
    std::mutex mutex;
    std::map<std::string, ConfigDataWriter::Factory> factories;
};

FormatRegistry& registry() {
    static FormatRegistry instance;
    return instance;
}

std::string lowerExtension(const std::string& fileName) {
    std::string ext = std::filesystem::path(fileName).extension().string();
    std::transform(ext.begin(), ext.end(), ext.begin(),
                   [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    return ext;
}

}  // namespace

void ConfigDataWriter::registerFormat(const std::string& extension, Factory factory) {
    auto& r = registry();
    std::lock_guard<std::mutex> lock(r.mutex);
    r.factories[extension] = std::move(factory);
}

ConfigDataWriter* ConfigDataWriter::CreateWriter(const char* fileName, const char*, ConfigDataReader*) {
    if (!fileName || !*fileName) return nullptr;
    Factory factory;
    {
        auto& r = registry();
        std::lock_guard<std::mutex> lock(r.mutex);
        auto it = r.factories.find(lowerExtension(fileName));
        if (it == r.factories.end()) it = r.factories.find("");
        if (it == r.factories.end()) return nullptr;
        factory = it->second;
    }
    try {
        return factory(fileName).release();
    } catch (...) {
        // A writer that cannot be made is reported as none; the caller names the file.
        return nullptr;
    }
}
