// Locks: hand-over between threads, re-entrance, time-outs, handles.

#include "support/heapwatch.h"

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <functional>
#include <gtest/gtest.h>
#include <mutex>
#include <TAVO/threading.h>
#include <thread>
#include <vector>

using namespace TAVO::Threading;
using TAVO::ulong32;

namespace {

// A second thread that runs one step after the other on demand, so that tests say who does what when.
class Helper {
public:
    Helper() : m_thread([this] { Run(); }) {}
    ~Helper() {
        Finish();
        {
            std::lock_guard lock(m_mutex);
            m_stop = true;
        }
        m_changed.notify_all();
        m_thread.join();
    }
    // Starts a step and returns; Finish waits for its end.
    void Start(std::function<void()> step) {
        Finish();
        {
            std::lock_guard lock(m_mutex);
            m_step = std::move(step);
        }
        m_changed.notify_all();
    }
    void Finish() {
        std::unique_lock lock(m_mutex);
        m_changed.wait(lock, [this] { return !m_step; });
    }
    template <class Step> auto Do(Step step) {
        decltype(step()) result{};
        Start([&] { result = step(); });
        Finish();
        return result;
    }
    template <class Step> void DoVoid(Step step) {
        Start(step);
        Finish();
    }

private:
    void Run() {
        std::unique_lock lock(m_mutex);
        for (;;) {
            m_changed.wait(lock, [this] { return m_step || m_stop; });
            if (!m_step) return;
            const auto step = m_step;
            lock.unlock();
            step();
            lock.lock();
            m_step = nullptr;
            m_changed.notify_all();
        }
    }
    std::mutex m_mutex;
    std::condition_variable m_changed;
    std::function<void()> m_step;
    bool m_stop = false;
    std::thread m_thread;
};

std::chrono::milliseconds TimeOf(const std::function<void()>& body) {
    const auto start = std::chrono::steady_clock::now();
    body();
    return std::chrono::duration_cast<std::chrono::milliseconds>(std::chrono::steady_clock::now() - start);
}

template <class Lock> class AnyLock : public testing::Test {};
using Locks = testing::Types<CPMutex, CPCriticalSection, CPRWInterlock>;
TYPED_TEST_SUITE(AnyLock, Locks);

} // namespace

TYPED_TEST(AnyLock, ExcludesOtherThreads) {
    TypeParam lock;
    Helper other;
    EXPECT_TRUE(lock.TryEnter(0));
    EXPECT_FALSE(other.Do([&] { return lock.TryEnter(0); }));
    lock.Leave();
    EXPECT_TRUE(other.Do([&] { return lock.TryEnter(5000); }));
    EXPECT_FALSE(lock.TryEnter(0));
    other.DoVoid([&] { lock.Leave(); });
    EXPECT_TRUE(lock.TryEnter(WaitForever)) << "as Enter";
    lock.Leave();
}

TYPED_TEST(AnyLock, HandsOverToTheWaiter) {
    TypeParam lock;
    Helper other;
    for (int round = 0; round < 50; ++round) {
        std::atomic<bool> taken{false};
        lock.Enter();
        other.Start([&] {
            if (round % 2)
                lock.Enter();
            else
                EXPECT_TRUE(lock.TryEnter(60000));
            taken = true;
            lock.Leave();
        });
        EXPECT_FALSE(taken);
        lock.Leave();
        other.Finish();
        EXPECT_TRUE(taken);
    }
}

TYPED_TEST(AnyLock, TimeOutsAreKept) {
    TypeParam lock;
    Helper other;
    lock.Enter();
    bool result = true;
    const auto taken = TimeOf([&] { result = other.Do([&] { return lock.TryEnter(150); }); });
    EXPECT_FALSE(result);
    EXPECT_GE(taken.count(), 140) << "the system clock may differ a little from the steady one";
    EXPECT_LT(taken.count(), 10000);
    lock.Leave();
    EXPECT_TRUE(other.Do([&] { return lock.TryEnter(1); })) << "a wait that ended leaves nothing behind";
    other.DoVoid([&] { lock.Leave(); });
}

TYPED_TEST(AnyLock, CopiesAreTheSameLock) {
    TypeParam lock;
    TypeParam copy = lock;
    Helper other;
    EXPECT_EQ(copy.key(), lock.key());
    copy.Enter();
    EXPECT_FALSE(other.Do([&] { return lock.TryEnter(0); }));
    lock.Leave();
    EXPECT_TRUE(other.Do([&] { return copy.TryEnter(0); }));
    other.DoVoid([&] { lock.Leave(); });
}

TYPED_TEST(AnyLock, HasItsOwnTypeAndNoCopies) {
    TypeParam lock;
    const TAVO::Buffers::CPObjectMemory& block = lock;
    EXPECT_EQ(lock.GetTypeID(), TypeParam().GetTypeID());
    EXPECT_TRUE(block.IsType(lock.GetTypeID()));
    EXPECT_EQ((block.GetTypeID() == CPMutex::GetTypeID()) + (block.GetTypeID() == CPCriticalSection::GetTypeID()) +
                  (block.GetTypeID() == CPRWInterlock::GetTypeID()),
              1);
    EXPECT_EQ(TypeParam::_vtbl.clone, nullptr);
}

TYPED_TEST(AnyLock, WithoutMemoryDoesNothing) {
    support::FailingHeap heap(0);
    TypeParam lock;
    EXPECT_TRUE(heap.Refused());
    EXPECT_EQ(lock.key(), 0u);
    lock.Enter();
    lock.Leave();
    EXPECT_FALSE(lock.TryEnter(0));
    EXPECT_FALSE(lock.TryEnter(WaitForever));
    if constexpr (std::is_same_v<TypeParam, CPRWInterlock>) {
        lock.EnterRead();
        lock.LeaveRead();
        EXPECT_FALSE(lock.TryEnterRead(0));
        EXPECT_FALSE(lock.TryEnterRead(WaitForever));
    }
}

TEST(CriticalSection, IsLeftAsOftenAsEntered) {
    CPCriticalSection lock;
    Helper other;
    const auto isFree = [&] {
        return other.Do([&] {
            const bool taken = lock.TryEnter(0);
            if (taken) lock.Leave();
            return taken;
        });
    };
    lock.Enter();
    lock.Enter();
    EXPECT_TRUE(lock.TryEnter(0));
    EXPECT_TRUE(lock.TryEnter(10));
    EXPECT_TRUE(lock.TryEnter(WaitForever));
    for (int i = 0; i < 5; ++i) {
        EXPECT_FALSE(isFree()) << i;
        lock.Leave();
    }
    EXPECT_TRUE(isFree());
    for (int i = 0; i < 70000; ++i) lock.Enter(); // beyond 16 bits
    for (int i = 0; i < 69999; ++i) lock.Leave();
    EXPECT_FALSE(isFree());
    lock.Leave();
    EXPECT_TRUE(isFree());
}

TEST(CriticalSection, ANewThreadIsNeverTakenForADeadOwner) {
    CPCriticalSection lock;
    std::thread([&] { lock.Enter(); }).join(); // ends as the owner
    for (int i = 0; i < 20; ++i) std::thread([&] { EXPECT_FALSE(lock.TryEnter(0)); }).join();
}

TEST(Interlock, ManyReadOneWrites) {
    CPRWInterlock lock;
    Helper other;
    lock.EnterRead();
    EXPECT_TRUE(other.Do([&] { return lock.TryEnterRead(0); }));
    EXPECT_FALSE(other.Do([&] { return lock.TryEnter(0) || lock.TryEnter(20); }));
    other.DoVoid([&] { lock.LeaveRead(); });
    lock.LeaveRead();
    EXPECT_TRUE(other.Do([&] { return lock.TryEnter(0); }));
    EXPECT_FALSE(lock.TryEnterRead(0));
    EXPECT_FALSE(lock.TryEnterRead(20));
    other.DoVoid([&] { lock.Leave(); });
    EXPECT_TRUE(lock.TryEnterRead(WaitForever));
    lock.LeaveRead();
}

TEST(Interlock, TheWriterEntersAgain) {
    CPRWInterlock lock;
    Helper other;
    const auto isFree = [&] {
        return other.Do([&] {
            const bool taken = lock.TryEnterRead(0);
            if (taken) lock.LeaveRead();
            return taken;
        });
    };
    lock.Enter();
    lock.Enter();
    EXPECT_TRUE(lock.TryEnter(0));
    lock.EnterRead();
    EXPECT_TRUE(lock.TryEnterRead(0));
    lock.LeaveRead();
    lock.LeaveRead();
    for (int i = 0; i < 3; ++i) {
        EXPECT_FALSE(isFree()) << i;
        lock.Leave();
    }
    EXPECT_TRUE(isFree());
}

TEST(Interlock, AWriterGoesBeforeNewReaders) {
    CPRWInterlock lock;
    Helper writer, reader;
    std::atomic<bool> written{false};
    lock.EnterRead();
    writer.Start([&] {
        lock.Enter();
        written = true;
        lock.Leave();
    });
    // The writer waits as soon as it keeps new readers out.
    while (reader.Do([&] { return lock.TryEnterRead(0); })) reader.DoVoid([&] { lock.LeaveRead(); });
    EXPECT_FALSE(written);
    lock.LeaveRead();
    writer.Finish();
    EXPECT_TRUE(written);
    EXPECT_TRUE(reader.Do([&] { return lock.TryEnterRead(5000); }));
    reader.DoVoid([&] { lock.LeaveRead(); });
}

TEST(Interlock, RepetitionsEndAt65535) {
    CPRWInterlock lock;
    lock.Enter();
    for (int i = 0; i < 65535; ++i) {
        ASSERT_TRUE(lock.TryEnter(0));
        ASSERT_TRUE(lock.TryEnterRead(0));
    }
    EXPECT_FALSE(lock.TryEnter(0));
    EXPECT_FALSE(lock.TryEnterRead(0));
    lock.Enter(); // raises an assertion and does not count
    lock.EnterRead();
    for (int i = 0; i < 65535; ++i) {
        lock.LeaveRead();
        lock.Leave();
    }
    Helper other;
    EXPECT_FALSE(other.Do([&] { return lock.TryEnter(0); }));
    lock.Leave();
    EXPECT_TRUE(other.Do([&] { return lock.TryEnter(0); }));
    other.DoVoid([&] { lock.Leave(); });
}

// Plain counters under each lock: a thread checker sees every hole.
TEST(LocksUnderStress, GuardPlainData) {
    constexpr int kThreads = 4, kRounds = 3000;
    CPMutex mutex;
    CPCriticalSection section;
    CPRWInterlock interlock;
    int underMutex = 0, underSection = 0, first = 0, second = 0, torn = 0;
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t)
        threads.emplace_back([&, t, mutex, section, interlock] {
            for (int i = 0; i < kRounds; ++i) {
                if ((i + t) % 3 == 0)
                    mutex.Enter();
                else
                    while (!mutex.TryEnter(i % 2 ? 0 : 1)) {
                    }
                ++underMutex;
                mutex.Leave();

                section.Enter();
                while (!section.TryEnter(0)) {
                }
                ++underSection;
                section.Leave();
                section.Leave();

                if ((i + t) % 4 == 0) {
                    interlock.Enter();
                    interlock.EnterRead();
                    ++first;
                    interlock.LeaveRead();
                    ++second;
                    interlock.Leave();
                } else {
                    interlock.EnterRead();
                    const bool whole = first == second;
                    interlock.LeaveRead();
                    if (whole) continue;
                    mutex.Enter();
                    ++torn;
                    mutex.Leave();
                }
            }
        });
    for (auto& thread : threads) thread.join();
    EXPECT_EQ(underMutex, kThreads * kRounds);
    EXPECT_EQ(underSection, kThreads * kRounds);
    EXPECT_EQ(first, kThreads * kRounds / 4);
    EXPECT_EQ(second, first);
    EXPECT_EQ(torn, 0);
}
