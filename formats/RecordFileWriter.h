#pragma once
#include "formats/AtomicFileWriter.h"

#include <cstdint>
#include <string>
#include <vector>

namespace vorant::formats {

// The part the text formats share: captured data, arriving in ascending
// order, are cut into records of recordBytes aligned bytes (a record never
// crosses a multiple of its size), each handed to emitRecord() as flash
// bytes once it is full or the data jump ahead. Data below what was
// written already are refused: the file is a stream.
class RecordFileWriter : public AtomicFileWriter {
public:
    bool writeData(const unsigned char* data, int offset, int bits, int reserved) final;

protected:
    // formatName goes into the refusal of out-of-order data.
    RecordFileWriter(const std::string& target, std::size_t recordBytes, std::string formatName);

    // One full or last record.
    virtual void emitRecord(std::uint64_t address, const unsigned char* bytes, std::size_t count) = 0;
    // Whether [address, address + count) can be written at all; false after
    // fail() with the reason.
    virtual bool acceptRange(std::uint64_t /*address*/, std::size_t /*count*/) { return true; }
    // After each call's records: a format may write its text out.
    virtual bool afterData() { return true; }

    // Hands over the record being collected, if any.
    void flushRecord();

private:
    const std::size_t recordBytes_;
    const std::string formatName_;
    std::uint64_t nextAddress_ = 0;    // the end of the data so far
    std::uint64_t recordAddress_ = 0;  // address of pending_[0]
    std::vector<unsigned char> pending_;
};

}  // namespace vorant::formats
