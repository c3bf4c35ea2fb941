// The entry point: the one place that can refuse the load.

#include "lifecycle.h"

#include <windows.h>

extern "C" BOOL WINAPI DllMain(HINSTANCE module, DWORD reason, LPVOID reserved) {
    if (reason == DLL_PROCESS_DETACH && reserved) TAVO::OnProcessEnd();
    if (reason != DLL_PROCESS_ATTACH) return TRUE;
    if (!TAVO::OnLoad()) return FALSE;
    DisableThreadLibraryCalls(module); // refused where the runtime has thread-local storage; nothing depends on it
    return TRUE;
}
