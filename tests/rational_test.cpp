// Fractions against a 128-bit reference that follows the rules literally, log lines included.

#include "../fuzz/rational_reference.h"

#include <climits>
#include <cmath>
#include <gtest/gtest.h>
#include <limits>
#include <random>
#include <vector>

using namespace TAVO;
using TAVO::Math::CRational;

static auto Both(const CRational& r) { return std::make_pair(r.num(), static_cast<long32>(r.den())); }

// Intended: rational-low-denominator
TEST(Rational, BoundaryPairsAgainstTheReference) {
    const long32 edges[] = {0,           1,           -1,      2,          3,          -4,
                            6,           1001,        30000,   1073741822, 1073741823, 1073741824,
                            -1073741823, -1073741824, INT_MAX, INT_MIN,    INT_MIN + 1};
    std::vector<CRational> values;
    for (long32 n : edges)
        for (long32 d : edges) {
            CRational r;
            EXPECT_TRUE(reference::Observe([=] { return CRational(n, d); }) == reference::Normalized(n, d))
                << n << "/" << d;
            EXPECT_EQ(r.assign(n, d), d != 0);
            EXPECT_EQ(Both(r), Both(CRational(n, d)));
            values.push_back(r);
        }
    CRational wrapped;
    wrapped.fassign(1073741823.5 / 2, 2147483647); // not normalised, and outside the definition space
    // the second carries its sign below
    values.insert(values.end(), {-CRational(1, 0), CRational(-2, 3) * CRational(3, 4), wrapped});
    for (const CRational& a : values)
        for (const CRational& b : values)
            EXPECT_TRUE(reference::AgreesOn(a, b)) << a.num() << "/" << a.den() << " and " << b.num() << "/" << b.den();
}

// Intended: rational-order, rational-product-sign, rational-plus
TEST(Rational, IntegersDoublesOrderAndSignsIntended) {
    const CRational half(1, 2), infinite(1, 0);
    EXPECT_TRUE(half + 1 == CRational(3, 2) && 1 - half == half && half * 4 == CRational(2) &&
                3 / half == CRational(6));
    EXPECT_NE(reference::Observe([&] { return half + 1073741824; }).lines, "");
    EXPECT_TRUE(~CRational(0) == infinite && ~CRational(-2, 3) == CRational(-3, 2));
    EXPECT_TRUE(half == 0.5 && half < 0.6 && half > 0.4 && half <= 0.5 && half >= 0.5);
    EXPECT_FALSE(infinite.isNormal() || !CRational() || !infinite || !std::isinf(infinite.fract()));

    EXPECT_TRUE(CRational(3, 4) < half && !(half < CRational(3, 4)) && !(CRational(0) < half));
    EXPECT_TRUE(CRational(-3, 4) < CRational(-1, 2) && CRational(-1, 2) < half);
    const CRational product = CRational(-2, 3) * CRational(3, 4);
    EXPECT_TRUE(Both(product) == std::make_pair(long32(1), long32(-2)) && !(product == CRational(-1, 2)));
    EXPECT_EQ(+CRational(-3, 4), CRational(3, 4)) << "unary plus is the magnitude";
}

TEST(Rational, FromDoubles) {
    constexpr double kPi = 3.14159265358979, kInfinity = std::numeric_limits<double>::infinity();
    const std::tuple<double, long32, long32, long32, bool> rows[] = {
        {-kPi, 100, -311, 99, true},     {-0.0, 5, 0, 1, true}, {1073741823.0, 10, 1073741823, 1, true},
        {1073741823.5, 10, 1, 0, false}, {0.5, 0, 1, 0, true},  {kInfinity - kInfinity, 10, 1, 0, false},
        {1e-310, INT_MAX, 0, 1, true}};
    for (const auto& [x, maxDen, n, d, result] : rows) {
        CRational r(7, 5);
        EXPECT_TRUE(r.fassign(x, maxDen) == result && Both(r) == std::make_pair(n, d)) << x;
    }
    // A brute search finds nothing nearer.
    std::mt19937 random(11);
    for (int i = 0; i < 2000; ++i) {
        const double x = std::ldexp(static_cast<double>(random()), -24);
        const auto maxDen = static_cast<long32>(1 + random() % 200);
        CRational r;
        ASSERT_TRUE(r.fassign(x, maxDen) && r.den() <= static_cast<ulong32>(maxDen));
        for (long32 d = 1; d <= maxDen; ++d)
            ASSERT_LE(std::fabs(x - r.fract()), std::fabs(x - std::round(x * d) / d) * (1 + 1e-9) + 1e-15)
                << x << " " << maxDen;
    }
}
