// The pool's inside: its lock, reading without the lock, sweeps and threads' priorities, and what it tells at the end.

#include "platform/platform.h"
#include "poolentry.h"
#include "poollock.h"
#include "poolreaders.h"
#include "support/log.h"

#include <atomic>
#include <chrono>
#include <gtest/gtest.h>
#include <memory>
#include <thread>

using namespace TAVO;
using namespace TAVO::String;
using pool::Lock, pool::Readers;

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
    for (Shared& each : shared) {
        while (each.progress.load(std::memory_order_relaxed) < 4200) {
        }
        for (int i = 0; i < 10; ++i) each.Pass(i % 2);
    }
    favourite.join();
    for (const Shared& each : shared) EXPECT_EQ(each.overlaps, 0);
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

TEST(PoolReaders, NobodyReadsWhileItIsClosed) {
    Readers readers;
    std::vector<int> table(16, 0); // all the same while open
    std::atomic<bool> joined{false}, stop{false};
    std::thread reader([&] {
        readers.Join();
        joined = true;
        int torn = 0;
        while (!stop.load(std::memory_order_relaxed)) {
            Readers::Mark* const mark = readers.Enter();
            if (!mark) continue;
            for (const int each : table) torn += each != table.front();
            Readers::Leave(*mark);
        }
        EXPECT_EQ(torn, 0);
    });
    while (!joined) std::this_thread::yield();
    for (int round = 1; round < 2000; ++round) {
        EXPECT_TRUE(readers.Close());
        table.assign(16, round);
        readers.Open();
    }
    stop = true;
    reader.join();
}

TEST(PoolReaders, OneThatWasStoppedInsideIsTold) {
    Readers readers;
    EXPECT_FALSE(readers.Enter()) << "without a mark";
    readers.Join();
    Readers::Mark* const mark = readers.Enter();
    ASSERT_TRUE(mark);
    std::thread([&] { EXPECT_FALSE(readers.Close()); }).join();
    Readers::Leave(*mark);
    EXPECT_EQ(readers.Enter(), mark) << "open again";
    Readers::Leave(*mark);
    EXPECT_TRUE(readers.Close() && !readers.Enter());
    readers.Open();
}

// More threads than there are marks, one after the other; every second dies while it reads.
TEST(PoolReaders, MarksOfThreadsThatEndedAreFreed) {
    const auto readers = std::make_unique<Readers>();
    for (int i = 0; i < 300; ++i) {
        std::thread([&] {
            readers->Join();
            Readers::Mark* const mark = readers->Enter();
            EXPECT_TRUE(mark) << i;
            if (mark && i % 2) Readers::Leave(*mark);
        }).join();
        ASSERT_TRUE(readers->Close());
        readers->Open();
    }
}

// Intended: collect-priority
TEST(PoolSweepInner, OnlyThreadsOfNormalPrioritySweepIntended) {
    for (const int priority : {-15, -1, 1, 15, 0})
        std::thread([=] {
            Platform::SetThreadPriority(priority);
            EXPECT_EQ(CStringPool::Collect(60000), priority == 0) << priority;
        }).join();
}

// Kept: texts that are held while the tables go stand in no table afterwards, so no sweep finds them.
TEST(PoolUnload, TellsHowManyTextsAreHeldAndLetsThemLive) {
    const CPPoolString first(L"Held at the end"), second(L"HELD AT THE END");
    std::thread([] {
        const support::Log log;
        pool::Unload();
        const std::string start = "8 TAVO source/TAVO/cstringpool:0 SPool ClearTable: ";
        EXPECT_EQ(log.Take(),
                  (support::Texts{start + "Diagnosis started", start + "diagnosis done, %u items still referenced|2"}));
    }).join();
    EXPECT_EQ(CStringPool::GetNItems(), 0u);
    EXPECT_STREQ(static_cast<const wchar_t*>(first), L"Held at the end");
    EXPECT_TRUE(CPPoolString(L"HELD AT THE END") != second) << "interning goes on, with entries of its own";
}

} // namespace
