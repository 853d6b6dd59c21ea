#pragma once
#include <optional>
#include <string>
#include <vector>

namespace vorant::cli {

struct PartSummary {
    std::string name;
    long long sizeBytes = -1;  // -1 when the part has no usable DEVICE_SIZE
    std::string jedecId;       // "" when the part has none
    std::string description;
    std::string vendor;
    bool x4 = false;      // the Quad Enable write and x4 programming (X4_READ)
    bool unlock = false;  // erase and program clear block protection (USE_UNLOCKSR)
    std::string source;   // where the part's facts come from
};

// What `parts` lists: every condition given must hold.
struct PartFilter {
    std::string pattern = "*";           // the name, '*' and '?' wildcards, any case
    std::string vendor;                  // part of VENDOR, any case
    std::optional<long long> sizeBytes;  // exactly this size
    std::string jedecId;                 // exactly this ID, any case
};

// The parts of the database the filter keeps, in name order.
std::vector<PartSummary> matchingParts(const PartFilter& filter);
std::vector<PartSummary> matchingParts(const std::string& pattern);

// "16MiB", "512K", "128Mbit", "2097152" as bytes; nothing for other text.
std::optional<long long> parseSizeText(const std::string& text);

// The table `parts` prints: a header, then one line per part.
std::string partTable(const std::vector<PartSummary>& parts);

// "2 MiB", "512 KiB", "300 bytes".
std::string sizeText(long long bytes);

}  // namespace vorant::cli
