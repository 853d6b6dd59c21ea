#pragma once
#include "cli/CommandLine.h"
#include "cli/OperationRequest.h"

namespace vorant::cli {

class ProgressAwareSink;

// Runs one device operation from start to end: checks the part and files,
// opens the port, identifies the part when asked, builds and wires the
// device, shows progress, handles Ctrl-C and prints the summary. Returns
// the exit status. Throws UsageError, having sent nothing to the flash and
// left no file behind, when the request cannot be carried out.
int runDeviceOperation(const ToolOptions& options, const OperationRequest& request, ProgressAwareSink& sink);

}  // namespace vorant::cli
