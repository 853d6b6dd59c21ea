#pragma once
#include <exception>
#include <string>

namespace vorant::sim {

// What to do about a simulator backing file that was refused, fitting why:
// a file cut short is removed or replaced, a full disk needs room, and a
// file of another chip is swapped for one made for this chip.
std::string flashFileAdvice(const std::exception& problem);

}  // namespace vorant::sim
