#include "cli/CancelSignal.h"

#include <cstdlib>

#ifdef _WIN32
#include <windows.h>

#include <cstdio>
#else
#include <csignal>
#include <unistd.h>
#endif

namespace vorant::cli {

namespace {

// Lock-free atomics are safe to touch from a signal handler.
std::atomic<bool> cancelRequested{false};
std::atomic<int> interruptCount{0};
static_assert(std::atomic<bool>::is_always_lock_free && std::atomic<int>::is_always_lock_free);

constexpr char kQuitMessage[] = "\nvorant-spi: interrupted twice, quitting at once\n";

// Returns true when this is the second interrupt and the process must end.
bool noteInterrupt() {
    cancelRequested.store(true);
    return interruptCount.fetch_add(1) + 1 >= 2;
}

#ifdef _WIN32
BOOL WINAPI onConsoleControl(DWORD event) {
    if (event != CTRL_C_EVENT && event != CTRL_BREAK_EVENT) return FALSE;
    // The handler runs on a thread of its own, so ordinary output is fine.
    if (noteInterrupt()) {
        std::fputs(kQuitMessage, stderr);
        std::fflush(stderr);
        std::_Exit(130);
    }
    return TRUE;
}
#else
void onInterrupt(int) {
    if (noteInterrupt()) {
        // Only async-signal-safe calls here.
        [[maybe_unused]] const auto written = ::write(STDERR_FILENO, kQuitMessage, sizeof kQuitMessage - 1);
        std::_Exit(130);
    }
}

using Handler = void (*)(int);
Handler previousHandler = SIG_DFL;
#endif

}  // namespace

CancelSignal::CancelSignal() {
    cancelRequested.store(false);
    interruptCount.store(0);
#ifdef _WIN32
    SetConsoleCtrlHandler(onConsoleControl, TRUE);
#else
    previousHandler = std::signal(SIGINT, onInterrupt);
#endif
}

CancelSignal::~CancelSignal() {
#ifdef _WIN32
    SetConsoleCtrlHandler(onConsoleControl, FALSE);
#else
    std::signal(SIGINT, previousHandler == SIG_ERR ? SIG_DFL : previousHandler);
#endif
}

const std::atomic<bool>& CancelSignal::flag() { return cancelRequested; }

}  // namespace vorant::cli
