#pragma once
// Part files a user could add with --parts, for the tests. Each extends
// the shipped Winbond family and changes what the test is about.

#include <string>

namespace vorant::cli::test {

// The keys a W25Q16JV-like part adds to the family, with a given page size
// (bits) and JEDEC ID.
inline std::string smallWinbondPart(const std::string& name, int pageBits, const std::string& jedecId,
                                    const std::string& extraKeys = "") {
    return "[part." + name + "]\n"
           "extends = \"WINBOND_W25Q\"\n"
           "DESCRIPTION = \"test part " + name + "\"\n"
           "JEDEC_ID = \"" + jedecId + "\"\n"
           "IDCODE = \"" + jedecId + "\"\n"
           "RES_SIGNATURE = \"14\"\n"
           "DEVICE_SIZE = 16777216\n"
           "PAGE_SIZE = " + std::to_string(pageBits) + "\n"
           "TOTAL_SHIFT_SIZE = " + std::to_string(pageBits + 32) + "\n"
           "WRSR_BITS = 8\n"
           "X4_READ = \"FALSE\"\n"
           "PROGRAM_WAITTIME = 400\n"
           "PROGRAM_WAITTIME_INC = 40\n"
           "PROGRAM_MAXWAITTIME = 4500\n"
           "SIM_PAGE_PROGRAM_US = 400\n"
           "BULKERASE_WAITTIME = 5000000\n"
           "BULKERASE_WAITTIME_INC = 500000\n"
           "BULKERASE_MAXWAITTIME = 37500000\n"
           "PROGRESS_ERASE_WAITTIME_INC = 325000\n"
           "SIM_BULK_ERASE_US = 5000000\n" +
           extraKeys;
}

// A chip whose bulk erase keeps it busy for about half an hour of simulated
// time while the device polls every microsecond: an erase that, in real
// time, only a cancel ends.
inline std::string endlessErasePart(const std::string& name) {
    return "[part." + name + "]\n"
           "extends = \"WINBOND_W25Q\"\n"
           "JEDEC_ID = \"EF40EE\"\n"
           "IDCODE = \"EF40EE\"\n"
           "DEVICE_SIZE = 16777216\n"
           "WRSR_BITS = 8\n"
           "X4_READ = \"FALSE\"\n"
           "PROGRAM_WAITTIME = 400\n"
           "PROGRAM_WAITTIME_INC = 40\n"
           "PROGRAM_MAXWAITTIME = 4500\n"
           "BULKERASE_WAITTIME = 0\n"
           "BULKERASE_WAITTIME_INC = 1\n"
           "BULKERASE_MAXWAITTIME = 2000000000\n"
           "PROGRESS_ERASE_WAITTIME_INC = 20000000\n"
           "SIM_BULK_ERASE_US = 2000000000\n";
}

}  // namespace vorant::cli::test
