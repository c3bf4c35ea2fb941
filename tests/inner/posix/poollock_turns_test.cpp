// Turns at the pool's lock, on one processor, where the scheduler does as told.

#include "poollock.h"

#include <atomic>
#include <chrono>
#include <gtest/gtest.h>
#include <sched.h>
#include <thread>

using TAVO::String::pool::Lock;

namespace {

// A thread that leaves the lock only to take it again. The other, of the lowest class, never runs in between, so
// without being handed the lock over it would wait for ever.
TEST(PoolLock, IsHandedOverToASleeper) {
    Lock lock;
    std::atomic<bool> held{false};
    std::atomic<int> turns{0};
    const auto onOneProcessor = [](auto body) {
        return std::thread([=] {
            cpu_set_t allowed;
            sched_getaffinity(0, sizeof allowed, &allowed);
            for (int i = 0; CPU_COUNT(&allowed) > 1; ++i) CPU_CLR(i, &allowed);
            sched_setaffinity(0, sizeof allowed, &allowed);
            body();
        });
    };
    constexpr int kNever = 600; // some ten do, more on a busy machine, since the sleeper runs when nobody else wants to
    int holds = 0;
    auto greedy = onOneProcessor([&] {
        lock.Enter();
        held = true;
        for (; turns < 5 && holds < kNever; ++holds) {
            std::this_thread::sleep_for(std::chrono::milliseconds(5));
            lock.Leave();
            lock.Enter();
        }
        lock.Leave();
    });
    while (!held) std::this_thread::yield();
    auto sleeper = onOneProcessor([&] {
        const sched_param parameters{};
        sched_setscheduler(0, SCHED_IDLE, &parameters);
        for (; turns < 5; ++turns) lock.Enter(), lock.Leave();
    });
    greedy.join();
    sleeper.join();
    EXPECT_LT(holds, kNever);
}

} // namespace
