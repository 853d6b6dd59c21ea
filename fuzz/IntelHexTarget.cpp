#include "fuzz/FuzzTargets.h"

#include "formats/FormatError.h"
#include "formats/IntelHexImage.h"

#include <sstream>
#include <stdexcept>
#include <string>

namespace vorant::fuzz {

void fuzzIntelHex(const std::uint8_t* data, std::size_t size) {
    std::istringstream in(std::string(reinterpret_cast<const char*>(data), size));
    // A lower ceiling than the reader's own keeps each run fast; the
    // refusal past it is the same code.
    constexpr std::uint64_t kCeilingBytes = 4 << 20;
    try {
        formats::FlashImage image = formats::parseIntelHex(in, "fuzz.hex", kCeilingBytes);
        if (image.byteSize() > kCeilingBytes) throw std::logic_error("the image passed its ceiling");
        // Handed out as a device takes it: pages from 0 that cover the image.
        constexpr int kPageBits = 256 * 8;
        const char* page = nullptr;
        int address = -1;
        std::uint64_t bits = 0;
        for (int n; (n = image.next(&page, &address, kPageBits)) > 0;) {
            if (static_cast<std::uint64_t>(address) * 8 != bits) throw std::logic_error("a page out of order");
            bits += static_cast<std::uint64_t>(n);
        }
        if (bits != image.dataSize()) throw std::logic_error("the pages do not cover the image");
    } catch (const formats::FormatError&) {
    }
}

}  // namespace vorant::fuzz
