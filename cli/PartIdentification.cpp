#include "cli/PartIdentification.h"

#include "cli/SfdpMatch.h"
#include "cli/SfdpOperation.h"
#include "cli/ToolFailure.h"
#include "cli/UsageError.h"
#include "host/ConstraintsManager.h"
#include "host/VorantException.h"
#include "s/Type1SPIDevice.h"

#include <algorithm>
#include <memory>

namespace vorant::cli {

namespace {

constexpr const char* kJedecIdInstruction = "10011111";  // 9Fh

// The first part (by name) that reads its ID with 9Fh and makes a device.
std::unique_ptr<Type1SPIDevice> jedecIdReader() {
    ConstraintsManager& database = ConstraintsManager::instance();
    for (const std::string& name : database.partNames()) {
        if (!database.hasProperty(name, "IDENTIFICATION_INSTRUCTION") ||
            std::string(database.getDeviceStringProperty(name.c_str(), "IDENTIFICATION_INSTRUCTION")) !=
                kJedecIdInstruction)
            continue;
        try {
            if (std::unique_ptr<Type1SPIDevice> device{create_type1_spi_device(name.c_str())}) return device;
        } catch (const VorantException&) {
            // Not usable as a device: try the next part.
        }
    }
    throw UsageError("--part auto needs a part that reads the JEDEC ID with 9Fh, and the database has none; "
                     "name the part with --part NAME");
}

std::string joined(const std::vector<std::string>& names) {
    std::string text;
    for (const std::string& name : names) text += (text.empty() ? "" : ", ") + name;
    return text;
}

// Narrows parts sharing one ID by the chip's SFDP area. Returns what
// decided when exactly one part remains (left alone in `matches`); otherwise
// leaves the parts the area fits (all of them when it fits none).
std::string decideBySfdp(ScanPort& port, std::vector<std::string>& matches) {
    std::optional<formats::SfdpTable> table;
    const auto area = readSfdpArea(port);
    if (!area) return {};
    try {
        table = formats::decodeSfdp(*area);
    } catch (const formats::SfdpError&) {
        // No usable area: only a part older than SFDP can be this chip.
    }
    const std::vector<std::string> fitting = partsFittingSfdp(matches, table);
    if (fitting.size() == 1) {
        matches = fitting;
        return table ? "its SFDP table (size, erase types, page and Quad Enable method fit no other part with this ID)"
                     : "its missing SFDP table (the other parts with this ID publish one)";
    }
    if (!fitting.empty()) matches = fitting;
    return {};
}

// Keys that only say how long the chip may take, or describe it.
bool isTimingKey(const std::string& key) {
    auto endsWith = [&](const char* tail) {
        const std::string t = tail;
        return key.size() >= t.size() && key.compare(key.size() - t.size(), t.size(), t) == 0;
    };
    return endsWith("WAITTIME") || endsWith("WAITTIME_INC") || endsWith("MAXWAITTIME") ||
           key.rfind("PROGRESS_", 0) == 0;
}

// Parts that share an ID and an SFDP table yet differ only in their times
// (two generations of one chip, say) drive the chip alike: the one with the
// longest limits is right for whichever of them answers, since polling
// ends every wait as soon as the chip is done. Empty when they differ in
// anything else.
std::string longestLimitsAmongTimingTwins(const std::vector<std::string>& parts) {
    ConstraintsManager& database = ConstraintsManager::instance();
    std::vector<std::string> keys;
    for (const std::string& key : ConstraintsManager::deviceKeys())
        if (!isTimingKey(key)) keys.push_back(key);
    for (const char* key : {"QE_LOCATION", "WRSR_BITS", "SECTOR_SIZE"}) keys.push_back(key);
    auto value = [&](const std::string& part, const std::string& key) {
        return database.hasProperty(part, key) ? std::string(database.getDeviceStringProperty(part.c_str(), key.c_str()))
                                               : std::string();
    };
    for (const std::string& part : parts)
        for (const std::string& key : keys)
            if (value(part, key) != value(parts.front(), key)) return {};
    auto limits = [&](const std::string& part) {
        long long total = 0;
        for (const char* key : {"PROGRAM_MAXWAITTIME", "BULKERASE_MAXWAITTIME", "WRSR_MAXWAITTIME",
                                "SECTORERASE_MAXWAITTIME"})
            if (database.hasProperty(part, key)) total += database.getDeviceLongProperty(part.c_str(), key);
        return total;
    };
    // On equal limits, the entry that names more of the chip's erase sizes
    // (their shared SFDP table says the chip has them all) programs faster.
    auto eraseSizes = [&](const std::string& part) {
        int count = 0;
        for (const char* key : {"SECTORERASE_INSTRUCTION", "BLOCKERASE32_INSTRUCTION", "BLOCKERASE64_INSTRUCTION"})
            count += database.hasProperty(part, key) ? 1 : 0;
        return count;
    };
    return *std::max_element(parts.begin(), parts.end(), [&](const std::string& a, const std::string& b) {
        return std::make_pair(limits(a), eraseSizes(a)) < std::make_pair(limits(b), eraseSizes(b));
    });
}

}  // namespace

bool chipAnswered(const std::string& jedecId) {
    return jedecId.find_first_not_of("Ff") != std::string::npos && jedecId.find_first_not_of('0') != std::string::npos;
}

std::string identificationProblem(const std::string& jedecId, const std::vector<std::string>& matches) {
    if (!chipAnswered(jedecId))
        return "no chip answered the JEDEC ID read (it read " + jedecId +
               "); check the connection, wake a chip in deep power-down with "
               "'vorant-spi --part NAME release', or name the part with --part NAME";
    if (matches.empty())
        return "no part in the database has the JEDEC ID " + jedecId +
               "; add one with --parts FILE or name the part with --part NAME";
    if (matches.size() > 1)
        return "the JEDEC ID " + jedecId + " belongs to several parts (" + joined(matches) +
               "); choose one with --part NAME";
    return {};
}

Identification identifyPart(ScanPort& port, int index) {
    std::unique_ptr<Type1SPIDevice> reader = jedecIdReader();
    reader->setScanPort(&port);
    const bool read = reader->readIdcode(index, false);
    const char* id = reader->getAttribute(DeviceNS::ATTR_IDCODE);
    if (!read || id == nullptr || *id == '\0') {
        const char* reason = port.failureReason();
        throw ToolFailure(std::string("the JEDEC ID could not be read over the port") +
                         (reason != nullptr ? std::string(": ") + reason : std::string()));
    }

    Identification identification;
    identification.jedecId = id;
    std::vector<std::string> matches = ConstraintsManager::instance().partsWithId(identification.jedecId);
    if (matches.size() > 1 && chipAnswered(identification.jedecId)) {
        if (const std::string decided = decideBySfdp(port, matches); !decided.empty()) {
            identification.partName = matches.front();
            identification.decidedBy = decided;
            return identification;
        }
        if (const std::string twin = longestLimitsAmongTimingTwins(matches); !twin.empty()) {
            identification.partName = twin;
            identification.decidedBy = "its limits: " + joined(matches) +
                                       " differ only in their times, and its limits are the longest";
            return identification;
        }
    }
    if (const std::string problem = identificationProblem(identification.jedecId, matches); !problem.empty()) {
        // A chip that does not answer is a failed run; an answer the
        // database cannot place asks the user to name the part.
        if (!chipAnswered(identification.jedecId)) throw ToolFailure(problem);
        throw UsageError(problem);
    }
    identification.partName = matches.front();
    return identification;
}

}  // namespace vorant::cli
