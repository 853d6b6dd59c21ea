// Coverage bookkeeping behind the Intel HEX overlap check.
#include "formats/AddressRanges.h"

#include <gtest/gtest.h>

#include <vector>

namespace vorant::formats {
namespace {

struct Span {
    std::uint64_t start, end;
};

TEST(AddressRanges, MergesAdjacentAndBridgedRunsAndFindsEveryOverlap) {
    AddressRanges ranges;
    // Ascending, adjacent: one run.
    for (std::uint64_t a = 0; a < 64; a += 16) ranges.add(a, a + 16);
    EXPECT_EQ(ranges.runCount(), 1u);
    // Two runs with holes, then a record that bridges them and the hole after.
    ranges.add(100, 110);
    ranges.add(120, 130);
    EXPECT_EQ(ranges.runCount(), 3u);
    ranges.add(110, 120);
    EXPECT_EQ(ranges.runCount(), 2u);
    ranges.add(90, 100);  // below a run, touching it
    EXPECT_EQ(ranges.runCount(), 2u);

    // Covered now: [0, 64) and [90, 130).
    const std::vector<Span> overlapping{{0, 1}, {63, 64}, {60, 95}, {89, 91}, {129, 200}, {0, 1000}, {95, 96}};
    const std::vector<Span> clear{{64, 90}, {130, 131}, {1000, 2000}, {70, 70}};
    for (const auto& span : overlapping) EXPECT_TRUE(ranges.overlaps(span.start, span.end)) << span.start;
    for (const auto& span : clear) EXPECT_FALSE(ranges.overlaps(span.start, span.end)) << span.start;
}

}  // namespace
}  // namespace vorant::formats
