// Fraction arithmetic against 128-bit integers.
// Input: records of four 32-bit integers, two fractions each; their bits are taken as a double as well.

#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <TAVO/math.h>

namespace {

using TAVO::long32;
using TAVO::ulong32;
using TAVO::Math::CRational;

__extension__ typedef __int128 Wide;

void Require(bool condition) {
    if (!condition) std::abort();
}

struct Pair {
    Wide n, d;
};
constexpr Wide kLimit = 1073741823;

Wide Gcd(Wide x, Wide y) {
    if (x == 0) return y;
    for (;;) {
        y %= x;
        if (y == 0) return x;
        x %= y;
        if (x == 0) return y;
    }
}
Wide Abs(Wide x) { return x < 0 ? -x : x; }
Wide Low32(Wide x) { return static_cast<long32>(static_cast<ulong32>(x)); }

Pair Of(const CRational& r) { return {r.num(), static_cast<long32>(r.den())}; }
Pair Bounded(Wide n, Wide d) {
    if (-n > kLimit || n > kLimit || d > kLimit) return {1, 0};
    return {Low32(n), Low32(d)};
}
Pair Normalized(Wide n, Wide d) {
    if (d == 0) return {1, 0};
    const Wide g = Gcd(Abs(n), Abs(d)), sign = (n < 0) != (d < 0) ? -1 : 1;
    if (Abs(n) / g > kLimit || Abs(d) / g > kLimit) return {1, 0};
    return {sign * (Abs(n) / g), Abs(d) / g};
}
Pair Sum(Pair a, Pair b) {
    const Wide d = Gcd(a.d, b.d);
    if (d == 0) return {1, 0};
    const Wide ad = a.d / d, n = b.d / d * a.n + b.n * ad, g = Abs(Gcd(n, d));
    return Bounded(n / g, b.d / g * ad);
}
Pair Product(Pair a, Pair b) {
    const Wide g1 = Gcd(a.n, b.d), g2 = Gcd(b.n, a.d);
    if (g1 == 0 || g2 == 0) return {1, 0};
    return Bounded(a.n / g1 * (b.n / g2), a.d / g2 * (b.d / g1));
}
Pair Reciprocal(Pair a) { return a.n < 0 ? Pair{Low32(-a.d), Low32(-a.n)} : Pair{a.d, a.n}; }

void RequireSame(const CRational& r, Pair expected) { Require(Of(r).n == expected.n && Of(r).d == expected.d); }

void CheckPair(const CRational& x, const CRational& y) {
    const Pair a = Of(x), b = Of(y);
    RequireSame(x + y, Sum(a, b));
    RequireSame(x - y, Sum(a, {Low32(-b.n), b.d}));
    RequireSame(x * y, Product(a, b));
    RequireSame(x / y, Product(a, Reciprocal(b)));
    Require((x <= y) == (x < y || x == y) && (x >= y) == (x > y || x == y));
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    CRational last;
    for (; size >= 16; data += 16, size -= 16) {
        long32 n[4];
        double x;
        std::memcpy(n, data, sizeof(n));
        std::memcpy(&x, data + 8, sizeof(x));
        const CRational a(n[0], n[1]), b(n[2], n[3]);
        RequireSame(a, Normalized(n[0], n[1]));
        CheckPair(a, b);
        CheckPair(last, b);
        last = a * b;

        CRational near;
        const bool inRange = near.fassign(x, n[0]);
        Require(inRange == (std::fabs(x) <= 1073741823.0));
        if (inRange && n[0] >= 1) Require(near.den() >= 1 && near.den() <= static_cast<ulong32>(n[0]));
        CheckPair(near, a);
        CheckPair(last, near);
    }
    return 0;
}
