#include "cli/ProgressDisplay.h"

#include <algorithm>

namespace vorant::cli {

namespace {

constexpr std::size_t kBarWidth = 40;
// A shorter bar says too little to be worth its room.
constexpr std::size_t kShortestBar = 10;
constexpr auto kMinimumRedrawInterval = std::chrono::milliseconds(80);

// Room for text on a terminal `columns` wide.
std::size_t roomFor(int columns) { return static_cast<std::size_t>(std::max(columns - 1, 0)); }

}  // namespace

ProgressDisplay::ProgressDisplay(std::FILE* stream, std::string label)
    : stream_(stream), width_(stream), label_(std::move(label)) {}

std::string ProgressDisplay::render(const std::string& label, long long done, long long total, int frame,
                                    int columns) {
    const std::size_t room = roomFor(columns);
    if (total <= 0) {
        static const char kSpinner[] = {'|', '/', '-', '\\'};
        const std::string line =
            std::string(1, kSpinner[frame % 4]) + " " + label + ": " + std::to_string(done) + " steps";
        return line.substr(0, std::max<std::size_t>(room, 1));
    }
    const long long clamped = std::clamp(done, 0LL, total);
    const std::string digits = std::to_string(clamped * 100 / total);
    const std::string percent = std::string(3 - std::min<std::size_t>(3, digits.size()), ' ') + digits + "%";
    const std::string tail = " " + label;
    const std::size_t decoration = std::string("[] ").size() + percent.size();  // around the bar

    const bool labelFits = room >= decoration + kShortestBar + tail.size();
    if (labelFits || room >= decoration + kShortestBar) {
        const std::size_t width = std::min(kBarWidth, room - decoration - (labelFits ? tail.size() : 0));
        const auto filled = static_cast<std::size_t>(clamped * static_cast<long long>(width) / total);
        std::string line = "[";
        line.append(filled, '#');
        line.append(width - filled, '.');
        line += "] " + percent;
        return labelFits ? line + tail : line;
    }
    if (room >= percent.size() + tail.size()) return percent + tail;
    return digits + "%";
}

void ProgressDisplay::progressed(long long done, long long total) {
    done_ = done;
    total_ = total;
    draw(false);
}

void ProgressDisplay::draw(bool force) {
    if (finished_) return;
    const auto now = std::chrono::steady_clock::now();
    if (!force && drawn_ && now - lastDraw_ < kMinimumRedrawInterval) return;
    if (total_ <= 0) ++frame_;
    const int columns = width_.columns();
    std::string line = render(label_, done_, total_, frame_, columns);
    if (!force && drawn_ && line == lastLine_) return;
    // Pad over a longer previous line, as far as the terminal reaches.
    std::string padded = line;
    const std::size_t cover = std::min(lastLine_.size(), roomFor(columns));
    if (cover > line.size()) padded.append(cover - line.size(), ' ');
    std::fprintf(stream_, "\r%s", padded.c_str());
    std::fflush(stream_);
    lastLine_ = std::move(line);
    lastDraw_ = now;
    drawn_ = true;
}

void ProgressDisplay::hide() {
    if (!drawn_ || finished_) return;
    const std::size_t cover = std::min(lastLine_.size(), roomFor(width_.columns()));
    std::fprintf(stream_, "\r%s\r", std::string(cover, ' ').c_str());
    std::fflush(stream_);
    drawn_ = false;
}

void ProgressDisplay::show() {
    if (finished_ || (done_ == 0 && total_ == 0 && lastLine_.empty())) return;
    draw(true);
}

void ProgressDisplay::complete() {
    if (finished_) return;
    if (total_ > 0) done_ = total_;
    draw(true);
    std::fputc('\n', stream_);
    std::fflush(stream_);
    finished_ = true;
}

void ProgressDisplay::stop() {
    if (finished_) return;
    if (drawn_) {
        std::fputc('\n', stream_);
        std::fflush(stream_);
    }
    finished_ = true;
}

}  // namespace vorant::cli
