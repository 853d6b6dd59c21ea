#pragma once
#include "HostExport.h"
#include "RLBitVec.h"

// Stage codes: how a shift is framed by chip select.
namespace ScanStage {
constexpr int kWhole = 0;         // select, shift, deselect
constexpr int kOpen = 1;          // select, shift, stay selected
constexpr int kContinue = 2;      // shift, stay selected
constexpr int kClose = 3;         // shift, deselect
constexpr int kCaptureClose = 12; // shift capturing MISO into tdo, deselect
}  // namespace ScanStage

// The host's scan port: every transfer of a device goes through it. A port
// either plays transfers on a cable (here: the flash simulator) or records
// them to a file (outputMode() true).
//
// A transaction left open (stage 1 then 2 with no closing stage) is closed
// by the next wait or by the next opening stage (0 or 1), whichever comes
// first. Waits are in microseconds.
class VORANT_HOST_API ScanPort {
public:
    virtual ~ScanPort();
    // true while transfers go to a file.
    virtual bool outputMode() = 0;
    // One comment line, "//" up to "\n".
    virtual void comment(const char* text) = 0;
    // tdi is driven; with stage 12 the bits received are stored in tdo.
    // tdo holds the expected bits and tdoMask selects which are compared.
    virtual bool shift(int stage, RLBitVec* tdi, RLBitVec* tdiMask, RLBitVec* tdo,
                       RLBitVec* tdoMask) = 0;
    // A write-only shift; reserved is 0.
    virtual bool shiftWrite(int stage, RLBitVec* tdi, int reserved) = 0;
    // Waits `time` microseconds (the flag is always true).
    virtual bool wait(int time, bool microseconds) = 0;
    // true when the running operation is to stop; level is 2.
    virtual bool isCancelled(int level) = 0;

    // Added after the operations above, so their places in the table stay.
    // Why the last failing shift or wait failed, in the port's own words;
    // null while nothing has failed.
    virtual const char* failureReason();
    // true once the cable itself is gone (unplugged, server closed): every
    // further call would fail too, so waiting or polling on is pointless.
    virtual bool connectionLost();
};

// The port a device has before the host gives it one: every transfer fails
// and every cancel query answers true, so no operation can hang on it.
class VORANT_HOST_API NullScanPort : public ScanPort {
public:
    bool outputMode() override { return false; }
    void comment(const char*) override {}
    bool shift(int, RLBitVec*, RLBitVec*, RLBitVec*, RLBitVec*) override { return false; }
    bool shiftWrite(int, RLBitVec*, int) override { return false; }
    bool wait(int, bool) override { return false; }
    bool isCancelled(int) override { return true; }
    const char* failureReason() override { return "no scan port was given to the device"; }
    bool connectionLost() override { return true; }
};
