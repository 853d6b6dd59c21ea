#include "cli/OutputSettlement.h"

#include "cli/Tool.h"
#include "cli/ToolMessages.h"
#include "host/OutputTarget.h"
#include "host/PendingOutputs.h"
#include "host/VorantException.h"

namespace vorant::cli {

namespace {

bool writtenInPlace(const std::string& file) {
    try {
        return resolveOutputTarget(file).delivery != OutputDelivery::Replace;
    } catch (const VorantException&) {
        return false;
    }
}

}  // namespace

std::string streamedOutputNote(const std::string& file, const std::string& what) {
    const std::string who = isStandardOutputTarget(file) ? "Standard output" : file + " is not a regular file and";
    return who + " got the " + what + " as it went: what it received is incomplete.";
}

void settleOutputFiles(const OperationInfo& info, const std::string& file, int& status, RunFigures& figures) {
    if (status == kExitSuccess) {
        for (const std::string& error : PendingOutputs::commitAll()) {
            toolError(error);
            status = kExitFailure;
            figures.outcome = RunOutcome::Failed;
        }
        return;
    }
    PendingOutputs::discardAll();
    if (info.operation != Operation::Readback || file.empty()) return;
    if (writtenInPlace(file))
        toolInfo(streamedOutputNote(file, "readback"));
    else
        toolInfo("Nothing was written: " + file + " is written only when the readback succeeds.");
}

}  // namespace vorant::cli
