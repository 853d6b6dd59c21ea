#include "s/BlockEraseTypes.h"

#include "host/ConstraintsManager.h"

#include <algorithm>
#include <cstdint>
#include <string>

namespace vorant::device {

namespace {

constexpr std::int64_t kMaxWaitPerTypical = 15;
constexpr std::int64_t kStepsPerTypical = 10;

struct EraseKeys {
    const char* instruction;
    const char* size;
    const char* prefix;  // of the three waits
};

const EraseKeys kEraseKeys[] = {
    {"SECTORERASE_INSTRUCTION", "SECTOR_SIZE", "SECTORERASE"},
    {"BLOCKERASE32_INSTRUCTION", "BLOCKERASE32_SIZE", "BLOCKERASE32"},
    {"BLOCKERASE64_INSTRUCTION", "BLOCKERASE64_SIZE", "BLOCKERASE64"},
};

}  // namespace

std::vector<BlockEraseType> readBlockEraseTypes(ConstraintsManager& database, const char* partName) {
    std::vector<BlockEraseType> types;
    auto number = [&](const std::string& key, std::int64_t fallback) -> std::int64_t {
        return database.hasProperty(partName, key) ? database.getDeviceLongProperty(partName, key.c_str()) : fallback;
    };
    for (const EraseKeys& keys : kEraseKeys) {
        if (!database.hasProperty(partName, keys.instruction) || !database.hasProperty(partName, keys.size)) continue;
        const std::string prefix = keys.prefix;
        BlockEraseType type;
        type.instruction = database.getDeviceStringProperty(partName, keys.instruction);
        const std::int64_t size = number(keys.size, 0);
        const std::int64_t typical = number(prefix + "_WAITTIME", 0);
        if (type.instruction.length() == 0 || size <= 0 || typical < 0) continue;
        type.sizeBytes = static_cast<std::uint32_t>(size);
        type.waitTime = static_cast<std::int32_t>(typical);
        type.maxWaitTime = static_cast<std::int32_t>(
            std::min<std::int64_t>(number(prefix + "_MAXWAITTIME", typical * kMaxWaitPerTypical), INT32_MAX / 2));
        type.waitStep = static_cast<std::int32_t>(
            std::max<std::int64_t>(1, number(prefix + "_WAITTIME_INC", typical / kStepsPerTypical)));
        types.push_back(type);
    }
    return types;
}

}  // namespace vorant::device
