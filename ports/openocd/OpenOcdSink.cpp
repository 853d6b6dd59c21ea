#include "ports/openocd/OpenOcdSink.h"

#include <cstdio>

namespace vorant::ports::openocd {

namespace {

// A reply may take as long as the sleeps it carries, and then some.
constexpr std::chrono::milliseconds kReplyMargin{30'000};

std::string unbraced(std::string text) {
    while (!text.empty() && (text.back() == '\n' || text.back() == ' ')) text.pop_back();
    if (text.size() >= 2 && text.front() == '{' && text.back() == '}') text = text.substr(1, text.size() - 2);
    while (!text.empty() && (text.back() == '\n' || text.back() == ' ')) text.pop_back();
    return text;
}

}  // namespace

std::string drscanValue(const BitBuffer& bits) {
    static const char digits[] = "0123456789abcdef";
    const std::size_t count = (bits.size() + 3) / 4;
    std::string text = "0x";
    text.reserve(count + 2);
    for (std::size_t d = count; d-- > 0;) {
        unsigned nibble = 0;
        for (unsigned k = 0; k < 4; ++k) {
            const std::size_t bit = d * 4 + k;
            if (bit < bits.size() && bits.bit(bit)) nibble |= 1u << k;
        }
        text += digits[nibble];
    }
    if (count == 0) text += '0';
    return text;
}

bool parseDrscanField(const std::string& text, std::size_t bits, BitBuffer& out) {
    const std::size_t digits = 2 * ((bits + 7) / 8);
    if (text.size() != digits) return false;
    out.assign(bits, false);
    for (std::size_t i = 0; i < digits; ++i) {
        const char c = text[digits - 1 - i];  // i counts from the least significant digit
        unsigned nibble;
        if (c >= '0' && c <= '9') nibble = static_cast<unsigned>(c - '0');
        else if (c >= 'a' && c <= 'f') nibble = static_cast<unsigned>(c - 'a' + 10);
        else return false;
        for (unsigned k = 0; k < 4; ++k)
            if (i * 4 + k < bits && ((nibble >> k) & 1u)) out.setBit(i * 4 + k, true);
    }
    return true;
}

bool parseCaughtReply(const std::string& reply, std::string& code, std::string& text) {
    const std::size_t space = reply.find(' ');
    code = reply.substr(0, space);
    const bool numeric = !code.empty() && code.find_first_not_of("-0123456789") == std::string::npos;
    if (!numeric || space == std::string::npos) {
        code.clear();
        text = reply;
        return false;
    }
    text = unbraced(reply.substr(space + 1));
    return code == "0";
}

bool OpenOcdSink::fail(const std::string& why) {
    error_ = why;
    // After an error the TAP's state is unknown: select the bridge again.
    mayHaveReset_ = true;
    return false;
}

void OpenOcdSink::queue(const std::string& command) {
    if (!queued_.empty()) queued_ += "; ";
    queued_ += command;
    ++stats_.commands;
}

bool OpenOcdSink::send(std::string& result) {
    const std::string request = "list [catch {" + queued_ + "} r] $r";
    const std::chrono::milliseconds timeout = kReplyMargin + std::chrono::milliseconds(queuedSleepMs_);
    queued_.clear();
    queuedSleepMs_ = 0;
    ++stats_.requests;
    std::string reply;
    if (!io_.request(request, reply, timeout)) return fail(io_.error());
    std::string code;
    if (parseCaughtReply(reply, code, result)) return true;
    if (code.empty()) return fail("OpenOCD gave a malformed reply: '" + reply.substr(0, 80) + "'");
    return fail("OpenOCD: " + result);
}

bool OpenOcdSink::flush() {
    if (queued_.empty()) return true;
    std::string result;
    return send(result);
}

bool OpenOcdSink::run(const std::string& command, std::string& result) {
    if (!flush()) return false;
    queue(command);
    return send(result);
}

bool OpenOcdSink::irScan(unsigned bits, std::uint64_t value) {
    (void)bits;  // OpenOCD shifts as many bits as the TAP was declared with
    char text[32];
    std::snprintf(text, sizeof text, "0x%llx", static_cast<unsigned long long>(value));
    queue("irscan " + tap_ + " " + text);
    mayHaveReset_ = false;
    return true;
}

bool OpenOcdSink::drScan(const BitBuffer& tdi, BitBuffer* tdo) {
    queue("drscan " + tap_ + " " + std::to_string(tdi.size()) + " " + drscanValue(tdi));
    if (tdo == nullptr) return true;
    std::string result;
    if (!send(result)) return false;
    if (!parseDrscanField(result, tdi.size(), *tdo))
        return fail("OpenOCD answered a " + std::to_string(tdi.size()) + "-bit drscan with '" + result.substr(0, 80) +
                    "', not " + std::to_string(2 * ((tdi.size() + 7) / 8)) + " hex digits");
    return true;
}

// OpenOCD sleeps in whole milliseconds; a wait never runs short.
bool OpenOcdSink::idle(std::uint64_t microseconds) {
    const std::uint64_t ms = (microseconds + 999) / 1000;
    queue("sleep " + std::to_string(ms));
    queuedSleepMs_ += ms;
    return true;
}

}  // namespace vorant::ports::openocd
