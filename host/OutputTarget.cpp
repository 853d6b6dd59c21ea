#include "OutputTarget.h"

#include "VorantException.h"

#include <cerrno>
#include <cstring>
#include <string>
#include <system_error>

#ifdef _WIN32
#include <io.h>
#else
#include <sys/stat.h>
#include <unistd.h>
#endif

namespace vorant {
namespace fs = std::filesystem;
namespace {

// As many links as the system itself follows before it gives up.
constexpr int kMaxLinkHops = 40;

// The name with every symbolic link on its last component followed, also
// when the last link dangles (the file it names is then created). Folders
// on the way are left as they are: a rename works through them.
fs::path followLinks(const fs::path& name) {
    fs::path current = name;
    for (int hop = 0; hop <= kMaxLinkHops; ++hop) {
        std::error_code error;
        if (!fs::is_symlink(fs::symlink_status(current, error))) return current;
        const fs::path link = fs::read_symlink(current, error);
        if (error) throw VorantException(name.string() + ": cannot follow the link: " + error.message());
        current = link.is_absolute() ? link : current.parent_path() / link;
    }
    throw VorantException(name.string() + ": too many levels of symbolic links");
}

#ifndef _WIN32
bool isProcessStandardOutput(const struct stat& file) {
    struct stat out {};
    return fstat(STDOUT_FILENO, &out) == 0 && out.st_dev == file.st_dev && out.st_ino == file.st_ino;
}
#endif

}  // namespace

OutputTarget resolveOutputTarget(const fs::path& name) {
    if (name.empty()) throw VorantException("no output file name given");
    OutputTarget target;
    target.name = name;
    target.path = name;
    if (name == "-") {
        target.delivery = OutputDelivery::StandardOutput;
        return target;
    }
    const std::string shown = name.string();

#ifndef _WIN32
    // stat follows every link, the /proc ones behind /dev/stdout included,
    // so it sees what a write would reach.
    struct stat reached {};
    if (stat(name.c_str(), &reached) == 0) {
        if (S_ISDIR(reached.st_mode)) throw VorantException(shown + ": is a directory");
        if (isProcessStandardOutput(reached)) {
            target.delivery = OutputDelivery::StandardOutput;
            return target;
        }
        if (!S_ISREG(reached.st_mode)) {
            if (access(name.c_str(), W_OK) != 0)
                throw VorantException(shown + ": cannot be written: " + std::strerror(errno));
            target.delivery = OutputDelivery::Direct;
            return target;
        }
    }
#endif

    target.path = followLinks(name);
    std::error_code error;
    const fs::file_status status = fs::status(target.path, error);
    if (fs::is_directory(status) || !target.path.has_filename()) throw VorantException(shown + ": is a directory");
    if (fs::exists(status) && !fs::is_regular_file(status)) {
        // Only reached where the system has no stat (Windows): its devices.
        target.delivery = OutputDelivery::Direct;
        target.path = name;
        return target;
    }
    if (fs::exists(status) && (status.permissions() & fs::perms::owner_write) == fs::perms::none)
        throw VorantException(shown + ": is read-only; not overwritten");
    const fs::path folder = target.path.parent_path().empty() ? fs::path(".") : target.path.parent_path();
    if (!fs::is_directory(folder, error))
        throw VorantException(shown + ": cannot create: folder " + folder.string() + " does not exist");
    return target;
}

bool isStandardOutputTarget(const fs::path& name) {
    try {
        return resolveOutputTarget(name).delivery == OutputDelivery::StandardOutput;
    } catch (const VorantException&) {
        return false;
    }
}

}  // namespace vorant
