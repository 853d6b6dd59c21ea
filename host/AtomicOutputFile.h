#pragma once
#include "HostExport.h"
#include "OutputTarget.h"

#include <filesystem>
#include <memory>
#include <ostream>
#include <streambuf>
#include <string>
#include <string_view>

namespace vorant {

// A file that appears under its name complete or not at all. Where the
// name resolves to a regular file (or to nothing yet), everything is
// written to a temporary file beside what it resolves to, and publish()
// renames it over that file; through a symbolic link the link stays and
// the file it points to is replaced. Destroying the object before publish()
// (a failed or cancelled run) removes the temporary file and leaves the
// target untouched. Readback writers and the SVF recorder write through it.
//
// A name that resolves to something other than a regular file (a device, a
// FIFO, standard output) cannot be replaced: it is written in place as the
// data come, and neither discard() nor a failure can take back what went
// out (see OutputDelivery).
class VORANT_HOST_API AtomicOutputFile {
public:
    // Opens the temporary file (or the direct output; a FIFO waits here for
    // its reader). Throws VorantException naming the target when it cannot
    // be written: no name, a folder in its place, a read-only target, a
    // missing folder, a folder that refuses new files. Nothing is created
    // then.
    explicit AtomicOutputFile(const std::filesystem::path& target);
    ~AtomicOutputFile();
    AtomicOutputFile(const AtomicOutputFile&) = delete;
    AtomicOutputFile& operator=(const AtomicOutputFile&) = delete;

    // Throws as the constructor does when `target` cannot be written, and
    // creates, opens and changes nothing: a FIFO is not opened (its reader
    // would take the close for the end of the data).
    static void checkWritable(const std::filesystem::path& target);

    std::ostream& stream() { return stream_; }
    // Appends text; false once any write has failed (for example a full disk).
    bool write(std::string_view text);
    bool failed() const { return failed_ || (open_ && !stream_); }
    // Why writing failed, as the system said ("No space left on device"),
    // or "" when it did not say.
    const std::string& failureReason() const { return failureReason_; }

    // Flushes and closes the output: complete, but not yet published. On
    // failure the temporary file is removed, the target is untouched, and
    // error says why.
    bool close(std::string& error);
    // Renames the closed temporary file over the target, keeping an
    // existing target's permissions. A direct output has nothing left to
    // do. On failure the temporary file is removed and error says why.
    bool publish(std::string& error);
    // close() and publish() in one.
    bool commit(std::string& error);
    // Closes and removes the temporary file; a direct output is closed.
    void discard();

    OutputDelivery delivery() const { return delivery_; }
    // Whether the target changes only at publish(); false for direct outputs.
    bool replacesTarget() const { return delivery_ == OutputDelivery::Replace; }
    // Whether data may be written out of order (streams take them in order).
    bool seekable() const;
    bool isOpen() const { return open_; }
    // The name as given.
    const std::filesystem::path& target() const { return target_; }
    const std::filesystem::path& temporaryPath() const { return temporary_; }

private:
    void noteFailure();

    std::filesystem::path target_;
    std::filesystem::path destination_;  // the regular file to replace (Replace only)
    std::filesystem::path temporary_;    // empty unless a temporary file exists
    OutputDelivery delivery_ = OutputDelivery::Replace;
    std::unique_ptr<std::streambuf> buffer_;
    std::ostream stream_{nullptr};
    bool open_ = false;
    bool failed_ = false;
    std::string failureReason_;
};

}  // namespace vorant
