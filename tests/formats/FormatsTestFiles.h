#pragma once
// Scratch files for the format tests: a private temporary directory per
// test, removed with everything in it.
#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <random>
#include <string>
#include <vector>

namespace vorant::formats::testing {

using Bytes = std::vector<unsigned char>;

class ScratchDirectory {
public:
    ScratchDirectory() {
        std::random_device device;
        const auto base = std::filesystem::temp_directory_path();
        do {
            path_ = base / ("vorant-formats-" + std::to_string(device()) + std::to_string(device()));
        } while (!std::filesystem::create_directory(path_));
    }
    ~ScratchDirectory() {
        std::error_code ec;
        std::filesystem::permissions(path_, std::filesystem::perms::owner_all, ec);
        std::filesystem::remove_all(path_, ec);
    }
    ScratchDirectory(const ScratchDirectory&) = delete;
    ScratchDirectory& operator=(const ScratchDirectory&) = delete;

    const std::filesystem::path& path() const { return path_; }
    std::string file(const std::string& name) const { return (path_ / name).string(); }

    // Names of everything in the directory, sorted.
    std::vector<std::string> listing() const {
        std::vector<std::string> names;
        for (const auto& entry : std::filesystem::directory_iterator(path_)) {
            names.push_back(entry.path().filename().string());
        }
        std::sort(names.begin(), names.end());
        return names;
    }

private:
    std::filesystem::path path_;
};

inline void writeFile(const std::string& path, const std::string& content) {
    std::ofstream(path, std::ios::binary) << content;
}

inline void writeFile(const std::string& path, const Bytes& content) {
    std::ofstream(path, std::ios::binary)
        .write(reinterpret_cast<const char*>(content.data()), static_cast<std::streamsize>(content.size()));
}

inline Bytes readFile(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    return Bytes(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

inline std::string readText(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

inline Bytes randomBytes(std::size_t count, unsigned seed) {
    std::mt19937 generator(seed);
    Bytes bytes(count);
    for (auto& byte : bytes) byte = static_cast<unsigned char>(generator());
    return bytes;
}

// Flash bytes as a capture delivers them: every byte's bit order reversed.
inline Bytes captured(const Bytes& flashBytes) {
    Bytes result(flashBytes.size());
    for (std::size_t i = 0; i < flashBytes.size(); ++i) {
        unsigned reversed = 0;
        for (int bit = 0; bit < 8; ++bit) {
            if (flashBytes[i] & (1u << bit)) reversed |= 0x80u >> bit;
        }
        result[i] = static_cast<unsigned char>(reversed);
    }
    return result;
}

}  // namespace vorant::formats::testing
