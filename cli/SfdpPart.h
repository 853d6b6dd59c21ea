#pragma once
// --part sfdp: a part entry for a chip the database does not know, built
// from its JEDEC ID and its SFDP table alone.
#include "formats/SfdpTable.h"
#include "host/ScanPort.h"

#include <string>

namespace vorant::cli {

// The entry as a TOML part file ([part.NAME], every key the device reads,
// comments for each value the table could not give). Throws UsageError when
// the table lacks what the plug-in needs (over 16 MiB without 4-byte
// opcodes, 4-byte addresses only).
//
// Safety: register 2 is read with 35h only for Quad Enable requirements
// 001b, 100b and 101b; X4_READ only for 001b and 100b; under 001b a one-byte
// status write would clear register 2, so the unlock is off; the chip-erase
// opcode is not in the table and C7h is assumed; tables before revision 1.5
// give no page size or times, so 256 bytes and conservative waits are used.
std::string sfdpPartToml(const std::string& name, const std::string& jedecId, const formats::SfdpTable& table);

// Reads the chip's JEDEC ID and SFDP table over the port, prints the entry
// (so the user can save it and load it with --parts), loads it into the
// part database and returns its name. Throws ToolFailure when no chip
// answers, UsageError when it has no usable SFDP table.
std::string partFromChipSfdp(ScanPort& port, std::string& jedecId);

}  // namespace vorant::cli
