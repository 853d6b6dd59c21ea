#pragma once
#include "HostExport.h"

#include <filesystem>
#include <fstream>
#include <string>
#include <string_view>

namespace vorant {

// A file that appears under its name complete or not at all: everything is
// written to a temporary file beside the target, and commit() renames it
// over the target. Destroying the object without commit() (a failed or
// cancelled run) removes the temporary file and leaves whatever the target
// was untouched. Readback writers and the SVF recorder write through it.
class VORANT_HOST_API AtomicOutputFile {
public:
    // Creates the temporary file. Throws VorantException naming the target
    // when it cannot be written: no name, a folder in its place, a
    // read-only target, a missing folder, a folder that refuses new files.
    // Nothing is created then.
    explicit AtomicOutputFile(const std::filesystem::path& target);
    ~AtomicOutputFile();
    AtomicOutputFile(const AtomicOutputFile&) = delete;
    AtomicOutputFile& operator=(const AtomicOutputFile&) = delete;

    std::ofstream& stream() { return stream_; }
    // Appends text; false once any write has failed (for example a full disk).
    bool write(std::string_view text);
    bool failed() const { return failed_ || (stream_.is_open() && !stream_); }

    // Flushes, closes and renames over the target, keeping an existing
    // target's permissions. On failure the temporary file is removed, the
    // target is untouched, and error says why.
    bool commit(std::string& error);
    // Closes and removes the temporary file.
    void discard();

    bool isOpen() const { return stream_.is_open(); }
    const std::filesystem::path& target() const { return target_; }
    const std::filesystem::path& temporaryPath() const { return temporary_; }

private:
    std::filesystem::path target_;
    std::filesystem::path temporary_;  // empty once committed or discarded
    std::ofstream stream_;
    bool failed_ = false;
};

}  // namespace vorant
