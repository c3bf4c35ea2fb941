#pragma once
// The pool's lock: re-entrant, one atomic exchange to take it and none to leave it, a Boost mutex and condition for
// those who wait.
//
// Leaving is a plain store, then a look whether anybody sleeps. Between the two the processor may take the look first,
// and a sleeper that arrives just then would be missed; so whoever is about to sleep says so and then makes all
// processors pass a barrier. After that, either the holder sees the sleeper or the sleeper sees the lock free. Where
// the system offers no such barrier, leaving pays for one.
//
// A thread that takes the lock many times with no other in between becomes its favourite and needs no exchange any
// more: it writes down that it is in, then looks whether it still is the favourite. Any other thread takes the lock as
// always, which keeps further ones out, ends the favour and makes all processors pass a barrier. After that, either the
// favourite sees the end and retreats, or the other sees that it is in and waits for it to leave. Without such a
// barrier there are no favourites. Each favour has a mark of its own for "in": a thread that was held up before writing
// down that it is in must not, when it retreats at last, wipe out the mark of a later favourite.
//
// Whoever comes by while the lock is free may take it ahead of sleepers. But one that has slept for long gets it handed
// over by a thread that leaves, so a thread that takes it again and again without a pause keeps nobody out for good.

#include "platform/platform.h"
#include "simd.h"

#include <atomic>
#include <boost/thread/condition_variable.hpp>
#include <boost/thread/mutex.hpp>
#include <utility>

namespace TAVO::String::pool {

class Lock {
public:
    void Enter() noexcept {
        const std::uint32_t self = Platform::GetThreadId();
        if (IsReentry(self) || EnterFavoured(self)) return;
        if (TAVO_UNLIKELY(!Take())) Wait();
        if (TAVO_UNLIKELY(HasRival())) {
            EndFavour();
            if (HasRival()) WaitForRival();
        }
        Own(self);
    }

    // Never waits.
    bool TryEnter() noexcept {
        const std::uint32_t self = Platform::GetThreadId();
        if (IsReentry(self) || EnterFavoured(self)) return true;
        if (!Take()) return false;
        if (HasRival()) {
            EndFavour();
            if (HasRival()) {
                m_taken.store(false, std::memory_order_release);
                WakeSleepers();
                return false;
            }
        }
        Own(self);
        return true;
    }

    void Leave() noexcept {
        if (--m_depth) return;
        m_owner.store(0, std::memory_order_relaxed);
        if (std::exchange(m_ownerTook, false))
            m_taken.store(false, std::memory_order_release);
        else
            m_in[m_favour].store(false, std::memory_order_release);
        WakeSleepers();
    }

private:
    // Entries in a row that make a favourite, doubled each time a favour ends: ending one costs as much as some
    // thousand exchanges.
    static constexpr std::uint32_t kFirstStreak = 4096;
    // After the last one there are no favourites any more; its streak takes two thousand million entries.
    static constexpr std::uint32_t kFavours = 20;

    // Only the owner itself can find its own number there.
    bool IsReentry(std::uint32_t self) noexcept {
        if (m_owner.load(std::memory_order_relaxed) != self) return false;
        ++m_depth;
        return true;
    }

    bool EnterFavoured(std::uint32_t self) noexcept {
        const std::uint64_t favourite = m_favourite.load(std::memory_order_relaxed);
        if (static_cast<std::uint32_t>(favourite) != self) return false;
        std::atomic<bool>& in = m_in[favourite >> 32];
        in.store(true, std::memory_order_relaxed);
        std::atomic_signal_fence(std::memory_order_seq_cst); // the compiler keeps the order
        if (TAVO_UNLIKELY(m_favourite.load(std::memory_order_acquire) != favourite)) {
            in.store(false, std::memory_order_release);
            WakeSleepers();
            return false;
        }
        m_owner.store(self, std::memory_order_relaxed);
        m_depth = 1;
        return true;
    }

    bool Take() noexcept { return !m_taken.exchange(true, std::memory_order_acquire); }

    // Asked by the one that took the lock: whether a favourite may come in, or is in.
    bool HasRival() const noexcept {
        return m_favourite.load(std::memory_order_relaxed) != 0 || m_in[m_favour].load(std::memory_order_acquire);
    }

    void Own(std::uint32_t self) noexcept {
        m_owner.store(self, std::memory_order_relaxed);
        m_depth = 1;
        m_ownerTook = true;
        if (m_latest != self) {
            m_latest = self;
            m_streak = 0;
        } else if (TAVO_UNLIKELY(++m_streak >> m_favour >= kFirstStreak) && m_flushes && m_favour + 1 < kFavours) {
            m_streak = 0;
            m_favourite.store(std::uint64_t{++m_favour} << 32 | self, std::memory_order_relaxed);
        }
    }

    // After the store that freed the lock: wakes sleepers who may not have seen it free.
    void WakeSleepers() noexcept {
        if (m_flushes)
            std::atomic_signal_fence(std::memory_order_seq_cst); // the compiler keeps the order
        else
            m_sleepers.fetch_add(0); // a barrier, and one that thread checkers understand
        if (TAVO_UNLIKELY(m_sleepers.load(std::memory_order_relaxed) != 0)) Wake();
    }

    struct Sleeper;
    template <class Ready> void Sleep(boost::condition_variable& condition, Sleeper& self, Ready ready) noexcept;
    TAVO_NOINLINE void Wait() noexcept;
    TAVO_NOINLINE void WaitForRival() noexcept;
    TAVO_NOINLINE void EndFavour() noexcept;
    TAVO_NOINLINE void Wake() noexcept;

    const bool m_flushes = Platform::CanFlushProcessors();
    std::atomic<bool> m_taken{false};
    std::atomic<std::uint32_t> m_owner{0};     // thread id; 0 when nobody is in
    std::atomic<std::uint32_t> m_sleepers{0};  // threads that sleep or are about to
    std::atomic<std::uint64_t> m_favourite{0}; // number of the favour and thread id; 0: none
    std::atomic<bool> m_in[kFavours] = {};     // the favourite is in, or about to see that it no longer is one
    // The owner's.
    std::uint32_t m_depth = 0;
    bool m_ownerTook = false; // false for a favourite
    std::uint32_t m_latest = 0, m_streak = 0;
    std::uint32_t m_favour = 0; // the latest

    boost::mutex m_mutex;
    boost::condition_variable m_left, m_rivalLeft;
    Sleeper* m_starved = nullptr; // under the mutex: who gets the lock handed over next
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
