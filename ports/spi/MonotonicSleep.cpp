#include "ports/spi/MonotonicSleep.h"

#include <chrono>
#include <thread>

namespace vorant::ports::spi {

void sleepOnMonotonicClock(std::uint64_t microseconds) {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::microseconds(microseconds);
    // sleep_until may return early on some platforms; the loop makes the
    // deadline hold.
    while (std::chrono::steady_clock::now() < deadline) std::this_thread::sleep_until(deadline);
}

}  // namespace vorant::ports::spi
