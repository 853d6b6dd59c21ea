#pragma once
// What "ftdi[:VID:PID][,interface=A|B,serial=S,speed=HZ,cs=PIN]" asks
// for, checked before any USB is touched.

#include "ports/PortAddress.h"
#include "ports/ftdi/FtdiIo.h"

#include <cstdint>
#include <optional>
#include <string>

namespace vorant::ports::ftdi {

constexpr std::uint32_t kDefaultSpeedHz = 6'000'000;
constexpr std::uint32_t kMaxSpeedHz = 30'000'000;
// The slowest SCK: 60 MHz / ((1 + 0xFFFF) * 2), rounded up to a whole Hz.
constexpr std::uint32_t kMinSpeedHz = 458;

struct FtdiRequest {
    std::optional<FtdiUsbId> id;  // none: any of the three MPSSE chips
    char channel = 'A';
    std::string serial;                       // empty: any
    std::uint32_t speedHz = kDefaultSpeedHz;  // as asked
    std::uint16_t divisor = 0;                // the fastest SCK not above it
    unsigned chipSelectPin = 3;               // ADBUS3..ADBUS7
};

// Throws PortError (BadRequest) naming the value and what would be right.
FtdiRequest parseFtdiRequest(const PortAddress& address);

// The divisor of the fastest SCK at or below `hz` (kMinSpeedHz..kMaxSpeedHz).
std::uint16_t divisorAtOrBelow(std::uint32_t hz);

}  // namespace vorant::ports::ftdi
