#include "CliTestFiles.h"

#include <algorithm>
#include <fstream>
#include <iterator>
#include <random>
#include <stdexcept>

namespace vorant::cli::test {

ScratchFolder::ScratchFolder() {
    std::random_device device;
    const auto base = std::filesystem::temp_directory_path();
    do {
        path_ = base / ("vorant-cli-" + std::to_string(device()) + std::to_string(device()));
    } while (!std::filesystem::create_directory(path_));
}

ScratchFolder::~ScratchFolder() {
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
}

std::vector<std::string> ScratchFolder::listing() const {
    std::vector<std::string> names;
    for (const auto& entry : std::filesystem::directory_iterator(path_)) names.push_back(entry.path().filename().string());
    std::sort(names.begin(), names.end());
    return names;
}

Bytes randomBytes(std::size_t count, std::uint32_t seed) {
    std::mt19937 generator(seed);
    Bytes bytes(count);
    for (auto& byte : bytes) byte = static_cast<unsigned char>(generator() >> 24);
    return bytes;
}

void writeFile(const std::string& path, const Bytes& bytes) {
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out.write(reinterpret_cast<const char*>(bytes.data()), static_cast<std::streamsize>(bytes.size()));
    if (!out) throw std::runtime_error("cannot write " + path);
}

void writeText(const std::string& path, const std::string& text) {
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out << text;
    if (!out) throw std::runtime_error("cannot write " + path);
}

Bytes readFile(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    if (!in) return {};
    return Bytes(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

bool fileExists(const std::string& path) {
    std::error_code ignored;
    return std::filesystem::exists(path, ignored);
}

long long firstDifference(const Bytes& actual, const Bytes& expected, std::size_t offset) {
    for (std::size_t i = 0; i < expected.size(); ++i) {
        if (offset + i >= actual.size() || actual[offset + i] != expected[i]) return static_cast<long long>(i);
    }
    return -1;
}

bool allErased(const Bytes& bytes, std::size_t from, std::size_t to) {
    if (to > bytes.size() || from > to) return false;
    for (std::size_t i = from; i < to; ++i)
        if (bytes[i] != 0xFF) return false;
    return true;
}

}  // namespace vorant::cli::test
