#include "formats/AtomicOutputFile.h"

#include "formats/FormatError.h"

#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstring>
#include <atomic>
#include <random>

namespace vorant::formats {
namespace fs = std::filesystem;
namespace {

// A name that no other writer picks at the same moment: random_device may
// be deterministic on some platforms, so the clock and a counter are mixed in.
std::string uniqueSuffix(unsigned attempt) {
    static std::atomic<unsigned> counter{0};
    std::random_device device;
    const auto ticks = static_cast<unsigned long long>(
        std::chrono::high_resolution_clock::now().time_since_epoch().count());
    const unsigned long long mixed = (static_cast<unsigned long long>(device()) << 32) ^ ticks ^
                                     (static_cast<unsigned long long>(++counter) << 20) ^ attempt;
    char text[24];
    std::snprintf(text, sizeof text, "%016llx", mixed);
    return text;
}

}  // namespace

AtomicOutputFile::AtomicOutputFile(const std::string& target) : target_(target) {
    std::error_code ec;
    if (target.empty()) throw FormatError("no output file name given");

    const fs::file_status status = fs::status(target_, ec);
    if (fs::is_directory(status)) throw FormatError(target + ": is a directory");
    if (fs::exists(status) && (status.permissions() & fs::perms::owner_write) == fs::perms::none) {
        throw FormatError(target + ": is read-only; not overwritten");
    }
    const fs::path directory = target_.parent_path().empty() ? fs::path(".") : target_.parent_path();
    if (!fs::is_directory(directory, ec)) {
        throw FormatError(target + ": cannot create: directory " + directory.string() + " does not exist");
    }

    for (unsigned attempt = 0; attempt < 16 && !pending_; ++attempt) {
        fs::path candidate = target_;
        candidate += "." + uniqueSuffix(attempt) + ".tmp";
        if (fs::exists(candidate, ec)) continue;
        errno = 0;
        out_.open(candidate, std::ios::out | std::ios::binary | std::ios::trunc);
        if (!out_) {
            const std::string reason = errno != 0 ? std::strerror(errno) : "the directory refuses new files";
            throw FormatError(target + ": cannot create: " + reason);
        }
        temporary_ = std::move(candidate);
        pending_ = true;
    }
    if (!pending_) throw FormatError(target + ": cannot create: no free temporary name beside it");
}

AtomicOutputFile::~AtomicOutputFile() {
    discard();
}

void AtomicOutputFile::discard() {
    if (out_.is_open()) out_.close();
    if (pending_) {
        std::error_code ec;
        fs::remove(temporary_, ec);
        pending_ = false;
    }
}

bool AtomicOutputFile::commit(std::string& error) {
    if (!pending_) {
        error = target_.string() + ": already closed";
        return false;
    }
    out_.flush();
    const bool written = static_cast<bool>(out_);
    out_.close();
    if (!written || out_.fail()) {
        error = target_.string() + ": write failed (disk full?); the file was not replaced";
        discard();
        return false;
    }

    std::error_code ec;
    const fs::file_status existing = fs::status(target_, ec);
    if (fs::exists(existing)) fs::permissions(temporary_, existing.permissions(), ec);

    fs::rename(temporary_, target_, ec);
    if (ec) {
        error = target_.string() + ": cannot replace: " + ec.message();
        discard();
        return false;
    }
    pending_ = false;
    return true;
}

}  // namespace vorant::formats
