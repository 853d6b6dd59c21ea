// The plug-in as a host that knows only the factory sees it: loaded by
// name, a device created through the exported function and destroyed
// through the base class.

#include "host/Device.h"
#include "host/Port_MsgManData.h"
#include "tests/support/TestParts.h"

#include <gtest/gtest.h>

#include <dlfcn.h>
#include <unistd.h>

#include <climits>
#include <cstdlib>
#include <string>

namespace vorant::test {
namespace {

// VORANT_BIN_DIR when the test runs under ctest, else the folder of this
// test program (plug-in and tests are built side by side).
std::string binaryDirectory() {
    if (const char* dir = std::getenv("VORANT_BIN_DIR")) return dir;
    char path[PATH_MAX] = {};
    const ssize_t length = readlink("/proc/self/exe", path, sizeof path - 1);
    if (length <= 0) return ".";
    std::string executable(path, static_cast<std::size_t>(length));
    return executable.substr(0, executable.find_last_of('/'));
}

TEST(FrameLoad, HostCreatesAndDestroysADeviceThroughTheFactoryAlone) {
    const std::string library = binaryDirectory() + "/libVorantType1SPIDevice.so";
    void* handle = dlopen(library.c_str(), RTLD_NOW | RTLD_LOCAL);
    ASSERT_NE(handle, nullptr) << dlerror();

    using Factory = DeviceOperation* (*)(const char*);
    auto factory = reinterpret_cast<Factory>(dlsym(handle, "create_type1_spi_device"));
    ASSERT_NE(factory, nullptr) << dlerror();

    addTestPart("FRAME_LOADED", w25q128Properties());
    DeviceOperation* device = factory("FRAME_LOADED");
    ASSERT_NE(device, nullptr);
    // A device without a port fails its scans instead of crashing.
    EXPECT_FALSE(device->spienable(0, nullptr));
    delete device;  // through the base: the destructor is virtual

    EXPECT_EQ(dlclose(handle), 0);
}

TEST(FrameLoad, LoadingConstructsTheHostInitialisersInOrder) {
    const std::string log = Port::initialiserLog();
    EXPECT_NE(log.find("+FileInit +PathListInit +InstanceTableInit +FactoryInit +Port_MsgManInit "),
              std::string::npos)
        << log;
}

}  // namespace
}  // namespace vorant::test
