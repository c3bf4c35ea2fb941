#pragma once
// Background upkeep: requests that one thread of the library runs when they fall due.
//
// The thread exists from the first AppInit to the last AppExit. It picks the most urgent request that is due, runs it,
// and goes on until nothing is due; then it sleeps at idle priority until the next one is. Every pass in which a
// request was due and another one was chosen raises its priority by one, so that everyone's turn comes.

#include <TAVO/buffers.h>

namespace TAVO {
namespace Maintenance {

/// Work for the maintenance thread. Implemented by an object in a block of object memory whose type table answers
/// acfTypeOf<IMaintenanceRequest>::uid with the address of this base; CPRequest makes such blocks.
///
/// Due time and priority are asked often, on the maintenance thread, while the list of requests is locked: they must
/// answer at once, take no lock that is held around calls of this header, and cannot register or unregister anything.
/// A request that throws is retired: it stays in the list but is never called again.
struct IMaintenanceRequest {
    /// Names the request in log lines: constant text, readable on any thread.
    virtual const wchar_t* GetName() = 0;
    /// When to run next, in milliseconds of Core::OS::GetTimeNow; in the past means at once. A run must move it
    /// forward: a request that stays due is run again and again and keeps the thread busy.
    virtual unsigned long long GetDueTime() = 0;
    /// One pass of work, on the maintenance thread, at normal priority and without any lock. Requests share the
    /// thread, so it should be short.
    virtual void Run() = 0;
    /// The more, the more urgent among those that are due.
    virtual std::int32_t GetPriority() = 0;

protected:
    ~IMaintenanceRequest() = default; // by its block
};

/// Adds a request to the end of the list and wakes the thread. Works before AppInit too: entries wait for the thread,
/// and survive a stop. The list holds a reference on the block until the request is unregistered.
/// @return false for an empty handle, a block without the interface, a request that is registered already, without
///         memory, and from GetDueTime and GetPriority. A retired request is registered anew once it no longer runs.
/// Threads: any. Cost: linear in the number of requests.
TAVO_API bool RegisterRequest(const Buffers::CPObjectMemory& request) noexcept;

/// Takes a request out of the list. True means that it is neither registered nor running any more, also when it never
/// was. A request that is running is waited for, 10 seconds at most; then an ERROR line is written and the answer is
/// false: it is removed when its run ends. From inside the request's own run that is always so: it waits the full time.
/// False at once for an empty handle, and from GetDueTime and GetPriority.
/// Threads: any.
TAVO_API bool UnregisterRequest(const Buffers::CPObjectMemory& request) noexcept;

/// Makes the thread ask its requests again, for one whose due time has come nearer. False when there is no thread.
/// Threads: any.
TAVO_API bool Wake() noexcept;

/// Whether the thread exists.
TAVO_API bool IsRunning() noexcept;

} // namespace Maintenance
} // namespace TAVO

/// The identifier of the interface of maintenance requests: 15603CD4-AB81-4D6F-B05F-C6BEA760A789.
template <> struct acfTypeOf<TAVO::Maintenance::IMaintenanceRequest> {
    static constexpr _acfUID uid = {0x15603CD4, 0xAB81, 0x4D6F, {0xB0, 0x5F, 0xC6, 0xBE, 0xA7, 0x60, 0xA7, 0x89}};
};

namespace TAVO {
namespace Maintenance {

/// A handle of a new block that holds one T, a class that implements IMaintenanceRequest. Copies share the object.
/// Empty without memory, or when T's constructor throws. The block calls code of the module that made it: unregister it
/// and let go of all handles before that module is unloaded.
template <class T> class CPRequest : public Buffers::CPObjectMemory {
public:
    template <class... Arguments> explicit CPRequest(Arguments&&... arguments) noexcept {
        static const Buffers::tagCPOVTABL table = {nullptr, nullptr, Finalize, QueryInterface};
        m_pMH = NewObject<T>(&table, std::forward<Arguments>(arguments)...);
    }
    CPRequest(const CPRequest&) noexcept = default;
    CPRequest(CPRequest& other) noexcept : CPRequest(static_cast<const CPRequest&>(other)) {}
    CPRequest(CPRequest&&) noexcept = default;
    CPRequest& operator=(const CPRequest&) noexcept = default;
    CPRequest& operator=(CPRequest&&) noexcept = default;

    /// The object; only for a handle that is not empty.
    T* operator->() const noexcept { return static_cast<T*>(Payload()); }

private:
    static void Finalize(void* payload, std::size_t) { static_cast<T*>(payload)->~T(); }
    static void* QueryInterface(void* payload, const _acfUID& type) {
        const bool known = acfIsSame(type, acfTypeOf<IMaintenanceRequest>::uid);
        return known ? static_cast<IMaintenanceRequest*>(static_cast<T*>(payload)) : nullptr;
    }
};

} // namespace Maintenance
} // namespace TAVO
