#include "tests/support/TestParts.h"

#include "host/ConstraintsManager.h"

namespace vorant::test {

Properties w25q128Properties() {
    Properties p{
        {"ENABLE_INSTRUCTION", "00000110"},
        {"DISABLE_INSTRUCTION", "00000100"},
        {"IDENTIFICATION_INSTRUCTION", "10011111"},
        {"READSTATUS_INSTRUCTION", "00000101"},
        {"READSTATUS2_INSTRUCTION", "00110101"},
        {"WRITESTATUS_INSTRUCTION", "00000001"},
        {"READ_INSTRUCTION", "00000011"},
        {"FASTREAD_INSTRUCTION", "00001011"},
        {"PAGEPROGRAM_INSTRUCTION", "00000010"},
        {"SECTORERASE_INSTRUCTION", "00100000"},
        {"BULKERASE_INSTRUCTION", "11000111"},
        {"DEEPDOWN_INSTRUCTION", "10111001"},
        {"RELEASE_INSTRUCTION", "10101011"},
        {"READSIGNATURE_INSTRUCTION", "10101011"},
        {"WRITESR_INSTRUCTION", "00000001"},
        {"PROGRAM_WAITTIME_INC", "70"},
        {"BULKERASE_WAITTIME_INC", "4000000"},
        {"WRITESTATUS_WAITTIME", "15000"},
        {"SECTORERASE_WAITTIME", "400000"},
        {"ADDRESS_SIZE", "24"},
        {"READ_SIZE", "32"},
        {"PAGE_SIZE", "2048"},
        {"DATA_START_INDEX", "32"},
        {"PAGE_ADDRESS_START_INDEX", "8"},
        {"TOTAL_SHIFT_SIZE", "2080"},
        {"PROGRAM_MAXWAITTIME", "4500"},
        {"PROGRAM_WAITTIME", "700"},
        {"BULKERASE_WAITTIME", "40000000"},
        {"PROGRESS_ERASE_WAITTIME_INC", "2000000"},
        {"BULKERASE_MAXWAITTIME", "300000000"},
        {"WRSR_MAXWAITTIME", "22500"},
        {"DEVICE_SIZE", "134217728"},
        {"IDCODE", "EF4018"},
        {"INSTRUCTION_LENGTH", "8"},
        {"USE_RES", "FALSE"},
        {"USE_UNLOCKSR", "TRUE"},
        {"READ_STATUS_ENABLED", "TRUE"},
        {"X2_READ", "FALSE"},
        {"X4_READ", "TRUE"},
        {"STATUS_REGISTER_LENGTH", "16"},
        {"RELEASE_FROM_STANDBY_MAX_WAITTIME", "5"},
        // Identification and simulator facts.
        {"VENDOR", "Winbond"},
        {"JEDEC_ID", "EF4018"},
        {"RES_SIGNATURE", "17"},
        {"QE_LOCATION", "SR2.1"},
        {"WRSR_BITS", "16"},
        {"SECTOR_SIZE", "4096"},
        {"SIM_PAGE_PROGRAM_US", "700"},
        {"SIM_BULK_ERASE_US", "40000000"},
        {"SIM_WRITE_STATUS_US", "15000"},
        {"SIM_RELEASE_US", "3"},
    };
    const char* labels[16] = {"BUSY", "WEL", "BP0", "BP1", "BP2", "TB", "SEC", "SRP",
                              "SRL", "QE", "NOT_VALID", "LB1", "LB2", "LB3", "CMP", "SUS"};
    for (int i = 0; i < 16; ++i) p["STATUS_LOCATION_" + std::to_string(i)] = labels[i];
    return p;
}

Properties m25p16Properties() {
    Properties p = w25q128Properties();
    p["IDCODE"] = "14";
    p["USE_RES"] = "TRUE";
    p["JEDEC_ID"] = "202015";
    p["RES_SIGNATURE"] = "14";
    p["VENDOR"] = "Micron";
    p["DEVICE_SIZE"] = "16777216";
    // No second status register: read register 1 again, which is harmless.
    p["READSTATUS2_INSTRUCTION"] = "00000101";
    p["SECTORERASE_INSTRUCTION"] = "11011000";
    p["SECTOR_SIZE"] = "65536";
    p["X4_READ"] = "FALSE";
    p["QE_LOCATION"] = "none";
    p["WRSR_BITS"] = "8";
    p["PROGRAM_WAITTIME"] = "640";
    p["PROGRAM_WAITTIME_INC"] = "64";
    p["PROGRAM_MAXWAITTIME"] = "7500";
    p["BULKERASE_WAITTIME"] = "13000000";
    p["BULKERASE_WAITTIME_INC"] = "1300000";
    p["BULKERASE_MAXWAITTIME"] = "60000000";
    p["SIM_PAGE_PROGRAM_US"] = "640";
    p["SIM_BULK_ERASE_US"] = "13000000";
    p["RELEASE_FROM_STANDBY_MAX_WAITTIME"] = "45";
    p["SIM_RELEASE_US"] = "30";
    const char* labels[8] = {"WIP", "WEL", "BP0", "BP1", "BP2", "NOT_VALID", "NOT_VALID", "SRWD"};
    for (int i = 0; i < 8; ++i) p["STATUS_LOCATION_" + std::to_string(i)] = labels[i];
    for (int i = 8; i < 16; ++i) p["STATUS_LOCATION_" + std::to_string(i)] = "NOT_VALID";
    return p;
}

std::string addTestPart(const std::string& name, const Properties& properties) {
    ConstraintsManager::instance().addPart(name, properties);
    return name;
}

void loadShippedParts() { ConstraintsManager::instance().loadDirectory(VORANT_PARTS_DIR); }

}  // namespace vorant::test
