#pragma once
// Helpers shared by the format tests: a private scratch directory, file
// contents, and flash bytes handed to a writer the way a readback does.
#include "formats/ConfigDataFiles.h"
#include "formats/FormatError.h"
#include "tests/support/ScratchFolder.h"

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <random>
#include <string>
#include <vector>

namespace vorant::formats::testing {

using Bytes = std::vector<unsigned char>;
namespace fs = std::filesystem;

using ScratchDirectory = vorant::test::ScratchFolder;

template <class Content> void writeFile(const std::string& path, const Content& content) {
    std::ofstream(path, std::ios::binary).write(reinterpret_cast<const char*>(content.data()), content.size());
}
template <class Content = Bytes> Content readFile(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    return Content(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}
inline Bytes randomBytes(std::size_t count, unsigned seed) {
    std::mt19937 generator(seed);
    Bytes bytes(count);
    for (auto& byte : bytes) byte = static_cast<unsigned char>(generator());
    return bytes;
}

// Hands flash bytes to a writer as a readback does: one page per call, each
// byte captured with its bit order reversed (flash 0x01 arrives as 0x80).
inline bool writePages(ConfigDataWriter& writer, const Bytes& flash, int offset, std::size_t pageBytes) {
    Bytes capture(flash.size());
    for (std::size_t i = 0; i < flash.size(); ++i)
        for (int bit = 0; bit < 8; ++bit) capture[i] |= static_cast<unsigned char>(((flash[i] >> bit) & 1) << (7 - bit));
    bool ok = true;
    for (std::size_t start = 0; start < capture.size(); start += pageBytes)
        ok &= writer.writeData(capture.data() + start, offset + int(start), int(std::min(pageBytes, capture.size() - start) * 8), 0);
    return ok;
}

// The text of the FormatError that action throws, "" when it throws none.
template <class Action> std::string formatErrorOf(Action&& action) {
    try { action(); } catch (const FormatError& error) { return error.what(); }
    return "";
}

}  // namespace vorant::formats::testing
