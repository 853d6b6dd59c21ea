#pragma once
#include "host/AtomicOutputFile.h"
#include "host/ConfigData.h"

#include <cstdint>
#include <memory>
#include <ostream>
#include <string>

namespace vorant::formats {

// The part every file writer shares: the output goes to a temporary file
// (see AtomicOutputFile), and the first failure is kept. endWrite() closes
// the file complete and leaves it in PendingOutputs: the host publishes it
// once the operation that wrote it succeeded, and discards it otherwise,
// since a readback can still fail or be cancelled after its last page went
// to the writer. After a failure every further call answers false and
// endWrite() removes the temporary file, so a readback never replaces a
// good file with a damaged one. Destroying the writer before endWrite()
// removes the temporary file too.
class AtomicFileWriter : public ConfigDataWriter {
public:
    bool beginWrite() override;
    bool endWrite() override;

    // Why the last call answered false; empty while all is well.
    const std::string& errorMessage() const { return error_; }

protected:
    // Throws FormatError when the target cannot be written.
    explicit AtomicFileWriter(const std::string& target);

    // Checks writeData's arguments and the writer's state; on success gives
    // the number of bytes. Captured pages always hold whole bytes.
    bool acceptData(const unsigned char* data, int offset, int bits, std::size_t& byteCount);
    // Records the first failure and answers false.
    bool fail(const std::string& reason);
    // Notes a stream error after a write; answers whether all is well.
    bool checkStream();

    std::ostream& out() { return file_->stream(); }
    // False for a stream (a FIFO, standard output): data must come in order.
    bool seekable() const { return file_->seekable(); }
    const std::string& targetName() const { return target_; }

    // Writes whatever the format still holds back (the end record, say).
    virtual bool finishData() = 0;

private:
    std::string target_;
    std::unique_ptr<vorant::AtomicOutputFile> file_;  // null once handed to PendingOutputs
    std::string error_;
    bool failed_ = false;
    bool ended_ = false;
};

}  // namespace vorant::formats
