#pragma once
#include <filesystem>
#include <fstream>
#include <string>

namespace vorant::formats {

// A file written under a temporary name beside its target and renamed over
// the target only when complete, so a reader never sees half a file and a
// failed or abandoned write leaves any earlier file as it was.
class AtomicOutputFile {
public:
    // Creates the temporary file. Throws FormatError naming the target when
    // it cannot be written: missing directory, a directory in its place, a
    // read-only target, a directory that refuses new files. Nothing is
    // created then.
    explicit AtomicOutputFile(const std::string& target);
    // Removes the temporary file unless commit() succeeded.
    ~AtomicOutputFile();

    AtomicOutputFile(const AtomicOutputFile&) = delete;
    AtomicOutputFile& operator=(const AtomicOutputFile&) = delete;

    std::ofstream& stream() { return out_; }
    const std::filesystem::path& target() const { return target_; }
    const std::filesystem::path& temporaryPath() const { return temporary_; }

    // Closes the temporary file and renames it over the target, keeping the
    // target's permissions. On failure the temporary file is removed, the
    // target is untouched, and error says why.
    bool commit(std::string& error);
    // Closes and removes the temporary file.
    void discard();

private:
    std::filesystem::path target_;
    std::filesystem::path temporary_;
    std::ofstream out_;
    bool pending_ = false;  // a temporary file exists and is ours to remove
};

}  // namespace vorant::formats
