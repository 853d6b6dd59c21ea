// What the plug-in library does when it is loaded and unloaded: it brings up
// the host's portability layer it relies on, and nothing else. The plug-in
// holds no other global state.

#include "host/Port_MsgManData.h"

#if defined(_WIN32)
#  ifndef WIN32_LEAN_AND_MEAN
#    define WIN32_LEAN_AND_MEAN
#  endif
#  include <windows.h>
#endif

namespace {

// Members are constructed in declaration order when the library is loaded
// and destroyed in the reverse order when it is unloaded, on every platform.
struct HostInitialisers {
    Port::FileInit file;
    Port::PathListInit pathList;
    CitP::InstanceTableInit instanceTable;
    CitP::FactoryInit factory;
    Port_MsgManInit messageManager;
};

HostInitialisers hostInitialisers;

}  // namespace

#if defined(_WIN32)
// The plug-in starts no threads and keeps no per-thread state, so the
// thread attach and detach notifications are only overhead.
extern "C" BOOL WINAPI DllMain(HINSTANCE instance, DWORD reason, LPVOID /*reserved*/) {
    if (reason == DLL_PROCESS_ATTACH) DisableThreadLibraryCalls(instance);
    return TRUE;
}
#endif
