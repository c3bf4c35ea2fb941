// Threads: start, wait, terminate, and what becomes of the object that ran.

#include "support/heapwatch.h"
#include "support/jobs.h"

#include <chrono>
#include <stdexcept>
#include <thread>

using namespace TAVO::Threading;
using support::Job;
using support::Wrapper;
using TAVO::Buffers::CPObjectMemory;

TEST(Threads, RunAnObjectAndLetItGo) {
    CPThread thread;
    EXPECT_EQ(thread.Wait(WaitForever), WaitNoState);
    EXPECT_TRUE(thread.Terminate()) << "there is none";
    const CPObjectMemory object = Wrapper::Create();
    EXPECT_EQ(Wrapper::From(object)->GetState(), ThreadNotStarted);
    const CPEvent begun(false), go(false);
    std::function<void()> body = [&] {
        begun.Set();
        go.Wait(WaitForever);
    };
    ASSERT_TRUE(thread.Execute(object, reinterpret_cast<std::size_t>(&body)));
    EXPECT_FALSE(thread.Execute(object, 0)) << "one thread per handle";
    EXPECT_EQ(begun.Wait(60000), 0u);
    EXPECT_EQ(Wrapper::From(object)->GetState(), ThreadRunning);
    EXPECT_EQ(thread.Wait(0), WaitTimedOut);
    EXPECT_EQ(object.lockcnt(), 2u);
    const CPThread copy = thread;
    go.Set();
    EXPECT_EQ(thread.Wait(60000), 0u);
    EXPECT_EQ(thread.key(), 0u);
    EXPECT_EQ(object.lockcnt(), 1u) << "also while a handle of the thread is left";
    EXPECT_EQ(CPThread(copy).Wait(0), 0u) << "what has ended has ended for every handle";
    EXPECT_TRUE(CPThread(copy).Terminate());
    EXPECT_EQ(Wrapper::From(object)->GetState(), ThreadEnded);
    ASSERT_TRUE(
        thread.Execute(object, reinterpret_cast<std::size_t>(&(body = [] { throw std::logic_error("thrown"); }))));
    EXPECT_EQ(thread.Wait(WaitForever), 0u);
    EXPECT_EQ(Wrapper::From(object)->GetState(), ThreadFailed);
}

TEST(Threads, RefuseWhatTheyCannotRun) {
    CPThread thread;
    EXPECT_FALSE(thread.Execute(CPObjectMemory(), 0));
    EXPECT_FALSE(thread.Execute(CPEvent(true), 0)) << "no such interface";
    EXPECT_EQ(thread.key(), 0u);
    std::atomic<int> runs{0};
    std::function<void()> body = [&] { ++runs; };
    support::ForEachFailingAllocation([&] {
        const int before = runs;
        const CPObjectMemory object = Wrapper::Create();
        const bool started = thread.Execute(object, reinterpret_cast<std::size_t>(&body));
        EXPECT_EQ(thread.Wait(WaitForever), started ? 0 : WaitNoState);
        EXPECT_EQ(runs, before + started);
    });
}

TEST(Threads, AnswerForTheirClassOnly) {
    const CPObjectMemory object = Wrapper::Create();
    Wrapper* wrapper = Wrapper::From(object);
    IThreadExecute* execute = wrapper;
    EXPECT_EQ(execute->QueryInterface(support::Call::uid), &wrapper->Object());
    EXPECT_EQ(execute->QueryInterface(acfTypeOf<IThreadExecute>::uid), nullptr);
    void* payload = wrapper; // the block begins with it
    EXPECT_EQ(Wrapper::_vtbl.queryinterface(payload, acfTypeOf<IThreadExecute>::uid), execute);
    EXPECT_EQ(Wrapper::_vtbl.queryinterface(payload, support::Call::uid), &wrapper->Object());
    _acfUID other = support::Call::uid;
    ++other.Data4[7];
    EXPECT_EQ(Wrapper::_vtbl.queryinterface(payload, other), nullptr);
    EXPECT_EQ(Wrapper::From(CPEvent(true)), nullptr);
}

TEST(Threads, EndAtEveryInterruptionPoint) {
    const CPEvent never(false), set(true);
    const CPMultipleEvent nothing;
    EXPECT_TRUE(nothing.Attach(never));
    set.Set();
    Job other([&] { never.Wait(WaitForever); });
    const std::function<void()> points[] = {
        [] { CurrentThread::sleep(100000); },
        [&] { never.Wait(WaitForever); },
        [&] { never.Wait(100000); },
        [&] { nothing.Wait(WaitForever); },
        [&] { other.thread.Wait(100000); },
        [&] { other.thread.Wait(WaitForever); },
        [&] {
            for (;;) set.Wait(0); // one that never has to wait is one, too
        },
    };
    for (const auto& point : points)
        for (const bool asleep : {false, true}) {
            const CPEvent begun(false);
            Job job([&] {
                begun.Set();
                point();
            });
            EXPECT_EQ(begun.Wait(60000), 0u);
            if (asleep) CurrentThread::sleep(2);
            EXPECT_TRUE(job.thread.Terminate()) << &point - points;
            EXPECT_EQ(job.thread.key(), 0u);
            EXPECT_EQ(job.State(), ThreadFailed) << &point - points;
        }
    EXPECT_TRUE(other.thread.Terminate()) << "the interrupted joins left it as it was";
}

TEST(Threads, AreLeftToThemselvesAfterFiveSeconds) {
    std::atomic<bool> go{false};
    const CPEvent ended(false);
    Job job([&] {
        while (!go) std::this_thread::yield();
        ended.Set();
    });
    CPThread copy = job.thread;
    const auto start = std::chrono::steady_clock::now();
    EXPECT_FALSE(job.thread.Terminate());
    const std::chrono::duration<double> taken = std::chrono::steady_clock::now() - start;
    EXPECT_GE(taken.count(), 4.99);
    EXPECT_EQ(job.thread.key(), 0u);
    EXPECT_EQ(copy.Wait(0), WaitTimedOut) << "nobody can tell any more";
    EXPECT_FALSE(copy.Terminate());
    go = true;
    EXPECT_EQ(ended.Wait(60000), 0u);
    while (job.object.lockcnt() > 1) std::this_thread::yield();
}

TEST(Threads, CannotWaitForThemselves) {
    const CPEvent go(false);
    CPThread thread;
    unsigned long long waited = 7;
    bool terminated = true, interrupted = false;
    std::function<void()> body = [&] {
        go.Wait(WaitForever); // until the handle is complete
        CPThread self = thread;
        waited = self.Wait(WaitForever);
        terminated = self.Terminate();
        try {
            CurrentThread::sleep(100000);
        } catch (...) {
            interrupted = true;
            throw;
        }
    };
    const CPObjectMemory object = Wrapper::Create();
    ASSERT_TRUE(thread.Execute(object, reinterpret_cast<std::size_t>(&body)));
    go.Set();
    while (object.lockcnt() > 1) std::this_thread::yield(); // it was detached
    EXPECT_EQ(waited, WaitTimedOut);
    EXPECT_FALSE(terminated);
    EXPECT_TRUE(interrupted);
}

TEST(Threads, RunOnWithoutHandles_Intended) {
    const CPEvent go(false), ended(false);
    std::function<void()> body = [&] {
        go.Wait(WaitForever);
        ended.Set();
    };
    CPObjectMemory object = Wrapper::Create();
    {
        CPThread thread;
        ASSERT_TRUE(thread.Execute(object, reinterpret_cast<std::size_t>(&body)));
    }
    EXPECT_EQ(object.lockcnt(), 2u);
    go.Set();
    EXPECT_EQ(ended.Wait(60000), 0u);
    while (object.lockcnt() > 1) std::this_thread::yield();
}
