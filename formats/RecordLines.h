#pragma once
// The line reading every text record format shares (Intel HEX,
// S-records): lines are counted, trailing CR, spaces and tabs dropped,
// empty lines skipped, and a read error names the last line read.

#include "formats/FormatError.h"

#include <cstddef>
#include <istream>
#include <string>

namespace vorant::formats {

// Hands each record line and its length without trailing blanks to
// onLine(line, length); lineNumber counts every line, so a parser's
// messages can name it.
template <class OnLine>
void forEachRecordLine(std::istream& in, const std::string& sourceName, std::size_t& lineNumber, OnLine&& onLine) {
    std::string line;
    while (std::getline(in, line)) {
        ++lineNumber;
        std::size_t length = line.size();
        while (length > 0 && (line[length - 1] == '\r' || line[length - 1] == ' ' || line[length - 1] == '\t'))
            --length;
        if (length > 0) onLine(line, length);
    }
    if (in.bad()) throw FormatError(sourceName + ": read error after line " + std::to_string(lineNumber));
}

}  // namespace vorant::formats
