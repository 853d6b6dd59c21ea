#pragma once
// Shared set-up of the frame tests: a device of a test part wired to a
// recording scan port, with every message captured and the two environment
// variables cleared around each test.

#include "host/MessageSinks.h"
#include "s/Type1SPIDevice.h"
#include "tests/support/RecordingScanPort.h"
#include "tests/support/TestParts.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

namespace vorant::test::frame {

// Opcodes of the W25Q128-like test part, as shifted (MSB first).
inline const std::string kWriteEnable = "00000110";
inline const std::string kWriteDisable = "00000100";
inline const std::string kReadId = "10011111";
inline const std::string kReadStatus1 = "00000101";
inline const std::string kReadStatus2 = "00110101";
inline const std::string kWriteStatus = "00000001";
inline const std::string kReadSignature = "10101011";

inline const std::string kCommentWriteEnable = "comment //Loading device with 'write enable' instruction.\n";
inline const std::string kCommentWriteDisable = "comment //Loading device with 'write disable' instruction.\n";
inline const std::string kCommentReadStatus = "comment //Loading device with 'read status' instruction.\n";
inline const std::string kCommentReadId = "comment //Loading device with 'read id' instruction.\n";
inline const std::string kCommentReadSig = "comment //Loading device with 'read sig' instruction.\n";
inline const std::string kCommentWriteSr = "comment //Loading device with 'write SR' instruction.\n";

// An 8-bit value as it travels on the wire, MSB first.
inline std::string wireByte(unsigned value) {
    std::string text;
    for (int bit = 7; bit >= 0; --bit) text += ((value >> bit) & 1u) ? '1' : '0';
    return text;
}

inline void clearDeviceEnvironment() {
    unsetenv("QRX_VORANT_ENV_DONT_USE_POLLING");
    unsetenv("QRX_VORANT_SKIPIDCODECHECK");
}

class FrameTest : public ::testing::Test {
protected:
    void SetUp() override { clearDeviceEnvironment(); }
    void TearDown() override { clearDeviceEnvironment(); }

    // A device of a part registered under `name` with `properties`, wired
    // to this test's port.
    std::unique_ptr<Type1SPIDevice> makeDevice(const Properties& properties,
                                               const std::string& name = "FRAME_W25Q") {
        addTestPart(name, properties);
        auto device = std::make_unique<Type1SPIDevice>(name.c_str());
        device->setScanPort(&port);
        return device;
    }
    std::unique_ptr<Type1SPIDevice> makeDevice() { return makeDevice(w25q128Properties()); }

    std::vector<std::string> statusTexts() const { return sink.texts(MessageKind::Status); }
    std::vector<std::string> infoTexts() const { return sink.texts(MessageKind::Info); }
    std::vector<std::string> debugTexts() const { return sink.texts(MessageKind::Debug); }
    // Shift or shiftWrite events, in order.
    std::vector<ScanEvent> shifts() const {
        std::vector<ScanEvent> out;
        for (const ScanEvent& event : port.events)
            if (event.kind == ScanEvent::Kind::Shift || event.kind == ScanEvent::Kind::ShiftWrite)
                out.push_back(event);
        return out;
    }

    CapturingSink sink;
    ScopedSink scopedSink{&sink};
    RecordingScanPort port;
};

}  // namespace vorant::test::frame
