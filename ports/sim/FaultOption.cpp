#include "ports/sim/FaultOption.h"

#include <cstdint>
#include <limits>
#include <optional>

namespace vorant::sim {

namespace {

// Thrown by a row's value parser; addFault puts the fault text around it.
struct BadValue {
    std::string why;
};

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

int count(const std::string& value) {
    const auto number = parseNumber(value, static_cast<std::uint64_t>(std::numeric_limits<int>::max()));
    if (!number) throw BadValue{"'" + value + "' is not a count"};
    return static_cast<int>(*number);
}

// A call count from 1, or with "page:" a page-transaction count from 1.
struct FaultCount {
    int at = 0;
    bool pages = false;
};

FaultCount callOrPageCount(const std::string& value) {
    const std::string pagePrefix = "page:";
    FaultCount result;
    result.pages = value.rfind(pagePrefix, 0) == 0;
    result.at = count(result.pages ? value.substr(pagePrefix.size()) : value);
    if (result.at == 0) throw BadValue{"counts from 1"};
    return result;
}

StuckBits stuckBits(const std::string& value) {
    const std::size_t first = value.find(':');
    if (first == std::string::npos) throw BadValue{"needs ADDR:MASK"};
    const std::size_t second = value.find(':', first + 1);
    const std::string address = value.substr(0, first);
    const std::string mask =
        value.substr(first + 1, second == std::string::npos ? std::string::npos : second - first - 1);
    const std::string stuckValue = second == std::string::npos ? "0" : value.substr(second + 1);

    const auto addressNumber = parseNumber(address, std::numeric_limits<std::uint32_t>::max());
    const auto maskNumber = parseNumber(mask, 0xFF);
    const auto valueNumber = parseNumber(stuckValue, 0xFF);
    if (!addressNumber) throw BadValue{"'" + address + "' is not an address"};
    if (!maskNumber || *maskNumber == 0) throw BadValue{"'" + mask + "' is not a byte mask (1..0xFF)"};
    if (!valueNumber) throw BadValue{"'" + stuckValue + "' is not a byte value"};
    StuckBits stuck;
    stuck.address = static_cast<std::uint32_t>(*addressNumber);
    stuck.mask = static_cast<std::uint8_t>(*maskNumber);
    stuck.value = static_cast<std::uint8_t>(*valueNumber);
    return stuck;
}

}  // namespace

const std::vector<FaultOption>& faultOptions() {
    static const std::vector<FaultOption> table = {
        {"stuck-busy", "", "the chip never leaves busy after a write",
         [](FaultPlan& plan, const std::string&) { plan.stuckBusy = true; }},
        {"cancel-after", "N", "the port reports a cancel after N page transactions",
         [](FaultPlan& plan, const std::string& value) { plan.cancelAfterPages = count(value); }},
        {"stuck-bit", "ADDR:MASK[:VALUE]", "the MASK bits of the byte at ADDR read as VALUE (default 0)",
         [](FaultPlan& plan, const std::string& value) { plan.stuckBits.push_back(stuckBits(value)); }},
        {"protected", "", "block protection is set at power-on",
         [](FaultPlan& plan, const std::string&) { plan.protectAtPowerOn = true; }},
        {"deep-power-down", "", "the chip starts in deep power-down",
         [](FaultPlan& plan, const std::string&) { plan.startInDeepPowerDown = true; }},
        {"status-locked", "", "status register writes are accepted and change nothing",
         [](FaultPlan& plan, const std::string&) { plan.statusWriteLocked = true; }},
        {"fail-shift", "N|page:N", "the N-th shift call, or the shift opening the N-th page transaction, fails",
         [](FaultPlan& plan, const std::string& value) {
             const FaultCount at = callOrPageCount(value);
             (at.pages ? plan.failShiftAtPage : plan.failShiftAt) = at.at;
         }},
        {"fail-wait", "N|page:N", "the N-th wait, or the first wait after the N-th page transaction, fails",
         [](FaultPlan& plan, const std::string& value) {
             const FaultCount at = callOrPageCount(value);
             (at.pages ? plan.failWaitAtPage : plan.failWaitAt) = at.at;
         }},
        {"disconnect", "N", "the cable is lost at the N-th shift call",
         [](FaultPlan& plan, const std::string& value) {
             const FaultCount at = callOrPageCount(value);
             if (at.pages) throw BadValue{"counts shift calls"};
             plan.disconnectAtShift = at.at;
         }},
    };
    return table;
}

std::string faultList() {
    std::string list;
    for (const FaultOption& option : faultOptions()) {
        if (!list.empty()) list += ", ";
        list += option.name;
        if (*option.valueForm != '\0') list += std::string("=") + option.valueForm;
    }
    return list;
}

void addFault(FaultPlan& plan, const std::string& text) {
    const std::size_t equals = text.find('=');
    const std::string name = text.substr(0, equals);
    const bool hasValue = equals != std::string::npos;
    const std::string value = hasValue ? text.substr(equals + 1) : std::string();
    auto refuse = [&](const std::string& why) {
        throw FaultOptionError("--sim-fault '" + text + "': " + why + " (known: " + faultList() + ")");
    };
    for (const FaultOption& option : faultOptions()) {
        if (name != option.name) continue;
        const bool takesValue = *option.valueForm != '\0';
        if (takesValue && !hasValue) refuse("needs a value after '='");
        if (!takesValue && hasValue) refuse("takes no value");
        try {
            option.apply(plan, value);
        } catch (const BadValue& bad) {
            refuse(bad.why);
        }
        return;
    }
    refuse("unknown fault");
}

FaultPlan faultPlan(const std::vector<std::string>& texts) {
    FaultPlan plan;
    for (const std::string& text : texts) addFault(plan, text);
    return plan;
}

}  // namespace vorant::sim
