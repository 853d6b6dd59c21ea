#include "host/PortString.h"
#include "host/UT_STR.h"

#include <gtest/gtest.h>

namespace {

TEST(TextServices, IMatchIsACaseInsensitiveWildcardMatch) {
    struct Case { const char* text; const char* pattern; bool match; };
    const Case cases[] = {
        {"NOT_VALID", "NOT_VALID", true}, {"not_valid", "NOT_VALID", true}, {"NOT_VALID ", "NOT_VALID", false},
        {"W25Q128JV", "w25q*", true},     {"W25Q128JV", "*128*", true},     {"W25Q128JV", "W25Q?28JV", true},
        {"W25Q128JV", "MX*", false},      {"", "*", true},                  {"abc", "", false},
        {"CHECKSUM", "CHECKSUM", true},   {"aaaaaaaaaaab", "*a*a*a*b", true}, {nullptr, "*", false},
    };
    for (const auto& c : cases)
        EXPECT_EQ(UT_STR::IMatch(c.text, c.pattern) != 0, c.match)
            << (c.text ? c.text : "(null)") << " ~ " << c.pattern;
}

}  // namespace
