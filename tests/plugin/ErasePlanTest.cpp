// The erase plan as rows: the image's spans and the part's erase sizes in,
// the erases out. The fewest erases cover exactly the blocks touched.
#include "s/ErasePlan.h"

#include <gtest/gtest.h>

namespace vorant::device {
namespace {

constexpr std::uint32_t K = 1024;
const std::vector<std::uint32_t> kWinbond = {4 * K, 32 * K, 64 * K};
constexpr std::uint64_t kFlash = 16 * 1024 * K;

TEST(ErasePlan, FewestErasesCoverEveryTouchedBlock) {
    const struct {
        const char* name;
        std::vector<AddressSpan> spans;
        std::vector<std::uint32_t> sizes;
        std::vector<EraseStep> plan;  // sizeIndex into `sizes`
    } rows[] = {
        {"one byte", {{5, 6}}, kWinbond, {{0, 0}}},
        {"one 64 KiB block", {{0, 64 * K}}, kWinbond, {{2, 0}}},
        {"a byte past 64 KiB", {{0, 64 * K + 1}}, kWinbond, {{2, 0}, {0, 64 * K}}},
        {"36 KiB from 28 KiB: 4 + 32",
         {{28 * K, 64 * K}}, kWinbond, {{0, 28 * K}, {1, 32 * K}}},
        {"unaligned 1 MiB at 0x1000",
         {{0x1000, 0x101000}}, kWinbond,
         [] {
             std::vector<EraseStep> steps;
             for (std::uint64_t a = 0x1000; a < 0x8000; a += 4 * K) steps.push_back({0, a});
             steps.push_back({1, 0x8000});
             for (std::uint64_t a = 0x10000; a < 0x100000; a += 64 * K) steps.push_back({2, a});
             steps.push_back({0, 0x100000});
             return steps;
         }()},
        {"two ranges in one 4 KiB block", {{10, 20}, {100, 200}}, kWinbond, {{0, 0}}},
        {"overlapping and out of order", {{8 * K, 12 * K}, {0, 9 * K}}, kWinbond, {{0, 0}, {0, 4 * K}, {0, 8 * K}}},
        {"sizes in any order", {{0, 96 * K}}, {64 * K, 4 * K, 32 * K}, {{0, 0}, {2, 64 * K}}},
        {"past the end is cut", {{kFlash - 10, kFlash + 100}}, kWinbond, {{0, kFlash - 4 * K}}},
        {"nothing", {}, kWinbond, {}},
        {"no erase sizes", {{0, 10}}, {}, {}},
    };
    for (const auto& row : rows) EXPECT_EQ(planErase(row.spans, row.sizes, kFlash), row.plan) << row.name;
}

TEST(ErasePlan, PartlyCoveredBlocksKeepTheirOtherBytes) {
    const struct {
        const char* name;
        std::vector<AddressSpan> spans;
        std::vector<AddressSpan> partial;
    } rows[] = {
        {"whole blocks", {{0, 8 * K}}, {}},
        {"head and tail", {{100, 8 * K + 1}}, {{0, 4 * K}, {8 * K, 12 * K}}},
        {"two ranges that fill a block between them", {{0, 2 * K}, {2 * K, 4 * K}}, {}},
        {"a gap inside a block", {{0, 1 * K}, {2 * K, 4 * K}}, {{0, 4 * K}}},
    };
    for (const auto& row : rows) {
        const std::vector<AddressSpan> got = partlyCoveredBlocks(row.spans, 4 * K, kFlash);
        ASSERT_EQ(got.size(), row.partial.size()) << row.name;
        for (std::size_t i = 0; i < got.size(); ++i)
            EXPECT_TRUE(got[i].begin == row.partial[i].begin && got[i].end == row.partial[i].end) << row.name;
    }
}

}  // namespace
}  // namespace vorant::device
