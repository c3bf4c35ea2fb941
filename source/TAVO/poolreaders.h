#pragma once
// Threads that look into the pool's front table without the pool's lock.
//
// Each has a mark of its own, for as long as it lives: it sets the mark with a plain store, asks whether the table is
// open, looks, and takes the mark away. Who holds the pool's lock and is about to take something away from under
// readers closes the table first: it says so, makes all processors pass a barrier, and waits until no mark is set.
// After that, either a reader sees the table closed or the closer sees its mark. Without such a barrier setting the
// mark costs an exchange.
//
// A mark is never shared: a thread that was held up between looking whose mark it is and setting it could take another
// one's mark away. So a thread whose mark belongs to another that still lives uses the lock, as does a thread that has
// none yet; it gets one with the lock held. Marks of threads that have ended are freed whenever the table is closed.

#include "platform/platform.h"

#include <atomic>

namespace TAVO::String::pool {

class Readers {
public:
    struct alignas(64) Mark {
        std::atomic<std::uint32_t> owner{0}; // thread id; 0: free
        std::atomic<bool> reading{false};    // the owner's; others only read it
        std::uint64_t thread = 0;            // the system's name of the owner
    };

    // The calling thread's mark, set: the table may be read until Leave. Null when it may not.
    Mark* Enter() noexcept {
        const std::uint32_t self = Platform::GetThreadId();
        Mark& mark = MarkOf(self);
        if (TAVO_UNLIKELY(mark.owner.load(std::memory_order_relaxed) != self)) return nullptr;
        if (TAVO_LIKELY(m_flushes)) {
            mark.reading.store(true, std::memory_order_relaxed);
            std::atomic_signal_fence(std::memory_order_seq_cst); // the compiler keeps the order
        } else {
            mark.reading.exchange(true);
        }
        if (TAVO_LIKELY(m_open.load(std::memory_order_acquire))) return &mark;
        Leave(mark);
        return nullptr;
    }
    static void Leave(Mark& mark) noexcept { mark.reading.store(false, std::memory_order_release); }

    // The rest is for who holds the pool's lock.

    // Gives the calling thread its mark, if that is free.
    void Join() noexcept {
        const std::uint32_t self = Platform::GetThreadId();
        Mark& mark = MarkOf(self);
        if (mark.owner.load(std::memory_order_relaxed) != 0) return;
        mark.thread = Platform::GetSystemThread();
        mark.owner.store(self, std::memory_order_relaxed);
    }

    // Keeps readers out until Open. False, with nothing changed, when one does not leave: it was stopped inside.
    bool Close() noexcept;
    void Open() noexcept { m_open.store(true, std::memory_order_release); }

private:
    static constexpr std::size_t kMarks = 128; // threads that live at once and read without the lock

    // One mark for each of 128 ids in a row; Windows gives every fourth number.
    Mark& MarkOf(std::uint32_t id) noexcept { return m_marks[(id ^ id >> 2) % kMarks]; }

    bool IsLeft(Mark& mark) noexcept;

    const bool m_flushes = Platform::CanFlushProcessors();
    std::atomic<bool> m_open{true};
    Mark m_marks[kMarks];
};

} // namespace TAVO::String::pool
