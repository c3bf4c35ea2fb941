// Timecode values: arithmetic, rounding to frames, days.

#include "timecode_systems.h"

#include <cmath>
#include <limits>
#include <utility>

namespace TAVO::TimeCode {

using namespace detail;

namespace {

constexpr long long kMax = std::numeric_limits<long long>::max();
constexpr long long kMin = std::numeric_limits<long long>::min();
constexpr double kTwoTo63 = 9223372036854775808.0;

// Truncated toward zero; out of range the end of the range, on the negative side one above it. 0 for not-a-number.
long long Truncate(double value) noexcept {
    if (value >= kTwoTo63) return kMax;
    if (value <= -kTwoTo63) return -kMax;
    return std::isnan(value) ? 0 : static_cast<long long>(value);
}

// Halves away from zero.
long long RoundAway(double value) noexcept { return Truncate(value < 0 ? value - 0.5 : value + 0.5); }

// count / unit: 1 rounds away from zero, -1 divides without a sign, everything else rounds halves away from zero.
long32 CountUnits(long long count, ulong32 unit, int mode) noexcept {
    const auto bits = static_cast<unsigned long long>(count);
    // Intended (timecode-count-units): a textbook would round a negative count down; its unsigned quotient is what
    // hosts have stored.
    if (mode == -1) return static_cast<long32>(bits / unit);
    const unsigned long long magnitude = count < 0 ? 0 - bits : bits;
    const unsigned long long units = (magnitude + (mode == 1 ? unit - 1 : unit / 2)) / unit;
    return static_cast<long32>(count < 0 ? 0 - units : units);
}

} // namespace

timecode::timecode(long long count, ulong32 sys) noexcept : m_count(count), m_sys(Normalize(sys)) {
    if (!IsAssigned()) m_count = 0;
}

timecode::timecode(long32 fields, ulong32 sys) noexcept : m_count(0), m_sys(Normalize(sys)) {
    if (!IsAssigned() || !IsDefined()) return;
    const System& s = RowOf(m_sys);
    const long long bound = s.MaxFields();
    if (fields > bound || fields < -bound)
        m_sys = kInvalid;
    else
        m_count = static_cast<long long>(fields) * s.Field();
}

timecode::timecode(double seconds, ulong32 sys) noexcept : m_count(0), m_sys(Normalize(sys)) {
    if (!IsAssigned() || !IsDefined()) return;
    if (std::isnan(seconds))
        m_sys = kInvalid;
    else
        m_count = RoundAway(seconds / BULen());
}

timecode::operator long32() const noexcept {
    if (IsFlagged(m_sys)) return 0;
    return static_cast<long32>(RoundAway(static_cast<double>(m_count) / GetFieldBU()));
}

timecode::operator double() const noexcept { return IsFlagged(m_sys) ? 0.0 : static_cast<double>(m_count) * BULen(); }

long32 timecode::Fields(ulong32 sys, int mode) const noexcept {
    if (IsFlagged(m_sys) || IsFlagged(Normalize(sys))) return 0;
    return CountUnits(m_count, GetFieldBU(sys), mode);
}

long32 timecode::Frames(ulong32 sys, int mode) const noexcept {
    if (IsFlagged(m_sys) || IsFlagged(Normalize(sys))) return 0;
    return CountUnits(m_count, GetFrameBU(sys), mode);
}

// --- arithmetic ------------------------------------------------------------------------------------------------------

timecode& timecode::Invalidate() noexcept {
    m_sys |= kInvalid;
    return *this;
}

timecode& timecode::AddCount(long long count) noexcept {
    return __builtin_add_overflow(m_count, count, &m_count) ? Invalidate() : *this;
}

timecode& timecode::SubtractCount(long long count) noexcept {
    return __builtin_sub_overflow(m_count, count, &m_count) ? Invalidate() : *this;
}

// Takes a floating-point result, truncated.
timecode& timecode::SetTruncated(double count) noexcept {
    if (std::isnan(count)) return *this = timecode(0LL, kInvalid);
    m_count = Truncate(count);
    return std::fabs(count) < kTwoTo63 ? *this : Invalidate();
}

// Base units are counts whatever the system: they do not take an invalid flag over.
timecode timecode::Operand(long long count) const noexcept { return timecode(count, m_sys & ~kInvalid); }

timecode& timecode::operator+=(const timecode& right) noexcept {
    if (!IsAssigned()) return *this = right;
    return right.IsDefined() ? AddCount(right.m_count) : Invalidate();
}

timecode& timecode::operator-=(const timecode& right) noexcept {
    if (IsFlagged(m_sys) || !right.IsAssigned()) return *this;
    return right.IsDefined() ? SubtractCount(right.m_count) : Invalidate();
}

timecode& timecode::StepFrames(long long frames) noexcept {
    return IsFlagged(m_sys) ? *this : AddCount(frames * GetFrameBU());
}

timecode timecode::operator++(int) noexcept {
    const timecode before = *this;
    ++*this;
    return before;
}

timecode timecode::operator--(int) noexcept {
    const timecode before = *this;
    --*this;
    return before;
}

timecode timecode::operator-() const noexcept {
    if (IsFlagged(m_sys)) return *this;
    return timecode(0LL, m_sys).SubtractCount(m_count);
}

timecode tcabs(const timecode& value) noexcept { return value < 0LL ? -value : value; }

timecode& timecode::Multiply(long long factor) noexcept {
    return __builtin_mul_overflow(m_count, factor, &m_count) ? Invalidate() : *this;
}

// Intended (timecode-half): 0.5 is added to negative results too, so that they are not rounded half away from zero as a
// textbook would.
timecode& timecode::Multiply(double factor) noexcept {
    return SetTruncated(static_cast<double>(m_count) * factor + 0.5);
}

timecode& timecode::Divide(long long divisor) noexcept {
    if (divisor == 0) return *this = timecode(0LL, kInvalid);
    if (divisor == -1) return Multiply(-1LL); // the one quotient that can overflow
    m_count /= divisor;
    return *this;
}

timecode& timecode::Divide(double divisor) noexcept {
    // Intended (timecode-divisor): negative divisors are refused with the small ones.
    if (!(divisor >= 0.000001)) return *this = timecode(0LL, kInvalid);
    return SetTruncated(static_cast<double>(m_count) / divisor + 0.5);
}

double timecode::operator/(const timecode& divisor) const noexcept {
    if (IsFlagged(m_sys) || IsFlagged(divisor.m_sys) || divisor.m_count == 0) return 1e300;
    return static_cast<double>(m_count) / static_cast<double>(divisor.m_count);
}

timecode& timecode::Scale(long32 num, long32 den, bool rounding) noexcept {
    if (den == 0) {
        m_count = 0;
        return Invalidate();
    }
    Multiply(static_cast<long long>(num));
    if (rounding) {
        const long long half = (den < 0 ? -static_cast<long long>(den) : den) / 2;
        AddCount(m_count < 0 ? -half : half);
    }
    Divide(static_cast<long long>(den));
    // Intended (timecode-scale): only large positive results are marked, as they are the ones that fields cannot hold.
    return m_count > 2147483647 ? Invalidate() : *this;
}

// --- order -----------------------------------------------------------------------------------------------------------

bool timecode::operator==(const timecode& right) const noexcept {
    if (!IsDefined() && !right.IsDefined()) return true;
    return m_count == right.m_count && m_sys == right.m_sys;
}

// Intended (timecode-invalid-order): two invalid values are each "less" than the other, which no strict order allows;
// sorts that meet several of them must not rely on their order.
bool timecode::operator<(const timecode& right) const noexcept {
    if (!right.IsDefined()) return true;
    return IsDefined() && m_count < right.m_count;
}

bool timecode::operator<=(const timecode& right) const noexcept {
    if (!right.IsDefined()) return true;
    return IsDefined() && m_count <= right.m_count;
}

bool timecode::operator>(const timecode& right) const noexcept {
    if (!right.IsDefined()) return false;
    return !IsDefined() || m_count > right.m_count;
}

bool timecode::operator>=(const timecode& right) const noexcept {
    if (!right.IsDefined()) return false;
    return !IsDefined() || m_count >= right.m_count;
}

// --- frames ----------------------------------------------------------------------------------------------------------

// Exchanges the code, keeps the flags and adds those of the new word.
void timecode::SetSystem(ulong32 sys) noexcept { m_sys = GetFlags() | Normalize(sys); }

timecode& timecode::AlignToSystem(ulong32 sys) noexcept {
    SetSystem(sys);
    if (!IsAssigned()) m_count = 0;
    if (IsFlagged(m_sys)) return *this;

    const long long frame = GetFrameBU();
    const long long rest = m_count % frame;
    m_count -= rest;
    if (2 * rest >= frame && m_count <= kMax - frame) m_count += frame;
    if (2 * rest <= -frame && m_count >= kMin + frame) m_count -= frame;
    return *this;
}

timecode& timecode::TruncToSystem(ulong32 sys) noexcept {
    SetSystem(sys);
    if (IsFlagged(m_sys)) return *this;

    const long long frame = GetFrameBU();
    const long long rest = m_count % frame;
    if (rest == 0) return *this;
    m_count -= rest;
    // Intended (timecode-trunc): a textbook would go one frame down from every negative count; less than one frame
    // below zero becomes 0.
    if (m_count >= 0) return *this;
    if (m_count < kMin + frame) return Invalidate();
    m_count -= frame;
    return *this;
}

timecode& timecode::RoofToSystem(ulong32 sys) noexcept {
    SetSystem(sys);
    if (IsFlagged(m_sys)) return *this;

    const long long frame = GetFrameBU();
    const long long rest = m_count % frame;
    if (rest == 0) return *this;
    m_count -= rest;
    // Intended (timecode-roof): the frame is added to negative counts too, which lands one above the boundary a
    // textbook would take.
    if (m_count > kMax - frame) return Invalidate();
    m_count += frame;
    return *this;
}

bool timecode::AssertAlignedToSystem(ulong32 sys) const noexcept {
    return !IsFlagged(m_sys) && !IsFlagged(Normalize(sys)) && m_count % static_cast<long long>(GetFrameBU(sys)) == 0;
}

timecode& timecode::MapTo(ulong32 sys, int direction) noexcept {
    const long long start = m_count;
    AlignToSystem(sys);
    if (IsFlagged(m_sys)) return *this;
    // Aligning moves by half a frame at most, so one step is enough.
    const long long frame = GetFrameBU();
    if (direction == -1 && m_count > start && m_count >= kMin + frame) m_count -= frame;
    if (direction == 1 && m_count < start && m_count <= kMax - frame) m_count += frame;
    return *this;
}

void timecode::ConvertRate(ulong32 counterpart, int direction) noexcept {
    if (counterpart == kUnassigned) return;
    if (IsFlagged(m_sys))
        SetSystem(counterpart);
    else
        MapTo(counterpart, direction);
}

timecode& timecode::Upconvert(int direction) noexcept {
    ConvertRate(RowOf(m_sys).doubleRate, direction);
    return *this;
}

timecode& timecode::Downconvert(int direction) noexcept {
    ulong32 half = kUnassigned;
    for (ulong32 code = 0; code < kSystemCount; ++code)
        if (kSystems[code].doubleRate == CodeOf(m_sys)) half = code;
    ConvertRate(half, direction);
    return *this;
}

timecode& timecode::XlateToSystem(ulong32 sys) noexcept {
    const double from = BULen();
    SetSystem(sys);
    const double to = BULen();
    if (IsFlagged(m_sys) || from == to) return *this;
    const double count = static_cast<double>(m_count) * from / to;
    return SetTruncated(count < 0 ? count - 0.5 : count + 0.5);
}

// --- days ------------------------------------------------------------------------------------------------------------

timecode& timecode::Clip() noexcept {
    if (!IsDefined()) return *this;
    return *this = timecode(TCINFO(*this).Clip());
}

timecode& timecode::Wrap() noexcept {
    if (IsFlagged(m_sys)) return *this;
    Clip();
    if (m_count < 0) m_count += RowOf(m_sys).Day();
    return *this;
}

// Intended (timecode-slip): the day's base units are passed as fields. A textbook would pass a day, but exchange texts
// with a day mark have always been read this way, and the systems whose bound it exceeds have no largest timecode.
timecode timecode::GetMaxTC(ulong32 sys) noexcept { return timecode(static_cast<long32>(RowOf(sys).Day()), sys); }

timecode& timecode::Slip(long32 n) noexcept {
    if (!IsDefined()) return *this;
    const timecode step = GetMaxTC(m_sys);
    if (!step.IsAssigned()) return *this = step;
    if (!step.IsDefined()) return Invalidate();
    return AddCount(step.m_count * n); // below 2^62
}

timecode timecode::GetMaxFrame(ulong32 sys) noexcept { return timecode(kMax - kMax % GetFrameBU(sys), sys); }

timecode timecode::GetMinFrame(ulong32 sys) noexcept { return timecode(kMax % GetFrameBU(sys) - kMax, sys); }

// --- choosing --------------------------------------------------------------------------------------------------------

timecode& timecode::Bias(const timecode& lo, const timecode& hi) noexcept {
    if (!IsAssigned() || !lo.IsAssigned() || !hi.IsAssigned()) return *this;
    timecode low = lo, high = hi; // copies: a bound may be this very value
    if (low > high) std::swap(low, high);
    if (*this >= low && *this <= high) return *this;

    const bool wasBelow = *this < low;
    *this = (*this - low).Wrapped() + low;
    if (*this > high) *this = wasBelow ? low : high;
    return *this;
}

timecode& timecode::RoundTo(const timecode& a, const timecode& b) noexcept {
    if (!IsAssigned()) return *this;
    if (!a.IsAssigned()) return b.IsAssigned() ? *this = b : *this;
    if (!b.IsAssigned()) return *this = a;
    const auto distance = [count = static_cast<double>(m_count)](const timecode& t) {
        return std::fabs(count - static_cast<double>(t.m_count));
    };
    return *this = distance(b) < distance(a) ? b : a;
}

timecode& timecode::Unassign(ulong32 sys) noexcept {
    m_count = 0;
    m_sys = CodeOf(Normalize(sys)) | kUnassigned;
    return *this;
}

} // namespace TAVO::TimeCode
