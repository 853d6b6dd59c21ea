// The port table as a whole, and the --port address checked against its
// rows.

#include "ports/PortAddress.h"
#include "ports/PortError.h"
#include "ports/PortTable.h"

#include <gtest/gtest.h>

#include <set>

namespace vorant::ports::test {
namespace {

TEST(PortTable, EveryRowIsCompleteAndConsistent) {
    std::set<std::string> names;
    for (const PortInfo& row : portTable()) {
        SCOPED_TRACE(row.name);
        EXPECT_EQ(row.name.find_first_of(":,= "), std::string::npos) << "the name must survive address parsing";
        EXPECT_TRUE(names.insert(row.name).second) << "two rows share a name";
        EXPECT_NE(row.open, nullptr);
        if (row.path != PathUse::None) { EXPECT_FALSE(row.pathName.empty()); }
        std::set<std::string> keys;
        for (const PortKey& key : row.keys) {
            EXPECT_TRUE(keys.insert(key.name).second) << key.name << " twice";
            EXPECT_FALSE(key.valueName.empty() || key.purpose.empty()) << key.name;
        }
        // A recording reads nothing; a simulated chip is read back.
        EXPECT_FALSE(row.caps.records && row.caps.readsBack);
        if (row.caps.simulatesChip) { EXPECT_TRUE(row.caps.readsBack); }
        for (const auto& [form, purpose] : row.synopsis) {
            EXPECT_EQ(form.rfind(row.name, 0), 0u) << form;
            EXPECT_FALSE(purpose.empty()) << form;
        }
    }
    EXPECT_NE(findPort("sim"), nullptr) << "the default port";
}

TEST(PortTable, HelpShowsEveryFormAndKey) {
    const std::string help = "\n" + portHelp();
    for (const PortInfo& row : portTable()) {
        for (const auto& [form, purpose] : row.synopsis) {
            const std::size_t at = help.find("\n  " + form);
            ASSERT_NE(at, std::string::npos) << form;
            const char after = help[at + 3 + form.size()];
            EXPECT_TRUE(after == ' ' || after == '\n') << form << " is a line of its own";
        }
        for (const PortKey& key : row.keys) EXPECT_NE(help.find("," + key.name + "="), std::string::npos) << key.name;
        EXPECT_NE(portNames().find(row.name), std::string::npos);
    }
}

// "kind[:path][,key=value...]": the path keeps its colons (a drive letter,
// a Unix name), and what no row takes is refused naming the --port text.
TEST(PortAddress, SplitsKindAndPathOrRefusesWhatNoRowTakes) {
    const struct { const char *text, *kind, *path, *error; } cases[] = {
        {"sim", "sim", "", nullptr},
        {"sim:flash.bin", "sim", "flash.bin", nullptr},
        {"sim:C:\\flash.bin", "sim", "C:\\flash.bin", nullptr},
        {"svf:job.svf", "svf", "job.svf", nullptr},
        {"svf:/tmp/a:b.svf", "svf", "/tmp/a:b.svf", nullptr},
        {"usb", "", "", "unknown port 'usb'; the ports are sim, svf"},
        {"", "", "", "unknown port ''"},
        {"svf", "", "", "svf needs a FILE: --port svf:FILE"},
        {"svf:", "", "", "svf needs a FILE"},
        {"sim:", "", "", "the FILE after the colon is empty"},
        {"sim,clock=5", "", "", "sim has no key 'clock'; it takes none"},
        {"sim:f.bin,oops", "", "", "'oops' is not KEY=VALUE"},
        {"sim,=1", "", "", "'=1' is not KEY=VALUE"},
        {"sim,a=1,a=2", "", "", "'a' is given twice"},
    };
    for (const auto& c : cases) {
        try {
            const PortAddress address = parsePortAddress(c.text);
            EXPECT_EQ(c.error, nullptr) << c.text << " was accepted";
            EXPECT_EQ(address.kind, c.kind) << c.text;
            EXPECT_EQ(address.path, c.path) << c.text;
            EXPECT_EQ(address.hasPath, *c.path != '\0') << c.text;
            EXPECT_EQ(address.text, c.text);
            EXPECT_TRUE(address.keys.empty());
        } catch (const PortError& error) {
            ASSERT_NE(c.error, nullptr) << c.text << ": " << error.what();
            EXPECT_EQ(std::string(error.what()).rfind(std::string("--port ") + c.text + ": ", 0), 0u) << error.what();
            EXPECT_NE(std::string(error.what()).find(c.error), std::string::npos) << error.what();
        }
    }
}

// Keys are checked against a row that has some, as a cable's row will.
TEST(PortAddress, ChecksKeysAgainstTheRow) {
    PortInfo cable;
    cable.name = "cable";
    cable.path = PathUse::Optional;
    cable.pathName = "HOST[:PORT]";
    cable.keys = {{"tap", "NAME", "the TAP"}, {"bridge", "NAME", "the bridge"}};

    PortAddress good;
    good.text = "cable:host:6666,tap=fpga.tap,bridge=shiftdr";
    good.kind = "cable";
    good.path = "host:6666";
    good.hasPath = true;
    good.keys = {{"tap", "fpga.tap"}, {"bridge", "shiftdr"}};
    EXPECT_NO_THROW(checkPortAddress(good, cable));
    EXPECT_EQ(good.key("tap"), "fpga.tap");
    EXPECT_EQ(good.key("speed", "1000"), "1000");

    const std::pair<std::map<std::string, std::string>, const char*> bad[] = {
        {{{"speed", "1"}}, "cable has no key 'speed'; its keys are tap, bridge"},
        {{{"tap", ""}}, "'tap=' needs a value"},
    };
    for (const auto& [keys, message] : bad) {
        PortAddress address = good;
        address.keys = keys;
        try {
            checkPortAddress(address, cable);
            ADD_FAILURE() << message;
        } catch (const PortError& error) {
            EXPECT_EQ(error.kind(), PortError::Kind::BadRequest);
            EXPECT_NE(std::string(error.what()).find(message), std::string::npos) << error.what();
        }
    }
}

}  // namespace
}  // namespace vorant::ports::test
