#include "loading/loading.h"

// clang-format off
#include <windows.h>
#include <psapi.h>
// clang-format on

namespace loading {

void* LoadPlugin() { return LoadLibraryW(L"TAVOTestPlugin.dll"); }
void Unload(void* plugin) { FreeLibrary(static_cast<HMODULE>(plugin)); }
void* Find(void* plugin, const char* name) {
    return reinterpret_cast<void*>(GetProcAddress(static_cast<HMODULE>(plugin), name));
}

bool IsLibraryLoaded() { return GetModuleHandleW(L"TAVO.dll") != nullptr; }

std::size_t PrivateBytes() {
    PROCESS_MEMORY_COUNTERS_EX counters = {};
    GetProcessMemoryInfo(GetCurrentProcess(), reinterpret_cast<PROCESS_MEMORY_COUNTERS*>(&counters), sizeof(counters));
    return counters.PrivateUsage;
}

std::size_t FirstFreeSlot() {
    const DWORD slot = TlsAlloc();
    TlsFree(slot);
    return slot;
}

} // namespace loading
