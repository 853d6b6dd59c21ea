// The spidev cable's ioctls for `program -e -v` of a 1 MiB image on a
// simulated W25Q128JV: the whole command line in-process, the spidev double
// behind the node counting its ioctls, messages and chip-select cycles
// (transactions on the wire). Prints ioctls per page programmed (write
// enable, page program and status polls each cost one) and per transaction
// (target: 1), and the CPU and simulated bus time of the run. The double
// knows opcodes only as the first byte of a message.
//
//   vorant-spidev-bench [KIB]      (default 1024)
//
// On the 2-core development machine: 3.00 ioctls per page programmed (write
// enable, page program, one status poll), 1.000 ioctl per transaction, 6
// setup ioctls per run; 0.1 s of CPU for the whole run.
#include "bench/ResourceUsage.h"
#include "cli/PartDatabaseSetup.h"
#include "cli/Tool.h"
#include "ports/sim/FlashModel.h"
#include "tests/doubles/FakeSpidev.h"

#include <algorithm>
#include <cstdio>
#include <ctime>
#include <filesystem>
#include <fstream>
#include <random>
#include <string>
#include <unistd.h>
#include <vector>

namespace {

namespace fs = std::filesystem;

constexpr std::size_t kPageBytes = 256;

std::vector<char> randomImage(std::size_t bytes) {
    std::vector<char> data(bytes);
    std::mt19937 random(11);
    for (char& byte : data) byte = static_cast<char>(random());
    return data;
}

double cpuSeconds() { return static_cast<double>(std::clock()) / CLOCKS_PER_SEC; }

}  // namespace

int main(int argc, char** argv) {
    const std::size_t kib = argc > 1 ? std::stoul(argv[1]) : 1024;
    const fs::path dir = fs::temp_directory_path() / ("vorant-spidev-bench-" + std::to_string(getpid()));
    fs::create_directories(dir);
    const std::vector<char> image = randomImage(kib * 1024);
    std::ofstream(dir / "image.bin", std::ios::binary).write(image.data(), static_cast<std::streamsize>(image.size()));

    vorant::cli::loadPartDatabase({});
    vorant::sim::FlashModel flash(vorant::sim::FlashConfig::fromPartDatabase("W25Q128JV"));
    vorant::test::FakeSpidevNode node(&flash);
    node.device.keepLog = false;

    std::vector<std::string> args = {"vorant-spidev-bench", "--quiet", "--port", "spidev:/dev/spidev0.0",
                                     "--part", "auto", "program", (dir / "image.bin").string(), "-e", "-v"};
    std::vector<char*> argv2;
    for (std::string& arg : args) argv2.push_back(arg.data());
    argv2.push_back(nullptr);
    const double cpuBefore = cpuSeconds();
    const int status = vorant::cli::runTool(static_cast<int>(args.size()), argv2.data());
    const double cpu = cpuSeconds() - cpuBefore;
    fs::remove_all(dir);

    const bool programmed = std::equal(image.begin(), image.end(), flash.memory().begin(),
                                       [](char a, std::uint8_t b) { return static_cast<std::uint8_t>(a) == b; });
    const vorant::test::FakeSpidev& device = node.device;
    const double pages = static_cast<double>(image.size() / kPageBytes);
    std::printf("spidev: program -e -v of %zu KiB on a simulated W25Q128JV (exit %d, flash %s)\n", kib, status,
                programmed ? "equals the image" : "DIFFERS from the image");
    std::printf("  ioctls %llu (setup %llu, messages %llu), transactions on the wire %llu, pages %.0f\n",
                static_cast<unsigned long long>(device.ioctls),
                static_cast<unsigned long long>(device.ioctls - device.messages),
                static_cast<unsigned long long>(device.messages), static_cast<unsigned long long>(device.chipSelects),
                pages);
    // Write enables and status polls of the erase count here too: a few
    // against thousands of pages.
    const auto& by = device.messagesByFirstByte;
    std::printf("  per page programmed: %.2f ioctls (page program %.2f, write enable %.2f, status polls %.2f); "
                "verify reads %llu\n",
                static_cast<double>(by[0x02] + by[0x06] + by[0x05]) / pages, static_cast<double>(by[0x02]) / pages,
                static_cast<double>(by[0x06]) / pages, static_cast<double>(by[0x05]) / pages,
                static_cast<unsigned long long>(by[0x03] + by[0x0B]));
    std::printf("  ioctls per transaction %.3f (target 1); all ioctls of the run per page %.2f\n",
                static_cast<double>(device.messages) / static_cast<double>(device.chipSelects),
                static_cast<double>(device.ioctls) / pages);
    std::printf("  CPU %.2f s, simulated bus and busy time %.2f s, peak RSS %ld KiB\n", cpu,
                static_cast<double>(flash.now()) / 1e9, vorant::bench::peakResidentKiB());
    return status == 0 && programmed ? 0 : 1;
}
