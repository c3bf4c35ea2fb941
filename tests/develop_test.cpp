// Log, assertions, result codes, clocks and random numbers as a host sees them.

#include "support/machine.h"

#include <chrono>
#include <gtest/gtest.h>
#include <regex>
#include <string>
#include <TAVO/develop.h>
#include <thread>
#include <vector>

using namespace TAVO;
using namespace TAVO::Develop;

namespace {

// What a host's logger was told; format and arguments narrow.
struct Line {
    int level;
    bool hasCategory;
    std::string source;
    int line;
    std::string format;
    std::vector<std::string> arguments;
};

std::vector<Line> g_lines;

// Keeps each line; understands the narrow string and integer arguments that the library itself passes.
void KeepLine(_acfDebugLevel level, const wchar_t* category, const char* source, long32 line, const wchar_t* format,
              std::va_list arguments) {
    Line kept{level, category != nullptr, source ? source : "", static_cast<int>(line), {}, {}};
    for (const wchar_t* unit = format; *unit; ++unit) {
        kept.format += static_cast<char>(*unit);
        if (*unit != L'%') continue;
        if (unit[1] == L'h') kept.arguments.emplace_back(va_arg(arguments, const char*));
        if (unit[1] == L'x') kept.arguments.push_back(std::to_string(va_arg(arguments, unsigned)));
    }
    g_lines.push_back(kept);
}

int g_throwerCalls = 0;
void Throw(_acfDebugLevel level, const wchar_t*, const char*, long32, const wchar_t*, std::va_list) {
    ++g_throwerCalls;
    if (level == acfDebugInfo) SetExternalLogger(KeepLine);
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

TEST_F(Log, HostGetsLinesUnformatted) {
    _logWrite(acfDebugVerbose, nullptr, nullptr, 0, L"100%%");
    _logWrite(static_cast<_acfDebugLevel>(3), L"host", "a/b", 7, L"%hs and %x", "text", 255);
    ASSERT_EQ(g_lines.size(), 2u) << "an unknown level asserts only where the library itself writes the line";
    EXPECT_EQ(g_lines[0].format, "100%%");
    EXPECT_FALSE(g_lines[0].hasCategory);
    EXPECT_EQ(g_lines[1].level, 3);
    EXPECT_EQ(g_lines[1].source, "a/b");
    EXPECT_EQ(g_lines[1].line, 7);
    EXPECT_EQ(g_lines[1].arguments, (std::vector<std::string>{"text", "255"}));
}

TEST_F(Log, ThrowingLoggerIsRemovedButNotItsReplacement) {
    for (const _acfDebugLevel level : {acfDebugError, acfDebugInfo}) {
        SetExternalLogger(Throw);
        for (int i = 0; i < 2; ++i) _logWrite(level, nullptr, nullptr, 0, L"line");
    }
    EXPECT_EQ(g_throwerCalls, 2);
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
    for (const Line& line : g_lines) {
        EXPECT_EQ(line.level, acfDebugError);
        EXPECT_EQ(line.source, "source/TAVO/BaseOS_Win");
        EXPECT_EQ(line.line, 201);
        EXPECT_EQ(line.format, "Failed assumption: %hs:%hs");
        EXPECT_EQ(line.arguments.size(), 2u);
    }
    EXPECT_EQ(g_lines[0].arguments[0], "RTA_ON_TRUE");
    EXPECT_EQ(g_lines[1].arguments[0], "RTA_ON_FALSE");
    EXPECT_EQ(g_lines[2].arguments, (std::vector<std::string>{"caption", "text"}));
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

TEST(DebuggerOutput, CarriesPrefixMessageAndLineEnd) {
    int exitCode = 0;
    std::string text = support::RunUnderDebugger("Debuggee.DISABLED_WritesLines", exitCode);
    text = std::regex_replace(text, std::regex(" *[0-9]+\\.[0-9]{3} \\["), "["); // the time is of no fixed value
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

namespace {

using SetLogger = void (*)(ExternalLogger);
using MakeResult = void (*)(hr*, long32); // the constructor; both systems pass the object first

constexpr long32 kFailure = static_cast<long32>(0x80004005);

// What constructing a code in this copy of the library tells the logger.
std::vector<Line> LinesOf(const support::LibraryCopy& copy, long32 code) {
    const auto setLogger =
        copy.Find<SetLogger>("_ZN4TAVO7Develop17SetExternalLoggerEPFv14_acfDebugLevelPKwPKciS3_P13__va_list_tagE",
                             "_ZN4TAVO7Develop17SetExternalLoggerEPFv14_acfDebugLevelPKwPKclS3_PcE");
    const auto make = copy.Find<MakeResult>("_ZN4TAVO2hrC1Ei", "_ZN4TAVO2hrC1El");
    EXPECT_TRUE(setLogger && make) << "the copy lacks an export";
    if (!setLogger || !make) return {};
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

} // namespace

TEST(Configuration, SwitchesReportsOfFailedResultCodes) {
    struct Row {
        const char* text;
        bool box, log, stop;
    };
    for (const Row& row : {
             Row{nullptr, false, false, false},
             Row{"[Other]\nLogFailedHRESULT=1\n", false, false, false},
             Row{"[Debug]\nAssertBox=1\n", true, false, false},
             Row{"; ours\r\n[debug]\r\nlogfailedhresult = 2\r\nAssertBox=0\n", false, true, false},
             Row{"[Debug]\nLogFailedHRESULT=0\nBreakOnHRESULT=1\n", false, false, true},
             Row{"[Debug]\nBreakOnHRESULT=-1\nLogFailedHRESULT=0x10", false, true, true},
         }) {
        SCOPED_TRACE(row.text ? row.text : "no file");
        const support::LibraryCopy copy("Renamed", row.text);
        const auto get = copy.Find<tagSWITCHES (*)()>("_ZN4TAVO7Develop11GetSwitchesEv");
        ASSERT_TRUE(get);
        const tagSWITCHES switches = get();
        EXPECT_EQ(switches.AssertBox, row.box);
        EXPECT_EQ(switches.LogFailedHRESULT, row.log);
        EXPECT_EQ(switches.BreakOnHRESULT, row.stop);

        for (const long32 good : {0, 5}) EXPECT_TRUE(LinesOf(copy, good).empty());
        if (row.box) continue; // nobody would answer it
        const auto lines = LinesOf(copy, kFailure);
        ASSERT_EQ(lines.size(), (row.stop ? 1u : 0u) + (row.log ? 1u : 0u)) << "the assertion first";
        for (const Line& line : lines) {
            const bool assertion = line.level == acfDebugError;
            EXPECT_EQ(assertion, row.stop && &line == &lines[0]);
            EXPECT_EQ(line.source, assertion ? "source/TAVO/BaseOS_Win" : "source/TAVO/TAVOACF");
            EXPECT_EQ(line.line, assertion ? 201 : 28);
            EXPECT_EQ(line.format, assertion ? "Failed assumption: %hs:%hs" : "lResult < 0: %x");
            EXPECT_EQ(line.arguments.back(), assertion ? "source/TAVO/TAVOACF,25:lResult < 0" : "2147500037");
        }
    }
}

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
    EXPECT_LT(ticks, 3600.0) << "since the process started";
    EXPECT_NEAR(static_cast<double>(_now_micro()), static_cast<double>(_now_nano()) / 1e3, 1e6);
    EXPECT_NEAR(static_cast<double>(_now_milli()), static_cast<double>(_now_nano()) / 1e6, 1e3);
}

TEST(Numbers, CountBitsAndKnowTheMachine) {
    EXPECT_EQ(bitcount64(0), 0u);
    EXPECT_STREQ(Core::OS::GetPlatformString(), L"Windows");
    EXPECT_EQ(Core::OS::GetStartupPath()[1], Core::OS::GetProcessName()[0]) << "the file name's start";
    for (int bit = 0; bit < 64; ++bit) EXPECT_EQ(bitcount64(1ULL << bit | 1ULL << 63), bit == 63 ? 1u : 2u);
    EXPECT_FALSE(_isBigEndian() || _isWChar32());
}

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
    for (std::uint32_t seed : {0u, 5489u, 0xFFFFFFFFu}) {
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
    for (int i = 0; i < 500; ++i) {
        ASSERT_EQ(random.rnd(), naive.Next() % 10);
        ASSERT_EQ(random.drnd(), naive.Next() * (10 / 4294967295.0));
    }
    random.maxrnd(4294967295u);
    EXPECT_EQ(random.rnd(), naive.Next());
    for (int i = 0; i < 100; ++i) EXPECT_NEAR(TAVO::Random::_drandom(2.5), 1.25, 1.25);
}
