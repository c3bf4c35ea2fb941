// Fractions against a 128-bit reference that follows the rules literally, log lines included.

#include <algorithm>
#include <climits>
#include <cmath>
#include <gtest/gtest.h>
#include <limits>
#include <random>
#include <string>
#include <TAVO/develop.h>
#include <TAVO/math.h>
#include <utility>
#include <vector>

using namespace TAVO;
using TAVO::Math::CRational;

namespace {

__extension__ typedef __int128 Wide;

// Gathers the log lines that fractions write.
std::string g_lines;
void Gather(_acfDebugLevel level, const wchar_t* category, const char* source, long32, const wchar_t* format,
            std::va_list) {
    const bool placed = level == acfDebugInfo && category && std::equal(category, category + 5, L"TAVO") && source &&
                        std::string(source) == "source/TAVO/crational";
    g_lines += placed ? "[" : "[misplaced ";
    while (*format) g_lines += static_cast<char>(*format++);
    g_lines += "]";
}

constexpr Wide kLimit = 1073741823;

struct Reference {
    Wide n, d;
    std::string lines;

    bool operator==(const Reference& o) const { return n == o.n && d == o.d && lines == o.lines; }
    friend std::ostream& operator<<(std::ostream& out, const Reference& r) {
        return out << static_cast<long long>(r.n) << "/" << static_cast<long long>(r.d) << " " << r.lines;
    }
};

Wide Gcd(Wide x, Wide y) {
    while (x != 0) y = std::exchange(x, y % x);
    return y;
}
Wide Abs(Wide x) { return x < 0 ? -x : x; }
Wide Low32(Wide x) { return static_cast<long32>(static_cast<ulong32>(x)); }

Reference Bounded(Wide n, Wide d, const char* line) {
    if (-n > kLimit || n > kLimit || d > kLimit) return {1, 0, line};
    return {Low32(n), Low32(d), ""};
}

Reference Normalized(Wide n, Wide d) {
    if (d == 0) return {1, 0, ""};
    const Wide sign = (n < 0) != (d < 0) ? -1 : 1;
    const Wide g = Gcd(Abs(n), Abs(d));
    n = Abs(n) / g, d = Abs(d) / g;
    if (n > kLimit || d > kLimit) return {1, 0, "[CRational::_normalize(): components exceed definition space]"};
    return {sign * n, d, ""};
}

Reference Sum(const Reference& a, const Reference& b) {
    const Wide d = Gcd(a.d, b.d);
    if (d == 0) return {1, 0, ""};
    const Wide ad = a.d / d, bd = b.d / d, n = bd * a.n + b.n * ad, g = Abs(Gcd(n, d));
    return Bounded(n / g, b.d / g * ad, "[CRational::operator +(): Result exceeded definition space]");
}

Reference Product(const Reference& a, const Reference& b) {
    const Wide g1 = Gcd(a.n, b.d), g2 = Gcd(b.n, a.d);
    if (g1 == 0 || g2 == 0) return {1, 0, ""};
    return Bounded(a.n / g1 * (b.n / g2), a.d / g2 * (b.d / g1),
                   "[CRational::operator *(): Result exceeded definition space]");
}

Reference Negated(const Reference& a) { return {Low32(-a.n), a.d, ""}; }
Reference Reciprocal(const Reference& a) {
    return a.n < 0 ? Reference{Low32(-a.d), Low32(-a.n), ""} : Reference{a.d, a.n, ""};
}

template <class Make> Reference Observe(Make make) {
    g_lines.clear();
    Develop::SetExternalLogger(Gather);
    const CRational r = make();
    Develop::SetExternalLogger(nullptr);
    return {r.num(), static_cast<long32>(r.den()), g_lines};
}
Reference Fields(const CRational& r) { return {r.num(), static_cast<long32>(r.den()), ""}; }

void CheckPair(const CRational& a, const CRational& b) {
    const Reference ra = Fields(a), rb = Fields(b), quotient = Product(ra, Reciprocal(rb));
    const auto what = ::testing::Message() << ra << " and " << rb;
    EXPECT_EQ(Observe([&] { return a + b; }), Sum(ra, rb)) << what;
    EXPECT_EQ(Observe([&] { return a - b; }), Sum(ra, Negated(rb))) << what;
    EXPECT_EQ(Observe([&] { return a * b; }), Product(ra, rb)) << what;
    EXPECT_EQ(Observe([&] { return a / b; }), quotient) << what;

    bool less = ra.n < 0, greater = rb.n < 0;
    if ((ra.n < 0) == (rb.n < 0)) {
        const bool bothZero = ra.n == 0 && rb.n == 0;
        less = !bothZero && quotient.d < Abs(quotient.n);
        greater = !bothZero && quotient.d > Abs(quotient.n);
    }
    EXPECT_EQ(a < b, less) << what;
    EXPECT_EQ(a > b, greater) << what;
    EXPECT_EQ(a <= b, less || a == b) << what;
    EXPECT_EQ(a >= b, greater || a == b) << what;
}

} // namespace

TEST(Rational, BoundaryAndRandomPairsAgainstTheReference) {
    const long32 edges[] = {0,           1,           -1,      2,          3,          -4,
                            6,           1001,        30000,   1073741822, 1073741823, 1073741824,
                            -1073741823, -1073741824, INT_MAX, INT_MIN,    INT_MIN + 1};
    std::vector<CRational> values;
    for (long32 n : edges)
        for (long32 d : edges) {
            EXPECT_EQ(Observe([=] { return CRational(n, d); }), Normalized(n, d)) << n << "/" << d;
            CRational r;
            EXPECT_EQ(r.assign(n, d), d != 0);
            EXPECT_EQ(Fields(r), Fields(CRational(n, d)));
            values.push_back(r);
        }
    values.push_back(-CRational(1, 0));
    values.push_back(CRational(-2, 3) * CRational(3, 4)); // carries its sign below
    CRational wrapped;
    wrapped.fassign(1073741823.5 / 2, 2147483647); // not normalised, and outside the definition space
    values.push_back(wrapped);
    for (const CRational& a : values)
        for (const CRational& b : values) CheckPair(a, b);

    std::mt19937 random(7);
    const auto number = [&] { return static_cast<long32>(random()) >> random() % 31; };
    for (int i = 0; i < 100000 && !HasFailure(); ++i)
        CheckPair(CRational(number(), number()), CRational(number(), number()));
}

TEST(Rational, IntegersAndDoublesOnEitherSide) {
    const CRational half(1, 2), infinite(1, 0);
    EXPECT_TRUE(half + 1 == CRational(3, 2) && 1 - half == half && half * 4 == CRational(2) &&
                3 / half == CRational(6));
    EXPECT_NE(Observe([&] { return half + 1073741824; }).lines, "");
    EXPECT_TRUE(~CRational(0) == infinite && ~CRational(-2, 3) == CRational(-3, 2));
    EXPECT_TRUE(half == 0.5 && half < 0.6 && half > 0.4 && half <= 0.5 && half >= 0.5);
    EXPECT_TRUE(std::isinf(infinite.fract()));
    EXPECT_FALSE(infinite.isNormal() || !CRational() || !infinite);
}

TEST(Rational, OrderOfNonNegativeFractionsIntended) {
    EXPECT_TRUE(CRational(3, 4) < CRational(1, 2) && !(CRational(1, 2) < CRational(3, 4)));
    EXPECT_FALSE(CRational(0) < CRational(1, 2));
    EXPECT_TRUE(CRational(-3, 4) < CRational(-1, 2) && CRational(-1, 2) < CRational(1, 2));
}

TEST(Rational, SignOfProductsIntended) {
    const CRational product = CRational(-2, 3) * CRational(3, 4);
    EXPECT_EQ(Fields(product), (Reference{1, -2, ""}));
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
    const Row rows[] = {{kPi, 1000, 355, 113, true},
                        {-kPi, 100, -311, 99, true},
                        {29.97002997, 1001, 30000, 1001, true},
                        {-0.0, 5, 0, 1, true},
                        {0.3, 1, 0, 1, true},
                        {0.7, 1, 1, 1, true},
                        {1073741823.0, 10, 1073741823, 1, true},
                        {1073741823.5, 10, 1, 0, false},
                        {2e9, 10, 1, 0, false},
                        {0.5, 0, 1, 0, true},
                        {0.5, INT_MIN, 1, 0, true},
                        {kInfinity - kInfinity, 10, 1, 0, false},
                        {-kInfinity, 10, 1, 0, false},
                        {1e-310, INT_MAX, 0, 1, true}};
    for (const Row& row : rows) {
        CRational r(7, 5);
        EXPECT_EQ(r.fassign(row.x, row.maxDen), row.result) << row.x;
        EXPECT_EQ(Fields(r), (Reference{row.n, row.d, ""})) << row.x;
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
