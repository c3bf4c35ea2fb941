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
