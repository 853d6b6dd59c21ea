#pragma once
#include "host/ScanPort.h"

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace vorant::cli {

// Reads the tool makes on a cable itself, around an operation and outside
// the plug-in's streams: the checks before a write and the read-back of
// what a write left in the status registers. One read is one transaction:
// the instruction with chip select held, then the answer captured.
class ChipProbe {
public:
    explicit ChipProbe(ScanPort& port) : port_(port) {}

    // Sends `instruction` (a '0'/'1' text, first bit first on the wire) and
    // returns the `count` bytes the chip answers, each as the chip sent it
    // (most significant bit first). Nothing when either shift failed.
    std::optional<std::vector<std::uint8_t>> read(const std::string& instruction, std::size_t count);
    // One status register byte.
    std::optional<std::uint8_t> readRegister(const std::string& instruction);

private:
    ScanPort& port_;
};

// "EF4018" for the bytes EF 40 18.
std::string hexText(const std::vector<std::uint8_t>& bytes);

}  // namespace vorant::cli
