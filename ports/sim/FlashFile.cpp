#include "ports/sim/FlashFile.h"

#include "ports/sim/FlashFileError.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <random>
#include <system_error>

namespace vorant::sim {

namespace {

constexpr char kMagic[8] = {'V', 'S', 'I', 'M', 'F', 'L', 'S', 'H'};
constexpr std::size_t kChunkBytes = 1 << 16;

namespace fs = std::filesystem;

// A hidden name beside the target that no file has yet; the same folder, so
// the rename that completes the file never crosses file systems.
fs::path temporaryNameBeside(const fs::path& target) {
    std::random_device random;
    for (int attempt = 0; attempt < 100; ++attempt) {
        const fs::path candidate =
            target.parent_path() / ("." + target.filename().string() + "." + std::to_string(random()) + ".tmp");
        std::error_code error;
        if (!fs::exists(candidate, error) && !error) return candidate;
    }
    return target.parent_path() / ("." + target.filename().string() + ".tmp");
}

// Removes a temporary file unless it was renamed into place.
class TemporaryFile {
public:
    explicit TemporaryFile(fs::path path) : path_(std::move(path)) {}
    ~TemporaryFile() {
        std::error_code ignored;
        if (!path_.empty()) fs::remove(path_, ignored);
    }
    TemporaryFile(const TemporaryFile&) = delete;
    TemporaryFile& operator=(const TemporaryFile&) = delete;
    const fs::path& path() const { return path_; }
    void keep() { path_.clear(); }

private:
    fs::path path_;
};

bool isOutOfSpace(int error) {
#ifdef EDQUOT
    if (error == EDQUOT) return true;
#endif
    return error == ENOSPC || error == EFBIG;
}

std::string describeWriteError(int error) {
    if (error == ENOSPC) return "the disk is full";
#ifdef EDQUOT
    if (error == EDQUOT) return "the disk quota is used up";
#endif
    if (error == EFBIG) return "the file size limit is reached";
    if (error == 0) return "a write came up short";
    return std::strerror(error);
}

}  // namespace

FlashFile::FlashFile(const std::string& path, std::size_t sizeBytes) : path_(path), sizeBytes_(sizeBytes) {
    const fs::path filePath(path);
    std::error_code error;
    const bool exists = fs::exists(filePath, error);
    if (error) fail("cannot be examined: " + error.message());
    if (exists && fs::is_directory(filePath, error)) fail("is a directory, not a flash file");

    std::uintmax_t existingSize = 0;
    if (exists) {
        existingSize = fs::file_size(filePath, error);
        if (error) fail("cannot be examined: " + error.message());
    }
    if (exists && existingSize != 0 && existingSize != sizeBytes_ + kTrailerBytes) refuseSize(existingSize);

    if (!exists || existingSize == 0) {
        createErased();
    } else {
        // Check the trailer before anything is written.
        std::ifstream probe(filePath, std::ios::binary);
        if (!probe) fail("cannot be opened for reading");
        char trailer[kTrailerBytes];
        probe.seekg(static_cast<std::streamoff>(sizeBytes_));
        if (!probe.read(trailer, sizeof trailer)) fail("cannot be read");
        if (std::memcmp(trailer, kMagic, sizeof kMagic) != 0)
            fail("is not a simulated flash file (its status trailer is missing)");
    }

    stream_.open(filePath, std::ios::in | std::ios::out | std::ios::binary);
    if (!stream_) fail("cannot be opened for reading and writing");
}

void FlashFile::fail(const std::string& what) const { fail(FlashFileError::Kind::Unusable, what); }

void FlashFile::fail(FlashFileError::Kind kind, const std::string& what) const {
    throw FlashFileError(kind, "flash file '" + path_ + "' " + what);
}

// A file of the wrong size is the complete file of another chip when it
// ends in a trailer; a shorter one without it was cut off while it was made
// (files made before creation became atomic could be).
void FlashFile::refuseSize(std::uintmax_t existingSize) const {
    const std::uintmax_t expected = sizeBytes_ + kTrailerBytes;
    const std::string thisChip = "a flash file of this chip holds " + std::to_string(expected) + " (" +
                                 std::to_string(sizeBytes_) + " bytes of flash and a " +
                                 std::to_string(kTrailerBytes) + "-byte status trailer)";
    bool endsInTrailer = false;
    if (existingSize >= kTrailerBytes) {
        std::ifstream probe(fs::path(path_), std::ios::binary);
        char trailer[kTrailerBytes];
        probe.seekg(static_cast<std::streamoff>(existingSize - kTrailerBytes));
        if (!probe.read(trailer, sizeof trailer)) fail("cannot be read");
        endsInTrailer = std::memcmp(trailer, kMagic, sizeof kMagic) == 0;
    }
    const std::string holds = "holds " + std::to_string(existingSize) + " bytes";
    if (endsInTrailer)
        fail(FlashFileError::Kind::OtherChip, holds + ", the flash file of a chip with " +
                                                  std::to_string(existingSize - kTrailerBytes) +
                                                  " bytes of flash; " + thisChip);
    if (existingSize < expected)
        fail(FlashFileError::Kind::Truncated,
             "is truncated: it " + holds + " and no status trailer at its end, where " + thisChip);
    fail(holds + " and no status trailer at its end, so it is not a simulated flash file; " + thisChip);
}

void FlashFile::createErased() {
    const fs::path target(path_);
    TemporaryFile temporary(temporaryNameBeside(target));
    std::FILE* out = std::fopen(temporary.path().string().c_str(), "wb");
    if (!out) {
        const int code = errno;
        fail(isOutOfSpace(code) ? FlashFileError::Kind::DiskFull : FlashFileError::Kind::Unusable,
             "cannot be created: " + describeWriteError(code));
    }
    // Unbuffered: each write reaches the file at once, so a short one is
    // counted exactly and its errno is its own.
    std::setvbuf(out, nullptr, _IONBF, 0);

    const std::uintmax_t total = sizeBytes_ + kTrailerBytes;
    std::uintmax_t written = 0;
    int writeError = 0;
    auto put = [&](const char* data, std::size_t count) {
        if (writeError != 0) return;
        errno = 0;
        const std::size_t done = std::fwrite(data, 1, count, out);
        written += done;
        if (done != count) writeError = errno != 0 ? errno : -1;
    };
    const std::vector<char> erased(kChunkBytes, static_cast<char>(0xFF));
    for (std::size_t done = 0; done < sizeBytes_ && writeError == 0;) {
        const std::size_t n = std::min(kChunkBytes, sizeBytes_ - done);
        put(erased.data(), n);
        done += n;
    }
    char trailer[kTrailerBytes] = {};
    std::memcpy(trailer, kMagic, sizeof kMagic);
    put(trailer, sizeof trailer);
    errno = 0;
    if (std::fclose(out) != 0 && writeError == 0) writeError = errno != 0 ? errno : -1;

    if (writeError != 0) {
        const int code = writeError < 0 ? 0 : writeError;
        fail(isOutOfSpace(code) ? FlashFileError::Kind::DiskFull : FlashFileError::Kind::Unusable,
             "cannot be created: " + describeWriteError(code) + " after " + std::to_string(written) + " of its " +
                 std::to_string(total) + " bytes; no file was made");
    }
    std::error_code error;
    fs::rename(temporary.path(), target, error);
    if (error) fail("cannot be created: " + error.message());
    temporary.keep();
}

void FlashFile::load(std::vector<std::uint8_t>& memory, std::uint8_t& status1, std::uint8_t& status2) {
    // Read straight into the chip's array: a second copy would double the
    // memory a large flash costs.
    memory.resize(sizeBytes_);
    char trailer[kTrailerBytes];
    stream_.seekg(0);
    stream_.read(reinterpret_cast<char*>(memory.data()), static_cast<std::streamsize>(memory.size()));
    stream_.read(trailer, sizeof trailer);
    if (!stream_) fail("cannot be read");
    status1 = static_cast<std::uint8_t>(trailer[8]) & 0xFC;
    status2 = static_cast<std::uint8_t>(trailer[9]);
}

void FlashFile::writeMemory(std::size_t offset, const std::uint8_t* data, std::size_t length) {
    stream_.seekp(static_cast<std::streamoff>(offset));
    stream_.write(reinterpret_cast<const char*>(data), static_cast<std::streamsize>(length));
    stream_.flush();
    if (!stream_) fail("cannot be written");
}

void FlashFile::writeStatus(std::uint8_t status1, std::uint8_t status2) {
    const char bytes[2] = {static_cast<char>(status1 & 0xFC), static_cast<char>(status2)};
    stream_.seekp(static_cast<std::streamoff>(sizeBytes_ + sizeof kMagic));
    stream_.write(bytes, sizeof bytes);
    stream_.flush();
    if (!stream_) fail("cannot be written");
}

}  // namespace vorant::sim
