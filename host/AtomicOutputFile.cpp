#include "AtomicOutputFile.h"

#include "VorantException.h"

#include <cerrno>
#include <cstring>
#include <system_error>

namespace vorant {
namespace fs = std::filesystem;
namespace {

// A hidden name beside the target that no file has yet, so two runs never
// share a temporary file and an unrelated file is never truncated.
fs::path freeTemporaryName(const fs::path& target) {
    const std::string base = "." + target.filename().string() + ".";
    for (unsigned attempt = 0; attempt <= 10000; ++attempt) {
        fs::path candidate = target.parent_path() / (base + std::to_string(attempt) + ".tmp");
        std::error_code error;
        if (!fs::exists(candidate, error) && !error) return candidate;
    }
    throw VorantException(target.string() + ": cannot create: no free temporary file name beside it");
}

}  // namespace

AtomicOutputFile::AtomicOutputFile(const fs::path& target) : target_(target) {
    if (target_.empty()) throw VorantException("no output file name given");
    const std::string name = target_.string();
    std::error_code error;
    const fs::file_status status = fs::status(target_, error);
    if (fs::is_directory(status) || !target_.has_filename()) throw VorantException(name + ": is a directory");
    if (fs::exists(status) && (status.permissions() & fs::perms::owner_write) == fs::perms::none)
        throw VorantException(name + ": is read-only; not overwritten");
    const fs::path folder = target_.parent_path().empty() ? fs::path(".") : target_.parent_path();
    if (!fs::is_directory(folder, error))
        throw VorantException(name + ": cannot create: folder " + folder.string() + " does not exist");

    const fs::path temporary = freeTemporaryName(target_);
    errno = 0;
    stream_.open(temporary, std::ios::out | std::ios::binary | std::ios::trunc);
    if (!stream_) {
        const std::string reason = errno != 0 ? std::strerror(errno) : "the folder refuses new files";
        fs::remove(temporary, error);
        throw VorantException(name + ": cannot create: " + reason);
    }
    temporary_ = temporary;
}

AtomicOutputFile::~AtomicOutputFile() { discard(); }

bool AtomicOutputFile::write(std::string_view text) {
    if (failed() || !stream_.is_open()) return false;
    stream_.write(text.data(), static_cast<std::streamsize>(text.size()));
    if (!stream_) failed_ = true;
    return !failed_;
}

void AtomicOutputFile::discard() {
    if (stream_.is_open()) stream_.close();
    if (!temporary_.empty()) {
        std::error_code ignored;
        fs::remove(temporary_, ignored);
        temporary_.clear();
    }
}

bool AtomicOutputFile::commit(std::string& error) {
    if (temporary_.empty() || !stream_.is_open()) {
        error = target_.string() + ": the file is already closed";
        return false;
    }
    stream_.flush();
    if (!stream_) failed_ = true;
    stream_.close();
    if (stream_.fail()) failed_ = true;
    if (failed_) {
        error = target_.string() + ": writing failed (is the disk full?); the file was not replaced";
        discard();
        return false;
    }
    std::error_code code;
    const fs::file_status existing = fs::status(target_, code);
    if (fs::exists(existing)) fs::permissions(temporary_, existing.permissions(), code);
    fs::rename(temporary_, target_, code);
    if (code) {
        error = target_.string() + ": cannot replace: " + code.message();
        discard();
        return false;
    }
    temporary_.clear();
    return true;
}

}  // namespace vorant
