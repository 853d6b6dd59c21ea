#pragma once
#include <string>
#include <string_view>
#include <vector>

namespace vorant::cli {

enum class Operation {
    Program, Verify, Checksum, Erase, BlankCheck, Readback, IdCode, Signature,
    Validate, Status, Release, Unlock, QuadEnable, Sfdp, Parts, Ports, Play,
};

// What an operation takes besides its switches.
enum class OperandKind {
    None,            // nothing
    ImageFile,       // exactly one configuration data file
    SvfFile,         // exactly one SVF file
    QeMode,          // "set" or "clear"
    OptionalPattern, // zero or one name pattern
};

// A switch an operation passes through to the device.
struct SwitchInfo {
    std::string_view name;  // with its dash, as the device looks it up
    bool takesFileName = false;  // takes a value: the next token
    std::string_view valueName = "a file name";  // for "needs ..." messages
};

struct OperationInfo {
    Operation operation;
    std::string_view name;       // the word on the command line
    std::string_view synopsis;   // usage line after the tool name
    std::string_view purpose;    // one line for --help
    OperandKind operand;
    std::vector<SwitchInfo> switches;
    // Needs a device (and so a part and a port); false for parts, ports and play.
    bool needsDevice = true;
    // Meaningful on a recording port: everything the operation decides
    // happens on the flash when the file is played. Operations that answer
    // from what they read (readback, checksum, IDs, status) are not, since a
    // recording reads nothing.
    bool recordable = false;
    // Name under which the device counts the operation's progress steps
    // ("" when it has none; checksum counts its own pages).
    std::string_view progressName;
};

// Every operation, in the order --help lists them.
const std::vector<OperationInfo>& operationCatalog();
// The operation named `name` (exact, lower case), or null.
const OperationInfo* findOperation(std::string_view name);
// "program, verify, ..." for messages.
std::string operationNames();

}  // namespace vorant::cli
