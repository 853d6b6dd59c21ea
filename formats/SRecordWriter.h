#pragma once
#include "formats/RecordFileWriter.h"

#include <cstdint>
#include <string>
#include <vector>

namespace vorant::formats {

// Writes a readback as Motorola S-records: an S0 header, data records of
// 32 bytes at aligned addresses, all of one type, a count record (S5, or S6
// past 65535 records) and the matching end record. The type follows the
// name: S1/S9 for .s19 (64 KiB), S2/S8 for .s28 (16 MiB), S3/S7 otherwise.
// Captured bytes are bit-reversed back to flash bytes. Data arrive in
// ascending order, as for Intel HEX; data past the type's reach are
// refused.
class SRecordWriter final : public RecordFileWriter {
public:
    // Throws FormatError when path cannot be written; creates nothing then.
    explicit SRecordWriter(const std::string& path);

private:
    bool finishData() override;
    void emitRecord(std::uint64_t address, const unsigned char* bytes, std::size_t count) override;
    bool acceptRange(std::uint64_t address, std::size_t count) override;
    bool afterData() override;
    void appendRecord(int type, std::uint64_t address, int addressBytes, const unsigned char* data,
                      std::size_t count);
    void appendByte(unsigned value);
    bool writeText();

    int dataType_;      // 1, 2 or 3
    int addressBytes_;  // 2, 3 or 4
    std::uint64_t records_ = 0;
    std::string text_;
    unsigned sum_ = 0;
};

}  // namespace vorant::formats
