#include "ports/jtag/JtagChain.h"

#include <numeric>
#include <stdexcept>

namespace vorant::ports::jtag {

std::size_t JtagChain::irBitsBefore() const {
    return std::accumulate(irLengthsBefore.begin(), irLengthsBefore.end(), std::size_t{0});
}

std::size_t JtagChain::irBitsAfter() const {
    return std::accumulate(irLengthsAfter.begin(), irLengthsAfter.end(), std::size_t{0});
}

namespace {

unsigned irLength(const std::string& text) {
    if (text.empty() || text.size() > 2 || text.find_first_not_of("0123456789") != std::string::npos)
        throw std::invalid_argument("'" + text + "' is not an IR length (1 to 64)");
    const unsigned value = static_cast<unsigned>(std::stoul(text));
    if (value < 1 || value > 64) throw std::invalid_argument("'" + text + "' is not an IR length (1 to 64)");
    return value;
}

}  // namespace

JtagChain parseJtagChain(const std::string& text, unsigned& bridgeIrLength) {
    JtagChain chain;
    bool seenBridge = false;
    std::size_t start = 0;
    while (start <= text.size()) {
        const std::size_t end = std::min(text.find_first_of(",:", start), text.size());
        const std::string item = text.substr(start, end - start);
        if (item.size() >= 2 && item.front() == '[' && item.back() == ']') {
            if (seenBridge) throw std::invalid_argument("two TAPs in brackets; bracket the bridge's TAP only");
            bridgeIrLength = irLength(item.substr(1, item.size() - 2));
            seenBridge = true;
        } else {
            (seenBridge ? chain.irLengthsAfter : chain.irLengthsBefore).push_back(irLength(item));
        }
        start = end + 1;
    }
    if (!seenBridge) throw std::invalid_argument("no TAP in brackets; bracket the bridge's TAP, as in 8,[6],4");
    return chain;
}

std::string formatJtagChain(const JtagChain& chain, unsigned bridgeIrLength) {
    std::string text;
    for (unsigned length : chain.irLengthsBefore) text += std::to_string(length) + ":";
    text += "[" + std::to_string(bridgeIrLength) + "]";
    for (unsigned length : chain.irLengthsAfter) text += ":" + std::to_string(length);
    return text;
}

}  // namespace vorant::ports::jtag
