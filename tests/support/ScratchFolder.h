#pragma once
// A fresh temporary folder of one test, removed with everything in it; test
// programs run side by side, so each folder has a name of its own.

#include <algorithm>
#include <filesystem>
#include <iterator>
#include <random>
#include <string>
#include <vector>

namespace vorant::test {

class ScratchFolder {
public:
    ScratchFolder() {
        std::random_device random;
        namespace fs = std::filesystem;
        while (!fs::create_directory(path_ = fs::temp_directory_path() / ("vorant-test-" + std::to_string(random())))) {
        }
    }
    ~ScratchFolder() {
        std::error_code ignored;
        std::filesystem::remove_all(path_, ignored);
    }
    ScratchFolder(const ScratchFolder&) = delete;
    ScratchFolder& operator=(const ScratchFolder&) = delete;

    const std::filesystem::path& path() const { return path_; }
    std::filesystem::path operator/(const std::string& name) const { return path_ / name; }
    std::string file(const std::string& name) const { return (path_ / name).string(); }
    std::size_t entries() const {
        return static_cast<std::size_t>(std::distance(std::filesystem::directory_iterator(path_), {}));
    }
    // The names in the folder, hidden ones included, sorted.
    std::vector<std::string> names() const {
        std::vector<std::string> all;
        for (const auto& entry : std::filesystem::directory_iterator(path_)) all.push_back(entry.path().filename());
        std::sort(all.begin(), all.end());
        return all;
    }

private:
    std::filesystem::path path_;
};

}  // namespace vorant::test
