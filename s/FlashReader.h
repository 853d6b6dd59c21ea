#pragma once
// Reads flash bytes a page per transaction for the block path (what a block
// holds before it is erased, and what it holds after it is written), with
// one read frame and one capture reused for every page.

#include "s/ReadCommandFrame.h"

#include "host/RLBitVec.h"
#include "host/ScanPort.h"

#include <cstddef>

namespace vorant::device {

class FlashReader {
public:
    FlashReader(ScanPort& port, const Port::StringBase<char>& readInstruction, int readSize, int addressStart,
                int addressSize, std::size_t pageBytes);

    // Reads `count` bytes from `address` on into `bytes`, as they sit in the
    // flash. With `expected`, each capture starts as those bytes: what a
    // recording compares, and what a cable overwrites with what it read.
    // False when a shift failed; `bytes` then holds what was read so far.
    bool read(unsigned address, unsigned char* bytes, std::size_t count, const unsigned char* expected = nullptr);

private:
    ScanPort& port_;
    ReadCommandFrame command_;
    std::size_t pageBytes_;
    RLBitVec ones_, capture_;
};

}  // namespace vorant::device
