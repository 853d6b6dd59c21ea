#pragma once
#include "HostExport.h"

#include <stdexcept>
#include <string>

// The one exception type the host framework throws: unknown parts and keys,
// invalid part files, bit fields that do not fit their vector.
class VORANT_HOST_API VorantException : public std::runtime_error {
public:
    explicit VorantException(const std::string& what) : std::runtime_error(what) {}
};
