#include "cli/PartListing.h"

#include "host/ConstraintsManager.h"
#include "host/UT_STR.h"
#include "host/VorantException.h"

#include <algorithm>
#include <cstdio>

namespace vorant::cli {

namespace {

std::string propertyOr(const std::string& part, const char* key, const std::string& fallback) {
    ConstraintsManager& database = ConstraintsManager::instance();
    if (!database.hasProperty(part, key)) return fallback;
    return database.getDeviceStringProperty(part.c_str(), key);
}

std::string padded(const std::string& text, std::size_t width) {
    return text.size() >= width ? text + " " : text + std::string(width - text.size(), ' ');
}

}  // namespace

std::string sizeText(long long bytes) {
    if (bytes < 0) return "?";
    constexpr long long kKiB = 1024, kMiB = 1024 * 1024;
    if (bytes >= kMiB && bytes % kMiB == 0) return std::to_string(bytes / kMiB) + " MiB";
    if (bytes >= kKiB && bytes % kKiB == 0) return std::to_string(bytes / kKiB) + " KiB";
    return std::to_string(bytes) + " bytes";
}

std::vector<PartSummary> matchingParts(const std::string& pattern) {
    ConstraintsManager& database = ConstraintsManager::instance();
    std::vector<PartSummary> parts;
    for (const std::string& name : database.partNames()) {
        if (UT_STR::IMatch(name.c_str(), pattern.c_str()) == 0) continue;
        PartSummary summary;
        summary.name = name;
        try {
            if (database.hasProperty(name, "DEVICE_SIZE")) {
                const long long bits = database.getDeviceLongProperty(name.c_str(), "DEVICE_SIZE");
                if (bits >= 0) summary.sizeBytes = bits / 8;
            }
        } catch (const VorantException&) {
            // Shown as "?": the listing never fails on one odd entry.
        }
        summary.jedecId = propertyOr(name, "JEDEC_ID", "");
        if (summary.jedecId.empty() && UT_STR::ICompare(propertyOr(name, "USE_RES", "FALSE").c_str(), "TRUE") != 0)
            summary.jedecId = propertyOr(name, "IDCODE", "");
        summary.description = propertyOr(name, "DESCRIPTION", "");
        parts.push_back(std::move(summary));
    }
    return parts;
}

std::string partTable(const std::vector<PartSummary>& parts) {
    std::size_t nameWidth = 4;
    for (const PartSummary& part : parts) nameWidth = std::max(nameWidth, part.name.size() + 2);
    std::string table = padded("PART", nameWidth) + padded("SIZE", 10) + padded("JEDEC ID", 10) + "DESCRIPTION\n";
    for (const PartSummary& part : parts) {
        std::string line = padded(part.name, nameWidth) + padded(sizeText(part.sizeBytes), 10) +
                           padded(part.jedecId.empty() ? "-" : part.jedecId, 10) + part.description;
        while (!line.empty() && line.back() == ' ') line.pop_back();
        table += line + "\n";
    }
    return table;
}

}  // namespace vorant::cli
