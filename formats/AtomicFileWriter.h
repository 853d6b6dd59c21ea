#pragma once
#include "host/AtomicOutputFile.h"
#include "host/ConfigData.h"

#include <cstdint>
#include <string>

namespace vorant::formats {

// The part every file writer shares: the output goes to a temporary file
// that endWrite() renames over the target, and the first failure is kept.
// After a failure every further call answers false and endWrite() leaves
// the target untouched, so a readback never replaces a good file with a
// damaged one. Destroying the writer before endWrite() removes the
// temporary file.
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

    std::ofstream& out() { return file_.stream(); }
    std::string targetName() const { return file_.target().string(); }

    // Writes whatever the format still holds back (the end record, say).
    virtual bool finishData() = 0;

private:
    vorant::AtomicOutputFile file_;
    std::string error_;
    bool failed_ = false;
    bool ended_ = false;
};

}  // namespace vorant::formats
