// Chunking of configuration data and the reader factory's file checks.
#include "formats/ConfigDataFiles.h"
#include "formats/FlashImage.h"
#include "formats/FormatError.h"
#include "tests/formats/FormatsTestFiles.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <unistd.h>

namespace vorant::formats {
namespace {
using testing::Bytes;

struct Chunk {
    int bits;
    int address;
    Bytes page;  // the whole page buffer the caller may read
};

std::vector<Chunk> drain(ConfigDataReader& reader, int pageBits) {
    std::vector<Chunk> chunks;
    reader.rewind();
    for (;;) {
        const char* data = nullptr;
        int address = -1;
        const int bits = reader.next(&data, &address, pageBits);
        if (bits == 0) break;
        const auto* bytes = reinterpret_cast<const unsigned char*>(data);
        chunks.push_back({bits, address, Bytes(bytes, bytes + pageBits / 8)});
    }
    return chunks;
}

struct ChunkingCase {
    const char* name;
    std::size_t imageBytes;
    int pageBits;
};
void PrintTo(const ChunkingCase& value, std::ostream* out) { *out << value.name; }

class FlashImageChunking : public ::testing::TestWithParam<ChunkingCase> {};

TEST_P(FlashImageChunking, PagesFromZeroUpWithPaddedShortTail) {
    const auto& param = GetParam();
    const Bytes content = testing::randomBytes(param.imageBytes, 7);
    FlashImage image(content);
    EXPECT_EQ(image.dataSize(), param.imageBytes * 8);

    const std::size_t pageBytes = static_cast<std::size_t>(param.pageBits) / 8;
    const auto chunks = drain(image, param.pageBits);
    ASSERT_EQ(chunks.size(), (param.imageBytes + pageBytes - 1) / pageBytes);
    for (std::size_t k = 0; k < chunks.size(); ++k) {
        const std::size_t start = k * pageBytes;
        const std::size_t delivered = std::min(pageBytes, param.imageBytes - start);
        SCOPED_TRACE("chunk " + std::to_string(k));
        EXPECT_EQ(chunks[k].address, static_cast<int>(start));
        EXPECT_EQ(chunks[k].bits, static_cast<int>(delivered * 8));
        Bytes expected(content.begin() + start, content.begin() + start + delivered);
        expected.resize(pageBytes, 0xFF);
        EXPECT_EQ(chunks[k].page, expected);
    }
    // A second pass after rewind delivers the same chunks again.
    EXPECT_EQ(drain(image, param.pageBits).size(), chunks.size());
}

INSTANTIATE_TEST_SUITE_P(
    Sizes, FlashImageChunking,
    ::testing::Values(ChunkingCase{"TwoAndAHalfPages", 640, 256 * 8}, ChunkingCase{"OddLength", 1001, 256 * 8},
                      ChunkingCase{"ExactPages", 1024, 256 * 8}, ChunkingCase{"ShorterThanOnePage", 3, 256 * 8},
                      ChunkingCase{"OneBytePages", 5, 8}, ChunkingCase{"SmallPages", 100, 64},
                      ChunkingCase{"Empty", 0, 256 * 8}),
    [](const auto& info) { return std::string(info.param.name); });

TEST(FlashImage, PageThatIsNotWholeBytesIsRefused) {
    FlashImage image(Bytes(16, 0));
    const char* data = nullptr;
    int address = 0;
    for (int bits : {0, -8, 12}) {
        EXPECT_THROW(image.next(&data, &address, bits), std::invalid_argument) << bits;
    }
}

TEST(OpenConfigData, BinaryOfAnyUnknownExtensionIsTheFileBytes) {
    testing::ScratchDirectory dir;
    const Bytes content = testing::randomBytes(333, 3);
    for (const char* name : {"image.bin", "image.BIN", "image.dat", "image"}) {
        testing::writeFile(dir.file(name), content);
        const FlashImage image = loadFlashImage(dir.file(name));
        EXPECT_EQ(image.bytes(), content) << name;
    }
}

TEST(OpenConfigData, HexExtensionsIgnoreCase) {
    testing::ScratchDirectory dir;
    for (const char* name : {"a.hex", "b.HEX", "c.mcs", "d.Mcs"}) {
        testing::writeFile(dir.file(name), ":0100020042BB\n:00000001FF\n");
        const FlashImage image = loadFlashImage(dir.file(name));
        EXPECT_EQ(image.bytes(), (Bytes{0xFF, 0xFF, 0x42})) << name;
    }
}

struct UnusableInput {
    const char* name;
    const char* fileName;
    const char* content;  // null: no file is made
    const char* reason;
};
void PrintTo(const UnusableInput& value, std::ostream* out) { *out << value.name; }

class OpenConfigDataRefuses : public ::testing::TestWithParam<UnusableInput> {};

TEST_P(OpenConfigDataRefuses, WithAMessageNamingTheFile) {
    const auto& param = GetParam();
    testing::ScratchDirectory dir;
    const std::string path = dir.file(param.fileName);
    if (param.content) testing::writeFile(path, std::string(param.content));
    try {
        openConfigData(path);
        FAIL() << "no error";
    } catch (const FormatError& error) {
        const std::string message = error.what();
        EXPECT_NE(message.find(path), std::string::npos) << message;
        EXPECT_NE(message.find(param.reason), std::string::npos) << message;
    }
}

INSTANTIATE_TEST_SUITE_P(
    Files, OpenConfigDataRefuses,
    ::testing::Values(UnusableInput{"MissingBinary", "none.bin", nullptr, "no such file"},
                      UnusableInput{"MissingHex", "none.mcs", nullptr, "no such file"},
                      UnusableInput{"EmptyBinary", "empty.bin", "", "empty image"},
                      UnusableInput{"EmptyHex", "empty.hex", "", "empty image"},
                      UnusableInput{"HexWithoutData", "eof.hex", ":00000001FF\n", "empty image"}),
    [](const auto& info) { return std::string(info.param.name); });

TEST(OpenConfigData, DirectoryIsRefused) {
    testing::ScratchDirectory dir;
    std::filesystem::create_directory(dir.path() / "image.bin");
    EXPECT_THROW(openConfigData(dir.file("image.bin")), FormatError);
}

TEST(OpenConfigData, UnreadableFileIsRefused) {
    if (geteuid() == 0) GTEST_SKIP() << "root reads any file";
    testing::ScratchDirectory dir;
    const std::string path = dir.file("locked.bin");
    testing::writeFile(path, Bytes{1, 2, 3});
    std::filesystem::permissions(path, std::filesystem::perms::none);
    EXPECT_THROW(openConfigData(path), FormatError);
}

}  // namespace
}  // namespace vorant::formats
