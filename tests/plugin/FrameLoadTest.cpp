// The plug-in as a host that knows only the factory sees it: loaded by
// name, a device created through the exported function and destroyed
// through the base class.

#include "host/Device.h"
#include "host/Port_MsgManData.h"
#include "host/VorantException.h"
#include "s/Type1SPIDevice.h"
#include "tests/support/TestParts.h"

#include <gtest/gtest.h>

#include <dlfcn.h>
#include <unistd.h>

#include <climits>
#include <string>

namespace vorant::test {
namespace {

TEST(FrameLoad, HostLoadsThePluginAndCreatesAndDestroysADeviceThroughTheFactoryAlone) {
    // The plug-in is built next to this program.
    char path[PATH_MAX] = {};
    ASSERT_GT(readlink("/proc/self/exe", path, sizeof path - 1), 0);
    const std::string program = path;
    void* handle = dlopen((program.substr(0, program.rfind('/')) + "/libVorantType1SPIDevice.so").c_str(), RTLD_NOW);
    ASSERT_NE(handle, nullptr) << dlerror();
    // The factory's own type: calling it through another would be undefined.
    using Factory = decltype(&create_type1_spi_device);
    auto factory = reinterpret_cast<Factory>(dlsym(handle, "create_type1_spi_device"));
    ASSERT_NE(factory, nullptr) << dlerror();

    addTestPart("FRAME_LOADED", w25q128Properties());
    DeviceOperation* device = factory("FRAME_LOADED");  // the host drives it through the table alone
    ASSERT_NE(device, nullptr);
    EXPECT_FALSE(device->spienable(0, nullptr));  // without a port its scans fail instead of crashing
    delete device;                                 // through the base: the destructor is virtual
    EXPECT_THROW(factory("FRAME_NO_SUCH_PART"), VorantException);  // the part database's error passes on
    EXPECT_EQ(dlclose(handle), 0);

    // Loading the plug-in brought up the host's portability layer, in order.
    const std::string log = Port::initialiserLog();
    EXPECT_NE(log.find("+FileInit +PathListInit +InstanceTableInit +FactoryInit +Port_MsgManInit "), std::string::npos)
        << log;
}

}  // namespace
}  // namespace vorant::test
