#include "cli/TerminalWidth.h"

#include "cli/Terminal.h"

#include <atomic>

#ifndef _WIN32
#include <csignal>
#endif

namespace vorant::cli {

namespace {

#ifndef _WIN32
std::atomic<bool> resized{false};
static_assert(std::atomic<bool>::is_always_lock_free);

void onResize(int) { resized.store(true); }

struct sigaction previousAction {};
bool handlerInstalled = false;
#endif

}  // namespace

TerminalWidth::TerminalWidth(std::FILE* stream) : stream_(stream), columns_(terminalColumns(stream)) {
#ifndef _WIN32
    struct sigaction action {};
    action.sa_handler = onResize;
    sigemptyset(&action.sa_mask);
    // A resize must not interrupt a write or a FIFO's open.
    action.sa_flags = SA_RESTART;
    resized.store(false);
    handlerInstalled = sigaction(SIGWINCH, &action, &previousAction) == 0;
#endif
}

TerminalWidth::~TerminalWidth() {
#ifndef _WIN32
    if (handlerInstalled) sigaction(SIGWINCH, &previousAction, nullptr);
    handlerInstalled = false;
#endif
}

int TerminalWidth::columns() {
#ifdef _WIN32
    columns_ = terminalColumns(stream_);
#else
    if (resized.exchange(false)) columns_ = terminalColumns(stream_);
#endif
    return columns_;
}

}  // namespace vorant::cli
