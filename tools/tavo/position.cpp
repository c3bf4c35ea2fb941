#include "position.h"

#include "streams.h"
#include "text.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <cstdlib>
#include <TAVO/math.h>

namespace tool {

using namespace TAVO::TimeCode;
using TAVO::long32;

namespace {

constexpr std::string_view kSeparatorCharacters = ":.;,";
constexpr const char* kFieldNames[] = {"hours", "minutes", "seconds", "frames"};
constexpr long32 kMostHours = 743;

bool IsDigit(char c) { return c >= '0' && c <= '9'; }

char Lower(char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c + ('a' - 'A')) : c; }

bool SameName(std::string_view a, std::string_view b) {
    return std::equal(a.begin(), a.end(), b.begin(), b.end(), [](char x, char y) { return Lower(x) == Lower(y); });
}

bool HasSibling(ulong32 word) { return (word & kUnassigned) == 0; }
bool SkipsLabels(ulong32 system) { return HasSibling(timecode::GetNDFSystem(system)); }

std::string TwoDigits(ulong32 value) {
    const std::string digits = std::to_string(value);
    return value < 10 ? '0' + digits : digits;
}

Reading Position(const timecode& value) { return {value, std::string()}; }
Reading Flagged(ulong32 flag, const std::string& reason) { return {timecode(0LL, flag), reason}; }

// --- systems ---------------------------------------------------------------------------------------------------------

// A whole text of digits that fits; false leaves the number alone.
template <class N> bool ReadNumber(std::string_view text, N& number) {
    N value = 0;
    const auto end = text.data() + text.size();
    const auto result = std::from_chars(text.data(), end, value);
    if (text.empty() || result.ec != std::errc() || result.ptr != end) return false;
    number = value;
    return true;
}

bool Refuse(const std::string& text, const std::string& why) {
    Complain(Named(text) + " is no system: " + why + "; see tavo tc systems");
    return false;
}

// The system without drop frame that has this rate.
bool FindRate(std::string_view numerator, std::string_view denominator, ulong32& system) {
    long32 n = 0, d = 0;
    if (!ReadNumber(numerator, n) || !ReadNumber(denominator, d) || n <= 0 || d <= 0) return false;
    const TAVO::Math::CRational wanted(n, d);
    for (ulong32 code = 0; code < kSystems; ++code) {
        ulong32 num = 0, den = 0;
        timecode::GetFrameRateScaleOf(code, &num, &den);
        if (!(TAVO::Math::CRational(static_cast<long32>(num), static_cast<long32>(den)) == wanted)) continue;
        system = code; // the one without drop frame comes first
        return true;
    }
    return false;
}

bool FindByRate(const std::string& text, ulong32& system) {
    const auto slash = text.find('/'), second = text.find('/', slash + 1);
    const std::string rate = text.substr(0, second);
    const std::string flag = second == text.npos ? "" : text.substr(second + 1);
    ulong32 plain = 0;
    if (!FindRate(std::string_view(rate).substr(0, slash), std::string_view(rate).substr(slash + 1), plain))
        return Refuse(text, "no system has this rate");
    const ulong32 drop = timecode::GetDFSystem(plain);
    if (flag.empty() && HasSibling(drop)) {
        return Refuse(text, "the rate is that of " + NameOf(plain) + " and of " + NameOf(drop) + ", so write " + rate +
                                "/ND or " + rate + "/D");
    }
    if (!flag.empty() && flag != "D" && flag != "ND")
        return Refuse(text, "behind the rate stands /D for drop frame, or /ND");
    if (flag == "D" && !HasSibling(drop)) return Refuse(text, "there is no drop frame at this rate");
    system = flag == "D" ? drop : plain;
    return true;
}

// --- fields ----------------------------------------------------------------------------------------------------------

// Why these fields are no position; empty when they are one.
std::string WhyNoPosition(const ulong32 (&field)[4], ulong32 system) {
    const auto wrong = [&](std::size_t i, const std::string& why) {
        return std::string("the ") + kFieldNames[i] + " are " + TwoDigits(field[i]) + ": " + why;
    };
    const auto hours = static_cast<long32>(field[0]);
    if (TCINFO(hours, field[1], field[2], field[3], system).IsDefined()) return std::string();
    const ulong32 limit = FrameLimit(system);
    if (hours < -kMostHours || hours > kMostHours) return wrong(0, "they go to " + std::to_string(kMostHours));
    for (const std::size_t i : {1, 2})
        if (field[i] > 59) return wrong(i, "they go from 00 to 59");
    if (field[3] >= limit) return wrong(3, NameOf(system) + " counts 00 to " + TwoDigits(limit - 1));
    if (!SkipsLabels(system))
        return wrong(3, "in an odd second " + NameOf(system) + " counts 00 to " + TwoDigits(limit - 2));
    return wrong(3, NameOf(system) + " skips this label, the minute begins with frame " +
                        TwoDigits(DropRuleOf(system).frames));
}

// --- counts ----------------------------------------------------------------------------------------------------------

enum class Unit { None, BaseUnits, Fields, Frames, Seconds };

// Splits "25frames"; None for what is no count.
Unit SplitCount(std::string_view text, std::string_view& number) {
    const auto end = text.find_first_not_of("0123456789.", text[0] == '-' || text[0] == '+');
    number = text.substr(text[0] == '+', end == text.npos ? end : end - (text[0] == '+'));
    if (number.empty() || !IsDigit(number.back()) || std::count(number.begin(), number.end(), '.') > 1)
        return Unit::None;
    const std::string_view unit = end == text.npos ? "" : text.substr(end);
    constexpr struct {
        std::string_view name;
        Unit unit;
    } kUnits[] = {{"", Unit::BaseUnits},
                  {"bu", Unit::BaseUnits},
                  {"fields", Unit::Fields},
                  {"frames", Unit::Frames},
                  {"s", Unit::Seconds}};
    for (const auto& row : kUnits)
        if (row.name == unit) return row.unit;
    return Unit::None;
}

Reading ReadCount(std::string_view number, Unit unit, ulong32 system) {
    constexpr double kLimit = 9223372036854775808.0; // the first that does not fit
    const auto tooLarge = [] { return Flagged(kInvalid, "its base units do not fit 64 bits"); };
    if (unit == Unit::Seconds) {
        double seconds = 0;
        if (!ReadNumber(number, seconds) || !(std::fabs(seconds) / timecode::BULen(system) < kLimit)) return tooLarge();
        return Position(timecode(seconds, system));
    }
    if (number.find('.') != number.npos) return Flagged(kInvalid, "only seconds may have a point");
    long long count = 0;
    if (!ReadNumber(number, count)) return tooLarge();
    if (unit == Unit::Fields) {
        const long long most = 2147483647 / timecode::GetFieldBU(system);
        if (count < -most || count > most)
            return Flagged(kInvalid,
                           "a count of " + NameOf(system) + " fields goes to " + std::to_string(most) + " at most");
        return Position(timecode(static_cast<long32>(count), system));
    }
    if (unit == Unit::BaseUnits) return Position(timecode(count, system));
    const timecode value = timecode(static_cast<long long>(timecode::GetFrameBU(system)), system) * count;
    return value.IsDefined() ? Position(value) : tooLarge();
}

// --- texts -----------------------------------------------------------------------------------------------------------

bool IsContinuation(char c) { return (static_cast<unsigned char>(c) & 0xC0) == 0x80; }

// Where the character at a place ends.
std::size_t EndOfCharacter(std::string_view text, std::size_t at) {
    do ++at;
    while (at < text.size() && IsContinuation(text[at]));
    return at;
}

// Places are told in characters, from 1.
std::string WrongCharacter(std::string_view text, std::size_t at, const std::string& wanted) {
    const auto before = text.substr(0, at);
    const auto place =
        before.size() - static_cast<std::size_t>(std::count_if(before.begin(), before.end(), IsContinuation));
    const std::string where = ", where " + wanted + " belongs";
    if (at >= text.size()) return "it ends after character " + std::to_string(place) + where;
    return "character " + std::to_string(place + 1) + " is " + Quoted(text.substr(at, EndOfCharacter(text, at) - at)) +
           where;
}

bool IsDashes(std::string_view text) {
    if (!text.empty() && text[0] == ' ') text.remove_prefix(1);
    if (text.size() != 11) return false;
    for (std::size_t i = 0; i < text.size(); ++i)
        if (i % 3 == 2 ? kSeparatorCharacters.find(text[i]) == kSeparatorCharacters.npos : text[i] != '-') return false;
    return true;
}

// Eleven characters from `begin`: pairs of digits and separators between them. The reason where they are not.
std::string WhyNoFixedForm(std::string_view text, std::size_t begin) {
    for (std::size_t i = 0; i < 11; ++i) {
        const std::size_t at = begin + i;
        const bool ends = at >= text.size();
        const std::string field = kFieldNames[i / 3];
        if (i % 3 == 2) {
            if (ends || kSeparatorCharacters.find(text[at]) == kSeparatorCharacters.npos)
                return WrongCharacter(text, at, "a separator behind the " + field);
        } else if (ends || !IsDigit(text[at])) {
            return WrongCharacter(text, at, "a digit of the " + field);
        }
    }
    return text.size() == begin + 11 ? std::string() : WrongCharacter(text, begin + 11, "the end");
}

std::string ListOf(const std::string& separators) {
    return Quoted(separators.substr(0, 1)) + ", " + Quoted(separators.substr(1, 1)) + " and " +
           Quoted(separators.substr(2));
}

// The system that writes these separators, as the library knows it.
ulong32 SystemOf(const std::string& separators) {
    SZTC zero;
    const std::string text =
        " 00" + separators.substr(0, 1) + "00" + separators.substr(1, 1) + "00" + separators.substr(2) + "00";
    std::copy(text.begin(), text.end(), zero.text);
    return TCINFO(zero).sys();
}

Reading ReadFixed(const std::string& text, ulong32 system) {
    constexpr std::string_view kDisplays = "><*", kHidden = "##:##:##:##";
    if (IsDashes(text)) return Flagged(kUnassigned, "dashes stand for a position that is not given");
    if (const auto mark = kDisplays.find(text[0]); mark != kDisplays.npos && text.substr(1, 2) == kHidden.substr(0, 2))
        return Flagged(kInvalid, mark == 2 ? "this is how an invalid position is shown"
                                           : "this is how a position of a day or more is shown");
    const bool hasMark = text[0] == ' ' || text[0] == '-' || text[0] == '+';
    const std::size_t begin = hasMark ? 1 : 0;
    if (const std::string reason = WhyNoFixedForm(text, begin); !reason.empty()) return Flagged(kUnassigned, reason);

    const std::string separators = {text[begin + 2], text[begin + 5], text[begin + 8]};
    const ulong32 told = SystemOf(separators);
    if (system == kAnySystem) {
        if (told >= kSystems) return Flagged(kUnassigned, "no system has the separators " + ListOf(separators));
        system = told;
    }
    const bool isNeutral = separators == ":::" || (separators == "::;" && SkipsLabels(system));
    if (told != system && !isNeutral)
        return Flagged(kInvalid, "its separators are those of " + (told < kSystems ? NameOf(told) : "no system") +
                                     " and not of " + NameOf(system));

    ulong32 field[4];
    for (std::size_t i = 0; i < 4; ++i)
        field[i] = static_cast<ulong32>((text[begin + 3 * i] - '0') * 10 + (text[begin + 3 * i + 1] - '0'));
    if (const std::string reason = WhyNoPosition(field, system); !reason.empty()) return Flagged(kInvalid, reason);
    const timecode value(static_cast<long32>(field[0]), field[1], field[2], field[3], system);
    return Position(text[0] == '-' ? -value : value);
}

// Walks along the universal form, as the library scans it, to where it ends or differs.
class UniversalWalk {
public:
    explicit UniversalWalk(std::string_view text) : m_text(text) {}

    bool Literal(char wanted, const char* where) {
        if (m_at < m_text.size() && m_text[m_at] == wanted) {
            ++m_at;
            return true;
        }
        return Stop(Quoted(std::string(1, wanted)) + " " + where);
    }
    bool Any(char& c) {
        if (m_at >= m_text.size()) return Stop("a mark behind the frames");
        c = m_text[m_at];
        m_at = EndOfCharacter(m_text, m_at);
        return true;
    }
    bool Number(ulong32& value, const std::string& what) {
        constexpr std::string_view kBlanks = " \t\n\v\f\r";
        while (m_at < m_text.size() && kBlanks.find(m_text[m_at]) != kBlanks.npos) ++m_at;
        const bool negative = m_at < m_text.size() && m_text[m_at] == '-';
        if (negative || (m_at < m_text.size() && m_text[m_at] == '+')) ++m_at;
        const std::size_t first = m_at;
        value = 0;
        for (; m_at < m_text.size() && IsDigit(m_text[m_at]); ++m_at) {
            if (value > (0xFFFFFFFFu - 9) / 10) return Fail("the number of the " + what + " does not fit 32 bits");
            value = value * 10 + static_cast<ulong32>(m_text[m_at] - '0');
        }
        if (m_at == first) return Stop("a number, the " + what + ",");
        if (negative) value = 0 - value;
        return true;
    }
    const std::string& Reason() const { return m_reason; }

private:
    bool Stop(const std::string& wanted) { return Fail(WrongCharacter(m_text, m_at, wanted)); }
    bool Fail(const std::string& reason) {
        m_reason = reason;
        return false;
    }

    std::string_view m_text;
    std::size_t m_at = 0;
    std::string m_reason;
};

// Why the library did not take a universal text. It scans more than the form, so this is asked afterwards.
std::string WhyNoUniversalForm(const std::string& text) {
    if (text.compare(0, 11, "--:--:--:--") == 0) return "dashes stand for a position that is not given";
    UniversalWalk walk(text);
    ulong32 field[4], n = 0, d = 0;
    char mark = 0;
    for (std::size_t i = 0; i < 4; ++i) {
        if (!walk.Number(field[i], kFieldNames[i])) return walk.Reason();
        if (i < 3 && !walk.Literal(':', (std::string("behind the ") + kFieldNames[i]).c_str())) return walk.Reason();
    }
    if (!walk.Any(mark) || !walk.Literal('{', "before the rate") || !walk.Number(n, "rate") ||
        !walk.Literal('/', "within the rate") || !walk.Number(d, "rate's divisor") ||
        !walk.Literal('}', "behind the rate") || !walk.Literal('H', "of the unit Hz") ||
        !walk.Literal('z', "of the unit Hz"))
        return walk.Reason();
    const std::string rate = std::to_string(n) + '/' + std::to_string(d);
    ulong32 system = timecode::GetTCSystemOf(n, d);
    if (system >= kSystems) return "the rate " + rate + " is that of no system";
    if (text[text.size() - 2] == '/') system = timecode::GetDFSystem(system);
    if (system >= kSystems) return "there is no drop frame at the rate " + rate;
    if (const std::string reason = WhyNoPosition(field, system); !reason.empty()) return reason;
    if (mark == '+' || mark == '-')
        return std::string("the mark ") + Quoted(std::string(1, mark)) + " moves by a span that is too large in " +
               NameOf(system);
    return "the library does not read it";
}

Reading ReadUniversal(const std::string& text, const wchar_t* wide, ulong32 system) {
    SZUTC form;
    std::size_t length = 0;
    while (wide[length]) ++length;
    if (length >= std::size(form.text))
        return Flagged(kUnassigned, "a universal text has " + std::to_string(std::size(form.text) - 1) +
                                        " characters at most, and this one " + Grouped(length));
    std::copy_n(wide, length + 1, form.text);
    const timecode value = form;
    if (value.sys() >= kSystems) return Flagged(value.GetFlags(), WhyNoUniversalForm(text));
    if (system != kAnySystem && value.sys() != system)
        return Flagged(kInvalid, "its rate is that of " + NameOf(value.sys()) + " and not of " + NameOf(system));
    return Position(value);
}

} // namespace

std::string NameOf(ulong32 system) { return Shown(timecode::GetSystemString(system), Pairs::Standard); }

std::string RateOf(ulong32 system) {
    ulong32 numerator = 0, denominator = 0;
    timecode::GetFrameRateScaleOf(system, &numerator, &denominator);
    return std::to_string(numerator) + '/' + std::to_string(denominator);
}

std::string SeparatorsOf(ulong32 system) {
    const SZTC zero(0LL, system);
    return {static_cast<char>(zero.text[3]), static_cast<char>(zero.text[6]), static_cast<char>(zero.text[9])};
}

ulong32 FrameLimit(ulong32 system) {
    ulong32 limit = 1;
    while (TCINFO(0, 0, 0, limit, system).IsDefined()) ++limit;
    return limit;
}

DropRule DropRuleOf(ulong32 system) {
    DropRule rule = {0, 1};
    if (!SkipsLabels(system)) return rule;
    while (!TCINFO(0, 1, 0, rule.frames, system).IsDefined()) ++rule.frames;
    while (!TCINFO(0, rule.period, 0, 0, system).IsDefined()) ++rule.period;
    return rule;
}

bool IsCount(const std::string& text) {
    std::string_view number;
    return !text.empty() && SplitCount(text, number) != Unit::None;
}

bool FindSystem(const std::string& text, ulong32& system) {
    if (text.empty()) return true;
    ulong32 code = 0;
    if (ReadNumber(text, code)) {
        if (code >= kSystems) return Refuse(text, "codes go from 0 to 13, and a rate is written like 25/1");
        system = code;
        return true;
    }
    for (code = 0; code < kSystems; ++code)
        if (SameName(text, NameOf(code))) {
            system = code;
            return true;
        }
    if (text.find('/') != text.npos) return FindByRate(text, system);
    return Refuse(text, "give a name, a code, or a rate like 25/1");
}

void WarnOf(ulong32 system) {
    static bool warned = false;
    if (system != eSystemHDFilmDF || warned) return;
    warned = true;
    Complain("warning: no standard knows " + NameOf(system) + "; other programs do not have its labels");
}

const char* Reading::Verdict() const {
    return IsPosition() ? "valid" : value.GetFlags() & kUnassigned ? "unassigned" : "invalid";
}

Reading ReadPosition(const std::string& text, ulong32 system) {
    if (text.empty()) return Flagged(kUnassigned, "it is empty");
    WideText wide;
    if (!ToWide(text, Pairs::Standard, wide)) return Flagged(kUnassigned, "it is no UTF-8");
    if (text.find('{') != text.npos) return ReadUniversal(text, wide, system);
    std::string_view number;
    if (const Unit unit = SplitCount(text, number); unit != Unit::None) {
        if (system == kAnySystem)
            return Flagged(kUnassigned, "it is a count without fields, and does not tell its system");
        return ReadCount(number, unit, system);
    }
    return ReadFixed(text, system);
}

std::string Cleaned(const std::string& text) {
    WideText wide;
    if (ToWide(text, Pairs::Standard, wide)) return Shown(wide, Pairs::Standard);
    std::string clean;
    for (const char c : text) clean += static_cast<unsigned char>(c) < 0x80 ? std::string(1, c) : "\xEF\xBF\xBD";
    return clean;
}

std::string Named(const std::string& text) {
    constexpr std::size_t kLongest = 60;
    std::string clean = Cleaned(text);
    if (clean.size() <= kLongest) return Quoted(clean);
    std::size_t end = kLongest;
    while ((static_cast<unsigned char>(clean[end]) & 0xC0) == 0x80) --end;
    return Quoted(clean.substr(0, end)) + "...";
}

} // namespace tool
