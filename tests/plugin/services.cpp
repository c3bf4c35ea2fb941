// What a plug-in does with the library from its loading to its unloading, well and badly behaved.

#include "services.h"

#include <new>
#include <TAVO/string.h>
#include <TAVO/threading.h>

namespace {

// Everything that has state of a thread or of the process behind it.
void Use() {
    const TAVO::String::CPPoolString text(L"A text of this cycle");
    TAVO::Threading::CPCriticalSection section;
    section.Enter();
    section.Leave();
    TAVO::Threading::CPEvent event(false);
    event.Set();
    event.Wait(0);
}

struct Sleeper {
    static constexpr _acfUID uid = {0x6D3C9E15, 0x2A40, 0x4B7F, {0x91, 0x5E, 0x0C, 0x4D, 0x71, 0xE8, 0x33, 0xA6}};
    void Run(unsigned long long) { Use(); }
};

} // namespace

extern "C" TAVO_EXPORT void TavoTestService(plugin::Deed deed, void** kept) {
    switch (deed) {
    case plugin::Start:
        TAVO::AppInit();
        break;
    case plugin::Use:
        Use();
        break;
    case plugin::RunAThread: {
        TAVO::Threading::CPThread thread;
        thread.Execute(TAVO::Threading::CThreadWrapper<Sleeper>::Create(), 0);
        thread.Wait(TAVO::Threading::WaitForever);
        break;
    }
    case plugin::KeepHandles:
        ::new (static_cast<void*>(kept)) TAVO::String::CPPoolString(L"Never let go");
        break;
    case plugin::Stop:
        TAVO::AppExit();
        break;
    }
}
