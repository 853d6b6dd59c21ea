#pragma once
// The time of an SVF RUNTEST, written exactly and deterministically.

#include <cstdint>
#include <string>

namespace vorant::svf {

// Microseconds as seconds in SVF's usual scientific form, exact (every
// significant digit kept): 1500 -> "1.5E-03", 40000000 -> "4.0E+01",
// 0 -> "0.0E+00".
std::string formatSvfSeconds(std::uint64_t microseconds);

}  // namespace vorant::svf
