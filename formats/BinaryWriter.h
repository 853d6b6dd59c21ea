#pragma once
#include "formats/AtomicFileWriter.h"

#include <cstdint>
#include <vector>

namespace vorant::formats {

// Writes a readback as a raw binary file: flash byte k at file offset k.
// Captured bytes are bit-reversed back to flash bytes. Data may arrive at
// any offset: a gap before new data is filled with 0xFF (what erased flash
// reads), data below the end overwrite what is there (not on a stream such
// as a FIFO or standard output, which takes data in ascending order only).
class BinaryWriter final : public AtomicFileWriter {
public:
    // Throws FormatError when path cannot be written; creates nothing then.
    explicit BinaryWriter(const std::string& path);

    bool writeData(const unsigned char* data, int offset, int bits, int reserved) override;

private:
    bool finishData() override { return true; }
    bool fillTo(std::uint64_t offset);

    std::uint64_t position_ = 0;  // where the stream stands
    std::uint64_t length_ = 0;    // bytes in the file so far
    std::vector<unsigned char> flashBytes_;
};

}  // namespace vorant::formats
