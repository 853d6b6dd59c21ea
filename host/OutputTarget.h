#pragma once
#include "HostExport.h"

#include <filesystem>

namespace vorant {

// How an output file's bytes reach what its name finally resolves to.
enum class OutputDelivery {
    // A regular file, or a name that does not exist yet: the bytes go to a
    // temporary file in the same folder, renamed over it when published.
    // Through a symbolic link that folder is the link target's folder, so
    // the link stays a link and the file it points to is replaced.
    Replace,
    // A character device, a FIFO or any other file that is not regular
    // (/dev/null, a terminal, /dev/stdout on a pipe): written in place as
    // the data come, never replaced, never turned into a regular file.
    Direct,
    // The process's own standard output: the name "-", or a name for the
    // file standard output already is (so a shell redirection and the name
    // of the same file do not fight over it).
    StandardOutput,
};

struct OutputTarget {
    OutputDelivery delivery = OutputDelivery::Replace;
    // The name as given, for messages.
    std::filesystem::path name;
    // Replace: the file to create or replace, symbolic links followed.
    // Direct: the name as given (opening it follows the links).
    std::filesystem::path path;
};

// Decides where an output named `name` goes. Throws VorantException naming
// it when it cannot be written: no name, a folder, a read-only file, a
// missing folder, a loop of links. Creates nothing.
VORANT_HOST_API OutputTarget resolveOutputTarget(const std::filesystem::path& name);

// Whether writing `name` writes the process's standard output; false for a
// name that cannot be resolved.
VORANT_HOST_API bool isStandardOutputTarget(const std::filesystem::path& name);

}  // namespace vorant
