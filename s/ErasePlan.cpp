#include "s/ErasePlan.h"

#include <algorithm>

namespace vorant::device {

namespace {

// The spans clipped to the flash, sorted and joined where they touch.
std::vector<AddressSpan> normalised(std::vector<AddressSpan> spans, std::uint64_t flashBytes) {
    for (AddressSpan& span : spans) {
        span.end = std::min(span.end, flashBytes);
        span.begin = std::min(span.begin, span.end);
    }
    std::sort(spans.begin(), spans.end(), [](const AddressSpan& a, const AddressSpan& b) { return a.begin < b.begin; });
    std::vector<AddressSpan> joined;
    for (const AddressSpan& span : spans) {
        if (span.begin == span.end) continue;
        if (!joined.empty() && span.begin <= joined.back().end) joined.back().end = std::max(joined.back().end, span.end);
        else joined.push_back(span);
    }
    return joined;
}

// The smallest blocks touched, as joined runs of whole blocks.
std::vector<AddressSpan> touchedBlocks(const std::vector<AddressSpan>& spans, std::uint64_t block) {
    std::vector<AddressSpan> runs;
    for (const AddressSpan& span : spans) {
        const std::uint64_t begin = span.begin / block * block;
        const std::uint64_t end = (span.end + block - 1) / block * block;
        if (!runs.empty() && begin <= runs.back().end) runs.back().end = std::max(runs.back().end, end);
        else runs.push_back({begin, end});
    }
    return runs;
}

}  // namespace

std::vector<EraseStep> planErase(std::vector<AddressSpan> spans, const std::vector<std::uint32_t>& sizes,
                                 std::uint64_t flashBytes) {
    std::vector<EraseStep> plan;
    if (sizes.empty()) return plan;
    // Largest first, remembering each size's place in the caller's list.
    std::vector<std::size_t> bySize(sizes.size());
    for (std::size_t i = 0; i < sizes.size(); ++i) bySize[i] = i;
    std::sort(bySize.begin(), bySize.end(), [&](std::size_t a, std::size_t b) { return sizes[a] > sizes[b]; });
    const std::uint64_t smallest = sizes[bySize.back()];

    for (const AddressSpan& run : touchedBlocks(normalised(std::move(spans), flashBytes), smallest)) {
        // Within one run of blocks to erase, every block of a size that is
        // aligned and ends inside the run may go in one step.
        for (std::uint64_t address = run.begin; address < run.end;) {
            for (std::size_t index : bySize) {
                const std::uint64_t size = sizes[index];
                if (address % size != 0 || address + size > run.end) continue;
                plan.push_back({index, address});
                address += size;
                break;
            }
        }
    }
    return plan;
}

std::vector<AddressSpan> partlyCoveredBlocks(std::vector<AddressSpan> spans, std::uint32_t smallestSize,
                                             std::uint64_t flashBytes) {
    const std::vector<AddressSpan> joined = normalised(std::move(spans), flashBytes);
    std::vector<AddressSpan> partial;
    auto covered = [&](std::uint64_t begin, std::uint64_t end) {
        for (const AddressSpan& span : joined)
            if (span.begin <= begin && end <= span.end) return true;
        return false;
    };
    for (const AddressSpan& run : touchedBlocks(joined, smallestSize))
        for (std::uint64_t block = run.begin; block < run.end; block += smallestSize)
            if (!covered(block, std::min<std::uint64_t>(block + smallestSize, flashBytes)))
                partial.push_back({block, block + smallestSize});
    return partial;
}

}  // namespace vorant::device
