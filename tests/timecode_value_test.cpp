// Timecode values: arithmetic, order, rounding to frames, days, rates.

#include <climits>
#include <cmath>
#include <gtest/gtest.h>
#include <limits>
#include <string>
#include <TAVO/timecode.h>
#include <vector>

using namespace TAVO;
using namespace TAVO::TimeCode;

namespace {

constexpr double kNan = std::numeric_limits<double>::quiet_NaN();
constexpr double kInfinity = std::numeric_limits<double>::infinity();

// Count and word, for comparing values whole: operator== takes any two invalid values for equal.
struct Whole {
    long long count;
    ulong32 sys;
    bool operator==(const Whole& o) const { return count == o.count && sys == o.sys; }
    friend std::ostream& operator<<(std::ostream& out, const Whole& w) {
        return out << w.count << " sys 0x" << std::hex << w.sys << std::dec;
    }
};
Whole Of(const timecode& t) { return {static_cast<long long>(t), t.sys()}; }

struct ResultRow {
    const char* name;
    timecode result;
    Whole expected;
};
template <std::size_t N> void Check(const ResultRow (&rows)[N]) {
    for (const ResultRow& row : rows) EXPECT_EQ(Of(row.result), row.expected) << row.name;
}

const timecode kNothing;
const timecode kBroken(7LL, kInvalid);

} // namespace

TEST(Timecode, Construction) {
    const ResultRow rows[] = {
        {"one field", timecode(1, 0), {24, 0}},
        {"one field of another width", timecode(short(1), 0), {24, 0}},
        {"64-bit integers are base units", timecode(std::int64_t(1), 0), {1, 0}},
        {"one second", timecode(1.0, 0), {1200, 0}},
        {"one second of longer units", timecode(1.0, 1), {1199, 1}},
        {"half a unit", timecode(0.5 / 1200, 0), {1, 0}},
        {"minus half a unit", timecode(-0.5 / 1200, 0), {-1, 0}},
        {"seconds above the range", timecode(1e300, 0), {LLONG_MAX, 0}},
        {"seconds below the range", timecode(-kInfinity, 0), {-LLONG_MAX, 0}},
        {"units above the range", timecode(9e18, 0), {LLONG_MAX, 0}},
        {"not a number", timecode(kNan, 3), {0, kInvalid}},
        {"unassigned has no count", timecode(5LL, kUnassigned | 3), {0, kUnassigned | 3}},
        {"no such system", timecode(5LL, 15), {0, kUnassigned}},
        {"an invalid count stays", timecode(5LL, kInvalid | 3), {5, kInvalid | 3}},
        {"invalid fields have none", timecode(5, kInvalid | 3), {0, kInvalid | 3}},
        {"invalid seconds have none", timecode(5.0, kInvalid | 3), {0, kInvalid | 3}},
        {"from a label", timecode(0, 1, 0, 2, 2), {72000, 2}},
        {"from a skipped label", timecode(0, 1, 0, 1, 2), {0, kInvalid | 2}},
    };
    Check(rows);
}

TEST(Timecode, Conversions) {
    EXPECT_EQ(static_cast<long32>(timecode(12LL, 0)), 1);
    EXPECT_EQ(static_cast<long32>(timecode(-12LL, 0)), -1);
    EXPECT_EQ(static_cast<long32>(timecode(11LL, 0)), 0);
    EXPECT_EQ(static_cast<long32>(kBroken), 0);
    EXPECT_EQ(static_cast<long long>(kBroken), 7);
    EXPECT_EQ(static_cast<double>(timecode(1200LL, 4)), 1200 * (1.001 / 1200.0));
    EXPECT_EQ(static_cast<double>(kBroken), 0.0);

    const timecode back(-49LL, 0);
    EXPECT_EQ(back.Frames(0, 1), -2);
    EXPECT_EQ(back.Frames(0, 0), -1);
    EXPECT_EQ(back.Fields(0, 5), -2);
    EXPECT_EQ(timecode(72LL, 0).Frames(0, 0), 2) << "halves away from zero";
    EXPECT_EQ(back.Frames(14, 0), 0);
    EXPECT_EQ(kBroken.Frames(0, 0), 0);
    EXPECT_EQ(timecode(LLONG_MIN, 0).Frames(0, 1), static_cast<long32>(0 - ((1ULL << 63) + 47) / 48));
    EXPECT_TRUE(!kNothing);
    EXPECT_TRUE(kNothing.IsDefined());
    EXPECT_FALSE(!kBroken);
}

TEST(Timecode, UnsignedUnitsIntended) {
    EXPECT_EQ(timecode(-48LL, 0).Frames(0, -1), static_cast<long32>((0ULL - 48) / 48));
    EXPECT_EQ(timecode(95LL, 0).Frames(0, -1), 1);
}

TEST(Timecode, AddingAndSubtracting) {
    const timecode pal(48LL, 0), film(100LL, 3);
    const ResultRow rows[] = {
        {"keeps the left system", pal + film, {148, 0}},
        {"base units", pal - 1LL, {47, 0}},
        {"fields", pal + 1, {72, 0}},
        {"seconds", pal + 1.0, {1248, 0}},
        {"fields on the left", 1 + pal, {72, 0}},
        {"units on the left", 1LL - film, {-99, 3}},
        {"seconds on the left", 1.0 - film, {1100, 3}},
        {"too many fields", pal + INT_MAX, {48, kInvalid}},
        {"not a number", pal - kNan, {48, kInvalid}},
        {"unassigned left", kNothing + film, {100, 3}},
        {"unassigned left, number", kNothing + 5LL, {0, kUnassigned}},
        {"unassigned right", film + kNothing, {100, 3}},
        {"unassigned right of minus", film - kNothing, {100, 3}},
        {"unassigned left of minus", kNothing - film, {0, kUnassigned}},
        {"invalid right", film + kBroken, {100, kInvalid | 3}},
        {"invalid right of minus", film - kBroken, {100, kInvalid | 3}},
        {"invalid left", kBroken + film, {107, kInvalid}},
        {"invalid left, units", kBroken + 1LL, {8, kInvalid}},
        {"invalid left, fields", kBroken + 1, {7, kInvalid}},
        {"invalid left of minus", kBroken - film, {7, kInvalid}},
        {"beyond the top", timecode(LLONG_MAX, 3) + 1LL, {LLONG_MIN, kInvalid | 3}},
        {"beyond the bottom", timecode(LLONG_MIN, 3) - 1LL, {LLONG_MAX, kInvalid | 3}},
        {"negated", -film, {-100, 3}},
        {"negated bottom", -timecode(LLONG_MIN, 3), {LLONG_MIN, kInvalid | 3}},
        {"negated broken", -kBroken, {7, kInvalid}},
        {"magnitude", tcabs(-film), {100, 3}},
        {"magnitude of the bottom", tcabs(timecode(LLONG_MIN, 3)), {LLONG_MIN, kInvalid | 3}},
    };
    Check(rows);
    timecode t = film;
    EXPECT_EQ(Of(t++), Of(film));
    EXPECT_EQ(Of(++t), (Whole{200, 3}));
    EXPECT_EQ(Of(--t), (Whole{150, 3}));
    EXPECT_EQ(Of(t--), (Whole{150, 3}));
    const timecode& same = t;
    t -= same;
    EXPECT_EQ(Of(t), (Whole{0, 3}));
    timecode end(LLONG_MAX, 3);
    EXPECT_EQ(Of(++end), (Whole{LLONG_MIN + 49, kInvalid | 3}));
    EXPECT_EQ(Of(++end), (Whole{LLONG_MIN + 49, kInvalid | 3}));
}

TEST(Timecode, Scaling) {
    const timecode t(100LL, 3), bottom(LLONG_MIN, 3);
    const ResultRow rows[] = {
        {"times", t * 3, {300, 3}},
        {"times on the left", -3 * t, {-300, 3}},
        {"over, truncating", timecode(-100LL, 3) / 3, {-33, 3}},
        {"over zero", t / 0, {0, kInvalid}},
        {"bottom over minus one", bottom / -1, {LLONG_MIN, kInvalid | 3}},
        {"bottom times minus one", bottom * -1, {LLONG_MIN, kInvalid | 3}},
        {"times a double", t * 0.555, {56, 3}},
        {"over a double", t / 0.3, {333, 3}},
        {"over the least double", t / 0.000001, {100000000, 3}},
        {"over a smaller double", t / 0.0000009, {0, kInvalid}},
        {"over a negative double", t / -2.0, {0, kInvalid}},
        {"over not-a-number", t / kNan, {0, kInvalid}},
        {"times not-a-number", t * kNan, {0, kInvalid}},
        {"times infinity", t * kInfinity, {LLONG_MAX, kInvalid | 3}},
        {"times minus infinity", t * -kInfinity, {-LLONG_MAX, kInvalid | 3}},
        {"scaled", timecode::Scale(t, 1, 3, false), {33, 3}},
        {"scaled half up", timecode::Scale(t, 1, 8, true), {13, 3}},
        {"scaled half down", timecode::Scale(t, -1, 8, true), {-13, 3}},
        {"scaled by a negative denominator", timecode::Scale(t, 1, -8, true), {-13, 3}},
        {"scaled by the least denominator", timecode::Scale(t, 1, INT_MIN, true), {0, 3}},
        {"scaled over zero", timecode::Scale(t, 1, 0, true), {0, kInvalid | 3}},
        {"scaled to the bound", timecode::Scale(timecode(2147483647LL, 3), 1, 1, false), {2147483647, 3}},
        {"scaled beyond it", timecode::Scale(timecode(2147483648LL, 3), 1, 1, false), {2147483648, kInvalid | 3}},
        {"scaled far below it", timecode::Scale(timecode(-99999999999LL, 3), 1, 1, false), {-99999999999, 3}},
        {"scaled bottom", timecode::Scale(bottom, 1, -1, false), {LLONG_MIN, kInvalid | 3}},
    };
    Check(rows);
    EXPECT_EQ(t / timecode(50LL, 0), 2.0);
    EXPECT_EQ(t / timecode(0LL, 0), 1e300);
    EXPECT_EQ(t / kBroken, 1e300);
    EXPECT_EQ(Of(timecode(-48LL, 0) * 1.0), (Whole{-47, 0})) << "Intended: 0.5 is added to negative results too";
}

TEST(Timecode, Order) {
    const timecode one(1LL, 0), two(2LL, 3), broken2(9LL, kInvalid | 3);
    EXPECT_TRUE(one < two && two > one && one <= two && two >= one && one != two);
    EXPECT_TRUE(one != timecode(1LL, 3) && one <= timecode(1LL, 3) && one >= timecode(1LL, 3));
    EXPECT_TRUE(kBroken > two && two < kBroken && !(kBroken <= two) && !(two >= kBroken));
    EXPECT_TRUE(one == 1LL && 1LL == one && one < 1 && 0 < timecode(24LL, 0) && timecode(24LL, 0) == 1);
    EXPECT_TRUE(timecode(1200LL, 0) == 1.0 && 2.0 >= timecode(1200LL, 0) && timecode(1200LL, 0) != 1.5);
    EXPECT_TRUE(kBroken == 7LL && kBroken == 0 && kBroken == 0.0);
    // Intended: two invalid values are equal, and each is less than the other.
    EXPECT_TRUE(kBroken == broken2 && kBroken < broken2 && broken2 < kBroken && kBroken <= broken2);
    EXPECT_FALSE(kBroken > broken2 || kBroken >= broken2 || kBroken != broken2);
}

TEST(Timecode, RoundingToFramesIntended) {
    struct Row {
        long long count, aligned, trunced, roofed;
    };
    const Row rows[] = {{0, 0, 0, 0},       {1, 0, 0, 48},      {23, 0, 0, 48},      {24, 48, 0, 48},
                        {47, 48, 0, 48},    {48, 48, 48, 48},   {49, 48, 48, 96},    {-1, 0, 0, 48},
                        {-23, 0, 0, 48},    {-24, -48, 0, 48},  {-47, -48, 0, 48},   {-48, -48, -48, -48},
                        {-49, -48, -96, 0}, {-72, -96, -96, 0}, {-96, -96, -96, -96}};
    for (const Row& row : rows) {
        const timecode t(row.count, 0);
        EXPECT_EQ(Of(t.Aligned()), (Whole{row.aligned, 0})) << row.count;
        EXPECT_EQ(Of(t.Trunced()), (Whole{row.trunced, 0})) << row.count;
        EXPECT_EQ(Of(t.Roofed()), (Whole{row.roofed, 0})) << row.count;
        EXPECT_EQ(t.AssertAligned(), row.count % 48 == 0);
        EXPECT_LE(static_cast<long long>(t.MappedTo(0, -1)), row.count);
        EXPECT_GE(static_cast<long long>(t.MappedTo(0, 1)), row.count);
        EXPECT_EQ(Of(t.MappedTo(0, 0)), Of(t.Aligned()));
    }
    const long long top = LLONG_MAX - LLONG_MAX % 48;
    const ResultRow ends[] = {
        {"align at the top", timecode::Align(timecode(LLONG_MAX, 9)), {LLONG_MAX - LLONG_MAX % 96, 9}},
        {"align at the bottom", timecode::Align(timecode(LLONG_MIN, 9)), {LLONG_MAX % 96 - LLONG_MAX, 9}},
        {"trunc at the bottom", timecode::Trunc(timecode(LLONG_MIN, 0)), {-top, kInvalid}},
        {"roof at the top", timecode::Roof(timecode(LLONG_MAX, 0)), {top, kInvalid}},
        {"map at the top", timecode::MapTo(timecode(LLONG_MAX, 0), 0, 1), {top, 0}},
        {"largest frame", timecode::GetMaxFrame(0), {top, 0}},
        {"smallest frame", timecode::GetMinFrame(0), {-top, 0}},
        {"largest frame of no system", timecode::GetMaxFrame(14), {0, kUnassigned}},
        {"align to an unassigned system", timecode(47LL, 0).AlignedToSystem(kUnassigned | 3), {0, kUnassigned | 3}},
        {"align an unassigned value", kNothing.AlignedToSystem(3), {0, kUnassigned | 3}},
        {"align an invalid value", kBroken.AlignedToSystem(3), {7, kInvalid | 3}},
        {"trunc an invalid value", kBroken.TruncedToSystem(3), {7, kInvalid | 3}},
        {"roof to an invalid system", timecode(1LL, 0).RoofedToSystem(kInvalid | 3), {1, kInvalid | 3}},
        {"align to film", timecode(74LL, 0).AlignedToSystem(3), {50, 3}},
        {"up", timecode(50LL, 0).Upconverted(0), {48, 6}},
        {"down", timecode(24LL, 6).Downconverted(-1), {0, 0}},
        {"down, later", timecode(20LL, 8).Downconverted(1), {40, 2}},
        {"no counterpart", timecode(49LL, 6).Upconverted(0), {49, 6}},
        {"no counterpart down", timecode(49LL, 9).Downconverted(0), {49, 9}},
        {"up, flagged", timecode(49LL, kInvalid | 1).Upconverted(0), {49, kInvalid | 7}},
        {"re-timed", timecode(120000LL, 1).XlatedToSystem(0), {120120, 0}},
        {"re-timed back", timecode(-120120LL, 0).XlatedToSystem(4), {-120000, 4}},
        {"re-timed between equal units", timecode(LLONG_MAX, 1).XlatedToSystem(8), {LLONG_MAX, 8}},
        {"re-timed out of range", timecode(LLONG_MIN, 1).XlatedToSystem(0), {-LLONG_MAX, kInvalid}},
        {"re-timed, flagged", kBroken.XlatedToSystem(3), {7, kInvalid | 3}},
    };
    Check(ends);
    EXPECT_FALSE(timecode(0LL, 0).AssertAlignedToSystem(kUnassigned));
    EXPECT_FALSE(kBroken.AssertAlignedToSystem(0));
}

TEST(Timecode, Days) {
    const ResultRow rows[] = {
        {"clip", timecode(103680048LL, 0).Clipped(), {48, 0}},
        {"clip a negative", timecode(-103680048LL, 0).Clipped(), {-48, 0}},
        {"clip an invalid", kBroken.Clipped(), {7, kInvalid}},
        {"clip at the bottom", timecode(LLONG_MIN, 3).Clipped(), {-(LLONG_MAX % 103680000 / 50 * 50), 3}},
        {"wrap", timecode(-48LL, 0).Wrapped(), {103679952, 0}},
        {"wrap drop frame", timecode(-40LL, 2).Wrapped(), {103576280, 2}},
        {"wrap film", timecode(-50LL, 5).Wrapped(), {103571950, 5}},
        {"wrap a whole day", timecode(-103680000LL, 0).Wrapped(), {0, 0}},
        {"wrap an invalid", kBroken.Wrapped(), {7, kInvalid}},
        {"unassign", timecode(5LL, 3).Unassign(), {0, kUnassigned}},
        {"unassign to a system", timecode(5LL, 3).Unassign(kInvalid | 4), {0, kUnassigned | 4}},
        {"unassign to no system", timecode(5LL, 3).Unassign(15), {0, kUnassigned}},
    };
    Check(rows);
}

TEST(Timecode, SlippingByFieldsIntended) {
    const long long steps[] = {0,          2073600000, 2071526400, 0, 0, 0,          1244160000,
                               1036800000, 1035763200, 0,          0, 0, 2073600000, 1036800000};
    for (ulong32 sys = 0; sys < 14; ++sys) {
        EXPECT_EQ(Of(timecode::GetMaxTC(sys)), (Whole{steps[sys], steps[sys] ? sys : kInvalid}));
        EXPECT_EQ(Of(timecode(7LL, sys).Slipped(-2)), (Whole{7 - 2 * steps[sys], steps[sys] ? sys : kInvalid | sys}));
    }
    EXPECT_EQ(Of(timecode::GetMaxTC(kUnassigned | 2)), (Whole{0, kUnassigned | 2}));
    EXPECT_EQ(Of(timecode::Slip(timecode(0LL, kUnassigned | 2), 1)), (Whole{0, kUnassigned | 2}));
    EXPECT_EQ(Of(kBroken.Slipped(1)), (Whole{7, kInvalid}));
    EXPECT_EQ(timecode(LLONG_MIN, 12).Slipped(INT_MIN).sys(), kInvalid | 12);
}

TEST(Timecode, Choosing) {
    const long long day = 103680000;
    const timecode lo(1000LL, 0), hi(2000LL, 3);
    const ResultRow rows[] = {
        {"inside", timecode::Bias(timecode(1500LL, 1), lo, hi), {1500, 1}},
        {"at the bound", timecode::Bias(timecode(2000LL, 1), lo, hi), {2000, 1}},
        {"folded from above", timecode::Bias(timecode(day + 1480, 0), lo, hi), {1480, 0}},
        {"folded from below", timecode::Bias(timecode(1480 - day, 0), lo, hi), {1480, 0}},
        {"bounds exchanged", timecode::Bias(timecode(1480 - day, 0), hi, lo), {1480, 0}},
        {"above", timecode::Bias(timecode(2041LL, 1), lo, hi), {2000, 3}},
        {"below", timecode::Bias(timecode(-1LL, 1), lo, hi), {1000, 0}},
        {"invalid", timecode::Bias(kBroken, lo, hi), {2000, 3}},
        {"unassigned bound", timecode::Bias(timecode(5LL, 1), kNothing, hi), {5, 1}},
        {"nearer to a", timecode::RoundTo(timecode(1400LL, 1), lo, hi), {1000, 0}},
        {"nearer to b", timecode::RoundTo(timecode(1501LL, 1), lo, hi), {2000, 3}},
        {"as near", timecode::RoundTo(timecode(1500LL, 1), hi, lo), {2000, 3}},
        {"only b", timecode::RoundTo(timecode(0LL, 1), kNothing, hi), {2000, 3}},
        {"only a", timecode::RoundTo(timecode(0LL, 1), lo, kNothing), {1000, 0}},
        {"neither", timecode::RoundTo(timecode(5LL, 1), kNothing, kNothing), {5, 1}},
        {"unassigned", timecode::RoundTo(kNothing, lo, hi), {0, kUnassigned}},
    };
    Check(rows);
    timecode own(3000LL, 0);
    EXPECT_EQ(Of(own.Bias(lo, own)), (Whole{3000, 0}));
}

TEST(TimecodeSystem, FactsOfTheTable) {
    const char* names[] = {"PAL",    "NTSC",       "NTSC(DF)", "FILM",     "HDFILM",   "HDFILM(DF)", "HD50",
                           "HDNTSC", "HDNTSC(DF)", "PAL(PX)",  "NTSC(PX)", "FILM(PX)", "HD30",       "HD60"};
    const double rates[] = {25.0,
                            29.97002997002997,
                            29.97002997002997,
                            24.0,
                            23.976023976023978,
                            23.976023976023978,
                            50.0,
                            59.94005994005994,
                            59.94005994005994,
                            12.5,
                            15.0,
                            12.0,
                            30.0,
                            60.0};
    for (ulong32 sys = 0; sys < 14; ++sys) {
        std::string name;
        for (const wchar_t* c = timecode::GetSystemString(sys); *c; ++c) name += static_cast<char>(*c);
        EXPECT_EQ(name, names[sys]);
        EXPECT_EQ(timecode::FramerateOf(sys), rates[sys]);
        const bool slow = sys == 1 || sys == 2 || sys == 4 || sys == 5 || sys == 7 || sys == 8;
        EXPECT_EQ(timecode(0LL, sys).BULen(), slow ? 1.001 / 1200.0 : 1 / 1200.0);
        EXPECT_EQ(timecode::GetFrameBU(sys), 2 * timecode::GetFieldBU(sys));
    }
    EXPECT_EQ(*timecode::GetSystemString(14), L'\0');
    EXPECT_EQ(timecode::NormalizeSystem(0x1000E), 0x30000u);
    EXPECT_EQ(timecode::NormalizeSystem(0x1000D), 0x1000Du);

    const ulong32 pairs[][2] = {{1, 2}, {4, 5}, {7, 8}};
    for (const auto& [plain, drop] : pairs) {
        EXPECT_EQ(timecode::GetDFSystem(plain), drop);
        EXPECT_EQ(timecode::GetNDFSystem(drop), plain);
        EXPECT_EQ(timecode::GetDFSystem(drop), kUnassigned);
        EXPECT_EQ(timecode::GetNDFSystem(plain), kUnassigned);
        EXPECT_TRUE(timecode::IsDFSystem(drop) && !timecode::IsDFSystem(plain));
    }
    EXPECT_EQ(timecode::GetNDFSystem(kUnassigned), kUnassigned);
    EXPECT_TRUE(timecode::IsDFSystem(9)) << "Intended";
    EXPECT_FALSE(timecode::IsDFSystem(0x10002));
    EXPECT_TRUE(timecode(0LL, 0x10002).IsDFSystem());
}

TEST(TimecodeSystem, RateLookUpIntended) {
    const std::pair<double, ulong32> rates[] = {
        {60, 13},
        {1e300, 13},
        {12.5, 11},
        {0, 11},
        {-1, 11},
        {29.98, 1},
        {29.97, kUnassigned},
        {25.0, kUnassigned},
        {29.99, kUnassigned},
        {23.98, 4},
        {59.95, 7},
        {59.99, kUnassigned},
        {kNan, kUnassigned},
    };
    for (const auto& [rate, sys] : rates) EXPECT_EQ(timecode::GetBestTCSystem(rate), sys) << rate;

    const ulong32 fractions[][3] = {
        {30000, 1001, 1},
        {24000, 1001, 4},
        {60000, 1001, 7},
        {25, 2, 9},
        {60, 1, 13},
        {120, 2, 13},
        {12, 1, 11},
        {24, 2, 11},
        {25, 1, 0},
        {50, 2, kUnassigned},
        {60000, 2002, kUnassigned},
        {61, 1, kUnassigned},
        {120, 1, kUnassigned},
        {0, 0, kUnassigned},
        {1, 0, kUnassigned},
        {0, 1, kUnassigned},
        {4294967280u, 71582788, 13},
    };
    for (const auto& [num, den, sys] : fractions)
        EXPECT_EQ(timecode::GetTCSystemOf(num, den), sys) << num << "/" << den;

    ulong32 list[14] = {};
    EXPECT_EQ(timecode::GetFramerateTCList(list, 3), 3u);
    EXPECT_EQ(list[3], 0u);
    EXPECT_EQ(timecode::GetFramerateTCList(list, 99), 14u);
    for (std::size_t i = 1; i < 14; ++i) EXPECT_LE(timecode::FramerateOf(list[i - 1]), timecode::FramerateOf(list[i]));
}
