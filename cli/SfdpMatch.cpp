#include "cli/SfdpMatch.h"

#include "host/ConstraintsManager.h"
#include "host/VorantException.h"

namespace vorant::cli {

namespace {

std::string text(const std::string& part, const char* key) {
    ConstraintsManager& database = ConstraintsManager::instance();
    return database.hasProperty(part, key) ? database.getDeviceStringProperty(part.c_str(), key) : std::string();
}

long long number(const std::string& part, const char* key) {
    ConstraintsManager& database = ConstraintsManager::instance();
    return database.hasProperty(part, key) ? database.getDeviceLongProperty(part.c_str(), key) : -1;
}

int opcodeOf(const std::string& instruction) {
    if (instruction.size() < 8) return -1;
    return std::stoi(instruction.substr(0, 8), nullptr, 2);
}

// The Quad Enable requirements (JESD216 DWORD 15) a part's entry allows.
bool quadEnableFits(const std::string& part, int requirement) {
    const std::string qe = text(part, "QE_LOCATION");
    if (qe.empty()) return true;  // the entry does not say
    if (qe == "SR1.6") return requirement == 2;
    if (qe == "none") return requirement == 0;
    // Register 2 bit 1: written with a two-byte 01h (requirements 1, 4, 5),
    // or alone with 31h (6).
    if (number(part, "WRSR_BITS") == 16) return requirement == 1 || requirement == 4 || requirement == 5;
    return requirement == 6 || requirement == 1 || requirement == 4 || requirement == 5;
}

}  // namespace

bool partFitsSfdp(const std::string& part, const formats::SfdpTable& table) {
    try {
        if (text(part, "SFDP") == "none") return false;  // an older generation publishes nothing
        if (static_cast<long long>(table.densityBytes) * 8 != number(part, "DEVICE_SIZE")) return false;
        const formats::SfdpEraseType* erase = table.eraseOfSize(static_cast<std::uint32_t>(number(part, "SECTOR_SIZE")));
        if (erase == nullptr) return false;
        const int opcode = opcodeOf(text(part, "SECTORERASE_INSTRUCTION"));
        // A 4-byte part erases with the 4-byte form, which some tables of
        // such parts do not list.
        const bool usualPair = (erase->opcode == 0x20 && opcode == 0x21) || (erase->opcode == 0xD8 && opcode == 0xDC);
        if (erase->opcode != opcode && erase->opcode4 != opcode && !usualPair) return false;
        if (table.pageBytes && static_cast<long long>(*table.pageBytes) * 8 != number(part, "PAGE_SIZE")) return false;
        if (table.quadEnableRequirement && !quadEnableFits(part, *table.quadEnableRequirement)) return false;
        return true;
    } catch (const VorantException&) {
        return false;  // an entry without the facts to compare
    } catch (const std::logic_error&) {
        return false;  // an instruction text that is no number
    }
}

std::vector<std::string> partsFittingSfdp(const std::vector<std::string>& candidates,
                                          const std::optional<formats::SfdpTable>& table) {
    std::vector<std::string> fitting;
    for (const std::string& part : candidates)
        if (table ? partFitsSfdp(part, *table) : text(part, "SFDP") == "none") fitting.push_back(part);
    return fitting;
}

}  // namespace vorant::cli
