#pragma once
// Helpers of the SVF tests: a private scratch folder, whole-file reads, and
// shift vectors built bit by bit from wire bytes (independent of the host's
// own byte layout helpers, which are what the tests check against).

#include "host/RLBitVec.h"

#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

namespace vorant::svf::test {

// A fresh empty folder under the system's temporary folder, removed with
// everything in it at the end of the test.
class ScratchFolder {
public:
    ScratchFolder();
    ~ScratchFolder();
    ScratchFolder(const ScratchFolder&) = delete;
    ScratchFolder& operator=(const ScratchFolder&) = delete;

    const std::filesystem::path& path() const { return path_; }
    std::filesystem::path operator/(const std::string& name) const { return path_ / name; }
    // Names of the entries in the folder, sorted.
    std::vector<std::string> entries() const;

private:
    std::filesystem::path path_;
};

std::string readFile(const std::filesystem::path& file);
void writeFile(const std::filesystem::path& file, const std::string& text);

// Bytes as the flash sees them on MOSI: byte k's MSB is vector bit 8k.
RLBitVec wireVector(const std::vector<std::uint8_t>& bytes);
// A vector of `bits` bits, all `value`.
RLBitVec filledVector(std::size_t bits, bool value);

}  // namespace vorant::svf::test
