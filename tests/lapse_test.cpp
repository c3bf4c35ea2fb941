// The stopwatch: its times, and what it tells the log.

#include <cstring>
#include <gtest/gtest.h>
#include <string>
#include <TAVO/develop.h>
#include <thread>
#include <vector>

using namespace TAVO::Develop;
using TAVO::String::CPPoolString;

namespace {

std::vector<std::string> g_lines;
CHFLapse* g_watched = nullptr;

std::string Narrow(const wchar_t* text) {
    std::string narrow;
    while (*text) narrow += static_cast<char>(*text++);
    return narrow;
}

void KeepLine(_acfDebugLevel level, const wchar_t* category, const char* source, TAVO::long32 line,
              const wchar_t* format, std::va_list arguments) {
    EXPECT_TRUE(level == 16 && !source && line == 0);
    std::string kept = Narrow(category).append(": ").append(Narrow(format));
    if (kept.find('%') != kept.npos) kept.append("|").append(std::to_string(va_arg(arguments, int)));
    if (g_watched) {
        EXPECT_EQ(g_watched->lapse_nano() * 2 / 1e9, g_watched->count_double()) << "stopped meanwhile";
    }
    g_lines.push_back(kept);
}

struct Stopwatch : testing::Test {
    Stopwatch() {
        g_lines.clear();
        SetExternalLogger(KeepLine);
    }
    ~Stopwatch() override { SetExternalLogger(nullptr); }
};

// Its word comes first.
void SetWord(CHFLapse& watch, unsigned long long word) { std::memcpy(static_cast<void*>(&watch), &word, sizeof word); }
unsigned long long Word(const CHFLapse& watch) {
    unsigned long long word;
    std::memcpy(&word, static_cast<const void*>(&watch), sizeof word);
    return word;
}

} // namespace

TEST_F(Stopwatch, ReportsKeptTimes) {
    {
        CHFLapse watch(L"import"), unnamed(CPPoolString::pempty);
        for (const unsigned long long nanoseconds : {0ULL, 4999ULL, 12345678ULL, 3600000000000ULL}) {
            SetWord(watch, nanoseconds << 1);
            watch.Stop(L"%d clips", 3);
            watch.Lapse(nullptr);
            watch.Stop();
            EXPECT_EQ(Word(watch), nanoseconds << 1) << "only Start changes a stopped watch";
        }
        SetWord(unnamed, 15000 << 1);
        unnamed.Lapse(L"100%%%d", 7);
        EXPECT_EQ(unnamed.lapse_micro(), 15u);
    }
    EXPECT_EQ(g_lines, (std::vector<std::string>{"import - 0.00ms: %d clips|3",
                                                 "import - 0.00ms: ", "import - 0.00ms: %d clips|3",
                                                 "import - 0.00ms: ", "import - 12.35ms: %d clips|3",
                                                 "import - 12.35ms: ", "import - 3600000.00ms: %d clips|3",
                                                 "import - 3600000.00ms: ", "CHFLapse - 0.01ms: 100%%%d|7"}))
        << "stopped watches say nothing at their end";
}

TEST_F(Stopwatch, RunsFromItsStart) {
    const auto wait = [] { std::this_thread::sleep_for(std::chrono::milliseconds(10)); };
    {
        CHFLapse watch(L"import"), unnamed{CPPoolString()};
        EXPECT_TRUE(Word(watch) & 1);
        EXPECT_EQ(Word(unnamed), 0u);
        unnamed.Start();
        const auto start = Word(watch);
        wait();
        g_watched = &watch;
        watch.Lapse(L"lap");
        g_watched = nullptr;
        EXPECT_EQ(Word(watch), start) << "laps add up";
        wait();
        EXPECT_GE(watch.lapse_double(), 0.019);
        EXPECT_LT(watch.lapse_double(), 5.0);
        EXPECT_EQ(watch.count_micro(), start / 1000 + (start % 1000 >= 500)) << "the word as it stands";
    }
    ASSERT_EQ(g_lines.size(), 2u) << "a watch without a name has no total";
    EXPECT_EQ(g_lines[0].substr(0, 9), "import - ");
    EXPECT_EQ(g_lines[0].substr(g_lines[0].find("ms")), "ms: lap");
    EXPECT_EQ(g_lines[1].substr(g_lines[1].find("ms")), "ms: Total");
    EXPECT_GE(std::stod(g_lines[1].substr(9)), 19.0);
    CHFLapse again(L"again");
    again.Stop();
    const auto kept = again.lapse_nano();
    again.Start();
    EXPECT_TRUE(Word(again) & 1);
    again.Stop();
    wait();
    EXPECT_LT(again.lapse_nano(), kept + 10000000) << "from 0, and stopped";
    EXPECT_EQ(g_lines.size(), 2u);
}

// Intended: lapse-count
TEST_F(Stopwatch, IntendedCountsAreTwiceTheTime) {
    CHFLapse watch(L"count");
    SetWord(watch, 10749999 << 1);
    EXPECT_EQ(watch.lapse_nano(), 10749999u);
    EXPECT_EQ(watch.lapse_micro(), 10750u);
    EXPECT_EQ(watch.lapse_milli(), 11u);
    EXPECT_EQ(watch.lapse_double(), 10749999 / 1e9);
    EXPECT_EQ(watch.count_double(), 21499998 / 1e9);
    EXPECT_EQ(watch.count_micro(), 21500u);
    EXPECT_EQ(watch.count_milli(), 21u);
}
