// The budget of a whole job: erase + program + verify of a full 16 MiB
// image through the flash simulator, and the SVF recording of the same job.
// Prints CPU time, peak memory and simulated bus time for each.
//
//   vorant-bench [PART] [SVF-FILE]
#include "bench/ResourceUsage.h"
#include "formats/FlashImage.h"
#include "host/ConstraintsManager.h"
#include "host/MessageSinks.h"
#include "host/UT_CMDARGS.h"
#include "ports/sim/SimScanPort.h"
#include "ports/svf/SvfRecorder.h"
#include "s/Type1SPIDevice.h"

#include <chrono>
#include <cstdio>
#include <ctime>
#include <filesystem>
#include <random>
#include <string>


namespace {

using vorant::bench::peakResidentKiB;

double cpuSeconds() { return static_cast<double>(std::clock()) / CLOCKS_PER_SEC; }

struct Job {
    const char* name;
    bool ok;
    double cpu;
    double wall;
};

Job runJob(const char* name, const std::string& part, ScanPort& port, vorant::formats::FlashImage& image) {
    Type1SPIDevice* device = create_type1_spi_device(part.c_str());
    device->setScanPort(&port);
    device->setConfigData(&image);
    UT_CMDARGS args({"-e", "-v"});
    const double cpu0 = cpuSeconds();
    const auto wall0 = std::chrono::steady_clock::now();
    const bool ok = device->program(0, &args);
    const double cpu = cpuSeconds() - cpu0;
    const double wall = std::chrono::duration<double>(std::chrono::steady_clock::now() - wall0).count();
    delete static_cast<DeviceOperation*>(device);
    return {name, ok, cpu, wall};
}

}  // namespace

int main(int argc, char** argv) {
    const std::string part = argc > 1 ? argv[1] : "W25Q128JV";
    const std::filesystem::path svfFile =
        argc > 2 ? std::filesystem::path(argv[2]) : std::filesystem::temp_directory_path() / "vorant-bench.svf";
    vorant::ScopedSink quiet(nullptr);
    ConstraintsManager::instance().loadDirectory(VORANT_PARTS_DIR);
    const auto deviceBytes =
        static_cast<std::size_t>(ConstraintsManager::instance().getDeviceLongProperty(part.c_str(), "DEVICE_SIZE") / 8);

    std::vector<unsigned char> bytes(deviceBytes);
    std::mt19937 generator(2026);
    for (auto& b : bytes) b = static_cast<unsigned char>(generator());
    vorant::formats::FlashImage image(std::move(bytes));

    std::printf("job: erase + program + verify of %zu bytes (%s)\n", deviceBytes, part.c_str());

    vorant::sim::SimScanPort sim(vorant::sim::FlashConfig::fromPartDatabase(part));
    const Job simJob = runJob("simulator", part, sim, image);
    const auto stats = sim.stats();
    std::printf("%-10s %s  cpu %.3f s  wall %.3f s  simulated %.1f s  %.1f MB/s of CPU  peak RSS %ld KiB\n",
                simJob.name, simJob.ok ? "ok  " : "FAIL", simJob.cpu, simJob.wall, stats.simulatedNs / 1e9,
                deviceBytes / 1e6 / simJob.cpu, peakResidentKiB());

    {
        vorant::svf::SvfRecorder recorder(svfFile);
        Job svfJob = runJob("svf", part, recorder, image);
        recorder.finish();
        const auto size = std::filesystem::file_size(svfFile);
        std::printf("%-10s %s  cpu %.3f s  wall %.3f s  file %.1f MB  peak RSS %ld KiB\n", svfJob.name,
                    svfJob.ok ? "ok  " : "FAIL", svfJob.cpu, svfJob.wall, size / 1e6, peakResidentKiB());
    }
    std::filesystem::remove(svfFile);
    return simJob.ok ? 0 : 1;
}
