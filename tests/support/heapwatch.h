#pragma once
// Lets tests see and refuse the library's allocations.

#include <cstdint>
#include <gtest/gtest.h>

namespace support {

// Blocks of the library's heap that live now, counted since the program started.
std::int64_t LiveBlocks();

// While it lives, the allocation that would be the (n+1)-th from now on, and every later one, fails.
class FailingHeap {
public:
    explicit FailingHeap(std::int64_t allowed);
    ~FailingHeap();
    // Whether an allocation was refused so far.
    bool Refused() const;
};

// Runs `body` with the first, second, third ... allocation failing until it runs through with none refused.
// `body` must check that objects stay usable; that nothing leaks is checked here.
template <class Body> void ForEachFailingAllocation(Body body, int limit = 10000) {
    for (int allowed = 0; allowed < limit; ++allowed) {
        const auto before = LiveBlocks();
        bool refused;
        {
            FailingHeap heap(allowed);
            body();
            refused = heap.Refused();
        }
        ASSERT_EQ(LiveBlocks(), before) << "leak with " << allowed << " allocations allowed";
        if (!refused) return;
    }
    FAIL() << "still refusing after " << limit << " allocations";
}

} // namespace support
