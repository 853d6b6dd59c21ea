#include "s/FlashReader.h"

#include "host/BitReversal.h"

#include <algorithm>

namespace vorant::device {

FlashReader::FlashReader(ScanPort& port, const Port::StringBase<char>& readInstruction, int readSize,
                         int addressStart, int addressSize, std::size_t pageBytes)
    : port_(port),
      command_(readInstruction, readSize, addressStart, addressSize),
      pageBytes_(pageBytes),
      ones_(pageBytes * 8, true),
      capture_(pageBytes * 8, false) {}

bool FlashReader::read(unsigned address, unsigned char* bytes, std::size_t count, const unsigned char* expected) {
    for (std::size_t done = 0; done < count; done += pageBytes_) {
        const std::size_t take = std::min(pageBytes_, count - done);
        // A short last piece gets vectors of its own length.
        RLBitVec shortCapture(0, false), shortOnes(0, false);
        RLBitVec* capture = &capture_;
        RLBitVec* ones = &ones_;
        if (take != pageBytes_) {
            shortCapture = RLBitVec(take * 8, false);
            shortOnes = RLBitVec(take * 8, true);
            capture = &shortCapture;
            ones = &shortOnes;
        }
        if (expected != nullptr)
            capture->updateBitField(reinterpret_cast<const char*>(expected + done), 0, static_cast<int>(take * 8), true);
        const unsigned at = address + static_cast<unsigned>(done);
        if (!command_.open(port_, at, "//Loading device with 'read' instruction.\n")) return false;
        if (!port_.shift(ScanStage::kCaptureClose, capture, ones, capture, ones)) return false;
        reverseBitsOfEachByte(capture->data(), take, bytes + done);
    }
    return true;
}

}  // namespace vorant::device
