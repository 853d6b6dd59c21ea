#include "formats/AtomicFileWriter.h"

#include "formats/FormatError.h"
#include "host/VorantException.h"

namespace vorant::formats {

AtomicFileWriter::AtomicFileWriter(const std::string& target) try : file_(target) {
} catch (const VorantException& error) {
    throw FormatError(error.what());
}

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
    return fail(targetName() + ": write failed (disk full?)");
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
        file_.discard();
        return false;
    }
    std::string error;
    if (!file_.commit(error)) return fail(error);
    return true;
}

}  // namespace vorant::formats
