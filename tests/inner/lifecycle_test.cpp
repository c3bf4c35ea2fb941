// Process facts, configuration paths and the counted start.

#include "lifecycle.h"

#include <gtest/gtest.h>
#include <vector>

using namespace TAVO;

// Intended: failed-start-counts, exit-wraps
TEST(Services, FailedStartStaysCountedAndTheCountWraps_Intended) {
    static int starts, stops;
    CountedServices services({[]() noexcept { return ++starts, false; }, []() noexcept { ++stops; },
                              []() noexcept { return false; }, []() noexcept {}});
    EXPECT_FALSE(services.Enter());
    EXPECT_TRUE(services.Enter()) << "counts on without trying again";
    services.Leave();
    EXPECT_EQ(stops, 0);
    services.Leave();
    services.Leave();
    EXPECT_EQ(stops, 1) << "below zero";
    EXPECT_TRUE(services.Enter());
    EXPECT_EQ(starts, 1) << "the wrapped count does not reach 1";
    EXPECT_FALSE(services.Enter());
    services.Leave();
    EXPECT_TRUE(starts == 2 && stops == 2);
}

// Intended: startup-path
TEST(ProcessFacts, StartupPathStartsAtTheSeparator_Intended) {
    const wchar_t* const rows[][3] = {{L"C:\\Apps\\host.exe", L"host.exe", L"/host.ex"},
                                      {L"/usr/lib/media/bin/h", L"h", L"/h"},
                                      {L"C:\\mixed/host", L"host", L"/host"},
                                      {L"/h", L"h", L"/"},
                                      {L"\\", L"", L"/"}};
    ProcessFacts facts;
    for (const auto& [path, name, startup] : rows) {
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
    const struct {
        std::size_t stem;
        const wchar_t* extension;
        bool made;
    } rows[] = {{10, L".so", true}, {255, L".so", true}, {256, L".so", false}, {10, L"", false}};
    for (const auto& row : rows) {
        std::vector<wchar_t> path(row.stem, L'a');
        path[0] = L'/';
        for (const wchar_t* unit = row.extension; *unit; ++unit) path.push_back(*unit);
        const std::size_t length = path.size();
        path.resize(kModulePathUnits);
        EXPECT_EQ(MakeConfigurationPath(path.data(), length), row.made) << row.stem;
        EXPECT_STREQ(path.data() + row.stem, row.made ? L".ini" : row.extension);
    }
}
