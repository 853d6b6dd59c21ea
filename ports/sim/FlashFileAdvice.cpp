#include "ports/sim/FlashFileAdvice.h"

#include "ports/sim/FlashFileError.h"

namespace vorant::sim {

std::string flashFileAdvice(const std::exception& problem) {
    using Kind = FlashFileError::Kind;
    const auto* fileError = dynamic_cast<const FlashFileError*>(&problem);
    const Kind kind = fileError ? fileError->kind() : Kind::Unusable;
    switch (kind) {
    case Kind::Truncated: return "remove it to start again from an erased flash, or give a new file name";
    case Kind::DiskFull: return "make room on the disk, or give a file name on a disk with room";
    case Kind::OtherChip:
    case Kind::Unusable: break;
    }
    return "use a flash file made for this chip, or a new file name";
}

}  // namespace vorant::sim
