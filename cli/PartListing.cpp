#include "cli/PartListing.h"

#include "host/ConstraintsManager.h"
#include "host/UT_STR.h"
#include "host/VorantException.h"

#include <algorithm>
#include <cctype>
#include <cstdio>

namespace vorant::cli {

namespace {

std::string propertyOr(const std::string& part, const char* key, const std::string& fallback) {
    ConstraintsManager& database = ConstraintsManager::instance();
    if (!database.hasProperty(part, key)) return fallback;
    return database.getDeviceStringProperty(part.c_str(), key);
}

std::string lowered(std::string text) {
    for (char& c : text) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    return text;
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

std::optional<long long> parseSizeText(const std::string& text) {
    std::size_t digits = 0;
    while (digits < text.size() && std::isdigit(static_cast<unsigned char>(text[digits]))) ++digits;
    if (digits == 0 || digits > 12) return std::nullopt;
    const long long count = std::stoll(text.substr(0, digits));
    std::string unit = text.substr(digits);
    for (char& c : unit) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    static const std::pair<const char*, long long> kUnits[] = {
        {"", 1}, {"b", 1}, {"k", 1024}, {"kib", 1024}, {"kb", 1024}, {"m", 1 << 20}, {"mib", 1 << 20}, {"mb", 1 << 20},
        {"g", 1 << 30}, {"gib", 1 << 30}, {"gb", 1 << 30}, {"kbit", 128}, {"mbit", 1 << 17}, {"gbit", 1 << 27}};
    for (const auto& [name, bytes] : kUnits)
        if (unit == name) return count * bytes;
    return std::nullopt;
}

std::vector<PartSummary> matchingParts(const std::string& pattern) {
    PartFilter filter;
    filter.pattern = pattern;
    return matchingParts(filter);
}

std::vector<PartSummary> matchingParts(const PartFilter& filter) {
    ConstraintsManager& database = ConstraintsManager::instance();
    std::vector<PartSummary> parts;
    for (const std::string& name : database.partNames()) {
        if (UT_STR::IMatch(name.c_str(), filter.pattern.c_str()) == 0) continue;
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
        summary.vendor = propertyOr(name, "VENDOR", "");
        summary.x4 = UT_STR::ICompare(propertyOr(name, "X4_READ", "FALSE").c_str(), "TRUE") == 0;
        summary.unlock = UT_STR::ICompare(propertyOr(name, "USE_UNLOCKSR", "FALSE").c_str(), "TRUE") == 0;
        summary.source = propertyOr(name, "SOURCE", "");
        if (!filter.vendor.empty() && lowered(summary.vendor).find(lowered(filter.vendor)) == std::string::npos) continue;
        if (filter.sizeBytes && summary.sizeBytes != *filter.sizeBytes) continue;
        if (!filter.jedecId.empty() && UT_STR::ICompare(summary.jedecId.c_str(), filter.jedecId.c_str()) != 0) continue;
        parts.push_back(std::move(summary));
    }
    return parts;
}

std::string partTable(const std::vector<PartSummary>& parts) {
    std::size_t nameWidth = 4;
    for (const PartSummary& part : parts) nameWidth = std::max(nameWidth, part.name.size() + 2);
    std::size_t vendorWidth = 8;
    for (const PartSummary& part : parts) vendorWidth = std::max(vendorWidth, part.vendor.size() + 2);
    // SUPPORT: "x4" when the part takes the Quad Enable write, "unlock" when
    // erase and program clear block protection themselves.
    std::string table = padded("PART", nameWidth) + padded("SIZE", 10) + padded("JEDEC ID", 10) +
                        padded("VENDOR", vendorWidth) + padded("SUPPORT", 11) + "SOURCE\n";
    for (const PartSummary& part : parts) {
        std::string support = std::string(part.x4 ? "x4" : "") + (part.x4 && part.unlock ? "," : "") +
                              (part.unlock ? "unlock" : "");
        std::string line = padded(part.name, nameWidth) + padded(sizeText(part.sizeBytes), 10) +
                           padded(part.jedecId.empty() ? "-" : part.jedecId, 10) +
                           padded(part.vendor.empty() ? "-" : part.vendor, vendorWidth) +
                           padded(support.empty() ? "-" : support, 11) + (part.source.empty() ? "-" : part.source);
        while (!line.empty() && line.back() == ' ') line.pop_back();
        table += line + "\n";
    }
    return table;
}

}  // namespace vorant::cli
