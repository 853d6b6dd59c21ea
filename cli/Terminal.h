#pragma once
#include <cstdio>

namespace vorant::cli {

// Whether the stream is an interactive terminal (a progress bar only makes
// sense there).
bool isTerminal(std::FILE* stream);

}  // namespace vorant::cli
