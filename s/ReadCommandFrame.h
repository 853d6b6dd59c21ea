#pragma once
// The read-command frame of the page reads (verify, checksum, blank check,
// readback) with its companion vectors. Built once per operation and reused
// for every page: the instruction stays, only the address is rewritten.

#include "host/PortString.h"
#include "host/RLBitVec.h"
#include "host/ScanPort.h"

#include <cstddef>

namespace vorant::device {

class ReadCommandFrame {
public:
    ReadCommandFrame(const Port::StringBase<char>& readInstruction, int readSize, int addressStart,
                     int addressSize)
        : frame_(static_cast<std::size_t>(readSize), false),
          tdiMask_(static_cast<std::size_t>(readSize), true),
          tdo_(static_cast<std::size_t>(readSize), false),
          tdoMask_(static_cast<std::size_t>(readSize), false),
          addressStart_(addressStart),
          addressSize_(addressSize) {
        frame_.updateBitField(readInstruction.c_str(), 0);
    }

    // Announces the read with its comment, then opens it: the instruction
    // and the page's byte address in one stage-1 shift, nothing compared.
    // The data phase is the caller's stage-12 shift.
    bool open(ScanPort& port, unsigned address, const char* comment) {
        frame_.updateBitField(address, addressStart_, addressSize_, true);
        port.comment(comment);
        return port.shift(ScanStage::kOpen, &frame_, &tdiMask_, &tdo_, &tdoMask_);
    }

private:
    RLBitVec frame_, tdiMask_, tdo_, tdoMask_;
    int addressStart_, addressSize_;
};

}  // namespace vorant::device
