// The platform layer: what both systems promise; process facts, configuration paths and the counted start; clocks, the
// generator that all threads share, the assertion lock, the prefix of a line; which maintenance request runs next, by a
// clock of the test's own, and the pace of the pool's sweeps.

#include "clocks.h"
#include "lifecycle.h"
#include "logging.h"
#include "platform/platform.h"
#include "poolmaintenance.h"
#include "random.h"
#include "requests.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <fstream>
#include <gtest/gtest.h>
#include <iterator>
#include <limits>
#include <mutex>
#include <stdexcept>
#include <string>
#include <TAVO/develop.h>
#include <TAVO/threading.h>
#include <thread>
#include <vector>

using namespace TAVO;
using namespace TAVO::Develop;
using namespace TAVO::Maintenance;

namespace {

// What the reader finds for the key "Level" of section "Debug" in a file with this content, beside the program.
int ReadLevel(const std::string& content) {
    wchar_t path[1024];
    char narrow[1024];
    bool truncated = false;
    const std::size_t length = Platform::GetModulePath(Platform::Module::Executable, path, 1000, truncated);
    for (std::size_t i = 0; i <= 4; ++i) path[length + i] = L".ini"[i];
    Platform::WideToAnsi(path, -1, narrow, sizeof narrow);
    std::ofstream(narrow, std::ios::binary) << content;
    const int value = Platform::ReadConfigurationInteger(path, L"Debug", L"Level");
    std::remove(narrow);
    return value;
}

TEST(ConfigurationFile, MeansTheSameOnBothSystems) {
    using namespace std::string_literals;
    using Row = std::pair<std::string, int>;
    for (const auto& [content, value] :
         {Row{"[Debug]\nLevel=5\nLevel=6\n", 5}, Row{"  [ Debug ] ; ours\n\t Level \t=\t +5 \t\r\n", 5},
          Row{"[Debug]\nLevel=0x1F\n", 31}, Row{"[Debug]\nLevel=0X1f\n", 0}, Row{"[Debug]\nLevel=12ab\n", 12},
          Row{"[Debug]\nLevel=\"7\"\n", 7}, Row{"[Debug]\nLevel=4294967297\n", 1},
          Row{"[Debug]\nLevels=5\nLeve=6\n[Debugs]\nLevel=7\n[Debu]\nLevel=8", 0},
          Row{"Level=5\n[Debug]\n[Other]\nLevel=6\n[Debug]\nLevel=5\n", 0}, Row{"[Debug\nLevel=5\n", 0},
          Row{"\xEF\xBB\xBF[Debug]\nLevel=5\n", 5}, // with a mark in front
          Row{"\xFF\xFE[\0D\0e\0b\0u\0g\0]\0\n\0L\0e\0v\0e\0l\0=\0\x35\0"s, 5}, Row{"\xFF\xFE["s, 0}})
        EXPECT_EQ(ReadLevel(content), value) << content;
    const std::string whole = "[Debug]\nA=1\nLevel=\"0x15\"";
    for (std::size_t length = 0; length < whole.size() - 5; ++length)
        EXPECT_EQ(ReadLevel(whole.substr(0, length)), 0) << "cut at " << length;
}

// Intended: priority-levels
TEST(ThreadPriority, HasFiveLevelsOfMany_Intended) {
    using namespace Threading;
    // The level, and what the system gets, should the level be set; then what the system has, and the level told.
    constexpr int kLevels[][2] = {{-3, 0}, {-2, -15}, {-1, -2}, {0, 0}, {1, 2}, {2, 15}, {3, 0}, {-15, 0}};
    constexpr int kReadings[][2] = {{-15, -2}, {-2, -1}, {-1, -1}, {0, 0}, {1, 1}, {2, 1}, {15, 2}};
    std::thread([&] { // of its own, since a priority stays
        for (const auto& [level, set] : kLevels) {
            CurrentThread::OS::SetThreadPriority(static_cast<eThreadPriority>(level));
            EXPECT_EQ(Platform::GetThreadPriority(), set) << level;
        }
        for (const auto& [system, level] : kReadings) {
            Platform::SetThreadPriority(system);
            EXPECT_TRUE(Platform::GetThreadPriority() == system && CurrentThread::OS::GetThreadPriority() == level)
                << system;
        }
    })
        .join();
}

TEST(Heap, GivesLargeBlocksToOneAtATime) {
    const auto work = [](std::uint64_t tag) {
        constexpr std::size_t kMegabytes[] = {18, 3, 40, 17, 33, 64, 16, 20, 90, 36};
        constexpr std::size_t kStep = 4096 / sizeof(tag), kUnitsPerMegabyte = (1 << 20) / sizeof(tag);
        const auto fill = [tag](std::uint64_t* block, std::size_t megabytes) {
            for (std::size_t i = 0; i < megabytes * kUnitsPerMegabyte; i += kStep) block[i] = tag + i;
        };
        const auto isFilled = [tag](const std::uint64_t* block, std::size_t megabytes) {
            for (std::size_t i = 0; i < megabytes * kUnitsPerMegabyte; i += kStep)
                if (block[i] != tag + i) return false;
            return true;
        };
        std::uint64_t* held[3] = {};
        std::size_t sizes[3] = {};
        for (std::size_t round = 0; round < 60; ++round) {
            const std::size_t each = round % 3, megabytes = kMegabytes[(round * 7 + tag) % std::size(kMegabytes)];
            ASSERT_TRUE(isFilled(held[each], sizes[each]));
            if (round % 4 && held[each]) {
                held[each] = static_cast<std::uint64_t*>(Platform::HeapResize(held[each], megabytes << 20));
                ASSERT_TRUE(held[each] && isFilled(held[each], std::min(sizes[each], megabytes)));
            } else {
                Platform::HeapRelease(held[each]);
                held[each] = static_cast<std::uint64_t*>(Platform::HeapAllocate(megabytes << 20));
                ASSERT_TRUE(held[each]);
            }
            fill(held[each], sizes[each] = megabytes);
            if (round % 16 == 0) Platform::HeapTrim();
        }
        for (std::uint64_t* block : held) Platform::HeapRelease(block);
    };
    std::thread first([&] { work(1); }), second([&] { work(std::uint64_t{1} << 40); });
    first.join();
    second.join();
}

TEST(Modules, TellATruncatedPath) {
    wchar_t path[1024];
    bool truncated = true;
    const std::size_t length = Platform::GetModulePath(Platform::Module::Executable, path, 1024, truncated);
    for (std::size_t capacity : {length + 1, length, std::size_t{8}}) {
        path[capacity] = L'#';
        const std::size_t kept = Platform::GetModulePath(Platform::Module::Executable, path, capacity, truncated);
        EXPECT_TRUE(truncated == (capacity <= length) && kept == (truncated ? capacity - 1 : length));
        EXPECT_TRUE(path[kept] == 0 && path[capacity] == L'#');
    }
}

// Intended: failed-start-counts, exit-wraps
TEST(Services, FailedStartStaysCountedAndTheCountWraps_Intended) {
    static int starts, stops;
    CountedServices services({[]() noexcept { return ++starts, false; }, []() noexcept { ++stops; },
                              []() noexcept { return false; }, []() noexcept {}});
    EXPECT_FALSE(services.Enter());
    EXPECT_TRUE(services.Enter()) << "counts on without trying again";
    for (const int expected : {0, 1, 1}) {
        services.Leave();
        EXPECT_EQ(stops, expected) << "the last one goes below zero";
    }
    EXPECT_TRUE(services.Enter() && starts == 1) << "the wrapped count does not reach 1";
    EXPECT_FALSE(services.Enter());
    services.Leave();
    EXPECT_TRUE(starts == 2 && stops == 2);
}

// Intended: startup-path
TEST(ProcessFacts, StartupPathStartsAtTheSeparator_Intended) {
    ProcessFacts facts;
    using Row = std::array<const wchar_t*, 3>;
    for (const auto& [path, name, startup] :
         {Row{L"C:\\Apps\\host.exe", L"host.exe", L"/host.ex"}, Row{L"/usr/lib/media/bin/h", L"h", L"/h"},
          Row{L"C:\\mixed/host", L"host", L"/host"}, Row{L"/h", L"h", L"/"}, Row{L"\\", L"", L"/"}}) {
        ASSERT_TRUE(DeriveProcessFacts(path, facts));
        EXPECT_STREQ(facts.processName, name);
        EXPECT_STREQ(facts.startupPath, startup);
    }
    EXPECT_FALSE(DeriveProcessFacts(L"host.exe", facts) || DeriveProcessFacts(L"", facts));
    std::vector<wchar_t> path(1000, L'x'); // far too long
    path[500] = L'/';
    path.back() = 0;
    EXPECT_TRUE(DeriveProcessFacts(path.data(), facts));
    EXPECT_EQ(facts.processName[259] + facts.startupPath[259], 2 * L'x');
    EXPECT_EQ(facts.processName[260] + facts.startupPath[260], 0);
}

TEST(ConfigurationPath, ReplacesTheExtensionOnlyWhereItFits) {
    using Row = std::tuple<std::size_t, std::vector<wchar_t>, bool>; // units before the extension, is it replaced?
    for (const auto& [stem, extension, made] : {Row{10, {'.', 's', 'o'}, true}, Row{255, {'.', 's', 'o'}, true},
                                                Row{256, {'.', 's', 'o'}, false}, Row{10, {}, false}}) {
        std::vector<wchar_t> path(stem, L'a');
        path[0] = L'/';
        path.insert(path.end(), extension.begin(), extension.end());
        const std::size_t length = path.size();
        path.resize(kModulePathUnits);
        EXPECT_EQ(MakeConfigurationPath(path.data(), length), made) << stem;
        EXPECT_STREQ(path.data() + stem, made ? L".ini" : extension.empty() ? L"" : L".so");
    }
}

constexpr int kRefused = 1; // a frequency that is not told

std::int64_t g_frequency, g_ticks;
int g_failures, g_reads;

bool GetFrequency(std::int64_t& frequency) noexcept { return (frequency = g_frequency) != kRefused; }
bool Read(std::int64_t& ticks) noexcept {
    ++g_reads;
    ticks = g_ticks;
    return g_failures-- <= 0;
}
std::uint64_t Nanoseconds(std::int64_t frequency, std::int64_t ticks, int failures = 0) {
    g_frequency = frequency, g_ticks = ticks;
    g_failures = failures, g_reads = 0;
    return ReadNanoseconds({GetFrequency, Read});
}

TEST(Clocks, NanosecondsAreExactAndFailuresGiveZero) {
    EXPECT_EQ(Nanoseconds(1000000000, 9007199254740993), 9007199254740993u) << "a double would lose the last bit";
    EXPECT_EQ(Nanoseconds(3, 10), 3333333333u);
    EXPECT_EQ(Nanoseconds(18000000000, 17999999999), 999999999u);
    EXPECT_EQ(Nanoseconds(10000000, 100LL * 365 * 86400 * 10000000 + 3), 100ULL * 365 * 86400 * 1000000000 + 300);
    EXPECT_TRUE(RoundHalfUp(499999, 1000000) == 0 && RoundHalfUp(500000, 1000000) == 1);
    EXPECT_EQ(RoundHalfUp(~0ULL, 1000), 18446744073709552u);
    for (const std::int64_t frequency : {0, -1, kRefused}) EXPECT_EQ(Nanoseconds(frequency, 5), 0u) << frequency;
    EXPECT_EQ(Nanoseconds(1000000000, 5, 3), 5u) << "the fourth attempt counts";
    EXPECT_EQ(Nanoseconds(1000000000, 5, 4), 0u);
    EXPECT_EQ(g_reads, 4);
}

// What four threads get, sorted.
std::vector<std::uint32_t> Draw(SharedTwister& shared, std::size_t perThread) {
    std::vector<std::uint32_t> words(4 * perThread);
    std::vector<std::thread> threads;
    for (std::size_t t = 0; t < 4; ++t)
        threads.emplace_back([&, t] {
            for (std::size_t i = 0; i < perThread; ++i) words[t * perThread + i] = shared.Next();
        });
    for (auto& thread : threads) thread.join();
    std::sort(words.begin(), words.end());
    return words;
}

TEST(SharedTwister, GivesTheSequenceOfItsSeedEachWordOnce) {
    constexpr std::size_t kPerThread = 624 * 40;
    SharedTwister shared;
    CMTRandom own;
    shared.Seed(5489);
    own.seed(5489);
    for (int i = 0; i < 624 * 3; ++i) ASSERT_EQ(shared.Next(), own.rnd()) << i;
    std::vector<std::uint32_t> expected(4 * kPerThread);
    for (auto& word : expected) word = own.rnd();
    std::sort(expected.begin(), expected.end());
    EXPECT_TRUE(Draw(shared, kPerThread) == expected);
    SharedTwister unseeded; // seeds itself once when threads race
    auto all = Draw(unseeded, 100);
    EXPECT_LE(all.end() - std::unique(all.begin(), all.end()), 1) << "words of one sequence, not of several alike";
}

TEST(AssertionLock, IsRecursiveAndExcludesOthers) {
    AssertionLock lock;
    std::atomic<bool> left{false};
    for (int level = 0; level < 2; ++level) lock.lock();
    std::thread other([&] {
        const std::lock_guard guard(lock);
        EXPECT_TRUE(left);
    });
    lock.unlock();
    std::this_thread::sleep_for(std::chrono::milliseconds(30)); // one level is still held
    left = true;
    lock.unlock();
    other.join();
}

TEST(Prefix, HasTheFixedForm) {
    wchar_t out[kPrefixUnits + 1];
    FormatPrefix(out, 1.2346, FindLevelLabel(acfDebugFull), L"host", "a/b", -7);
    EXPECT_STREQ(out, L"   1.235 [FULL   ] [host] [] {[file:a/b] [line:-7]} ");
    out[kPrefixUnits] = L'#';
    FormatPrefix(out, 0, L"INFO   ", L"c", std::string(1000, 'x').c_str(), 1);
    EXPECT_TRUE(out[kPrefixUnits - 2] == L'x' && out[kPrefixUnits - 1] == 0) << "511 units are kept";
    EXPECT_EQ(out[kPrefixUnits], L'#');
    for (int level : {0, 3, 32, -2}) EXPECT_EQ(FindLevelLabel(static_cast<_acfDebugLevel>(level)), nullptr);
}

constexpr auto kLowest = std::numeric_limits<std::int32_t>::min(), kHighest = std::numeric_limits<std::int32_t>::max();

struct Row {
    std::int32_t priority;
    unsigned long long due, period; // it falls due again that long after it was due; 0: it stays due
    char thrower = 0;               // 'd': its due time throws, 'p': its priority
};
struct Fake final : IMaintenanceRequest, Row {
    explicit Fake(const Row& row) : Row(row) {}
    const wchar_t* GetName() override { return L"fake"; }
    unsigned long long GetDueTime() override { return thrower == 'd' ? throw std::runtime_error("due") : due; }
    void Run() override {}
    std::int32_t GetPriority() override { return thrower == 'p' ? throw std::runtime_error("priority") : priority; }
};

// Requests named A, B, C ...; what `passes` choices at the times 0, 1, 2 ... run, '.' for none.
std::string Order(const std::vector<Row>& rows, int passes) {
    RequestList list;
    std::vector<CPRequest<Fake>> requests;
    for (const Row& row : rows) {
        requests.emplace_back(row);
        Fake* const fake = requests.back().operator->();
        const auto position =
            reinterpret_cast<char*>(static_cast<IMaintenanceRequest*>(fake)) - reinterpret_cast<char*>(fake);
        EXPECT_TRUE(list.Append(requests.back(), static_cast<std::size_t>(position)));
    }
    std::string order;
    for (int now = 0; now < passes; ++now) {
        const std::size_t chosen = list.Choose(static_cast<unsigned long long>(now));
        order += chosen == Buffers::NotFound ? '.' : static_cast<char>('A' + chosen);
        if (chosen != Buffers::NotFound) requests[chosen]->due += requests[chosen]->period;
    }
    return order;
}

TEST(MaintenanceChoice, RunsTheMostUrgentAndAgesTheRest) {
    using Case = std::tuple<const char*, std::vector<Row>, std::string>;
    for (const auto& [what, rows, order] :
         {Case{"the higher priority first, and the lower one in its turn", {{5, 0, 0}, {3, 0, 0}}, "AAABAAABAAAB"},
          Case{"registered later, still first; a tie goes to the earlier", {{3, 0, 0}, {5, 0, 0}}, "BBABBABBA"},
          Case{"equal: the earlier one, also when a bonus has just caught up", {{1, 0, 0}, {1, 0, 0}}, "ABABAB"},
          Case{"what is not due gains nothing", {{2, 0, 0}, {0, 3, 100}}, "AAAAAAB"},
          Case{"one that throws is passed over for good", {{9, 0, 0, 'd'}, {8, 0, 0, 'p'}, {0, 0, 0}}, "CCC"},
          Case{"the highest priority overflows nothing", {{kHighest, 0, 0}, {kHighest, 0, 0}}, "ABABAB"}})
        EXPECT_EQ(Order(rows, static_cast<int>(order.size())), order) << what;
}

// Intended: lowest-priority
TEST(MaintenanceChoice, LowestPriorityWaitsAPassIntended) { EXPECT_EQ(Order({{kLowest, 0, 100}}, 3), ".A."); }

TEST(PoolUpkeep, SweepsEveryTenSecondsAndEveryTwentyWhileAllIsWell) {
    String::CStringPoolMaintenance upkeep;
    const auto created = Core::OS::GetTimeNow();
    EXPECT_TRUE(upkeep.GetDueTime() - 10000 <= created && upkeep.GetPriority() == 0);
    upkeep.Run();
    EXPECT_TRUE(upkeep.GetDueTime() >= created + 20000 && upkeep.GetDueTime() <= Core::OS::GetTimeNow() + 20000);
    EXPECT_EQ(upkeep.GetPriority(), -2);
    Platform::SetThreadPriority(-1);
    upkeep.Run(); // which does not sweep
    Platform::SetThreadPriority(0);
    EXPECT_TRUE(upkeep.GetDueTime() <= Core::OS::GetTimeNow() + 10000 && upkeep.GetPriority() == 0);
}

} // namespace
