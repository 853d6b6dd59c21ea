#include "Hex2Bit.h"

#include "PortString.h"
#include "VorantException.h"

#include <algorithm>
#include <cctype>
#include <cstring>
#include <string>

namespace {

int hexDigitValue(char c) {
    if (c >= '0' && c <= '9') return c - '0';
    c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
    if (c >= 'A' && c <= 'F') return c - 'A' + 10;
    return -1;
}

}  // namespace

std::unique_ptr<RLBitVec> Hex2Bit::convertBinString2BitVec(const char* text, int length, bool) {
    if (length < 0) throw VorantException("a bit vector cannot have a negative length");
    auto vector = std::make_unique<RLBitVec>(static_cast<std::size_t>(length), false);
    const std::size_t available = text ? std::strlen(text) : 0;
    if (available < static_cast<std::size_t>(length))
        throw VorantException(std::string("'") + (text ? text : "") + "' holds fewer than " +
                              std::to_string(length) + " bits");
    if (length > 0) vector->updateBitField(std::string(text, static_cast<std::size_t>(length)).c_str(), 0);
    return vector;
}

std::unique_ptr<RLBitVec> Hex2Bit::convertHexString2BitVec(const char* text, int bits, bool, bool, bool) {
    if (bits < 0) throw VorantException("a bit vector cannot have a negative length");
    auto vector = std::make_unique<RLBitVec>(static_cast<std::size_t>(bits), false);
    const std::string digits = text ? text : "";
    // Right-aligned: the last digit holds the last four bits.
    long long bit = static_cast<long long>(bits) - 4 * static_cast<long long>(digits.size());
    for (char c : digits) {
        const int value = hexDigitValue(c);
        if (value < 0) throw VorantException("'" + digits + "' is not a hexadecimal text");
        for (int b = 3; b >= 0; --b, ++bit) {
            const bool set = (value >> b) & 1;
            // A text wider than the vector keeps its low-order digits: the
            // 8-bit signature read preloads itself from a 24-bit ID text.
            if (bit < 0) continue;
            vector->setBit(static_cast<std::size_t>(bit), set);
        }
    }
    return vector;
}

char* Hex2Bit::convertBinData2HexString(const unsigned char* data, int bits, bool, bool) {
    static const char kDigits[] = "0123456789ABCDEF";
    std::string text;
    if (bits > 0 && data) {
        // Leading pad bits make the text right-aligned like the reverse
        // conversion expects.
        const int pad = (4 - bits % 4) % 4;
        int value = 0;
        int filled = pad;
        for (int i = 0; i < bits; ++i) {
            value = (value << 1) | ((data[i / 8] >> (i % 8)) & 1);
            if (++filled == 4) {
                text += kDigits[value];
                value = 0;
                filled = 0;
            }
        }
    }
    return Port::internText(text.c_str());
}

void Hex2Bit::convertInt2BitVec(unsigned value, int bits, RLBitVec* target, bool) {
    if (!target) return;
    const int count = std::min<int>(bits, static_cast<int>(target->length()));
    for (int i = 0; i < count; ++i) target->setBit(static_cast<std::size_t>(i), i < 32 && ((value >> i) & 1u));
}
