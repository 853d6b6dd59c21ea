#include "AtomicOutputFile.h"

#include "VorantException.h"

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <system_error>

#ifdef _WIN32
#include <fcntl.h>
#include <io.h>
#endif

namespace vorant {
namespace fs = std::filesystem;
namespace {

// A hidden name beside the file to replace that no file has yet, so two
// runs never share a temporary file and an unrelated file is never
// truncated.
fs::path freeTemporaryName(const fs::path& destination, const std::string& shownName) {
    const std::string base = "." + destination.filename().string() + ".";
    for (unsigned attempt = 0; attempt <= 10000; ++attempt) {
        fs::path candidate = destination.parent_path() / (base + std::to_string(attempt) + ".tmp");
        std::error_code error;
        // Not even a dangling link may stand there.
        if (fs::symlink_status(candidate, error).type() == fs::file_type::not_found) return candidate;
    }
    throw VorantException(shownName + ": cannot create: no free temporary file name beside it");
}

// The process's standard output as a stream buffer. It keeps no buffer of
// its own: C stdio buffers, so the data and anything else the process
// prints there stay in order.
class StandardOutputBuffer final : public std::streambuf {
public:
    StandardOutputBuffer() {
#ifdef _WIN32
        // Image bytes, not text: no CR before every LF.
        std::fflush(stdout);
        _setmode(_fileno(stdout), _O_BINARY);
#endif
    }

protected:
    int_type overflow(int_type c) override {
        if (traits_type::eq_int_type(c, traits_type::eof())) return traits_type::not_eof(c);
        return std::fputc(c, stdout) == EOF ? traits_type::eof() : c;
    }
    std::streamsize xsputn(const char* data, std::streamsize count) override {
        return static_cast<std::streamsize>(std::fwrite(data, 1, static_cast<std::size_t>(count), stdout));
    }
    int sync() override { return std::fflush(stdout) == 0 ? 0 : -1; }
};

std::string systemReason() { return errno != 0 ? std::strerror(errno) : std::string(); }

}  // namespace

void AtomicOutputFile::checkWritable(const fs::path& target) {
    const OutputTarget resolved = resolveOutputTarget(target);
    // A regular target proves its folder takes new files by making (and
    // at once removing) the temporary file.
    if (resolved.delivery == OutputDelivery::Replace) AtomicOutputFile probe(target);
}

AtomicOutputFile::AtomicOutputFile(const fs::path& target) : target_(target) {
    const OutputTarget resolved = resolveOutputTarget(target_);
    delivery_ = resolved.delivery;
    const std::string name = target_.string();

    if (delivery_ == OutputDelivery::StandardOutput) {
        buffer_ = std::make_unique<StandardOutputBuffer>();
    } else {
        auto file = std::make_unique<std::filebuf>();
        fs::path opened = resolved.path;
        if (delivery_ == OutputDelivery::Replace) {
            destination_ = resolved.path;
            opened = freeTemporaryName(destination_, name);
        }
        errno = 0;
        if (file->open(opened, std::ios::out | std::ios::binary | std::ios::trunc) == nullptr) {
            const std::string reason = errno != 0 ? std::strerror(errno) : "the folder refuses new files";
            std::error_code ignored;
            if (delivery_ == OutputDelivery::Replace) fs::remove(opened, ignored);
            throw VorantException(name + ": cannot " + (delivery_ == OutputDelivery::Replace ? "create" : "open") +
                                  ": " + reason);
        }
        if (delivery_ == OutputDelivery::Replace) temporary_ = opened;
        buffer_ = std::move(file);
    }
    stream_.rdbuf(buffer_.get());
    open_ = true;
}

AtomicOutputFile::~AtomicOutputFile() { discard(); }

bool AtomicOutputFile::seekable() const {
    if (!open_ || delivery_ == OutputDelivery::StandardOutput) return false;
    return buffer_->pubseekoff(0, std::ios::cur, std::ios::out) != std::streampos(std::streamoff(-1));
}

void AtomicOutputFile::noteFailure() {
    if (!failed_ && failureReason_.empty()) failureReason_ = systemReason();
    failed_ = true;
}

bool AtomicOutputFile::write(std::string_view text) {
    if (failed() || !open_) return false;
    errno = 0;
    stream_.write(text.data(), static_cast<std::streamsize>(text.size()));
    if (!stream_) noteFailure();
    return !failed_;
}

void AtomicOutputFile::discard() {
    if (open_) {
        stream_.flush();
        if (auto* file = dynamic_cast<std::filebuf*>(buffer_.get())) file->close();
        open_ = false;
    }
    if (!temporary_.empty()) {
        std::error_code ignored;
        fs::remove(temporary_, ignored);
        temporary_.clear();
    }
}

bool AtomicOutputFile::close(std::string& error) {
    if (!open_) {
        error = target_.string() + ": the file is already closed";
        return false;
    }
    if (!stream_) noteFailure();
    errno = 0;
    if (!stream_.flush()) noteFailure();
    if (auto* file = dynamic_cast<std::filebuf*>(buffer_.get()); file != nullptr && file->close() == nullptr)
        noteFailure();
    open_ = false;
    if (failed_) {
        const std::string reason = failureReason_.empty() ? "is the disk full?" : failureReason_;
        error = target_.string() + ": writing failed (" + reason + ")" +
                (replacesTarget() ? "; the file was not replaced" : "");
        discard();
        return false;
    }
    return true;
}

bool AtomicOutputFile::publish(std::string& error) {
    if (open_) {
        error = target_.string() + ": publish before close";
        return false;
    }
    if (!replacesTarget()) return !failed_;
    if (temporary_.empty()) {
        error = target_.string() + ": the file is already closed";
        return false;
    }
    std::error_code code;
    const fs::file_status existing = fs::status(destination_, code);
    if (fs::exists(existing)) fs::permissions(temporary_, existing.permissions(), code);
    fs::rename(temporary_, destination_, code);
    if (code) {
        error = target_.string() + ": cannot replace: " + code.message();
        discard();
        return false;
    }
    temporary_.clear();
    return true;
}

bool AtomicOutputFile::commit(std::string& error) {
    if (!open_ && temporary_.empty() && replacesTarget()) {
        error = target_.string() + ": the file is already closed";
        return false;
    }
    if (open_ && !close(error)) return false;
    return publish(error);
}

}  // namespace vorant
