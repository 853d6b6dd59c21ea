// Programming that touches only what the configuration data cover: the
// blocks they reach are erased with the fewest, largest erases that fit,
// a block that already holds what it should is left alone, the bytes of a
// block outside the data are written back, and pages that stay all 0xFF are
// not sent. The same failure rules as the whole-chip path hold: a failed
// status read counts as busy, and no page is written after a failed erase.

#include "s/BlockEraseTypes.h"
#include "s/DeviceMessages.h"
#include "s/ErasePlan.h"
#include "s/FlashReader.h"
#include "s/Type1SPIDevice.h"

#include "host/ConfigData.h"
#include "host/ScanPort.h"
#include "host/UT_CMDARGS.h"

#include <algorithm>
#include <cstring>
#include <vector>

namespace {

bool switchGiven(const UT_CMDARGS* args, const char* name) {
    return args != nullptr && args->getsw(name, 0) != nullptr;
}

// One piece of the configuration data: bytes bound for `address` on.
struct Piece {
    unsigned address = 0;
    const unsigned char* bytes = nullptr;
    std::size_t count = 0;
};

bool allErased(const unsigned char* bytes, std::size_t count) {
    return std::all_of(bytes, bytes + count, [](unsigned char byte) { return byte == 0xFF; });
}

}  // namespace

bool Type1SPIDevice::programBlocks(int index, UT_CMDARGS* args) {
    const bool fileMode = port().outputMode();
    const bool verifyAfter = switchGiven(args, "-v") || switchGiven(args, "-verify");
    ConfigDataReader* reader = dataToProgram(index);
    if (reader == nullptr) return false;
    const std::vector<vorant::device::BlockEraseType> types =
        vorant::device::readBlockEraseTypes(constraints(), getPartName());
    if (types.empty() || pageSize_ / 8 <= 0) {
        DEVICE_MESSAGE().issueError(
            "'%d': Programming terminated, the part names no erase smaller than the chip (SECTORERASE_INSTRUCTION "
            "and SECTOR_SIZE); erase the whole chip instead.\n",
            index);
        return false;
    }
    const std::size_t pageBytes = static_cast<std::size_t>(pageSize_ / 8);
    const std::uint64_t flashBytes = static_cast<std::uint64_t>(std::max(deviceSize_, 0)) / 8;

    // First pass: where the data are, to plan the erases.
    std::vector<vorant::device::AddressSpan> spans;
    reader->rewind();
    const char* data = nullptr;
    int pieceAddress = 0;
    for (int bits; (bits = reader->nextPiece(&data, &pieceAddress, pageSize_)) > 0;) {
        const auto begin = static_cast<std::uint64_t>(pieceAddress);
        const std::uint64_t end = begin + static_cast<std::uint64_t>(bits) / 8;
        if (end > flashBytes) {
            DEVICE_MESSAGE().issueError("'%d': The configuration data reach address 0x%llX, past the device's end.\n",
                                        index, static_cast<unsigned long long>(end));
            return false;
        }
        if (!spans.empty() && spans.back().end == begin) spans.back().end = end;
        else spans.push_back({begin, end});
    }
    std::vector<std::uint32_t> sizes;
    for (const auto& type : types) sizes.push_back(type.sizeBytes);
    const std::vector<vorant::device::EraseStep> plan = vorant::device::planErase(spans, sizes, flashBytes);
    // A recording cannot read a block to keep what lies around the data:
    // it erases whole blocks only where that was accepted.
    if (fileMode && !switchGiven(args, "-wholeblocks")) {
        const auto partial =
            vorant::device::partlyCoveredBlocks(spans, *std::min_element(sizes.begin(), sizes.end()), flashBytes);
        if (!partial.empty()) {
            DEVICE_MESSAGE().issueError(
                "'%d': Programming terminated, the data cover the block at address 0x%llX only in part, and a "
                "recording cannot read the rest of it to keep it.\n",
                index, static_cast<unsigned long long>(partial.front().begin));
            return false;
        }
    }

    bool result = true;
    if (useUnlockSr_) result = unlockStatusRegister(index, args);
    DEVICE_MESSAGE().issueStatus("'%d': Programming Flash.\n", index);

    RLBitVec frame(static_cast<std::size_t>(totalShiftSize_), false);
    frame.updateBitField(pageProgramInstruction_.c_str(), 0);
    vorant::device::FlashReader flash(port(), readInstruction_, readSize_, pageAddressStartIndex_, addressSize_,
                                      pageBytes);
    std::vector<unsigned char> current, desired, covered;
    int erased = 0, unchanged = 0, pagesWritten = 0;
    bool cancelled = false;

    // Second pass: the blocks in ascending order, the data's pieces with them.
    reader->rewind();
    Piece piece;
    auto nextPiece = [&] {
        const int bits = reader->nextPiece(&data, &pieceAddress, pageSize_);
        piece = bits > 0 ? Piece{static_cast<unsigned>(pieceAddress), reinterpret_cast<const unsigned char*>(data),
                                 static_cast<std::size_t>(bits) / 8}
                         : Piece{};
    };
    nextPiece();
    for (const vorant::device::EraseStep& step : plan) {
        const auto& type = types[step.sizeIndex];
        const auto block = static_cast<unsigned>(step.address);
        const std::size_t size = type.sizeBytes;
        // What the block should hold: the data where they are, and around
        // them what it holds now (a recording cannot read: it erases).
        desired.assign(size, 0xFF);
        covered.assign(size, 0);
        // Every piece lies in a planned block, and both come in ascending
        // order; a page-sized piece never crosses a block.
        for (; piece.count > 0 && piece.address < block + size; nextPiece()) {
            if (piece.address < block) continue;
            const std::size_t at = piece.address - block, n = std::min(piece.count, size - at);
            std::memcpy(desired.data() + at, piece.bytes, n);
            std::memset(covered.data() + at, 1, n);
        }
        current.assign(size, 0xFF);
        if (!fileMode) {
            // Read what must be kept, and the data's pages until one differs:
            // after that a page the data fill wholly need not be read.
            bool differs = false;
            for (std::size_t offset = 0; offset < size; offset += pageBytes) {
                const std::size_t end = std::min(size, offset + pageBytes);
                if (differs && std::all_of(covered.begin() + static_cast<std::ptrdiff_t>(offset),
                                           covered.begin() + static_cast<std::ptrdiff_t>(end),
                                           [](unsigned char c) { return c != 0; }))
                    continue;
                if (!flash.read(block + static_cast<unsigned>(offset), current.data() + offset, end - offset)) {
                    DEVICE_MESSAGE().issueError(
                        "'%d': Programming terminated, the block at address 0x%X could not be read.\n", index, block);
                    spidisable(index, args);
                    return false;
                }
                for (std::size_t k = offset; k < end; ++k) {
                    if (covered[k]) differs = differs || current[k] != desired[k];
                    else desired[k] = current[k];
                }
            }
            if (!differs) {
                ++unchanged;
                continue;
            }
        }

        if (!eraseBlock(index, args, type, block, fileMode)) {
            DEVICE_MESSAGE().issueError(
                "'%d': Programming terminated, the erase of the block at address 0x%X did not complete; no page of "
                "it was written.\n",
                index, block);
            spidisable(index, args);
            return false;
        }
        ++erased;
        for (std::size_t offset = 0; offset < size; offset += pageBytes) {
            const unsigned char* page = desired.data() + offset;
            if (allErased(page, pageBytes)) continue;
            const unsigned address = block + static_cast<unsigned>(offset);
            frame.updateBitField(address, pageAddressStartIndex_, addressSize_, true);
            frame.updateBitField(reinterpret_cast<const char*>(page), dataStartIndex_, pageSize_, true);
            const PageOutcome outcome = writePage(index, args, frame, fileMode);
            if (outcome == PageOutcome::Cancelled) {
                cancelled = true;
                break;
            }
            if (outcome != PageOutcome::Written) {
                reportPageFailure(index, outcome, address);
                spidisable(index, args);
                return false;
            }
            ++pagesWritten;
            if ((cancelled = port().isCancelled(2))) break;
        }
        if (!cancelled && verifyAfter) {
            // A recording compares what it reads with what the block should hold.
            if (!flash.read(block, current.data(), size, desired.data())) {
                DEVICE_MESSAGE().issueError("'%d': Verification terminated, the block at address 0x%X could not be read.\n",
                                            index, block);
                spidisable(index, args);
                return false;
            }
            const auto mismatch = std::mismatch(current.begin(), current.end(), desired.begin());
            if (!fileMode && mismatch.first != current.end()) {
                DEVICE_MESSAGE().issueStatus("Failed at address, %d\n",
                                             static_cast<int>(block + (mismatch.first - current.begin())));
                DEVICE_MESSAGE().issueStatus("'%d': Verification Terminated\n", index);
                spidisable(index, args);
                return false;
            }
        }
        if (cancelled) break;
    }

    if (cancelled) {
        DEVICE_MESSAGE().issueStatus("'%d': Programming cancelled.\n", index);
        result = false;
    } else {
        auto plural = [](int count, const char* one, const char* many) { return count == 1 ? one : many; };
        DEVICE_MESSAGE().issueStatus("'%d': %d %s erased, %d %s written, %d %s the data already.\n", index, erased,
                                     plural(erased, "block", "blocks"), pagesWritten, plural(pagesWritten, "page", "pages"),
                                     unchanged, plural(unchanged, "block held", "blocks held"));
        if (verifyAfter) DEVICE_MESSAGE().issueStatus("'%d': Verification completed.\n", index);
    }
    return finishProgramming(index, args, result);
}

bool Type1SPIDevice::eraseBlock(int index, UT_CMDARGS* args, const vorant::device::BlockEraseType& type,
                                unsigned address, bool fileMode) {
    RLBitVec command(static_cast<std::size_t>(readSize_), false);
    command.updateBitField(type.instruction.c_str(), 0);
    command.updateBitField(address, pageAddressStartIndex_, addressSize_, true);
    RLBitVec tdiMask(command.length(), true), tdo(command.length(), false), tdoMask(command.length(), false);

    const bool enabled = spienable(index, args);
    port().comment("//Loading device with 'block erase' instruction.\n");
    if (!(port().shift(ScanStage::kWhole, &command, &tdiMask, &tdo, &tdoMask) && enabled)) return false;
    // A recording cannot poll: it waits the longest the erase may take.
    const bool waited = port().wait(fileMode ? type.maxWaitTime : type.waitTime, true);
    if (fileMode || !usesPolling()) return waited;
    return checkStatus(index, type.maxWaitTime, type.waitStep);
}
