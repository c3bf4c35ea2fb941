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

// Bursts long enough to make favourites of their threads, with others cutting in: every road in and out, many times.
TEST(PoolLock, ExcludesWhileFavouritesComeAndGo) {
    Lock lock;
    std::uint64_t entries = 0; // plain: the lock alone protects it
    std::atomic<std::uint64_t> expected{0};
    const auto burst = [&](int count) {
        for (int i = 0; i < count; ++i) {
            lock.Enter();
            ++entries;
            if (i % 16 == 0) { // again, while it is held
                EXPECT_TRUE(lock.TryEnter());
                ++entries;
                lock.Leave();
            }
            lock.Leave();
        }
        expected += static_cast<std::uint64_t>(count + (count + 15) / 16);
    };
    std::vector<std::thread> threads;
    for (int t = 0; t < 3; ++t)
        threads.emplace_back([&, t] {
            for (int round = 0; round < 20; ++round) {
                burst(t == 0 ? 20000 : 100);
                std::this_thread::sleep_for(std::chrono::microseconds(200 * t));
                if (!lock.TryEnter()) continue;
                ++entries, ++expected;
                lock.Leave();
            }
        });
    for (auto& thread : threads) thread.join();
    EXPECT_EQ(entries, expected);
}

// The instant in which a favour ends, on many locks: a favourite in full run, and another that cuts in.
TEST(PoolLock, ExcludesWhenAFavourEnds) {
    struct Shared {
        Lock lock;
        std::atomic<int> inside{0}, progress{0};
        int overlaps = 0;
        void Pass() {
            lock.Enter();
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
        for (int i = 0; i < 10; ++i) each.Pass();
    }
    favourite.join();
    for (const Shared& each : shared) overlaps += each.overlaps;
    EXPECT_EQ(overlaps, 0);
}

// A favourite that stays in keeps others waiting, and TryEnter from waiting, as any holder does.
TEST(PoolLock, WaitsForAFavouriteThatIsIn) {
    Lock lock;
    for (int i = 0; i < 10000; ++i) lock.Enter(), lock.Leave();
    lock.Enter();
    std::atomic<bool> left{false}, tried{false};
    bool early = false;
    std::thread other([&] {
        EXPECT_FALSE(lock.TryEnter());
        tried = true;
        lock.Enter();
        early = !left;
        lock.Leave();
    });
    while (!tried) std::this_thread::yield();
    std::this_thread::sleep_for(std::chrono::milliseconds(20)); // time for the other to go to sleep
    left = true;
    lock.Leave();
    other.join();
    EXPECT_FALSE(early);
    EXPECT_TRUE(lock.TryEnter());
    lock.Leave();
}

} // namespace
