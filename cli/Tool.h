#pragma once

namespace vorant::cli {

// Exit status of the tool.
enum ExitStatus : int {
    kExitSuccess = 0,    // the operation returned true
    kExitFailure = 1,    // the operation returned false, was cancelled, or failed
    kExitUsage = 2,      // bad command line, file, part or value: nothing was done
};

// The whole tool: parses the command line, loads the part database, opens
// the port and runs one operation. Returns the exit status.
int runTool(int argc, char** argv);

}  // namespace vorant::cli
