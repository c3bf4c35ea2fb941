// The stopwatch: its times, and what it tells the log.

#include "support/log.h"

#include <cstring>
#include <gtest/gtest.h>
#include <thread>

using namespace TAVO::Develop;
using TAVO::String::CPPoolString;

// Its word comes first.
static unsigned long long& Word(CHFLapse& watch) { return *reinterpret_cast<unsigned long long*>(&watch); }

// Intended: lapse-count
TEST(Stopwatch, KeepsAndReportsTimesAndIntendedCountsTwiceThem) {
    const support::Log log;
    {
        CHFLapse watch(L"import"), unnamed(CPPoolString::pempty);
        EXPECT_EQ(Word(unnamed), 0u) << "stands";
        Word(watch) = 10749999 << 1;
        watch.Stop(L"%d clips", 3);
        watch.Lapse(nullptr);
        watch.Stop();
        EXPECT_EQ(Word(watch), 10749999u << 1) << "only Start changes a stopped watch";
        EXPECT_TRUE(watch.lapse_nano() == 10749999 && watch.lapse_micro() == 10750 && watch.lapse_milli() == 11);
        EXPECT_TRUE(watch.count_micro() == 21500 && watch.count_milli() == 21);
        EXPECT_TRUE(watch.lapse_double() == 10749999 / 1e9 && watch.count_double() == 21499998 / 1e9);
        Word(unnamed) = 3600000004999999ULL << 1;
        unnamed.Lapse(L"100%%%d", 7);
    }
    EXPECT_EQ(log.Take(), (support::Texts{"16 import - 10.75ms none:0 %d clips|3", "16 import - 10.75ms none:0 ",
                                          "16 CHFLapse - 3600000005.00ms none:0 100%%%d|7"}))
        << "and no totals";
    { // one with a name runs from its start, laps add up, and it tells its total at the end
        CHFLapse watch(L"import"), unnamed{CPPoolString()};
        unnamed.Start();
        const auto start = Word(watch);
        EXPECT_TRUE(start & Word(unnamed) & 1);
        std::this_thread::sleep_for(std::chrono::milliseconds(20));
        watch.Lapse(L"lap");
        EXPECT_TRUE(Word(watch) == start && watch.lapse_double() >= 0.019 && watch.lapse_double() < 5);
    }
    const support::Texts lines = log.Take();
    ASSERT_EQ(lines.size(), 2u) << "a watch without a name has no total";
    EXPECT_EQ(lines[0].substr(lines[0].find("ms")), "ms none:0 lap");
    EXPECT_EQ(lines[1].substr(lines[1].find("ms")), "ms none:0 Total");
    EXPECT_GE(std::stod(lines[1].substr(lines[1].find(" - ") + 3)), 19.0);
}
