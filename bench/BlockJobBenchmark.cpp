// Programming that touches only what an image covers, against the physical
// bound of each job, on a simulated W25Q128JV: (a) a 16 MiB image, (b) 1 MiB
// at 0, (c) 4 MiB at 0 and 64 KiB at 0xC00000, (d) image (b) again with one
// 64 KiB block changed; then the whole-chip path (-e -v) for comparison.
//
// The bound of a job is what the chip cannot do faster: the erases it ran
// at their typical times, the pages it wrote at the typical page time, and
// the bits that went over the bus at the clock. Prints simulated time, the
// bound, their ratio, CPU time and the process's peak RSS so far.
//
//   vorant-block-bench [PART]
#include "bench/ResourceUsage.h"
#include "formats/FlashImage.h"
#include "host/ConstraintsManager.h"
#include "host/MessageSinks.h"
#include "host/UT_CMDARGS.h"
#include "ports/sim/SimScanPort.h"
#include "s/Type1SPIDevice.h"

#include <cstdio>
#include <ctime>
#include <random>
#include <string>
#include <vector>


namespace {

using Bytes = std::vector<unsigned char>;

using vorant::bench::peakResidentKiB;

Bytes randomBytes(std::size_t count, unsigned seed) {
    Bytes bytes(count);
    std::mt19937 generator(seed);
    for (auto& byte : bytes) byte = static_cast<unsigned char>(generator());
    return bytes;
}

// Counts the page programs a job sends, to price them at the typical time.
class PageCounter : public ScanPort {
public:
    explicit PageCounter(ScanPort& inner) : inner_(inner) {}
    bool outputMode() override { return inner_.outputMode(); }
    void comment(const char* text) override { inner_.comment(text); }
    bool shift(int stage, RLBitVec* tdi, RLBitVec* mask, RLBitVec* tdo, RLBitVec* tdoMask) override {
        // A page program is the one whole transaction longer than a read command.
        if (stage == ScanStage::kWhole && tdi != nullptr && tdi->length() > 64) ++pages;
        return inner_.shift(stage, tdi, mask, tdo, tdoMask);
    }
    bool shiftWrite(int stage, RLBitVec* tdi, int reserved) override { return inner_.shiftWrite(stage, tdi, reserved); }
    bool wait(int time, bool microseconds) override { return inner_.wait(time, microseconds); }
    bool isCancelled(int level) override { return inner_.isCancelled(level); }
    long long pages = 0;

private:
    ScanPort& inner_;
};

struct Chip {
    explicit Chip(const std::string& part) : config(vorant::sim::FlashConfig::fromPartDatabase(part)), port(config) {}
    vorant::sim::FlashConfig config;
    vorant::sim::SimScanPort port;
};

void runCase(const char* name, const std::string& part, Chip& chip, std::vector<vorant::formats::ImageRange> ranges,
             bool wholeChip) {
    vorant::formats::FlashImage image(std::move(ranges));
    Type1SPIDevice* device = create_type1_spi_device(part.c_str());
    PageCounter counter(chip.port);
    device->setScanPort(&counter);
    device->setConfigData(&image);
    const auto before = chip.port.stats();
    auto& model = chip.port.model();
    const std::uint64_t erases4 = model.erasesOf(4096), erases32 = model.erasesOf(32768),
                        erases64 = model.erasesOf(65536), bulk = model.erasesOf(chip.config.sizeBytes);
    const std::clock_t cpu0 = std::clock();
    UT_CMDARGS args(wholeChip ? std::vector<std::string>{"-e", "-v"} : std::vector<std::string>{"-v"});
    const bool ok = wholeChip ? device->program(0, &args) : device->programBlocks(0, &args);
    const double cpu = static_cast<double>(std::clock() - cpu0) / CLOCKS_PER_SEC;
    delete static_cast<DeviceOperation*>(device);

    const auto after = chip.port.stats();
    const double simulated = (after.simulatedNs - before.simulatedNs) / 1e9;
    const double erases = (model.erasesOf(4096) - erases4) * chip.config.sectorEraseUs / 1e6 +
                          (model.erasesOf(32768) - erases32) * chip.config.block32EraseUs / 1e6 +
                          (model.erasesOf(65536) - erases64) * chip.config.block64EraseUs / 1e6 +
                          (model.erasesOf(chip.config.sizeBytes) - bulk) * chip.config.bulkEraseUs / 1e6;
    const double pages = counter.pages * chip.config.pageProgramUs / 1e6;
    const double bus = (after.bitsShifted - before.bitsShifted) / static_cast<double>(vorant::sim::FlashModel::kDefaultClockHz);
    const double bound = erases + pages + bus;
    std::printf("%-38s %s  simulated %7.3f s  bound %7.3f s  ratio %.3f  cpu %.3f s  peak RSS %ld KiB\n", name,
                ok ? "ok  " : "FAIL", simulated, bound, bound > 0 ? simulated / bound : 0.0, cpu, peakResidentKiB());
}

}  // namespace

int main(int argc, char** argv) {
    const std::string part = argc > 1 ? argv[1] : "W25Q128JV";
    vorant::ScopedSink quiet(nullptr);
    ConstraintsManager::instance().loadDirectory(VORANT_PARTS_DIR);
    constexpr std::size_t MiB = 1024 * 1024;

    std::printf("programming only what the image covers, on a simulated %s\n", part.c_str());
    {
        Chip chip(part);
        runCase("(a) 16 MiB image", part, chip, {{0, randomBytes(16 * MiB, 1)}}, false);
    }
    {
        Chip chip(part);
        Bytes image = randomBytes(1 * MiB, 2);
        runCase("(b) 1 MiB at 0", part, chip, {{0, image}}, false);
        image[0x50000 + 10] ^= 0xFF;
        runCase("(d) (b) with one 64 KiB block changed", part, chip, {{0, image}}, false);
    }
    {
        Chip chip(part);
        runCase("(c) 4 MiB at 0, 64 KiB at 0xC00000", part, chip,
                {{0, randomBytes(4 * MiB, 3)}, {0xC00000, randomBytes(64 * 1024, 4)}}, false);
    }
    std::printf("the whole-chip path (-e -v), for comparison\n");
    {
        Chip chip(part);
        runCase("(b) 1 MiB at 0, -e -v", part, chip, {{0, randomBytes(1 * MiB, 2)}}, true);
    }
    return 0;
}
