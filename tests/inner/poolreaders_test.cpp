// Reading the pool without its lock: nobody reads while the table is closed, and threads that are stopped or gone.

#include "poolreaders.h"

#include <atomic>
#include <gtest/gtest.h>
#include <memory>
#include <thread>
#include <vector>

using namespace TAVO;
using String::pool::Readers;

namespace {

TEST(PoolReaders, NobodyReadsWhileItIsClosed) {
    Readers readers;
    std::vector<int> table(16, 0); // all the same while open
    std::atomic<bool> joined{false}, stop{false};
    int torn = 0;
    std::thread reader([&] {
        readers.Join();
        joined = true;
        while (!stop.load(std::memory_order_relaxed)) {
            Readers::Mark* mark = readers.Enter();
            if (!mark) continue;
            for (const int each : table) torn += each != table.front();
            Readers::Leave(*mark);
        }
    });
    while (!joined) std::this_thread::yield();
    for (int round = 1; round < 2000; ++round) {
        ASSERT_TRUE(readers.Close());
        for (int& each : table) each = round;
        readers.Open();
    }
    stop = true;
    reader.join();
    EXPECT_EQ(torn, 0);
}

TEST(PoolReaders, OneThatWasStoppedInsideIsTold) {
    Readers readers;
    EXPECT_FALSE(readers.Enter()) << "without a mark";
    readers.Join();
    Readers::Mark* mark = readers.Enter();
    ASSERT_TRUE(mark);
    std::thread([&] { EXPECT_FALSE(readers.Close()); }).join();
    Readers::Leave(*mark);
    EXPECT_EQ(readers.Enter(), mark) << "open again";
    Readers::Leave(*mark);
    ASSERT_TRUE(readers.Close());
    EXPECT_FALSE(readers.Enter());
    readers.Open();
}

// More threads than there are marks, one after the other; the first dies while it reads.
TEST(PoolReaders, MarksOfThreadsThatEndedAreFreed) {
    const auto readers = std::make_unique<Readers>();
    std::thread([&] {
        readers->Join();
        EXPECT_TRUE(readers->Enter());
    }).join();
    int inside = 0;
    for (int i = 0; i < 300; ++i) {
        ASSERT_TRUE(readers->Close());
        readers->Open();
        std::thread([&] {
            readers->Join();
            Readers::Mark* mark = readers->Enter();
            if (!mark) return;
            ++inside;
            Readers::Leave(*mark);
        }).join();
    }
    EXPECT_EQ(inside, 300);
}

} // namespace
