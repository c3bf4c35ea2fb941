// Threads over those of Boost.Thread, and what the calling thread may ask for itself.

#include "blocks.h"
#include "threadblocks.h"

#include <boost/thread/thread_only.hpp>
#include <optional>
#include <TAVO/threading.h>

namespace TAVO::Threading {

namespace {

using Buffers::Block;
using Buffers::CPObjectMemory;
using SteadyClock = boost::chrono::steady_clock;

SteadyClock::time_point DeadlineIn(ulong32 ms) { return SteadyClock::now() + boost::chrono::milliseconds(ms); }

struct ThreadState {
    // Intended (thread-runs-on): a thread whose last handle goes runs on by itself. A textbook would wait for it or end
    // the process; but the last handle may go on the thread itself, and hosts start threads that they never look after.
    ~ThreadState() { thread.detach(); }

    bool IsCurrent() const { return thread.get_id() == boost::this_thread::get_id(); }

    boost::thread thread; // joinable until it was waited for or left to itself
    bool left = false;
};

// What runs on the new thread: it keeps the object, and knows where its interface lies.
class _cThreadFunctor {
public:
    _cThreadFunctor(const CPObjectMemory& object, std::size_t position, unsigned long long parameter)
        : m_object(object), m_position(position), m_parameter(parameter) {}

    void operator()() noexcept {
        Platform::MarkOwnThread();
        try {
            reinterpret_cast<IThreadExecute*>(Block::PayloadOf<char>(m_object) + m_position)->Run(m_parameter);
        } catch (...) { // an interruption, too: the thread ends here either way
        }
        const boost::this_thread::disable_interruption theRunIsOver; // it is no matter of the object's destructor
        m_object.free();                                             // handles of the thread may stay
    }

private:
    CPObjectMemory m_object;
    std::size_t m_position;
    unsigned long long m_parameter;
};

// An interruption that the library did not ask for is not let out: it belongs to the host's own use of Boost.
class OnlyOwnInterruptions {
public:
    OnlyOwnInterruptions() {
        if (!Platform::IsOwnThread()) m_none.emplace();
    }

private:
    std::optional<boost::this_thread::disable_interruption> m_none;
};

// Calls what a thread of ours may be interrupted in; nothing else gets out, and counts as false.
template <class Call> bool Interruptibly(Call call) {
    const OnlyOwnInterruptions rule;
    try {
        return call();
    } catch (const boost::thread_interrupted&) {
        throw;
    } catch (...) {
        return false;
    }
}

bool JoinWithin(boost::thread& thread, ulong32 ms) {
    if (ms != WaitForever) return thread.try_join_until(DeadlineIn(ms));
    thread.join();
    return true;
}

bool EndsWithin(boost::thread& thread, ulong32 ms) noexcept {
    const boost::this_thread::disable_interruption theHandleMustBeReleased;
    try {
        thread.interrupt();
        return thread.get_id() != boost::this_thread::get_id() && JoinWithin(thread, ms);
    } catch (...) {
        return false;
    }
}

} // namespace

const Buffers::tagCPOVTABL CPThread::_vtbl = detail::kTable<ThreadState>;

bool CPThread::Execute(const CPObjectMemory& object, unsigned long long parameter) noexcept {
    if (m_pMH) return false;
    const std::size_t position = queryinterface(object, acfTypeOf<IThreadExecute>::uid);
    if (position == Buffers::NotFound) return false;
    m_pMH = NewObject<ThreadState>(&_vtbl);
    if (!m_pMH) return false;
    try {
        detail::StateOf<ThreadState>(Payload())->thread = boost::thread(_cThreadFunctor(object, position, parameter));
        return true;
    } catch (...) {
        free();
        return false;
    }
}

unsigned long long CPThread::Wait(ulong32 ms) {
    auto* state = detail::StateOf<ThreadState>(Payload());
    if (!state) return WaitNoState;
    if (state->left || state->IsCurrent()) return WaitTimedOut;
    // Where another handle has waited already there is nothing left to join.
    if (state->thread.joinable() && !Interruptibly([&] { return JoinWithin(state->thread, ms); })) return WaitTimedOut;
    free();
    return 0;
}

bool CPThread::Terminate() noexcept {
    constexpr ulong32 kPatience = 5000;
    auto* state = detail::StateOf<ThreadState>(Payload());
    if (!state) return true;
    if (state->thread.joinable() && !EndsWithin(state->thread, kPatience)) {
        state->thread.detach();
        state->left = true;
    }
    const bool ended = !state->left;
    free();
    return ended;
}

namespace CurrentThread {

void sleep(ulong32 ms) {
    if (ms == 0) return;
    Interruptibly([until = DeadlineIn(ms)] {
        boost::this_thread::sleep_until(until);
        return true;
    });
}

namespace OS {

void SetThreadPriority(eThreadPriority priority) noexcept {
    constexpr int kIdle = -15, kLowest = -2, kNormal = 0, kHighest = 2, kTimeCritical = 15;
    constexpr int kLevels[] = {kIdle, kLowest, kNormal, kHighest, kTimeCritical};
    const bool known = priority >= ThreadPriorityIdle && priority <= ThreadPriorityTimeCritical;
    Platform::SetThreadPriority(known ? kLevels[priority - ThreadPriorityIdle] : kNormal);
}

eThreadPriority GetThreadPriority() noexcept {
    const int priority = Platform::GetThreadPriority();
    if (priority == 0) return ThreadPriorityNormal;
    // Intended (priority-levels): one step above or below normal reads as high or low, which would be set as two steps.
    // A textbook would give back what it can set; hosts compare with the five levels.
    if (priority > 0) return priority <= 2 ? ThreadPriorityHigh : ThreadPriorityTimeCritical;
    return priority >= -2 ? ThreadPriorityLow : ThreadPriorityIdle;
}

} // namespace OS
} // namespace CurrentThread

} // namespace TAVO::Threading
