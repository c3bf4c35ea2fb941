// Log, assertions, result codes, clocks and random numbers as a host sees them.

#include "support/machine.h"

#include <chrono>
#include <gtest/gtest.h>
#include <stdexcept>
#include <string>
#include <TAVO/develop.h>
#include <thread>
#include <vector>

using namespace TAVO;
using namespace TAVO::Develop;

namespace {

// What a host's logger was told.
struct Line {
    int level;
    bool hasCategory;
    std::string source;
    int line;
    std::vector<wchar_t> format;
    std::vector<std::string> arguments;

    bool FormatIs(const wchar_t* expected) const {
        std::size_t i = 0;
        for (; expected[i]; ++i)
            if (i >= format.size() || format[i] != expected[i]) return false;
        return i == format.size();
    }
};

std::vector<Line> g_lines;

// Keeps each line; understands the narrow string and integer arguments that the library itself passes.
void KeepLine(_acfDebugLevel level, const wchar_t* category, const char* source, long32 line, const wchar_t* format,
              std::va_list arguments) {
    Line kept{level, category != nullptr, source ? source : "", static_cast<int>(line), {}, {}};
    for (const wchar_t* unit = format; *unit; ++unit) kept.format.push_back(*unit);
    for (const wchar_t* unit = format; *unit; ++unit) {
        if (*unit != L'%') continue;
        if (unit[1] == L'h') kept.arguments.emplace_back(va_arg(arguments, const char*));
        if (unit[1] == L'x') kept.arguments.push_back(std::to_string(va_arg(arguments, unsigned)));
    }
    g_lines.push_back(kept);
}

int g_throwerCalls = 0;
void Throw(_acfDebugLevel, const wchar_t*, const char*, long32, const wchar_t*, std::va_list) {
    ++g_throwerCalls;
    throw std::runtime_error("a logger that fails");
}

void ReplaceAndThrow(_acfDebugLevel, const wchar_t*, const char*, long32, const wchar_t*, std::va_list) {
    SetExternalLogger(KeepLine);
    throw 1;
}

class Log : public testing::Test {
protected:
    void SetUp() override {
        g_lines.clear();
        SetExternalLogger(KeepLine);
    }
    void TearDown() override { SetExternalLogger(nullptr); }
};

} // namespace

// --- log -----------------------------------------------------------------------------------------------------------

TEST_F(Log, HostGetsLinesUnformatted) {
    _logWrite(acfDebugVerbose, nullptr, nullptr, 0, L"100%%");
    _logWrite(static_cast<_acfDebugLevel>(3), L"host", "a/b", 7, L"%hs and %x", "text", 255);
    ASSERT_EQ(g_lines.size(), 2u) << "an unknown level asserts only where the library itself writes the line";
    EXPECT_TRUE(g_lines[0].FormatIs(L"100%%"));
    EXPECT_FALSE(g_lines[0].hasCategory);
    EXPECT_EQ(g_lines[1].level, 3);
    EXPECT_EQ(g_lines[1].source, "a/b");
    EXPECT_EQ(g_lines[1].line, 7);
    EXPECT_EQ(g_lines[1].arguments, (std::vector<std::string>{"text", "255"}));
}

TEST_F(Log, ThrowingLoggerIsRemovedForGood) {
    SetExternalLogger(Throw);
    _logWrite(acfDebugError, nullptr, nullptr, 0, L"first");
    _logWrite(acfDebugError, nullptr, nullptr, 0, L"second");
    EXPECT_EQ(g_throwerCalls, 1);
}

TEST_F(Log, LoggerInstalledWhileTheOldOneThrowsStays) {
    SetExternalLogger(ReplaceAndThrow);
    _logWrite(acfDebugError, nullptr, nullptr, 0, L"first");
    _logWrite(acfDebugError, nullptr, nullptr, 0, L"second");
    EXPECT_EQ(g_lines.size(), 1u);
}

TEST_F(Log, AssertionsWriteOneErrorLineAndGoOn) {
    EXPECT_FALSE(_istrue_(false, "silent"));
    EXPECT_TRUE(_isfalse_(true, "silent"));
    EXPECT_TRUE(g_lines.empty());
    EXPECT_TRUE(_istrue_(true, "spoken"));
    EXPECT_FALSE(_isfalse_(false, "spoken"));
    EXPECT_FALSE(Develop::OS::RTABox("caption", "text")) << "no box without configuration";
    ASSERT_EQ(g_lines.size(), 3u);
    const char* captions[] = {"RTA_ON_TRUE", "RTA_ON_FALSE", "caption"};
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(g_lines[i].level, acfDebugError);
        EXPECT_EQ(g_lines[i].source, "source/TAVO/BaseOS_Win");
        EXPECT_EQ(g_lines[i].line, 201);
        EXPECT_TRUE(g_lines[i].FormatIs(L"Failed assumption: %hs:%hs"));
        ASSERT_EQ(g_lines[i].arguments.size(), 2u);
        EXPECT_EQ(g_lines[i].arguments[0], captions[i]);
    }
}

// Run by the tests below in a child process under a debugger.
TEST(Debuggee, DISABLED_WritesLines) {
    _logWrite(acfDebugInfo, nullptr, nullptr, 0, L"plain %d %ls", 5, L"wide");
    _logWrite(acfDebugWarning, L"host", "a/b", 12, L"%hs", "narrow");
    _logWrite(static_cast<_acfDebugLevel>(3), L"host", nullptr, 0, L"odd level");
    Develop::OS::OutputDebugMessage("100% narrow\n");
    Develop::OS::OutputDebugMessage(L"100% wide\n");
    const std::vector<wchar_t> letters(3000, L'x');
    _logWrite(acfDebugTrace, L"long", nullptr, 0, L"%.*ls", 3000, letters.data());
}

namespace {

// Takes "    0.123 " off: the time is of no fixed value.
std::string DropTimes(const std::string& text) {
    std::string rest;
    for (std::size_t at = 0; at < text.size();) {
        std::size_t end = text.find('\n', at);
        end = end == std::string::npos ? text.size() : end + 1;
        std::string line = text.substr(at, end - at);
        at = end;
        const std::size_t bracket = line.find(" [");
        const bool timed = bracket != std::string::npos && bracket >= 8 && line[bracket - 4] == '.';
        rest += timed ? line.substr(bracket + 1) : line;
    }
    return rest;
}

} // namespace

TEST(DebuggerOutput, CarriesPrefixMessageAndLineEnd) {
    int exitCode = 0;
    const std::string text = DropTimes(support::RunUnderDebugger("Debuggee.DISABLED_WritesLines", exitCode));
    EXPECT_EQ(exitCode, 0);
    const std::string written = "[INFO   ] [TAVO.default] [] plain 5 wide\r\n"
                                "[WARNING] [host] [] {[file:a/b] [line:12]} narrow\r\n"
                                "[ERROR  ] [TAVO] [] {[file:source/TAVO/BaseOS_Win] [line:201]} "
                                "Failed assumption: Illegal code point reached:Unknown debug level\r\n"
                                "[unknown] [host] [] odd level\r\n"
                                "100% narrow\n"
                                "100% wide\n"
                                "[trace  ] [long] [] " +
                                std::string(2047, 'x') + "\r\n";
    // What follows, if anything, is the string pool's farewell.
    EXPECT_EQ(text.substr(0, written.size()), written);
    EXPECT_TRUE(text.size() == written.size() || text.find("SPool ClearTable") < text.size());
}

// --- configuration and result codes --------------------------------------------------------------------------------

namespace {

using SetLogger = void (*)(ExternalLogger);
using Box = bool (*)(const char*, const char*);
using MakeResult = void (*)(hr*, long32); // the constructor; both systems pass the object first

// What constructing a code in a copy of the library with this configuration tells the logger.
std::vector<Line> LinesOf(const char* configuration, long32 code) {
    const support::LibraryCopy copy("Renamed", configuration);
    if (!copy.IsLoaded()) {
        ADD_FAILURE() << "the copy does not load";
        return {};
    }
    const auto setLogger =
        copy.Find<SetLogger>("_ZN4TAVO7Develop17SetExternalLoggerEPFv14_acfDebugLevelPKwPKciS3_P13__va_list_tagE",
                             "_ZN4TAVO7Develop17SetExternalLoggerEPFv14_acfDebugLevelPKwPKclS3_PcE");
    const auto make = copy.Find<MakeResult>("_ZN4TAVO2hrC1Ei", "_ZN4TAVO2hrC1El");
    if (!setLogger || !make) {
        ADD_FAILURE() << "the copy lacks an export";
        return {};
    }
    g_lines.clear();
    setLogger(KeepLine);
    SetExternalLogger(KeepLine); // where symbols bind to the first library loaded, the copy's lines arrive there
    hr result(0);
    make(&result, code);
    setLogger(nullptr);
    SetExternalLogger(nullptr);
    EXPECT_EQ(result.lResult, code);
    return g_lines;
}

constexpr long32 kFailure = static_cast<long32>(0x80004005);

} // namespace

TEST(Configuration, SwitchesReportsOfFailedResultCodes) {
    EXPECT_TRUE(LinesOf(nullptr, kFailure).empty()) << "no file: all off";
    EXPECT_TRUE(LinesOf("[Debug]\nLogFailedHRESULT=0\n", kFailure).empty());
    EXPECT_TRUE(LinesOf("[Other]\nLogFailedHRESULT=1\n", kFailure).empty());
    EXPECT_TRUE(LinesOf("[Debug]\nLogFailedHRESULT=1\nBreakOnHRESULT=1\n", 0).empty());
    EXPECT_TRUE(LinesOf("[Debug]\nLogFailedHRESULT=1\nBreakOnHRESULT=1\n", 5).empty());

    const auto logged = LinesOf("; ours\r\n[debug]\r\nlogfailedhresult = 1\r\n", kFailure);
    ASSERT_EQ(logged.size(), 1u);
    EXPECT_EQ(logged[0].level, acfDebugTrace);
    EXPECT_EQ(logged[0].source, "source/TAVO/TAVOACF");
    EXPECT_EQ(logged[0].line, 28);
    EXPECT_TRUE(logged[0].FormatIs(L"lResult < 0: %x"));
    EXPECT_EQ(logged[0].arguments[0], std::to_string(0x80004005u));

    const auto both = LinesOf("[Debug]\nBreakOnHRESULT=-1\nLogFailedHRESULT=0x10", kFailure);
    ASSERT_EQ(both.size(), 2u) << "the assertion first";
    EXPECT_EQ(both[0].arguments, (std::vector<std::string>{"RTA_ON_TRUE", "source/TAVO/TAVOACF,25:lResult < 0"}));
    EXPECT_EQ(both[1].line, 28);
}

TEST(Configuration, TellsItsSwitches) {
    const struct {
        const char* configuration;
        bool box, log, stop;
    } rows[] = {{nullptr, false, false, false},
                {"[Debug]\nAssertBox=1\n", true, false, false},
                {"[Debug]\nLogFailedHRESULT=2\nAssertBox=0\n", false, true, false},
                {"[Debug]\nBreakOnHRESULT=1\n", false, false, true},
                {"[Debug]\nAssertBox=1\nLogFailedHRESULT=1\nBreakOnHRESULT=1\n", true, true, true}};
    for (const auto& row : rows) {
        SCOPED_TRACE(row.configuration ? row.configuration : "no file");
        const support::LibraryCopy copy("Renamed", row.configuration);
        const auto get = copy.Find<tagSWITCHES (*)()>("_ZN4TAVO7Develop11GetSwitchesEv");
        ASSERT_TRUE(get);
        const tagSWITCHES switches = get();
        EXPECT_EQ(switches.AssertBox, row.box);
        EXPECT_EQ(switches.LogFailedHRESULT, row.log);
        EXPECT_EQ(switches.BreakOnHRESULT, row.stop);
    }
}

TEST(ResultCode, ComparesAndConverts) {
    const hr good(1), bad(kFailure), alsoBad(bad);
    EXPECT_TRUE(good);
    EXPECT_FALSE(bad);
    EXPECT_TRUE(bad == alsoBad);
    EXPECT_TRUE(good != bad);
    EXPECT_TRUE(good == 1);
    EXPECT_TRUE(good != 0);
    EXPECT_TRUE(bad == kFailure);
    EXPECT_EQ(static_cast<long32>(bad), kFailure);
}

// --- process facts -------------------------------------------------------------------------------------------------

TEST(ProcessFacts, AreFixedAtLoad) {
    const wchar_t* name = Core::OS::GetProcessName();
    std::string narrow;
    for (; *name; ++name) narrow += static_cast<char>(*name);
    EXPECT_EQ(narrow.substr(0, 10), "tavo_tests");
    const wchar_t* startup = Core::OS::GetStartupPath();
    EXPECT_EQ(startup[0], L'/');
    EXPECT_EQ(startup[1], L't') << "the file name's start, not the folder's";
    EXPECT_STREQ(Core::OS::GetPlatformString(), L"Windows");
}

// --- clocks and numbers --------------------------------------------------------------------------------------------

TEST(Clocks, AgreeWithTheStandardOnes) {
    using namespace std::chrono;
    const auto before = duration_cast<milliseconds>(system_clock::now().time_since_epoch()).count();
    const auto now = static_cast<long long>(Core::OS::GetTimeNow());
    EXPECT_LE(before - 20, now);
    EXPECT_LE(now, before + 5000);

    const auto nano = _now_nano();
    const double ticks = _getTicks();
    std::this_thread::sleep_for(milliseconds(30));
    const auto slept = _now_nano() - nano;
    EXPECT_GE(slept, 29000000u);
    EXPECT_NEAR((_getTicks() - ticks) * 1e9, static_cast<double>(slept), 25e6);
    EXPECT_LT(_getTicks(), 3600.0) << "since the process started";
    EXPECT_NEAR(static_cast<double>(_now_micro()), static_cast<double>(_now_nano()) / 1e3, 1e6);
    EXPECT_NEAR(static_cast<double>(_now_milli()), static_cast<double>(_now_nano()) / 1e6, 1e3);
}

TEST(Numbers, CountBitsAndKnowTheMachine) {
    EXPECT_EQ(bitcount64(0), 0u);
    EXPECT_EQ(bitcount64(0xFFFFFFFFFFFFFFFFULL), 64u);
    for (int bit = 0; bit < 64; ++bit) EXPECT_EQ(bitcount64(1ULL << bit | 1ULL << 63), bit == 63 ? 1u : 2u);
    EXPECT_FALSE(_isBigEndian());
    EXPECT_FALSE(_isWChar32());
}

// --- random numbers ------------------------------------------------------------------------------------------------

namespace {

// The rules once more, in plain words.
struct NaiveTwister {
    std::vector<std::uint64_t> state;
    std::size_t index = 0;

    explicit NaiveTwister(std::uint32_t seed) {
        state.push_back(seed);
        for (std::uint64_t i = 1; i < 624; ++i)
            state.push_back((1812433253ULL * (state[i - 1] ^ state[i - 1] / 0x40000000) + i) % 0x100000000);
    }

    std::uint32_t Next() {
        if (index > 623) {
            for (std::size_t i = 0; i < 624; ++i) {
                std::uint64_t joined = (state[i] & 0x80000001) | (state[(i + 1) % 624] & 0x7FFFFFFE);
                joined = joined / 2 ^ state[(i + 397) % 624];
                if (joined % 2 == 1) joined ^= 0x9908B0DF;
                state[i] = joined;
            }
            index = 0;
        }
        std::uint64_t y = state[index++];
        y ^= y >> 11;
        y ^= (y << 7) & 0x9D2C5680;
        y ^= (y << 15) & 0xEFC60000;
        return static_cast<std::uint32_t>(y ^ y >> 18);
    }
};

} // namespace

TEST(Random, SequenceOfASeedIsIntended) {
    for (std::uint32_t seed : {0u, 1u, 5489u, 0xFFFFFFFFu}) {
        CMTRandom random;
        random.rnd();
        random.seed(seed);
        NaiveTwister naive(seed);
        for (int i = 0; i < 624 * 3 + 5; ++i) ASSERT_EQ(random.rnd(), naive.Next()) << seed << " at " << i;
    }
}

TEST(Random, LimitsAndFactorSurviveSeeding) {
    CMTRandom random;
    random.maxrnd(9);
    random.maxdrnd(10 / 4294967295.0);
    random.seed(7);
    NaiveTwister naive(7);
    unsigned seen = 0;
    for (int i = 0; i < 500; ++i) {
        const std::uint32_t value = random.rnd();
        ASSERT_EQ(value, naive.Next() % 10);
        seen |= 1u << value;
        ASSERT_EQ(random.drnd(), naive.Next() * (10 / 4294967295.0));
    }
    EXPECT_EQ(seen, 0x3FFu);
    random.maxrnd(4294967295u);
    EXPECT_EQ(random.rnd(), naive.Next());
    for (int i = 0; i < 100; ++i) {
        const double value = TAVO::Random::_drandom(2.5);
        EXPECT_TRUE(value >= 0 && value <= 2.5) << value;
    }
    EXPECT_EQ(_drandom(0), 0.0);
}
