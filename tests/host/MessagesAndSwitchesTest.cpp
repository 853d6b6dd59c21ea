#include "host/MessageSinks.h"
#include "host/Port_MsgManData.h"
#include "host/UT_CMDARGS.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <string>

namespace {

std::string readAll(std::FILE* f) {
    std::rewind(f);
    std::string text;
    char buffer[256];
    while (std::fgets(buffer, sizeof buffer, f)) text += buffer;
    return text;
}

TEST(Messages, ConsoleSinkLabelsInfoAndErrorsAndHidesDebugUnlessAsked) {
    struct Case { bool debug; bool quiet; const char* out; const char* err; };
    const Case cases[] = {
        {false, false, "status\nINFO: info\n", "ERROR: error\n"},
        {true, false, "status\nINFO: info\n", "ERROR: error\nDEBUG: debug\n"},
        {false, true, "", "ERROR: error\n"},
    };
    for (const auto& c : cases) {
        std::FILE* out = std::tmpfile();
        std::FILE* err = std::tmpfile();
        vorant::ConsoleSink console(out, err, c.debug, c.quiet);
        vorant::ScopedSink scope(&console);
        Port_MsgManData::createObject("Vorant", "s", 1, "r").issueStatus("status\n");
        Port_MsgManData::createObject("Vorant", "s", 1, "r").issueInfo("info\n");
        Port_MsgManData::createObject("Vorant", "s", 1, "r").issueError("error\n");
        Port_MsgManData::debugStub("debug");
        EXPECT_EQ(readAll(out), c.out);
        EXPECT_EQ(readAll(err), c.err);
        std::fclose(out);
        std::fclose(err);
    }
}

TEST(Switches, TokensBecomeSwitchesWithTheirArguments) {
    UT_CMDARGS args({"image.bin", "-e", "-f", "out.bin", "extra", "-v", "-file", "second.bin", "-", "-qebit"});
    EXPECT_STREQ(args.getsw("-file", 0)->getargtxt(1), "-") << "a lone dash is an argument";
    UT_CMDARGS twice({"-f", "first.bin", "-f", "second.bin"});
    EXPECT_STREQ(twice.getsw("-f", 0)->getargtxt(0), "first.bin");
}

}  // namespace
