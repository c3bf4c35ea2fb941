// Events: who is let go, and which signals are used.

#include "support/assertions.h"
#include "support/heapwatch.h"
#include "support/jobs.h"

#include <algorithm>
#include <chrono>
#include <random>
#include <thread>

using namespace TAVO::Threading;
using support::Job;
using TAVO::ulong32;

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
        const ulong32 ms = random() % 500 == 0;
        switch (random() % 8) {
        case 0:
            one.event.Set(), one.set = true;
            break;
        case 1:
            one.event.Reset(), one.set = false;
            break;
        case 2:
            ASSERT_EQ(one.event.Wait(ms), one.set ? 0 : WaitTimedOut) << step;
            one.set &= one.manual;
            break;
        case 3:
        case 4:
            ASSERT_NE(multiple.Attach(one.event), isAttached) << step;
            if (!isAttached) attached.push_back(&one);
            break;
        case 5:
            ASSERT_EQ(multiple.Detach(one.event), isAttached) << step;
            if (isAttached) attached.erase(place);
            break;
        case 6:
            ASSERT_EQ(multiple.Reset(index), index < attached.size()) << step;
            if (index < attached.size()) attached[index]->set = false;
            break;
        default: {
            const auto first = std::find_if(attached.begin(), attached.end(), [](Model* m) { return m->set; });
            const auto found = static_cast<unsigned long long>(first - attached.begin());
            const auto none = attached.empty() ? WaitNoState : WaitTimedOut;
            ASSERT_EQ(multiple.Wait(ms), first == attached.end() ? none : found) << step;
            if (first != attached.end()) (*first)->set &= (*first)->manual;
        }
        }
    }
}

TEST(Events, HandOverWhatWasWrittenBefore) {
    for (const bool manual : {false, true}) {
        const CPEvent there(manual), back(manual);
        int ball = 0; // plain: the events alone keep the two apart
        constexpr int kRounds = 2000;
        const auto play = [&ball](const CPEvent& mine, const CPEvent& other) {
            for (int round = 0; round < kRounds; ++round) {
                EXPECT_EQ(mine.Wait(round % 2 ? WaitForever : 60000), 0u);
                mine.Reset();
                ++ball;
                if (round % 512 == 0) CurrentThread::sleep(1); // the other one falls asleep
                other.Set();
            }
        };
        Job second([&] { play(there, back); });
        there.Set();
        play(back, there);
        EXPECT_EQ(second.thread.Wait(60000), 0u);
        EXPECT_EQ(ball, 2 * kRounds);
    }
}

TEST(Events, NoSignalIsLostOrUsedTwice) {
    // Waiters of every kind: with and without time-outs that end just then, for one event and for several.
    const CPEvent first(false), second(false), stop(true);
    std::atomic<int> used{0};
    std::atomic<bool> stopping{false};
    const auto waitFor = [&](std::initializer_list<CPEvent> events, ulong32 ms) {
        CPMultipleEvent some;
        for (const CPEvent& event : events) EXPECT_TRUE(some.Attach(event));
        for (;;) {
            const auto index = some.Wait(ms);
            if (index == events.size() - 1) return;
            if (index != WaitTimedOut) ++used;
        }
    };
    constexpr int kRounds = 3000;
    {
        Job both([&] { waitFor({first, second, stop}, WaitForever); });
        Job reversed([&] { waitFor({second, first, stop}, WaitForever); });
        Job impatient([&] { waitFor({first, second, stop}, 1); });
        Job polling([&] {
            while (!stopping) {
                if (first.Wait(0) == 0) ++used;
                if (second.Wait(1) == 0) ++used;
            }
        });
        std::mt19937 random(2);
        for (int round = 1; round <= kRounds; ++round) {
            (random() % 2 ? first : second).Set();
            if (random() % 64 == 0) CurrentThread::sleep(1);
            while (used < round) std::this_thread::yield();
        }
        stopping = true;
        stop.Set();
    }
    EXPECT_EQ(used, kRounds);
    EXPECT_EQ(first.Wait(0), WaitTimedOut);
    EXPECT_EQ(second.Wait(0), WaitTimedOut);
}

TEST(Events, TwoSignalsWhileAWaitBeginsAreTwo) {
    constexpr int kRounds = 1500;
    constexpr std::size_t kBetween = 300; // makes the beginning long
    const CPEvent first(false), last(false);
    const CPMultipleEvent several;
    EXPECT_TRUE(several.Attach(first));
    for (std::size_t i = 0; i < kBetween; ++i) EXPECT_TRUE(several.Attach(CPEvent(false)));
    EXPECT_TRUE(several.Attach(last));
    std::atomic<int> used{0};
    Job waiter([&] {
        while (used < 2 * kRounds && several.Wait(5000) != WaitTimedOut) ++used;
    });
    std::mt19937 random(4);
    for (int round = 1; round <= kRounds && waiter.State() != ThreadEnded; ++round) {
        for (auto pause = random() % 4000; pause; --pause) std::atomic_signal_fence(std::memory_order_seq_cst);
        last.Set();
        first.Set();
        while (used < 2 * round && waiter.State() != ThreadEnded) std::this_thread::yield();
    }
    EXPECT_EQ(waiter.thread.Wait(60000), 0u);
    EXPECT_EQ(used, 2 * kRounds);
}

TEST(Events, AManualOneLetsAllPassAndStaysSet) {
    const CPEvent gate(true);
    for (int round = 0; round < 50; ++round) {
        std::atomic<int> arrived{0}, passed{0};
        const auto pass = [&] {
            ++arrived;
            if (gate.Wait(60000) == 0 && gate.Wait(0) == 0) ++passed;
        };
        {
            Job a(pass), b(pass), c(pass);
            while (arrived < 3) std::this_thread::yield();
            if (round % 10 == 0) CurrentThread::sleep(1); // all asleep
            gate.Set();
        }
        ASSERT_EQ(passed, 3);
        gate.Reset();
        ASSERT_EQ(gate.Wait(0), WaitTimedOut);
    }
}

TEST(Events, AnInterruptedWaitUsesNoSignal) {
    std::mt19937 random(3);
    for (int round = 0; round < 200; ++round) {
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
        std::thread setter([&] {
            for (auto pause = random() % 2000; pause; --pause) std::atomic_signal_fence(std::memory_order_seq_cst);
            event.Set();
        });
        EXPECT_TRUE(job.thread.Terminate());
        setter.join();
        ASSERT_EQ(event.Wait(0), used ? WaitTimedOut : 0) << round;
    }
}

TEST(Events, AWaitWorksOnTheEventsOfItsBeginning) {
    const CPMultipleEvent several;
    CPEvent going(false);
    const CPEvent coming(false), passing(false);
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
        going.free();
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
        [&] { return event.Wait(15) == WaitTimedOut; },
        [&] { return multiple.Wait(15) == WaitTimedOut; },
        [&] { return job.thread.Wait(15) == WaitTimedOut; },
        [] { return CurrentThread::sleep(15), true; },
    };
    for (const auto& wait : waits) {
        const auto start = std::chrono::steady_clock::now();
        EXPECT_TRUE(wait());
        const std::chrono::duration<double> taken = std::chrono::steady_clock::now() - start;
        EXPECT_GE(taken.count(), 0.015) << &wait - waits;
        EXPECT_LT(taken.count(), 10) << &wait - waits;
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

TEST(Events, AssertAboutASourceAndAreSet_Intended) {
    support::Assertions assertions;
    const CPEvent event(false);
    event.Set(&event);
    EXPECT_EQ(support::Assertions::Take(), support::Texts{"source/TAVO/threading,743:pSource==NULL"});
    EXPECT_EQ(event.Wait(0), 0u);
}
