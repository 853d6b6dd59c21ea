#pragma once
#include <string>
#include <vector>

namespace vorant::cli {

struct PartSummary {
    std::string name;
    long long sizeBytes = -1;  // -1 when the part has no usable DEVICE_SIZE
    std::string jedecId;       // "" when the part has none
    std::string description;
};

// The parts of the database whose name matches the pattern ('*' and '?',
// any letter case), in name order.
std::vector<PartSummary> matchingParts(const std::string& pattern);

// The table `parts` prints: a header, then one line per part.
std::string partTable(const std::vector<PartSummary>& parts);

// "2 MiB", "512 KiB", "300 bytes".
std::string sizeText(long long bytes);

}  // namespace vorant::cli
