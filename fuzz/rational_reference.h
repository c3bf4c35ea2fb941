#pragma once
// Fractions of 128-bit integers that follow the rules literally, log lines included, to compare the library's with.

#include <algorithm>
#include <string>
#include <TAVO/develop.h>
#include <TAVO/math.h>
#include <utility>

namespace reference {

using TAVO::long32;
using TAVO::Math::CRational;

__extension__ typedef __int128 Wide;

constexpr Wide kLimit = 1073741823;

struct Fraction {
    Wide n, d;
    std::string lines; // that making it wrote
    bool operator==(const Fraction& o) const { return n == o.n && d == o.d && lines == o.lines; }
};

// Gathers the log lines that fractions write.
inline std::string g_lines;
inline void Gather(_acfDebugLevel level, const wchar_t* category, const char* source, long32, const wchar_t* format,
                   std::va_list) {
    const bool placed = level == acfDebugInfo && category && std::equal(category, category + 5, L"TAVO") && source &&
                        std::string(source) == "source/TAVO/crational";
    g_lines += placed ? "" : "misplaced ";
    while (*format) g_lines += static_cast<char>(*format++);
}

inline Fraction Fields(const CRational& r) { return {r.num(), static_cast<long32>(r.den()), ""}; }
template <class Make> Fraction Observe(Make make) {
    g_lines.clear();
    TAVO::Develop::SetExternalLogger(Gather);
    Fraction made = Fields(make());
    TAVO::Develop::SetExternalLogger(nullptr);
    made.lines = g_lines;
    return made;
}

inline Wide Gcd(Wide x, Wide y) {
    while (x != 0) y = std::exchange(x, y % x);
    return y;
}
inline Wide Abs(Wide x) { return x < 0 ? -x : x; }
inline Wide Low32(Wide x) { return static_cast<long32>(static_cast<TAVO::ulong32>(x)); }

inline Fraction Bounded(Wide n, Wide d, char operation) {
    if (Abs(n) <= kLimit && d <= kLimit) return {Low32(n), Low32(d), ""};
    return {1, 0, std::string("CRational::operator ") + operation + "(): Result exceeded definition space"};
}

inline Fraction Normalized(Wide n, Wide d) {
    if (d == 0) return {1, 0, ""};
    const Wide sign = (n < 0) != (d < 0) ? -1 : 1, g = Gcd(Abs(n), Abs(d));
    n = Abs(n) / g, d = Abs(d) / g;
    if (n > kLimit || d > kLimit) return {1, 0, "CRational::_normalize(): components exceed definition space"};
    return {sign * n, d, ""};
}

inline Fraction Sum(const Fraction& a, const Fraction& b) {
    const Wide d = Gcd(a.d, b.d);
    if (d == 0) return {1, 0, ""};
    const Wide ad = a.d / d, n = b.d / d * a.n + b.n * ad, g = Abs(Gcd(n, d));
    return Bounded(n / g, b.d / g * ad, '+');
}

inline Fraction Product(const Fraction& a, const Fraction& b) {
    const Wide g1 = Gcd(a.n, b.d), g2 = Gcd(b.n, a.d);
    if (g1 == 0 || g2 == 0) return {1, 0, ""};
    return Bounded(a.n / g1 * (b.n / g2), a.d / g2 * (b.d / g1), '*');
}

inline Fraction Negated(const Fraction& a) { return {Low32(-a.n), a.d, ""}; }
inline Fraction Reciprocal(const Fraction& a) {
    return a.n < 0 ? Fraction{Low32(-a.d), Low32(-a.n), ""} : Fraction{a.d, a.n, ""};
}

// Whether the library calculates and orders these two as the reference does.
inline bool AgreesOn(const CRational& a, const CRational& b) {
    const Fraction ra = Fields(a), rb = Fields(b), quotient = Product(ra, Reciprocal(rb));
    bool less = ra.n < 0, greater = rb.n < 0;
    if (less == greater) {
        const bool bothZero = ra.n == 0 && rb.n == 0;
        less = !bothZero && quotient.d < Abs(quotient.n);
        greater = !bothZero && quotient.d > Abs(quotient.n);
    }
    return Observe([&] { return a + b; }) == Sum(ra, rb) && Observe([&] { return a - b; }) == Sum(ra, Negated(rb)) &&
           Observe([&] { return a * b; }) == Product(ra, rb) && Observe([&] { return a / b; }) == quotient &&
           (a < b) == less && (a > b) == greater && (a <= b) == (less || a == b) && (a >= b) == (greater || a == b);
}

} // namespace reference
