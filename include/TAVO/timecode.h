#pragma once
// Positions in film and video material, in fourteen timecode systems.
//
//   base unit    1/1200 of a nominal second, the same for all systems, so values of different systems add and compare
//                directly; a unit of the 1000/1001 systems lasts 1.001/1200 s of real time
//   field, frame half a frame and a frame of a system, in base units
//   system word  the low four bits are the system code (eSystem), 0x10000 marks an invalid and 0x20000 an unassigned
//                value; a word below 16 is a defined one
//
// Nothing here throws. Failures are flags in the system word; a constructor or function that takes a system word
// replaces a code above 13 by 0 with the unassigned flag. Threads: plain values without shared state; one object is for
// one thread at a time.
//
// A number in an expression means what its type says: a 64-bit integer base units, a 32-bit or shorter integer fields,
// a floating-point number seconds.

#include <TAVO/config.h>
#include <TAVO/string.h>
#include <type_traits>

namespace TAVO {
namespace TimeCode {

/// The low four bits of a system word. "(DF)" systems skip frame labels so that their clock follows real time; "(PX)"
/// systems show every other frame of a system.
enum eSystem : ulong32 {
    eSystemPAL = 0,
    eSystemNTSC = 1,
    eSystemNTSCDF = 2,
    eSystemFilm = 3,
    eSystemHDFilm = 4,
    eSystemHDFilmDF = 5,
    eSystemHD50 = 6,
    eSystemHDNTSC = 7,
    eSystemHDNTSCDF = 8,
    eSystemPALPX = 9,
    eSystemNTSCPX = 10,
    eSystemFilmPX = 11,
    eSystemHD30 = 12,
    eSystemHD60 = 13
};

/// The flags of a system word.
constexpr ulong32 kInvalid = 0x10000;    ///< made from invalid input, or by an overflow
constexpr ulong32 kUnassigned = 0x20000; ///< not given yet

namespace detail {

// The contract's three kinds of numbers, by the width of what is passed. Unsigned numbers have no kind: cast them.
template <class N>
using NumberKind =
    std::enable_if_t<std::is_floating_point<N>::value || (std::is_integral<N>::value && std::is_signed<N>::value),
                     std::conditional_t<std::is_floating_point<N>::value, double,
                                        std::conditional_t<sizeof(N) == 8, long long, long32>>>;

// What composing needs of a system, in base units, here so that hosts compile it into their loops. The library's build
// checks it against the table of systems.
struct tagCOMPOSE {
    ulong32 day;
    ulong32 frame;
    ulong32 skipped;  // labels at the start of a minute
    ulong32 block;    // 2^20 / the minutes between two that skip none, rounded up; 0 where labels are not skipped
    ulong32 straddle; // by which odd seconds are late
};
constexpr tagCOMPOSE kCompose[] = {
    {103680000, 48, 0, 0, 0},      // PAL
    {103680000, 40, 0, 0, 0},      // NTSC
    {103576320, 40, 2, 104858, 0}, // NTSC(DF)
    {103680000, 50, 0, 0, 0},      // FILM
    {103680000, 50, 0, 0, 0},      // HDFILM
    {103572000, 50, 2, 262145, 0}, // HDFILM(DF)
    {103680000, 24, 0, 0, 0},      // HD50
    {103680000, 20, 0, 0, 0},      // HDNTSC
    {103576320, 20, 4, 104858, 0}, // HDNTSC(DF)
    {103680000, 96, 0, 0, 48},     // PAL(PX)
    {103680000, 80, 0, 0, 0},      // NTSC(PX)
    {103680000, 100, 0, 0, 0},     // FILM(PX)
    {103680000, 40, 0, 0, 0},      // HD30
    {103680000, 20, 0, 0, 0},      // HD60
};

} // namespace detail

class timecode;
struct SZTC;
struct SZUTC;

/// A position broken down into days, hours, minutes, seconds and frames of one system.
/// A flagged record has no meaningful fields; they are zero.
class TAVO_API TCINFO {
public:
    /// Unassigned.
    TCINFO() noexcept : TCINFO(0LL, kUnassigned) {}
    TCINFO(const TCINFO& other) noexcept = default;
    TCINFO& operator=(const TCINFO& other) noexcept = default;

    /// The position of @p count base units. A count between two frames shows the frame that has begun, except that drop
    /// frame systems may name a neighbour near a skipped label and "HDNTSC(DF)" shows the frame that follows.
    TCINFO(long long count, ulong32 sys) noexcept;
    /// The position of @p fields fields; invalid, without a code, when their base units exceed 2147483647.
    TCINFO(long32 fields, ulong32 sys) noexcept;
    /// The position of @p seconds of real time.
    TCINFO(double seconds, ulong32 sys) noexcept;
    template <class N, class K = detail::NumberKind<N>>
    TCINFO(N number, ulong32 sys)
    noexcept : TCINFO(static_cast<K>(number), sys) {}

    TCINFO(const timecode& value) noexcept;

    /// From fields. Invalid when a field is out of range (hours may reach +-743; a negative one makes the whole
    /// position negative) or the label is one that the drop-frame system skips.
    TCINFO(long32 hh, ulong32 mm, ulong32 ss, ulong32 ff, ulong32 sys) noexcept;

    /// Reads the fixed text form; the separators tell the system. The numbers are not tested against their ranges.
    /// Invalid for the overflow and error displays and for text without four numbers; unassigned for dashes (with the
    /// system of the separators) and for separators that no system has.
    TCINFO(const SZTC& text) noexcept;

    /// Drops whole days and keeps the sign.
    TCINFO& Clip() noexcept;

    /// The position in base units; 0 when flagged.
    operator long long() const noexcept {
        if (m_sys >= 16) return 0;
        const ulong32 inDay = ComposeDay();
        if (m_dd == 0) return inDay;
        const auto days = static_cast<unsigned long long>(m_dd < 0 ? -1 - m_dd : m_dd);
        const unsigned long long magnitude = days * detail::kCompose[m_sys].day + inDay;
        return static_cast<long long>(m_dd < 0 ? 0 - magnitude : magnitude);
    }
    /// The position in fields, rounded down; 0 when flagged. For a negative position it is the low half of an unsigned
    /// quotient and not the negative number of fields: ask a timecode for that.
    operator long32() const noexcept;

    /// Whether neither flag is set. (A timecode counts an unassigned value as defined, a record does not.)
    bool IsDefined() const noexcept { return m_sys < 16; }

    /// Reads the fields; every pointer may be null. @p hh includes the days, @p sign is -1 or +1.
    /// @return false for a flagged record, with only @p sys written
    bool GetInfo(ulong32* hh, ulong32* mm, ulong32* ss, ulong32* ff, int* sign, ulong32* sys) const noexcept;

    ulong32 ff() const noexcept { return m_ff; }   ///< frame within the second
    ulong32 ss() const noexcept { return m_ss; }   ///< seconds
    ulong32 mm() const noexcept { return m_mm; }   ///< minutes
    ulong32 hh() const noexcept { return m_hh; }   ///< hours within the day
    long long dd() const noexcept { return m_dd; } ///< whole days; -1 - days for a negative position
    ulong32 sys() const noexcept { return m_sys; } ///< system word

private:
    ulong32 ComposeDay() const noexcept {
        const detail::tagCOMPOSE& system = detail::kCompose[m_sys];
        const ulong32 minutes = m_hh * 60 + m_mm;
        ulong32 inDay = (minutes * 60 + m_ss) * 1200;
        if (system.block != 0) { // every minute skips labels, but for those that begin a block
            const ulong32 skipping = minutes - (minutes * system.block >> 20);
            inDay += (m_ff - skipping * system.skipped) * system.frame;
        } else {
            inDay += m_ff * system.frame + (m_ss & 1) * system.straddle;
        }
        return inDay;
    }

    void BreakDownDropFrame(long long count) noexcept;
    template <class Fields> void Set(const Fields& fields, bool negative) noexcept;

    ulong32 m_ff, m_ss, m_mm, m_hh; // magnitudes
    long long m_dd;                 // carries the sign, so that -0 hours can be told from 0 hours
    ulong32 m_sys;
};
static_assert(sizeof(TCINFO) == 32, "exchanged between modules by value");

/// The fixed text form: a mark and "hh:mm:ss:ff", twelve characters, whose separators tell the system.
/// The mark is ' ' or '-'. A position of a day or more shows ">##:##:##:##" or "<##:##:##:##", an invalid one
/// "*##:##:##:##", an unassigned one " --:--:--:--". Text may also be put into the characters directly.
struct TAVO_API SZTC {
    wchar_t text[13];

    /// The unassigned form.
    SZTC() noexcept : SZTC(TCINFO()) {}
    SZTC(long long count, ulong32 sys) noexcept : SZTC(TCINFO(count, sys)) {}
    SZTC(long32 fields, ulong32 sys) noexcept : SZTC(TCINFO(fields, sys)) {}
    SZTC(double seconds, ulong32 sys) noexcept : SZTC(TCINFO(seconds, sys)) {}
    template <class N, class K = detail::NumberKind<N>>
    SZTC(N number, ulong32 sys)
    noexcept : SZTC(static_cast<K>(number), sys) {}
    SZTC(const TCINFO& record) noexcept;
    SZTC(const timecode& value) noexcept : SZTC(TCINFO(value)) {}
    SZTC(long32 hh, ulong32 mm, ulong32 ss, ulong32 ff, ulong32 sys) noexcept : SZTC(TCINFO(hh, mm, ss, ff, sys)) {}

    /// Reads free text: two digits per field, not tested against their ranges, between separators that a system has,
    /// with or without a mark ' ', '-' or '+' in front (a missing mark and '+' become ' '). The overflow and error
    /// displays are kept. Everything else, null included, gives the unassigned form.
    SZTC(const wchar_t* freeText) noexcept;

    /// The position in base units; 0 when flagged.
    operator long long() const noexcept { return TCINFO(*this); }
    /// The position in fields as TCINFO tells it; 0 when flagged.
    operator long32() const noexcept { return TCINFO(*this); }
    /// The characters as they stand.
    operator String::CACFWChar() const;
    /// The characters with every separator written as ':', which drops the system.
    operator String::CUTF8Char() const;
};
static_assert(std::is_standard_layout<SZTC>::value && sizeof(SZTC) == 26, "begins with its characters");

/// The text form for exchange: "hh:mm:ss:ff", a day mark, and the frame rate as a fraction, as in
/// "10:00:00:00 {30000/1001}Hz/D". "/D" marks drop frame (and is also written for "PAL(PX)"); the mark is '+' for a
/// position of a day or more and '-' for a negative one, which is written wrapped into the day. A flagged value shows
/// "--:--:--:-- {25/1}Hz". Text may also be put into the characters directly.
struct TAVO_API SZUTC {
    wchar_t text[48];

    /// Empty.
    SZUTC() noexcept : text{} {}
    /// Writes @p value.
    SZUTC(timecode value) noexcept;
    /// Rewrites @p freeText in the form above: its fraction reduced to the system's own, its fields in two digits, its
    /// mark as it is. Text whose rate is known but whose fields are not gives the flagged form in a few cases only (see
    /// the contract); everything else, null included, gives the empty text.
    SZUTC(const wchar_t* freeText) noexcept;

    /// Reads the text back. Unassigned for text of another form, or with a rate that is no system's; invalid for fields
    /// that are none. A '+' slips the value by timecode::Slip(1) and a '-' by Slip(-1), which for several systems makes
    /// it invalid.
    operator timecode() const noexcept;
};
static_assert(std::is_standard_layout<SZUTC>::value, "begins with its characters");

/// A position or a duration: a count of base units and the system that shows it.
///
/// Arithmetic works on the count. A result that does not fit 64 bits keeps its low 64 bits and gets the invalid flag; a
/// floating-point one becomes the nearest end of the range instead, with the flag. Changing functions return the value
/// itself; their static forms and the forms in the past participle leave it alone and return a changed copy.
class TAVO_API timecode {
public:
    /// Unassigned, count 0.
    timecode() noexcept : m_count(0), m_sys(kUnassigned) {}
    timecode(const timecode& other) noexcept = default;
    timecode& operator=(const timecode& other) noexcept = default;

    /// @p count base units; 0 when @p sys is unassigned.
    timecode(long long count, ulong32 sys) noexcept;
    /// @p fields fields; invalid, without a code, when their base units exceed 2147483647. Count 0 when @p sys is
    /// flagged.
    timecode(long32 fields, ulong32 sys) noexcept;
    /// @p seconds of real time, rounded half away from zero to base units; the end of the range when out of it. Invalid
    /// without a code when not a number. Count 0 when @p sys is flagged.
    timecode(double seconds, ulong32 sys) noexcept;
    template <class N, class K = detail::NumberKind<N>>
    timecode(N number, ulong32 sys) noexcept : timecode(static_cast<K>(number), sys) {}

    /// Reads free text as SZTC does.
    timecode(const wchar_t* freeText) noexcept : timecode(TCINFO(SZTC(freeText))) {}
    timecode(const TCINFO& record) noexcept : m_count(record), m_sys(record.sys()) {}
    /// From fields, tested as TCINFO does.
    timecode(long32 hh, ulong32 mm, ulong32 ss, ulong32 ff, ulong32 sys) noexcept
        : timecode(TCINFO(hh, mm, ss, ff, sys)) {}

    /// The count, flagged or not.
    operator long long() const noexcept { return m_count; }
    /// The count in fields, rounded half away from zero, its low 32 bits; 0 when flagged.
    operator long32() const noexcept;
    /// The count in seconds of real time; 0.0 when flagged.
    operator double() const noexcept;
    /// The count in fields or frames of @p sys, the low 32 bits; 0 when either is flagged. @p mode 1 rounds away from
    /// zero, -1 divides the count as an unsigned number (rounding down, for counts that are not negative), any other
    /// rounds half away from zero.
    long32 Fields(ulong32 sys, int mode) const noexcept;
    long32 Frames(ulong32 sys, int mode) const noexcept;

    /// The system word.
    ulong32 sys() const noexcept { return m_sys; }
    /// The system word without its code.
    ulong32 GetFlags() const noexcept { return m_sys & ~15u; }
    bool IsAssigned() const noexcept { return (m_sys & kUnassigned) == 0; }
    // Intended (timecode-defined): a textbook, and TCINFO, would not call an unassigned value defined.
    /// Whether the value is not invalid; an unassigned one counts as defined.
    bool IsDefined() const noexcept { return (m_sys & kInvalid) == 0; }
    /// True for count 0 and for unassigned values.
    bool operator!() const noexcept { return m_count == 0 || !IsAssigned(); }

    /// Adds counts and keeps the left system. An unassigned left operand becomes the right one; an invalid right one
    /// only adds its flag. A number is first converted under the left operand's system word.
    timecode& operator+=(const timecode& right) noexcept;
    /// Subtracts counts and keeps the left system. A flagged left operand stays as it is.
    timecode& operator-=(const timecode& right) noexcept;
    timecode operator+(const timecode& right) const noexcept { return timecode(*this) += right; }
    timecode operator-(const timecode& right) const noexcept { return timecode(*this) -= right; }
    template <class N, class K = detail::NumberKind<N>> timecode& operator+=(N number) noexcept {
        return *this += Operand(static_cast<K>(number));
    }
    template <class N, class K = detail::NumberKind<N>> timecode& operator-=(N number) noexcept {
        return *this -= Operand(static_cast<K>(number));
    }
    template <class N, class K = detail::NumberKind<N>> timecode operator+(N number) const noexcept {
        return timecode(*this) += number;
    }
    template <class N, class K = detail::NumberKind<N>> timecode operator-(N number) const noexcept {
        return timecode(*this) -= number;
    }

    /// One frame forward or back; a flagged value stays.
    timecode& operator++() noexcept { return StepFrames(1); }
    timecode& operator--() noexcept { return StepFrames(-1); }
    timecode operator++(int) noexcept;
    timecode operator--(int) noexcept;

    /// The negated count; a flagged value stays.
    timecode operator-() const noexcept;

    /// Scales the count by an integer, exactly, or by a floating-point number, adding 0.5 and truncating toward zero
    /// (so -48 times 1.0 is -47). Flags stay.
    template <class N, class K = detail::NumberKind<N>> timecode& operator*=(N factor) noexcept {
        return Multiply(static_cast<Factor<K>>(factor));
    }
    template <class N, class K = detail::NumberKind<N>> timecode operator*(N factor) const noexcept {
        return timecode(*this) *= factor;
    }
    /// Divides the count by an integer, truncating, or by a floating-point number, adding 0.5 and truncating. Count 0
    /// and the invalid flag alone for a divisor of 0, and for a floating-point one below 0.000001.
    template <class N, class K = detail::NumberKind<N>> timecode& operator/=(N divisor) noexcept {
        return Divide(static_cast<Factor<K>>(divisor));
    }
    template <class N, class K = detail::NumberKind<N>> timecode operator/(N divisor) const noexcept {
        return timecode(*this) /= divisor;
    }
    /// The ratio of the counts; 1e300 when either value is flagged or the divisor is 0.
    double operator/(const timecode& divisor) const noexcept;

    /// Equal counts and equal system words; two invalid values are equal whatever they hold.
    bool operator==(const timecode& right) const noexcept;
    bool operator!=(const timecode& right) const noexcept { return !(*this == right); }
    /// The order of the counts, whatever their systems, with invalid values after all others. Of two invalid values
    /// each is less than the other, and neither is greater.
    bool operator<(const timecode& right) const noexcept;
    bool operator<=(const timecode& right) const noexcept;
    bool operator>(const timecode& right) const noexcept;
    bool operator>=(const timecode& right) const noexcept;

    /// Compare with base units (the count, flags ignored), fields or seconds (0 when flagged).
    template <class N, class K = detail::NumberKind<N>> bool operator==(N n) const noexcept { return As<K>() == K(n); }
    template <class N, class K = detail::NumberKind<N>> bool operator!=(N n) const noexcept { return As<K>() != K(n); }
    template <class N, class K = detail::NumberKind<N>> bool operator<(N n) const noexcept { return As<K>() < K(n); }
    template <class N, class K = detail::NumberKind<N>> bool operator<=(N n) const noexcept { return As<K>() <= K(n); }
    template <class N, class K = detail::NumberKind<N>> bool operator>(N n) const noexcept { return As<K>() > K(n); }
    template <class N, class K = detail::NumberKind<N>> bool operator>=(N n) const noexcept { return As<K>() >= K(n); }

    /// The forms with the number on the left; it is first converted under the value's system word.
    template <class N, class K = detail::NumberKind<N>>
    friend timecode operator+(N number, const timecode& value) noexcept {
        return timecode(static_cast<K>(number), value.sys()) + value;
    }
    template <class N, class K = detail::NumberKind<N>>
    friend timecode operator-(N number, const timecode& value) noexcept {
        return timecode(static_cast<K>(number), value.sys()) - value;
    }
    template <class N, class K = detail::NumberKind<N>>
    friend timecode operator*(N factor, const timecode& value) noexcept {
        return value * factor;
    }
    template <class N, class K = detail::NumberKind<N>> friend bool operator==(N n, const timecode& t) noexcept {
        return K(n) == t.As<K>();
    }
    template <class N, class K = detail::NumberKind<N>> friend bool operator!=(N n, const timecode& t) noexcept {
        return K(n) != t.As<K>();
    }
    template <class N, class K = detail::NumberKind<N>> friend bool operator<(N n, const timecode& t) noexcept {
        return K(n) < t.As<K>();
    }
    template <class N, class K = detail::NumberKind<N>> friend bool operator<=(N n, const timecode& t) noexcept {
        return K(n) <= t.As<K>();
    }
    template <class N, class K = detail::NumberKind<N>> friend bool operator>(N n, const timecode& t) noexcept {
        return K(n) > t.As<K>();
    }
    template <class N, class K = detail::NumberKind<N>> friend bool operator>=(N n, const timecode& t) noexcept {
        return K(n) >= t.As<K>();
    }

    /// Change to system @p sys and round to its nearest frame, halves away from zero. The value keeps its flags and
    /// gets those of @p sys; unassigned results have count 0, flagged ones are not rounded. At the ends of the 64-bit
    /// range the boundary toward zero is taken.
    timecode& AlignToSystem(ulong32 sys) noexcept;
    timecode& SetSystemAligned(ulong32 sys) noexcept { return AlignToSystem(sys); }
    timecode& Align() noexcept { return AlignToSystem(m_sys); }
    /// The same, down to a frame. A negative count between two frames goes to the boundary below the one that a
    /// textbook would take, except above minus one frame, where it becomes 0.
    timecode& TruncToSystem(ulong32 sys) noexcept;
    timecode& Trunc() noexcept { return TruncToSystem(m_sys); }
    /// The same, up to a frame. A negative count between two frames goes one frame above the boundary that a textbook
    /// would take (-1 becomes one frame).
    timecode& RoofToSystem(ulong32 sys) noexcept;
    timecode& Roof() noexcept { return RoofToSystem(m_sys); }
    /// Whether the value is unflagged and a whole number of frames (of @p sys, which must be unflagged too).
    bool AssertAligned() const noexcept { return AssertAlignedToSystem(m_sys); }
    bool AssertAlignedToSystem(ulong32 sys) const noexcept;

    /// AlignToSystem, then with @p direction -1 not later and with 1 not earlier than the value was.
    timecode& MapTo(ulong32 sys, int direction) noexcept;
    /// MapTo the system of twice or half the rate: "PAL" and "HD50", "NTSC" and "HDNTSC", "NTSC(DF)" and "HDNTSC(DF)".
    /// Values of other systems stay; a flagged value only changes its code.
    timecode& Upconvert(int direction) noexcept;
    timecode& Downconvert(int direction) noexcept;
    /// Changes to system @p sys and keeps the real time, to the nearest base unit. A flagged value only changes its
    /// word.
    timecode& XlateToSystem(ulong32 sys) noexcept;

    /// Drops whole days and keeps the sign; an unassigned value gets count 0, an invalid one stays.
    timecode& Clip() noexcept;
    /// Clip, then one day is added to a negative count; flagged values stay.
    timecode& Wrap() noexcept;
    /// Adds @p n times GetMaxTC of the value's system: twenty of its days for "NTSC(DF)", and the invalid flag for the
    /// systems that have no GetMaxTC. Unassigned values get count 0, invalid ones stay.
    timecode& Slip(long32 n) noexcept;
    /// Multiplies the count by @p num / @p den, with @p rounding half away from zero. Count 0 and the invalid flag when
    /// @p den is 0; a result above 2147483647 keeps its value and gets the invalid flag.
    timecode& Scale(long32 num, long32 den, bool rounding) noexcept;
    /// Folds a value outside [lo, hi] back by whole days from the lower bound, else takes the nearer bound with its
    /// system word. The bounds may come in either order. Any unassigned operand leaves the value as it is.
    timecode& Bias(const timecode& lo, const timecode& hi) noexcept;
    /// Becomes whichever of @p a and @p b is nearer, @p a when both are; an unassigned one of them yields to the other.
    /// An unassigned value stays, and so does every value when both are unassigned.
    timecode& RoundTo(const timecode& a, const timecode& b) noexcept;
    /// Unassigned with count 0, code 0.
    timecode& Unassign() noexcept { return Unassign(0); }
    /// Unassigned with count 0 and the code of @p sys.
    timecode& Unassign(ulong32 sys) noexcept;

    timecode AlignedToSystem(ulong32 sys) const noexcept { return timecode(*this).AlignToSystem(sys); }
    timecode Aligned() const noexcept { return timecode(*this).Align(); }
    timecode TruncedToSystem(ulong32 sys) const noexcept { return timecode(*this).TruncToSystem(sys); }
    timecode Trunced() const noexcept { return timecode(*this).Trunc(); }
    timecode RoofedToSystem(ulong32 sys) const noexcept { return timecode(*this).RoofToSystem(sys); }
    timecode Roofed() const noexcept { return timecode(*this).Roof(); }
    timecode MappedTo(ulong32 sys, int direction) const noexcept { return timecode(*this).MapTo(sys, direction); }
    timecode Upconverted(int direction) const noexcept { return timecode(*this).Upconvert(direction); }
    timecode Downconverted(int direction) const noexcept { return timecode(*this).Downconvert(direction); }
    timecode XlatedToSystem(ulong32 sys) const noexcept { return timecode(*this).XlateToSystem(sys); }
    timecode Clipped() const noexcept { return timecode(*this).Clip(); }
    timecode Wrapped() const noexcept { return timecode(*this).Wrap(); }
    timecode Slipped(long32 n) const noexcept { return timecode(*this).Slip(n); }
    timecode RoundedTo(const timecode& a, const timecode& b) const noexcept { return timecode(*this).RoundTo(a, b); }

    static timecode AlignToSystem(timecode t, ulong32 sys) noexcept { return t.AlignToSystem(sys); }
    static timecode SetSystemAligned(timecode t, ulong32 sys) noexcept { return t.AlignToSystem(sys); }
    static timecode Align(timecode t) noexcept { return t.Align(); }
    static timecode TruncToSystem(timecode t, ulong32 sys) noexcept { return t.TruncToSystem(sys); }
    static timecode Trunc(timecode t) noexcept { return t.Trunc(); }
    static timecode RoofToSystem(timecode t, ulong32 sys) noexcept { return t.RoofToSystem(sys); }
    static timecode Roof(timecode t) noexcept { return t.Roof(); }
    static timecode MapTo(timecode t, ulong32 sys, int direction) noexcept { return t.MapTo(sys, direction); }
    static timecode Upconvert(timecode t, int direction) noexcept { return t.Upconvert(direction); }
    static timecode Downconvert(timecode t, int direction) noexcept { return t.Downconvert(direction); }
    static timecode XlateToSystem(timecode t, ulong32 sys) noexcept { return t.XlateToSystem(sys); }
    static timecode Clip(timecode t) noexcept { return t.Clip(); }
    static timecode Wrap(timecode t) noexcept { return t.Wrap(); }
    static timecode Slip(timecode t, long32 n) noexcept { return t.Slip(n); }
    static timecode Scale(timecode t, long32 num, long32 den, bool rounding) noexcept {
        return t.Scale(num, den, rounding);
    }
    static timecode Bias(timecode t, const timecode& lo, const timecode& hi) noexcept { return t.Bias(lo, hi); }
    static timecode RoundTo(timecode t, const timecode& a, const timecode& b) noexcept { return t.RoundTo(a, b); }

    /// The step of Slip: as many *fields* as the system's day has base units; invalid where so many fields are out of
    /// bounds, unassigned for an unassigned word.
    static timecode GetMaxTC(ulong32 sys) noexcept;
    /// The largest and the smallest count of whole frames.
    static timecode GetMaxFrame(ulong32 sys) noexcept;
    static timecode GetMinFrame(ulong32 sys) noexcept;

    /// @p sys, or with a code above 13 its code replaced by 0 and the unassigned flag set.
    static ulong32 NormalizeSystem(ulong32 sys) noexcept;
    /// Whether the exchange text form shows "/D": the drop-frame systems and "PAL(PX)". False for a flagged word.
    static bool IsDFSystem(ulong32 sys) noexcept;
    bool IsDFSystem() const noexcept { return IsDFSystem(m_sys & 15); }
    /// The drop-frame system of a system, or the other way round; the unassigned flag when there is none.
    static ulong32 GetDFSystem(ulong32 sys) noexcept;
    static ulong32 GetNDFSystem(ulong32 sys) noexcept;

    /// Base units of a frame or a field. Like all facts below, those of code 0 for a code above 13; flags are ignored.
    static ulong32 GetFrameBU(ulong32 sys) noexcept;
    static ulong32 GetFieldBU(ulong32 sys) noexcept;
    ulong32 GetFrameBU() const noexcept { return GetFrameBU(m_sys); }
    ulong32 GetFieldBU() const noexcept { return GetFieldBU(m_sys); }
    /// Seconds of real time that a base unit lasts.
    static double BULen(ulong32 sys) noexcept;
    double BULen() const noexcept { return BULen(m_sys); }
    /// Frames per second.
    static double FramerateOf(ulong32 sys) noexcept;
    double Framerate() const noexcept { return FramerateOf(m_sys); }
    /// Frames per second as a fraction; either pointer may be null. Always true.
    static bool GetFrameRateScaleOf(ulong32 sys, ulong32* numerator, ulong32* denominator) noexcept;
    bool GetFrameRateScale(ulong32* numerator, ulong32* denominator) const noexcept {
        return GetFrameRateScaleOf(m_sys, numerator, denominator);
    }
    /// The system's name, a static text such as "NTSC(DF)"; empty for a code above 13.
    static const wchar_t* GetSystemString(ulong32 sys) noexcept;
    const wchar_t* GetSystemString() const noexcept { return GetSystemString(m_sys); }

    /// Copies the codes of the systems, slowest rate first, @p capacity of them at most.
    /// @return how many were copied; at most 14
    static ulong32 GetFramerateTCList(ulong32* list, ulong32 capacity) noexcept;
    /// The system for a rate. Between the ends ("HD60" from 60 up, "FILM(PX)" from 12.5 down) it answers only when the
    /// nearest rate is a drop-frame system's, with its non-drop sibling, else the unassigned flag: 29.98 gives "NTSC",
    /// 29.97 and 25.0 give none. Look up known rates with GetTCSystemOf.
    static ulong32 GetBestTCSystem(double rate) noexcept;
    /// The non-drop system whose rate is @p num / @p den, exactly or in a multiple such as 120/2; else the unassigned
    /// flag. Multiples of most rates are not found.
    static ulong32 GetTCSystemOf(ulong32 num, ulong32 den) noexcept;

private:
    // Integers scale as 64-bit ones, whatever their width.
    template <class K> using Factor = std::conditional_t<std::is_same<K, double>::value, double, long long>;
    template <class K> K As() const noexcept { return static_cast<K>(*this); }

    timecode Operand(long long count) const noexcept;
    timecode Operand(long32 fields) const noexcept { return timecode(fields, m_sys); }
    timecode Operand(double seconds) const noexcept { return timecode(seconds, m_sys); }
    timecode& AddCount(long long count) noexcept;
    timecode& SubtractCount(long long count) noexcept;
    timecode& SetTruncated(double count) noexcept;
    timecode& StepFrames(long long frames) noexcept;
    timecode& Multiply(long long factor) noexcept;
    timecode& Multiply(double factor) noexcept;
    timecode& Divide(long long divisor) noexcept;
    timecode& Divide(double divisor) noexcept;
    timecode& Invalidate() noexcept;
    void SetSystem(ulong32 sys) noexcept;
    void ConvertRate(ulong32 counterpart, int direction) noexcept;

    long long m_count; // base units
    ulong32 m_sys;
};
static_assert(sizeof(timecode) == 16, "exchanged between modules by value");

/// The magnitude; an invalid value stays.
TAVO_API timecode tcabs(const timecode& value) noexcept;

} // namespace TimeCode
} // namespace TAVO
