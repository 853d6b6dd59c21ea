#pragma once
#include "host/ScanPort.h"

#include <string>
#include <vector>

namespace vorant::cli {

struct Identification {
    std::string partName;
    std::string jedecId;  // as read, hexadecimal text
    // What told the part apart from others with the same ID ("" when the
    // ID alone did), for the identification message.
    std::string decidedBy;
};

// --part auto: reads the JEDEC ID over the port with a device built for a
// part that reads it with 9Fh (every shipped part does, so any of them can
// ask whatever chip answers) and returns the one part that has that ID.
// Where several parts share the ID, the chip's SFDP area decides when it
// fits exactly one of them. Throws ToolFailure when no chip answers (or the
// read fails), UsageError, listing what matched, when no part has the ID or
// several remain.
Identification identifyPart(ScanPort& port, int index);

// false for the IDs a bus without an answering chip reads: all ones or all
// zeros.
bool chipAnswered(const std::string& jedecId);

// The message for an ID and the parts that have it; empty when exactly one
// does. Exposed for tests.
std::string identificationProblem(const std::string& jedecId, const std::vector<std::string>& matches);

}  // namespace vorant::cli
