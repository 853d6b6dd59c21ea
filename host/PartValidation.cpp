// The checks every part from a part file passes before a device may be
// built for it: a part that passes can neither write past a vector, nor
// loop forever, nor overflow the time it polls.
#include "ConstraintsManager.h"
#include "PropertyText.h"
#include "UT_STR.h"
#include "VorantException.h"

#include <cctype>
#include <climits>

namespace vorant::host {

std::optional<std::int32_t> parseInt32(const std::string& text) {
    if (text.empty()) return std::nullopt;
    std::size_t i = 0;
    bool negative = false;
    if (text[0] == '-' || text[0] == '+') {
        negative = text[0] == '-';
        i = 1;
    }
    int base = 10;
    if (text.size() > i + 2 && text[i] == '0' && (text[i + 1] == 'x' || text[i + 1] == 'X')) {
        base = 16;
        i += 2;
    }
    if (i >= text.size()) return std::nullopt;
    long long value = 0;
    for (; i < text.size(); ++i) {
        const int c = std::tolower(static_cast<unsigned char>(text[i]));
        int digit;
        if (c >= '0' && c <= '9') digit = c - '0';
        else if (base == 16 && c >= 'a' && c <= 'f') digit = c - 'a' + 10;
        else return std::nullopt;
        value = value * base + digit;
        if (value > static_cast<long long>(INT32_MAX) + 1) return std::nullopt;
    }
    if (negative) value = -value;
    if (value < INT32_MIN || value > INT32_MAX) return std::nullopt;
    return static_cast<std::int32_t>(value);
}

bool isBinaryText(const std::string& text) {
    return !text.empty() && text.find_first_not_of("01") == std::string::npos;
}

bool isHexText(const std::string& text) {
    return !text.empty() && text.find_first_not_of("0123456789abcdefABCDEF") == std::string::npos;
}

}  // namespace vorant::host

namespace {

using vorant::host::isBinaryText;
using vorant::host::isHexText;
using vorant::host::parseInt32;

const char* const kInstructionKeys[] = {
    "ENABLE_INSTRUCTION",        "DISABLE_INSTRUCTION",       "IDENTIFICATION_INSTRUCTION",
    "READSTATUS_INSTRUCTION",    "READSTATUS2_INSTRUCTION",   "WRITESTATUS_INSTRUCTION",
    "READ_INSTRUCTION",          "FASTREAD_INSTRUCTION",      "PAGEPROGRAM_INSTRUCTION",
    "SECTORERASE_INSTRUCTION",   "BULKERASE_INSTRUCTION",     "DEEPDOWN_INSTRUCTION",
    "RELEASE_INSTRUCTION",       "READSIGNATURE_INSTRUCTION", "WRITESR_INSTRUCTION"};

const char* const kFlagKeys[] = {"USE_RES", "USE_UNLOCKSR", "READ_STATUS_ENABLED", "X2_READ", "X4_READ"};

// Sizes, steps and divisors: zero or less would loop forever or divide by zero.
const char* const kPositiveKeys[] = {"ADDRESS_SIZE",         "READ_SIZE",
                                     "PAGE_SIZE",            "TOTAL_SHIFT_SIZE",
                                     "DEVICE_SIZE",          "PROGRAM_WAITTIME_INC",
                                     "BULKERASE_WAITTIME_INC", "PROGRESS_ERASE_WAITTIME_INC"};

const char* const kNonNegativeKeys[] = {
    "WRITESTATUS_WAITTIME",  "SECTORERASE_WAITTIME", "DATA_START_INDEX",
    "PAGE_ADDRESS_START_INDEX", "PROGRAM_MAXWAITTIME", "PROGRAM_WAITTIME",
    "BULKERASE_WAITTIME",    "BULKERASE_MAXWAITTIME", "WRSR_MAXWAITTIME",
    "INSTRUCTION_LENGTH",    "STATUS_REGISTER_LENGTH", "RELEASE_FROM_STANDBY_MAX_WAITTIME"};

// Erases of one size each; SECTORERASE is the smallest that works anywhere.
const char* const kEraseGranularities[] = {"SECTORERASE", "BLOCKERASE32", "BLOCKERASE64"};

class PartChecker {
public:
    PartChecker(const std::string& source, const std::string& part, const std::map<std::string, std::string>& props)
        : source_(source), part_(part), props_(props) {}

    [[noreturn]] void fail(const std::string& key, const std::string& reason) const {
        throw VorantException(source_ + ": part " + part_ + ": " + key + ": " + reason);
    }

    const std::string& text(const std::string& key) const {
        auto it = props_.find(key);
        if (it == props_.end()) fail(key, "missing");
        return it->second;
    }

    std::int32_t number(const std::string& key) const {
        auto value = parseInt32(text(key));
        if (!value) fail(key, "'" + text(key) + "' is not a whole number within the 32-bit range");
        return *value;
    }

    bool flag(const std::string& key) const { return UT_STR::ICompare(text(key).c_str(), "TRUE") == 0; }

    long long length(const std::string& key) const { return static_cast<long long>(text(key).size()); }

    void check() const {
        for (const auto& key : ConstraintsManager::deviceKeys()) text(key);
        for (const char* key : kInstructionKeys)
            if (!isBinaryText(text(key))) fail(key, "'" + text(key) + "' must be a text of '0' and '1' characters");
        for (const char* key : kFlagKeys)
            if (UT_STR::ICompare(text(key).c_str(), "TRUE") != 0 && UT_STR::ICompare(text(key).c_str(), "FALSE") != 0)
                fail(key, "'" + text(key) + "' must be TRUE or FALSE");
        for (const char* key : kPositiveKeys)
            if (number(key) <= 0) fail(key, "must be greater than 0");
        for (const char* key : kNonNegativeKeys)
            if (number(key) < 0) fail(key, "must not be negative");

        const long long pageSize = number("PAGE_SIZE"), deviceSize = number("DEVICE_SIZE");
        const long long addressSize = number("ADDRESS_SIZE"), addressStart = number("PAGE_ADDRESS_START_INDEX");
        const long long dataStart = number("DATA_START_INDEX"), totalShift = number("TOTAL_SHIFT_SIZE");
        const long long readSize = number("READ_SIZE");

        if (pageSize % 8 != 0) fail("PAGE_SIZE", "must be a multiple of 8 bits (whole bytes)");
        if (deviceSize % 8 != 0) fail("DEVICE_SIZE", "must be a multiple of 8 bits (whole bytes)");
        if (pageSize > deviceSize) fail("PAGE_SIZE", "is larger than DEVICE_SIZE");
        if (addressSize > 32 || addressSize % 8 != 0) fail("ADDRESS_SIZE", "must be 8, 16, 24 or 32 bits");
        if (addressSize < 32 && deviceSize / 8 > (1LL << addressSize))
            fail("ADDRESS_SIZE", "cannot address all of DEVICE_SIZE");

        // Every field must fit the frame it is written into.
        if (length("PAGEPROGRAM_INSTRUCTION") > addressStart)
            fail("PAGE_ADDRESS_START_INDEX", "overlaps PAGEPROGRAM_INSTRUCTION");
        if (length("READ_INSTRUCTION") > addressStart) fail("PAGE_ADDRESS_START_INDEX", "overlaps READ_INSTRUCTION");
        if (addressStart + addressSize > readSize) fail("READ_SIZE", "too short for the address field");
        if (addressStart + addressSize > dataStart) fail("DATA_START_INDEX", "overlaps the address field");
        if (dataStart + pageSize > totalShift) fail("TOTAL_SHIFT_SIZE", "too short for the data field");
        if (length("READSTATUS_INSTRUCTION") < 8) fail("READSTATUS_INSTRUCTION", "must be at least 8 bits");
        if (length("READSTATUS2_INSTRUCTION") < 8) fail("READSTATUS2_INSTRUCTION", "must be at least 8 bits");

        checkWaitOrder("PROGRAM");
        checkWaitOrder("BULKERASE");

        const std::string& id = text("IDCODE");
        const std::size_t idDigits = flag("USE_RES") ? 2 : 6;
        if (!isHexText(id) || id.size() != idDigits)
            fail("IDCODE", "'" + id + "' must be " + std::to_string(idDigits) + " hexadecimal digits" +
                               (flag("USE_RES") ? " (a RES signature)" : " (a JEDEC ID)"));

        if (flag("X4_READ") && number("STATUS_REGISTER_LENGTH") < 16)
            fail("STATUS_REGISTER_LENGTH", "must be at least 16 when X4_READ is set (the Quad Enable write sends two bytes)");
        // The Quad Enable write sends register 1 and register 2 with one
        // two-byte 01h and sets register 2 bit 1: a part that takes one byte
        // there, or keeps Quad Enable elsewhere, would get a wrong register.
        if (flag("X4_READ")) {
            if (props_.count("WRSR_BITS") == 0 || number("WRSR_BITS") != 16)
                fail("WRSR_BITS", "must be 16 when X4_READ is set (Quad Enable is written with a two-byte 01h)");
            if (props_.count("QE_LOCATION") != 0 && text("QE_LOCATION") != "SR2.1")
                fail("QE_LOCATION", "must be SR2.1 when X4_READ is set (Quad Enable is written as status register 2 bit 1)");
        }

        checkOptional();
    }

    void checkOptional() const {
        auto has = [&](const char* key) { return props_.count(key) != 0; };
        if (has("JEDEC_ID") && !(isHexText(text("JEDEC_ID")) && text("JEDEC_ID").size() == 6))
            fail("JEDEC_ID", "'" + text("JEDEC_ID") + "' must be 6 hexadecimal digits");
        if (has("RES_SIGNATURE") && !(isHexText(text("RES_SIGNATURE")) && text("RES_SIGNATURE").size() == 2))
            fail("RES_SIGNATURE", "'" + text("RES_SIGNATURE") + "' must be 2 hexadecimal digits");
        if (has("QE_LOCATION")) {
            const std::string& qe = text("QE_LOCATION");
            if (qe != "SR2.1" && qe != "SR1.6" && qe != "none") fail("QE_LOCATION", "must be SR2.1, SR1.6 or none");
        }
        if (has("SFDP") && text("SFDP") != "none" &&
            (!isHexText(text("SFDP")) || text("SFDP").size() % 2 != 0 || text("SFDP").size() < 16))
            fail("SFDP", "must be the SFDP area as hexadecimal digits (two per byte), or none");
        if (has("WRSR_BITS") && number("WRSR_BITS") != 8 && number("WRSR_BITS") != 16)
            fail("WRSR_BITS", "must be 8 or 16");
        for (const char* erase : kEraseGranularities) checkEraseGranularity(erase);
        for (const char* key : {"SIM_SECTOR_ERASE_US", "SIM_BLOCK32_ERASE_US", "SIM_BLOCK64_ERASE_US", "SIM_PAGE_PROGRAM_US",
                                "SIM_BULK_ERASE_US", "SIM_WRITE_STATUS_US",
                                "SIM_RELEASE_US"})
            if (has(key) && number(key) < 0) fail(key, "must not be negative");
    }

    // A wait limit below its first wait would give up before the first
    // poll; polling adds the step to the elapsed time before it compares,
    // so limit plus step must stay a 32-bit number.
    void checkWaitOrder(const std::string& prefix) const {
        const std::string first = prefix + "_WAITTIME", limit = prefix + "_MAXWAITTIME", step = first + "_INC";
        if (number(limit) < number(first))
            fail(limit, std::to_string(number(limit)) + " is below " + first + " (" + std::to_string(number(first)) +
                            "); the limit must not be shorter than the first wait");
        if (static_cast<long long>(number(limit)) + number(step) > INT32_MAX)
            fail(limit, "plus " + step + " exceeds the 32-bit range");
    }

    // One erase granularity (the smallest erase, the 32 KiB or the 64 KiB
    // block): each key is optional, but what is given must make sense, and a
    // complete set of waits must keep their order.
    void checkEraseGranularity(const std::string& prefix) const {
        auto has = [&](const std::string& key) { return props_.count(key) != 0; };
        const std::string instruction = prefix + "_INSTRUCTION";
        if (has(instruction) && (!isBinaryText(text(instruction)) || text(instruction).size() < 8))
            fail(instruction, "'" + text(instruction) + "' must be a text of at least eight '0' and '1' characters");
        const std::string size = prefix == "SECTORERASE" ? "SECTOR_SIZE" : prefix + "_SIZE";
        if (has(size)) {
            const std::int32_t bytes = number(size);
            if (bytes <= 0 || (bytes & (bytes - 1)) != 0) fail(size, "must be a power of two bytes");
            if (static_cast<long long>(bytes) * 8 > number("DEVICE_SIZE")) fail(size, "is larger than DEVICE_SIZE");
        }
        const std::string first = prefix + "_WAITTIME", limit = prefix + "_MAXWAITTIME", step = first + "_INC";
        for (const std::string& key : {first, limit})
            if (has(key) && number(key) < 0) fail(key, "must not be negative");
        if (has(step) && number(step) <= 0) fail(step, "must be greater than 0");
        if (has(first) && has(limit) && has(step)) checkWaitOrder(prefix);
        else if (has(first) && has(limit) && number(limit) < number(first))
            fail(limit, "is below " + first + "; the limit must not be shorter than the first wait");
    }

private:
    const std::string& source_;
    const std::string& part_;
    const std::map<std::string, std::string>& props_;
};

}  // namespace

void ConstraintsManager::validatePart(const std::string& sourceName, const std::string& partName,
                                      const std::map<std::string, std::string>& properties) {
    PartChecker(sourceName, partName, properties).check();
}

const std::vector<std::string>& ConstraintsManager::deviceKeys() {
    static const std::vector<std::string> keys = {
        "ENABLE_INSTRUCTION", "DISABLE_INSTRUCTION", "IDENTIFICATION_INSTRUCTION", "READSTATUS_INSTRUCTION",
        "READSTATUS2_INSTRUCTION", "WRITESTATUS_INSTRUCTION", "READ_INSTRUCTION", "FASTREAD_INSTRUCTION",
        "PAGEPROGRAM_INSTRUCTION", "SECTORERASE_INSTRUCTION", "BULKERASE_INSTRUCTION", "DEEPDOWN_INSTRUCTION",
        "RELEASE_INSTRUCTION", "READSIGNATURE_INSTRUCTION", "WRITESR_INSTRUCTION", "PROGRAM_WAITTIME_INC",
        "BULKERASE_WAITTIME_INC", "WRITESTATUS_WAITTIME", "SECTORERASE_WAITTIME", "ADDRESS_SIZE", "READ_SIZE",
        "PAGE_SIZE", "DATA_START_INDEX", "PAGE_ADDRESS_START_INDEX", "TOTAL_SHIFT_SIZE", "PROGRAM_MAXWAITTIME",
        "PROGRAM_WAITTIME", "BULKERASE_WAITTIME", "PROGRESS_ERASE_WAITTIME_INC", "BULKERASE_MAXWAITTIME",
        "WRSR_MAXWAITTIME", "DEVICE_SIZE", "IDCODE", "INSTRUCTION_LENGTH", "USE_RES", "USE_UNLOCKSR",
        "READ_STATUS_ENABLED", "X2_READ", "X4_READ", "STATUS_REGISTER_LENGTH",
        "RELEASE_FROM_STANDBY_MAX_WAITTIME"};
    return keys;
}
