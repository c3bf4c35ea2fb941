// The maintenance thread as hosts see it: registering, running, leaving, starting and stopping.

#include "support/gate.h"
#include "support/heapwatch.h"

#include <atomic>
#include <functional>
#include <stdexcept>
#include <TAVO/maintenance.h>
#include <TAVO/string.h>
#include <thread>
#include <vector>

using namespace TAVO;
using namespace TAVO::Maintenance;
using namespace TAVO::String;
using support::Gate;
using Clock = std::chrono::steady_clock;

namespace {

constexpr unsigned long long kNever = ~0ull;

// The library's services while it lives.
struct Running {
    Running() { EXPECT_TRUE(AppInit()); }
    ~Running() { AppExit(); }
};

// Runs what a test tells it, when it tells it.
struct Work final : IMaintenanceRequest {
    std::function<void()> run, ask;
    std::atomic<unsigned long long> due{0};
    Gate runs;

    explicit Work(
        std::function<void()> body = [] {}, std::function<void()> question = [] {})
        : run(std::move(body)), ask(std::move(question)) {}

    const wchar_t* GetName() override { return L"work"; }
    unsigned long long GetDueTime() override { return ask(), due; }
    void Run() override {
        due = kNever;
        runs.Step();
        run();
    }
    std::int32_t GetPriority() override { return 0; }
};
using CPWork = CPRequest<Work>;

TEST(Maintenance, RunsWhatFallsDueAndWhatIsWoken) {
    EXPECT_FALSE(Wake() || IsRunning());
    const CPWork early, late;
    late->due = kNever;
    EXPECT_TRUE(RegisterRequest(early) && RegisterRequest(late)) << "wait for the thread";
    {
        const Running services;
        EXPECT_TRUE(IsRunning() && early->runs.Reached(1));
        late->due = 0;
        EXPECT_TRUE(Wake() && late->runs.Reached(1));
        early->due = Core::OS::GetTimeNow() + 20;
        EXPECT_TRUE(Wake() && early->runs.Reached(2)) << "the wait ends at the due time";
    }
    EXPECT_FALSE(IsRunning());
    late->due = 0;
    const Running again;
    EXPECT_TRUE(late->runs.Reached(2)) << "entries survive a stop";
    EXPECT_TRUE(UnregisterRequest(early) && UnregisterRequest(late));
}

TEST(Maintenance, RefusesWhatItCannotKeep) {
    const Running services;
    const CPWork work;
    work->due = kNever;
    EXPECT_FALSE(RegisterRequest(Buffers::CPObjectMemory()) || UnregisterRequest(Buffers::CPObjectMemory()));
    Buffers::CPPlainMemory bytes;
    ASSERT_TRUE(bytes.Alloc(64));
    EXPECT_FALSE(RegisterRequest(bytes)) << "no such interface";
    EXPECT_TRUE(UnregisterRequest(bytes)) << "is not registered, as asked";
    EXPECT_TRUE(RegisterRequest(work) && !RegisterRequest(work)) << "registered already";
    EXPECT_TRUE(UnregisterRequest(work) && UnregisterRequest(work));

    // From the questions that are asked under the lock: refused, and nothing hangs.
    std::atomic<int> granted{0};
    Gate asked;
    CPWork curious;
    curious = CPWork([] {},
                     [&] {
                         granted += RegisterRequest(work) || UnregisterRequest(curious);
                         asked.Step();
                     });
    EXPECT_TRUE(RegisterRequest(curious) && asked.Reached(1) && UnregisterRequest(curious));
    EXPECT_EQ(granted, 0);
}

TEST(Maintenance, ThrowingRequestsAreRetiredAndMayComeBack) {
    const Running services;
    std::atomic<bool> broken{true};
    const auto fail = [&] {
        if (broken) throw std::runtime_error("broken");
    };
    const CPWork runner(fail), asker([] {}, fail), sound;
    EXPECT_TRUE(RegisterRequest(runner) && RegisterRequest(asker) && runner->runs.Reached(1));
    EXPECT_TRUE(RegisterRequest(sound) && sound->runs.Reached(1)) << "the thread goes on";
    runner->due = sound->due = 0;
    EXPECT_TRUE(Wake() && sound->runs.Reached(2));
    EXPECT_EQ(runner->runs.Steps() + asker->runs.Steps(), 1) << "retired";
    broken = false;
    EXPECT_TRUE(RegisterRequest(runner) && RegisterRequest(asker)) << "anew";
    EXPECT_TRUE(runner->runs.Reached(2) && asker->runs.Reached(1));
    for (const CPWork* work : {&runner, &asker, &sound}) EXPECT_TRUE(UnregisterRequest(*work));
}

TEST(Maintenance, LeavingWaitsForTheRunAndNothingIsCalledAfterwards) {
    const Running services;
    for (int round = 0; round < 50; ++round) {
        std::atomic<int> gone{0}, calledAfterwards{0};
        const auto look = [&] { calledAfterwards += gone; };
        CPWork work(look, look);
        EXPECT_TRUE(RegisterRequest(work) && work->runs.Reached(round % 2) && UnregisterRequest(work));
        gone = 1;
        Wake();
        EXPECT_EQ(work.lockcnt(), 1u) << "the list's handle is gone";
        EXPECT_EQ(calledAfterwards, 0);
    }
}

// One that does not end in time, and one that unregisters itself from inside its run, side by side: ten seconds once.
// Intended: unregister-own-run
TEST(Maintenance, LeavingGivesUpAfterTenSecondsAlsoInTheOwnRunIntended) {
    const Running services;
    CPWork work;
    std::atomic<bool> own{true};
    work = CPWork([&] { own = UnregisterRequest(work); });
    EXPECT_TRUE(RegisterRequest(work) && work->runs.Reached(1));
    const auto before = Core::OS::GetTimeNow();
    UnregisterRequest(work);
    EXPECT_GE(Core::OS::GetTimeNow() - before, 9000u);
    // Whoever of the two gives up first lets the run end, which may still save the other one.
    while (work.lockcnt() > 1) std::this_thread::yield();
    EXPECT_FALSE(own);
    EXPECT_TRUE(UnregisterRequest(work)) << "removed when the run ended";
    work->run = {};
}

TEST(Maintenance, RequestsMayRegisterOthersAndAskTheServicesToEnd) {
    const CPWork second;
    const CPWork first([&] {
        EXPECT_TRUE(RegisterRequest(second));
        AppExit(); // only asks: the thread cannot wait for itself
        EXPECT_FALSE(AppInit());
        AppExit();
    });
    EXPECT_TRUE(AppInit() && RegisterRequest(first) && first->runs.Reached(1));
    while (first.lockcnt() > 2) std::this_thread::yield(); // the run is over
    EXPECT_EQ(second->runs.Steps(), 0) << "the thread was asked to end";
    const Running again; // brings the old thread to its end first
    EXPECT_TRUE(second->runs.Reached(1) && UnregisterRequest(first) && UnregisterRequest(second));
}

TEST(Maintenance, StartsStopsAndRegistersOnManyThreadsAndAStopIsQuick) {
    std::vector<std::thread> threads;
    for (int t = 0; t < 4; ++t)
        threads.emplace_back([t] {
            for (int i = 0; i < 100; ++i) {
                const Running services;
                const CPWork work;
                EXPECT_TRUE(RegisterRequest(work) && work->runs.Reached(i % 3 == t % 2));
                Wake();
                EXPECT_TRUE(UnregisterRequest(work));
            }
        });
    for (auto& thread : threads) thread.join();
    EXPECT_FALSE(IsRunning());
    ASSERT_TRUE(AppInit());
    const auto before = Clock::now();
    AppExit();
    EXPECT_LE(Clock::now() - before, std::chrono::milliseconds(50));

    support::ForEachFailingAllocation([] {
        const bool started = AppInit();
        EXPECT_TRUE(!started || IsRunning());
        CPWork work;
        const bool registered = work.key() && RegisterRequest(work);
        EXPECT_TRUE(!registered || UnregisterRequest(work));
        AppExit();
        EXPECT_FALSE(IsRunning());
    });
}

TEST(Maintenance, PoolSweepsStartOnce) {
    EXPECT_TRUE(CStringPool::AppInit() && !CStringPool::AppInit());
    EXPECT_FALSE(AppInit()) << "the sweeps were started by themselves";
    EXPECT_TRUE(IsRunning() && AppInit()) << "what did start stays started, and counts on";
    AppExit();
    AppExit();
    EXPECT_TRUE(!IsRunning() && CStringPool::AppInit()) << "the stop let go of them";
    CStringPool::AppExit();
}

} // namespace
