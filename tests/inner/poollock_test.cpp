// The pool's lock: exclusion through all its roads, and turns.

#include "poollock.h"

#include <atomic>
#include <chrono>
#include <gtest/gtest.h>
#include <thread>
#include <vector>

using namespace TAVO;
using String::pool::Lock;

namespace {

// The instant in which a favour ends, on many locks: a favourite in full run, and another that cuts in.
TEST(PoolLock, ExcludesWhenAFavourEnds) {
    struct Shared {
        Lock lock;
        std::atomic<int> inside{0}, progress{0};
        int overlaps = 0;
        void Pass(bool trying = false) {
            if (!trying || !lock.TryEnter()) lock.Enter();
            overlaps += inside.load(std::memory_order_relaxed) != 0;
            inside.store(1, std::memory_order_relaxed);
            for (int i = 0; i < 4; ++i) overlaps += inside.load(std::memory_order_relaxed) != 1;
            inside.store(0, std::memory_order_relaxed);
            lock.Leave();
        }
    };
    std::vector<Shared> shared(1000);
    std::thread favourite([&] {
        for (Shared& each : shared)
            for (int i = 0; i < 5000; ++i) each.Pass(), each.progress.store(i, std::memory_order_relaxed);
    });
    int overlaps = 0;
    for (Shared& each : shared) {
        while (each.progress.load(std::memory_order_relaxed) < 4200) {
        }
        for (int i = 0; i < 10; ++i) each.Pass(i % 2);
    }
    favourite.join();
    for (const Shared& each : shared) overlaps += each.overlaps;
    EXPECT_EQ(overlaps, 0);
}

TEST(PoolLock, WaitsForAFavouriteThatIsIn) {
    Lock lock;
    for (int i = 0; i < 10000; ++i) lock.Enter(), lock.Leave();
    lock.Enter();
    EXPECT_TRUE(lock.TryEnter()); // again, while it is held
    lock.Leave();
    std::atomic<bool> left{false}, tried{false};
    std::thread other([&] {
        EXPECT_FALSE(lock.TryEnter());
        tried = true;
        lock.Enter();
        EXPECT_TRUE(left);
        lock.Leave();
    });
    while (!tried) std::this_thread::yield();
    std::this_thread::sleep_for(std::chrono::milliseconds(20)); // time for the other to go to sleep
    left = true;
    lock.Leave();
    other.join();
    EXPECT_TRUE(lock.TryEnter());
    lock.Leave();
}

} // namespace
