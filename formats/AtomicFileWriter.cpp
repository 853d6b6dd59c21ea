#include "formats/AtomicFileWriter.h"

#include "formats/FormatError.h"
#include "host/PendingOutputs.h"
#include "host/VorantException.h"

#include <cerrno>
#include <cstring>

namespace vorant::formats {
namespace {

std::unique_ptr<AtomicOutputFile> openOutput(const std::string& target) {
    try {
        return std::make_unique<AtomicOutputFile>(target);
    } catch (const VorantException& error) {
        throw FormatError(error.what());
    }
}

}  // namespace

AtomicFileWriter::AtomicFileWriter(const std::string& target) : target_(target), file_(openOutput(target)) {}

bool AtomicFileWriter::beginWrite() {
    if (ended_) return fail(targetName() + ": beginWrite after endWrite");
    return !failed_;
}

bool AtomicFileWriter::fail(const std::string& reason) {
    if (!failed_) error_ = reason;
    failed_ = true;
    return false;
}

bool AtomicFileWriter::checkStream() {
    if (out()) return true;
    // Called right after the write, so errno still says why it failed
    // (a full disk, a FIFO whose reader went away).
    return fail(targetName() + ": write failed (" + (errno != 0 ? std::strerror(errno) : "disk full?") + ")");
}

bool AtomicFileWriter::acceptData(const unsigned char* data, int offset, int bits, std::size_t& byteCount) {
    if (ended_) return fail(targetName() + ": data after endWrite");
    if (failed_) return false;
    if (offset < 0) return fail(targetName() + ": negative offset " + std::to_string(offset));
    if (bits < 0 || bits % 8 != 0) {
        return fail(targetName() + ": " + std::to_string(bits) + " bits at offset " + std::to_string(offset) +
                    " are not whole bytes");
    }
    if (bits > 0 && data == nullptr) return fail(targetName() + ": no data buffer");
    byteCount = static_cast<std::size_t>(bits) / 8;
    return true;
}

bool AtomicFileWriter::endWrite() {
    if (ended_) return fail(targetName() + ": endWrite called twice");
    ended_ = true;
    if (failed_ || !finishData() || !checkStream()) {
        file_->discard();
        return false;
    }
    std::string error;
    if (!file_->close(error)) return fail(error);
    PendingOutputs::add(std::move(file_));
    return true;
}

}  // namespace vorant::formats
