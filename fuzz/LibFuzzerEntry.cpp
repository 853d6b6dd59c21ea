// The libFuzzer entry of one fuzz target; VORANT_FUZZ_TARGET names its
// function (set per harness by the build).
#include "fuzz/FuzzTargets.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    VORANT_FUZZ_TARGET(data, size);
    return 0;
}
