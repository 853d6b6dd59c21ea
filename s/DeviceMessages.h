#pragma once
// Every message of the device names the same domain, source and revision;
// only the line changes. DEVICE_MESSAGE() opens a message at the line that
// issues it:  DEVICE_MESSAGE().issueStatus("'%d': Erasing Device.\n", index);

#include "host/Port_MsgManData.h"

#ifndef VORANT_REVISION
#  define VORANT_REVISION "unversioned"
#endif

namespace vorant::device {
inline constexpr const char* kMessageDomain = "Vorant";
inline constexpr const char* kMessageSource = "../s/Type1SPIDevice";
inline constexpr const char* kRevision = VORANT_REVISION;
}  // namespace vorant::device

#define DEVICE_MESSAGE()                                                                      \
    Port_MsgManData::createObject(vorant::device::kMessageDomain,                             \
                                  vorant::device::kMessageSource, __LINE__,                   \
                                  vorant::device::kRevision)
