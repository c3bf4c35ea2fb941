// The maintenance thread: it runs requests when they fall due, and sleeps in between.
//
// One lock guards the list and "current", the request that runs. Requests run without it; asking them for due time and
// priority happens under it, so that a request is never called again once it was unregistered.

#include "maintenance.h"

#include "platform/platform.h"
#include "requests.h"

#include <atomic>
#include <boost/thread/thread.hpp>
#include <mutex>
#include <TAVO/develop.h>
#include <TAVO/threading.h>

namespace TAVO::Maintenance {

using Buffers::CPObjectMemory;
using Threading::CPCriticalSection;
using Threading::CPEvent;
using Threading::CPMultipleEvent;
using Threading::CPThread;

namespace OwnThread = Threading::CurrentThread::OS;

namespace {

constexpr char kSource[] = "source/TAVO/maintenance";
constexpr wchar_t kCategory[] = L"TAVO";

constexpr std::uint32_t kStepMilliseconds = 5;     // between two looks whether a run has ended
constexpr std::uint64_t kPatience = 10000;         // milliseconds that unregistering waits for a run
constexpr std::uint64_t kLongestWait = 0xFFFFFFFE; // one less than "without limit"

// The lock under the names of the standard.
class RegistryLock {
public:
    void lock() noexcept { m_section.Enter(); }
    void unlock() noexcept { m_section.Leave(); }
    bool IsThere() const noexcept { return m_section.key() != 0; }

private:
    CPCriticalSection m_section;
};

struct Registry {
    RegistryLock lock;
    RequestList requests;
    Entry current;       // what runs; its block is empty between runs
    bool asking = false; // a request is being asked: it must not change the list under its own feet

    CPEvent stop{true}, wake{true};

    CPMultipleEvent events; // stop first, so that it wins, then wake
    const bool attached = events.Attach(stop) && events.Attach(wake);

    // The thread; under g_lifecycleMutex.
    CPThread thread;
    void* hold = nullptr; // keeps the library mapped while the thread runs
    std::atomic<std::uint32_t> threadId{0};
    std::atomic<bool> running{false};
    std::atomic<bool> stopping{false}; // as the stop event says, for those who only look

    bool IsComplete() const noexcept { return lock.IsThere() && attached; }
    bool IsCurrent(const CPObjectMemory& request, std::size_t position) const noexcept {
        return current.block.key() != 0 && current.Is(request, position);
    }
};

// In storage that no destructor touches: taken down by Unload, in its place among the library's other objects.
alignas(Registry) unsigned char g_storage[sizeof(Registry)];
constinit std::atomic<Registry*> g_registry{nullptr}; // null before Load and after Unload

// The registry when it can be used.
Registry* TheRegistry() noexcept {
    Registry* registry = g_registry;
    return registry && registry->IsComplete() ? registry : nullptr;
}

// Marks the stretch in which requests are asked. Requires: the lock held.
class Asking {
public:
    explicit Asking(Registry& registry) noexcept : m_registry(registry) { registry.asking = true; }
    ~Asking() { m_registry.asking = false; }
    Asking(const Asking&) = delete;
    Asking& operator=(const Asking&) = delete;

private:
    Registry& m_registry;
};

// Where the request's interface lies in its block; all-ones when it has none.
std::size_t PositionOf(const CPObjectMemory& request) noexcept {
    class Query : public CPObjectMemory {
    public:
        using CPObjectMemory::queryinterface;
    };
    return Query::queryinterface(request, acfTypeOf<IMaintenanceRequest>::uid);
}

// The request's name for a log line; foreign code, called without the lock.
const wchar_t* NameOf(const CPObjectMemory& request, std::size_t position) noexcept {
    try {
        return Entry{request, position}.Request().GetName();
    } catch (...) {
        return nullptr;
    }
}

// --- the thread ------------------------------------------------------------------------------------------------------

// Chooses, and makes the chosen one current. False when nothing is due, or the thread is to stop.
bool MakeCurrent(Registry& registry) noexcept {
    if (registry.stopping) return false;
    const std::lock_guard lock(registry.lock);
    const Asking asking(registry);
    const Entry* chosen = registry.requests.At(registry.requests.Choose(Core::OS::GetTimeNow()));
    if (!chosen) return false;
    registry.current = *chosen;
    return true;
}

bool RunCurrent(Registry& registry) noexcept {
    try {
        registry.current.Request().Run();
        return true;
    } catch (...) {
        return false;
    }
}

void FinishCurrent(Registry& registry, bool succeeded) noexcept {
    Entry ended, removed; // dropped without the lock
    const std::lock_guard lock(registry.lock);
    ended = std::exchange(registry.current, Entry());
    const std::size_t index = registry.requests.Find(ended.block, ended.position);
    Entry* entry = registry.requests.At(index);
    if (!entry) return;
    if (!succeeded) entry->flags |= Entry::Retired;
    if (entry->flags & Entry::RemoveAfterRun) removed = registry.requests.Take(index);
}

bool RunMostUrgent(Registry& registry) noexcept {
    if (!MakeCurrent(registry)) return false;
    FinishCurrent(registry, RunCurrent(registry));
    return true;
}

ulong32 TimeToNextDue(Registry& registry) noexcept {
    const std::lock_guard lock(registry.lock);
    const Asking asking(registry);
    unsigned long long due;
    if (!registry.requests.NextDue(due)) return Threading::WaitForever;
    const unsigned long long now = Core::OS::GetTimeNow();
    if (due <= now) return 0;
    // Not cut to 32 bits: that could give 0, or "for ever". Waking early does no harm.
    return static_cast<ulong32>(due - now < kLongestWait ? due - now : kLongestWait);
}

class CMaintenanceThread {
public:
    static constexpr _acfUID uid = {0x24508B8F, 0xA78E, 0x4243, {0x9E, 0x68, 0x71, 0xAA, 0x02, 0x9C, 0x83, 0x8A}};

    void Run(unsigned long long) {
        Registry& registry = *g_registry.load();
        registry.threadId = Platform::GetThreadId();
        ulong32 wait;
        do {
            OwnThread::SetThreadPriority(Threading::ThreadPriorityNormal);
            registry.wake.Reset(); // before the choice: whoever wakes from now on is heard by the wait
            while (RunMostUrgent(registry)) {
            }
            wait = TimeToNextDue(registry);
            OwnThread::SetThreadPriority(Threading::ThreadPriorityIdle);
        } while (registry.events.Wait(wait) != 0);
        OwnThread::SetThreadPriority(Threading::ThreadPriorityNormal);
    }
};

// Waits for the thread to end and gives back what it held. False when the time is over.
bool Join(Registry& registry, ulong32 milliseconds) noexcept {
    const boost::this_thread::disable_interruption uninterrupted; // a host's thread may be asked to end in here
    if (registry.thread.Wait(milliseconds) != 0) return false;
    registry.threadId = 0;
    registry.running = false;
    Platform::DropLibrary(std::exchange(registry.hold, nullptr));
    return true;
}

} // namespace

// --- start and stop --------------------------------------------------------------------------------------------------

void Load() noexcept {
    if (!g_registry) g_registry = ::new (static_cast<void*>(g_storage)) Registry;
}

bool Unload(std::uint32_t milliseconds) noexcept {
    Registry* registry = g_registry;
    if (!registry) return true;
    if (registry->running) {
        AskToStop();
        if (!Join(*registry, milliseconds)) return false;
    }
    g_registry = nullptr;
    registry->~Registry();
    return true;
}

bool Start() noexcept {
    Registry* registry = TheRegistry();
    if (!registry) return false;
    if (registry->running) return true;
    registry->stopping = false;
    registry->stop.Reset();
    registry->wake.Reset();
    Develop::_logWrite(acfDebugInfo, kCategory, kSource, 0, L"Starting maintenance thread");
    registry->hold = Platform::HoldLibrary();
    registry->running =
        registry->hold && registry->thread.Execute(Threading::CThreadWrapper<CMaintenanceThread>::Create(), 0);
    if (!registry->running) Platform::DropLibrary(std::exchange(registry->hold, nullptr));
    return registry->running;
}

void Stop() noexcept {
    Registry* registry = TheRegistry();
    if (!Develop::_isfalse_(registry && registry->running, "source/TAVO/maintenance,431:g_cpMRThread")) return;
    AskToStop();
    Join(*registry, Threading::WaitForever);
}

bool IsOwnThread() noexcept {
    const Registry* registry = g_registry;
    return registry && registry->threadId == Platform::GetThreadId();
}

void AskToStop() noexcept {
    Registry* registry = TheRegistry();
    if (!registry) return;
    registry->stopping = true;
    registry->stop.Set();
}

bool IsStopPending() noexcept {
    Registry* registry = TheRegistry();
    return registry && registry->running && registry->stopping;
}

// --- the public names ------------------------------------------------------------------------------------------------

bool RegisterRequest(const CPObjectMemory& request) noexcept {
    Registry* registry = TheRegistry();
    const std::size_t position = PositionOf(request);
    if (!registry || position == Buffers::NotFound) return false;
    Entry replaced; // dropped without the lock
    {
        const std::lock_guard lock(registry->lock);
        if (registry->asking) return false;
        const std::size_t index = registry->requests.Find(request, position);
        const Entry* known = registry->requests.At(index);
        if (known && (!known->IsRetired() || registry->IsCurrent(request, position))) return false;
        if (!registry->requests.Append(request, position)) return false;
        if (known) replaced = registry->requests.Take(index);
    }
    registry->wake.Set();
    return true;
}

bool UnregisterRequest(const CPObjectMemory& request) noexcept {
    if (request.key() == 0) return false;
    Registry* registry = TheRegistry();
    const std::size_t position = PositionOf(request);
    if (!registry || position == Buffers::NotFound) return true; // never was registered

    const std::uint64_t deadline = Platform::GetProcessMilliseconds() + kPatience;
    for (bool late = false;; late = Platform::GetProcessMilliseconds() >= deadline) {
        Entry removed; // dropped without the lock
        {
            const std::lock_guard lock(registry->lock);
            if (registry->asking) return false;
            const std::size_t index = registry->requests.Find(request, position);
            Entry* entry = registry->requests.At(index);
            if (!registry->IsCurrent(request, position)) {
                if (entry) removed = registry->requests.Take(index);
                return true;
            }
            if (entry) entry->flags |= late ? Entry::Retired | Entry::RemoveAfterRun : Entry::Retired;
        }
        if (late) break;
        // Intended (unregister-own-run): also from inside the request's own run, which cannot end meanwhile. A textbook
        // would refuse at once.
        Platform::SleepMilliseconds(kStepMilliseconds);
    }
    Develop::_logWrite(acfDebugError, kCategory, kSource, 0,
                       L"Service for %ls can not unregister due to pending condition...", NameOf(request, position));
    return false;
}

bool Wake() noexcept {
    Registry* registry = TheRegistry();
    if (!registry || !registry->running) return false;
    registry->wake.Set();
    return true;
}

bool IsRunning() noexcept {
    const Registry* registry = TheRegistry();
    return registry && registry->running;
}

} // namespace TAVO::Maintenance
