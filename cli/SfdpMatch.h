#pragma once
#include "formats/SfdpTable.h"

#include <optional>
#include <string>
#include <vector>

namespace vorant::cli {

// Whether a part of the database could be the chip that published `table`:
// the same size, an erase type of the part's smallest erase with its opcode,
// the same page size where the table gives one, and a Quad Enable method the
// part's entry allows. Parts that differ only in timing publish tables that
// fit them all alike.
bool partFitsSfdp(const std::string& part, const formats::SfdpTable& table);

// The candidates (parts sharing one JEDEC ID) the chip's SFDP area fits, in
// their order. `table` is empty when the chip has no readable SFDP area: then
// the candidates of a generation older than SFDP (SFDP = "none") fit.
std::vector<std::string> partsFittingSfdp(const std::vector<std::string>& candidates,
                                          const std::optional<formats::SfdpTable>& table);

}  // namespace vorant::cli
