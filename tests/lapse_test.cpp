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

using Lines = std::vector<std::string>;
Lines g_lines;

void KeepLine(_acfDebugLevel level, const wchar_t* category, const char* source, TAVO::long32 line,
              const wchar_t* format, std::va_list arguments) {
    EXPECT_TRUE(level == 16 && !source && line == 0);
    std::string kept;
    for (; *category; ++category) kept += static_cast<char>(*category);
    kept += ": ";
    for (; *format; ++format) kept += static_cast<char>(*format);
    if (kept.find('%') != kept.npos) kept.append("|").append(std::to_string(va_arg(arguments, int)));
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

// Intended: lapse-count
TEST_F(Stopwatch, KeepsAndReportsTimesAndIntendedCountsTwiceThem) {
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
    EXPECT_EQ(g_lines,
              (Lines{"import - 10.75ms: %d clips|3", "import - 10.75ms: ", "CHFLapse - 3600000005.00ms: 100%%%d|7"}))
        << "and no totals";
}

TEST_F(Stopwatch, RunsFromItsStart) {
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
    ASSERT_EQ(g_lines.size(), 2u) << "a watch without a name has no total";
    EXPECT_EQ(g_lines[0].substr(g_lines[0].find("ms")), "ms: lap");
    EXPECT_EQ(g_lines[1].substr(g_lines[1].find("ms")), "ms: Total");
    EXPECT_GE(std::stod(g_lines[1].substr(9)), 19.0);
}
