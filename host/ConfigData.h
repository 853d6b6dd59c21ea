#pragma once
#include "HostExport.h"

#include <functional>
#include <memory>
#include <string>

// The source of the data a device programs and compares.
class VORANT_HOST_API ConfigDataReader {
public:
    virtual ~ConfigDataReader();
    // Size of the data in bits.
    virtual unsigned dataSize() = 0;
    // Back to the first chunk; called before the first next().
    virtual void rewind() = 0;
    // The next chunk of at most maxBits bits: *data points to its bytes (in
    // flash order; the buffer always holds at least maxBits bits, padded with
    // 0xFF past the data), *address to its flash byte address. Returns the
    // number of bits delivered; 0 when no data remain.
    virtual int next(const char** data, int* address, int maxBits) = 0;

    // Added after the operations above, so their places in the table stay.
    // The data exactly as the file holds them, one piece per call, in
    // ascending address order: a piece is at most maxBits long and never
    // crosses a multiple of maxBits / 8 bytes (a page), and the holes
    // between the file's ranges are skipped. Same contract as next()
    // otherwise; rewind() restarts both. By default the pieces are next()'s
    // chunks: a reader that knows no holes has none.
    virtual int nextPiece(const char** data, int* address, int maxBits);
};

// Writes a readback file. Pages arrive as captured: each buffer byte holds
// eight bits in the order they were read (first bit in bit 0), so a writer
// reverses each byte to get the flash byte back.
class VORANT_HOST_API ConfigDataWriter {
public:
    virtual ~ConfigDataWriter();

    // A writer for fileName, the format picked from its extension among the
    // registered formats (the format registered for "" is the fallback).
    // Returns null, and creates no file, when the file cannot be written or
    // no format is registered.
    static ConfigDataWriter* CreateWriter(const char* fileName, const char* partName,
                                          ConfigDataReader* reader);

    // Creates a writer for a file; returns null when the file cannot be
    // written.
    using Factory = std::function<std::unique_ptr<ConfigDataWriter>(const std::string& fileName)>;
    // Registers (or replaces) the factory for a lower-case extension with
    // its dot (".bin", ".mcs"), or "" for the fallback.
    static void registerFormat(const std::string& extension, Factory factory);

    virtual bool beginWrite() = 0;
    // bits of captured data at a flash byte offset; reserved is 0.
    virtual bool writeData(const unsigned char* data, int offset, int bits, int reserved) = 0;
    // Completes the file. The host's writers leave it complete but
    // unpublished (PendingOutputs): the host publishes it when the whole
    // operation succeeded. A writer destroyed before endWrite leaves no file
    // under the final name.
    virtual bool endWrite() = 0;
};

// The host's view of the configuration's format details.
class VORANT_HOST_API CifReader {
public:
    virtual ~CifReader();
    // 4 when the configuration is read four bits wide.
    virtual int getDataWidth() = 0;
};
