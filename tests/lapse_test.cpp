// The stopwatch: its times, and what it tells the log.

#include "support/log.h"

#include <cstring>
#include <gtest/gtest.h>
#include <string>
#include <TAVO/develop.h>
#include <thread>
#include <vector>

using namespace TAVO::Develop;
using TAVO::String::CPPoolString;

namespace {

// Its word comes first.
void SetWord(CHFLapse& watch, unsigned long long word) { std::memcpy(static_cast<void*>(&watch), &word, sizeof word); }
unsigned long long Word(const CHFLapse& watch) {
    unsigned long long word;
    std::memcpy(&word, static_cast<const void*>(&watch), sizeof word);
    return word;
}

} // namespace

// Intended: lapse-count
TEST(Stopwatch, KeepsAndReportsTimesAndIntendedCountsTwiceThem) {
    const support::Log log;
    {
        CHFLapse watch(L"import"), unnamed(CPPoolString::pempty);
        EXPECT_EQ(Word(unnamed), 0u) << "stands";
        SetWord(watch, 10749999 << 1);
        watch.Stop(L"%d clips", 3);
        watch.Lapse(nullptr);
        watch.Stop();
        EXPECT_EQ(Word(watch), 10749999u << 1) << "only Start changes a stopped watch";
        EXPECT_TRUE(watch.lapse_nano() == 10749999 && watch.lapse_micro() == 10750 && watch.lapse_milli() == 11);
        EXPECT_TRUE(watch.count_micro() == 21500 && watch.count_milli() == 21);
        EXPECT_EQ(watch.lapse_double(), 10749999 / 1e9);
        EXPECT_EQ(watch.count_double(), 21499998 / 1e9);
        SetWord(unnamed, 3600000004999999ULL << 1);
        unnamed.Lapse(L"100%%%d", 7);
    }
    EXPECT_EQ(log.Take(), (support::Texts{"16 import - 10.75ms none:0 %d clips|3", "16 import - 10.75ms none:0 ",
                                          "16 CHFLapse - 3600000005.00ms none:0 100%%%d|7"}))
        << "and no totals";
}

TEST(Stopwatch, RunsFromItsStart) {
    const support::Log log;
    const auto wait = [] { std::this_thread::sleep_for(std::chrono::milliseconds(10)); };
    {
        CHFLapse watch(L"import"), unnamed{CPPoolString()};
        unnamed.Start();
        const auto start = Word(watch);
        EXPECT_TRUE(start & Word(unnamed) & 1);
        wait();
        watch.Lapse(L"lap");
        EXPECT_EQ(Word(watch), start) << "laps add up";
        wait();
        EXPECT_TRUE(watch.lapse_double() >= 0.019 && watch.lapse_double() < 5) << watch.lapse_double();
    }
    const support::Texts lines = log.Take();
    ASSERT_EQ(lines.size(), 2u) << "a watch without a name has no total";
    EXPECT_EQ(lines[0].substr(lines[0].find("ms")), "ms none:0 lap");
    EXPECT_EQ(lines[1].substr(lines[1].find("ms")), "ms none:0 Total");
    EXPECT_GE(std::stod(lines[1].substr(lines[1].find(" - ") + 3)), 19.0);
}
