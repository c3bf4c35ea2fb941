// Events. One routine waits for all of them: a waiter queues at each of its events and sleeps until one of them claims
// it. The claim is one compare-and-swap of the waiter's word, so of several events, the time-out and an interruption
// exactly one ends the wait, and no signal is lost or used twice.

#include "blocks.h"
#include "platform/heap.h"
#include "threadblocks.h"

#include <boost/thread/condition_variable.hpp>
#include <boost/thread/thread_only.hpp>
#include <mutex>
#include <optional>
#include <TAVO/develop.h>
#include <TAVO/threading.h>

namespace TAVO::Threading {

namespace {

using Buffers::Block;
using SteadyClock = boost::chrono::steady_clock;
using Deadline = std::optional<SteadyClock::time_point>; // none: without limit

Deadline DeadlineIn(ulong32 ms) {
    if (ms == WaitForever) return {};
    return SteadyClock::now() + boost::chrono::milliseconds(ms);
}

// --- the waiter -----------------------------------------------------------------------------------------------------

class Waiter {
public:
    // For whoever sets an event: the wait ends with `index`; Wake must follow. False when it has an end already.
    bool TryClaim(std::uint64_t index) noexcept { return TryEnd(index); }
    void Wake() noexcept {
        boost::unique_lock<boost::mutex> lock(m_mutex, boost::defer_lock);
        detail::TakeSurely([&] { lock.lock(); });
        m_woken = true;
        m_wake.notify_one(); // under the lock: with its end the waiter may go
    }

    // For the waiter itself: from here on nobody can claim it. False when somebody has, whom Sleep must wait for.
    bool Close() noexcept { return TryEnd(kClosed); }

    // Returns claimed and woken, or closed when the time is over or the thread was interrupted.
    void Sleep(const Deadline& deadline) noexcept {
        boost::unique_lock<boost::mutex> lock(m_mutex, boost::defer_lock);
        detail::TakeSurely([&] { lock.lock(); });
        while (!m_woken) {
            const bool over = deadline && SteadyClock::now() >= *deadline;
            if ((over || m_interrupted) && Close()) return;
            Rest(lock, over ? Deadline() : deadline);
        }
    }

    // The index that ended the wait; all-ones when none did.
    std::uint64_t Index() const noexcept {
        const std::uint64_t word = m_word.load(std::memory_order_acquire);
        return word < kClosed ? word : WaitTimedOut;
    }
    bool IsInterrupted() const noexcept { return m_interrupted; }

private:
    static constexpr std::uint64_t kOpen = ~0ULL, kClosed = ~0ULL - 1; // anything else: an index

    bool TryEnd(std::uint64_t how) noexcept {
        std::uint64_t word = kOpen;
        return m_word.compare_exchange_strong(word, how, std::memory_order_acq_rel);
    }

    // Until something may have changed. What was interrupted once is not disturbed again: the end is near.
    void Rest(boost::unique_lock<boost::mutex>& lock, const Deadline& deadline) noexcept {
        std::optional<boost::this_thread::disable_interruption> undisturbed;
        if (m_interrupted || !Platform::IsOwnThread()) undisturbed.emplace();
        try {
            if (deadline)
                m_wake.wait_until(lock, *deadline);
            else
                m_wake.wait(lock);
        } catch (const boost::thread_interrupted&) {
            m_interrupted = true;
        } catch (...) { // the system has no means to let us sleep: look again a little later
            lock.unlock();
            Platform::SleepMilliseconds(1);
            detail::TakeSurely([&] { lock.lock(); });
        }
    }

    std::atomic<std::uint64_t> m_word{kOpen};
    bool m_interrupted = false;
    bool m_woken = false; // under m_mutex
    boost::mutex m_mutex;
    boost::condition_variable m_wake;
};

// --- the event ------------------------------------------------------------------------------------------------------

class EventState;

// A waiter's place in the queue of one event. Lives with the waiter; everything is under the event's lock.
struct Place {
    EventState* event;
    Waiter* waiter;
    std::uint64_t index; // of the event among the waiter's
    Place *previous, *next;
    bool queued;
};

// The queue is not empty exactly while the word says Awaited, a state that only begins and ends under the lock. The
// other two change without it. (While a manual event lets its queue go, the word is ahead.)
class EventState {
public:
    bool manual = false;

    // Whether it was set; an auto-reset event is not afterwards.
    bool TryTake() noexcept {
        std::uint32_t word = m_word.load(std::memory_order_acquire);
        if (word != kSet || manual) return word == kSet;
        return m_word.compare_exchange_strong(word, kIdle, std::memory_order_acq_rel);
    }

    void Set() noexcept {
        // Also when it is set already: whoever takes the signal then sees what was written before this call.
        std::uint32_t word = m_word.load(std::memory_order_relaxed);
        while (word != kAwaited)
            if (m_word.compare_exchange_weak(word, kSet, std::memory_order_acq_rel)) return;
        SetAwaited();
    }

    void Reset() noexcept {
        std::uint32_t word = kSet;
        m_word.compare_exchange_strong(word, kIdle, std::memory_order_acq_rel);
    }

    // Puts a waiter at the end of the queue; false when the event is set.
    bool Queue(Place& place) noexcept {
        const std::lock_guard lock(m_mutex);
        std::uint32_t word = kIdle;
        if (!m_word.compare_exchange_strong(word, kAwaited, std::memory_order_acq_rel) && word == kSet) return false;
        place.previous = m_last;
        place.next = nullptr;
        place.queued = true;
        (m_last ? m_last->next : m_first) = &place;
        m_last = &place;
        return true;
    }

    // Takes a waiter out of the queue if it is still there.
    void Leave(Place& place) noexcept {
        const std::lock_guard lock(m_mutex);
        if (!place.queued) return;
        Remove(place);
        if (!m_first) m_word.store(kIdle, std::memory_order_release);
    }

private:
    static constexpr std::uint32_t kIdle = 0, kSet = 1, kAwaited = 2;

    void Remove(Place& place) noexcept {
        (place.previous ? place.previous->next : m_first) = place.next;
        (place.next ? place.next->previous : m_last) = place.previous;
        place.queued = false;
    }

    TAVO_NOINLINE void SetAwaited() noexcept {
        Place* woken = nullptr;
        {
            const std::lock_guard lock(m_mutex);
            if (manual) m_word.exchange(kSet, std::memory_order_acq_rel); // first: whoever is let go must find it set
            const bool used = LetGo(&woken);
            if (!manual) m_word.exchange(m_first ? kAwaited : used ? kIdle : kSet, std::memory_order_acq_rel);
        }
        // Each stays where it is until it is woken, and its place with it.
        while (woken) std::exchange(woken, woken->next)->waiter->Wake();
    }

    // Claims the first waiter that can be claimed, all of a manual event; true when there was one. They are chained to
    // `claimed`.
    bool LetGo(Place** claimed) noexcept {
        bool any = false;
        while (m_first && (manual || !any)) {
            Place& place = *m_first;
            Remove(place);
            if (!place.waiter->TryClaim(place.index)) continue; // it ended otherwise and is about to leave
            any = true;
            place.next = nullptr;
            *claimed = &place;
            claimed = &place.next;
        }
        return any;
    }

    std::atomic<std::uint32_t> m_word{kIdle};
    Platform::Mutex m_mutex;
    Place *m_first = nullptr, *m_last = nullptr;
};

// --- waiting --------------------------------------------------------------------------------------------------------

// The events of one wait, each with the waiter's place there.
class Places {
public:
    Places() = default;
    Places(const Places&) = delete;
    Places& operator=(const Places&) = delete;
    ~Places() {
        if (m_places != m_few) Platform::Release(m_places);
    }

    // Room for `count` events; false without memory.
    bool Reserve(std::size_t count) noexcept {
        if (count > std::size(m_few)) m_places = static_cast<Place*>(Platform::Allocate(count * sizeof(Place)));
        return m_places != nullptr;
    }
    void Add(EventState* event) noexcept {
        m_places[m_count] = {event, nullptr, m_count, nullptr, nullptr, false};
        ++m_count;
    }

    Place* begin() noexcept { return m_places; }
    Place* end() noexcept { return m_places + m_count; }
    Place& operator[](std::size_t index) noexcept { return m_places[index]; }

private:
    Place m_few[8];
    Place* m_places = m_few;
    std::size_t m_count = 0;
};

// Queues the waiter everywhere; false when an event turned out to be set meanwhile. Then the waiter was claimed before,
// or it is closed and has taken that signal, whose index goes to `taken`, unless another thread was faster.
bool QueueAll(Places& places, Waiter& waiter, std::uint64_t& taken) noexcept {
    for (Place& place : places) {
        place.waiter = &waiter;
        if (place.event->Queue(place)) continue;
        // Closed first: an event that claims the waiter now would lose its signal.
        if (waiter.Close() && place.event->TryTake()) taken = place.index;
        return false;
    }
    return true;
}

// The index of the event that ended the wait; all-ones when the time is over or the thread was interrupted.
std::uint64_t WaitQueued(Places& places, const Deadline& deadline, bool& interrupted) {
    for (;;) {
        Waiter waiter;
        std::uint64_t index = WaitTimedOut;
        const bool queued = QueueAll(places, waiter, index);
        if (queued || waiter.Index() != WaitTimedOut) waiter.Sleep(deadline);
        for (Place& place : places) place.event->Leave(place);
        if (index == WaitTimedOut) index = waiter.Index();
        interrupted = waiter.IsInterrupted();
        if (queued || index != WaitTimedOut) return index;
    }
}

void InterruptionPoint() {
    if (Platform::IsOwnThread()) boost::this_thread::interruption_point();
}

// Waits for events of which none was set a moment ago.
unsigned long long WaitFor(Places& places, ulong32 ms) {
    std::uint64_t index = WaitTimedOut;
    bool interrupted = false;
    try {
        index = WaitQueued(places, DeadlineIn(ms), interrupted);
    } catch (...) {
        return WaitNoState; // the system has no means to sleep
    }
    if (!interrupted) return index;
    if (index != WaitTimedOut && !places[index].event->manual) places[index].event->Set(); // the next wait's
    throw boost::thread_interrupted();
}

// --- several events -------------------------------------------------------------------------------------------------

// The list is replaced rather than changed while a wait works on it.
struct MultipleEventState {
    Platform::Mutex mutex;
    Buffers::CPOMVector events;

    Buffers::CPOMVector List() noexcept {
        const std::lock_guard lock(mutex);
        return events;
    }
};

EventState* EventIn(const Buffers::CPObjectMemory& handle) { return Block::PayloadOf<EventState>(handle); }

} // namespace

// --- CPEvent --------------------------------------------------------------------------------------------------------

const Buffers::tagCPOVTABL CPEvent::_vtbl = detail::kTable<EventState>;

CPEvent::CPEvent(bool manual) noexcept : CPObjectMemory(NewObject<EventState>(&_vtbl)) {
    if (auto* state = detail::StateOf<EventState>(Payload())) state->manual = manual;
}

void CPEvent::Set(const void* pSource) const noexcept {
    // Intended (event-source): told, and set all the same: a waiter must not hang for a wrong argument.
    Develop::_isfalse_(pSource == nullptr, "source/TAVO/threading,743:pSource==NULL");
    if (auto* state = detail::StateOf<EventState>(Payload())) state->Set();
}

void CPEvent::Reset() const noexcept {
    if (auto* state = detail::StateOf<EventState>(Payload())) state->Reset();
}

unsigned long long CPEvent::Wait(ulong32 ms) const {
    auto* state = detail::StateOf<EventState>(Payload());
    if (!state) return WaitNoState;
    InterruptionPoint();
    if (state->TryTake()) return 0;
    if (ms == 0) return WaitTimedOut;
    Places places;
    places.Add(state);
    return WaitFor(places, ms);
}

// --- CPMultipleEvent ------------------------------------------------------------------------------------------------

const Buffers::tagCPOVTABL CPMultipleEvent::_vtbl = detail::kTable<MultipleEventState>;

CPMultipleEvent::CPMultipleEvent() noexcept : CPObjectMemory(NewObject<MultipleEventState>(&_vtbl)) {}

bool CPMultipleEvent::Attach(const CPEvent& event) const noexcept {
    auto* state = detail::StateOf<MultipleEventState>(Payload());
    if (!state || event.key() == 0) return false;
    const std::lock_guard lock(state->mutex);
    Buffers::CPOMVector& events = state->events;
    return events.Find(event, Buffers::NotFound) == Buffers::NotFound && events.clone() &&
           events.Insert(event, Buffers::NotFound);
}

bool CPMultipleEvent::Detach(const CPEvent& event) const noexcept {
    auto* state = detail::StateOf<MultipleEventState>(Payload());
    if (!state || event.key() == 0) return false;
    const std::lock_guard lock(state->mutex);
    Buffers::CPOMVector& events = state->events;
    const std::size_t index = events.Find(event, Buffers::NotFound);
    return index != Buffers::NotFound && events.clone() && events.Delete(index, true);
}

bool CPMultipleEvent::Reset(std::size_t index) const noexcept {
    auto* state = detail::StateOf<MultipleEventState>(Payload());
    if (!state) return false;
    const Buffers::CPOMVector events = state->List();
    if (index >= events.GetNItems()) return false;
    EventIn(events[index])->Reset();
    return true;
}

unsigned long long CPMultipleEvent::Wait(ulong32 ms) const {
    auto* state = detail::StateOf<MultipleEventState>(Payload());
    if (!state) return WaitNoState;
    InterruptionPoint();
    const Buffers::CPOMVector events = state->List();
    const std::size_t count = events.GetNItems();
    if (count == 0) return WaitNoState;
    for (std::size_t i = 0; i < count; ++i)
        if (EventIn(events[i])->TryTake()) return i;
    if (ms == 0) return WaitTimedOut;
    Places places;
    if (!places.Reserve(count)) return WaitNoState;
    for (std::size_t i = 0; i < count; ++i) places.Add(EventIn(events[i]));
    return WaitFor(places, ms);
}

} // namespace TAVO::Threading
