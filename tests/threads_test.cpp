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
    const CPEvent begun(false), go(false);
    EXPECT_EQ(Wrapper::From(Wrapper::Create())->GetState(), ThreadNotStarted);
    Job job([&] {
        begun.Set();
        go.Wait(WaitForever);
    });
    const CPThread copy = job.thread;
    EXPECT_TRUE(begun.Wait(60000) == 0 && job.State() == ThreadRunning);
    EXPECT_FALSE(job.thread.Execute(job.object, 0)) << "one thread per handle";
    EXPECT_TRUE(job.thread.Wait(0) == WaitTimedOut && job.object.lockcnt() == 2);
    go.Set();
    EXPECT_TRUE(job.thread.Wait(60000) == 0 && job.State() == ThreadEnded);
    EXPECT_EQ(job.object.lockcnt(), 1u) << "also while a handle of the thread is left";
    EXPECT_TRUE(CPThread(copy).Wait(0) == 0 && CPThread(copy).Terminate()) << "has ended for every handle";
    EXPECT_TRUE(job.thread.key() == 0 && job.thread.Terminate() && job.thread.Wait(WaitForever) == WaitNoState);
    Job failing([] { throw std::logic_error("thrown"); });
    EXPECT_TRUE(failing.thread.Wait(WaitForever) == 0 && failing.State() == ThreadFailed);
}

TEST(Threads, RefuseWhatTheyCannotRunAndAnswerForTheirClassOnly) {
    CPThread thread;
    EXPECT_FALSE(thread.Execute(CPObjectMemory(), 0) || thread.Execute(CPEvent(true), 0) || thread.key());
    int runs = 0;
    std::function<void()> body = [&] { ++runs; };
    support::ForEachFailingAllocation([&] {
        runs = 0;
        const bool started = thread.Execute(Wrapper::Create(), reinterpret_cast<std::size_t>(&body));
        EXPECT_EQ(thread.Wait(WaitForever), started ? 0 : WaitNoState);
        EXPECT_EQ(runs, started);
    });
    const CPObjectMemory object = Wrapper::Create();
    Wrapper* wrapper = Wrapper::From(object); // at the begin of the payload
    _acfUID other = support::Call::uid;
    ++other.Data4[7];
    const auto query = Wrapper::_vtbl.queryinterface;
    EXPECT_EQ(query(wrapper, acfTypeOf<IThreadExecute>::uid), static_cast<IThreadExecute*>(wrapper));
    EXPECT_TRUE(query(wrapper, support::Call::uid) == &wrapper->Object() && !query(wrapper, other));
    EXPECT_TRUE(wrapper->QueryInterface(support::Call::uid) == &wrapper->Object() && !Wrapper::From(CPEvent(true)));
}

TEST(Threads, EndAtEveryInterruptionPoint) {
    const CPEvent never(false), set(true);
    const CPMultipleEvent nothing;
    EXPECT_TRUE(nothing.Attach(never));
    set.Set();
    Job other([&] { never.Wait(WaitForever); });
    const auto endless = [&] {
        for (;;) set.Wait(0); // one that never has to wait is one, too
    };
    const std::function<void()> points[] = {[] { CurrentThread::sleep(100000); }, [&] { never.Wait(WaitForever); },
                                            [&] { nothing.Wait(WaitForever); }, [&] { other.thread.Wait(WaitForever); },
                                            endless};
    for (const auto& point : points)
        for (const bool asleep : {false, true}) {
            const CPEvent begun(false);
            Job job([&] {
                begun.Set();
                point();
            });
            EXPECT_EQ(begun.Wait(60000), 0u);
            if (asleep) CurrentThread::sleep(2);
            EXPECT_TRUE(job.thread.Terminate() && !job.thread.key() && job.State() == ThreadFailed) << &point - points;
        }
    EXPECT_TRUE(other.thread.Terminate()) << "the interrupted joins left it as it was";
}

TEST(Threads, AreLeftToThemselvesAfterFiveSeconds) {
    std::atomic<bool> go{false};
    Job job([&] {
        while (!go) std::this_thread::yield();
    });
    CPThread copy = job.thread;
    const auto start = std::chrono::steady_clock::now();
    EXPECT_FALSE(job.thread.Terminate());
    EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(4990));
    EXPECT_EQ(copy.Wait(WaitForever), WaitTimedOut) << "nobody can tell any more";
    EXPECT_FALSE(job.thread.key() || copy.Terminate());
    go = true;
}

// Intended: thread-runs-on
TEST(Threads, CannotWaitForThemselvesAndRunOnWithoutHandles_Intended) {
    const CPEvent go(false);
    bool interrupted = false, ended = false;
    Job job([&] {
        go.Wait(WaitForever); // until the handle is complete
        CPThread self = job.thread;
        EXPECT_TRUE(self.Wait(WaitForever) == WaitTimedOut && !self.Terminate());
        interrupted = true;
        CurrentThread::sleep(100000);
        interrupted = false;
    });
    go.Set();
    while (job.object.lockcnt() > 1) std::this_thread::yield(); // it was detached
    EXPECT_TRUE(interrupted && job.State() == ThreadFailed);
    {
        Job left([&] { ended = go.Wait(60000) == 0; });
        left.thread.free();
        go.Set();
    }
    EXPECT_TRUE(ended);
}
