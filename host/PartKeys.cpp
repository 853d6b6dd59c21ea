#include "PartKeys.h"

#include "ConstraintsManager.h"
#include "VorantException.h"

#include <algorithm>
#include <cctype>
#include <cstdint>
#include <set>
#include <vector>

namespace vorant::host {

namespace {

// Keys besides the ones a device reads: identification, the simulator's
// chip facts, the erase granularities and the status-bit labels.
const char* const kDescriptiveKeys[] = {
    "extends", "VENDOR", "DESCRIPTION", "SOURCE", "JEDEC_ID", "RES_SIGNATURE", "QE_LOCATION", "WRSR_BITS", "SFDP",
    "SECTOR_SIZE", "SECTORERASE_MAXWAITTIME", "SECTORERASE_WAITTIME_INC",
    "BLOCKERASE32_INSTRUCTION", "BLOCKERASE32_SIZE", "BLOCKERASE32_WAITTIME", "BLOCKERASE32_MAXWAITTIME",
    "BLOCKERASE32_WAITTIME_INC",
    "BLOCKERASE64_INSTRUCTION", "BLOCKERASE64_SIZE", "BLOCKERASE64_WAITTIME", "BLOCKERASE64_MAXWAITTIME",
    "BLOCKERASE64_WAITTIME_INC",
    "SIM_PAGE_PROGRAM_US", "SIM_BULK_ERASE_US", "SIM_SECTOR_ERASE_US", "SIM_BLOCK32_ERASE_US", "SIM_BLOCK64_ERASE_US",
    "SIM_WRITE_STATUS_US", "SIM_RELEASE_US"};

// Status labels exist for up to 32 bits (STATUS_REGISTER_LENGTH may grow).
constexpr int kStatusLabels = 32;

const std::set<std::string>& knownKeys() {
    static const std::set<std::string> keys = [] {
        std::set<std::string> all(ConstraintsManager::deviceKeys().begin(), ConstraintsManager::deviceKeys().end());
        all.insert(std::begin(kDescriptiveKeys), std::end(kDescriptiveKeys));
        for (int bit = 0; bit < kStatusLabels; ++bit) all.insert("STATUS_LOCATION_" + std::to_string(bit));
        return all;
    }();
    return keys;
}

std::size_t editDistance(const std::string& a, const std::string& b) {
    std::vector<std::size_t> row(b.size() + 1);
    for (std::size_t j = 0; j <= b.size(); ++j) row[j] = j;
    for (std::size_t i = 1; i <= a.size(); ++i) {
        std::size_t diagonal = row[0];
        row[0] = i;
        for (std::size_t j = 1; j <= b.size(); ++j) {
            const bool same = std::toupper(static_cast<unsigned char>(a[i - 1])) ==
                              std::toupper(static_cast<unsigned char>(b[j - 1]));
            const std::size_t next = std::min({row[j] + 1, row[j - 1] + 1, diagonal + (same ? 0 : 1)});
            diagonal = row[j];
            row[j] = next;
        }
    }
    return row[b.size()];
}

}  // namespace

bool isKnownPartKey(const std::string& key) { return knownKeys().count(key) != 0; }

std::string nearestPartKey(const std::string& key) {
    std::string best;
    std::size_t bestDistance = SIZE_MAX;
    for (const std::string& known : knownKeys()) {
        const std::size_t distance = editDistance(key, known);
        if (distance < bestDistance) bestDistance = distance, best = known;
    }
    return best;
}

void checkPartKeys(const std::string& sourceName, const std::string& kind, const std::string& name,
                   const std::map<std::string, std::string>& properties) {
    for (const auto& entry : properties)
        if (!isKnownPartKey(entry.first))
            throw VorantException(sourceName + ": " + kind + " " + name + ": " + entry.first +
                                  ": unknown key; did you mean '" + nearestPartKey(entry.first) + "'?");
}

}  // namespace vorant::host
