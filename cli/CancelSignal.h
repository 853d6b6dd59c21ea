#pragma once
#include <atomic>

namespace vorant::cli {

// Ctrl-C handling for the length of one operation. The first Ctrl-C (SIGINT;
// on Windows the console's Ctrl-C or Ctrl-Break) only raises a flag, which
// the port's cancel query reports, so the operation stops at its next page
// or poll and the tool can clean up. A second one ends the process at once
// with status 130.
class CancelSignal {
public:
    CancelSignal();
    ~CancelSignal();
    CancelSignal(const CancelSignal&) = delete;
    CancelSignal& operator=(const CancelSignal&) = delete;

    // Set once the user pressed Ctrl-C.
    static const std::atomic<bool>& flag();
    static bool requested() { return flag().load(); }
};

}  // namespace vorant::cli
