// --part auto over every shipped part on its simulated chip: the ID alone
// names the part, or SFDP tells the parts sharing the ID apart, or (for
// parts that differ only in timing, whose tables fit alike) the one with
// the longest limits drives the chip, or the candidates are listed with the
// part among them.
#include "cli/PartIdentification.h"
#include "cli/SfdpMatch.h"
#include "cli/UsageError.h"
#include "formats/SfdpTable.h"
#include "host/ConstraintsManager.h"
#include "ports/sim/SimScanPort.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <map>

namespace vorant::cli {
namespace {

void loadShippedOnce() {
    static const bool loaded = (ConstraintsManager::instance().clear(),
                                ConstraintsManager::instance().loadDirectory(VORANT_PARTS_DIR), true);
    (void)loaded;
}

TEST(PartIdentification, EveryShippedPartIsNamedOrListedAmongPartsItsSfdpCannotTellApart) {
    loadShippedOnce();
    ConstraintsManager& db = ConstraintsManager::instance();
    int bySfdp = 0, listed = 0, twins = 0;
    for (const std::string& part : db.partNames()) {
        SCOPED_TRACE(part);
        sim::SimScanPort port(sim::FlashConfig::fromPartDatabase(part));
        const auto sharing = db.partsWithId(db.getDeviceStringProperty(part.c_str(), "JEDEC_ID"));
        try {
            const Identification found = identifyPart(port, 0);
            if (found.decidedBy.find("differ only in their times") != std::string::npos) {
                // A twin that drives the chip alike, with the longest limits.
                EXPECT_NE(std::find(sharing.begin(), sharing.end(), found.partName), sharing.end());
                ++twins;
                continue;
            }
            EXPECT_EQ(found.partName, part);
            EXPECT_EQ(found.decidedBy.empty(), sharing.size() == 1);
            bySfdp += !found.decidedBy.empty();
        } catch (const UsageError& error) {
            // Undecided: the part is listed, and the chip's table fits every
            // part listed with it.
            const std::string message = error.what();
            EXPECT_NE(message.find(part), std::string::npos) << message;
            EXPECT_GT(sharing.size(), 1u) << message;
            ++listed;
        }
    }
    EXPECT_GE(bySfdp, 6) << "shared IDs that SFDP decides";
    EXPECT_GE(listed + twins, 2);
}

// What makes a table fit a part, one fact at a time, on the W25Q128JV.
TEST(PartIdentification, ATableFitsAPartOnlyWithItsSizeEraseOpcodePageAndQuadEnableMethod) {
    loadShippedOnce();
    formats::SfdpTable table;
    table.densityBytes = 16u << 20;
    table.eraseTypes.push_back({1, 4096, 0x20, std::nullopt, std::nullopt, std::nullopt});
    table.pageBytes = 256;
    table.quadEnableRequirement = 4;
    EXPECT_TRUE(partFitsSfdp("W25Q128JV", table));
    const std::map<std::string, std::function<void(formats::SfdpTable&)>> mismatches{
        {"size", [](auto& t) { t.densityBytes = 8u << 20; }},
        {"erase size", [](auto& t) { t.eraseTypes[0].sizeBytes = 65536; }},
        {"erase opcode", [](auto& t) { t.eraseTypes[0].opcode = 0x81; }},
        {"page", [](auto& t) { t.pageBytes = 512; }},
        {"Quad Enable in register 1", [](auto& t) { t.quadEnableRequirement = 2; }},
        {"no Quad Enable", [](auto& t) { t.quadEnableRequirement = 0; }}};
    for (const auto& [what, change] : mismatches) {
        formats::SfdpTable changed = table;
        change(changed);
        EXPECT_FALSE(partFitsSfdp("W25Q128JV", changed)) << what;
    }
    EXPECT_FALSE(partFitsSfdp("M25P16", table)) << "a part older than SFDP fits no table";
    EXPECT_EQ(partsFittingSfdp({"MX25L3206E", "MX25L3233F"}, std::nullopt), std::vector<std::string>{"MX25L3206E"});
}

}  // namespace
}  // namespace vorant::cli
