#pragma once
#include <cstdint>
#include <map>

namespace vorant::formats {

// The set of byte addresses covered so far, kept as disjoint runs
// [start, end). Adjacent runs are merged, so data that arrive in ascending
// order stay one run and every query is cheap.
class AddressRanges {
public:
    // True when any address in [start, end) is already covered.
    bool overlaps(std::uint64_t start, std::uint64_t end) const;
    void add(std::uint64_t start, std::uint64_t end);
    std::size_t runCount() const { return runs_.size(); }

private:
    std::map<std::uint64_t, std::uint64_t> runs_;  // start -> end
};

}  // namespace vorant::formats
