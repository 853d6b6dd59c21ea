#include "tests/system/SystemRig.h"

#include "formats/ConfigDataFiles.h"
#include "host/ConstraintsManager.h"
#include "tests/support/TestParts.h"

#include <mutex>
#include <random>

namespace vorant::test {

std::vector<unsigned char> randomImage(std::size_t bytes, std::uint32_t seed) {
    std::mt19937 generator(seed);
    std::vector<unsigned char> image(bytes);
    for (auto& b : image) b = static_cast<unsigned char>(generator() & 0xFFu);
    return image;
}

void loadShippedPartsOnce() {
    static std::once_flag once;
    std::call_once(once, [] {
        loadShippedParts();
        formats::registerStandardFormats();
    });
}

SystemRig::SystemRig(const std::string& partName, sim::FaultPlan faults) : part(partName) {
    loadShippedPartsOnce();
    port = std::make_unique<sim::SimScanPort>(sim::FlashConfig::fromPartDatabase(part), std::move(faults));
    device = create_type1_spi_device(part.c_str());
    device->setScanPort(port.get());
}

SystemRig::~SystemRig() {
    DeviceOperation* base = device;
    delete base;
}

void SystemRig::useImage(std::vector<unsigned char> bytes) {
    image = std::make_unique<formats::FlashImage>(std::move(bytes));
    device->setConfigData(image.get());
}

bool SystemRig::run(const std::function<bool(Type1SPIDevice&, UT_CMDARGS*)>& operation,
                    const std::vector<std::string>& switches) {
    UT_CMDARGS args(switches);
    return operation(*device, &args);
}

}  // namespace vorant::test
