#pragma once
// Locks that threads share by copying a handle.
//
// A copy of a handle is the same lock; it is destroyed with the last handle, which must not happen while it is held or
// waited for. A handle without a lock (its allocation failed, or it was moved from) does nothing: Enter and Leave
// return, TryEnter answers false.
//
// Threads: every operation may be called from any thread, on one handle object too. Misuse (leaving what is not held,
// leaving from another thread) is not detected. Waiting for a lock is no interruption point.
//
// Time-outs are in milliseconds; 0 only tries, 0xFFFFFFFF waits without limit. The deadline is a time of the system
// clock: setting that clock forward ends a wait early, setting it back prolongs it.

#include <TAVO/buffers.h>

namespace TAVO {
namespace Threading {

/// The time-out that waits without limit.
constexpr ulong32 WaitForever = 0xFFFFFFFF;

/// A plain lock. Not re-entrant: a second Enter by its owner blocks for ever.
class TAVO_API CPMutex : public Buffers::CPObjectMemory {
public:
    static const Buffers::tagCPOVTABL _vtbl;
    /// The identity of the class, the same for every instance.
    static unsigned long long GetTypeID() noexcept { return reinterpret_cast<std::size_t>(&_vtbl); }

    /// A new lock that nobody holds; an empty handle without memory.
    CPMutex() noexcept;

    /// Waits until the lock is taken.
    void Enter() const noexcept;
    /// Waits until the lock is taken, @p ms at most; false when the time is over.
    bool TryEnter(ulong32 ms) const noexcept;
    /// Gives the lock back and wakes one waiter.
    void Leave() const noexcept;
};

/// A lock that its owner may take again; it must be left as often as it was entered.
/// Cost: taking it again costs no atomic operation.
class TAVO_API CPCriticalSection : public Buffers::CPObjectMemory {
public:
    static const Buffers::tagCPOVTABL _vtbl;
    /// The identity of the class, the same for every instance.
    static unsigned long long GetTypeID() noexcept { return reinterpret_cast<std::size_t>(&_vtbl); }

    /// A new lock that nobody holds; an empty handle without memory.
    CPCriticalSection() noexcept;

    /// Waits until the lock is taken; its owner only counts.
    void Enter() const noexcept;
    /// As Enter, waiting @p ms at most; false when the time is over. The owner always gets true.
    bool TryEnter(ulong32 ms) const noexcept;
    /// Takes back one Enter; the last one frees the lock.
    void Leave() const noexcept;
};

/// A lock for many readers or one writer. The writer may enter again, for writing and for reading, up to 65535 times
/// each. Everything must be left as often as it was entered, and a writer's reads before its last Leave. A waiting
/// writer holds new readers back; so a reader that enters again may block for ever, and a reader cannot become the
/// writer.
class TAVO_API CPRWInterlock : public Buffers::CPObjectMemory {
public:
    static const Buffers::tagCPOVTABL _vtbl;
    /// The identity of the class, the same for every instance.
    static unsigned long long GetTypeID() noexcept { return reinterpret_cast<std::size_t>(&_vtbl); }

    /// A new lock that nobody holds; an empty handle without memory.
    CPRWInterlock() noexcept;

    /// Waits until the calling thread is the writer. Beyond the writer's 65535th repetition it raises an assertion and
    /// does not count.
    void Enter() const noexcept;
    /// Waits until the calling thread is a reader; the writer never waits. Limited as Enter.
    void EnterRead() const noexcept;
    /// As Enter, waiting @p ms at most; false when the time is over, and beyond the limit.
    bool TryEnter(ulong32 ms) const noexcept;
    /// As EnterRead, waiting @p ms at most; false when the time is over, and beyond the limit.
    bool TryEnterRead(ulong32 ms) const noexcept;
    /// Takes back one Enter.
    void Leave() const noexcept;
    /// Takes back one EnterRead.
    void LeaveRead() const noexcept;
};

} // namespace Threading
} // namespace TAVO
