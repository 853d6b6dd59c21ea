#pragma once
#include "AtomicOutputFile.h"
#include "HostExport.h"

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

namespace vorant {

// Output files an operation finished writing that the host has not
// published yet. A readback writer is created and ended inside the
// operation, so it cannot know whether the operation as a whole succeeds:
// a read fault or a cancel comes after the pages it wrote. It closes its
// file complete and leaves it here; the host then publishes everything left
// here when the operation succeeded, and discards it otherwise, so a failed
// run never replaces a good file. Files still here when the process ends
// are discarded.
class VORANT_HOST_API PendingOutputs {
public:
    // Takes a closed file (AtomicOutputFile::close succeeded).
    static void add(std::unique_ptr<AtomicOutputFile> file);
    // Publishes every file, oldest first. Returns one line per file that
    // could not be published, naming it; empty when all went well.
    static std::vector<std::string> commitAll();
    // Drops every file: temporary files are removed, targets stay as they
    // were. Returns how many files were dropped.
    static std::size_t discardAll();
    static std::size_t count();
};

}  // namespace vorant
