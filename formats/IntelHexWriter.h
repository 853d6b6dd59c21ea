#pragma once
#include "formats/RecordFileWriter.h"

#include <cstdint>
#include <string>
#include <vector>

namespace vorant::formats {

struct IntelHexLayout {
    int bytesPerRecord = 16;  // 16 or 32
    bool crlf = false;        // CRLF line endings (.mcs); LF otherwise (.hex)
};

// Writes a readback as Intel HEX: data records of bytesPerRecord bytes,
// aligned to multiples of that size, an 04 record before the first data
// record and wherever the upper 16 address bits change, an 01 record at the
// end. Captured bytes are bit-reversed back to flash bytes.
//
// Records are streamed, so data must arrive in ascending order: each call
// starts at or past the end of the data before it (gaps become holes, which
// read 0xFF). Data below that end are refused: writeData answers false,
// errorMessage() says why, and endWrite() leaves the target untouched.
class IntelHexWriter final : public RecordFileWriter {
public:
    // Throws FormatError when path cannot be written (creating nothing), and
    // std::invalid_argument for a record size other than 16 or 32.
    IntelHexWriter(const std::string& path, IntelHexLayout layout);

private:
    bool finishData() override;
    void emitRecord(std::uint64_t address, const unsigned char* bytes, std::size_t count) override;
    bool afterData() override;
    void appendRecord(unsigned char type, unsigned address, const unsigned char* data, std::size_t count);
    void appendByte(unsigned value);
    bool writeText();

    const char* const lineEnd_;
    long long upperAddress_ = -1;      // upper 16 bits announced by the last 04 record
    std::string text_;
    unsigned checksum_ = 0;
};

}  // namespace vorant::formats
