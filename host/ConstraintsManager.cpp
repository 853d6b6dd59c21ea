#include "ConstraintsManager.h"

#include "PartFileReader.h"
#include "PartKeys.h"
#include "PropertyText.h"
#include "UT_STR.h"
#include "VorantException.h"

#include <algorithm>
#include <cctype>
#include <filesystem>
#include <fstream>
#include <set>
#include <sstream>

namespace {

using Properties = vorant::host::PartProperties;

}  // namespace

ConstraintsManager& ConstraintsManager::instance() {
    static ConstraintsManager manager;
    return manager;
}

const ConstraintsManager::Part& ConstraintsManager::part(const char* partName, const char* key) const {
    auto it = parts_.find(partName ? partName : "");
    if (it == parts_.end())
        throw VorantException(std::string("unknown part '") + (partName ? partName : "") +
                              "' (asked for key '" + (key ? key : "") + "')");
    return it->second;
}

const char* ConstraintsManager::getDeviceStringProperty(const char* partName, const char* key) {
    std::lock_guard<std::mutex> lock(mutex_);
    const Part& p = part(partName, key);
    auto it = p.properties.find(key ? key : "");
    if (it == p.properties.end())
        throw VorantException(std::string("part '") + partName + "' has no key '" + (key ? key : "") + "'");
    return it->second.c_str();
}

std::int32_t ConstraintsManager::getDeviceLongProperty(const char* partName, const char* key) {
    const std::string text = getDeviceStringProperty(partName, key);
    auto value = vorant::host::parseInt32(text);
    if (!value)
        throw VorantException(std::string("part '") + partName + "' key '" + key + "': '" + text +
                              "' is not a 32-bit number");
    return *value;
}

ConstraintsManager::Replacements ConstraintsManager::loadFile(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    if (!in) throw VorantException(path + ": cannot open the part file");
    std::ostringstream text;
    text << in.rdbuf();
    if (in.bad()) throw VorantException(path + ": cannot read the part file");
    return loadText(text.str(), path);
}

ConstraintsManager::Replacements ConstraintsManager::loadDirectory(const std::string& path) {
    namespace fs = std::filesystem;
    std::error_code error;
    if (!fs::is_directory(path, error)) throw VorantException(path + ": not a folder of part files");
    std::vector<fs::path> files;
    for (const auto& entry : fs::directory_iterator(path, error))
        if (entry.is_regular_file() && entry.path().extension() == ".toml") files.push_back(entry.path());
    if (error) throw VorantException(path + ": cannot list the folder: " + error.message());
    if (files.empty()) throw VorantException(path + ": no part files (*.toml) in the folder");
    std::sort(files.begin(), files.end());
    Replacements replaced;
    for (const auto& file : files) {
        Replacements more = loadFile(file.string());
        replaced.insert(replaced.end(), more.begin(), more.end());
    }
    return replaced;
}

ConstraintsManager::Replacements ConstraintsManager::loadText(const std::string& text, const std::string& sourceName) {
    vorant::host::PartFileTables parsed = vorant::host::readPartFileText(text, sourceName);
    for (const auto& [name, props] : parsed.families) vorant::host::checkPartKeys(sourceName, "family", name, props);
    for (const auto& [name, props] : parsed.parts) vorant::host::checkPartKeys(sourceName, "part", name, props);

    std::lock_guard<std::mutex> lock(mutex_);
    // Families of this file see each other and every family loaded before.
    auto families = families_;
    for (auto& [name, props] : parsed.families) families[name] = props;

    // Flattens `extends` chains: the nearest definition of a key wins.
    auto resolve = [&](const std::string& kind, const std::string& name, Properties own) {
        std::set<std::string> seen;
        Properties result = own;
        std::string context = sourceName + ": " + kind + " " + name;
        while (own.count("extends")) {
            const std::string parent = own["extends"];
            if (!seen.insert(parent).second)
                throw VorantException(context + ": extends: family '" + parent + "' extends itself");
            auto it = families.find(parent);
            if (it == families.end())
                throw VorantException(context + ": extends: unknown family '" + parent + "'");
            own = it->second;
            for (const auto& [key, value] : own) result.emplace(key, value);
        }
        result.erase("extends");
        return result;
    };

    std::map<std::string, Part> resolved;
    for (auto& [name, props] : parsed.parts) {
        Properties flat = resolve("part", name, props);
        validatePart(sourceName, name, flat);
        resolved[name] = Part{std::move(flat), sourceName};
    }
    // Every family must resolve too, so a broken family is reported where
    // it is written rather than when a later file uses it.
    for (auto& [name, props] : parsed.families) resolve("family", name, props);

    families_ = std::move(families);
    Replacements replaced;
    for (auto& [name, p] : resolved) {
        // Erased first so the new spelling of the name is the one kept.
        if (auto it = parts_.find(name); it != parts_.end()) {
            if (it->second.source != sourceName) replaced.push_back(Replacement{name, it->second.source, sourceName});
            parts_.erase(it);
        }
        parts_.emplace(name, std::move(p));
    }
    return replaced;
}

void ConstraintsManager::addPart(const std::string& partName, const std::map<std::string, std::string>& properties) {
    std::lock_guard<std::mutex> lock(mutex_);
    parts_[partName] = Part{properties, ""};
}

void ConstraintsManager::clear() {
    std::lock_guard<std::mutex> lock(mutex_);
    parts_.clear();
    families_.clear();
}

bool ConstraintsManager::hasPart(const std::string& partName) const {
    std::lock_guard<std::mutex> lock(mutex_);
    return parts_.count(partName) != 0;
}

bool ConstraintsManager::hasProperty(const std::string& partName, const std::string& key) const {
    std::lock_guard<std::mutex> lock(mutex_);
    auto it = parts_.find(partName);
    return it != parts_.end() && it->second.properties.count(key) != 0;
}

std::vector<std::string> ConstraintsManager::partNames() const {
    std::lock_guard<std::mutex> lock(mutex_);
    std::vector<std::string> names;
    for (const auto& [name, p] : parts_) names.push_back(name);
    return names;
}

std::vector<std::string> ConstraintsManager::partsWithId(const std::string& hexId) const {
    std::lock_guard<std::mutex> lock(mutex_);
    std::vector<std::string> names;
    for (const auto& [name, p] : parts_) {
        const auto& props = p.properties;
        std::string id;
        if (auto it = props.find("JEDEC_ID"); it != props.end()) {
            id = it->second;
        } else if (auto idcode = props.find("IDCODE"); idcode != props.end()) {
            auto res = props.find("USE_RES");
            if (res == props.end() || UT_STR::ICompare(res->second.c_str(), "TRUE") != 0) id = idcode->second;
        }
        if (!id.empty() && UT_STR::ICompare(id.c_str(), hexId.c_str()) == 0) names.push_back(name);
    }
    return names;
}

std::string ConstraintsManager::canonicalName(const std::string& partName) const {
    std::lock_guard<std::mutex> lock(mutex_);
    auto it = parts_.find(partName);
    return it == parts_.end() ? std::string() : it->first;
}

bool ConstraintsManager::CaseInsensitiveLess::operator()(const std::string& a, const std::string& b) const {
    return std::lexicographical_compare(a.begin(), a.end(), b.begin(), b.end(), [](char x, char y) {
        return std::toupper(static_cast<unsigned char>(x)) < std::toupper(static_cast<unsigned char>(y));
    });
}

std::string ConstraintsManager::sourceOf(const std::string& partName) const {
    std::lock_guard<std::mutex> lock(mutex_);
    auto it = parts_.find(partName);
    return it == parts_.end() ? std::string() : it->second.source;
}
