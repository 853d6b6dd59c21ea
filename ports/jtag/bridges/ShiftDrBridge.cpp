#include "ports/jtag/bridges/ShiftDrBridge.h"

namespace vorant::ports::jtag {

void ShiftDrBridge::encode(const BitBuffer& mosi, bool reads, BitBuffer& dr) const {
    dr = mosi;
    if (reads) dr.appendZeros(delay_);
}

}  // namespace vorant::ports::jtag
