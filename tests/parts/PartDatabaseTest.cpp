// Self-check of the shipped part database (parts/*.toml): every part loads
// through the host's loader, keeps the rules the plug-in, the flash
// simulator and identification rely on (rules the loader does not enforce),
// and matches the datasheet facts it was built from.
#include "host/ConstraintsManager.h"
#include "tests/support/TestParts.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <bitset>
#include <cctype>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <map>
#include <set>
#include <sstream>
#include <string>
#include <vector>

namespace {

using Properties = std::map<std::string, std::string>;

// The facts each shipped part was built from, read from the fact tables
// (tests/data/parts, one row a part, each naming its sources). Opcodes in
// kOpcodeKeys order as the part uses them: 4-byte-address forms over 16 MiB,
// register 1 read again where there is no register 2, 00 for a missing
// command. Page program typical/maximum in us, chip erase typical/maximum
// and status write maximum in ms.
struct Reference {
    std::string part, vendor, jedecId, res;
    long long sizeBytes = 0, pageBytes = 0;
    std::string opcodes, qe;
    long long wrsrBits = 0, tppTyp = 0, tppMax = 0, tbeTyp = 0, tbeMax = 0, twMax = 0;
};

// One table row as the part entry must hold it. This conversion is written
// apart from the script that generates the part files, so a slip in either
// shows here.
Reference referenceOf(const std::map<std::string, std::string>& row) {
    auto cell = [&](const char* column) { return row.at(column); };
    // "-": not specified (only in rows that are left out).
    auto count = [&](const char* column) { return cell(column) == "-" ? -1LL : std::stoll(cell(column)); };
    const bool fourByte = cell("addr_bits") == "32";
    const std::map<std::string, std::string> native{{"03", "13"}, {"0B", "0C"}, {"02", "12"}, {"20", "21"}, {"D8", "DC"}};
    auto wide = [&](const std::string& op) { return fourByte ? native.at(op) : op; };
    auto orNone = [](const std::string& op) { return op == "-" ? std::string("00") : op; };
    const bool register2 = cell("qe_location") == "SR2.1";
    Reference r;
    r.part = cell("part"), r.vendor = cell("vendor"), r.jedecId = cell("jedec_id_hex");
    r.res = cell("res_signature_hex") == "-" ? "" : cell("res_signature_hex");
    r.sizeBytes = count("size_bytes"), r.pageBytes = count("page_bytes");
    const bool powerDown = cell("dp") != "-";
    r.opcodes = cell("wren") + " " + cell("wrdi") + " " + cell("rdid") + " " + cell("rdsr") + " " +
                (register2 ? cell("rdsr2") : cell("rdsr")) + " " + cell("wrsr") + " " + wide(cell("read")) + " " +
                wide(cell("fast_read")) + " " + wide(cell("pp")) + " " + wide(cell("se")) + " " + cell("be") + " " +
                orNone(cell("dp")) + " " + (powerDown ? orNone(cell("res")) : std::string("--")) + " " +
                orNone(cell("res")) + " " + cell("wrsr");
    r.qe = cell("qe_location");
    r.wrsrBits = count("sr_bits_written_by_wrsr");
    r.tppTyp = count("tpp_typ_us"), r.tppMax = count("tpp_max_us");
    r.tbeTyp = count("tbe_typ_ms"), r.tbeMax = count("tbe_max_ms");
    r.twMax = count("tw_max_ms");
    return r;
}

// Every row of the fact tables.
std::vector<Reference> factRows() {
    std::vector<Reference> references;
    for (const char* table : {"spi-nor-parts.tsv", "spi-nor-parts-more.tsv"}) {
        std::ifstream in(std::string(VORANT_TEST_DATA_DIR) + "/parts/" + table);
        std::string line;
        std::getline(in, line);
        std::vector<std::string> columns;
        std::istringstream header(line);
        for (std::string name; std::getline(header, name, '\t');) columns.push_back(name);
        while (std::getline(in, line)) {
            std::map<std::string, std::string> row;
            std::istringstream cells(line);
            for (std::size_t i = 0; i < columns.size() && std::getline(cells, row[columns[i]], '\t'); ++i) {}
            references.push_back(referenceOf(row));
        }
    }
    return references;
}

// Rows of the fact tables the plug-in cannot drive (the generator's header
// comments give each reason): over 16 MiB without confirmed native 4-byte
// opcodes, and the Microchip protection and write schemes.
const std::set<std::string> kLeftOut{"W25Q256FV", "XM25QH512C", "XM25QU512C", "N25Q256A", "N25Q256A11",
                                     "IS25LP512M", "IS25WP512M", "XT25F256B", "BY25Q256FS", "SST26VF032B",
                                     "SST26VF016B", "SST26VF064B", "SST25VF064C"};

const char* const kOpcodeKeys[] = {"ENABLE", "DISABLE", "IDENTIFICATION", "READSTATUS", "READSTATUS2", "WRITESTATUS", "READ",
    "FASTREAD", "PAGEPROGRAM", "SECTORERASE", "BULKERASE", "DEEPDOWN", "RELEASE", "READSIGNATURE", "WRITESR"};
const std::set<std::string> kFlags{"USE_RES", "USE_UNLOCKSR", "READ_STATUS_ENABLED", "X2_READ", "X4_READ"};
const char* const kExtraKeys[] = {"VENDOR", "DESCRIPTION", "SOURCE", "SECTOR_SIZE", "JEDEC_ID", "RES_SIGNATURE", "QE_LOCATION", "WRSR_BITS",
                                  "SIM_PAGE_PROGRAM_US", "SIM_BULK_ERASE_US", "SIM_WRITE_STATUS_US", "SIM_RELEASE_US"};
// JEDEC manufacturer bytes (bank 1) of each maker; XMC shares 20h with Micron,
// and Zbit parts answer either byte (datasheet and silicon disagree).
const std::map<std::string, std::string> kManufacturerBytes{
    {"Winbond", "EF"}, {"Macronix", "C2"}, {"GigaDevice", "C8"}, {"Micron", "20"}, {"ISSI", "9D"}, {"Infineon", "01"},
    {"Renesas", "1F"}, {"XMC", "20"}, {"XTX", "0B"}, {"Puya", "85"}, {"Zbit", "0E 5E"}, {"Boya", "68"}, {"Eon", "1C"},
    {"Fudan", "A1"}, {"ESMT", "8C"}, {"Zetta", "BA"}};
std::string label(long long bit) { return "STATUS_LOCATION_" + std::to_string(bit); }

ConstraintsManager& db() {
    static ConstraintsManager& loaded = (vorant::test::loadShippedParts(), ConstraintsManager::instance());
    return loaded;
}

Properties readPart(const char* part) {
    Properties p;
    auto take = [&](const std::string& key) { if (db().hasProperty(part, key)) p[key] = db().getDeviceStringProperty(part, key.c_str()); };
    for (const auto& key : ConstraintsManager::deviceKeys()) take(key);
    for (const char* key : kExtraKeys) take(key);
    for (int bit = 0; bit < 32; ++bit) take(label(bit));
    return p;
}

// The keys that break a rule the loader does not enforce; empty for a sound part.
std::set<std::string> brokenKeys(const Properties& p) {
    std::set<std::string> broken;
    auto text = [&](const std::string& key) { return p.count(key) ? p.at(key) : std::string(); };
    auto num = [&](const std::string& key) { return std::atoll(text(key).c_str()); };
    auto rule = [&](bool kept, const std::string& key) { if (!kept) broken.insert(key); };
    for (const auto& key : kFlags) rule(text(key) == "TRUE" || text(key) == "FALSE", key);
    // Frames: opcode, address and data follow each other without gaps.
    const long long start = num("PAGE_ADDRESS_START_INDEX"), address = num("ADDRESS_SIZE");
    rule(start == std::ssize(text("READ_INSTRUCTION")) && start == std::ssize(text("PAGEPROGRAM_INSTRUCTION")), "PAGE_ADDRESS_START_INDEX");
    rule(num("READ_SIZE") == start + address, "READ_SIZE");
    rule(num("DATA_START_INDEX") == start + address, "DATA_START_INDEX");
    rule(num("TOTAL_SHIFT_SIZE") == num("DATA_START_INDEX") + num("PAGE_SIZE"), "TOTAL_SHIFT_SIZE");
    rule(address == (num("DEVICE_SIZE") / 8 > (16 << 20) ? 32 : 24), "ADDRESS_SIZE");
    // A first wait, simulated time or polling step never exceeds what bounds it.
    for (auto [low, high] : {std::pair{"PROGRAM_WAITTIME", "PROGRAM_MAXWAITTIME"}, {"SIM_PAGE_PROGRAM_US", "PROGRAM_MAXWAITTIME"},
                             {"BULKERASE_WAITTIME", "BULKERASE_MAXWAITTIME"}, {"SIM_BULK_ERASE_US", "BULKERASE_MAXWAITTIME"},
                             {"SIM_WRITE_STATUS_US", "WRSR_MAXWAITTIME"}, {"SIM_RELEASE_US", "RELEASE_FROM_STANDBY_MAX_WAITTIME"},
                             {"PROGRAM_WAITTIME_INC", "PROGRAM_WAITTIME"}, {"BULKERASE_WAITTIME_INC", "BULKERASE_WAITTIME"}})
        rule(p.count(low) && num(low) >= 0 && num(low) <= num(high), low);
    const long long eraseSteps = (num("BULKERASE_MAXWAITTIME") - num("BULKERASE_WAITTIME")) / std::max(1LL, num("PROGRESS_ERASE_WAITTIME_INC"));
    rule(eraseSteps >= 10 && eraseSteps <= 1000, "PROGRESS_ERASE_WAITTIME_INC");
    // 35h only where register 2 exists: elsewhere it may enter QPI mode and hang the chip.
    const bool register2 = text("QE_LOCATION") == "SR2.1";
    rule(text("READSTATUS2_INSTRUCTION") == (register2 ? "00110101" : text("READSTATUS_INSTRUCTION")), "READSTATUS2_INSTRUCTION");
    rule(text("X4_READ") != "TRUE" || (register2 && num("WRSR_BITS") == 16), "X4_READ");
    rule(num("STATUS_REGISTER_LENGTH") == 16, "STATUS_REGISTER_LENGTH");
    for (long long bit = 0; bit < std::min(num("STATUS_REGISTER_LENGTH"), 32LL); ++bit) rule(!text(label(bit)).empty(), label(bit));
    // Identification: by JEDEC ID, or by the RES signature byte, which needs its command.
    const bool byRes = text("USE_RES") == "TRUE";
    rule(!text("IDCODE").empty() && text("IDCODE") == text(byRes ? "RES_SIGNATURE" : "JEDEC_ID"), byRes ? "RES_SIGNATURE" : "IDCODE");
    rule(!p.count("RES_SIGNATURE") || text("READSIGNATURE_INSTRUCTION") != "00000000", "RES_SIGNATURE");
    rule(text("DEEPDOWN_INSTRUCTION") == "00000000" || text("READSIGNATURE_INSTRUCTION") != "00000000", "READSIGNATURE_INSTRUCTION");
    // An ID no chip answers (a missing or placeholder entry), or one whose
    // manufacturer byte belongs to another maker (a byte-order slip).
    const std::string id = text("JEDEC_ID");
    rule(id.size() == 6 && id != "FFFFFF" && id != "000000", "JEDEC_ID");
    const std::string vendor = text("VENDOR").substr(0, text("VENDOR").find(' '));
    rule(kManufacturerBytes.count(vendor) && kManufacturerBytes.at(vendor).find(id.substr(0, 2)) != std::string::npos, "JEDEC_ID");
    // The smallest erase tiles the chip and covers at least a page.
    const long long sector = num("SECTOR_SIZE");
    rule(sector >= num("PAGE_SIZE") / 8 && (sector & (sector - 1)) == 0 && num("DEVICE_SIZE") / 8 % std::max(1LL, sector) == 0, "SECTOR_SIZE");
    for (const char* key : {"VENDOR", "DESCRIPTION", "SOURCE"}) rule(!text(key).empty(), key);
    return broken;
}

TEST(PartDatabase, ShipsTwoHundredPartsOfTwelveMakersOrMoreAndEveryReferencePart) {
    const auto names = db().partNames();
    std::set<std::string> makers;
    for (const auto& name : names) {
        const std::string vendor = db().getDeviceStringProperty(name.c_str(), "VENDOR");
        makers.insert(vendor.substr(0, vendor.find(' ')));
    }
    for (const auto& r : factRows())
        EXPECT_NE(db().hasPart(r.part), kLeftOut.count(r.part) == 1) << r.part << ": ships exactly when not left out";
    EXPECT_TRUE(names.size() >= 200 && makers.size() >= 12) << names.size() << " parts, " << makers.size() << " makers";
    // All its blocks are locked at power-up and only 98h unlocks them, which the plug-in cannot send.
    EXPECT_FALSE(db().hasPart("SST26VF032B"));
}

// The rows whose part ships.
std::vector<Reference> shippedReferences() {
    std::vector<Reference> rows = factRows();
    std::erase_if(rows, [](const Reference& r) { return kLeftOut.count(r.part) != 0; });
    return rows;
}

class ShippedPart : public ::testing::TestWithParam<Reference> {};

TEST_P(ShippedPart, KeepsTheRulesAndMatchesItsDatasheet) {
    const Reference& r = GetParam();
    const Properties p = readPart(r.part.c_str());
    EXPECT_EQ(brokenKeys(p), std::set<std::string>());
    auto text = [&](const char* key) { return p.count(key) ? p.at(key) : std::string(); };
    auto num = [&](const char* key) { return std::atoll(p.count(key) ? p.at(key).c_str() : "-1"); };
    EXPECT_EQ(text("VENDOR"), r.vendor);
    EXPECT_EQ(text("JEDEC_ID"), r.jedecId);
    EXPECT_EQ(text("RES_SIGNATURE"), r.res);
    EXPECT_EQ(text("USE_RES") == "TRUE", std::string(r.part) == "M25P16") << "only the M25P16 is identified by RES";
    EXPECT_EQ(num("DEVICE_SIZE"), r.sizeBytes * 8);
    EXPECT_EQ(num("PAGE_SIZE"), r.pageBytes * 8);
    EXPECT_EQ(text("QE_LOCATION"), r.qe);
    EXPECT_EQ(num("WRSR_BITS"), r.wrsrBits);
    std::istringstream opcodes(r.opcodes);
    for (const std::string name : kOpcodeKeys) {
        std::string expected;
        opcodes >> expected;
        if (expected == "--") continue;  // release of a part without deep power-down: either way
        const unsigned opcode = std::stoul(expected, nullptr, 16);
        EXPECT_EQ(text((name + "_INSTRUCTION").c_str()), std::bitset<8>(opcode).to_string()) << name;
    }
    // Typical times as first waits and simulated times; maxima 1.25x to 2x the datasheet's.
    for (auto [key, typ] : {std::pair{"PROGRAM_WAITTIME", r.tppTyp}, {"SIM_PAGE_PROGRAM_US", r.tppTyp},
                            {"BULKERASE_WAITTIME", r.tbeTyp * 1000}, {"SIM_BULK_ERASE_US", r.tbeTyp * 1000}})
        EXPECT_EQ(num(key), typ) << key;
    for (auto [key, max] : {std::pair{"PROGRAM_MAXWAITTIME", r.tppMax}, {"BULKERASE_MAXWAITTIME", r.tbeMax * 1000},
                            {"WRSR_MAXWAITTIME", r.twMax * 1000}})
        EXPECT_TRUE(num(key) * 4 >= max * 5 && num(key) <= max * 2) << key << " against the maximum " << max;
    const auto withId = db().partsWithId(r.jedecId);  // itself and every other part answering the same ID
    EXPECT_EQ(std::count(withId.begin(), withId.end(), r.part), 1);
}

TEST(PartDatabase, EveryShippedPartReadsAsTheDeviceReadsItAndKeepsTheRules) {
    for (const auto& name : db().partNames()) {
        for (const auto& key : ConstraintsManager::deviceKeys())
            EXPECT_NO_THROW(db().getDeviceStringProperty(name.c_str(), key.c_str())) << name << " " << key;
        EXPECT_EQ(brokenKeys(readPart(name.c_str())), std::set<std::string>()) << name;
    }
}

INSTANTIATE_TEST_SUITE_P(Parts, ShippedPart, ::testing::ValuesIn(shippedReferences()), [](const auto& info) {
    std::string name = info.param.part;  // test names take letters, digits and '_' only
    for (char& c : name) c = std::isalnum(static_cast<unsigned char>(c)) ? c : '_';
    return name;
});

// The rules that guard the chip itself, each shown to catch its fault.
TEST(PartRules, CatchWhatWouldHangOrMisdriveAChip) {
    const struct { const char *part, *key, *value; } faults[] = {
        {"MX25L12835F", "READSTATUS2_INSTRUCTION", "00110101"}, {"W25Q128JV", "READSTATUS2_INSTRUCTION", "00000101"},
        {"IS25LP128", "X4_READ", "TRUE"}, {"GD25Q128C", "X4_READ", "TRUE"}, {"W25Q128JV", "X4_READ", "true"},
        {"W25Q256JV", "ADDRESS_SIZE", "24"}, {"W25Q128JV", "DATA_START_INDEX", "40"}, {"W25Q128JV", "STATUS_LOCATION_12", ""},
        {"W25Q128JV", "PROGRESS_ERASE_WAITTIME_INC", "100000"}, {"M25P16", "RES_SIGNATURE", "15"}, {"W25Q128JV", "IDCODE", "EF4017"},
        {"IS25LP128", "JEDEC_ID", "FFFFFF"}, {"XM25QH64C", "JEDEC_ID", "EF4017"}, {"GD25Q20C", "JEDEC_ID", "4012C8"},
        {"P25Q80H", "SECTOR_SIZE", "3000"}, {"W25Q16JV", "SECTOR_SIZE", "128"}, {"EN25Q64", "SOURCE", ""}};
    for (const auto& f : faults) {
        Properties p = readPart(f.part);
        p[f.key] = f.value;
        EXPECT_EQ(brokenKeys(p).count(f.key), 1u) << f.part << " with " << f.key << " = '" << f.value << "'";
    }
}

}  // namespace
