// What a page program costs through a CH341A: the cable's scan port over
// the programmer's double (behind the USB seam) and a blank simulated
// W25Q128JV, driven the way the plug-in programs a page: write enable, page
// program (02h, address, 256 bytes), the part's typical wait, then status
// reads until the chip is idle. Prints per page: USB transfers out and in,
// 32-byte packets, bytes sent, and the chip's time at the programmer's
// fixed 1.4 MHz clock (the waits included). The double does not model USB
// frame timing, so the wall time on a real programmer is not measured
// here; every transfer of a page waits for the one before it.
//
//   vorant-ch341a-bench [PAGES]      (default 1024)
//
// On the development machine (1024 pages): 12 OUT and 11 IN transfers per
// page (write enable 1; page program 9 of 31 bytes each, chip select riding
// with the first; the deselect before the wait 1; one status read 1), 15
// packets and 373 bytes sent for 256 data bytes; chip time 2.2 ms per page
// (1.5 ms of SPI clocks, the 0.7 ms page program).
#include "cli/PartDatabaseSetup.h"
#include "host/RLBitVec.h"
#include "host/ScanPort.h"
#include "ports/Port.h"
#include "ports/ch341a/Ch341aPort.h"
#include "ports/sim/FlashModel.h"
#include "tests/doubles/FakeCh341a.h"

#include <cstdio>
#include <cstdlib>
#include <vector>

namespace {

using namespace vorant;

constexpr int kProgramWaitUs = 700, kPollStepUs = 70;  // W25Q128JV's typical page program and polling step

RLBitVec wireBytes(const std::vector<unsigned char>& bytes) { return RLBitVec(bytes.data(), bytes.size() * 8); }

}  // namespace

int main(int argc, char** argv) {
    const int pages = argc > 1 ? std::atoi(argv[1]) : 1024;
    if (pages < 1 || pages > 65536) {
        std::fprintf(stderr, "usage: vorant-ch341a-bench [PAGES]   (1 to 65536)\n");
        return 2;
    }
    cli::loadPartDatabase({});
    sim::FlashModel flash(sim::FlashConfig::fromPartDatabase("W25Q128JV"));
    test::FakeCh341a device(flash);
    const std::unique_ptr<ports::Port> cable = ports::ch341a::openCh341aCable(device.connect(), "ch341a:1:5");
    ScanPort& scan = cable->scan();
    const std::uint64_t outBefore = device.outTransfers, inBefore = device.inTransfers;
    const std::uint64_t packetsBefore = device.packets, bytesBefore = device.outBytes, nsBefore = flash.now();
    RLBitVec writeEnable = wireBytes({0x06}), readStatus = wireBytes({0x05});
    std::uint64_t polls = 0;
    for (int page = 0; page < pages; ++page) {
        const std::uint32_t address = static_cast<std::uint32_t>(page) * 256;
        std::vector<unsigned char> program = {0x02, static_cast<unsigned char>(address >> 16),
                                              static_cast<unsigned char>(address >> 8), 0x00};
        for (int i = 0; i < 256; ++i) program.push_back(static_cast<unsigned char>(page + i));
        RLBitVec programPage = wireBytes(program);
        bool ok = scan.shiftWrite(ScanStage::kWhole, &writeEnable, 0) &&
                  scan.shiftWrite(ScanStage::kWhole, &programPage, 0) && scan.wait(kProgramWaitUs, true);
        for (bool busy = true; ok && busy;) {
            RLBitVec filler(8, false), status(8, false);
            ok = scan.shiftWrite(ScanStage::kOpen, &readStatus, 0) &&
                 scan.shift(ScanStage::kCaptureClose, &filler, nullptr, &status, nullptr);
            ++polls;
            busy = status.getBit(7);  // WIP, the last bit captured
            if (ok && busy) ok = scan.wait(kPollStepUs, true);
        }
        if (!ok) {
            std::fprintf(stderr, "page %d failed: %s\n", page, scan.failureReason() ? scan.failureReason() : "?");
            return 1;
        }
    }
    if (flash.memory()[256 * (pages - 1) + 1] != static_cast<std::uint8_t>(pages)) {
        std::fprintf(stderr, "the pages did not reach the flash\n");
        return 1;
    }
    const auto perPage = [pages](std::uint64_t before, std::uint64_t after) {
        return static_cast<double>(after - before) / pages;
    };
    std::printf("pages                         %d (256 bytes, W25Q128JV, CH341A double)\n", pages);
    std::printf("USB OUT transfers per page    %.2f\n", perPage(outBefore, device.outTransfers));
    std::printf("USB IN transfers per page     %.2f\n", perPage(inBefore, device.inTransfers));
    std::printf("32-byte packets per page      %.2f\n", perPage(packetsBefore, device.packets));
    std::printf("bytes sent per page           %.1f (for 256 data bytes)\n", perPage(bytesBefore, device.outBytes));
    std::printf("status reads per page         %.2f\n", static_cast<double>(polls) / pages);
    std::printf("chip time per page            %.3f ms (SPI at 1.4 MHz, the waits)\n",
                perPage(nsBefore, flash.now()) / 1e6);
    return 0;
}
