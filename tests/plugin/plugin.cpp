// A plug-in: linked with the library, loaded by a host at run time. Its static object is made when it is loaded and
// ended when it is unloaded, both times with the pool at hand.

#include "identities.h"
#include "pool.h"

#include <new>
#include <vector>

using namespace TAVO;

namespace {

struct Static {
    String::CPPoolString text{plugin::kHeldText};
    const wchar_t** late = nullptr;
    ~Static() {
        const String::CPPoolString interned(plugin::kLateText);
        if (late) *late = interned;
    }
} g_static;

// Everything that has state of a thread or of the process behind it.
void Use() {
    const String::CPPoolString text(L"A text of this cycle");
    Threading::CPCriticalSection section;
    section.Enter();
    section.Leave();
    Threading::CPEvent event(false);
    event.Set();
    event.Wait(0);
}

struct User {
    static constexpr _acfUID uid = {0x6D3C9E15, 0x2A40, 0x4B7F, {0x91, 0x5E, 0x0C, 0x4D, 0x71, 0xE8, 0x33, 0xA6}};
    void Run(unsigned long long) { Use(); }
};

} // namespace

extern "C" {
TAVO_EXPORT void TavoTestIdentities(identities::Way way, identities::Table* table) { *table = identities::Taken(way); }

TAVO_EXPORT const wchar_t* TavoTestHeldEntry(const wchar_t** late) {
    g_static.late = late;
    return g_static.text;
}

TAVO_EXPORT void TavoTestService(plugin::Deed deed, void** kept) {
    if (deed == plugin::Start) AppInit();
    if (deed == plugin::Use) Use();
    if (deed == plugin::RunAThread) {
        Threading::CPThread thread;
        thread.Execute(Threading::CThreadWrapper<User>::Create(), 0);
        thread.Wait(Threading::WaitForever);
    }
    if (deed == plugin::KeepHandles) ::new (static_cast<void*>(kept)) String::CPPoolString(L"Never let go");
    if (deed == plugin::Fill)
        for (std::vector<String::CPPoolString> held; held.size() < 2500000;) held.emplace_back(held.size() + 1000);
    if (deed == plugin::Sweep)
        for (int round = 0; round < 2; ++round) String::CStringPool::Collect(60000);
    if (deed == plugin::Stop) AppExit();
}
}
