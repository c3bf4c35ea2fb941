// The strings of one character set: every constructor is an assignment to the absent string, every assignment builds a
// new text and then gives up the old one.

#include "transcoding.h"

#include "platform/platform.h"
#include <TAVO/core.h>
#include <TAVO/string.h>

namespace TAVO::String {
namespace {

using namespace detail;

constexpr std::size_t kNoLength = SIZE_MAX; // len() of a string assigned from an absent text of its own kind

// A text under construction.
template <class Unit> struct Built {
    Unit* text = nullptr;
    std::size_t length = 0; // what len() will answer
};

// Null when the heap refuses or the size in bytes overflows.
template <class Unit> Unit* AllocateUnits(std::size_t count) {
    if (count > SIZE_MAX / sizeof(Unit)) return nullptr;
    return static_cast<Unit*>(Core::OS::_falloc(count * sizeof(Unit)));
}

template <class Unit> void Take(Unit*& text, std::size_t& length, Built<Unit> built) {
    Unit* const old = text;
    text = built.text;
    length = built.length;
    if (old) Core::OS::_ffree(old);
}

// The units as they are; Source and Unit have one size.
template <class Unit, class Source> Built<Unit> Copied(const Source* source) {
    if (!source) return {};
    const std::size_t length = Simd::ZeroUnit(source, SIZE_MAX);
    auto* text = AllocateUnits<Unit>(length + 1);
    if (!text) return {};
    std::memcpy(text, source, (length + 1) * sizeof(Unit));
    return {text, length};
}

// Copied, for the classes where an absent source of the own kind has the length SIZE_MAX.
// Intended (absent-length): one would expect 0. Callers test the text, never this length.
template <class Unit> Built<Unit> CopiedOwn(const Unit* source) {
    if (!source) return {nullptr, kNoLength};
    return Copied<Unit>(source);
}

// UTF-8 to UTF-16 units. A value above 10FFFF ends the text as an invalid sequence does.
template <class Unit> Built<Unit> FromUtf8(const unsigned char* source) {
    if (!source) return {};
    const Extent extent = MeasureUtf8(source, Simd::ZeroUnit(source, SIZE_MAX));
    auto* text = AllocateUnits<Unit>(extent.target + 1);
    if (!text) return {};
    Unit* out = text;
    ConvertUtf8(source, extent, out);
    *out = 0;
    return {text, static_cast<std::size_t>(out - text)};
}

// UTF-16 units to UTF-8.
template <class Unit> Built<unsigned char> ToUtf8(const Unit* source) {
    if (!source) return {};
    const Extent extent = MeasureUtf16(source, WideLength(source));
    auto* text = AllocateUnits<unsigned char>(extent.target + 1);
    if (!text) return {};
    unsigned char* out = text;
    ConvertUtf16(source, extent, out);
    *out = 0;
    return {text, static_cast<std::size_t>(out - text)};
}

Built<wchar_t> FromUtf32(const ulong32* source) {
    if (!source) return {};
    auto* text = AllocateUnits<wchar_t>(UTF32wstrlen(source, SIZE_MAX) + 1);
    if (!text) return {};
    wchar_t* out = text;
    while (*source && EncodeUtf16(out, *source)) ++source;
    *out = 0;
    return {text, static_cast<std::size_t>(out - text)};
}

// Intended (ansi-length): the length counts the terminator, as that of wide text does.
Built<wchar_t> FromAnsi(const char* source) {
    if (!source) return {};
    const int size = Platform::AnsiToWide(source, -1, nullptr, 0);
    if (size <= 0) return {};
    auto* text = AllocateUnits<wchar_t>(static_cast<std::size_t>(size) + 1);
    if (!text) return {};
    if (Platform::AnsiToWide(source, -1, text, size) <= 0) {
        Core::OS::_ffree(text);
        return {};
    }
    return {text, static_cast<std::size_t>(size)};
}

// Wide text to units: a pair becomes the one unit 0 or 1.
Built<unsigned short> Decoded(const wchar_t* source) {
    if (!source) return {};
    const Extent extent = MeasureUtf16(source, WideLength(source));
    auto* text = AllocateUnits<unsigned short>(extent.characters + 1);
    if (!text) return {};
    unsigned short* out = text;
    const wchar_t* const end = source + extent.source;
    for (ulong32 value; source < end && StepUtf16(value, source);) *out++ = static_cast<unsigned short>(value);
    *out = 0;
    return {text, extent.characters};
}

constexpr std::size_t kAnsiRoom = 8; // bytes kept for every character of ANSI text

Built<char> ToAnsi(const wchar_t* source) {
    if (!source) return {};
    const int size = Platform::WideToAnsi(source, -1, nullptr, 0);
    if (size <= 0) return {};
    auto* text = AllocateUnits<char>(static_cast<std::size_t>(size) * kAnsiRoom);
    if (!text) return {};
    if (Platform::WideToAnsi(source, -1, text, size) <= 0) {
        Core::OS::_ffree(text);
        return {};
    }
    return {text, static_cast<std::size_t>(size) - 1};
}

Built<char> CopiedAnsi(const char* source) {
    if (!source) return {};
    const std::size_t length = Simd::ZeroUnit(source, SIZE_MAX);
    if (length > SIZE_MAX / kAnsiRoom - 1) return {};
    auto* text = AllocateUnits<char>((length + 1) * kAnsiRoom);
    if (!text) return {};
    std::memcpy(text, source, length + 1);
    return {text, length};
}

bool IsPercentS(const wchar_t* text) { return text[0] == L'%' && text[1] == L's'; }

} // namespace

// --- CACFWChar -----------------------------------------------------------------------------------------------------

CACFWChar::CACFWChar(const CACFWChar& other) { *this = other.m_text; }
CACFWChar::CACFWChar(const wchar_t* text) { *this = text; }
CACFWChar::CACFWChar(const unsigned short* text) { *this = text; }
CACFWChar::CACFWChar(const unsigned char* text) { *this = text; }
CACFWChar::CACFWChar(const ulong32* text) { *this = text; }
CACFWChar::CACFWChar(const char* text) { *this = text; }
CACFWChar::CACFWChar(const CUTF8Char& text) { *this = *text; }
CACFWChar::CACFWChar(const CUTF16Char& text) { *this = *text; }
CACFWChar::CACFWChar(const CANSIChar& text) { *this = *text; }
CACFWChar::~CACFWChar() { Core::OS::_ffree(m_text); }

CACFWChar& CACFWChar::operator=(const CACFWChar& other) { return *this = other.m_text; }
CACFWChar& CACFWChar::operator=(const wchar_t* text) {
    Built<wchar_t> built = Copied<wchar_t>(text);
    // Intended (wide-length): the length counts the terminator, unlike that of most other sources, and is set even when
    // the allocation failed. Callers size buffers by it.
    built.length = text ? WideLength(text) + 1 : 0;
    Take(m_text, m_length, built);
    return *this;
}
CACFWChar& CACFWChar::operator=(const unsigned short* text) {
    Take(m_text, m_length, Copied<wchar_t>(text));
    return *this;
}
CACFWChar& CACFWChar::operator=(const unsigned char* text) {
    Take(m_text, m_length, FromUtf8<wchar_t>(text));
    return *this;
}
CACFWChar& CACFWChar::operator=(const ulong32* text) {
    Take(m_text, m_length, FromUtf32(text));
    return *this;
}
CACFWChar& CACFWChar::operator=(const char* text) {
    Take(m_text, m_length, FromAnsi(text));
    return *this;
}
CACFWChar& CACFWChar::operator=(const CUTF8Char& text) { return *this = *text; }
CACFWChar& CACFWChar::operator=(const CUTF16Char& text) { return *this = *text; }
CACFWChar& CACFWChar::operator=(const CANSIChar& text) { return *this = *text; }

void CACFWChar::patch_percent_s_with(const wchar_t* text) {
    if (!text || !m_text) return;
    std::size_t found = 0;
    for (const wchar_t* at = m_text; *at; ++at)
        if (IsPercentS(at)) ++found, ++at;
    if (found == 0) return;

    const std::size_t inserted = WideLength(text);
    if (inserted > (SIZE_MAX / sizeof(wchar_t) - 1 - m_length) / found) return;
    auto* const patched = AllocateUnits<wchar_t>(found * inserted + m_length + 1);
    if (!patched) return;
    wchar_t* out = patched;
    for (const wchar_t* at = m_text; *at; ++at) {
        if (IsPercentS(at)) {
            WideCopy(out, text, inserted);
            out += inserted;
            ++at;
        } else {
            *out++ = *at;
        }
    }
    *out = 0;
    // Intended (patch-length): the two units of each "%s" are not subtracted, so the length exceeds the true count from
    // now on.
    Take(m_text, m_length, {patched, m_length + found * inserted});
}

// --- CUTF8Char -----------------------------------------------------------------------------------------------------

CUTF8Char::CUTF8Char(const CUTF8Char& other) { *this = other.m_text; }
CUTF8Char::CUTF8Char(const wchar_t* text) { *this = text; }
CUTF8Char::CUTF8Char(const unsigned short* text) { *this = text; }
CUTF8Char::CUTF8Char(const unsigned char* text) { *this = text; }
CUTF8Char::CUTF8Char(const char* text) { *this = text; }
CUTF8Char::CUTF8Char(const CACFWChar& text) { *this = *text; }
CUTF8Char::CUTF8Char(const CUTF16Char& text) { *this = *text; }
CUTF8Char::CUTF8Char(const CANSIChar& text) { *this = *text; }
CUTF8Char::~CUTF8Char() { Core::OS::_ffree(m_text); }

CUTF8Char& CUTF8Char::operator=(const CUTF8Char& other) { return this == &other ? *this : *this = other.m_text; }
CUTF8Char& CUTF8Char::operator=(const wchar_t* text) {
    Take(m_text, m_length, ToUtf8(text));
    return *this;
}
CUTF8Char& CUTF8Char::operator=(const unsigned short* text) {
    Take(m_text, m_length, ToUtf8(text));
    return *this;
}
CUTF8Char& CUTF8Char::operator=(const unsigned char* text) {
    Take(m_text, m_length, CopiedOwn(text));
    return *this;
}
CUTF8Char& CUTF8Char::operator=(const char* text) { return *this = *CACFWChar(text); }
CUTF8Char& CUTF8Char::operator=(const CACFWChar& text) { return *this = *text; }
CUTF8Char& CUTF8Char::operator=(const CUTF16Char& text) { return *this = *text; }
CUTF8Char& CUTF8Char::operator=(const CANSIChar& text) { return *this = *text; }

// --- CUTF16Char ----------------------------------------------------------------------------------------------------

CUTF16Char::CUTF16Char(const CUTF16Char& other) { *this = other.m_text; }
CUTF16Char::CUTF16Char(const wchar_t* text) { *this = text; }
CUTF16Char::CUTF16Char(const unsigned short* text) { *this = text; }
CUTF16Char::CUTF16Char(const unsigned char* text) { *this = text; }
CUTF16Char::CUTF16Char(const char* text) { *this = text; }
CUTF16Char::CUTF16Char(const CACFWChar& text) { *this = *text; }
CUTF16Char::CUTF16Char(const CUTF8Char& text) { *this = *text; }
CUTF16Char::CUTF16Char(const CANSIChar& text) { *this = *text; }
CUTF16Char::~CUTF16Char() { Core::OS::_ffree(m_text); }

CUTF16Char& CUTF16Char::operator=(const CUTF16Char& other) { return this == &other ? *this : *this = other.m_text; }
CUTF16Char& CUTF16Char::operator=(const wchar_t* text) {
    Take(m_text, m_length, Decoded(text));
    return *this;
}
CUTF16Char& CUTF16Char::operator=(const unsigned short* text) {
    Take(m_text, m_length, CopiedOwn(text));
    return *this;
}
CUTF16Char& CUTF16Char::operator=(const unsigned char* text) {
    Take(m_text, m_length, FromUtf8<unsigned short>(text));
    return *this;
}
CUTF16Char& CUTF16Char::operator=(const char* text) { return *this = *CACFWChar(text); }
CUTF16Char& CUTF16Char::operator=(const CACFWChar& text) { return *this = *text; }
CUTF16Char& CUTF16Char::operator=(const CUTF8Char& text) { return *this = *text; }
CUTF16Char& CUTF16Char::operator=(const CANSIChar& text) { return *this = *text; }

// --- CANSIChar -----------------------------------------------------------------------------------------------------

CANSIChar::CANSIChar(const CANSIChar& other) { *this = other.m_text; }
CANSIChar::CANSIChar(const wchar_t* text) { *this = text; }
CANSIChar::CANSIChar(const char* text) { *this = text; }
CANSIChar::CANSIChar(const CACFWChar& text) { *this = *text; }
CANSIChar::~CANSIChar() { Core::OS::_ffree(m_text); }

CANSIChar& CANSIChar::operator=(const CANSIChar& other) { return this == &other ? *this : *this = other.m_text; }
CANSIChar& CANSIChar::operator=(const wchar_t* text) {
    Take(m_text, m_length, ToAnsi(text));
    return *this;
}
CANSIChar& CANSIChar::operator=(const char* text) {
    Take(m_text, m_length, CopiedAnsi(text));
    return *this;
}
CANSIChar& CANSIChar::operator=(const CACFWChar& text) { return *this = *text; }

} // namespace TAVO::String
