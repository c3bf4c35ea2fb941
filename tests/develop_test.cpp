// Log, assertions, result codes, clocks, the stopwatch and random numbers as a host sees them.

#include "support/log.h"
#include "support/machine.h"

#include <chrono>
#include <gtest/gtest.h>
#include <regex>
#include <thread>

using namespace TAVO;
using namespace TAVO::Develop;

namespace {

// The line of a failed assumption, to be followed by caption and text.
const std::string kAssertion =
    std::to_string(acfDebugError) + " TAVO source/TAVO/BaseOS_Win:201 Failed assumption: %hs:%hs";

int g_throwerCalls = 0;
void Throw(_acfDebugLevel level, const wchar_t*, const char*, long32, const wchar_t*, std::va_list) {
    ++g_throwerCalls;
    if (level == acfDebugInfo) SetExternalLogger(support::Log::Keep);
    throw 1;
}

// The rules once more, in plain words.
struct NaiveTwister {
    std::vector<std::uint64_t> state;
    std::size_t index = 0;

    explicit NaiveTwister(std::uint32_t seed) : state{seed} {
        for (std::uint64_t i = 1; i < 624; ++i)
            state.push_back((1812433253ULL * (state[i - 1] ^ state[i - 1] / 0x40000000) + i) % 0x100000000);
    }
    std::uint32_t Next() {
        for (std::size_t i = 0; index == 624 && i < 624; ++i) {
            const std::uint64_t joined = (state[i] & 0x80000001) | (state[(i + 1) % 624] & 0x7FFFFFFE);
            state[i] = joined / 2 ^ state[(i + 397) % 624];
            if (state[i] % 2 == 1) state[i] ^= 0x9908B0DF;
        }
        std::uint64_t y = state[index %= 624];
        ++index;
        y ^= y >> 11;
        y ^= (y << 7) & 0x9D2C5680;
        y ^= (y << 15) & 0xEFC60000;
        return static_cast<std::uint32_t>(y ^ y >> 18);
    }
};

} // namespace

TEST(Logger, GetsLinesUnformattedAndIsRemovedWhenItThrows) {
    const support::Log log;
    _logWrite(acfDebugVerbose, nullptr, nullptr, 0, L"100%%");
    _logWrite(static_cast<_acfDebugLevel>(3), L"host", "a/b", 7, L"%hs and %x", "text", 255);
    EXPECT_FALSE(_istrue_(false, "silent") || !_isfalse_(true, "silent"));
    EXPECT_TRUE(_istrue_(true, "spoken") && !_isfalse_(false, "spoken"));
    EXPECT_FALSE(Develop::OS::RTABox("caption", "text")) << "no box without configuration";
    EXPECT_EQ(log.Take(), (support::Texts{std::to_string(acfDebugVerbose) + " none none:0 100%%",
                                          "3 host a/b:7 %hs and %x|text|255", kAssertion + "|RTA_ON_TRUE|spoken",
                                          kAssertion + "|RTA_ON_FALSE|spoken", kAssertion + "|caption|text"}));
    for (const _acfDebugLevel level : {acfDebugError, acfDebugInfo}) {
        SetExternalLogger(Throw);
        for (int i = 0; i < 2; ++i) _logWrite(level, nullptr, nullptr, 0, L"line");
    }
    EXPECT_TRUE(g_throwerCalls == 2 && log.Take().size() == 1) << "but not its replacement";
}

// Run by the tests below in a child process under a debugger.
TEST(Debuggee, DISABLED_WritesLines) {
    _logWrite(acfDebugInfo, nullptr, nullptr, 0, L"plain %d %ls", 5, L"wide");
    _logWrite(acfDebugWarning, L"host", "a/b", 12, L"%hs", "narrow");
    _logWrite(static_cast<_acfDebugLevel>(3), L"host", nullptr, 0, L"odd level");
    Develop::OS::OutputDebugMessage("100% narrow\n");
    Develop::OS::OutputDebugMessage(L"100% wide\n");
    _logWrite(acfDebugTrace, L"long", nullptr, 0, L"%.*ls", 3000, std::vector<wchar_t>(3000, L'x').data());
}

TEST(DebuggerOutput, CarriesPrefixMessageAndLineEnd) {
    int exitCode = 0;
    std::string text = support::RunUnderDebugger("Debuggee.DISABLED_WritesLines", exitCode);
    text = std::regex_replace(text, std::regex(" *[0-9]+\\.[0-9]{3} \\["), "["); // the time is of no fixed value
    const std::string written = "[INFO   ] [TAVO.default] [] plain 5 wide\r\n"
                                "[WARNING] [host] [] {[file:a/b] [line:12]} narrow\r\n"
                                "[ERROR  ] [TAVO] [] {[file:source/TAVO/BaseOS_Win] [line:201]} "
                                "Failed assumption: Illegal code point reached:Unknown debug level\r\n"
                                "[unknown] [host] [] odd level\r\n100% narrow\n100% wide\n[trace  ] [long] [] " +
                                std::string(2047, 'x') + "\r\n";
    // What follows, if anything, is the string pool's farewell.
    EXPECT_EQ(text.substr(0, written.size()), written);
    EXPECT_TRUE(exitCode == 0 && (text.size() == written.size() || text.find("SPool ClearTable") < text.size()));
}

// What constructing a code in this copy of the library tells the logger.
static support::Texts LinesOf(const support::LibraryCopy& copy, long32 code) {
    const auto setLogger = copy.Find<void (*)(ExternalLogger)>(
        "_ZN4TAVO7Develop17SetExternalLoggerEPFv14_acfDebugLevelPKwPKciS3_P13__va_list_tagE",
        "_ZN4TAVO7Develop17SetExternalLoggerEPFv14_acfDebugLevelPKwPKclS3_PcE");
    const auto make = copy.Find<void (*)(hr*, long32)>("_ZN4TAVO2hrC1Ei", "_ZN4TAVO2hrC1El"); // the constructor
    const support::Log log; // where symbols bind to the first library loaded, the copy's lines arrive there
    setLogger(log.Keep);
    hr result(0);
    make(&result, code);
    setLogger(nullptr);
    EXPECT_EQ(result.lResult, code);
    return log.Take();
}

TEST(Configuration, SwitchesReportsOfFailedResultCodes) {
    const std::tuple<const char*, bool, bool, bool> rows[] = {
        {nullptr, false, false, false},
        {"[Debug]\nAssertBox=1\n", true, false, false},
        {"; ours\r\n[debug]\r\nlogfailedhresult = 2\r\nAssertBox=0\n", false, true, false},
        {"[Debug]\nBreakOnHRESULT=-1\nLogFailedHRESULT=0x10", false, true, true}};
    for (const auto& [text, box, log, stop] : rows) {
        SCOPED_TRACE(text ? text : "no file");
        const support::LibraryCopy copy("Renamed", text);
        const tagSWITCHES switches = copy.Find<tagSWITCHES (*)()>("_ZN4TAVO7Develop11GetSwitchesEv")();
        EXPECT_TRUE(switches.AssertBox == box && switches.LogFailedHRESULT == log);
        EXPECT_EQ(switches.BreakOnHRESULT, stop);
        for (const long32 good : {0, 5}) EXPECT_EQ(LinesOf(copy, good), support::Texts());
        support::Texts expected;
        if (stop) expected.push_back(kAssertion + "|RTA_ON_TRUE|source/TAVO/TAVOACF,25:lResult < 0");
        if (log)
            expected.push_back(std::to_string(acfDebugTrace) +
                               " TAVO source/TAVO/TAVOACF:28 lResult < 0: %x|2147500037");
        if (box) continue; // nobody would answer it
        EXPECT_EQ(LinesOf(copy, static_cast<long32>(0x80004005)), expected);
    }
}

TEST(Clocks, AgreeWithTheStandardOnes) {
    using namespace std::chrono;
    const auto now = duration_cast<milliseconds>(system_clock::now().time_since_epoch()).count();
    EXPECT_NEAR(static_cast<double>(Core::OS::GetTimeNow()), static_cast<double>(now) + 2000, 2020);
    const auto nano = [] { return static_cast<double>(_now_nano()); };
    const double ticks = _getTicks(), start = nano();
    std::this_thread::sleep_for(milliseconds(30));
    EXPECT_GE(nano() - start, 29e6);
    EXPECT_NEAR((_getTicks() - ticks) * 1e9, nano() - start, 25e6);
    EXPECT_LT(ticks, 3600.0) << "since the process started";
    EXPECT_NEAR(static_cast<double>(_now_micro()), nano() / 1e3, 1e6);
    EXPECT_NEAR(static_cast<double>(_now_milli()), nano() / 1e6, 1e3);
    // Intended: platform-name
    EXPECT_STREQ(Core::OS::GetPlatformString(), L"Windows");
    for (int bit = 0; bit < 64; ++bit) EXPECT_EQ(bitcount64(~0ULL >> bit), 64u - static_cast<unsigned>(bit));
    EXPECT_FALSE(_isBigEndian() || _isWChar32());
}

// Its word comes first.
static unsigned long long& Word(CHFLapse& watch) { return *reinterpret_cast<unsigned long long*>(&watch); }

// Intended: lapse-count
TEST(Stopwatch, KeepsAndReportsTimesAndIntendedCountsTwiceThem) {
    const support::Log log;
    {
        CHFLapse watch(L"import"), unnamed(String::CPPoolString::pempty);
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
        CHFLapse watch(L"import"), unnamed{String::CPPoolString()};
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

// Intended: random-first-outputs, random-oddness
TEST(Random, SequenceOfASeedIsIntended) {
    CMTRandom random;
    for (std::uint32_t seed : {0u, 5489u, 0xFFFFFFFFu}) {
        random.maxrnd(4294967295u);
        random.seed(seed);
        NaiveTwister naive(seed);
        for (int i = 0; i < 624 * 3 + 5; ++i) ASSERT_EQ(random.rnd(), naive.Next()) << seed << " at " << i;
        random.maxrnd(9); // limit and factor survive seeding
        random.maxdrnd(10 / 4294967295.0);
        random.seed(seed);
        naive = NaiveTwister(seed);
        for (int i = 0; i < 500; ++i) {
            ASSERT_EQ(random.rnd(), naive.Next() % 10);
            ASSERT_EQ(random.drnd(), naive.Next() * (10 / 4294967295.0));
            ASSERT_NEAR(TAVO::Random::_drandom(2.5), 1.25, 1.25);
        }
    }
}
