#pragma once
// Base of the end-to-end tests: a scratch folder the tool runs in, and
// short ways to run it and to check its files.

#include "CliTestFiles.h"
#include "ToolProcess.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace vorant::cli::test {

// Small parts and a fast clock keep every run far below a second.
inline constexpr const char* kSmallPart = "W25Q16JV";
inline constexpr std::size_t kSmallPartBytes = 2 * 1024 * 1024;
inline constexpr const char* kFastClock = "100000000";

class ToolTest : public ::testing::Test {
protected:
    ToolResult run(const std::vector<std::string>& arguments) { return runTool(arguments, scratch.path()); }

    // Runs and expects exit status 0.
    ToolResult runOk(const std::vector<std::string>& arguments) {
        ToolResult result = run(arguments);
        EXPECT_EQ(result.exitStatus, 0) << result.transcript();
        return result;
    }

    std::string file(const std::string& name) const { return scratch.file(name); }

    // A flash file's array (the file holds the array, then a 16-byte trailer).
    Bytes flashArray(const std::string& name) const {
        Bytes bytes = readFile(file(name));
        if (bytes.size() >= 16) bytes.resize(bytes.size() - 16);
        return bytes;
    }

    ScratchFolder scratch;
};

inline bool contains(const std::string& text, const std::string& part) { return text.find(part) != std::string::npos; }

}  // namespace vorant::cli::test
