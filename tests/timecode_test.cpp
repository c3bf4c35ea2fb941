// Timecode records: every label of a day against a naive clock, bounds of fields, counts at the ends of the range; the
// two text forms. Timecode values: arithmetic, order, rounding to frames, days, rates.

#include "support/log.h"

#include <algorithm>
#include <climits>
#include <cmath>
#include <gtest/gtest.h>
#include <limits>
#include <TAVO/timecode.h>
#include <tuple>

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
using Row = std::tuple<const char*, ulong32, long long>; // a text, its system, its count

using T = timecode;

constexpr double kNan = std::numeric_limits<double>::quiet_NaN();
constexpr double kInfinity = std::numeric_limits<double>::infinity();

// Count and word, for comparing values whole: operator== takes any two invalid values for equal.
using Whole = std::pair<long long, ulong32>;
Whole Of(const timecode& t) { return {static_cast<long long>(t), t.sys()}; }

// Rows of a name, a result and what it should be.
void Check(const std::vector<std::tuple<const char*, timecode, Whole>>& rows) {
    for (const auto& [name, result, expected] : rows) EXPECT_EQ(Of(result), expected) << name;
}

const timecode kNothing;
const timecode kBroken(7LL, kInvalid);

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
    for (const auto& [held, sys, count] : rows) {
        const SZTC text = Holding<SZTC>(held);
        EXPECT_TRUE(TCINFO(text).sys() == sys && static_cast<long long>(text) == count) << held;
        EXPECT_EQ(static_cast<long32>(text), static_cast<long32>(TCINFO(text))) << held;
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
    // Numbers wrap at 2^32.
    const Row rows[] = {{"10:00:00:00 {25/2}Hz", 9, 10 * kHour},   {"01:00:00:00-{30/1}Hz", 12, kHour - 2073600000},
                        {"10:00:00:00 {25/1}", 0, 10 * kHour},     {"00:00:00:00+{30000/1001}Hz/D", 2, 2071526400},
                        {"-1:00:00:00 {25/1}Hz", 0, -kHour},       {"00:01:00:00 {30000/1001}Hz/D", kInvalid | 2, 0},
                        {"01:00:00:00+{25/1}Hz", kInvalid, kHour}, {" 1: 2: 3: 4x{ 25/ 1}Hz", 0, kHour + 147792},
                        {"60:60:00:00 {25/1}Hz", kInvalid, 0},     {"4294967297:00:00:00 {25/1}Hz", 0, kHour},
                        {"00:00:00:00 {120/2}Hz", 13, 0}};
    for (const auto& [held, sys, count] : rows) {
        const timecode value = Holding<SZUTC>(held);
        EXPECT_TRUE(value.sys() == sys && static_cast<long long>(value) == count) << held;
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
        // "/D " is not exactly /D
        {"1:2:3:4 {120/2}Hz", "01:02:03:04 {60/1}Hz"},
        {"1:2:3:4*{30000/1001}Hz/D", "01:02:03:04*{30000/1001}Hz/D"},
        {"1:2:3:4 {30000/1001}Hz/D ", "01:02:03:04 {30000/1001}Hz"},
        {"? 25/1}Hz", "--:--:--:-- {25/1}Hz"},
        {"1:2:3:4 {" + std::string(100000, '0') + "25/1}Hz", "01:02:03:04 {25/1}Hz"},
        {" 25/2}Hz", "--:--:--:-- {25/2}Hz"},
        {std::string(100000, '9'), ""}};
    for (const auto& [text, expected] : forms) EXPECT_EQ(Form<SZUTC>(text), expected) << text.substr(0, 30);
    for (const char* refused : {"0:1:0:0 {30000/1001}Hz/D", "1:2:3:4 {25/1}Hz/D", "--:--:--:-- {25/1}Hz", "25/1}Hz",
                                "--:--:--:-- {30000/1001}Hz", "? 26/1}Hz"})
        EXPECT_EQ(Form<SZUTC>(refused), "") << refused;
    EXPECT_STREQ(SZUTC(static_cast<const wchar_t*>(nullptr)).text, L"");
}

// --- values ----------------------------------------------------------------------------------------------------------

// Intended: timecode-count-units, timecode-seconds
TEST(Timecode, ConversionsWithUnsignedUnitsIntended) {
    const timecode back(-49LL, 0);
    EXPECT_TRUE(long32(T(12LL, 0)) == 1 && double(T(1200LL, 4)) == 1200 * (1.001 / 1200.0));
    EXPECT_TRUE(static_cast<long long>(kBroken) == 7 && double(kBroken) == 0 && kBroken.Frames(0, 0) == 0);
    EXPECT_TRUE(back.Frames(0, 1) == -2 && back.Frames(0, 0) == -1 && back.Frames(14, 0) == 0);
    EXPECT_EQ(T(72LL, 0).Frames(0, 0), 2) << "halves away from zero";
    EXPECT_EQ(T(LLONG_MIN, 0).Frames(0, 1), static_cast<long32>(0 - ((1ULL << 63) + 47) / 48));
    EXPECT_EQ(T(-48LL, 0).Frames(0, -1), static_cast<long32>((0ULL - 48) / 48));
    // Intended: timecode-defined
    EXPECT_TRUE(!kNothing && kNothing.IsDefined() && !!kBroken);
}

TEST(Timecode, Arithmetic) {
    const timecode pal(48LL, 0), film(100LL, 3), bottom(LLONG_MIN, 3);
    Check({{"made of longer units", T(1.0, 1), {1199, 1}},
           {"made of seconds below the range", T(-kInfinity, 0), {-LLONG_MAX, 0}},
           {"made of no number", T(kNan, 3), {0, kInvalid}},
           {"unassigned has no count", T(5LL, kUnassigned | 3), {0, kUnassigned | 3}},
           {"invalid fields have none", T(5, kInvalid | 3), {0, kInvalid | 3}},
           {"made of a skipped label", T(0, 1, 0, 1, 2), {0, kInvalid | 2}},
           {"keeps the left system", pal + film, {148, 0}},
           {"too many fields", pal + INT_MAX, {48, kInvalid}},
           {"not a number", pal - kNan, {48, kInvalid}},
           {"unassigned left", kNothing + film, {100, 3}},
           {"unassigned left of minus", kNothing - film, {0, kUnassigned}},
           {"invalid right", film + kBroken, {100, kInvalid | 3}},
           {"invalid left", kBroken + film, {107, kInvalid}},
           {"beyond the top", T(LLONG_MAX, 3) + 1LL, {LLONG_MIN, kInvalid | 3}},
           {"negated bottom", -bottom, {LLONG_MIN, kInvalid | 3}},
           {"over, truncating", -film / 3, {-33, 3}},
           {"over zero", film / 0, {0, kInvalid}},
           {"bottom over minus one", bottom / -1, {LLONG_MIN, kInvalid | 3}},
           {"times a double", film * 0.555, {56, 3}},
           {"over the least double", film / 0.000001, {100000000, 3}},
           // Intended: timecode-half
           {"0.5 is added to negative results too", -pal * 1.0, {-47, 0}},
           // Intended: timecode-divisor
           {"over a negative double", film / -2.0, {0, kInvalid}},
           {"times infinity", film * kInfinity, {LLONG_MAX, kInvalid | 3}},
           {"scaled by a negative denominator", T::Scale(film, 1, -8, true), {-13, 3}},
           {"scaled by the least denominator", T::Scale(film, 1, INT_MIN, true), {0, 3}},
           {"scaled beyond it", T::Scale(T(2147483648LL, 3), 1, 1, false), {2147483648, kInvalid | 3}},
           // Intended: timecode-scale
           {"scaled far below zero", T::Scale(T(-9000000000LL, 3), 1, 1, false), {-9000000000LL, 3}},
           {"scaled bottom", T::Scale(bottom, 1, -1, false), {LLONG_MIN, kInvalid | 3}}});
    EXPECT_TRUE(film / T(50LL, 0) == 2.0 && film / T(0LL, 0) == 1e300 && film / kBroken == 1e300);
    timecode t = film;
    EXPECT_TRUE(Of(t++) == Of(film) && Of(++t) == Whole(200, 3) && Of(--t) == Whole(150, 3));
    EXPECT_EQ(Of(t -= *&t), Whole(0, 3));
}

TEST(Timecode, OrderIntended) {
    const timecode one(1LL, 0), two(2LL, 3), broken2(9LL, kInvalid | 3);
    EXPECT_TRUE(one < two && two > one && one <= two && two >= one && one != two);
    EXPECT_TRUE(one != T(1LL, 3) && one <= T(1LL, 3) && one >= T(1LL, 3));
    EXPECT_TRUE(kBroken > two && two < kBroken && !(kBroken <= two) && !(two >= kBroken));
    EXPECT_TRUE(T(1200LL, 0) == 1.0 && 2.0 >= T(1200LL, 0) && T(1200LL, 0) != 1.5);
    EXPECT_TRUE(kBroken == 7LL && kBroken == 0 && kBroken == 0.0);
    // Two invalid values are equal, and each is less than the other.
    // Intended: timecode-invalid-order
    EXPECT_TRUE(kBroken == broken2 && kBroken < broken2 && broken2 < kBroken && kBroken <= broken2);
    EXPECT_FALSE(kBroken > broken2 || kBroken >= broken2 || kBroken != broken2);
}

// Intended: timecode-trunc, timecode-roof
TEST(Timecode, RoundingToFramesIntended) {
    const long long rows[][4] = {// aligned, trunced and roofed
                                 {0, 0, 0, 0},       {1, 0, 0, 48},       {23, 0, 0, 48},       {24, 48, 0, 48},
                                 {47, 48, 0, 48},    {48, 48, 48, 48},    {49, 48, 48, 96},     {-1, 0, 0, 48},
                                 {-23, 0, 0, 48},    {-24, -48, 0, 48},   {-48, -48, -48, -48}, {-49, -48, -96, 0},
                                 {-72, -96, -96, 0}, {-96, -96, -96, -96}};
    for (const auto& [count, aligned, trunced, roofed] : rows) {
        const timecode t(count, 0);
        EXPECT_TRUE(Of(t.Aligned()) == Whole(aligned, 0) && Of(t.MappedTo(0, 0)) == Of(t.Aligned())) << count;
        EXPECT_TRUE(Of(t.Trunced()) == Whole(trunced, 0) && Of(t.Roofed()) == Whole(roofed, 0)) << count;
        EXPECT_EQ(t.AssertAligned(), count % 48 == 0);
        EXPECT_LE(static_cast<long long>(t.MappedTo(0, -1)), count);
        EXPECT_GE(static_cast<long long>(t.MappedTo(0, 1)), count);
    }
    const long long top = LLONG_MAX - LLONG_MAX % 48;
    Check({{"align at the top", T::Align(T(LLONG_MAX, 9)), {LLONG_MAX - LLONG_MAX % 96, 9}},
           {"align at the bottom", T::Align(T(LLONG_MIN, 9)), {LLONG_MAX % 96 - LLONG_MAX, 9}},
           {"trunc at the bottom", T::Trunc(T(LLONG_MIN, 0)), {-top, kInvalid}},
           {"roof at the top", T::Roof(T(LLONG_MAX, 0)), {top, kInvalid}},
           {"smallest frame", T::GetMinFrame(0), {-top, 0}},
           {"align to an unassigned system", T(47LL, 0).AlignedToSystem(kUnassigned | 3), {0, kUnassigned | 3}},
           {"roof to an invalid system", T(1LL, 0).RoofedToSystem(kInvalid | 3), {1, kInvalid | 3}},
           {"re-timed", T(120000LL, 1).XlatedToSystem(0), {120120, 0}},
           {"re-timed out of range", T(LLONG_MIN, 1).XlatedToSystem(0), {-LLONG_MAX, kInvalid}},
           {"re-timed, flagged", kBroken.XlatedToSystem(3), {7, kInvalid | 3}}});
    EXPECT_FALSE(T(0LL, 0).AssertAlignedToSystem(kUnassigned) || kBroken.AssertAlignedToSystem(0));
}

TEST(Timecode, DaysAndChoices) {
    const long long day = 103680000;
    const timecode lo(1000LL, 0), hi(2000LL, 3);
    Check({{"clip a negative", T(-day - 48, 0).Clipped(), {-48, 0}},
           {"clip at the bottom", T(LLONG_MIN, 3).Clipped(), {-(LLONG_MAX % day / 50 * 50), 3}},
           {"wrap drop frame", T(-40LL, 2).Wrapped(), {103576280, 2}},
           {"unassign to a system", T(5LL, 3).Unassign(kInvalid | 4), {0, kUnassigned | 4}},
           {"folded from below", T::Bias(T(1480 - day, 0), lo, hi), {1480, 0}},
           {"above", T::Bias(T(2041LL, 1), lo, hi), {2000, 3}},
           {"invalid", T::Bias(kBroken, lo, hi), {2000, 3}},
           {"unassigned bound", T::Bias(T(5LL, 1), kNothing, hi), {5, 1}},
           {"nearer to b", T::RoundTo(T(1501LL, 1), lo, hi), {2000, 3}},
           {"unassigned", T::RoundTo(kNothing, lo, hi), {0, kUnassigned}}});
    timecode own(3000LL, 0);
    EXPECT_EQ(Of(own.Bias(lo, own)), Whole(3000, 0));
}

// Intended: timecode-slip
TEST(Timecode, SlippingByFieldsIntended) {
    const long long steps[] = {0,          2073600000, 2071526400, 0, 0, 0,          1244160000,
                               1036800000, 1035763200, 0,          0, 0, 2073600000, 1036800000};
    for (ulong32 sys = 0; sys < 14; ++sys) {
        EXPECT_EQ(Of(T::GetMaxTC(sys)), Whole(steps[sys], steps[sys] ? sys : kInvalid));
        EXPECT_EQ(Of(T(7LL, sys).Slipped(-2)), Whole(7 - 2 * steps[sys], steps[sys] ? sys : kInvalid | sys));
    }
    EXPECT_EQ(Of(T::Slip(T(0LL, kUnassigned | 2), 1)), Whole(0, kUnassigned | 2));
    EXPECT_EQ(Of(kBroken.Slipped(1)), Whole(7, kInvalid));
    EXPECT_EQ(T(LLONG_MIN, 12).Slipped(INT_MIN).sys(), kInvalid | 12);
}

TEST(TimecodeSystem, FactsOfTheTableIntended) {
    constexpr double kPal = 25.0, kNtsc = 29.97002997002997, kFilm = 23.976023976023978;
    const double rates[] = {kPal, kNtsc, kNtsc, 24, kFilm, kFilm, 2 * kPal, 2 * kNtsc, 2 * kNtsc, 12.5, 15, 12, 30, 60};
    for (ulong32 sys = 0; sys < 14; ++sys) {
        EXPECT_EQ(T::FramerateOf(sys), rates[sys]);
        EXPECT_EQ(T(0LL, sys).BULen(), std::fmod(rates[sys], 1) > 0.6 ? 1.001 / 1200.0 : 1 / 1200.0);
        const bool drop = sys == 2 || sys == 5 || sys == 8, plain = sys == 1 || sys == 4 || sys == 7;
        EXPECT_EQ(T::GetDFSystem(sys), plain ? sys + 1 : kUnassigned);
        EXPECT_EQ(T::GetNDFSystem(sys), drop ? sys - 1 : kUnassigned);
        // Intended: timecode-pal-px
        EXPECT_EQ(T::IsDFSystem(sys), drop || sys == 9) << "PAL(PX), too";
    }
    EXPECT_TRUE(*T::GetSystemString(14) == 0 && T::NormalizeSystem(0x1000E) == 0x30000);
    EXPECT_TRUE(!T::IsDFSystem(0x10002) && T(0LL, 0x10002).IsDFSystem());
}

// Intended: timecode-rate
TEST(TimecodeSystem, RateLookUpIntended) {
    const std::pair<double, ulong32> rates[] = {{60, 13},   {12.5, 11},           {-1, 11},
                                                {29.98, 1}, {29.97, kUnassigned}, {25.0, kUnassigned},
                                                {23.98, 4}, {59.95, 7},           {kNan, kUnassigned}};
    for (const auto& [rate, sys] : rates) EXPECT_EQ(T::GetBestTCSystem(rate), sys) << rate;

    const ulong32 fractions[][3] = {
        {30000, 1001, 1},      {60000, 1001, 7},    {25, 2, 9},           {60, 1, 13},
        {120, 2, 13},          {12, 1, 11},         {50, 2, kUnassigned}, {60000, 2002, kUnassigned},
        {120, 1, kUnassigned}, {0, 0, kUnassigned}, {1, 0, kUnassigned},  {4294967280u, 71582788, 13}};
    for (const auto& [num, den, sys] : fractions) EXPECT_EQ(T::GetTCSystemOf(num, den), sys) << num << "/" << den;

    ulong32 list[14] = {};
    EXPECT_TRUE(T::GetFramerateTCList(list, 3) == 3 && list[3] == 0 && T::GetFramerateTCList(list, 99) == 14);
    for (std::size_t i = 1; i < 14; ++i) EXPECT_LE(T::FramerateOf(list[i - 1]), T::FramerateOf(list[i]));
}
