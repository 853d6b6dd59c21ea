#pragma once
// Scratch folders and files for the tool's end-to-end tests.

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

namespace vorant::cli::test {

using Bytes = std::vector<unsigned char>;

// A private folder under the system's temporary folder, removed with
// everything in it.
class ScratchFolder {
public:
    ScratchFolder();
    ~ScratchFolder();
    ScratchFolder(const ScratchFolder&) = delete;
    ScratchFolder& operator=(const ScratchFolder&) = delete;

    const std::filesystem::path& path() const { return path_; }
    std::string file(const std::string& name) const { return (path_ / name).string(); }
    // Names of everything in the folder, sorted.
    std::vector<std::string> listing() const;

private:
    std::filesystem::path path_;
};

// Deterministic pseudo-random bytes.
Bytes randomBytes(std::size_t count, std::uint32_t seed);
void writeFile(const std::string& path, const Bytes& bytes);
void writeText(const std::string& path, const std::string& text);
Bytes readFile(const std::string& path);
bool fileExists(const std::string& path);

// The first offset at which `actual` differs from `expected` over
// expected's length (or actual is too short); -1 when it holds it all.
long long firstDifference(const Bytes& actual, const Bytes& expected, std::size_t offset = 0);
// Whether bytes [from, to) all hold 0xFF.
bool allErased(const Bytes& bytes, std::size_t from, std::size_t to);

}  // namespace vorant::cli::test
