#pragma once
// A file that appears under its name complete or not at all. Text goes to a
// temporary file beside the target; commit() renames it over the target.
// Destroying the object without commit() (a failed or cancelled run) removes
// the temporary file and leaves whatever the target was untouched.

#include <filesystem>
#include <fstream>
#include <string_view>

namespace vorant::svf {

class AtomicOutputFile {
public:
    // Throws SvfError naming the target when its folder does not exist, the
    // target is a folder, or the temporary file cannot be created. Nothing is
    // created then.
    explicit AtomicOutputFile(std::filesystem::path target);
    ~AtomicOutputFile();
    AtomicOutputFile(const AtomicOutputFile&) = delete;
    AtomicOutputFile& operator=(const AtomicOutputFile&) = delete;

    // Returns false once any write has failed (for example a full disk).
    bool write(std::string_view text);
    bool failed() const { return failed_; }

    // Flushes, closes and renames onto the target. Throws SvfError (and
    // removes the temporary file) when anything failed on the way.
    void commit();
    // Closes and removes the temporary file; the target stays as it was.
    void discard();

    bool open() const { return stream_.is_open(); }
    const std::filesystem::path& target() const { return target_; }
    const std::filesystem::path& temporaryPath() const { return temporary_; }

private:
    std::filesystem::path target_;
    std::filesystem::path temporary_;
    std::ofstream stream_;
    bool failed_ = false;
};

}  // namespace vorant::svf
