#pragma once
// What a benchmark reports of the process itself.
#if defined(__linux__)
#  include <sys/resource.h>
#endif

namespace vorant::bench {

// The peak resident set so far, in KiB; -1 where the system does not say.
inline long peakResidentKiB() {
#if defined(__linux__)
    rusage usage{};
    getrusage(RUSAGE_SELF, &usage);
    return usage.ru_maxrss;
#else
    return -1;
#endif
}

}  // namespace vorant::bench
