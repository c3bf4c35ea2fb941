// The entry point: the one place that can refuse the load.

#include "lifecycle.h"

#include <boost/thread/detail/tss_hooks.hpp>
#include <windows.h>

extern "C" BOOL WINAPI DllMain(HINSTANCE module, DWORD reason, LPVOID reserved) {
    if (reason == DLL_PROCESS_DETACH && reserved) TAVO::OnProcessEnd();
    if (reason == DLL_PROCESS_DETACH && !reserved) {
        // Boost's thread slot, which nobody else gives back when Boost is part of a DLL.
        boost::on_thread_exit();
        boost::on_process_exit();
    }
    if (reason != DLL_PROCESS_ATTACH) return TRUE;
    if (!TAVO::OnLoad()) return FALSE;
    DisableThreadLibraryCalls(module); // refused where the runtime has thread-local storage; nothing depends on it
    return TRUE;
}
