// Every input kept for a fuzz target, its seeds and the inputs that once
// crashed it, goes through the target again: each must be handled, however
// malformed, without a crash, a sanitizer report or an escaping exception.
#include "fuzz/FuzzTargets.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <exception>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

namespace vorant::fuzz {
namespace {

namespace fs = std::filesystem;

std::vector<fs::path> filesIn(const fs::path& folder) {
    std::vector<fs::path> files;
    std::error_code error;
    for (const auto& entry : fs::directory_iterator(folder, error))
        if (entry.is_regular_file()) files.push_back(entry.path());
    std::sort(files.begin(), files.end());
    return files;
}

class KeptInputs : public ::testing::TestWithParam<FuzzTarget> {};

TEST_P(KeptInputs, AreHandledWithoutACrash) {
    const FuzzTarget& target = GetParam();
    const fs::path root(VORANT_FUZZ_DIR);
    const std::vector<fs::path> seeds = filesIn(root / "corpus" / target.name);
    const std::vector<fs::path> regressions = filesIn(root / "regressions" / target.name);
    EXPECT_FALSE(seeds.empty()) << "no seeds for " << target.name;
    std::vector<fs::path> all = seeds;
    all.insert(all.end(), regressions.begin(), regressions.end());
    for (const fs::path& file : all) {
        std::ifstream in(file, std::ios::binary);
        const std::string bytes{std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
        try {
            target.run(reinterpret_cast<const std::uint8_t*>(bytes.data()), bytes.size());
        } catch (const std::exception& e) {
            ADD_FAILURE() << file << ": " << e.what();
        }
    }
}

INSTANTIATE_TEST_SUITE_P(Targets, KeptInputs, ::testing::ValuesIn(fuzzTargets()),
                         [](const auto& info) { return std::string(info.param.name); });

}  // namespace
}  // namespace vorant::fuzz
