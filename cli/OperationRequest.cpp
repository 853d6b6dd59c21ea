#include "cli/OperationRequest.h"

#include "cli/UsageError.h"

#include <algorithm>

namespace vorant::cli {

namespace {

const SwitchInfo* findSwitch(const OperationInfo& info, const std::string& token) {
    for (const SwitchInfo& sw : info.switches)
        if (sw.name == token) return &sw;
    return nullptr;
}

std::string usageOf(const OperationInfo& info) { return "usage: vorant-spi [options] " + std::string(info.synopsis); }

std::string acceptedSwitches(const OperationInfo& info) {
    if (info.switches.empty()) return "'" + std::string(info.name) + "' takes no switches";
    std::string list;
    for (const SwitchInfo& sw : info.switches) {
        if (!list.empty()) list += ", ";
        list += sw.name;
    }
    return "'" + std::string(info.name) + "' takes " + list;
}

// A lone "-" is an operand (a file called "-"), as the device's switch
// parser sees it.
bool looksLikeSwitch(const std::string& token) { return token.size() > 1 && token[0] == '-'; }

void checkOperands(const OperationInfo& info, const OperationRequest& request) {
    const std::size_t count = request.operands.size();
    const std::string name(info.name);
    switch (info.operand) {
    case OperandKind::None:
        if (count != 0)
            throw UsageError("'" + name + "' takes no operand, got '" + request.operands.front() + "' (" +
                             usageOf(info) + ")");
        break;
    case OperandKind::ImageFile:
        if (count == 0) throw UsageError("'" + name + "' needs an image file (" + usageOf(info) + ")");
        if (count > 1)
            throw UsageError("'" + name + "' takes one image file, got '" + request.operands[0] + "' and '" +
                             request.operands[1] + "' (" + usageOf(info) + ")");
        break;
    case OperandKind::SvfFile:
        if (count != 1) throw UsageError("'" + name + "' needs exactly one SVF file (" + usageOf(info) + ")");
        break;
    case OperandKind::QeMode:
        if (count != 1 || (request.operands[0] != "set" && request.operands[0] != "clear"))
            throw UsageError("'qe' needs 'set' or 'clear' (" + usageOf(info) + ")");
        break;
    case OperandKind::OptionalPattern:
        if (count > 1) throw UsageError("'" + name + "' takes at most one pattern (" + usageOf(info) + ")");
        break;
    }
    if (info.operation == Operation::Readback && request.fileOperand().empty())
        throw UsageError("'readback' needs the output file: vorant-spi [options] readback -f FILE");
}

}  // namespace

OperationRequest parseOperationTokens(const OperationInfo& info, const std::vector<std::string>& tokens) {
    OperationRequest request;
    request.info = &info;
    for (std::size_t i = 0; i < tokens.size(); ++i) {
        const std::string& token = tokens[i];
        if (!looksLikeSwitch(token)) {
            request.operands.push_back(token);
            continue;
        }
        const SwitchInfo* sw = findSwitch(info, token);
        if (sw == nullptr) throw UsageError("unknown switch '" + token + "': " + acceptedSwitches(info));
        // The device would quietly take the first of two file names.
        if (sw->takesFileName && std::find(request.switchTokens.begin(), request.switchTokens.end(), token) !=
                                     request.switchTokens.end())
            throw UsageError("'" + token + "' is given twice; give one file name (" + usageOf(info) + ")");
        request.switchTokens.push_back(token);
        if (sw->takesFileName) {
            if (i + 1 >= tokens.size() || looksLikeSwitch(tokens[i + 1]) || tokens[i + 1].empty())
                throw UsageError("'" + token + "' needs " + std::string(sw->valueName) + " (" + usageOf(info) + ")");
            request.switchTokens.push_back(tokens[++i]);
        }
    }
    checkOperands(info, request);
    return request;
}

UT_CMDARGS OperationRequest::deviceArguments() const {
    std::vector<std::string> tokens = operands;
    tokens.insert(tokens.end(), switchTokens.begin(), switchTokens.end());
    return UT_CMDARGS(tokens);
}

std::string OperationRequest::fileOperand() const {
    if (info == nullptr) return {};
    if (info->operand == OperandKind::ImageFile || info->operand == OperandKind::SvfFile)
        return operands.empty() ? std::string() : operands.front();
    // The device takes the readback file from "-f", else "-file"; so does
    // the tool when it checks the file up front.
    for (const char* name : {"-f", "-file"})
        for (std::size_t i = 0; i + 1 < switchTokens.size(); ++i)
            if (switchTokens[i] == name) return switchTokens[i + 1];
    return {};
}

}  // namespace vorant::cli
