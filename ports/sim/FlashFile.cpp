#include "ports/sim/FlashFile.h"

#include "host/VorantException.h"

#include <algorithm>
#include <cstring>
#include <filesystem>
#include <system_error>

namespace vorant::sim {

namespace {

constexpr char kMagic[8] = {'V', 'S', 'I', 'M', 'F', 'L', 'S', 'H'};
constexpr std::size_t kChunkBytes = 1 << 16;

}  // namespace

FlashFile::FlashFile(const std::string& path, std::size_t sizeBytes) : path_(path), sizeBytes_(sizeBytes) {
    namespace fs = std::filesystem;
    const fs::path filePath(path);
    std::error_code error;
    const bool exists = fs::exists(filePath, error);
    if (error) fail("cannot be examined: " + error.message());
    if (exists && fs::is_directory(filePath, error)) fail("is a directory, not a flash file");

    std::uintmax_t existingSize = 0;
    if (exists) {
        existingSize = fs::file_size(filePath, error);
        if (error) fail("cannot be examined: " + error.message());
    }
    const std::uintmax_t expected = sizeBytes_ + kTrailerBytes;
    if (exists && existingSize != 0 && existingSize != expected) {
        fail("holds " + std::to_string(existingSize) + " bytes; a flash file of this part holds " +
             std::to_string(expected) + " (" + std::to_string(sizeBytes_) + " bytes of flash and a " +
             std::to_string(kTrailerBytes) + "-byte status trailer)");
    }

    if (!exists || existingSize == 0) {
        createErased();
    } else {
        // Check the trailer before anything is written.
        std::ifstream probe(filePath, std::ios::binary);
        if (!probe) fail("cannot be opened for reading");
        char trailer[kTrailerBytes];
        probe.seekg(static_cast<std::streamoff>(sizeBytes_));
        if (!probe.read(trailer, sizeof trailer)) fail("cannot be read");
        if (std::memcmp(trailer, kMagic, sizeof kMagic) != 0)
            fail("is not a simulated flash file (its status trailer is missing)");
    }

    stream_.open(filePath, std::ios::in | std::ios::out | std::ios::binary);
    if (!stream_) fail("cannot be opened for reading and writing");
}

void FlashFile::fail(const std::string& what) const {
    throw VorantException("flash file '" + path_ + "' " + what);
}

void FlashFile::createErased() {
    std::ofstream out(std::filesystem::path(path_), std::ios::binary | std::ios::trunc);
    if (!out) fail("cannot be created");
    const std::vector<char> erased(kChunkBytes, static_cast<char>(0xFF));
    for (std::size_t done = 0; done < sizeBytes_;) {
        const std::size_t n = std::min(kChunkBytes, sizeBytes_ - done);
        out.write(erased.data(), static_cast<std::streamsize>(n));
        done += n;
    }
    char trailer[kTrailerBytes] = {};
    std::memcpy(trailer, kMagic, sizeof kMagic);
    out.write(trailer, sizeof trailer);
    out.close();
    if (!out) fail("cannot be written");
}

void FlashFile::load(std::vector<std::uint8_t>& memory, std::uint8_t& status1, std::uint8_t& status2) {
    std::vector<std::uint8_t> contents(sizeBytes_);
    char trailer[kTrailerBytes];
    stream_.seekg(0);
    stream_.read(reinterpret_cast<char*>(contents.data()), static_cast<std::streamsize>(contents.size()));
    stream_.read(trailer, sizeof trailer);
    if (!stream_) fail("cannot be read");
    memory = std::move(contents);
    status1 = static_cast<std::uint8_t>(trailer[8]) & 0xFC;
    status2 = static_cast<std::uint8_t>(trailer[9]);
}

void FlashFile::writeMemory(std::size_t offset, const std::uint8_t* data, std::size_t length) {
    stream_.seekp(static_cast<std::streamoff>(offset));
    stream_.write(reinterpret_cast<const char*>(data), static_cast<std::streamsize>(length));
    stream_.flush();
    if (!stream_) fail("cannot be written");
}

void FlashFile::writeStatus(std::uint8_t status1, std::uint8_t status2) {
    const char bytes[2] = {static_cast<char>(status1 & 0xFC), static_cast<char>(status2)};
    stream_.seekp(static_cast<std::streamoff>(sizeBytes_ + sizeof kMagic));
    stream_.write(bytes, sizeof bytes);
    stream_.flush();
    if (!stream_) fail("cannot be written");
}

}  // namespace vorant::sim
