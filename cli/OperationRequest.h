#pragma once
#include "cli/OperationCatalog.h"
#include "host/UT_CMDARGS.h"

#include <string>
#include <vector>

namespace vorant::cli {

// One operation as the user asked for it: its operands and the device
// switches to pass through.
struct OperationRequest {
    const OperationInfo* info = nullptr;
    std::vector<std::string> operands;
    // The switch tokens as given ("-e", "-f", "out.bin", ...), in order.
    std::vector<std::string> switchTokens;

    // The device's view: operands first, then the switches, so an operand
    // can never be mistaken for a switch's argument.
    UT_CMDARGS deviceArguments() const;
    // The image, SVF or readback file; "" when the operation has none.
    std::string fileOperand() const;
};

// Sorts the tokens that follow the operation name into operands and
// switches, and checks them against the operation. Throws UsageError for a
// switch the operation does not take, a switch without its file name, or
// operands that do not fit.
OperationRequest parseOperationTokens(const OperationInfo& info, const std::vector<std::string>& tokens);

}  // namespace vorant::cli
