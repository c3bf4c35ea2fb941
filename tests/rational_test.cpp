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

namespace {

auto Both(const CRational& r) { return std::make_pair(r.num(), static_cast<long32>(r.den())); }

} // namespace

// Intended: rational-low-denominator
TEST(Rational, BoundaryAndRandomPairsAgainstTheReference) {
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
    values.push_back(-CRational(1, 0));
    values.push_back(CRational(-2, 3) * CRational(3, 4)); // carries its sign below
    CRational wrapped;
    wrapped.fassign(1073741823.5 / 2, 2147483647); // not normalised, and outside the definition space
    values.push_back(wrapped);
    const auto check = [](const CRational& a, const CRational& b) {
        EXPECT_TRUE(reference::AgreesOn(a, b)) << a.num() << "/" << a.den() << " and " << b.num() << "/" << b.den();
    };
    for (const CRational& a : values)
        for (const CRational& b : values) check(a, b);
}

TEST(Rational, IntegersAndDoublesOnEitherSide) {
    const CRational half(1, 2), infinite(1, 0);
    EXPECT_TRUE(half + 1 == CRational(3, 2) && 1 - half == half && half * 4 == CRational(2) &&
                3 / half == CRational(6));
    EXPECT_NE(reference::Observe([&] { return half + 1073741824; }).lines, "");
    EXPECT_TRUE(~CRational(0) == infinite && ~CRational(-2, 3) == CRational(-3, 2));
    EXPECT_TRUE(half == 0.5 && half < 0.6 && half > 0.4 && half <= 0.5 && half >= 0.5);
    EXPECT_TRUE(std::isinf(infinite.fract()));
    EXPECT_FALSE(infinite.isNormal() || !CRational() || !infinite);
}

// Intended: rational-order, rational-product-sign, rational-plus
TEST(Rational, OrderOfNonNegativeFractionsAndSignOfProductsIntended) {
    EXPECT_TRUE(CRational(3, 4) < CRational(1, 2) && !(CRational(1, 2) < CRational(3, 4)));
    EXPECT_FALSE(CRational(0) < CRational(1, 2));
    EXPECT_TRUE(CRational(-3, 4) < CRational(-1, 2) && CRational(-1, 2) < CRational(1, 2));
    const CRational product = CRational(-2, 3) * CRational(3, 4);
    EXPECT_EQ(Both(product), std::make_pair(long32(1), long32(-2)));
    EXPECT_FALSE(product == CRational(-1, 2));
    EXPECT_EQ(+CRational(-3, 4), CRational(3, 4)) << "unary plus is the magnitude";
}

TEST(Rational, FromDoubles) {
    struct Row {
        double x;
        long32 maxDen, n, d;
        bool result;
    };
    constexpr double kPi = 3.14159265358979, kInfinity = std::numeric_limits<double>::infinity();
    const Row rows[] = {
        {-kPi, 100, -311, 99, true},     {-0.0, 5, 0, 1, true}, {1073741823.0, 10, 1073741823, 1, true},
        {1073741823.5, 10, 1, 0, false}, {0.5, 0, 1, 0, true},  {kInfinity - kInfinity, 10, 1, 0, false},
        {1e-310, INT_MAX, 0, 1, true}};
    for (const Row& row : rows) {
        CRational r(7, 5);
        EXPECT_EQ(r.fassign(row.x, row.maxDen), row.result) << row.x;
        EXPECT_EQ(Both(r), std::make_pair(row.n, row.d)) << row.x;
    }
    // A brute search finds nothing nearer.
    std::mt19937 random(11);
    for (int i = 0; i < 2000; ++i) {
        const double x = std::ldexp(static_cast<double>(random()), -24);
        const auto maxDen = static_cast<long32>(1 + random() % 200);
        CRational r;
        ASSERT_TRUE(r.fassign(x, maxDen));
        ASSERT_LE(r.den(), static_cast<ulong32>(maxDen));
        for (long32 d = 1; d <= maxDen; ++d)
            ASSERT_LE(std::fabs(x - r.fract()), std::fabs(x - std::round(x * d) / d) * (1 + 1e-9) + 1e-15)
                << x << " " << maxDen;
    }
}
