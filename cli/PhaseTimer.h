#pragma once
#include <array>
#include <cstddef>
#include <functional>

namespace vorant::cli {

// What a run is busy with, as far as its rate goes: only erase, program and
// read move (or clear) data; set-up, identification and status reads are
// Other and count for no phase.
enum class RunPhase : std::size_t { Other, Erase, Program, Read };

// Splits a run's time among its phases. Told when a phase begins, it
// charges the time since the previous change to the phase that ran.
class PhaseTimer {
public:
    // Seconds from any fixed origin: simulated bus time, or a wall clock.
    using Clock = std::function<double()>;

    PhaseTimer() = default;
    explicit PhaseTimer(Clock clock);

    // Switches to `phase`; nothing changes when it is the phase running.
    void enter(RunPhase phase);
    // Time spent in `phase`, including the current stretch when it runs.
    double seconds(RunPhase phase) const;
    bool running() const { return static_cast<bool>(clock_); }

private:
    Clock clock_;
    RunPhase current_ = RunPhase::Other;
    double since_ = 0;
    std::array<double, 4> spent_{};
};

}  // namespace vorant::cli
