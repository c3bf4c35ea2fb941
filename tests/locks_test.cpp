// Locks: hand-over between threads, re-entrance, time-outs, handles.

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

TYPED_TEST(AnyLock, ExcludesOtherThreadsInEveryCopy) {
    TypeParam lock, copy = lock;
    EXPECT_EQ(copy.key(), lock.key());
    EXPECT_TRUE(lock.TryEnter(0));
    EXPECT_FALSE(LetsIn(copy));
    copy.Leave();
    EXPECT_TRUE(LetsIn(lock, 5000));
    EXPECT_TRUE(lock.TryEnter(WaitForever)) << "as Enter";
    EXPECT_FALSE(LetsIn(lock));
    lock.Leave();
}

TYPED_TEST(AnyLock, HandsOverToTheWaiter) {
    TypeParam lock;
    for (int round = 0; round < 50; ++round) {
        std::atomic<bool> taken{false};
        lock.Enter();
        std::thread waiter([&] {
            if (round % 2)
                lock.Enter();
            else
                EXPECT_TRUE(lock.TryEnter(60000));
            taken = true;
            lock.Leave();
        });
        EXPECT_FALSE(taken);
        lock.Leave();
        waiter.join();
    }
}

TYPED_TEST(AnyLock, TimeOutsAreKept) {
    TypeParam lock;
    lock.Enter();
    const auto start = std::chrono::steady_clock::now();
    EXPECT_FALSE(LetsIn(lock, 150));
    const std::chrono::duration<double> taken = std::chrono::steady_clock::now() - start;
    EXPECT_GE(taken.count(), 0.14) << "the system clock may differ a little from the steady one";
    EXPECT_LT(taken.count(), 10);
    lock.Leave();
    EXPECT_TRUE(LetsIn(lock, 1)) << "a wait that ended leaves nothing behind";
}

TYPED_TEST(AnyLock, HasItsOwnTypeAndNoCopies) {
    const TypeParam lock;
    const TAVO::Buffers::CPObjectMemory& block = lock;
    int same = 0;
    for (const auto type : {CPMutex::GetTypeID(), CPCriticalSection::GetTypeID(), CPRWInterlock::GetTypeID()})
        same += block.GetTypeID() == type;
    EXPECT_EQ(same, 1);
    EXPECT_TRUE(block.IsType(TypeParam::GetTypeID()));
    EXPECT_EQ(TypeParam::_vtbl.clone, nullptr);
}

TYPED_TEST(AnyLock, WithoutMemoryDoesNothing) {
    support::FailingHeap heap(0);
    TypeParam lock;
    EXPECT_TRUE(heap.Refused());
    EXPECT_EQ(lock.key(), 0u);
    lock.Enter();
    lock.Leave();
    EXPECT_FALSE(lock.TryEnter(0) || lock.TryEnter(WaitForever));
    if constexpr (std::is_same_v<TypeParam, CPRWInterlock>) {
        lock.EnterRead();
        lock.LeaveRead();
        EXPECT_FALSE(lock.TryEnterRead(0) || lock.TryEnterRead(WaitForever));
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
}

TEST(CriticalSection, ANewThreadIsNeverTakenForADeadOwner) {
    const CPCriticalSection lock;
    std::thread([&] { lock.Enter(); }).join(); // ends as the owner
    for (int i = 0; i < 20; ++i) EXPECT_FALSE(LetsIn(lock));
}

TEST(Interlock, ManyReadOneWrites) {
    const CPRWInterlock lock;
    lock.EnterRead();
    EXPECT_TRUE(LetsRead(lock));
    EXPECT_FALSE(LetsIn(lock) || LetsIn(lock, 20));
    lock.LeaveRead();
    EXPECT_TRUE(lock.TryEnter(0));
    EXPECT_FALSE(LetsRead(lock) || LetsRead(lock, 20));
    lock.Leave();
    EXPECT_TRUE(LetsRead(lock, WaitForever));
}

TEST(Interlock, AWriterGoesBeforeNewReaders) {
    const CPRWInterlock lock;
    std::atomic<bool> written{false};
    lock.EnterRead();
    std::thread writer([&] {
        lock.Enter();
        written = true;
        lock.Leave();
    });
    while (LetsRead(lock)) std::this_thread::yield(); // until the writer waits and keeps new readers out
    EXPECT_FALSE(written);
    lock.LeaveRead();
    writer.join();
    EXPECT_TRUE(LetsRead(lock, 5000));
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
    const auto work = [&](int t) {
        for (int i = t; i < kRounds + t; ++i) {
            if (i % 3 == 0 || !mutex.TryEnter(i % 2)) mutex.Enter();
            ++underMutex;
            mutex.Leave();

            section.Enter();
            EXPECT_TRUE(section.TryEnter(0));
            ++underSection;
            section.Leave();
            section.Leave();

            if (i % 4) {
                interlock.EnterRead();
                EXPECT_EQ(first, second);
                interlock.LeaveRead();
                continue;
            }
            interlock.Enter();
            interlock.EnterRead();
            ++first;
            interlock.LeaveRead();
            ++second;
            interlock.Leave();
        }
    };
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) threads.emplace_back(work, t);
    for (auto& thread : threads) thread.join();
    EXPECT_EQ(underMutex, kThreads * kRounds);
    EXPECT_EQ(underSection, kThreads * kRounds);
    EXPECT_EQ(first, kThreads * kRounds / 4);
    EXPECT_EQ(second, first);
}
