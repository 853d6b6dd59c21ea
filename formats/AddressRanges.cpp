#include "formats/AddressRanges.h"

#include <algorithm>
#include <iterator>

namespace vorant::formats {

bool AddressRanges::overlaps(std::uint64_t start, std::uint64_t end) const {
    if (start >= end) return false;
    auto after = runs_.upper_bound(start);
    if (after != runs_.end() && after->first < end) return true;
    if (after != runs_.begin() && std::prev(after)->second > start) return true;
    return false;
}

void AddressRanges::add(std::uint64_t start, std::uint64_t end) {
    if (start >= end) return;
    auto next = runs_.upper_bound(start);
    if (next != runs_.begin() && std::prev(next)->second >= start) {
        // Extends the run before it in place: the common case of data in
        // ascending order costs no allocation.
        auto run = std::prev(next);
        run->second = std::max(run->second, end);
        while (next != runs_.end() && next->first <= run->second) {
            run->second = std::max(run->second, next->second);
            next = runs_.erase(next);
        }
        return;
    }
    while (next != runs_.end() && next->first <= end) {
        end = std::max(end, next->second);
        next = runs_.erase(next);
    }
    runs_.emplace_hint(next, start, end);
}

}  // namespace vorant::formats
