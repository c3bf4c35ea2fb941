// The two text forms of timecode, written and read by hand: no allocation, no locale, no scanf.

#include "timecode_systems.h"

#include <algorithm>

namespace TAVO::TimeCode {

using namespace detail;

namespace {

// --- reading ---------------------------------------------------------------------------------------------------------

// Reads from the front of a piece of text.
class Scanner {
public:
    Scanner(const wchar_t* begin, const wchar_t* end) : m_at(begin), m_end(end) {}

    bool AtEnd() const { return m_at == m_end; }
    const wchar_t* At() const { return m_at; }

    bool Literal(wchar_t expected) {
        if (AtEnd() || *m_at != expected) return false;
        ++m_at;
        return true;
    }

    bool Any(wchar_t& unit) {
        if (AtEnd()) return false;
        unit = *m_at++;
        return true;
    }

    // A decimal number modulo 2^32 after white space; it may have a sign, which counts to its width.
    bool Number(ulong32& value, std::size_t width = static_cast<std::size_t>(-1)) {
        while (!AtEnd() && (*m_at == L' ' || (*m_at >= L'\t' && *m_at <= L'\r'))) ++m_at;
        const wchar_t* stop = width < static_cast<std::size_t>(m_end - m_at) ? m_at + width : m_end;
        const bool negative = m_at != stop && *m_at == L'-';
        if (m_at != stop && (*m_at == L'-' || *m_at == L'+')) ++m_at;
        const wchar_t* first = m_at;
        ulong32 magnitude = 0;
        for (; m_at != stop && *m_at >= L'0' && *m_at <= L'9'; ++m_at) magnitude = magnitude * 10 + (*m_at - L'0');
        value = negative ? 0 - magnitude : magnitude;
        return m_at != first;
    }

private:
    const wchar_t* m_at;
    const wchar_t* m_end;
};

// The terminator of `text`, or the end of its array.
template <std::size_t N> const wchar_t* EndWithin(const wchar_t (&text)[N]) { return std::find(text, text + N, L'\0'); }

const wchar_t* EndOf(const wchar_t* text) {
    while (*text) ++text;
    return text;
}

// --- separators ------------------------------------------------------------------------------------------------------

constexpr wchar_t kSeparators[] = {L':', L'.', L',',
                                   L';'}; // ';' stands only before the frames, ',' not after the hours
constexpr std::size_t kSeparatorCount = std::size(kSeparators);

constexpr std::size_t ClassOf(wchar_t separator) {
    std::size_t i = 0;
    while (i < kSeparatorCount && kSeparators[i] != separator) ++i;
    return i;
}

struct SeparatorTable {
    ulong32 word[kSeparatorCount][kSeparatorCount][kSeparatorCount];
};

constexpr SeparatorTable kSystemOfSeparators = [] {
    SeparatorTable table{};
    for (auto& plane : table.word)
        for (auto& row : plane)
            for (auto& word : row) word = kUnassigned;
    for (ulong32 code = 0; code < kSystemCount; ++code) {
        const wchar_t* s = kSystems[code].separators;
        table.word[ClassOf(s[0])][ClassOf(s[1])][ClassOf(s[2])] = code;
    }
    // Intended (timecode-bad-separators): the one combination that is an error and not just unknown.
    table.word[ClassOf(L'.')][ClassOf(L'.')][ClassOf(L':')] = kInvalid;
    return table;
}();

// A system code, or a flag alone.
ulong32 SystemOfSeparators(wchar_t hours, wchar_t minutes, wchar_t seconds) {
    const std::size_t h = ClassOf(hours), m = ClassOf(minutes), s = ClassOf(seconds);
    if (h == kSeparatorCount || m == kSeparatorCount || s == kSeparatorCount) return kUnassigned;
    return kSystemOfSeparators.word[h][m][s];
}

// --- writing ---------------------------------------------------------------------------------------------------------

wchar_t* PutTwoDigits(wchar_t* at, ulong32 value) {
    at[0] = static_cast<wchar_t>(L'0' + value / 10 % 10);
    at[1] = static_cast<wchar_t>(L'0' + value % 10);
    return at + 2;
}

wchar_t* PutNumber(wchar_t* at, ulong32 value) {
    wchar_t digits[10];
    wchar_t* first = std::end(digits);
    do *--first = static_cast<wchar_t>(L'0' + value % 10);
    while (value /= 10);
    return std::copy(first, std::end(digits), at);
}

wchar_t* PutText(wchar_t* at, const wchar_t* text) {
    while (*text) *at++ = *text++;
    return at;
}

// --- the fixed form --------------------------------------------------------------------------------------------------

constexpr std::size_t kFixedLength = 12;
constexpr wchar_t kUnassignedText[] = L" --:--:--:--";
constexpr wchar_t kInvalidText[] = L"*##:##:##:##";
static_assert(std::size(kUnassignedText) == kFixedLength + 1 && std::size(kInvalidText) == kFixedLength + 1);

void SetText(SZTC& target, const wchar_t (&text)[kFixedLength + 1]) {
    std::copy_n(text, kFixedLength + 1, target.text);
}

void SetSeparators(wchar_t* text, const wchar_t* separators) {
    text[3] = separators[0];
    text[6] = separators[1];
    text[9] = separators[2];
}

// The characters, zero-filled behind a terminator that comes early.
struct FixedText {
    wchar_t text[kFixedLength + 1];

    explicit FixedText(const SZTC& source) : text{} {
        for (std::size_t i = 0; i < kFixedLength && source.text[i]; ++i) text[i] = source.text[i];
    }
};

// Whether all pairs of characters between the separators satisfy `test`.
template <class Test> bool AllPairs(const wchar_t* pairs, Test test) {
    for (std::size_t i = 0; i < 4; ++i)
        if (!test(pairs[3 * i]) || !test(pairs[3 * i + 1])) return false;
    return true;
}

bool IsDigit(wchar_t c) { return c >= L'0' && c <= L'9'; }

bool IsDisplayMark(wchar_t c) { return c == L'>' || c == L'<' || c == L'*'; }

// The mark of free text that has all twelve characters, or 0 when it cannot be read.
wchar_t MarkOf(const wchar_t* text) {
    if (IsDisplayMark(text[0])) return AllPairs(text + 1, [](wchar_t c) { return c == L'#'; }) ? text[0] : L'\0';
    const bool isMark = text[0] == L' ' || text[0] == L'-' || text[0] == L'+';
    if (!isMark || !AllPairs(text + 1, IsDigit)) return L'\0';
    return text[0] == L'-' ? L'-' : L' ';
}

} // namespace

SZTC::SZTC(const TCINFO& record) noexcept {
    const ulong32 sys = record.sys();
    if (IsFlagged(sys)) {
        const bool isInvalid = (sys & kInvalid) || !(sys & kUnassigned);
        SetText(*this, isInvalid ? kInvalidText : kUnassignedText);
        return;
    }
    const bool negative = record.dd() < 0;
    if (record.dd() > 0 || record.dd() < -1) {
        SetText(*this, kInvalidText);
        text[0] = negative ? L'<' : L'>';
    } else {
        text[0] = negative ? L'-' : L' ';
        PutTwoDigits(text + 1, record.hh());
        PutTwoDigits(text + 4, record.mm());
        PutTwoDigits(text + 7, record.ss());
        PutTwoDigits(text + 10, record.ff());
        text[kFixedLength] = L'\0';
    }
    SetSeparators(text, RowOf(sys).separators);
}

TCINFO::TCINFO(const SZTC& source) noexcept : TCINFO() {
    FixedText fixed(source);
    wchar_t* text = fixed.text;
    if (text[0] == L'\0' || IsDisplayMark(text[0]) || text[1] == L'#') {
        m_sys = kInvalid;
        return;
    }
    const ulong32 sys = SystemOfSeparators(text[3], text[6], text[9]);
    m_sys = sys;
    if (IsFlagged(sys)) return;
    if (AllPairs(text + 1, [](wchar_t c) { return c == L'-'; })) {
        m_sys |= kUnassigned;
        return;
    }

    std::replace(text + 1, text + kFixedLength, L'-', L'0');
    SetSeparators(text, L":::");
    Scanner scan(text + 1, EndWithin(fixed.text));
    ulong32 hh, mm, ss, ff;
    if (!(scan.Number(hh, 2) && scan.Literal(L':') && scan.Number(mm, 2) && scan.Literal(L':') && scan.Number(ss, 2) &&
          scan.Literal(L':') && scan.Number(ff, 2))) {
        m_sys = kInvalid;
        return;
    }
    m_hh = hh;
    m_mm = mm;
    m_ss = ss;
    m_ff = ff;
    m_dd = text[0] == L'-' ? -1 : 0;
}

SZTC::SZTC(const wchar_t* freeText) noexcept : SZTC() {
    if (!freeText) return;
    std::size_t length = 0;
    while (length <= kFixedLength && freeText[length]) ++length;
    if (length != kFixedLength && length != kFixedLength - 1) return;

    wchar_t whole[kFixedLength] = {L' '};
    std::copy_n(freeText, length, whole + (kFixedLength - length));
    const wchar_t mark = MarkOf(whole);
    if (mark == L'\0' || IsFlagged(SystemOfSeparators(whole[3], whole[6], whole[9]))) return;
    std::copy_n(whole, kFixedLength, text);
    text[0] = mark;
}

SZTC::operator String::CACFWChar() const { return String::CACFWChar(FixedText(*this).text); }

SZTC::operator String::CUTF8Char() const {
    FixedText fixed(*this);
    // Intended (timecode-utf8): the system is dropped, so that readers of the UTF-8 form see one style of timecode
    // only.
    for (std::size_t i : {3, 6, 9})
        if (fixed.text[i]) fixed.text[i] = L':';
    return String::CUTF8Char(fixed.text);
}

// --- the exchange form -----------------------------------------------------------------------------------------------

namespace {

struct Exchange {
    ulong32 hh, mm, ss, ff;
    wchar_t mark;
    ulong32 numerator, denominator;
};

// Reads all seven items; what follows the last one is not looked at.
bool ReadExchange(Scanner scan, Exchange& e) {
    return scan.Number(e.hh) && scan.Literal(L':') && scan.Number(e.mm) && scan.Literal(L':') && scan.Number(e.ss) &&
           scan.Literal(L':') && scan.Number(e.ff) && scan.Any(e.mark) && scan.Literal(L'{') &&
           scan.Number(e.numerator) && scan.Literal(L'/') && scan.Number(e.denominator);
}

TCINFO RecordOf(const Exchange& e, ulong32 sys) { return TCINFO(static_cast<long32>(e.hh), e.mm, e.ss, e.ff, sys); }

// "{25/1}Hz" and the terminator.
void PutRate(wchar_t* at, ulong32 sys, bool isDrop) {
    ulong32 numerator, denominator;
    timecode::GetFrameRateScaleOf(sys, &numerator, &denominator);
    *at++ = L'{';
    at = PutNumber(at, numerator);
    *at++ = L'/';
    at = PutNumber(at, denominator);
    at = PutText(at, isDrop ? L"}Hz/D" : L"}Hz");
    *at = L'\0';
}

void PutFlagged(SZUTC& target, ulong32 sys, bool isDrop) {
    PutRate(PutText(target.text, L"--:--:--:-- "), sys, isDrop);
}

void PutDefined(SZUTC& target, const TCINFO& record, wchar_t mark) {
    wchar_t* at = PutTwoDigits(target.text, record.hh());
    for (ulong32 field : {record.mm(), record.ss(), record.ff()}) {
        *at++ = L':';
        at = PutTwoDigits(at, field);
    }
    *at++ = mark;
    PutRate(at, record.sys(), timecode::IsDFSystem(record.sys()));
}

// The first "}Hz", or `end`.
const wchar_t* FindUnit(const wchar_t* begin, const wchar_t* end) {
    constexpr wchar_t unit[] = {L'}', L'H', L'z'};
    return std::search(begin, end, std::begin(unit), std::end(unit));
}

} // namespace

SZUTC::SZUTC(timecode value) noexcept {
    if (IsFlagged(value.sys())) {
        PutFlagged(*this, CodeOf(value.sys()), value.IsDFSystem());
        return;
    }
    const bool negative = value < 0LL;
    const TCINFO record(negative ? value.Wrap() : value);
    PutDefined(*this, record, negative ? L'-' : record.dd() != 0 ? L'+' : L' ');
}

SZUTC::operator timecode() const noexcept {
    const wchar_t* end = EndWithin(text);
    Exchange e{};
    if (!ReadExchange(Scanner(text, end), e)) return timecode();
    ulong32 sys = timecode::GetTCSystemOf(e.numerator, e.denominator);
    if (IsFlagged(sys)) return timecode();
    if (end[-2] == L'/') sys = timecode::GetDFSystem(sys);

    timecode value(RecordOf(e, sys));
    if (e.mark == L'+') value.Slip(1);
    if (e.mark == L'-') value.Slip(-1);
    return value;
}

SZUTC::SZUTC(const wchar_t* freeText) noexcept : text{} {
    if (!freeText) return;
    const wchar_t* end = EndOf(freeText);
    const wchar_t* unit = FindUnit(freeText, end);
    Exchange e{};
    if (ReadExchange(Scanner(freeText, end), e)) {
        ulong32 sys = timecode::GetTCSystemOf(e.numerator, e.denominator);
        const bool isDrop = end - unit == 5 && unit[3] == L'/' && unit[4] == L'D';
        if (isDrop && !IsFlagged(sys)) sys = timecode::GetDFSystem(sys);
        const TCINFO record = RecordOf(e, sys);
        if (record.IsDefined()) PutDefined(*this, record, e.mark);
        return;
    }

    // Intended (timecode-rate-alone): fields that cannot be read leave the rate alone, but only where its fraction
    // fills the five characters before the unit, and drop frame is forgotten. Readers of such texts look at the rate's
    // numbers only.
    constexpr std::ptrdiff_t kFraction = 5;
    if (unit == end || unit - freeText < kFraction) return;
    Scanner scan(unit - kFraction, end);
    if (!(scan.Number(e.numerator) && scan.Literal(L'/') && scan.Number(e.denominator))) return;
    const ulong32 sys = timecode::GetTCSystemOf(e.numerator, e.denominator);
    if (!IsFlagged(sys)) PutFlagged(*this, sys, false);
}

} // namespace TAVO::TimeCode
