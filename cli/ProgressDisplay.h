#pragma once
#include "cli/ProgressListener.h"

#include <chrono>
#include <cstdio>
#include <string>

namespace vorant::cli {

// A one-line progress bar (or, without a total, a spinner) redrawn in place
// on a terminal stream. Redraws are limited to visible changes and a few
// per second, so a fast simulated run is not slowed down by its display.
class ProgressDisplay final : public ProgressListener {
public:
    ProgressDisplay(std::FILE* stream, std::string label);

    void progressed(long long done, long long total) override;

    // Around a message printed to the same terminal: the bar gives the line
    // up and comes back under the message.
    void hide();
    void show();

    // Draws 100% and leaves the line (success).
    void complete();
    // Leaves the line as it is (failure or cancel).
    void stop();

    // The line for a state, without the carriage return; exposed for tests.
    static std::string render(const std::string& label, long long done, long long total, int frame);

private:
    void draw(bool force);

    std::FILE* stream_;
    std::string label_;
    long long done_ = 0;
    long long total_ = 0;
    int frame_ = 0;
    bool drawn_ = false;
    bool finished_ = false;
    std::string lastLine_;
    std::chrono::steady_clock::time_point lastDraw_{};
};

}  // namespace vorant::cli
