// Events: who is let go, and which signals are used.

#include "support/heapwatch.h"
#include "support/jobs.h"
#include "support/log.h"

#include <algorithm>
#include <chrono>
#include <list>
#include <random>

using namespace TAVO::Threading;
using support::Job;
using TAVO::ulong32;

namespace {

using Clock = std::chrono::steady_clock;

// Some time that no clock measures.
void Spin(unsigned long long turns) {
    for (; turns; --turns) std::atomic_signal_fence(std::memory_order_seq_cst);
}

} // namespace

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
    support::ForEachFailingAllocation([&] {
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
    const support::FailingHeap heap(0);
    EXPECT_EQ(many.Wait(1), WaitNoState);
    events[8].Set();
    EXPECT_EQ(many.Wait(1), 8u);
}

// Intended: event-source
TEST(Events, AssertAboutASourceAndAreSet_Intended) {
    const support::Assertions assertions;
    const CPEvent event(false);
    event.Set(&event);
    EXPECT_EQ(support::Assertions::Take(), support::Texts{"source/TAVO/threading,743:pSource==NULL"});
    EXPECT_EQ(event.Wait(0), 0u);
}
