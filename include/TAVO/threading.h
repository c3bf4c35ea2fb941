#pragma once
// Locks, events and threads, shared by copying a handle.
//
// A copy of a handle is the same lock, event or thread. A lock or event is destroyed with its last handle, which must
// not happen while it is held or waited for. A handle without one (its allocation failed, or it was moved from) does
// nothing: Enter and Leave return, TryEnter answers false, Wait answers WaitNoState.
//
// Threads: every operation of locks and events may be called from any thread, on one handle object too. Misuse of locks
// (leaving what is not held, leaving from another thread) is not detected.
//
// Time-outs are in milliseconds; 0 only tries, 0xFFFFFFFF waits without limit. For locks the deadline is a time of the
// system clock: setting that clock forward ends a wait early, setting it back prolongs it. All else goes by a clock
// that nobody sets.
//
// Interruption: CPThread::Terminate asks a thread that a CPThread started to end. The next wait for an event or a
// thread there, or the next sleep, then throws boost::thread_interrupted, the only exception that ever leaves the
// library; it is caught where the thread began. Code in between may catch it to clean up and should throw it on.
// Waiting for a lock is no interruption point, and no other thread ever sees the exception.

#include <atomic>
#include <TAVO/acfbase.h>
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

/// What a wait answers besides 0 (or the index) of success.
constexpr unsigned long long WaitTimedOut = ~0ULL;    ///< -1: the time is over
constexpr unsigned long long WaitNoState = ~0ULL - 1; ///< -2: the handle is empty, or there is nothing to wait for

/// A flag to wait for. A manual-reset event stays set until Reset and lets every waiter pass; an auto-reset event lets
/// one waiter pass per Set, the longest waiting one, and keeps the signal when nobody waits.
/// What a thread wrote before Set is visible behind the Wait that it ended.
/// Cost: Set, Reset and a Wait for a set event are one atomic operation while nobody waits.
class TAVO_API CPEvent : public Buffers::CPObjectMemory {
public:
    static const Buffers::tagCPOVTABL _vtbl;
    /// The identity of the class, the same for every instance.
    static unsigned long long GetTypeID() noexcept { return reinterpret_cast<std::size_t>(&_vtbl); }

    /// A new event, not set; an empty handle without memory.
    /// @param manual  true: manual reset
    explicit CPEvent(bool manual) noexcept;

    /// Sets the event. @p pSource is reserved and must be null; another value raises an assertion, and the event is set
    /// all the same.
    void Set(const void* pSource = nullptr) const noexcept;
    /// Takes a signal back that nobody has used.
    void Reset() const noexcept;
    /// Waits until the event is set, @p ms at most: 0 when it is, else WaitTimedOut; WaitNoState for an empty handle.
    /// An interruption point, which never uses up a signal when it throws.
    unsigned long long Wait(ulong32 ms) const;
};

/// Several events, to wait for the first that is set. It is set exactly while an attached event is, and has no signal
/// of its own. It keeps its events alive.
class TAVO_API CPMultipleEvent : public Buffers::CPObjectMemory {
public:
    static const Buffers::tagCPOVTABL _vtbl;
    /// The identity of the class, the same for every instance.
    static unsigned long long GetTypeID() noexcept { return reinterpret_cast<std::size_t>(&_vtbl); }

    /// Without events; an empty handle without memory.
    CPMultipleEvent() noexcept;

    /// Appends @p event; false when it is empty or attached already, and without memory.
    bool Attach(const CPEvent& event) const noexcept;
    /// Takes @p event out and closes the gap; false when it is not attached, and without memory.
    bool Detach(const CPEvent& event) const noexcept;
    /// Resets the event at @p index; false when there is none.
    bool Reset(std::size_t index) const noexcept;
    /// Waits until an attached event is set, @p ms at most: the index of the event, the lowest when several are set, of
    /// which an auto-reset event is used up. Else WaitTimedOut; WaitNoState for an empty handle, when nothing is
    /// attached, and without the memory that a wait for more than 8 events needs. Works on the events attached when it
    /// begins. An interruption point, which never uses up a signal when it throws.
    unsigned long long Wait(ulong32 ms) const;
};

/// What became of a run.
enum eThreadState : std::uint32_t {
    ThreadNotStarted = 0,
    ThreadRunning = 1,
    ThreadFailed = 2, ///< ended by an exception
    ThreadEnded = 3
};

/// What a thread runs: an interface inside the payload of a block, found by the block's type table. The slots are the
/// same for every compiler.
struct IThreadExecute {
    /// Runs on the new thread; gets the parameter of CPThread::Execute. An exception ends the run and goes no further.
    virtual void Run(unsigned long long parameter) = 0;
    /// An eThreadState; any thread may ask.
    virtual unsigned int GetState() = 0;
    /// The interface of the identified class, null when it is unknown.
    virtual void* QueryInterface(_acfUID const& type) = 0;

protected:
    ~IThreadExecute() = default; // only through the block
};

} // namespace Threading
} // namespace TAVO

template <> struct acfTypeOf<TAVO::Threading::IThreadExecute> {
    static constexpr _acfUID uid = {0xC877D5B8, 0xB364, 0x48DC, {0xA8, 0xC7, 0x7D, 0xFD, 0xEE, 0x03, 0x18, 0x38}};
};

namespace TAVO {
namespace Threading {

/// Makes a class something that a thread can run. T must have a default constructor, an operation
/// `void Run(unsigned long long parameter)` and its class identifier, `static constexpr _acfUID uid`.
/// Each module has its own type of block for T: one that another module created is not recognised by From.
template <class T> class CThreadWrapper final : public IThreadExecute {
public:
    static const Buffers::tagCPOVTABL _vtbl;

    /// A block that holds a wrapper with a new T; empty without memory or when the constructor of T throws.
    static Buffers::CPObjectMemory Create() noexcept { return Handle::Make(); }
    /// The wrapper inside a block; null for any other block. Lives as long as the block.
    static CThreadWrapper* From(const Buffers::CPObjectMemory& object) noexcept {
        const bool mine = object.IsType(reinterpret_cast<std::size_t>(&_vtbl));
        return mine ? static_cast<const Handle&>(object).Wrapper() : nullptr;
    }

    /// What is run. It may be used while the thread runs as far as it allows that itself.
    T& Object() noexcept { return m_object; }

    void Run(unsigned long long parameter) override {
        m_state = ThreadRunning;
        try {
            m_object.Run(parameter);
            m_state = ThreadEnded;
        } catch (...) {
            m_state = ThreadFailed;
        }
    }
    unsigned int GetState() override { return m_state; }
    /// The T for its class identifier; null for any other.
    void* QueryInterface(_acfUID const& type) override { return acfIsSame(type, T::uid) ? &m_object : nullptr; }

private:
    // Lifts the protection of the block; adds nothing.
    struct Handle : Buffers::CPObjectMemory {
        using Buffers::CPObjectMemory::CPObjectMemory;

        CThreadWrapper* Wrapper() const noexcept { return static_cast<CThreadWrapper*>(Payload()); }

        static Buffers::CPObjectMemory Make() noexcept { return Handle(NewObject<CThreadWrapper>(&_vtbl)); }
    };

    static void CreateIn(void* payload, std::size_t) { ::new (payload) CThreadWrapper; }
    static void Finalize(void* payload, std::size_t) { static_cast<CThreadWrapper*>(payload)->~CThreadWrapper(); }
    static void* Query(void* payload, const _acfUID& type) {
        auto* wrapper = static_cast<CThreadWrapper*>(payload);
        const bool execute = acfIsSame(type, acfTypeOf<IThreadExecute>::uid);
        return execute ? static_cast<IThreadExecute*>(wrapper) : wrapper->QueryInterface(type);
    }

    friend class Buffers::CPObjectMemory; // builds it

    CThreadWrapper() = default;
    ~CThreadWrapper() = default;

    T m_object{};
    std::atomic<std::uint32_t> m_state{ThreadNotStarted};
};

template <class T>
const Buffers::tagCPOVTABL CThreadWrapper<T>::_vtbl = {CThreadWrapper::CreateIn, nullptr, CThreadWrapper::Finalize,
                                                       CThreadWrapper::Query};

/// A thread that runs what a block holds. Execute, Wait and Terminate are for one controlling thread.
/// The last handle may go while the thread runs; it then runs on by itself. The library must stay loaded until it ends.
class TAVO_API CPThread : public Buffers::CPObjectMemory {
public:
    static const Buffers::tagCPOVTABL _vtbl;
    /// The identity of the class, the same for every instance.
    static unsigned long long GetTypeID() noexcept { return reinterpret_cast<std::size_t>(&_vtbl); }

    /// Holds no thread.
    CPThread() noexcept = default;

    /// Starts a thread that calls IThreadExecute::Run of @p object with @p parameter. The thread keeps the object until
    /// the run ends. False when this handle holds a thread, the object has no such interface, and when memory or the
    /// system refuses.
    bool Execute(const Buffers::CPObjectMemory& object, unsigned long long parameter) noexcept;
    /// Waits until the thread has ended, @p ms at most: 0 when it has, and the handle is empty afterwards; else
    /// WaitTimedOut, at once on the thread itself. WaitNoState for an empty handle. An interruption point.
    unsigned long long Wait(ulong32 ms);
    /// Interrupts the thread and waits 5 seconds for its end; true when it has ended or there was none. A thread that
    /// reaches no interruption point in that time is left to itself: false. On the thread itself: false, and its next
    /// interruption point ends it. The handle is empty in every case.
    bool Terminate() noexcept;
};

/// How much a thread matters to the scheduler.
enum eThreadPriority : std::int32_t {
    ThreadPriorityIdle = -2,
    ThreadPriorityLow = -1,
    ThreadPriorityNormal = 0,
    ThreadPriorityHigh = 1,
    ThreadPriorityTimeCritical = 2
};

namespace CurrentThread {

/// Sleeps @p ms milliseconds; returns at once for 0. An interruption point unless 0.
TAVO_API void sleep(ulong32 ms);

namespace OS {

/// Sets the calling thread's priority; a value outside the enumeration is normal. On Linux the level is only kept, for
/// GetThreadPriority: an ordinary user could not raise a thread again.
TAVO_API void SetThreadPriority(eThreadPriority priority) noexcept;
/// The calling thread's priority. Other steps of the system read as the nearest step away from normal: one above normal
/// is high, one below is low.
TAVO_API eThreadPriority GetThreadPriority() noexcept;

} // namespace OS
} // namespace CurrentThread

} // namespace Threading
} // namespace TAVO
