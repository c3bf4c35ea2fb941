// Timecode records: every label of a day against a naive clock, bounds of fields, counts at the ends of the range; and
// the two text forms.

#include "support/log.h"

#include <algorithm>
#include <climits>
#include <gtest/gtest.h>
#include <string>
#include <TAVO/timecode.h>
#include <tuple>
#include <vector>

using namespace TAVO;
using namespace TAVO::TimeCode;
using support::Ascii;

namespace {

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr long long kEvery = 251; // sanitizers get a slice
#else
constexpr long long kEvery = 1;
#endif

// What a broadcaster's table says, independent of the library's.
struct Facts {
    const char* name;
    ulong32 sys, evenFrames, oddFrames;
    long long frame;
    ulong32 skipped, block; // labels skipped at a minute's start, except every block-th minute
    long long framesPerDay;
};
const Facts kFacts[] = {{"PAL", 0, 25, 25, 48, 0, 1, 2160000},        {"NTSC", 1, 30, 30, 40, 0, 1, 2592000},
                        {"NTSC_DF", 2, 30, 30, 40, 2, 10, 2589408},   {"FILM", 3, 24, 24, 50, 0, 1, 2073600},
                        {"HDFILM", 4, 24, 24, 50, 0, 1, 2073600},     {"HDFILM_DF", 5, 24, 24, 50, 2, 4, 2071440},
                        {"HD50", 6, 50, 50, 24, 0, 1, 4320000},       {"HDNTSC", 7, 60, 60, 20, 0, 1, 5184000},
                        {"HDNTSC_DF", 8, 60, 60, 20, 4, 10, 5178816}, {"PAL_PX", 9, 13, 12, 96, 0, 1, 1080000},
                        {"NTSC_PX", 10, 15, 15, 80, 0, 1, 1296000},   {"FILM_PX", 11, 12, 12, 100, 0, 1, 1036800},
                        {"HD30", 12, 30, 30, 40, 0, 1, 2592000},      {"HD60", 13, 60, 60, 20, 0, 1, 5184000}};

// Counts labels one by one, and skips those that do not exist one by one.
struct Clock {
    const Facts& facts;
    ulong32 hh = 0, mm = 0, ss = 0, ff = 0;

    bool IsSkipped() const { return ss == 0 && mm % facts.block != 0 && ff < facts.skipped; }
    void Tick() {
        if (++ff < (ss % 2 ? facts.oddFrames : facts.evenFrames)) return;
        ff = 0;
        if (++ss < 60) return;
        ss = 0;
        if (++mm < 60) return;
        mm = 0;
        ++hh;
    }
};

auto FieldsOf(const TCINFO& r) { return std::make_tuple(r.dd(), r.hh(), r.mm(), r.ss(), r.ff(), r.sys()); }

class EveryFrame : public testing::TestWithParam<Facts> {};

} // namespace

// The clock never shows a label twice, so agreeing with it at every frame means that each frame has its own label and
// that the label exists.
TEST_P(EveryFrame, HasItsLabelBothWaysAndInText) {
    const Facts& facts = GetParam();
    Clock clock{facts};
    long long index = 0;
    for (; clock.hh < 24; clock.Tick()) {
        const TCINFO fields(long32(clock.hh), clock.mm, clock.ss, clock.ff, facts.sys);
        if (clock.IsSkipped()) {
            ASSERT_EQ(fields.sys(), facts.sys | kInvalid);
            continue;
        }
        const long long count = index++ * facts.frame;
        if (index % kEvery != 0) continue;

        const auto label = [&](long long dd) {
            return std::make_tuple(dd, clock.hh, clock.mm, clock.ss, clock.ff, facts.sys);
        };
        const TCINFO forward(count, facts.sys), backward(-count, facts.sys);
        bool ok = FieldsOf(forward) == label(0) && (count == 0 || FieldsOf(backward) == label(-1));
        ok = ok && static_cast<long long>(forward) == count && static_cast<long long>(backward) == -count;
        ok = ok && FieldsOf(fields) == label(0);
        const timecode value(count, facts.sys), exchanged = SZUTC(value);
        ok = ok && FieldsOf(TCINFO(SZTC(forward))) == label(0);
        ok = ok && FieldsOf(TCINFO(SZTC(backward))) == FieldsOf(backward);
        // "PAL(PX)" exchanges itself with "/D", which it has no system for.
        ok = ok && (facts.sys == eSystemPALPX ? !exchanged.IsAssigned() : exchanged == value);
        ASSERT_TRUE(ok) << facts.name << " frame " << index - 1;
    }
    EXPECT_EQ(index, facts.framesPerDay);
    EXPECT_EQ(TCINFO(index * facts.frame, facts.sys).dd(), 1) << "the next day begins";
}
INSTANTIATE_TEST_SUITE_P(Systems, EveryFrame, testing::ValuesIn(kFacts),
                         [](const auto& info) { return info.param.name; });

TEST(TimecodeRecord, BoundsOfFields) {
    const std::pair<TCINFO, ulong32> rows[] = {
        {TCINFO(743, 59, 59, 24, 0), 0},         {TCINFO(-744, 0, 0, 0, 0), kInvalid},
        {TCINFO(INT_MIN, 0, 0, 0, 0), kInvalid}, {TCINFO(0, 0, 0, UINT_MAX, 13), kInvalid | 13},
        {TCINFO(0, 0, 0, 0, 0x1000F), 0x30000},  {TCINFO(999, 0, 0, 0, 0x10003), 0x10003}};
    for (const auto& [record, sys] : rows) {
        EXPECT_EQ(record.sys(), sys);
        if (record.IsDefined()) continue;
        EXPECT_TRUE(FieldsOf(record) == FieldsOf(TCINFO(0LL, sys)) && static_cast<long long>(record) == 0) << sys;
        EXPECT_FALSE(record.GetInfo(nullptr, nullptr, nullptr, nullptr, nullptr, nullptr)) << sys;
    }
    for (const Facts& facts : kFacts) {
        EXPECT_FALSE(TCINFO(long32(0), 0, 0, facts.evenFrames, facts.sys).IsDefined()) << facts.name;
        const long32 fields = INT_MAX / long32(timecode::GetFieldBU(facts.sys));
        for (int sign : {1, -1}) {
            EXPECT_EQ(TCINFO(long32(sign * fields), facts.sys).sys(), facts.sys);
            EXPECT_EQ(TCINFO(long32(sign * (fields + 1)), facts.sys).sys(), kInvalid);
            EXPECT_EQ(timecode(long32(sign * (fields + 1)), facts.sys).sys(), kInvalid);
        }
    }
    EXPECT_EQ(TCINFO(long32(INT_MAX), kUnassigned | 3).sys(), kUnassigned | 3);
}

// Intended: timecode-record-fields, timecode-skipped-label
TEST(TimecodeRecord, CountsWithDaysAndSignsIntended) {
    EXPECT_EQ(FieldsOf(TCINFO(1LL, 8)), std::make_tuple(0, 0, 0, 0, 1, 8)) << "between two frames of half rate";
    EXPECT_EQ(TCINFO(71939LL, 2).ff(), 29u) << "within frame 28, just before a skipped label";
    EXPECT_TRUE(static_cast<long long>(TCINFO(-1LL, 0)) == 0 && TCINFO(-103680001LL, 0).Clip().dd() == -1);
    ulong32 hh, mm, ss, ff, sys;
    int sign;
    ASSERT_TRUE(TCINFO(-2 * 103680000LL - 4320000 - 48, 0).GetInfo(&hh, &mm, &ss, &ff, &sign, &sys));
    EXPECT_EQ(std::make_tuple(hh, mm, ss, ff, sign, sys), std::make_tuple(49u, 0u, 0u, 1u, -1, 0u));
    EXPECT_EQ(static_cast<long32>(TCINFO(48LL, 0)), 2);
    EXPECT_EQ(static_cast<ulong32>(static_cast<long32>(TCINFO(-48LL, 0))), 0xAAAAAAA8u) << "(2^64 - 48) / 24, cut";
}

// A position anywhere is at most one frame away from the frame it shows, at the ends of the range too.
TEST(TimecodeRecord, AnyCountComesBackWithinAFrame) {
    std::vector<long long> counts = {LLONG_MIN, LLONG_MIN + 1, LLONG_MIN / 2, LLONG_MAX / 2, LLONG_MAX - 200};
    for (long long edge : {0LL, 71920LL, 71928LL, 719280LL, 71900LL, 71925LL, 103576320LL, 103572000LL, 103680000LL})
        for (long long step = -101; step <= 101; ++step) counts.insert(counts.end(), {edge + step, -edge + step});
    for (const Facts& facts : kFacts)
        for (long long count : counts) {
            const long long back = TCINFO(count, facts.sys);
            // modulo 2^64: a label may be the frame just beyond the end of the range
            const auto apart = static_cast<unsigned long long>(back) - static_cast<unsigned long long>(count);
            EXPECT_LE(std::min(apart, 0 - apart), 2u * facts.frame) << facts.name << " " << count;
        }
}

// --- texts -----------------------------------------------------------------------------------------------------------

namespace {

// Puts text into the characters without canonicalising it.
template <class Text> Text Holding(const std::string& text) {
    Text t;
    std::fill(std::begin(t.text), std::end(t.text), L'\0');
    std::copy(text.begin(), text.end(), t.text);
    return t;
}

// What free text becomes in one of the forms.
template <class Text> std::string Form(const std::string& freeText) {
    const std::u16string wide(freeText.begin(), freeText.end());
    return Ascii(Text(reinterpret_cast<const wchar_t*>(wide.c_str())).text);
}

const char kNone[] = " --:--:--:--";
constexpr long long kHour = 4320000;
struct Row {
    const char* text;
    ulong32 sys;
    long long count;
};

} // namespace

// The separators and rates of all systems are in the tool's documentation, whose commands run.
// Intended: timecode-utf8
TEST(TimecodeText, WritingAndUtf8DropsTheSystemIntended) {
    const std::pair<SZTC, const char*> rows[] = {
        {{long32(10), 0, 0, 0, 10}, " 10:00,00;00"}, {TCINFO(-1LL, 0), "-00:00:00:00"},
        {{long32(25), 0, 0, 0, 0}, ">##:##:##:##"},  {{long32(-25), 0, 0, 0, 8}, "<##.##.##.##"},
        {{long32(999), 0, 0, 0, 8}, "*##:##:##:##"}, {{0LL, 0x20002}, kNone}};
    for (const auto& [text, expected] : rows) EXPECT_EQ(Ascii(text.text), expected);
    const SZTC text(long32(10), 0, 0, 0, 2);
    EXPECT_STREQ(*String::CACFWChar(text), L" 10.00:00.00");
    EXPECT_STREQ(reinterpret_cast<const char*>(*String::CUTF8Char(text)), " 10:00:00:00");

    const std::pair<SZUTC, const char*> exchanged[] = {{timecode(long32(10), 0, 0, 0, 9), "10:00:00:00 {25/2}Hz/D"},
                                                       {timecode(0LL, kUnassigned | 8), "--:--:--:-- {60000/1001}Hz/D"},
                                                       {timecode(long32(25), 0, 0, 0, 0), "01:00:00:00+{25/1}Hz"},
                                                       {timecode(-48LL, 0), "23:59:59:24-{25/1}Hz"},
                                                       {timecode(5LL, kInvalid | 14), "--:--:--:-- {25/1}Hz"},
                                                       {SZUTC(), ""}};
    for (const auto& [form, expected] : exchanged) EXPECT_EQ(Ascii(form.text), expected);
}

TEST(TimecodeText, ReadingTheFixedForm) {
    const Row rows[] = {
        {" 10.00:00.00", 2, 10 * 4315680LL},        {" 99:99:99:99", 0, 99 * kHour + 99 * 72000 + 99 * 1200 + 99 * 48},
        {" -1:--:-2:-3", 0, kHour + 2400 + 3 * 48}, {"  1: 2:+3: 4", 0, kHour + 2 * 72000 + 3 * 1200 + 4 * 48},
        {" 10:00:00:1", 0, 10 * kHour + 48},        {" --.--:--.--", kUnassigned | 2, 0}};
    for (const Row& row : rows) {
        const SZTC text = Holding<SZTC>(row.text);
        EXPECT_TRUE(TCINFO(text).sys() == row.sys && static_cast<long long>(text) == row.count) << row.text;
        EXPECT_EQ(static_cast<long32>(text), static_cast<long32>(TCINFO(text))) << row.text;
    }
    // Intended: timecode-bad-separators
    for (const char* invalid :
         {" 00.00.00:00", " 1x:00:00:00", " 00:00:00:x0", ">##:##:##:##", "*00:00:00:00", "", " 10:00:00:"})
        EXPECT_EQ(TCINFO(Holding<SZTC>(invalid)).sys(), kInvalid) << invalid;
    for (const std::string unassigned :
         {kNone, " 00.00:00:00", " 00:00:00!00", " ", " 10:00:00", "1111111111111"}) // full
        EXPECT_EQ(TCINFO(Holding<SZTC>(unassigned)).sys(), kUnassigned) << unassigned;
    const std::string stale(" 10:0\0:00:00", 12);
    EXPECT_EQ(TCINFO(Holding<SZTC>(stale)).sys(), kUnassigned) << "nothing is read behind the terminator";

    for (const char* unsignedText : {"10:20:30:12", "+10:20:30:12", " 10:20:30:12"})
        EXPECT_EQ(Form<SZTC>(unsignedText), " 10:20:30:12");
    for (const char* kept : {" 10.20:30.12", ">##:##:##:##", "*##:##:##:##", kNone}) EXPECT_EQ(Form<SZTC>(kept), kept);
    for (const char* refused : {"-10.20.30:12", "10.20:30:12", "x10:20:30:12", "1:20:30:12", "10:20:30:1",
                                " 10:20:30:123", ">10:20:30:12", " ##:##:##:##", " 1 :20:30:12", ""})
        EXPECT_EQ(Form<SZTC>(refused), kNone) << refused;
    EXPECT_EQ(Ascii(SZTC(static_cast<const wchar_t*>(nullptr)).text), kNone);
    EXPECT_TRUE(timecode(L"00:00:01:00") == timecode(1200LL, 0) && timecode(L">##:##:##:##").sys() == kInvalid);
}

// Intended: timecode-rate-alone
TEST(TimecodeText, ReadingTheExchangeFormAndRatesWithoutFieldsIntended) {
    const Row rows[] = {{"10:00:00:00 {25/2}Hz", 9, 10 * kHour},
                        {"10:00:00:00 {25/1}", 0, 10 * kHour},
                        {" 1: 2: 3: 4x{ 25/ 1}Hz", 0, kHour + 2 * 72000 + 3 * 1200 + 4 * 48},
                        {"-1:00:00:00 {25/1}Hz", 0, -kHour},
                        {"4294967297:00:00:00 {25/1}Hz", 0, kHour}, // numbers wrap at 2^32
                        {"00:00:00:00 {120/2}Hz", 13, 0},
                        {"01:00:00:00+{25/1}Hz", kInvalid, kHour},
                        {"01:00:00:00-{30/1}Hz", 12, kHour - 2073600000},
                        {"00:00:00:00+{30000/1001}Hz/D", 2, 2071526400},
                        {"00:01:00:00 {30000/1001}Hz/D", kInvalid | 2, 0},
                        {"60:60:00:00 {25/1}Hz", kInvalid, 0}};
    for (const Row& row : rows) {
        const timecode value = Holding<SZUTC>(row.text);
        EXPECT_TRUE(value.sys() == row.sys && static_cast<long long>(value) == row.count) << row.text;
    }
    // The character before the last one alone tells drop frame, which 25/1 does not have.
    for (const char* text : {"10:00:00:00 {25/1}Hz/D", "10:00:00:00 {25/1", "10:00:00:00 {25/1}Hz/?",
                             "00:00:00:00 {1/0}Hz", "--:--:--:-- {25/1}Hz", "1:2:3:4{25/1}Hz", "1:2:3:- {25/1}Hz", ""})
        EXPECT_EQ(timecode(Holding<SZUTC>(text)).sys(), kUnassigned) << text;
    // Texts that fill the array have no terminator: reading stops at its end.
    const SZUTC ones = Holding<SZUTC>("10:00:00:00 {25/" + std::string(32, '1'));
    const SZUTC one = Holding<SZUTC>("10:00:00:00 {25/" + std::string(31, '0') + "1");
    EXPECT_TRUE(timecode(ones).sys() == kUnassigned && timecode(one) == timecode(10 * kHour, 0));

    const std::pair<std::string, const char*> forms[] = {
        {"1:2:3:4 {120/2}Hz", "01:02:03:04 {60/1}Hz"},
        {"1:2:3:4*{30000/1001}Hz/D", "01:02:03:04*{30000/1001}Hz/D"},
        {"1:2:3:4 {30000/1001}Hz/D ", "01:02:03:04 {30000/1001}Hz"}, // not exactly /D
        {"1:2:3:4 {" + std::string(100000, '0') + "25/1}Hz", "01:02:03:04 {25/1}Hz"},
        {"? 25/1}Hz", "--:--:--:-- {25/1}Hz"},
        {" 25/2}Hz", "--:--:--:-- {25/2}Hz"},
        {std::string(100000, '9'), ""}};
    for (const auto& [text, expected] : forms) EXPECT_EQ(Form<SZUTC>(text), expected) << text.substr(0, 30);
    for (const char* refused : {"0:1:0:0 {30000/1001}Hz/D", "1:2:3:4 {25/1}Hz/D", "--:--:--:-- {25/1}Hz", "25/1}Hz",
                                "--:--:--:-- {30000/1001}Hz", "? 26/1}Hz"})
        EXPECT_EQ(Form<SZUTC>(refused), "") << refused;
    EXPECT_STREQ(SZUTC(static_cast<const wchar_t*>(nullptr)).text, L"");
}
