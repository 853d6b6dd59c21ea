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

TEST(Messages, EveryMessageReachesTheInstalledSinkWithItsOrigin) {
    vorant::CapturingSink sink;
    vorant::ScopedSink scope(&sink);
    Port_MsgManData::createObject("Vorant", "../s/Type1SPIDevice", 42, "r1").issueStatus("'%d': Erasing Device.\n", 3);
    Port_MsgManData::createObject("Vorant", "src", 7, "r1").issueError("%s\n", "bad");
    Port_MsgManData::debugStub("trace %02X", 0x5A);
    const auto messages = sink.messages();
    ASSERT_EQ(messages.size(), 3u);
    EXPECT_EQ(messages[0].text, "'3': Erasing Device.\n");
    EXPECT_EQ(messages[0].source, "../s/Type1SPIDevice");
    EXPECT_EQ(messages[0].line, 42);
    EXPECT_EQ(messages[0].domain, "Vorant");
    EXPECT_EQ(messages[1].kind, MessageKind::Error);
    EXPECT_EQ(messages[2].kind, MessageKind::Debug);
    EXPECT_EQ(messages[2].text, "trace 5A");
    EXPECT_EQ(sink.transcript(), "'3': Erasing Device.\nbad\n");
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
    EXPECT_EQ(args.positional(), std::vector<std::string>{"image.bin"});
    ASSERT_NE(args.getsw("-e", 0), nullptr);
    EXPECT_EQ(args.getsw("-e", 0)->getargtxt(0), nullptr);
    ASSERT_NE(args.getsw("-f", 0), nullptr);
    EXPECT_STREQ(args.getsw("-f", 0)->getargtxt(0), "out.bin");
    EXPECT_STREQ(args.getsw("-f", 0)->getargtxt(1), "extra");
    EXPECT_STREQ(args.getsw("-file", 0)->getargtxt(1), "-") << "a lone dash is an argument";
    EXPECT_NE(args.getsw("-qebit", 0), nullptr);
    EXPECT_EQ(args.getsw("-erase", 0), nullptr);
    EXPECT_EQ(args.getsw(nullptr, 0), nullptr);
    UT_CMDARGS twice({"-f", "first.bin", "-f", "second.bin"});
    EXPECT_STREQ(twice.getsw("-f", 0)->getargtxt(0), "first.bin");
}

TEST(Initialisers, EachConstructionAndDestructionIsLogged) {
    const std::string before = Port::initialiserLog();
    { Port::FileInit file; CitP::FactoryInit factory; }
    EXPECT_EQ(Port::initialiserLog().substr(before.size()), "+FileInit +FactoryInit -FactoryInit -FileInit ");
}

}  // namespace
