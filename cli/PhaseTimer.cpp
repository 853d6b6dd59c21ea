#include "cli/PhaseTimer.h"

#include <utility>

namespace vorant::cli {

PhaseTimer::PhaseTimer(Clock clock) : clock_(std::move(clock)), since_(clock_ ? clock_() : 0) {}

void PhaseTimer::enter(RunPhase phase) {
    if (!clock_ || phase == current_) return;
    const double now = clock_();
    spent_[static_cast<std::size_t>(current_)] += now - since_;
    current_ = phase;
    since_ = now;
}

double PhaseTimer::seconds(RunPhase phase) const {
    double total = spent_[static_cast<std::size_t>(phase)];
    if (clock_ && phase == current_) total += clock_() - since_;
    return total;
}

}  // namespace vorant::cli
