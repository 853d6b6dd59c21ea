#pragma once
// Why a simulated flash's backing file cannot be used, so the host can give
// advice that fits: a file of another chip, a file cut short, a disk that
// is full.

#include "host/VorantException.h"

#include <string>

namespace vorant::sim {

class FlashFileError : public VorantException {
public:
    enum class Kind {
        Unusable,   // cannot be opened, read or written, a folder, or not a flash file at all
        OtherChip,  // a complete flash file, of a chip of another size
        Truncated,  // shorter than this chip's file and without its trailer: cut off while made
        DiskFull,   // creating it ran out of space (or hit a file size limit)
    };

    FlashFileError(Kind kind, const std::string& what) : VorantException(what), kind_(kind) {}
    Kind kind() const { return kind_; }

private:
    Kind kind_;
};

}  // namespace vorant::sim
