#pragma once
// The backing file of a simulated flash: the array followed by a 16-byte
// trailer holding the non-volatile status bits, so a chip keeps its
// contents between runs.
//
// Layout: sizeBytes bytes of the array (flash address 0 first, so the file
// compares byte for byte with an image), then the trailer: the eight bytes
// "VSIMFLSH", status register 1 (WIP and WEL cleared), status register 2,
// six zero bytes.
//
// A new file is written whole under a temporary name beside it and then
// renamed, so a run that is killed or meets a full disk while making it
// leaves no file cut short. Changes are written through as they happen (one
// page per program, one sector or the whole array per erase, two bytes per
// status write), and flushed, so a run that is killed leaves every
// completed operation in the file.

#include "ports/sim/FlashFileError.h"

#include <cstddef>
#include <cstdint>
#include <fstream>
#include <string>
#include <vector>

namespace vorant::sim {

class FlashFile {
public:
    static constexpr std::size_t kTrailerBytes = 16;

    // Opens the file of a sizeBytes flash. A missing or empty file is
    // created erased (all 0xFF, both status registers 0). Throws
    // FlashFileError naming the file when it cannot be opened, read or
    // created (a full disk named as such), belongs to a chip of another
    // size, is cut short, or lacks the trailer; the file is then left as
    // it was.
    FlashFile(const std::string& path, std::size_t sizeBytes);

    const std::string& path() const { return path_; }

    // The contents as found on opening, read into `memory` (resized to the
    // flash); throws FlashFileError, with `memory` undefined, when they
    // cannot be read.
    void load(std::vector<std::uint8_t>& memory, std::uint8_t& status1, std::uint8_t& status2);

    void writeMemory(std::size_t offset, const std::uint8_t* data, std::size_t length);
    void writeStatus(std::uint8_t status1, std::uint8_t status2);

private:
    [[noreturn]] void fail(const std::string& what) const;
    [[noreturn]] void fail(FlashFileError::Kind kind, const std::string& what) const;
    [[noreturn]] void refuseSize(std::uintmax_t existingSize) const;
    void createErased();

    std::string path_;
    std::size_t sizeBytes_;
    std::fstream stream_;
};

}  // namespace vorant::sim
