// What a page program costs on the FTDI cable: the whole tool runs
// `program -e -v` of an image on a simulated W25Q128JV behind the MPSSE
// double at 30 MHz (no USB latency: the figures count bytes and round
// trips, which latency multiplies on a real cable). Prints the bytes of
// the USB write that carries each page program (its write enable included)
// and the USB round trips per page: that write plus the status polls until
// the next page (target: 1 plus polls).
//
//   vorant-ftdi-bench [PAGES]        (default 1024)
#include "cli/Tool.h"
#include "host/ConstraintsManager.h"
#include "ports/sim/FlashModel.h"
#include "tests/doubles/FakeMpsse.h"

#include <unistd.h>
#include <algorithm>
#include <cstdio>
#include <ctime>
#include <filesystem>
#include <fstream>
#include <random>
#include <string>
#include <vector>

namespace {

namespace fs = std::filesystem;
using Bytes = std::vector<std::uint8_t>;

// "11 03 01 02": a 260-byte write-only shift (length field 0x0103) that
// starts with page program: opcode, 24-bit address, 256 data bytes.
bool carriesPageProgram(const Bytes& write) {
    const std::uint8_t pattern[] = {0x11, 0x03, 0x01, 0x02};
    return std::search(write.begin(), write.end(), std::begin(pattern), std::end(pattern)) != write.end();
}

// "11 00 00 05": a status read's opcode.
bool carriesStatusRead(const Bytes& write) {
    const std::uint8_t pattern[] = {0x11, 0x00, 0x00, 0x05};
    return std::search(write.begin(), write.end(), std::begin(pattern), std::end(pattern)) != write.end();
}

}  // namespace

int main(int argc, char** argv) {
    const long pages = argc > 1 ? std::atol(argv[1]) : 1024;
    if (pages <= 0 || pages > 65536) {
        std::fprintf(stderr, "usage: vorant-ftdi-bench [PAGES]   (1 to 65536)\n");
        return 2;
    }
    ConstraintsManager::instance().loadDirectory(VORANT_PARTS_DIR);
    const fs::path dir = fs::temp_directory_path() / ("vorant-ftdi-bench-" + std::to_string(getpid()));
    fs::create_directories(dir);
    Bytes image(static_cast<std::size_t>(pages) * 256);
    std::mt19937 generator(11);
    for (auto& byte : image) byte = static_cast<std::uint8_t>(generator());
    std::ofstream(dir / "image.bin", std::ios::binary)
        .write(reinterpret_cast<const char*>(image.data()), static_cast<std::streamsize>(image.size()));

    vorant::sim::FlashModel flash(vorant::sim::FlashConfig::fromPartDatabase("W25Q128JV"));
    vorant::test::FakeMpsse mpsse(flash);
    mpsse.keepLog = false;
    vorant::test::FakeFtdiUsb usb(&mpsse);
    usb.devices = {vorant::test::FakeFtdiUsb::ft232h()};

    std::string args[] = {"vorant-spi", "--quiet", "--port", "ftdi,speed=30M", "--part", "W25Q128JV", "program",
                          "image.bin",  "-e",      "-v"};
    std::vector<char*> argv2;
    for (std::string& arg : args) argv2.push_back(arg.data());
    const fs::path before = fs::current_path();
    fs::current_path(dir);
    const std::clock_t cpu = std::clock();
    const int status = vorant::cli::runTool(static_cast<int>(argv2.size()), argv2.data());
    const double cpuSeconds = static_cast<double>(std::clock() - cpu) / CLOCKS_PER_SEC;
    fs::current_path(before);
    fs::remove_all(dir);
    const bool programmed = std::equal(image.begin(), image.end(), flash.memory().begin());
    if (status != 0 || !programmed) {
        std::fprintf(stderr, "vorant-ftdi-bench: program -e -v %s\n",
                     status != 0 ? "failed" : "left the flash unlike the image");
        return 1;
    }

    // From each page-program write to the next: that write and the polls.
    std::size_t pageWrites = 0, pageBytes = 0, polls = 0, otherWrites = 0;
    bool inPages = false;
    for (const Bytes& write : mpsse.writes) {
        if (carriesPageProgram(write)) {
            ++pageWrites;
            pageBytes += write.size();
            inPages = true;
        } else if (inPages && carriesStatusRead(write)) {
            ++polls;
        } else if (inPages) {
            inPages = false;  // the verify has begun
            ++otherWrites;
        } else {
            ++otherWrites;
        }
    }
    const double n = static_cast<double>(pageWrites);
    std::printf("FTDI MPSSE cable through its double at %.0f MHz, W25Q128JV, program -e -v of %ld pages:\n",
                mpsse.sckHz() / 1e6, pages);
    std::printf("  page programs: %zu, each in one USB write of %.1f bytes (write enable and page program)\n",
                pageWrites, pageBytes / n);
    std::printf("  USB round trips per page: %.2f (1 write + %.2f status polls of 1 write + 1 read each)\n",
                1.0 + polls / n, polls / n);
    std::printf("  whole job: %llu USB writes, %llu USB reads (%zu writes outside the page loop)\n",
                static_cast<unsigned long long>(mpsse.writeCount()), static_cast<unsigned long long>(mpsse.readCount()),
                otherWrites);
    std::printf("  simulated time %.3f s, CPU %.3f s, latency-timer waits %llu\n", flash.now() / 1e9, cpuSeconds,
                static_cast<unsigned long long>(mpsse.latencyWaits()));
    return 0;
}
