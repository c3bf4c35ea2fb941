// Exact fractions.

#include <TAVO/develop.h>
#include <TAVO/math.h>

#include <bit>
#include <cmath>
#include <type_traits>

namespace TAVO::Math {

namespace {

constexpr long long kLimit = 1073741823; // largest magnitude of a component: 2^30 - 1
constexpr double kLimitAsDouble = 1073741823.0;

template <class Integer> constexpr auto Magnitude(Integer value) noexcept {
    using Unsigned = std::make_unsigned_t<Integer>;
    return value < 0 ? static_cast<Unsigned>(0 - static_cast<Unsigned>(value)) : static_cast<Unsigned>(value);
}

// Both above zero; without a division.
template <class Unsigned> Unsigned BinaryGcd(Unsigned u, Unsigned v) noexcept {
    const int shift = std::countr_zero(u | v);
    u >>= std::countr_zero(u);
    do {
        v >>= std::countr_zero(v);
        const Unsigned smaller = u < v ? u : v;
        v = u < v ? v - u : u - v;
        u = smaller;
    } while (v != 0);
    return u << shift;
}

// Euclid's algorithm with remainders truncated toward zero. A remainder has the sign of its dividend, so both operands
// keep theirs to the end: it is enough to divide magnitudes, which cannot overflow, and to give the one that remains
// its sign.
template <class Integer> Integer Gcd(Integer x, Integer y) noexcept {
    if (x == 0) return y;
    if (y == 0) return x;
    auto u = Magnitude(x);
    auto v = Magnitude(y);
    if (x > 0 && y > 0) return static_cast<Integer>(BinaryGcd(u, v));
    const auto signedAs = [](auto magnitude, Integer original) {
        return static_cast<Integer>(original < 0 ? 0 - magnitude : magnitude);
    };
    for (;;) {
        v %= u;
        if (v == 0) return signedAs(u, x);
        u %= v;
        if (u == 0) return signedAs(v, y);
    }
}

TAVO_NOINLINE void Report(const wchar_t* message) noexcept {
    Develop::_logWrite(acfDebugInfo, L"TAVO", "source/TAVO/crational", __LINE__, message);
}

// a * b + c, wrapping in 32 bits.
constexpr long32 MultiplyAdd(long32 a, long32 b, long32 c) noexcept {
    return static_cast<long32>(static_cast<ulong32>(a) * static_cast<ulong32>(b) + static_cast<ulong32>(c));
}

} // namespace

long32 CRational::_gcd(long32 x, long32 y) noexcept { return Gcd(x, y); }
long long CRational::_gcd64(long long x, long long y) noexcept { return Gcd(x, y); }

CRational::CRational(long32 n) noexcept : m_num(n), m_den(1) { _normalize(); }
CRational::CRational(long32 n, long32 d) noexcept : m_num(n), m_den(d) { _normalize(); }

bool CRational::assign(long32 n, long32 d) noexcept {
    m_num = n;
    m_den = d;
    _normalize();
    return d != 0;
}

void CRational::_normalize() noexcept {
    if (m_den == 0) {
        m_num = 1;
        return;
    }
    const bool negative = (m_num < 0) != (m_den < 0);
    auto n = Magnitude(m_num);
    auto d = Magnitude(m_den);
    if (d > 1) {
        const auto g = n == 0 ? d : BinaryGcd(n, d);
        n /= g;
        d /= g;
    }
    if (n > kLimit || d > kLimit) {
        Report(L"CRational::_normalize(): components exceed definition space");
        *this = Raw(1, 0);
        return;
    }
    m_num = negative ? -static_cast<long32>(n) : static_cast<long32>(n);
    m_den = static_cast<long32>(d);
}

CRational& CRational::Store(long long n, long long d, const wchar_t* message) noexcept {
    // Intended (rational-low-denominator): a denominator far below zero is not tested, and the fraction is not
    // normalised again. Normalising would make (-2/3) * (3/4) equal to -1/2, which stored products of hosts are not.
    if (TAVO_UNLIKELY(-n > kLimit || n > kLimit || d > kLimit)) {
        Report(message);
        return *this = Raw(1, 0);
    }
    return *this = Raw(static_cast<long32>(n), static_cast<long32>(d));
}

// All intermediate results fit 64 bits: a quotient by the common divisor is at most 2^31, and the two quotients of the
// denominators have no common factor, so they are not both 2^31.
CRational& CRational::operator+=(const CRational& b) noexcept {
    constexpr const wchar_t* message = L"CRational::operator +(): Result exceeded definition space";
    const long long d = _gcd(m_den, b.m_den);
    if (d == 0) return *this = Raw(1, 0);
    if (d == 1) // nothing to reduce
        return Store(static_cast<long long>(b.m_den) * m_num + static_cast<long long>(b.m_num) * m_den,
                     static_cast<long long>(b.m_den) * m_den, message);
    const long long leftShare = m_den / d;
    const long long rightShare = b.m_den / d;
    const long long n = rightShare * m_num + b.m_num * leftShare;
    const long long g =
        _gcd64(static_cast<long long>(Magnitude(n) % Magnitude(d)), static_cast<long long>(Magnitude(d)));
    return Store(n / g, (b.m_den / g) * leftShare, message);
}

CRational& CRational::operator*=(const CRational& b) noexcept {
    // Intended (rational-product-sign): the divisors keep the sign that the remainders leave, so the sign of a product
    // may end in its denominator.
    const long long g1 = _gcd(m_num, b.m_den);
    const long long g2 = _gcd(b.m_num, m_den);
    if (g1 == 0 || g2 == 0) return *this = Raw(1, 0);
    return Store((m_num / g1) * (b.m_num / g2), (m_den / g2) * (b.m_den / g1),
                 L"CRational::operator *(): Result exceeded definition space");
}

// Intended (rational-order): the quotient is ranked by its magnitude, and the other way round than a textbook would, so
// that of two fractions that are not negative the larger one is "less". Hosts rely on the order of lists made with it.
bool CRational::operator<(const CRational& b) const noexcept {
    if ((m_num < 0) != (b.m_num < 0)) return m_num < 0;
    if (m_num == 0 && b.m_num == 0) return false;
    const CRational q = *this / b;
    return q.m_den < (q.m_num < 0 ? -q.m_num : q.m_num);
}

bool CRational::operator>(const CRational& b) const noexcept {
    if ((m_num < 0) != (b.m_num < 0)) return b.m_num < 0;
    if (m_num == 0 && b.m_num == 0) return false;
    const CRational q = *this / b;
    return q.m_den > (q.m_num < 0 ? -q.m_num : q.m_num);
}

// The continued fraction of |x|, cut where the denominator would exceed its bound. h and k are the last convergent,
// previousH and previousK the one before; numerators wrap in 32 bits.
bool CRational::fassign(double x, long32 maxDen) noexcept {
    const double a = std::fabs(x);
    *this = Raw(1, 0);
    if (!(a <= kLimitAsDouble)) return false; // also not-a-number
    if (maxDen < 1) return true;

    long32 previousH = 0, h = 1, previousK = 1, k = 0;
    double value = a;
    auto quotient = static_cast<long32>(value);
    for (;;) {
        const long32 nextH = MultiplyAdd(quotient, h, previousH);
        const long32 nextK = MultiplyAdd(quotient, k, previousK);
        previousH = h, h = nextH;
        previousK = k, k = nextK;
        if (value == quotient) break;
        value = 1.0 / (value - quotient);
        if (value > kLimitAsDouble) break;
        quotient = static_cast<long32>(value);
        if (static_cast<long long>(k) * quotient + previousK > maxDen) break;
    }

    const long32 steps = (maxDen - previousK) / k;
    const long32 nearH = MultiplyAdd(steps, h, previousH);
    const long32 nearK = MultiplyAdd(steps, k, previousK);
    const auto distance = [a](long32 n, long32 d) { return std::fabs(a - static_cast<double>(n) / d); };
    const bool nearer = distance(h, k) > distance(nearH, nearK);
    m_num = nearer ? nearH : h;
    m_den = nearer ? nearK : k;
    if (x < 0) m_num = Negated(m_num);
    return true;
}

} // namespace TAVO::Math
