#pragma once
// The fuzz targets. Each takes one input of any bytes and must return
// normally: refusing bad input with the component's own error is normal; a
// crash, a sanitizer report, a hang or any other exception escaping is a
// finding. libFuzzer drives them in the fuzz preset; the regular test run
// replays the kept seeds and regressions through the same functions.

#include <cstddef>
#include <cstdint>
#include <vector>

namespace vorant::fuzz {

// Intel HEX text through the reader, the image then handed out in pages.
void fuzzIntelHex(const std::uint8_t* data, std::size_t size);
// SVF text through the tokenizer, parser and player on a simulated flash.
void fuzzSvf(const std::uint8_t* data, std::size_t size);
// Part file text into a fresh part database, with validation.
void fuzzPartFile(const std::uint8_t* data, std::size_t size);
// Command-line arguments, separated by NUL bytes, through the tool's parser.
void fuzzCommandLine(const std::uint8_t* data, std::size_t size);
// S-record text through the reader into address ranges.
void fuzzSRecords(const std::uint8_t* data, std::size_t size);
// An SFDP area, as a chip answers 5Ah, through the decoder.
void fuzzSfdp(const std::uint8_t* data, std::size_t size);

struct FuzzTarget {
    const char* name;  // its folder under fuzz/corpus and fuzz/regressions
    void (*run)(const std::uint8_t* data, std::size_t size);
};

inline const std::vector<FuzzTarget>& fuzzTargets() {
    static const std::vector<FuzzTarget> targets = {
        {"intel_hex", fuzzIntelHex},
        {"svf", fuzzSvf},
        {"part_file", fuzzPartFile},
        {"command_line", fuzzCommandLine},
        {"srecord", fuzzSRecords},
        {"sfdp", fuzzSfdp},
    };
    return targets;
}

}  // namespace vorant::fuzz
