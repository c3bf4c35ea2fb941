#pragma once
// How a line for the debugger is laid out, and the lock of the assertion box.

#include "platform/platform.h"

#include <atomic>
#include <TAVO/develop.h>

namespace TAVO::Develop {

constexpr std::size_t kMessageUnits = 2048; // of a message, terminator included
constexpr std::size_t kPrefixUnits = 512;   // of the stretch before it

// The seven characters printed for a level; null for a level that does not exist.
const wchar_t* FindLevelLabel(_acfDebugLevel level) noexcept;

// Lays the prefix of a line out in kPrefixUnits.
void FormatPrefix(wchar_t* out, double seconds, const wchar_t* label, const wchar_t* category, const char* source,
                  long32 line) noexcept;

// Lets one thread show boxes at a time; that thread may show a nested one, since a box runs the host's message
// handlers. Constant-initialised and never destroyed: statics of others may assert before our constructors and after
// our destructors.
class AssertionLock {
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

} // namespace TAVO::Develop
