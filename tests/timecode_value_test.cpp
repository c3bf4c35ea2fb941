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
using T = timecode;

namespace {

constexpr double kNan = std::numeric_limits<double>::quiet_NaN();
constexpr double kInfinity = std::numeric_limits<double>::infinity();

// Count and word, for comparing values whole: operator== takes any two invalid values for equal.
using Whole = std::pair<long long, ulong32>;
Whole Of(const timecode& t) { return {static_cast<long long>(t), t.sys()}; }

struct ResultRow {
    const char* name;
    timecode result;
    Whole expected;
};
void Check(const std::vector<ResultRow>& rows) {
    for (const ResultRow& row : rows) EXPECT_EQ(Of(row.result), row.expected) << row.name;
}

const timecode kNothing;
const timecode kBroken(7LL, kInvalid);

} // namespace

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
