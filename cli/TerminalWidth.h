#pragma once
#include <cstdio>

namespace vorant::cli {

// The width of the terminal a stream writes to, kept current while the
// object lives: asked at construction and again after the terminal was
// resized. On POSIX systems a SIGWINCH handler only raises a flag, read by
// the next columns(); elsewhere every columns() asks the console. Only one
// object should live at a time (it owns the signal's handler).
class TerminalWidth {
public:
    explicit TerminalWidth(std::FILE* stream);
    ~TerminalWidth();
    TerminalWidth(const TerminalWidth&) = delete;
    TerminalWidth& operator=(const TerminalWidth&) = delete;

    int columns();

private:
    std::FILE* stream_;
    int columns_;
};

}  // namespace vorant::cli
