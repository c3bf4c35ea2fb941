// Which request runs next, by a clock of the test's own; and the pace of the pool's sweeps.

#include "platform/platform.h"
#include "poolmaintenance.h"
#include "requests.h"
#include "support/heapwatch.h"

#include <gtest/gtest.h>
#include <limits>
#include <stdexcept>
#include <string>
#include <vector>

using namespace TAVO;
using namespace TAVO::Maintenance;

namespace {

constexpr std::int32_t kLowest = std::numeric_limits<std::int32_t>::min();
constexpr std::int32_t kHighest = std::numeric_limits<std::int32_t>::max();

struct Fake final : IMaintenanceRequest {
    std::int32_t priority;
    unsigned long long due, period;
    char thrower; // 'd': its due time throws, 'p': its priority

    Fake(std::int32_t p, unsigned long long d, unsigned long long every, char t)
        : priority(p), due(d), period(every), thrower(t) {}

    const wchar_t* GetName() override { return L"fake"; }
    unsigned long long GetDueTime() override { return thrower == 'd' ? throw std::runtime_error("due") : due; }
    void Run() override {}
    std::int32_t GetPriority() override { return thrower == 'p' ? throw std::runtime_error("priority") : priority; }
};

std::size_t Position(const CPRequest<Fake>& request) {
    return static_cast<std::size_t>(reinterpret_cast<char*>(static_cast<IMaintenanceRequest*>(request.operator->())) -
                                    reinterpret_cast<char*>(request.operator->()));
}

struct Row {
    std::int32_t priority;
    unsigned long long due, period; // it falls due again that long after it was due; 0: it stays due
    char thrower = 0;
};

// Requests named A, B, C ...; what `passes` choices at the times 0, 1, 2 ... run, '.' for none.
std::string Order(const std::vector<Row>& rows, int passes) {
    RequestList list;
    std::vector<CPRequest<Fake>> requests;
    for (const Row& row : rows) {
        requests.emplace_back(row.priority, row.due, row.period, row.thrower);
        EXPECT_TRUE(list.Append(requests.back(), Position(requests.back())));
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
    const struct {
        const char* what;
        std::vector<Row> rows;
        const char* order;
    } rows[] = {
        {"the higher priority first, and the lower one in its turn", {{5, 0, 0}, {3, 0, 0}}, "AAABAAABAAAB"},
        {"registered later, still first; a tie goes to the earlier", {{3, 0, 0}, {5, 0, 0}}, "BBABBABBA"},
        {"equal: the earlier one, also when a bonus has just caught up", {{1, 0, 0}, {1, 0, 0}}, "ABABAB"},
        {"what is not due gains nothing", {{2, 0, 0}, {0, 3, 100}}, "AAAAAAB"},
        {"one that throws is passed over for good", {{9, 0, 0, 'd'}, {8, 0, 0, 'p'}, {0, 0, 0}}, "CCC"},
        {"the highest priority overflows nothing", {{kHighest, 0, 0}, {kHighest, 0, 0}}, "ABABAB"},
    };
    for (const auto& row : rows)
        EXPECT_EQ(Order(row.rows, static_cast<int>(std::string(row.order).size())), row.order) << row.what;
}

// Intended: lowest-priority
TEST(MaintenanceChoice, LowestPriorityWaitsAPassIntended) { EXPECT_EQ(Order({{kLowest, 0, 100}}, 3), ".A."); }

TEST(MaintenanceChoice, ListKeepsItsOrderAndSurvivesFailingHeaps) {
    std::vector<CPRequest<Fake>> requests;
    for (int i = 0; i < 40; ++i) requests.emplace_back(0, 0ull, 0ull, '\0');
    support::ForEachFailingAllocation([&] {
        RequestList list;
        std::size_t appended = 0;
        while (appended < requests.size() && list.Append(requests[appended], 0)) ++appended;
        for (std::size_t i = 0; i < appended; i += 3) list.Take(list.Find(requests[i], 0));
        for (std::size_t i = 0, place = 0; i < appended; ++i)
            EXPECT_EQ(list.Find(requests[i], 0), i % 3 ? place++ : Buffers::NotFound);
    });
}

TEST(PoolUpkeep, SweepsEveryTenSecondsAndEveryTwentyWhileAllIsWell) {
    String::CStringPoolMaintenance upkeep;
    const auto created = Core::OS::GetTimeNow();
    EXPECT_LE(upkeep.GetDueTime() - 10000, created);
    EXPECT_EQ(upkeep.GetPriority(), 0);
    upkeep.Run();
    const auto swept = Core::OS::GetTimeNow();
    EXPECT_GE(upkeep.GetDueTime(), created + 20000);
    EXPECT_LE(upkeep.GetDueTime(), swept + 20000);
    EXPECT_EQ(upkeep.GetPriority(), -2);
    Platform::SetThreadPriority(-1);
    upkeep.Run(); // which does not sweep
    Platform::SetThreadPriority(0);
    EXPECT_LE(upkeep.GetDueTime(), Core::OS::GetTimeNow() + 10000);
    EXPECT_EQ(upkeep.GetPriority(), 0);
}

} // namespace
