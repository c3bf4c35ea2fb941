// Process facts, configuration paths and the counted start.

#include "lifecycle.h"

#include <gtest/gtest.h>
#include <string>
#include <TAVO/core.h>
#include <thread>
#include <vector>

using namespace TAVO;

namespace {

int g_starts, g_stops;
bool g_startSucceeds;

bool Start() noexcept { return ++g_starts, g_startSucceeds; }
void Stop() noexcept { ++g_stops; }

class Services : public testing::Test {
protected:
    void SetUp() override {
        g_starts = g_stops = 0;
        g_startSucceeds = true;
    }
    CountedServices m_services{Start, Stop};
};

} // namespace

TEST_F(Services, StartWithTheFirstAndStopWithTheLast) {
    for (int round = 1; round <= 2; ++round) {
        EXPECT_TRUE(m_services.Enter());
        EXPECT_TRUE(m_services.Enter());
        m_services.Leave();
        EXPECT_EQ(g_stops, round - 1);
        m_services.Leave();
        EXPECT_EQ(g_starts, round);
        EXPECT_EQ(g_stops, round);
    }
}

TEST_F(Services, FailedStartStaysCounted_Intended) {
    g_startSucceeds = false;
    EXPECT_FALSE(m_services.Enter());
    EXPECT_TRUE(m_services.Enter()) << "counts on without trying again";
    EXPECT_EQ(g_starts, 1);
    m_services.Leave();
    m_services.Leave();
    EXPECT_EQ(g_stops, 1);
}

TEST_F(Services, CountWrapsBelowZero_Intended) {
    m_services.Leave();
    EXPECT_EQ(g_stops, 0);
    EXPECT_TRUE(m_services.Enter());
    EXPECT_EQ(g_starts, 0) << "the wrapped count does not reach 1";
    EXPECT_TRUE(m_services.Enter());
    EXPECT_EQ(g_starts, 1);
    m_services.Leave();
    EXPECT_EQ(g_stops, 1);
}

TEST_F(Services, StartsAndStopsNeverOverlap) {
    static std::atomic<int> running;
    static std::atomic<int> faults;
    running = faults = 0;
    CountedServices services([]() noexcept { return running++ == 0 ? true : (++faults, true); },
                             []() noexcept { faults += --running == 0 ? 0 : 1; });
    std::vector<std::thread> threads;
    for (int t = 0; t < 4; ++t)
        threads.emplace_back([&] {
            for (int i = 0; i < 5000; ++i) {
                services.Enter();
                services.Leave();
            }
        });
    for (auto& thread : threads) thread.join();
    EXPECT_EQ(faults, 0);
    EXPECT_EQ(running, 0);
}

TEST(LifeCycle, PairsSucceed) {
    EXPECT_TRUE(AppInit());
    EXPECT_TRUE(AppInit());
    AppExit();
    AppExit();
}

TEST(ProcessFacts, StartupPathStartsAtTheSeparator_Intended) {
    const struct {
        const wchar_t *path, *name, *startup;
    } rows[] = {
        {L"C:\\Apps\\host.exe", L"host.exe", L"/host.ex"},
        {L"C:\\A\\a-long-name.exe", L"a-long-name.exe", L"/a-lo"},
        {L"/usr/lib/media/bin/h", L"h", L"/h"},
        {L"C:\\mixed/host", L"host", L"/host"},
        {L"/h", L"h", L"/"},
        {L"\\", L"", L"/"},
    };
    for (const auto& row : rows) {
        ProcessFacts facts;
        ASSERT_TRUE(DeriveProcessFacts(row.path, facts));
        EXPECT_STREQ(facts.processName, row.name);
        EXPECT_STREQ(facts.startupPath, row.startup);
    }
    ProcessFacts facts;
    EXPECT_FALSE(DeriveProcessFacts(L"host.exe", facts));
    EXPECT_FALSE(DeriveProcessFacts(L"", facts));
}

TEST(ProcessFacts, TextsAreCutToTheirBuffers) {
    std::vector<wchar_t> path(1000, L'x');
    path[500] = L'/';
    path.back() = 0;
    ProcessFacts facts;
    ASSERT_TRUE(DeriveProcessFacts(path.data(), facts));
    EXPECT_EQ(facts.processName[259], L'x');
    EXPECT_EQ(facts.processName[260], 0);
    EXPECT_EQ(facts.startupPath[259], L'x');
    EXPECT_EQ(facts.startupPath[260], 0);
}

TEST(ConfigurationPath, ReplacesTheExtensionOnlyWhereItFits) {
    const auto make = [](std::size_t stem, const wchar_t* extension, bool& made) {
        std::vector<wchar_t> path(kModulePathUnits, 0);
        std::size_t length = 0;
        path[length++] = L'/';
        while (length < stem) path[length++] = L'a';
        while (*extension) path[length++] = *extension++;
        made = MakeConfigurationPath(path.data(), length);
        std::string narrow;
        for (std::size_t i = stem; path[i]; ++i) narrow += static_cast<char>(path[i]);
        return narrow;
    };
    bool made = false;
    EXPECT_EQ(make(10, L".so", made), ".ini");
    EXPECT_TRUE(made);
    EXPECT_EQ(make(255, L".so", made), ".ini") << "259 units and the terminator";
    EXPECT_TRUE(made);
    make(256, L".so", made);
    EXPECT_FALSE(made);
    make(10, L"", made);
    EXPECT_FALSE(made);
}

TEST(Mutex, IsReadyBeforeConstructorsAndExcludes) {
    Platform::Mutex mutex;
    mutex.lock();
    bool taken = true;
    std::thread([&] { taken = mutex.try_lock(); }).join();
    EXPECT_FALSE(taken);
    mutex.unlock();
    ASSERT_TRUE(mutex.try_lock());
    mutex.unlock();
}
