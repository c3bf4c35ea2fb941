// Breaking positions down into fields and composing them again.

#include "timecode_systems.h"

#include <array>

namespace TAVO::TimeCode {

using namespace detail;

namespace {

// A division by a multiplication: exact while dividend * divisor < 2^20.
constexpr ulong32 InverseOf(ulong32 divisor) { return (1u << 20) / divisor + 1; }
constexpr ulong32 Over(ulong32 dividend, ulong32 inverse) { return dividend * inverse >> 20; }

// The header's facts are those of the table.
constexpr bool IsComposedRight(ulong32 code) {
    const System& s = kSystems[code];
    const tagCOMPOSE& c = kCompose[code];
    if (c.day != s.Day() || c.frame != s.frame || c.straddle != s.Straddle()) return false;
    if (!s.IsDrop()) return c.block == 0;
    return c.block == InverseOf(s.drop.block) && c.frame * c.skipped == s.Dropped();
}
static_assert([] {
    for (ulong32 code = 0; code < kSystemCount; ++code)
        if (!IsComposedRight(code)) return false;
    return std::size(kCompose) == kSystemCount;
}());

constexpr auto kOverFrame = [] {
    std::array<ulong32, kSystemCount> inverses{};
    for (ulong32 code = 0; code < kSystemCount; ++code) inverses[code] = InverseOf(kSystems[code].frame);
    return inverses;
}();

struct Fields {
    ulong32 ff, ss, mm, hh;
    unsigned long long days;
};

inline Fields SplitPlain(unsigned long long magnitude, ulong32 overFrame) noexcept {
    constexpr ulong32 minute = 60 * kSecond, hour = 60 * minute, day = 24 * hour;
    const unsigned long long days = magnitude / day;
    const auto r = static_cast<ulong32>(magnitude - days * day);
    const ulong32 seconds = r / kSecond, minutes = r / minute, hours = r / hour; // do not wait for each other
    return {Over(r - seconds * kSecond, overFrame), seconds - minutes * 60, minutes - hours * 60, hours, days};
}

// One instance per rule, so that all divisors are constants. Labels count frames of `unit` base units; where frames are
// half as long, the odd one is added at the end.
template <DropRule rule, bool isHalved> inline Fields SplitDrop(unsigned long long magnitude) noexcept {
    constexpr System s{nullptr, 1, 1, rule.unit, rule, L"", 0, 0};
    const unsigned long long days = magnitude / s.Day();
    const auto r = static_cast<ulong32>(magnitude - days * s.Day());
    const ulong32 fine = isHalved ? r % rule.unit : 0;
    // Blocks divide hours, so that hours are whole numbers of average minutes, and need not be known for the rest.
    ulong32 minutes = (r - fine) / (s.Minute() + s.Dropped() / rule.block);
    const ulong32 inMinute = r - fine - minutes / rule.block * s.Dropped() - minutes * s.Minute();
    ulong32 ss = inMinute / kSecond;
    ulong32 ff = inMinute % kSecond / rule.unit;
    if (ff < 2 && ss == 0 && minutes % rule.block != 0) { // a skipped label: the estimate came a minute too far
        // Intended (timecode-skipped-label): always the minute's last frame, so that a position between frame starts
        // may show its neighbour.
        --minutes;
        ss = 59;
        ff = kSecond / rule.unit - 1;
    }
    const ulong32 hh = minutes / 60;
    return {isHalved ? 2 * ff + (fine != 0) : ff, ss, minutes - hh * 60, hh, days};
}

constexpr unsigned long long Magnitude(long long count) noexcept {
    const auto bits = static_cast<unsigned long long>(count);
    return count < 0 ? 0 - bits : bits;
}

// A label that a drop-frame system skips.
constexpr bool IsSkipped(const System& s, ulong32 mm, ulong32 ss, ulong32 ff) noexcept {
    return ss == 0 && mm % s.drop.block != 0 && ff * s.frame < s.Dropped();
}

// The day count that carries a sign.
constexpr long long SignedDays(unsigned long long days, bool negative) noexcept {
    return negative ? -1 - static_cast<long long>(days) : static_cast<long long>(days);
}

} // namespace

template <class Fields> inline void TCINFO::Set(const Fields& f, bool negative) noexcept {
    m_ff = f.ff;
    m_ss = f.ss;
    m_mm = f.mm;
    m_hh = f.hh;
    m_dd = SignedDays(f.days, negative);
}

TCINFO::TCINFO(long long count, ulong32 sys) noexcept : m_sys(sys) {
    if (TAVO_UNLIKELY(sys >= kSystemCount)) {
        m_sys = Normalize(sys);
        if (m_sys & (kInvalid | kUnassigned)) {
            m_ff = m_ss = m_mm = m_hh = 0;
            m_dd = 0;
            return;
        }
    }
    const ulong32 code = CodeOf(sys);
    if (kCompose[code].block == 0)
        Set(SplitPlain(Magnitude(count), kOverFrame[code]), count < 0);
    else
        BreakDownDropFrame(count);
}

// By itself, so that the plain systems need not save its registers.
TAVO_NOINLINE void TCINFO::BreakDownDropFrame(long long count) noexcept {
    const System& s = kSystems[CodeOf(m_sys)];
    if (s.drop.unit == kDropFilm.unit)
        Set(SplitDrop<kDropFilm, false>(Magnitude(count)), count < 0);
    else if (s.frame == s.drop.unit)
        Set(SplitDrop<kDropVideo, false>(Magnitude(count)), count < 0);
    else
        Set(SplitDrop<kDropVideo, true>(Magnitude(count)), count < 0);
}

TCINFO::TCINFO(long32 fields, ulong32 sys) noexcept : TCINFO(timecode(fields, sys)) {}
TCINFO::TCINFO(double seconds, ulong32 sys) noexcept : TCINFO(timecode(seconds, sys)) {}
TCINFO::TCINFO(const timecode& value) noexcept : TCINFO(static_cast<long long>(value), value.sys()) {}

TCINFO::TCINFO(long32 hh, ulong32 mm, ulong32 ss, ulong32 ff, ulong32 sys) noexcept : TCINFO(0LL, sys) {
    if (m_sys & (kInvalid | kUnassigned)) return;
    const System& s = RowOf(m_sys);
    const bool negative = hh < 0;
    const ulong32 hours = negative ? 0 - static_cast<ulong32>(hh) : static_cast<ulong32>(hh);
    // An odd second has one frame less where frames straddle the seconds.
    const ulong32 frameNumbers = s.FrameNumbers() - ((ss & 1) && s.Straddle());
    if (hours >= 31 * 24 || mm >= 60 || ss >= 60 || ff >= frameNumbers || IsSkipped(s, mm, ss, ff)) {
        m_sys |= kInvalid;
        return;
    }
    m_dd = SignedDays(hours / 24, negative);
    m_hh = hours % 24;
    m_mm = mm;
    m_ss = ss;
    m_ff = ff;
}

TCINFO& TCINFO::Clip() noexcept {
    m_dd = m_dd < 0 ? -1 : 0;
    return *this;
}

// Intended (timecode-record-fields): the division is unsigned, so that a negative position gives the low half of a huge
// quotient where a textbook would give the negative number of fields. Hosts that store it know it so.
TCINFO::operator long32() const noexcept {
    const auto count = static_cast<unsigned long long>(static_cast<long long>(*this));
    return static_cast<long32>(count / RowOf(m_sys).Field());
}

bool TCINFO::GetInfo(ulong32* hh, ulong32* mm, ulong32* ss, ulong32* ff, int* sign, ulong32* sys) const noexcept {
    if (sys) *sys = m_sys;
    if (!IsDefined()) return false;
    const auto days = static_cast<unsigned long long>(m_dd < 0 ? -1 - m_dd : m_dd);
    if (hh) *hh = static_cast<ulong32>(m_hh + 24 * days);
    if (mm) *mm = m_mm;
    if (ss) *ss = m_ss;
    if (ff) *ff = m_ff;
    if (sign) *sign = m_dd < 0 ? -1 : 1;
    return true;
}

} // namespace TAVO::TimeCode
