// Transcoding: single characters, counts and whole texts, each one body for UTF-16 and wide text.

#include "transcoding.h"

#include "platform/platform.h"
#include <TAVO/string.h>

namespace TAVO::String {
namespace detail {

Extent MeasureUtf8(const unsigned char* text, std::size_t length) {
    Extent extent;
    while (extent.source < length) {
        const unsigned char* at = text + extent.source;
        const std::size_t bytes = Utf8Sequence(at, length - extent.source);
        if (bytes == 0) {
            extent.ending = kUtf8Length[*at] > length - extent.source ? Ending::Cut : Ending::Invalid;
            break;
        }
        extent.source += bytes;
        ++extent.characters;
        extent.target += bytes == 4 && (at[0] > 0xF0 || at[1] >= 0x90) ? 2 : 1;
    }
    return extent;
}

namespace {

template <class Unit> Extent MeasureUnits(const Unit* text, std::size_t length) {
    Extent extent;
    while (extent.source < length) {
        const Unit* at = text + extent.source;
        const std::size_t units = Utf16Sequence(at, length - extent.source);
        if (units == 0) {
            extent.ending = IsHighSurrogate(*at) && length - extent.source == 1 ? Ending::Cut : Ending::Invalid;
            break;
        }
        extent.source += units;
        ++extent.characters;
        extent.target += units == 2 || *at < 0x80 ? 1 : *at < 0x800 ? 2 : 3;
    }
    return extent;
}

template <class Unit> bool ConvertBytes(const unsigned char* text, std::size_t length, Unit*& out) {
    const unsigned char* const end = text + length;
    for (ulong32 codePoint; text < end && StepUtf8(codePoint, text);)
        if (!EncodeUtf16(out, codePoint)) return false;
    return true;
}

template <class Unit> void ConvertUnits(const Unit* text, std::size_t length, unsigned char*& out) {
    const Unit* const end = text + length;
    for (ulong32 codePoint; text < end && StepUtf16(codePoint, text);) EncodeUtf8(out, codePoint);
}

} // namespace

Extent MeasureUtf16(const wchar_t* text, std::size_t length) { return MeasureUnits(text, length); }
Extent MeasureUtf16(const unsigned short* text, std::size_t length) { return MeasureUnits(text, length); }
bool ConvertUtf8(const unsigned char* text, std::size_t length, wchar_t*& out) {
    return ConvertBytes(text, length, out);
}
bool ConvertUtf8(const unsigned char* text, std::size_t length, unsigned short*& out) {
    return ConvertBytes(text, length, out);
}
void ConvertUtf16(const wchar_t* text, std::size_t length, unsigned char*& out) { ConvertUnits(text, length, out); }
void ConvertUtf16(const unsigned short* text, std::size_t length, unsigned char*& out) {
    ConvertUnits(text, length, out);
}

} // namespace detail

namespace {

using namespace detail;

Extent MeasureText(const unsigned char* text, std::size_t length) { return MeasureUtf8(text, length); }
template <class Unit> Extent MeasureText(const Unit* text, std::size_t length) { return MeasureUtf16(text, length); }

template <class Unit> Extent Measure(const Unit* text, std::size_t n) {
    return text ? MeasureText(text, Simd::ZeroUnit(text, n)) : Extent();
}

// Scans page by page and asks before each whether it can be read. A unit never straddles pages.
template <class Unit> std::size_t GuardedLength(const Unit* text, std::size_t n) {
    if (!text) return 0;
    std::size_t i = 0;
    while (i < n) {
        if (!Platform::IsReadable(text + i)) return 0;
        const std::size_t toPageEnd =
            Platform::PageSize - reinterpret_cast<std::uintptr_t>(text + i) % Platform::PageSize;
        const std::size_t units = (toPageEnd + sizeof(Unit) - 1) / sizeof(Unit);
        const std::size_t part = units < n - i ? units : n - i;
        const std::size_t length = WideLengthN(text + i, part);
        i += length;
        if (length < part) break;
    }
    return i;
}

// Intended: the element at index n belongs to the count, where one would expect the bound to end it; n = 0 alone is
// nothing. Callers pass the index of the last element.
template <class Size> std::size_t CountUtf32(const ulong32* text, std::size_t n, ulong32 last, Size size) {
    if (!text || n == 0) return 0;
    std::size_t count = 0;
    for (std::size_t i = 0; i <= n && text[i] != 0 && text[i] <= last; ++i) {
        count += size(text[i]);
        if (i == SIZE_MAX) break;
    }
    return count;
}

// The common shape of the whole-string converters: measure, check the room, convert, terminate.
template <class Source, class Target, class Convert>
std::size_t ConvertWhole(const Source* source, std::size_t sourceLength, Target* target, std::size_t capacity,
                         Convert convert) {
    if (!source) return 0;
    const std::size_t length = Simd::ZeroUnit(source, sourceLength);
    const Extent extent = MeasureText(source, length);
    const std::size_t need = extent.target + 1;
    if (!target) return need;
    if (capacity < need) return 0;
    if (!convert(source, extent.source, target)) return 0;
    // Intended: as many characters are read as there are target units, so that behind a character that took more than
    // one an invalid sequence is met and fails the whole, while it ends other texts silently. One that the terminator
    // cuts is invalid; of one that the source length cuts nobody can tell.
    const bool invalid = extent.ending == Ending::Invalid || (extent.ending == Ending::Cut && length < sourceLength);
    if (invalid && extent.target > extent.characters) return 0;
    *target = 0;
    return need;
}

} // namespace

// --- Single characters ---------------------------------------------------------------------------------------------

std::size_t UTF8Size(ulong32 codePoint) {
    return codePoint < 0x80 ? 1 : codePoint < 0x800 ? 2 : codePoint < 0x10000 ? 3 : codePoint < 0x110000 ? 4 : 0;
}
std::size_t UTF8Len(unsigned char lead) { return kUtf8Length[lead]; }
// Intended: 110000, one above the last code point, still counts 2.
std::size_t UTF16Size(ulong32 codePoint) { return codePoint < 0x10000 ? 1 : codePoint <= 0x110000 ? 2 : 0; }
std::size_t UTF16Len(unsigned short unit) { return IsLowSurrogate(unit) ? 0 : IsHighSurrogate(unit) ? 2 : 1; }
std::size_t acfWSize(ulong32 codePoint) { return codePoint < 0x10000 ? 1 : 2; }
std::size_t acfWLen(wchar_t) { return 1; }

// Intended: steps over two-byte leads and not, as its UTF-16 sibling would suggest, over continuation bytes. Callers
// rely on it as it is.
void UTF8Sync(const unsigned char*& text) {
    while ((*text & 0xE0) == 0xC0) ++text;
}
void UTF16Sync(const unsigned short*& text) {
    while (IsLowSurrogate(*text)) ++text;
}
void acfWSync(const wchar_t*& text) {
    while (IsLowSurrogate(*text)) ++text;
}

// --- Counts --------------------------------------------------------------------------------------------------------

std::size_t UTF8w32strlen(const unsigned char* source, std::size_t n) { return Measure(source, n).characters; }
std::size_t UTF8u16strlen(const unsigned char* source, std::size_t n) { return Measure(source, n).target; }
std::size_t UTF8wstrlen(const unsigned char* source, std::size_t n) { return UTF8u16strlen(source, n); }
std::size_t UTF16w32strlen(const unsigned short* source, std::size_t n) { return Measure(source, n).characters; }
std::size_t acfWw32strlen(const wchar_t* source, std::size_t n) { return Measure(source, n).characters; }
std::size_t UTF16u8strlen(const unsigned short* source, std::size_t n) { return Measure(source, n).target; }
std::size_t acfWu8strlen(const wchar_t* source, std::size_t n) { return Measure(source, n).target; }
std::size_t UTF16wstrlen(const unsigned short* source, std::size_t n) { return GuardedLength(source, n); }
std::size_t acfWu16strlen(const wchar_t* source, std::size_t n) { return GuardedLength(source, n); }
std::size_t UTF32wstrlen(const ulong32* source, std::size_t n) { return CountUtf32(source, n, 0x110000, acfWSize); }
std::size_t UTF32u16strlen(const ulong32* source, std::size_t n) { return UTF32wstrlen(source, n); }
std::size_t UTF32u8strlen(const ulong32* source, std::size_t n) { return CountUtf32(source, n, 0x10FFFF, UTF8Size); }

// --- Steps ---------------------------------------------------------------------------------------------------------

namespace {

template <class Unit> bool Utf8ToUnit(Unit*& out, const unsigned char*& in) {
    ulong32 codePoint;
    return StepUtf8(codePoint, in) && EncodeUtf16(out, codePoint);
}
template <class Unit> bool UnitToUtf8(unsigned char*& out, const Unit*& in) {
    ulong32 codePoint;
    return StepUtf16(codePoint, in) && EncodeUtf8(out, codePoint);
}

} // namespace

bool utf8_acfW32(ulong32* out, const unsigned char*& in) { return StepUtf8(*out, in); }
bool acfW_acfW32(ulong32* out, const wchar_t*& in) { return StepUtf16(*out, in); }
bool utf16_acfW32(ulong32* out, const unsigned short*& in) { return StepUtf16(*out, in); }
bool acfW32_utf8(unsigned char*& out, ulong32 codePoint) { return EncodeUtf8(out, codePoint); }
bool acfW32_acfW(wchar_t*& out, ulong32 codePoint) { return EncodeUtf16(out, codePoint); }
bool acfW32_utf16(unsigned short*& out, ulong32 codePoint) { return EncodeUtf16(out, codePoint); }
bool utf8_acfW(wchar_t*& out, const unsigned char*& in) { return Utf8ToUnit(out, in); }
bool utf8_utf16(unsigned short*& out, const unsigned char*& in) { return Utf8ToUnit(out, in); }
bool utf16_acfW(wchar_t*& out, const unsigned short*& in) {
    *out++ = static_cast<wchar_t>(*in++);
    return true;
}
bool acfW_utf8(unsigned char*& out, const wchar_t*& in) { return UnitToUtf8(out, in); }
bool utf16_utf8(unsigned char*& out, const unsigned short*& in) { return UnitToUtf8(out, in); }
bool acfW_utf16(unsigned short*& out, const wchar_t*& in) {
    ulong32 codePoint;
    return StepUtf16(codePoint, in) && EncodeUtf16(out, codePoint);
}

// --- Whole texts ---------------------------------------------------------------------------------------------------

std::size_t UTF8_To_acfWChar(const unsigned char* source, std::size_t sourceLength, wchar_t* target,
                             std::size_t targetCapacity) {
    return ConvertWhole(
        source, sourceLength, target, targetCapacity,
        [](const unsigned char* text, std::size_t length, wchar_t*& out) { return ConvertUtf8(text, length, out); });
}

std::size_t acfWChar_To_UTF8(const wchar_t* source, std::size_t sourceLength, unsigned char* target,
                             std::size_t targetCapacity) {
    return ConvertWhole(source, sourceLength, target, targetCapacity,
                        [](const wchar_t* text, std::size_t length, unsigned char*& out) {
                            ConvertUtf16(text, length, out);
                            return true;
                        });
}

namespace OS {

std::size_t ANSI_To_acfWChar(const char* source, std::size_t sourceLength, wchar_t* target,
                             std::size_t targetCapacity) {
    if (!source) return 0;
    return static_cast<std::size_t>(
        Platform::AnsiToWide(source, static_cast<int>(sourceLength), target, static_cast<int>(targetCapacity)));
}

std::size_t acfWChar_To_ANSI(const wchar_t* source, std::size_t sourceLength, char* target,
                             std::size_t targetCapacity) {
    if (!source) return 0;
    return static_cast<std::size_t>(
        Platform::WideToAnsi(source, static_cast<int>(sourceLength), target, static_cast<int>(targetCapacity)));
}

} // namespace OS
} // namespace TAVO::String
