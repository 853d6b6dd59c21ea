#include "tests/doubles/FakeTclRpc.h"

#include "ports/jtag/board/BoardScans.h"

#include <sstream>

namespace vorant::test {

namespace {

std::vector<std::string> words(const std::string& text) {
    std::istringstream in(text);
    std::vector<std::string> out;
    for (std::string word; in >> word;) out.push_back(word);
    return out;
}

// "0x..." as OpenOCD reads a scan value, into `bits` bits.
bool hexValue(const std::string& text, std::size_t bits, ports::BitBuffer& out) {
    if (text.rfind("0x", 0) != 0) return false;
    out.assign(bits, false);
    const std::string digits = text.substr(2);
    for (std::size_t i = 0; i < digits.size(); ++i) {
        const char c = digits[digits.size() - 1 - i];
        const int nibble = std::isdigit(static_cast<unsigned char>(c)) ? c - '0'
                           : (c >= 'a' && c <= 'f')                   ? c - 'a' + 10
                           : (c >= 'A' && c <= 'F')                   ? c - 'A' + 10
                                                                      : -1;
        if (nibble < 0) return false;
        for (int k = 0; k < 4; ++k)
            if (i * 4 + static_cast<std::size_t>(k) < bits && ((nibble >> k) & 1)) out.setBit(i * 4 + k, true);
    }
    return true;
}

// A field as OpenOCD prints it: 2 * ceil(n / 8) lower-case digits.
std::string hexField(const ports::BitBuffer& bits) {
    static const char digits[] = "0123456789abcdef";
    const std::size_t count = 2 * ((bits.size() + 7) / 8);
    std::string text;
    for (std::size_t d = count; d-- > 0;) {
        int nibble = 0;
        for (int k = 0; k < 4; ++k)
            if (d * 4 + k < bits.size() && bits.bit(d * 4 + k)) nibble |= 1 << k;
        text += digits[nibble];
    }
    return text;
}

}  // namespace

FakeTclRpc::FakeTclRpc(ports::jtag::BoardModel& board, std::string tap) : board_(board), tap_(std::move(tap)) {
    ports::jtag::resetToIdle(board_);
}

bool FakeTclRpc::execute(const std::string& command, std::string& result) {
    const std::vector<std::string> w = words(command);
    result.clear();
    if (w.empty()) return true;
    if (w[0] == "jtag" && w.size() == 2 && w[1] == "names") {
        result = tap_;
        return true;
    }
    if (w[0] == "scan_chain" && w.size() == 1) {
        result = "   TapName             Enabled  IdCode     Expected   IrLen IrCap IrMask\n"
                 "-- ------------------- -------- ---------- ---------- ----- ----- ------\n"
                 " 0 " + tap_ + "               Y     0x0362d093 0x0362d093     " +
                 std::to_string(board_.settings().irLength) + " 0x01  0x03\n";
        return true;
    }
    if ((w[0] == "irscan" || w[0] == "drscan") && (w.size() < 2 || w[1] != tap_)) {
        result = "Tap '" + (w.size() > 1 ? w[1] : std::string()) + "' could not be found";
        return false;
    }
    ports::BitBuffer tdi, tdo;
    if (w[0] == "irscan" && w.size() == 3) {
        if (!hexValue(w[2], board_.settings().irLength, tdi)) return result = "bad value", false;
        ports::jtag::scanIr(board_, tdi, tdo);
        return true;
    }
    if (w[0] == "drscan" && w.size() == 4) {
        const std::size_t bits = std::stoul(w[2]);
        if (!hexValue(w[3], bits, tdi)) return result = "bad value", false;
        ports::jtag::scanDr(board_, tdi, tdo);
        result = hexField(tdo);
        return true;
    }
    if (w[0] == "sleep" && w.size() == 2) {
        board_.flash().advance(std::stoull(w[1]) * 1'000'000ull);
        return true;
    }
    result = "invalid command name \"" + w[0] + "\"";
    return false;
}

bool FakeTclRpc::request(const std::string& line, std::string& reply, std::chrono::milliseconds) {
    log.push_back(line);
    const int number = static_cast<int>(log.size());
    if (closed_ || (closeAtRequest > 0 && number >= closeAtRequest)) {
        closed_ = true;
        error_ = "OpenOCD closed the connection";
        return false;
    }
    const std::string open = "list [catch {", close = "} r] $r";
    if (line.rfind(open, 0) != 0 || line.size() < open.size() + close.size() ||
        line.compare(line.size() - close.size(), close.size(), close) != 0) {
        reply = "invalid command name \"" + line.substr(0, line.find(' ')) + "\"";
        return true;
    }
    const std::string body = line.substr(open.size(), line.size() - open.size() - close.size());
    std::string result;
    bool ok = true;
    std::size_t start = 0;
    while (ok && start <= body.size()) {
        const std::size_t end = std::min(body.find(';', start), body.size());
        ok = execute(body.substr(start, end - start), result);
        start = end + 1;
    }
    if (garbleAtRequest == number) {
        reply = garbledReply;
        return true;
    }
    reply = ok ? "0 " + (result.empty() ? std::string("{}") : result) : "1 {" + result + "}";
    return true;
}

}  // namespace vorant::test
