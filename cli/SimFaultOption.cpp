#include "cli/SimFaultOption.h"

#include "cli/UsageError.h"

#include <cstdint>
#include <limits>
#include <optional>

namespace vorant::cli {

namespace {

constexpr const char* kFaultList =
    "stuck-busy, cancel-after=N, stuck-bit=ADDR:MASK[:VALUE], protected, deep-power-down, status-locked, "
    "fail-shift=N, "
    "fail-shift=page:N, fail-wait=N, fail-wait=page:N, disconnect=N";

// A decimal or 0x-prefixed hexadecimal number no larger than `limit`.
std::optional<std::uint64_t> parseNumber(const std::string& text, std::uint64_t limit) {
    std::size_t i = 0;
    int base = 10;
    if (text.size() > 2 && text[0] == '0' && (text[1] == 'x' || text[1] == 'X')) {
        base = 16;
        i = 2;
    }
    if (i >= text.size()) return std::nullopt;
    std::uint64_t value = 0;
    for (; i < text.size(); ++i) {
        const char c = text[i];
        int digit;
        if (c >= '0' && c <= '9') digit = c - '0';
        else if (base == 16 && c >= 'a' && c <= 'f') digit = c - 'a' + 10;
        else if (base == 16 && c >= 'A' && c <= 'F') digit = c - 'A' + 10;
        else return std::nullopt;
        value = value * static_cast<std::uint64_t>(base) + static_cast<std::uint64_t>(digit);
        if (value > limit) return std::nullopt;
    }
    return value;
}

[[noreturn]] void badFault(const std::string& text, const std::string& why) {
    throw UsageError("--sim-fault '" + text + "': " + why + " (known: " + kFaultList + ")");
}

int countArgument(const std::string& text, const std::string& value) {
    const auto number = parseNumber(value, static_cast<std::uint64_t>(std::numeric_limits<int>::max()));
    if (!number) badFault(text, "'" + value + "' is not a count");
    return static_cast<int>(*number);
}

sim::StuckBits stuckBitsArgument(const std::string& text, const std::string& value) {
    const std::size_t first = value.find(':');
    if (first == std::string::npos) badFault(text, "needs ADDR:MASK");
    const std::size_t second = value.find(':', first + 1);
    const std::string address = value.substr(0, first);
    const std::string mask =
        value.substr(first + 1, second == std::string::npos ? std::string::npos : second - first - 1);
    const std::string stuckValue = second == std::string::npos ? "0" : value.substr(second + 1);

    const auto addressNumber = parseNumber(address, std::numeric_limits<std::uint32_t>::max());
    const auto maskNumber = parseNumber(mask, 0xFF);
    const auto valueNumber = parseNumber(stuckValue, 0xFF);
    if (!addressNumber) badFault(text, "'" + address + "' is not an address");
    if (!maskNumber || *maskNumber == 0) badFault(text, "'" + mask + "' is not a byte mask (1..0xFF)");
    if (!valueNumber) badFault(text, "'" + stuckValue + "' is not a byte value");
    sim::StuckBits stuck;
    stuck.address = static_cast<std::uint32_t>(*addressNumber);
    stuck.mask = static_cast<std::uint8_t>(*maskNumber);
    stuck.value = static_cast<std::uint8_t>(*valueNumber);
    return stuck;
}

// A call count from 1, or with "page:" a page-transaction count from 1.
struct FaultCount {
    int at = 0;
    bool pages = false;
};

FaultCount faultCount(const std::string& text, const std::string& value) {
    const std::string pagePrefix = "page:";
    FaultCount count;
    count.pages = value.rfind(pagePrefix, 0) == 0;
    count.at = countArgument(text, count.pages ? value.substr(pagePrefix.size()) : value);
    if (count.at == 0) badFault(text, "counts from 1");
    return count;
}

}  // namespace

void addSimFault(sim::FaultPlan& plan, const std::string& text) {
    const std::size_t equals = text.find('=');
    const std::string name = text.substr(0, equals);
    const bool hasValue = equals != std::string::npos;
    const std::string value = hasValue ? text.substr(equals + 1) : std::string();

    const bool takesValue = name == "cancel-after" || name == "stuck-bit" || name == "fail-shift" ||
                            name == "fail-wait" || name == "disconnect";
    if (takesValue && !hasValue) badFault(text, "needs a value after '='");
    if (!takesValue && hasValue &&
        (name == "stuck-busy" || name == "protected" || name == "deep-power-down" || name == "status-locked"))
        badFault(text, "takes no value");

    if (name == "stuck-busy") plan.stuckBusy = true;
    else if (name == "protected") plan.protectAtPowerOn = true;
    else if (name == "deep-power-down") plan.startInDeepPowerDown = true;
    else if (name == "status-locked") plan.statusWriteLocked = true;
    else if (name == "cancel-after") plan.cancelAfterPages = countArgument(text, value);
    else if (name == "stuck-bit") plan.stuckBits.push_back(stuckBitsArgument(text, value));
    else if (name == "fail-shift") {
        const FaultCount count = faultCount(text, value);
        (count.pages ? plan.failShiftAtPage : plan.failShiftAt) = count.at;
    } else if (name == "fail-wait") {
        const FaultCount count = faultCount(text, value);
        (count.pages ? plan.failWaitAtPage : plan.failWaitAt) = count.at;
    } else if (name == "disconnect") {
        const FaultCount count = faultCount(text, value);
        if (count.pages) badFault(text, "counts shift calls");
        plan.disconnectAtShift = count.at;
    } else
        badFault(text, "unknown fault");
}

sim::FaultPlan simFaultPlan(const std::vector<std::string>& texts) {
    sim::FaultPlan plan;
    for (const std::string& text : texts) addSimFault(plan, text);
    return plan;
}

}  // namespace vorant::cli
