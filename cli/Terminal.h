#pragma once
#include <cstdio>

namespace vorant::cli {

// Whether the stream is an interactive terminal (a progress bar only makes
// sense there).
bool isTerminal(std::FILE* stream);

// Columns of the terminal the stream writes to, as the terminal reports
// them now; kFallbackColumns when it cannot tell (not a terminal, or a
// terminal that reports no size).
inline constexpr int kFallbackColumns = 80;
int terminalColumns(std::FILE* stream);

}  // namespace vorant::cli
