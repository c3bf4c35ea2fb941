// Waiting for the pool's lock.

#include "poollock.h"

#include <boost/thread/lock_types.hpp>
#include <boost/thread/thread_only.hpp>

namespace TAVO::String::pool {

namespace {

using MutexLock = boost::unique_lock<boost::mutex>;

// Milliseconds of sleep after which the lock is handed over. That costs the time of a thread's awakening, so it must
// stay rare where holds are short.
constexpr std::uint64_t kPatience = 2;

// Holds are short: looks again for a while. False when sleeping is better.
template <class Ready> bool Spin(Ready ready) noexcept {
    for (int look = 0; look < 200; ++look) {
        Simd::Pause();
        if (ready()) return true;
    }
    return false;
}

// The system may refuse for want of memory; the mutex is needed all the same.
void LockFirmly(MutexLock& mutex) noexcept {
    while (!mutex.owns_lock()) try {
            mutex.lock();
        } catch (...) {
            Platform::YieldThread();
        }
}

} // namespace

struct Lock::Sleeper {
    const std::uint64_t since = Platform::GetProcessMilliseconds();
    bool given = false; // under the mutex: the lock was taken for this thread

    bool IsStarved() const noexcept { return Platform::GetProcessMilliseconds() - since > kPatience; }
};

// Sleeps until `ready()`, which is asked under the mutex.
template <class Ready> void Lock::Sleep(boost::condition_variable& condition, Sleeper& self, Ready ready) noexcept {
    boost::this_thread::disable_interruption waitingForTheLockIsNoInterruptionPoint;
    MutexLock mutex(m_mutex, boost::defer_lock);
    LockFirmly(mutex);
    m_sleepers.fetch_add(1);
    if (m_flushes) Platform::FlushProcessors();
    // Who leaves from here on sees us and wakes under the mutex, which we hold until we sleep.
    while (!ready()) {
        if (!m_starved && self.IsStarved()) m_starved = &self;
        try {
            condition.wait(mutex);
        } catch (...) { // the system refused to let us sleep
            if (mutex.owns_lock()) mutex.unlock();
            Platform::YieldThread();
        }
        LockFirmly(mutex);
    }
    if (m_starved == &self) m_starved = nullptr;
    m_sleepers.fetch_sub(1);
}

void Lock::Wait() noexcept {
    if (Spin([this] { return !m_taken.load(std::memory_order_relaxed) && Take(); })) return;
    Sleeper self;
    Sleep(m_left, self, [&] { return self.given || Take(); });
}

void Lock::EndFavour() noexcept {
    if (m_favourite.load(std::memory_order_relaxed) == 0) return;
    m_favourite.store(0, std::memory_order_relaxed);
    Platform::FlushProcessors();
}

void Lock::WaitForRival() noexcept {
    const auto left = [this] { return !HasRival(); };
    if (Spin(left)) return;
    Sleeper self;
    Sleep(m_rivalLeft, self, left);
}

void Lock::Wake() noexcept {
    MutexLock mutex(m_mutex, boost::defer_lock);
    LockFirmly(mutex);
    if (m_starved && Take()) {
        std::exchange(m_starved, nullptr)->given = true;
        m_left.notify_all();
    } else {
        m_left.notify_one();
    }
    m_rivalLeft.notify_one();
}

} // namespace TAVO::String::pool
