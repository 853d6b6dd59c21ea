#pragma once
#include "cli/OperationCatalog.h"
#include "cli/RunSummary.h"

#include <string>

namespace vorant::cli {

// Settles the files an operation's writers left unpublished (a readback
// file: host/PendingOutputs.h) once the operation has returned and its exit
// status is known. A run that succeeded publishes them: each replaces its
// target whole; one that cannot be published turns the status into a
// failure. Any other run discards them, leaving an earlier file of the same
// name exactly as it was and creating none, and one line says so. A target
// that is not a regular file (a FIFO, a device, standard output) was
// written as the data came and cannot be taken back; the line says that
// instead.
// The line for an output written in place by a run that did not succeed:
// "out.fifo is not a regular file and got the readback as it went: what it
// received is incomplete."
std::string streamedOutputNote(const std::string& file, const std::string& what);

void settleOutputFiles(const OperationInfo& info, const std::string& file, int& status, RunFigures& figures);

}  // namespace vorant::cli
