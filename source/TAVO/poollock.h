#pragma once
// The pool's lock: re-entrant, one exchange when it is free, a Boost mutex and condition for those who wait.

#include "platform/platform.h"
#include "simd.h"

#include <atomic>
#include <boost/thread/condition_variable.hpp>
#include <boost/thread/mutex.hpp>

namespace TAVO::String::pool {

class Lock {
public:
    void Enter() noexcept {
        const std::uint32_t self = Platform::GetThreadId();
        // Only the owner itself can find its own number here.
        if (m_owner.load(std::memory_order_relaxed) == self) {
            ++m_depth;
            return;
        }
        std::uint32_t free = kFree;
        if (TAVO_UNLIKELY(!m_state.compare_exchange_strong(free, kTaken, std::memory_order_acquire))) Wait();
        m_owner.store(self, std::memory_order_relaxed);
        m_depth = 1;
    }

    bool TryEnter() noexcept {
        const std::uint32_t self = Platform::GetThreadId();
        if (m_owner.load(std::memory_order_relaxed) == self) {
            ++m_depth;
            return true;
        }
        std::uint32_t free = kFree;
        if (!m_state.compare_exchange_strong(free, kTaken, std::memory_order_acquire)) return false;
        m_owner.store(self, std::memory_order_relaxed);
        m_depth = 1;
        return true;
    }

    void Leave() noexcept {
        if (--m_depth) return;
        m_owner.store(0, std::memory_order_relaxed);
        if (TAVO_UNLIKELY(m_state.exchange(kFree, std::memory_order_release) == kAwaited)) WakeOne();
    }

private:
    enum : std::uint32_t { kFree, kTaken, kAwaited };

    TAVO_NOINLINE void Wait() noexcept;
    TAVO_NOINLINE void WakeOne() noexcept;

    std::atomic<std::uint32_t> m_state{kFree}; // awaited: taken, and someone sleeps or is about to
    std::atomic<std::uint32_t> m_owner{0};     // thread id; 0 when free
    std::uint32_t m_depth = 0;                 // the owner's
    boost::mutex m_sleepers;
    boost::condition_variable m_left;
};

// Holds the lock for a scope.
class Guard {
public:
    explicit Guard(Lock& lock) noexcept : m_lock(lock) { m_lock.Enter(); }
    Guard(const Guard&) = delete;
    Guard& operator=(const Guard&) = delete;
    ~Guard() { m_lock.Leave(); }

private:
    Lock& m_lock;
};

} // namespace TAVO::String::pool
