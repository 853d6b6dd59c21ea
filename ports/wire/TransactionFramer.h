#pragma once
// The one place that knows how stage codes frame SPI transactions.
//
// Every port that moves transactions (the simulator, the SVF recorder, the
// JTAG ports) hands its shifts to a framer and implements the three edges
// of a transaction as a TransactionSink. The rules:
//   stage 0   close a transaction left open, select, shift, deselect
//   stage 1   close a transaction left open, select, shift
//   stage 2   shift (a transaction must be open)
//   stage 3   shift, deselect (a transaction must be open)
//   stage 12  shift capturing MISO into tdo, deselect (must be open)
// A wait closes an open transaction (closeOpenTransaction) before its time
// passes: a status write starts only when chip select rises.

#include "host/RLBitVec.h"

#include <string>

namespace vorant::ports {

class TransactionSink {
public:
    virtual ~TransactionSink() = default;
    virtual void select() = 0;
    // One shift of the open transaction. tdo and tdoMask are as the device
    // handed them (either may be null): with `capture` the bits received are
    // stored into tdo; without it tdo holds the bits expected under tdoMask.
    virtual void shiftBits(const RLBitVec& tdi, RLBitVec* tdo, const RLBitVec* tdoMask, bool capture) = 0;
    virtual void deselect() = 0;
};

// Why a shift was refused before anything reached the sink.
enum class FramingFault { None, NoTdi, NothingOpen, UnknownStage };

// The refusal in words, for a port's failure reason.
std::string describeFramingFault(FramingFault fault, int stage);

class TransactionFramer {
public:
    explicit TransactionFramer(TransactionSink& sink) : sink_(sink) {}

    // Frames one shift onto the sink. A refused shift reaches the sink not
    // at all (an open transaction stays open). Exceptions of the sink pass
    // through; the transaction then counts as closed.
    FramingFault shift(int stage, const RLBitVec* tdi, RLBitVec* tdo, const RLBitVec* tdoMask);
    // Deselects a transaction left open; nothing when none is.
    void closeOpenTransaction();
    bool transactionOpen() const { return open_; }

private:
    void open();

    TransactionSink& sink_;
    bool open_ = false;
};

}  // namespace vorant::ports
