// Locks: exclusion, hand-over between threads, re-entrance, time-outs, handles.

#include "support/heapwatch.h"

#include <atomic>
#include <chrono>
#include <functional>
#include <TAVO/threading.h>
#include <thread>
#include <vector>

using namespace TAVO::Threading;
using TAVO::ulong32;

namespace {

// What another thread finds.
bool Elsewhere(const std::function<bool()>& question) {
    bool answer = false;
    std::thread([&] { answer = question(); }).join();
    return answer;
}

// Whether another thread gets in; it leaves at once.
template <class Lock> bool LetsIn(const Lock& lock, ulong32 wait = 0) {
    return Elsewhere([&] { return lock.TryEnter(wait) && (lock.Leave(), true); });
}
bool LetsRead(const CPRWInterlock& lock, ulong32 wait = 0) {
    return Elsewhere([&] { return lock.TryEnterRead(wait) && (lock.LeaveRead(), true); });
}

template <class Lock> class AnyLock : public testing::Test {};
using Locks = testing::Types<CPMutex, CPCriticalSection, CPRWInterlock>;
TYPED_TEST_SUITE(AnyLock, Locks);

} // namespace

TYPED_TEST(AnyLock, ExcludesOtherThreadsInEveryCopyAndKeepsTimeOuts) {
    TypeParam lock, copy = lock;
    EXPECT_TRUE(lock.TryEnter(0));
    EXPECT_FALSE(LetsIn(copy));
    const auto start = std::chrono::steady_clock::now();
    EXPECT_FALSE(LetsIn(copy, 150));
    const std::chrono::duration<double> taken = std::chrono::steady_clock::now() - start;
    // the system clock may differ a little from the steady one
    EXPECT_TRUE(taken.count() >= 0.14 && taken.count() < 10) << taken.count();
    copy.Leave();
    EXPECT_TRUE(LetsIn(lock, 1)) << "a wait that ended leaves nothing behind";
    EXPECT_TRUE(lock.TryEnter(WaitForever)) << "as Enter";
    EXPECT_FALSE(LetsIn(lock));
    lock.Leave();
    EXPECT_EQ(TypeParam::_vtbl.clone, nullptr);

    const support::FailingHeap heap(0);
    TypeParam none;
    none.Enter();
    none.Leave();
    EXPECT_FALSE(none.key() || none.TryEnter(0) || none.TryEnter(WaitForever)) << "without memory it does nothing";
    if constexpr (std::is_same_v<TypeParam, CPRWInterlock>) {
        none.EnterRead();
        none.LeaveRead();
        EXPECT_FALSE(none.TryEnterRead(0) || none.TryEnterRead(WaitForever));
    }
}

TEST(CriticalSection, IsLeftAsOftenAsEntered) {
    const CPCriticalSection lock;
    constexpr int kTimes = 70000; // beyond 16 bits
    for (int i = 0; i < kTimes; ++i) lock.Enter();
    EXPECT_TRUE(lock.TryEnter(0) && lock.TryEnter(10) && lock.TryEnter(WaitForever));
    for (int left = kTimes + 3; left > 0; --left) {
        ASSERT_FALSE(left < 5 && LetsIn(lock)) << left;
        lock.Leave();
    }
    EXPECT_TRUE(LetsIn(lock));
    std::thread([&] { lock.Enter(); }).join(); // ends as the owner
    for (int i = 0; i < 20; ++i) EXPECT_FALSE(LetsIn(lock)) << "a new thread is never taken for a dead owner";
}

TEST(Interlock, ManyReadOneWritesAndGoesBeforeNewReaders) {
    const CPRWInterlock lock;
    std::atomic<bool> written{false};
    lock.EnterRead();
    EXPECT_TRUE(LetsRead(lock));
    EXPECT_FALSE(LetsIn(lock) || LetsIn(lock, 20));
    std::thread writer([&] {
        lock.Enter();
        written = true;
        lock.Leave();
    });
    while (LetsRead(lock)) std::this_thread::yield(); // until the writer waits and keeps new readers out
    EXPECT_FALSE(written);
    lock.LeaveRead();
    writer.join();
    EXPECT_TRUE(lock.TryEnter(0));
    EXPECT_FALSE(LetsRead(lock) || LetsRead(lock, 20));
    lock.Leave();
    EXPECT_TRUE(LetsRead(lock, WaitForever));
}

TEST(Interlock, TheWriterEntersAgain65535Times) {
    const CPRWInterlock lock;
    constexpr int kTimes = 65535;
    lock.Enter();
    for (int i = 0; i < kTimes; ++i) ASSERT_TRUE(lock.TryEnter(0) && lock.TryEnterRead(0));
    EXPECT_FALSE(lock.TryEnter(0) || lock.TryEnterRead(0));
    lock.Enter(); // raises an assertion and does not count
    lock.EnterRead();
    for (int left = kTimes; left > 0; --left) {
        ASSERT_FALSE(left < 3 && LetsRead(lock)) << left;
        lock.LeaveRead();
        lock.Leave();
    }
    EXPECT_FALSE(LetsRead(lock));
    lock.Leave();
    EXPECT_TRUE(LetsIn(lock));
}

// Plain counters under each lock: a thread checker sees every hole.
TEST(LocksUnderStress, GuardPlainData) {
    constexpr int kThreads = 4, kRounds = 3000;
    const CPMutex mutex;
    const CPCriticalSection section;
    const CPRWInterlock interlock;
    int underMutex = 0, underSection = 0, first = 0, second = 0;
    const auto under = [](const auto& lock, int i, const auto& body) {
        if (i % 3 == 0 || !lock.TryEnter(i % 3 == 1 ? 60000 : i % 2)) lock.Enter();
        body();
        lock.Leave();
    };
    const auto read = [&](int ahead) {
        interlock.EnterRead();
        EXPECT_EQ(first, second + ahead);
        interlock.LeaveRead();
    };
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t)
        threads.emplace_back([&, t] {
            for (int i = t; i < kRounds + t; ++i) {
                under(mutex, i, [&] { ++underMutex; });
                under(section, i, [&] { under(section, i, [&] { ++underSection; }); });
                if (i % 4)
                    read(0);
                else
                    under(interlock, i / 4, [&] { ++first, read(1), ++second; });
            }
        });
    for (auto& thread : threads) thread.join();
    EXPECT_TRUE(underMutex == kThreads * kRounds && underSection == kThreads * kRounds);
    EXPECT_TRUE(first == kThreads * kRounds / 4 && second == first);
}
