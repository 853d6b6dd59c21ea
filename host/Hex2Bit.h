#pragma once
#include "HostExport.h"
#include "RLBitVec.h"

#include <memory>

// Conversions between texts and bit vectors, in wire order.
//
// Binary text: character j is bit j ("10011111" is opcode 0x9F sent MSB
// first). Hexadecimal text: the digits are the bits in wire order, most
// significant digit first, each digit's MSB first, so a flash answering
// EF 40 18 yields "EF4018" and convertHexString2BitVec("EF4018", 24) builds
// exactly those bits. A text with fewer digits than the length needs is
// right-aligned (leading zero bits).
//
// Ownership: texts returned as char* belong to the host's text pool
// (Port::internText): the caller must not free them, and they stay valid
// until the host library is unloaded. Equal texts share one copy, so
// repeated calls do not grow memory.
class VORANT_HOST_API Hex2Bit {
public:
    static std::unique_ptr<RLBitVec> convertBinString2BitVec(const char* text, int length, bool);
    static std::unique_ptr<RLBitVec> convertHexString2BitVec(const char* text, int bits, bool, bool, bool);
    static char* convertBinData2HexString(const unsigned char* data, int bits, bool, bool);
    // The exception to wire order: bit i of value goes to storage bit i of
    // target (the first `bits` bits; bits past 32 become 0). Used for raw
    // bytes that are already in captured order.
    static void convertInt2BitVec(unsigned value, int bits, RLBitVec* target, bool);
};
