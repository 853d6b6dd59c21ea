#pragma once
// CRC-32 (the zlib one) computed a bit at a time: the figure a user gets
// from any checksum tool, kept apart from every CRC of the project.

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <string>

namespace vorant::test {

inline std::uint32_t referenceCrc32(const void* data, std::size_t count) {
    const auto* bytes = static_cast<const unsigned char*>(data);
    std::uint32_t crc = 0xFFFFFFFFu;
    for (std::size_t i = 0; i < count; ++i) {
        crc ^= bytes[i];
        for (int bit = 0; bit < 8; ++bit) crc = (crc >> 1) ^ (0xEDB88320u & (0u - (crc & 1u)));
    }
    return ~crc;
}
// As the tool prints it: "0x" and eight upper-case hex digits.
inline std::string referenceCrc32Text(const void* data, std::size_t count) {
    char text[16];
    std::snprintf(text, sizeof text, "0x%08X", static_cast<unsigned>(referenceCrc32(data, count)));
    return text;
}

}  // namespace vorant::test
