#pragma once
// A device of the shipped part database wired to a simulated flash, the way
// a host wires it: created through the factory, driven through its virtual
// operations.

#include "formats/FlashImage.h"
#include "host/MessageSinks.h"
#include "host/UT_CMDARGS.h"
#include "ports/sim/SimScanPort.h"
#include "s/Type1SPIDevice.h"

#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace vorant::test {

// Deterministic pseudo-random bytes.
std::vector<unsigned char> randomImage(std::size_t bytes, std::uint32_t seed);

struct SystemRig {
    explicit SystemRig(const std::string& part, sim::FaultPlan faults = {});
    ~SystemRig();

    bool run(const std::function<bool(Type1SPIDevice&, UT_CMDARGS*)>& operation,
             const std::vector<std::string>& switches = {});
    void useImage(std::vector<unsigned char> bytes);

    std::string part;
    std::unique_ptr<sim::SimScanPort> port;
    std::unique_ptr<formats::FlashImage> image;
    Type1SPIDevice* device = nullptr;
    CapturingSink messages;
    ScopedSink sinkScope{&messages};
};

// Loads the shipped part files once per test program.
void loadShippedPartsOnce();

}  // namespace vorant::test
