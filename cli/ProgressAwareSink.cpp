#include "cli/ProgressAwareSink.h"

#include "cli/ProgressDisplay.h"

namespace vorant::cli {

ProgressAwareSink::ProgressAwareSink(std::FILE* out, std::FILE* err, bool showDebug, bool quiet)
    : console_(out, err, showDebug, quiet), out_(out), err_(err) {}

void ProgressAwareSink::receive(const Message& message) {
    if (display_ != nullptr) display_->hide();
    console_.receive(message);
    // Both streams may share the terminal: the message must be out before
    // the bar is drawn again.
    std::fflush(out_);
    std::fflush(err_);
    if (display_ != nullptr) display_->show();
}

}  // namespace vorant::cli
