// Breaking positions down into fields and composing them again.

#include "timecode_systems.h"

#include <array>
#include <utility>

namespace TAVO::TimeCode {

using namespace detail;

namespace {

struct Fields {
    ulong32 ff, ss, mm, hh;
    unsigned long long days;
};

// Breaks a magnitude down. One instance per system, so that all divisors are constants.
template <ulong32 Code> Fields Split(unsigned long long magnitude) noexcept {
    constexpr const System& s = kSystems[Code];
    const unsigned long long days = magnitude / s.Day();
    const auto r = static_cast<ulong32>(magnitude - days * s.Day());
    if constexpr (!s.IsDrop()) {
        const ulong32 seconds = r / kSecond; // the quotients do not wait for each other
        const ulong32 minutes = r / s.Minute();
        const ulong32 hours = r / s.Hour();
        return {(r - seconds * kSecond) / s.frame, seconds - minutes * 60, minutes - hours * 60, hours, days};
    } else {
        // Labels count frames of drop.unit; where frames are half as long, the odd one is added at the end.
        constexpr bool isHalved = s.frame != s.drop.unit;
        const ulong32 fine = isHalved ? r % s.drop.unit : 0;
        const ulong32 hh = (r - fine) / s.Hour();
        const ulong32 inHour = r - fine - hh * s.Hour();
        ulong32 mm = inHour / (s.Minute() + s.Dropped() / s.drop.block); // by the average minute of a block
        const ulong32 inMinute = inHour - mm / s.drop.block * s.Dropped() - mm * s.Minute();
        ulong32 ss = inMinute / kSecond;
        ulong32 ff = inMinute % kSecond / s.drop.unit;
        if (ff < 2 && ss == 0 && mm % s.drop.block != 0) { // a skipped label: the estimate came a minute too far
            // Intended: always the minute's last frame, so that a position between frame starts may show its neighbour.
            --mm;
            ss = 59;
            ff = kSecond / s.drop.unit - 1;
        }
        return {isHalved ? 2 * ff + (fine != 0) : ff, ss, mm, hh, days};
    }
}

template <ulong32 Code> unsigned long long Join(const Fields& f) noexcept {
    constexpr const System& s = kSystems[Code];
    const ulong32 inDay = f.hh * s.Hour() + f.mm * s.Minute() + f.mm / s.drop.block * s.Dropped() + f.ss * kSecond +
                          (f.ss & 1) * s.Straddle() + f.ff * s.frame;
    return f.days * s.Day() + inDay;
}

struct Codec {
    Fields (*split)(unsigned long long magnitude) noexcept;
    unsigned long long (*join)(const Fields& fields) noexcept;
};
constexpr auto kCodecs = []<std::size_t... code>(std::index_sequence<code...>) {
    return std::array{Codec{Split<code>, Join<code>}...};
}
(std::make_index_sequence<kSystemCount>{});

// A label that a drop-frame system skips.
constexpr bool IsSkipped(const System& s, ulong32 mm, ulong32 ss, ulong32 ff) noexcept {
    return ss == 0 && mm % s.drop.block != 0 && ff * s.frame < s.Dropped();
}

// The day count that carries a sign.
constexpr long long SignedDays(unsigned long long days, bool negative) noexcept {
    return negative ? -1 - static_cast<long long>(days) : static_cast<long long>(days);
}

} // namespace

TCINFO::TCINFO(long long count, ulong32 sys) noexcept
    : m_ff(0), m_ss(0), m_mm(0), m_hh(0), m_dd(0), m_sys(Normalize(sys)) {
    if (m_sys & (kInvalid | kUnassigned)) return;
    const bool negative = count < 0;
    const auto bits = static_cast<unsigned long long>(count);
    const Fields f = kCodecs[CodeOf(m_sys)].split(negative ? 0 - bits : bits);
    m_ff = f.ff;
    m_ss = f.ss;
    m_mm = f.mm;
    m_hh = f.hh;
    m_dd = SignedDays(f.days, negative);
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

TCINFO::operator long long() const noexcept {
    if (IsFlagged(m_sys)) return 0;
    const bool negative = m_dd < 0;
    const auto days = static_cast<unsigned long long>(negative ? -1 - m_dd : m_dd);
    const unsigned long long magnitude = kCodecs[m_sys].join({m_ff, m_ss, m_mm, m_hh, days});
    return static_cast<long long>(negative ? 0 - magnitude : magnitude);
}

// Intended: the division is unsigned, so that a negative position gives the low half of a huge quotient where a
// textbook would give the negative number of fields. Hosts that store it know it so.
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
