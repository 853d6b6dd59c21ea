#include "ports/jtag/board/BridgeGateware.h"

#include <stdexcept>

namespace vorant::ports::jtag {

namespace {

// Marker bit, 32 length bits (most significant first), then length + 1
// SPI clocks with chip select low. Leading zeros (other TAPs' bypass bits)
// are ignored; Capture-DR starts over.
class MarkerFramedGateware final : public BridgeGateware {
public:
    using BridgeGateware::BridgeGateware;
    void capture() override {
        deselect();
        phase_ = Phase::WaitMarker;
    }
    void shiftClock(bool tdi) override {
        switch (phase_) {
        case Phase::WaitMarker:
            if (tdi) {
                phase_ = Phase::Length;
                lengthBits_ = 0;
                length_ = 0;
            }
            idleClock();
            return;
        case Phase::Length:
            length_ = (length_ << 1) | (tdi ? 1u : 0u);
            idleClock();
            if (++lengthBits_ == 32) {
                phase_ = Phase::Transfer;
                remaining_ = std::uint64_t{length_} + 1;
                flash_.select();
            }
            return;
        case Phase::Transfer:
            spiClock(tdi);
            if (--remaining_ == 0) {
                flash_.deselect();
                phase_ = Phase::Done;
            }
            return;
        case Phase::Done: idleClock(); return;
        }
    }
    void leaveShift() override {}
    void update() override { deselect(); }

private:
    enum class Phase { WaitMarker, Length, Transfer, Done };
    Phase phase_ = Phase::WaitMarker;
    unsigned lengthBits_ = 0;
    std::uint32_t length_ = 0;
    std::uint64_t remaining_ = 0;
};

// Chip select low exactly while the TAP shifts DR; every shift is an SPI
// clock.
class ShiftFollowingGateware final : public BridgeGateware {
public:
    using BridgeGateware::BridgeGateware;
    void capture() override {}
    void shiftClock(bool tdi) override {
        if (!flash_.selected()) flash_.select();
        spiClock(tdi);
    }
    void leaveShift() override { deselect(); }
    void update() override { deselect(); }
};

}  // namespace

// TDO is read before the next rising edge: a delay of one is the TDO
// register itself, each further clock a register in front of it. With no
// delay the clock happened during the read, and MISO is TDO at once.
void BridgeGateware::pushMiso(bool miso) {
    const std::size_t registers = delay_ == 0 ? 0 : delay_ - 1;
    pipeline_.push_back(miso);
    if (pipeline_.size() > registers) {
        tdo_ = pipeline_.front();
        pipeline_.pop_front();
    } else {
        tdo_ = true;
    }
}

void BridgeGateware::spiClock(bool mosi) { pushMiso(flash_.clockBit(mosi)); }

// MISO floats high while the chip is not selected.
void BridgeGateware::idleClock() { pushMiso(true); }

void BridgeGateware::deselect() {
    if (flash_.selected()) flash_.deselect();
}

std::unique_ptr<BridgeGateware> makeGateware(const std::string& bridge, sim::FlashModel& flash, unsigned delay) {
    if (bridge == "jtagspi") return std::make_unique<MarkerFramedGateware>(flash, delay);
    if (bridge == "shiftdr") return std::make_unique<ShiftFollowingGateware>(flash, delay);
    if (bridge == "direct") return std::make_unique<ShiftFollowingGateware>(flash, 0);
    throw std::invalid_argument("the board has no bridge '" + bridge + "'; it has jtagspi, shiftdr and direct");
}

}  // namespace vorant::ports::jtag
