#pragma once
#include "cli/ProgressListener.h"
#include "cli/TerminalWidth.h"

#include <chrono>
#include <cstdio>
#include <string>

namespace vorant::cli {

// A one-line progress bar (or, without a total, a spinner) redrawn in place
// on a terminal stream. Redraws are limited to visible changes and a few
// per second, so a fast simulated run is not slowed down by its display.
// The line fits the terminal's width and follows a resize: a line longer
// than the terminal would wrap, and every redraw would add a line.
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

    // The line for a state on a terminal `columns` wide, without the
    // carriage return. It takes at most columns - 1 columns (the last one
    // would wrap on some terminals): the bar shrinks to fit, then the label
    // goes, then the bar; the percentage always stays, even where it does
    // not fit (a terminal of fewer than five columns).
    static std::string render(const std::string& label, long long done, long long total, int frame, int columns);

private:
    void draw(bool force);

    std::FILE* stream_;
    TerminalWidth width_;
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
