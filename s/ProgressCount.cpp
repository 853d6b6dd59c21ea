// Progress steps per operation, for the host's progress display: pages for
// the page operations, erase progress increments for the erase, and for
// program its pages plus the erase and verify its switches start.

#include "s/Type1SPIDevice.h"

#include "host/ConfigData.h"
#include "host/UT_CMDARGS.h"
#include "host/UT_STR.h"

#include <climits>
#include <cstdint>

namespace {

bool switchGiven(const UT_CMDARGS* args, const char* name) {
    return args != nullptr && args->getsw(name, 0) != nullptr;
}

// A divisor of 0 or less counts no steps rather than dividing by zero.
std::int64_t steps(std::int64_t span, std::int32_t divisor) { return divisor > 0 ? span / divisor : 0; }

}  // namespace

int Type1SPIDevice::getOperationProgressCount(const char* operation, UT_CMDARGS* args) {
    const auto named = [operation](const char* name) { return UT_STR::ICompare(operation, name) == 0; };
    // Wide, so that no sum of terms can overflow before it is clamped.
    std::int64_t count = 0;

    if (named("program")) {
        // No configuration data: nothing to program, so no steps of its own.
        if (ConfigDataReader* reader = getConfigData(); reader != nullptr && totalShiftSize_ > 0)
            count += reader->dataSize() / static_cast<unsigned>(totalShiftSize_);
        if (args != nullptr) {
            if (switchGiven(args, "-e") || switchGiven(args, "-erase"))
                count += getOperationProgressCount("erase", nullptr);
            if (switchGiven(args, "-v") || switchGiven(args, "-verify"))
                count += getOperationProgressCount("verify", nullptr);
        }
    }
    // verify counts the whole flash although it reads only the data's range.
    if (named("verify")) count += steps(deviceSize_, pageSize_);
    if (named("erase"))
        count += steps(static_cast<std::int64_t>(progressEraseMaxWaitTime_) - progressEraseWaitTime_,
                       progressEraseWaitTimeInc_);
    if (named("blankcheck")) count += steps(deviceSize_, pageSize_);
    if (named("readbacktofile")) count += steps(deviceSize_, pageSize_);

    if (count > INT_MAX) return INT_MAX;
    if (count < INT_MIN) return INT_MIN;
    return static_cast<int>(count);
}
