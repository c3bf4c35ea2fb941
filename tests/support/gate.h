#pragma once
// Hand-over between threads of a test.

#include <chrono>
#include <condition_variable>
#include <mutex>

namespace support {

// Counts up; threads wait until it has come so far. A wait that takes far too long gives up, so that a lost wake-up
// fails a test instead of hanging it.
class Gate {
public:
    void Step() {
        const std::lock_guard lock(m_mutex);
        ++m_steps;
        m_moved.notify_all();
    }
    bool Reached(int steps) {
        std::unique_lock lock(m_mutex);
        return m_moved.wait_for(lock, std::chrono::seconds(60), [&] { return m_steps >= steps; });
    }
    int Steps() {
        const std::lock_guard lock(m_mutex);
        return m_steps;
    }

private:
    std::mutex m_mutex;
    std::condition_variable m_moved;
    int m_steps = 0;
};

} // namespace support
