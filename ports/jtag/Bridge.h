#pragma once
// A JTAG-to-SPI bridge: how one SPI transaction becomes an instruction
// selection and one DR scan, and where MISO comes back in the scan's TDO.
//
// Bits are in scan order (bit 0 shifted first). The plug-in's vectors are
// already in SPI order (bit 0 the first bit on MOSI), so the MOSI bits go
// into the DR as they are; each bridge adds its own framing around them.

#include "ports/jtag/JtagChain.h"
#include "ports/wire/BitBuffer.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>

namespace vorant::ports::jtag {

struct BridgeSettings {
    std::string name = "jtagspi";
    unsigned irLength = 6;
    std::uint64_t instruction = 0x02;  // USER1 of a 6-bit IR
    // Clocks MISO comes back late; unset: the bridge's own default.
    std::optional<unsigned> misoDelay;
    JtagChain chain;
};

class Bridge {
public:
    virtual ~Bridge() = default;
    virtual std::string name() const = 0;
    // Whether the bridge is reached through an instruction (false: the
    // ideal bridge, which needs none).
    virtual bool selectsInstruction() const { return true; }

    // The DR scan of one transaction of mosi.size() bits. `reads`: the
    // transaction captures or compares MISO, so the scan runs on until the
    // last MISO bit is out.
    virtual void encode(const BitBuffer& mosi, bool reads, BitBuffer& dr) const = 0;
    // The TDO bit of the DR scan that carries MISO bit 0; MISO bit k is at
    // misoOffset() + k.
    virtual std::size_t misoOffset() const = 0;

    // The MISO bits of a transaction of `spiBits` bits out of the TDO of
    // its DR scan.
    void decode(const std::uint8_t* drTdo, std::size_t spiBits, BitBuffer& miso) const;
};

// The bridges by name: "jtagspi", "shiftdr", "direct". Throws
// std::invalid_argument naming the known ones for any other.
std::unique_ptr<Bridge> makeBridge(const BridgeSettings& settings);
// "jtagspi, shiftdr, direct"
const char* bridgeNames();

}  // namespace vorant::ports::jtag
