// Waiting for the pool's lock.

#include "poollock.h"

#include <boost/thread/lock_guard.hpp>
#include <boost/thread/thread_only.hpp>

namespace TAVO::String::pool {

void Lock::Wait() noexcept {
    // Holds are short: look again for a while before sleeping.
    for (int look = 0; look < 200; ++look) {
        Simd::Pause();
        if (!m_taken.load(std::memory_order_relaxed) && Take()) return;
    }
    try {
        boost::this_thread::disable_interruption waitingForTheLockIsNoInterruptionPoint;
        boost::unique_lock<boost::mutex> mutex(m_mutex);
        m_sleepers.fetch_add(1);
        if (m_sleepersFlush) Platform::FlushProcessors();
        // A holder that leaves from here on sees us and wakes under the mutex, which we hold until we sleep.
        while (!Take()) m_left.wait(mutex);
        m_sleepers.fetch_sub(1);
    } catch (...) {
        // The system refused to let us sleep; the lock is needed all the same. The count stays raised: that only makes
        // leaving slower.
        while (!Take()) Platform::YieldThread();
    }
}

void Lock::WakeOne() noexcept {
    try {
        boost::lock_guard<boost::mutex> mutex(m_mutex);
        m_left.notify_one();
    } catch (...) {
    }
}

} // namespace TAVO::String::pool
