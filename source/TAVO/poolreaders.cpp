// Keeping readers without the lock out of the pool's front table.

#include "poolreaders.h"

namespace TAVO::String::pool {

namespace {

// Reading takes less than a microsecond. A reader that lost its processor gets it back meanwhile; one that was stopped
// for good does not.
constexpr int kLooks = 10000;

} // namespace

// Waits until the mark is not set; frees it when its thread has ended, killed inside or left behind in another process.
bool Readers::IsLeft(Mark& mark) noexcept {
    for (int look = 0; look < kLooks; ++look) {
        if (Platform::HasThreadEnded(mark.thread)) {
            mark.reading.store(false, std::memory_order_relaxed);
            mark.owner.store(0, std::memory_order_relaxed);
            return true;
        }
        if (!mark.reading.load(std::memory_order_seq_cst)) return true;
        Platform::YieldThread();
    }
    return false;
}

bool Readers::Close() noexcept {
    m_open.store(false, std::memory_order_seq_cst);
    if (m_flushes) Platform::FlushProcessors();
    for (Mark& mark : m_marks)
        if (mark.owner.load(std::memory_order_relaxed) != 0 && !IsLeft(mark)) {
            Open();
            return false;
        }
    return true;
}

} // namespace TAVO::String::pool
