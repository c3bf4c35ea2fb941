// Events: who is let go, and which signals are used. Threads: start, wait, terminate, and what becomes of the object
// that ran.

#include "support/heapwatch.h"
#include "support/jobs.h"
#include "support/log.h"

#include <algorithm>
#include <chrono>
#include <list>
#include <random>
#include <stdexcept>

using namespace TAVO::Threading;
using namespace support;
using TAVO::ulong32;
using TAVO::Buffers::CPObjectMemory;
using Clock = std::chrono::steady_clock;

// Some time that no clock measures.
static void Spin(unsigned long long turns) {
    for (; turns; --turns) std::atomic_signal_fence(std::memory_order_seq_cst);
}

TEST(Events, FollowANaiveModel) {
    struct Model {
        CPEvent event;
        bool manual, set;
    };
    constexpr std::size_t kEvents = 12; // more than a wait has room for without memory
    std::vector<Model> all;
    for (std::size_t i = 0; i < kEvents; ++i) all.push_back({CPEvent(i % 3 == 0), i % 3 == 0, false});
    const CPMultipleEvent multiple;
    std::vector<Model*> attached;
    std::mt19937 random(1);
    for (int step = 0; step < 20000; ++step) {
        Model& one = all[random() % kEvents];
        const auto place = std::find(attached.begin(), attached.end(), &one);
        const bool isAttached = place != attached.end();
        const std::size_t index = random() % kEvents;
        const ulong32 ms = random() % 500 == 0, act = random() % 8;
        if (act < 2) {
            one.set = act != 0;
            one.set ? one.event.Set() : one.event.Reset();
        } else if (act == 2) {
            ASSERT_EQ(one.event.Wait(ms), one.set ? 0 : WaitTimedOut) << step;
            one.set &= one.manual;
        } else if (act < 5) {
            ASSERT_NE(multiple.Attach(one.event), isAttached) << step;
            if (!isAttached) attached.push_back(&one);
        } else if (act == 5) {
            ASSERT_EQ(multiple.Detach(one.event), isAttached) << step;
            if (isAttached) attached.erase(place);
        } else if (act == 6) {
            ASSERT_EQ(multiple.Reset(index), index < attached.size()) << step;
            if (index < attached.size()) attached[index]->set = false;
        } else {
            const auto first = std::find_if(attached.begin(), attached.end(), [](Model* m) { return m->set; });
            const auto found = static_cast<unsigned long long>(first - attached.begin());
            const auto none = attached.empty() ? WaitNoState : WaitTimedOut;
            ASSERT_EQ(multiple.Wait(ms), first == attached.end() ? none : found) << step;
            if (first != attached.end()) (*first)->set &= (*first)->manual;
        }
    }
}

TEST(Events, NoSignalIsLostOrUsedTwice) {
    // Two signals at a time, often while a wait begins: the events between make the beginning long.
    constexpr std::size_t kBetween = 300;
    constexpr int kRounds = 250;
    const CPEvent first(false), last(false), stop(true);
    const CPMultipleEvent several;
    EXPECT_TRUE(several.Attach(first));
    for (std::size_t i = 0; i < kBetween; ++i) EXPECT_TRUE(several.Attach(CPEvent(false)));
    EXPECT_TRUE(several.Attach(last) && several.Attach(stop));
    std::atomic<int> used{0};
    const auto waitFor = [&](ulong32 ms) {
        for (unsigned long long index = 0; index != kBetween + 2; used += index < kBetween + 2)
            index = several.Wait(ms);
    };
    const auto poll = [&] {
        while (stop.Wait(0) != 0) used += (first.Wait(0) == 0) + (last.Wait(1) == 0);
    };
    const std::function<void()> kinds[] = {[&] { waitFor(WaitForever); }, [&] { waitFor(1); }, poll};
    std::mt19937 random(2);
    for (unsigned chosen = 1; chosen < 8; ++chosen) { // every set of kinds at once
        std::list<Job> jobs;
        for (int kind = 0; kind < 3; ++kind)
            if (chosen >> kind & 1) jobs.emplace_back(kinds[kind]);
        const auto patience = Clock::now() + std::chrono::seconds(20);
        used = 0;
        for (int round = 1; round <= kRounds; ++round) {
            Spin(random() % 4000);
            last.Set();
            first.Set();
            while (used < 2 * round && Clock::now() < patience) std::this_thread::yield();
        }
        stop.Set();
        jobs.clear();
        stop.Reset();
        ASSERT_EQ(used, 2 * kRounds) << chosen;
        ASSERT_EQ(several.Wait(0), WaitTimedOut) << chosen;
    }
}

TEST(Events, AnInterruptedWaitUsesNoSignal) {
    std::mt19937 random(3);
    for (int round = 0; round < 100; ++round) {
        const CPEvent event(false), other(false);
        const CPMultipleEvent both;
        EXPECT_TRUE(both.Attach(other) && both.Attach(event));
        std::atomic<bool> began{false}, used{false};
        Job job([&] {
            began = true;
            used = (round % 2 ? both.Wait(WaitForever) : event.Wait(WaitForever)) != WaitTimedOut;
        });
        while (!began) std::this_thread::yield();
        if (round % 8 == 0) CurrentThread::sleep(1);
        std::thread setter([&event, pause = random() % 2000] {
            Spin(pause);
            event.Set();
        });
        EXPECT_TRUE(job.thread.Terminate());
        setter.join();
        ASSERT_EQ(event.Wait(0), used ? WaitTimedOut : 0) << round;
    }
}

TEST(Events, AWaitWorksOnTheEventsOfItsBeginning) {
    const CPMultipleEvent several;
    const CPEvent going(false), coming(false), passing(false);
    EXPECT_TRUE(several.Attach(going));
    unsigned long long result = 7;
    {
        Job job([&] { result = several.Wait(60000); });
        do EXPECT_TRUE(several.Attach(passing) && several.Detach(passing));
        while (going.lockcnt() < 3); // ours, the list's, and that of the wait, which keeps the list of its beginning
        EXPECT_TRUE(several.Detach(going) && several.Attach(coming));
        coming.Set();
        EXPECT_EQ(job.thread.Wait(5), WaitTimedOut);
        going.Set();
    }
    EXPECT_EQ(result, 0u);
    EXPECT_EQ(several.Wait(0), 0u) << "the new one has kept its signal";
}

TEST(Events, TimeOutsAreNeverShorter) {
    const CPEvent event(true);
    const CPMultipleEvent multiple;
    EXPECT_TRUE(multiple.Attach(event));
    Job job([&] { event.Wait(WaitForever); });
    const std::function<bool()> waits[] = {
        [&] { return event.Wait(15) == WaitTimedOut; }, [&] { return multiple.Wait(15) == WaitTimedOut; },
        [&] { return job.thread.Wait(15) == WaitTimedOut; }, [] { return CurrentThread::sleep(15), true; }};
    for (const auto& wait : waits) {
        const auto start = Clock::now();
        EXPECT_TRUE(wait());
        const std::chrono::duration<double> taken = Clock::now() - start;
        EXPECT_TRUE(taken.count() >= 0.015 && taken.count() < 10) << &wait - waits << ": " << taken.count();
    }
    event.Set();
}

TEST(Events, NeedMemoryOnlyToBeMade) {
    const CPEvent one(false), sleeper(false);
    ForEachFailingAllocation([&] {
        const CPEvent event(true);
        const CPMultipleEvent multiple;
        event.Set();
        EXPECT_EQ(event.Wait(WaitForever), event.key() ? 0 : WaitNoState);
        const bool attached = multiple.Attach(one);
        EXPECT_EQ(multiple.Wait(0), attached ? WaitTimedOut : WaitNoState);
        const bool second = multiple.Attach(event);
        EXPECT_EQ(multiple.Wait(0), second ? attached : attached ? WaitTimedOut : WaitNoState);
        EXPECT_EQ(multiple.Detach(one), attached);
    });
    const CPMultipleEvent many;
    std::vector<CPEvent> events(9, sleeper);
    for (CPEvent& event : events) EXPECT_TRUE(many.Attach(event = CPEvent(false)));
    const FailingHeap heap(0);
    EXPECT_EQ(many.Wait(1), WaitNoState);
    events[8].Set();
    EXPECT_EQ(many.Wait(1), 8u);
}

// Intended: event-source
TEST(Events, AssertAboutASourceAndAreSet_Intended) {
    const Assertions assertions;
    const CPEvent event(false);
    event.Set(&event);
    EXPECT_EQ(Assertions::Take(), Texts{"source/TAVO/threading,743:pSource==NULL"});
    EXPECT_EQ(event.Wait(0), 0u);
}

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
    ForEachFailingAllocation([&] {
        runs = 0;
        const bool started = thread.Execute(Wrapper::Create(), reinterpret_cast<std::size_t>(&body));
        EXPECT_EQ(thread.Wait(WaitForever), started ? 0 : WaitNoState);
        EXPECT_EQ(runs, started);
    });
    const CPObjectMemory object = Wrapper::Create();
    Wrapper* wrapper = Wrapper::From(object); // at the begin of the payload
    _acfUID other = Call::uid;
    ++other.Data4[7];
    const auto query = Wrapper::_vtbl.queryinterface;
    EXPECT_EQ(query(wrapper, acfTypeOf<IThreadExecute>::uid), static_cast<IThreadExecute*>(wrapper));
    EXPECT_TRUE(query(wrapper, Call::uid) == &wrapper->Object() && !query(wrapper, other));
    EXPECT_TRUE(wrapper->QueryInterface(Call::uid) == &wrapper->Object() && !Wrapper::From(CPEvent(true)));
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
    const auto start = Clock::now();
    EXPECT_FALSE(job.thread.Terminate());
    EXPECT_GE(Clock::now() - start, std::chrono::milliseconds(4990));
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

// --- locks -----------------------------------------------------------------------------------------------------------

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
    const auto start = Clock::now();
    EXPECT_FALSE(LetsIn(copy, 150));
    const std::chrono::duration<double> taken = Clock::now() - start;
    // the system clock may differ a little from the steady one
    EXPECT_TRUE(taken.count() >= 0.14 && taken.count() < 10) << taken.count();
    copy.Leave();
    EXPECT_TRUE(LetsIn(lock, 1)) << "a wait that ended leaves nothing behind";
    EXPECT_TRUE(lock.TryEnter(WaitForever)) << "as Enter";
    EXPECT_FALSE(LetsIn(lock));
    lock.Leave();
    EXPECT_EQ(TypeParam::_vtbl.clone, nullptr);

    const FailingHeap heap(0);
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
