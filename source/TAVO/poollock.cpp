// Waiting for the pool's lock.

#include "poollock.h"

#include <boost/thread/lock_guard.hpp>
#include <boost/thread/thread_only.hpp>

namespace TAVO::String::pool {

void Lock::Wait() noexcept {
    // Holds are short: look again a few times before sleeping.
    for (int look = 0; look < 200; ++look) {
        Simd::Pause();
        std::uint32_t free = kFree;
        if (m_state.load(std::memory_order_relaxed) == kFree &&
            m_state.compare_exchange_weak(free, kTaken, std::memory_order_acquire))
            return;
    }
    // Whoever sleeps has left "awaited" behind, so the holder's exchange tells it to wake somebody; that needs the
    // mutex, which is held from the exchange here until the sleep has begun. Taking the lock as awaited may wake once
    // in vain.
    try {
        boost::this_thread::disable_interruption waitingForTheLockIsNoInterruptionPoint;
        boost::unique_lock<boost::mutex> sleepers(m_sleepers);
        while (m_state.exchange(kAwaited, std::memory_order_acquire) != kFree) m_left.wait(sleepers);
    } catch (...) {
        // The system refused to let us sleep; the lock is needed all the same.
        while (m_state.exchange(kAwaited, std::memory_order_acquire) != kFree) Platform::YieldThread();
    }
}

void Lock::WakeOne() noexcept {
    try {
        boost::lock_guard<boost::mutex> sleepers(m_sleepers);
        m_left.notify_one();
    } catch (...) {
    }
}

} // namespace TAVO::String::pool
