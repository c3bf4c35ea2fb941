#pragma once
// A re-entrant lock that is ready before any constructor has run and is never destroyed: statics of others may need it
// before our constructors and after our destructors.

#include "platform/platform.h"

#include <atomic>

namespace TAVO {

class RecursiveLock {
public:
    void lock() noexcept {
        const std::uint32_t self = Platform::GetThreadId();
        if (m_owner.load(std::memory_order_relaxed) != self) {
            m_mutex.lock();
            m_owner.store(self, std::memory_order_relaxed);
        }
        ++m_depth;
    }

    void unlock() noexcept {
        if (--m_depth) return;
        m_owner.store(0, std::memory_order_relaxed);
        m_mutex.unlock();
    }

private:
    Platform::Mutex m_mutex;
    std::atomic<std::uint32_t> m_owner{0};
    std::uint32_t m_depth = 0; // the owner's alone
};

} // namespace TAVO
