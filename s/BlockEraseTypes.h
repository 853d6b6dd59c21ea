#pragma once
// The erase sizes a part offers below the whole-chip erase, from its part
// entry: the sector erase (SECTORERASE_INSTRUCTION, SECTOR_SIZE,
// SECTORERASE_WAITTIME, SECTORERASE_MAXWAITTIME, SECTORERASE_WAITTIME_INC)
// and the 32 KiB and 64 KiB blocks (BLOCKERASE32_* and BLOCKERASE64_*, the
// same five keys each).

#include "host/PortString.h"

#include <cstdint>
#include <vector>

class ConstraintsManager;

namespace vorant::device {

struct BlockEraseType {
    Port::StringBase<char> instruction;  // '0'/'1' text
    std::uint32_t sizeBytes = 0;
    std::int32_t waitTime = 0;     // typical, microseconds
    std::int32_t maxWaitTime = 0;  // give up after this
    std::int32_t waitStep = 0;     // polling step
};

// Every size whose instruction and size the part names. A missing maximum
// is 15 times the typical time (datasheets give 8 to 14 times), a missing
// polling step a tenth of the typical time; both stay within 32 bits.
std::vector<BlockEraseType> readBlockEraseTypes(ConstraintsManager& database, const char* partName);

}  // namespace vorant::device
