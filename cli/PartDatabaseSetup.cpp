#include "cli/PartDatabaseSetup.h"

#include "cli/ExecutablePath.h"
#include "cli/ToolMessages.h"
#include "cli/UsageError.h"
#include "host/ConstraintsManager.h"
#include "host/UT_STR.h"
#include "host/VorantException.h"

#include <system_error>

namespace vorant::cli {

namespace {

bool isFolder(const std::filesystem::path& path) {
    std::error_code error;
    return !path.empty() && std::filesystem::is_directory(path, error);
}

}  // namespace

std::filesystem::path shippedPartsDirectory() {
    if (const char* fromEnvironment = Port_Env::GetEnv("VORANT_PARTS_DIR");
        fromEnvironment != nullptr && *fromEnvironment != '\0') {
        if (!isFolder(fromEnvironment))
            throw UsageError(std::string("VORANT_PARTS_DIR is '") + fromEnvironment +
                             "', which is not a folder; point it at the folder of part files or unset it");
        return fromEnvironment;
    }
    if (const std::filesystem::path besideTool = executableDirectory() / "parts"; isFolder(besideTool))
        return besideTool;
    if (const std::filesystem::path sourceTree = VORANT_SOURCE_PARTS_DIR; isFolder(sourceTree)) return sourceTree;
    throw UsageError("the shipped part files cannot be found; set VORANT_PARTS_DIR to their folder");
}

void loadPartDatabase(const std::vector<std::string>& extraPartFiles) {
    ConstraintsManager& database = ConstraintsManager::instance();
    const std::filesystem::path shipped = shippedPartsDirectory();
    try {
        database.loadDirectory(shipped.string());
    } catch (const VorantException& error) {
        throw UsageError(std::string("a shipped part file is invalid: ") + error.what());
    }
    for (const std::string& file : extraPartFiles) {
        std::error_code error;
        const bool folder = std::filesystem::is_directory(file, error);
        if (!folder && !std::filesystem::is_regular_file(file, error))
            throw UsageError("--parts " + file + ": no such part file or folder");
        ConstraintsManager::Replacements replaced;
        try {
            replaced = folder ? database.loadDirectory(file) : database.loadFile(file);
        } catch (const VorantException& problem) {
            throw UsageError(std::string(problem.what()) + "; fix the part file");
        }
        // Replacing a part is allowed (a board may need other timings), but
        // never silent: the user learns which entry is now in force.
        for (const auto& replacement : replaced)
            toolInfo("part " + replacement.part + " from " + replacement.newSource + " replaces the one from " +
                     replacement.previousSource + ".");
    }
}

}  // namespace vorant::cli
