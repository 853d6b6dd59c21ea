#pragma once
// How a real cable lets a wait's time pass: on the monotonic clock, to a
// deadline, so a signal that wakes the sleep early or a wall-clock change
// neither shortens nor stretches a program or erase time.

#include <cstdint>

namespace vorant::ports::spi {

void sleepOnMonotonicClock(std::uint64_t microseconds);

}  // namespace vorant::ports::spi
