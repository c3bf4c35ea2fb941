#pragma once
// Exact fractions for rates and ratios.
// Threads: plain values without shared state; one object is for one thread at a time.

#include <TAVO/config.h>

namespace TAVO {
namespace Math {

/// A fraction of two signed 32-bit integers, in lowest terms.
///
/// A value is defined while the magnitude of its numerator and its denominator are at most 1073741823 (2^30 - 1). A
/// result beyond that is written to the log ("... exceed definition space") and replaced by the undefined value 1/0;
/// dividing by zero gives the undefined value without a log line. The undefined value spreads through all arithmetic.
///
/// The sign stays in the numerator, with one exception: a product of operands with a negative numerator may carry it in
/// the denominator ((-2/3) * (3/4) is 1/-2). Equality compares the two stored integers, so such a product differs from
/// -1/2.
///
/// Nothing here allocates or throws, and only fract(), fassign() and the comparisons with a double use floating point.
class TAVO_API CRational {
public:
    /// 0/1.
    CRational() noexcept : m_num(0), m_den(1) {}
    CRational(const CRational& other) noexcept = default;
    CRational& operator=(const CRational& other) noexcept = default;
    /// @p n / 1.
    CRational(long32 n) noexcept;
    /// @p n / @p d in lowest terms with a positive denominator; 1/0 when @p d is 0.
    CRational(long32 n, long32 d) noexcept;

    /// Becomes @p n / @p d as the constructor does.
    /// @return false when @p d is 0
    bool assign(long32 n, long32 d) noexcept;

    /// Becomes the best approximation of @p x whose denominator is at most @p maxDen.
    /// @return false, with the value 1/0, when the magnitude of @p x exceeds 1073741823 or @p x is not a number. A
    ///         @p maxDen below 1 gives 1/0 and true.
    bool fassign(double x, long32 maxDen) noexcept;

    /// The numerator; it carries the sign.
    long32 num() const noexcept { return m_num; }
    /// The denominator; 0 marks the undefined value.
    ulong32 den() const noexcept { return static_cast<ulong32>(m_den); }
    /// The value as a double; infinity for the undefined value.
    double fract() const noexcept { return static_cast<double>(m_num) / static_cast<double>(m_den); }
    /// True for every defined value.
    bool isNormal() const noexcept { return m_den != 0; }
    /// True only for 0/0, which no operation makes: false for zero and for the undefined value.
    bool operator!() const noexcept { return m_num == 0 && m_den == 0; }

    CRational& operator+=(const CRational& b) noexcept;
    CRational& operator-=(const CRational& b) noexcept { return *this += Raw(Negated(b.m_num), b.m_den); }
    CRational& operator*=(const CRational& b) noexcept;
    CRational& operator/=(const CRational& b) noexcept { return *this *= ~b; }

    CRational operator+(const CRational& b) const noexcept { return CRational(*this) += b; }
    CRational operator-(const CRational& b) const noexcept { return CRational(*this) -= b; }
    CRational operator*(const CRational& b) const noexcept { return CRational(*this) *= b; }
    CRational operator/(const CRational& b) const noexcept { return CRational(*this) /= b; }

    /// An integer operand stands for the fraction CRational(n).
    CRational operator+(long32 n) const noexcept { return *this + CRational(n); }
    CRational operator-(long32 n) const noexcept { return *this - CRational(n); }
    CRational operator*(long32 n) const noexcept { return *this * CRational(n); }
    CRational operator/(long32 n) const noexcept { return *this / CRational(n); }

    CRational operator-() const noexcept { return Raw(Negated(m_num), m_den); }
    /// The magnitude.
    // Intended (rational-plus): a textbook's unary plus gives the value itself; hosts use this one as their absolute
    // value.
    CRational operator+() const noexcept { return Raw(m_num < 0 ? Negated(m_num) : m_num, m_den); }
    /// The reciprocal; 1/0 for zero, 0/1 for the undefined value.
    CRational operator~() const noexcept { return m_num < 0 ? Raw(Negated(m_den), Negated(m_num)) : Raw(m_den, m_num); }

    /// Whether both stored integers are equal.
    bool operator==(const CRational& b) const noexcept { return m_num == b.m_num && m_den == b.m_den; }

    /// An order of its own: a negative value comes before one that is not. Two negative values are ordered by value,
    /// but of two values that are not negative the larger one counts as less (3/4 < 1/2), and 0 < 1/2 is false. Do not
    /// sort by it. May write the multiplication's message to the log.
    bool operator<(const CRational& b) const noexcept;
    bool operator>(const CRational& b) const noexcept;
    /// operator< or operator>, or equality of the stored integers.
    bool operator<=(const CRational& b) const noexcept { return *this < b || *this == b; }
    bool operator>=(const CRational& b) const noexcept { return *this > b || *this == b; }

    /// Compare fract() with @p x.
    bool operator<(double x) const noexcept { return fract() < x; }
    bool operator>(double x) const noexcept { return fract() > x; }
    bool operator==(double x) const noexcept { return fract() == x; }
    bool operator<=(double x) const noexcept { return fract() <= x; }
    bool operator>=(double x) const noexcept { return fract() >= x; }

private:
    // Takes both integers as they are.
    static CRational Raw(long32 n, long32 d) noexcept {
        CRational r;
        r.m_num = n;
        r.m_den = d;
        return r;
    }
    // Wraps at -2147483648.
    static long32 Negated(long32 n) noexcept { return static_cast<long32>(0u - static_cast<ulong32>(n)); }

    void _normalize() noexcept;
    // Euclid's algorithm with remainders truncated toward zero: the result may be negative.
    static long32 _gcd(long32 x, long32 y) noexcept;
    static long long _gcd64(long long x, long long y) noexcept;

    CRational& Store(long long n, long long d, const wchar_t* message) noexcept;

    long32 m_num;
    long32 m_den; // positive in every normalised value, 0 in the undefined one
};
static_assert(sizeof(CRational) == 8, "two 32-bit integers, exchanged between modules by value");

inline CRational operator+(long32 n, const CRational& r) noexcept { return CRational(n) + r; }
inline CRational operator-(long32 n, const CRational& r) noexcept { return CRational(n) - r; }
inline CRational operator*(long32 n, const CRational& r) noexcept { return CRational(n) * r; }
inline CRational operator/(long32 n, const CRational& r) noexcept { return CRational(n) / r; }

} // namespace Math
} // namespace TAVO
