// Locks over the primitives of Boost.Thread: ownership, re-entrance, time-outs. Their exceptions end here.

#include "threadblocks.h"

#include <atomic>
#include <boost/thread/mutex.hpp>
#include <boost/thread/shared_mutex.hpp>
#include <chrono>
#include <TAVO/threading.h>

namespace TAVO::Threading {

namespace {

struct MutexState {
    boost::timed_mutex mutex;
};

// The owner is compared without the lock: only the owner itself can make the comparison succeed. It is stored whole,
// which is all that an exchange with an unused result would give; order comes from the mutex around it. Nested counts
// belong to the holder; they are atomic only so that misuse stays a mistake in logic.
struct CriticalSectionState {
    std::atomic<std::uint32_t> count{0};
    std::atomic<std::uint32_t> owner{0}; // 0: free
    boost::timed_mutex mutex;
};

struct InterlockState {
    boost::shared_mutex mutex;
    std::atomic<std::uint32_t> writer{0}; // 0: none
    std::atomic<std::uint16_t> nestedReads{0};
    std::atomic<std::uint16_t> nestedWrites{0};
};

// --- waiting --------------------------------------------------------------------------------------------------------

// The system clock in units of 100 ns. Boost waits for a deadline of a clock it does not know by looking at it again
// every 100 ms, which is what a clock that can be set needs.
struct SystemClock {
    using rep = std::int64_t;
    using period = boost::ratio<1, 10000000>;
    using duration = boost::chrono::duration<rep, period>;
    using time_point = boost::chrono::time_point<SystemClock>;

    // Rounded up, so that a wait is never shorter than asked for.
    static time_point now() {
        using Ticks = std::chrono::duration<rep, std::ratio<1, 10000000>>;
        const auto sinceEpoch = std::chrono::system_clock::now().time_since_epoch();
        return time_point(duration(std::chrono::ceil<Ticks>(sinceEpoch).count()));
    }
};

SystemClock::time_point DeadlineIn(ulong32 ms) {
    constexpr std::int64_t kTicksPerMillisecond = 10000;
    return SystemClock::now() + SystemClock::duration(kTicksPerMillisecond * ms);
}

template <class Take> bool TakeOrFail(Take take) noexcept {
    try {
        return take();
    } catch (...) {
        return false;
    }
}

template <class Mutex> bool TakeWithin(Mutex& mutex, ulong32 ms) noexcept {
    if (ms == WaitForever) {
        detail::TakeSurely([&] { mutex.lock(); });
        return true;
    }
    // A timed attempt of a writer would hold new readers back for a moment, which one that does not wait must not do.
    if (ms == 0) return TakeOrFail([&] { return mutex.try_lock(); });
    return TakeOrFail([&] { return mutex.try_lock_until(DeadlineIn(ms)); });
}

bool TakeSharedWithin(boost::shared_mutex& mutex, ulong32 ms) noexcept {
    if (ms == WaitForever) {
        detail::TakeSurely([&] { mutex.lock_shared(); });
        return true;
    }
    if (ms == 0) return TakeOrFail([&] { return mutex.try_lock_shared(); });
    return TakeOrFail([&] { return mutex.try_lock_shared_until(DeadlineIn(ms)); });
}

// --- counting: by the holder only -----------------------------------------------------------------------------------

template <class Count> void StepUp(std::atomic<Count>& count) {
    count.store(static_cast<Count>(count.load(std::memory_order_relaxed) + 1), std::memory_order_relaxed);
}

template <class Count> Count StepDown(std::atomic<Count>& count) {
    const auto value = static_cast<Count>(count.load(std::memory_order_relaxed) - 1);
    count.store(value, std::memory_order_relaxed);
    return value;
}

bool IsHeldBy(const std::atomic<std::uint32_t>& holder, std::uint32_t thread) {
    return holder.load(std::memory_order_relaxed) == thread;
}

// One repetition more, unless the count is at its end.
bool TryNest(std::atomic<std::uint16_t>& count) {
    if (count.load(std::memory_order_relaxed) == 0xFFFF) return false;
    StepUp(count);
    return true;
}

void Nest(std::atomic<std::uint16_t>& count) {
    if (!TryNest(count)) diagnostics::IllegalCodePoint("CPRWInterlock: entered more than 65535 times");
}

// Takes one repetition back; false when there is none.
bool Unnest(std::atomic<std::uint16_t>& count) {
    if (count.load(std::memory_order_relaxed) == 0) return false;
    StepDown(count);
    return true;
}

} // namespace

// --- CPMutex --------------------------------------------------------------------------------------------------------

const Buffers::tagCPOVTABL CPMutex::_vtbl = detail::kTable<MutexState>;

CPMutex::CPMutex() noexcept : CPObjectMemory(NewObject<MutexState>(&_vtbl)) {}

void CPMutex::Enter() const noexcept { TryEnter(WaitForever); }

bool CPMutex::TryEnter(ulong32 ms) const noexcept {
    auto* state = detail::StateOf<MutexState>(Payload());
    return state && TakeWithin(state->mutex, ms);
}

void CPMutex::Leave() const noexcept {
    if (auto* state = detail::StateOf<MutexState>(Payload())) state->mutex.unlock();
}

// --- CPCriticalSection ----------------------------------------------------------------------------------------------

const Buffers::tagCPOVTABL CPCriticalSection::_vtbl = detail::kTable<CriticalSectionState>;

CPCriticalSection::CPCriticalSection() noexcept : CPObjectMemory(NewObject<CriticalSectionState>(&_vtbl)) {}

namespace {

void Own(CriticalSectionState& state, std::uint32_t self) {
    state.owner.store(self, std::memory_order_relaxed);
    state.count.store(1, std::memory_order_relaxed);
}

// Out of line, so that the owner's way in stays without a frame.
TAVO_NOINLINE void TakeOwnership(CriticalSectionState& state, std::uint32_t self) noexcept {
    detail::TakeSurely([&] { state.mutex.lock(); });
    Own(state, self);
}

TAVO_NOINLINE bool TakeOwnershipWithin(CriticalSectionState& state, std::uint32_t self, ulong32 ms) noexcept {
    if (!TakeWithin(state.mutex, ms)) return false;
    Own(state, self);
    return true;
}

} // namespace

void CPCriticalSection::Enter() const noexcept {
    auto* state = detail::StateOf<CriticalSectionState>(Payload());
    if (!state) return;
    const std::uint32_t self = Platform::GetThreadId();
    if (IsHeldBy(state->owner, self)) return StepUp(state->count);
    TakeOwnership(*state, self);
}

bool CPCriticalSection::TryEnter(ulong32 ms) const noexcept {
    auto* state = detail::StateOf<CriticalSectionState>(Payload());
    if (!state) return false;
    const std::uint32_t self = Platform::GetThreadId();
    if (!IsHeldBy(state->owner, self)) return TakeOwnershipWithin(*state, self, ms);
    StepUp(state->count);
    return true;
}

void CPCriticalSection::Leave() const noexcept {
    auto* state = detail::StateOf<CriticalSectionState>(Payload());
    if (!state || StepDown(state->count) != 0) return;
    state->owner.store(0, std::memory_order_relaxed);
    state->mutex.unlock();
}

// --- CPRWInterlock --------------------------------------------------------------------------------------------------

const Buffers::tagCPOVTABL CPRWInterlock::_vtbl = detail::kTable<InterlockState>;

CPRWInterlock::CPRWInterlock() noexcept : CPObjectMemory(NewObject<InterlockState>(&_vtbl)) {}

void CPRWInterlock::Enter() const noexcept {
    auto* state = detail::StateOf<InterlockState>(Payload());
    if (!state) return;
    const std::uint32_t self = Platform::GetThreadId();
    if (IsHeldBy(state->writer, self)) return Nest(state->nestedWrites);
    TakeWithin(state->mutex, WaitForever);
    state->writer.store(self, std::memory_order_relaxed);
}

void CPRWInterlock::EnterRead() const noexcept {
    auto* state = detail::StateOf<InterlockState>(Payload());
    if (!state) return;
    if (IsHeldBy(state->writer, Platform::GetThreadId())) return Nest(state->nestedReads);
    TakeSharedWithin(state->mutex, WaitForever);
}

bool CPRWInterlock::TryEnter(ulong32 ms) const noexcept {
    auto* state = detail::StateOf<InterlockState>(Payload());
    if (!state) return false;
    const std::uint32_t self = Platform::GetThreadId();
    if (IsHeldBy(state->writer, self)) return TryNest(state->nestedWrites);
    if (!TakeWithin(state->mutex, ms)) return false;
    state->writer.store(self, std::memory_order_relaxed);
    return true;
}

bool CPRWInterlock::TryEnterRead(ulong32 ms) const noexcept {
    auto* state = detail::StateOf<InterlockState>(Payload());
    if (!state) return false;
    if (IsHeldBy(state->writer, Platform::GetThreadId())) return TryNest(state->nestedReads);
    return TakeSharedWithin(state->mutex, ms);
}

void CPRWInterlock::Leave() const noexcept {
    auto* state = detail::StateOf<InterlockState>(Payload());
    if (!state || Unnest(state->nestedWrites)) return;
    state->writer.store(0, std::memory_order_relaxed);
    state->mutex.unlock();
}

void CPRWInterlock::LeaveRead() const noexcept {
    auto* state = detail::StateOf<InterlockState>(Payload());
    if (!state || Unnest(state->nestedReads)) return;
    state->mutex.unlock_shared();
}

} // namespace TAVO::Threading
