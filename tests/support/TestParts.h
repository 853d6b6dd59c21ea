#pragma once
// Part definitions for tests, registered in memory (unvalidated) so a test
// can change any value, including ones no part file may hold.

#include <map>
#include <string>

namespace vorant::test {

using Properties = std::map<std::string, std::string>;

// A 16 MiB part with a 24-bit address, JEDEC ID EF4018, two status
// registers and Quad Enable in register 2 bit 1.
Properties w25q128Properties();
// A 2 MiB part identified by its RES signature (USE_RES, IDCODE "14").
Properties m25p16Properties();

// Registers (or replaces) a part in the process-wide database and returns
// its name.
std::string addTestPart(const std::string& name, const Properties& properties);

// Loads the shipped part files (parts/).
void loadShippedParts();

}  // namespace vorant::test
