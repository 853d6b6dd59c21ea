#include "ports/svf/AtomicOutputFile.h"

#include "ports/svf/SvfError.h"

#include <string>
#include <system_error>
#include <utility>

namespace fs = std::filesystem;

namespace vorant::svf {
namespace {

std::string quoted(const fs::path& path) { return "'" + path.string() + "'"; }

// A name beside the target that no file has yet, so two runs never share a
// temporary file and an unrelated file is never truncated.
fs::path freeTemporaryName(const fs::path& target) {
    const fs::path folder = target.parent_path();
    const std::string base = "." + target.filename().string() + ".";
    for (unsigned attempt = 0;; ++attempt) {
        fs::path candidate = folder / (base + std::to_string(attempt) + ".tmp");
        std::error_code error;
        if (!fs::exists(candidate, error) && !error) return candidate;
        if (attempt > 10000) throw SvfError("cannot write " + quoted(target) + ": no free temporary file name");
    }
}

}  // namespace

AtomicOutputFile::AtomicOutputFile(fs::path target) : target_(std::move(target)) {
    if (target_.empty()) throw SvfError("cannot write an SVF file: no file name given");
    if (!target_.has_filename()) throw SvfError("cannot write " + quoted(target_) + ": it names a folder");
    std::error_code error;
    const fs::path folder = target_.parent_path().empty() ? fs::path(".") : target_.parent_path();
    if (!fs::is_directory(folder, error))
        throw SvfError("cannot write " + quoted(target_) + ": folder " + quoted(folder) + " does not exist");
    if (fs::is_directory(target_, error)) throw SvfError("cannot write " + quoted(target_) + ": it is a folder");
    temporary_ = freeTemporaryName(target_);
    stream_.open(temporary_, std::ios::binary | std::ios::trunc);
    if (!stream_) {
        std::error_code ignored;
        fs::remove(temporary_, ignored);
        throw SvfError("cannot write " + quoted(target_) + ": cannot create a file in " + quoted(folder));
    }
}

AtomicOutputFile::~AtomicOutputFile() { discard(); }

bool AtomicOutputFile::write(std::string_view text) {
    if (failed_ || !stream_.is_open()) return false;
    stream_.write(text.data(), static_cast<std::streamsize>(text.size()));
    if (!stream_) failed_ = true;
    return !failed_;
}

void AtomicOutputFile::commit() {
    if (!stream_.is_open()) throw SvfError("cannot write " + quoted(target_) + ": the file is already closed");
    stream_.flush();
    if (!stream_) failed_ = true;
    stream_.close();
    if (stream_.fail()) failed_ = true;
    if (failed_) {
        discard();
        throw SvfError("cannot write " + quoted(target_) + ": writing the file failed");
    }
    std::error_code error;
    fs::rename(temporary_, target_, error);
    if (error) {
        discard();
        throw SvfError("cannot write " + quoted(target_) + ": " + error.message());
    }
    temporary_.clear();
}

void AtomicOutputFile::discard() {
    if (stream_.is_open()) stream_.close();
    if (!temporary_.empty()) {
        std::error_code ignored;
        fs::remove(temporary_, ignored);
        temporary_.clear();
    }
}

}  // namespace vorant::svf
