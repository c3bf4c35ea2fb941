#pragma once
// The pool's lock: re-entrant, one atomic exchange to take it and none to leave it, a Boost mutex and condition for
// those who wait.
//
// Leaving is a plain store, then a look whether anybody sleeps. Between the two the processor may take the look first,
// and a sleeper that arrives just then would be missed; so whoever is about to sleep says so and then makes all
// processors pass a barrier. After that, either the holder sees the sleeper or the sleeper sees the lock free. Where
// the system offers no such barrier, leaving pays for one.
//
// The lock makes no promise of turns: a thread that takes it again and again without a pause can keep sleepers waiting.

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
        if (IsReentry(self)) return;
        if (TAVO_UNLIKELY(!Take())) Wait();
        Own(self);
    }

    bool TryEnter() noexcept {
        const std::uint32_t self = Platform::GetThreadId();
        if (IsReentry(self)) return true;
        if (!Take()) return false;
        Own(self);
        return true;
    }

    void Leave() noexcept {
        if (--m_depth) return;
        m_owner.store(0, std::memory_order_relaxed);
        m_taken.store(false, std::memory_order_release);
        if (TAVO_UNLIKELY(HasSleepers())) WakeOne();
    }

private:
    // Only the owner itself can find its own number there.
    bool IsReentry(std::uint32_t self) noexcept {
        if (m_owner.load(std::memory_order_relaxed) != self) return false;
        ++m_depth;
        return true;
    }
    bool Take() noexcept { return !m_taken.exchange(true, std::memory_order_acquire); }
    void Own(std::uint32_t self) noexcept {
        m_owner.store(self, std::memory_order_relaxed);
        m_depth = 1;
    }

    // Whether somebody sleeps who may not have seen the lock free; looks after the store that freed it.
    bool HasSleepers() noexcept {
        if (!m_sleepersFlush) return m_sleepers.fetch_add(0) != 0; // a barrier, and one that thread checkers understand
        std::atomic_signal_fence(std::memory_order_seq_cst);       // the compiler keeps the order
        return m_sleepers.load(std::memory_order_relaxed) != 0;
    }

    TAVO_NOINLINE void Wait() noexcept;
    TAVO_NOINLINE void WakeOne() noexcept;

    std::atomic<bool> m_taken{false};
    const bool m_sleepersFlush = Platform::CanFlushProcessors();
    std::atomic<std::uint32_t> m_owner{0};    // thread id; 0 when free
    std::uint32_t m_depth = 0;                // the owner's
    std::atomic<std::uint32_t> m_sleepers{0}; // threads that sleep or are about to
    boost::mutex m_mutex;
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
