#include "fuzz/FuzzTargets.h"

#include "host/ConstraintsManager.h"
#include "host/VorantException.h"

#include <stdexcept>
#include <string>

namespace vorant::fuzz {

void fuzzPartFile(const std::uint8_t* data, std::size_t size) {
    ConstraintsManager database;  // not the process-wide one: every run starts empty
    try {
        database.loadText(std::string(reinterpret_cast<const char*>(data), size), "fuzz.toml");
    } catch (const VorantException&) {
        if (!database.partNames().empty()) throw std::logic_error("a refused file left parts behind");
        return;
    }
    // A part that passed validation answers every key a device reads.
    for (const std::string& part : database.partNames())
        for (const std::string& key : ConstraintsManager::deviceKeys())
            if (!database.hasProperty(part, key)) throw std::logic_error(part + " passed without " + key);
}

}  // namespace vorant::fuzz
