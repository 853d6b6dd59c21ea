#include "cli/ProgressDisplay.h"

#include <algorithm>

namespace vorant::cli {

namespace {

constexpr int kBarWidth = 40;
constexpr auto kMinimumRedrawInterval = std::chrono::milliseconds(80);

}  // namespace

ProgressDisplay::ProgressDisplay(std::FILE* stream, std::string label) : stream_(stream), label_(std::move(label)) {}

std::string ProgressDisplay::render(const std::string& label, long long done, long long total, int frame) {
    if (total <= 0) {
        static const char kSpinner[] = {'|', '/', '-', '\\'};
        return std::string(1, kSpinner[frame % 4]) + " " + label + ": " + std::to_string(done) + " steps";
    }
    const long long clamped = std::clamp(done, 0LL, total);
    const int filled = static_cast<int>(clamped * kBarWidth / total);
    const int percent = static_cast<int>(clamped * 100 / total);
    std::string line = "[";
    line.append(static_cast<std::size_t>(filled), '#');
    line.append(static_cast<std::size_t>(kBarWidth - filled), '.');
    line += "] ";
    const std::string percentText = std::to_string(percent);
    line.append(3 - std::min<std::size_t>(3, percentText.size()), ' ');
    line += percentText + "% " + label;
    return line;
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
    std::string line = render(label_, done_, total_, frame_);
    if (!force && drawn_ && line == lastLine_) return;
    // Pad over a longer previous line.
    std::string padded = line;
    if (lastLine_.size() > line.size()) padded.append(lastLine_.size() - line.size(), ' ');
    std::fprintf(stream_, "\r%s", padded.c_str());
    std::fflush(stream_);
    lastLine_ = std::move(line);
    lastDraw_ = now;
    drawn_ = true;
}

void ProgressDisplay::hide() {
    if (!drawn_ || finished_) return;
    std::fprintf(stream_, "\r%s\r", std::string(lastLine_.size(), ' ').c_str());
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
