#pragma once
// The stepping code of the transcoders, inline for the loops of the library that decode text themselves, and the bulk
// passes over text of known length. The rules are those of string.h; Unit is wchar_t or unsigned short.

#include "wide.h"

#include <array>

namespace TAVO::String::detail {

// --- UTF-8 ---------------------------------------------------------------------------------------------------------

// The bytes of a sequence by its first byte; 0: begins none. C0 and C1 are accepted, so overlong forms decode.
inline constexpr std::array<std::uint8_t, 256> kUtf8Length = [] {
    std::array<std::uint8_t, 256> table{};
    for (unsigned lead = 0; lead < 256; ++lead)
        table[lead] = lead < 0x80 ? 1 : lead < 0xC0 ? 0 : lead < 0xE0 ? 2 : lead < 0xF0 ? 3 : lead < 0xF5 ? 4 : 0;
    return table;
}();

constexpr bool IsContinuation(unsigned char byte) { return (byte & 0xC0) == 0x80; }

// Decodes one sequence of a terminated text. A byte that begins none stores 0 and stays; a bad continuation byte stores
// the partial value and leaves `in` on that byte. Bytes are looked at one by one, so none behind a terminator is read.
inline bool StepUtf8(ulong32& out, const unsigned char*& in) {
    const unsigned lead = *in;
    if (TAVO_LIKELY(lead < 0x80)) {
        out = lead;
        ++in;
        return true;
    }
    const unsigned length = kUtf8Length[lead];
    if (length == 0) {
        out = 0;
        return false;
    }
    unsigned shift = (length - 1) * 6;
    out = (lead & (0x7Fu >> length)) << shift;
    for (++in; shift; ++in) {
        if (!IsContinuation(*in)) return false;
        shift -= 6;
        out |= (*in & 0x3Fu) << shift;
    }
    return true;
}

// The bytes of the good sequence at `text`, of which `left` (at least 1) may be read; 0: bad or cut.
inline std::size_t Utf8Sequence(const unsigned char* text, std::size_t left) {
    const std::size_t length = kUtf8Length[*text];
    if (length > left) return 0;
    for (std::size_t i = 1; i < length; ++i)
        if (!IsContinuation(text[i])) return 0;
    return length;
}

// Encodes one code point; false above 10FFFF. Surrogates are encoded like everything else.
inline bool EncodeUtf8(unsigned char*& out, ulong32 codePoint) {
    const auto trail = [codePoint](unsigned shift) {
        return static_cast<unsigned char>(0x80 | ((codePoint >> shift) & 0x3F));
    };
    if (codePoint < 0x80) {
        *out++ = static_cast<unsigned char>(codePoint);
    } else if (codePoint < 0x800) {
        *out++ = static_cast<unsigned char>(0xC0 | codePoint >> 6);
        *out++ = trail(0);
    } else if (codePoint <= 0xFFFF) {
        *out++ = static_cast<unsigned char>(0xE0 | codePoint >> 12);
        *out++ = trail(6);
        *out++ = trail(0);
    } else if (codePoint <= 0x10FFFF) {
        *out++ = static_cast<unsigned char>(0xF0 | codePoint >> 18);
        *out++ = trail(12);
        *out++ = trail(6);
        *out++ = trail(0);
    } else {
        return false;
    }
    return true;
}

// --- UTF-16 --------------------------------------------------------------------------------------------------------

template <class Unit> constexpr bool IsSurrogate(Unit unit) { return (unit & 0xF800) == 0xD800; }
template <class Unit> constexpr bool IsHighSurrogate(Unit unit) { return (unit & 0xFC00) == 0xD800; }
template <class Unit> constexpr bool IsLowSurrogate(Unit unit) { return (unit & 0xFC00) == 0xDC00; }

// Intended (pair-second-unit): no upper limit, so DBFF itself and E000 to FFFF complete a pair too. A textbook asks for
// DC00 to DFFF; counts and hashes of stored text would change.
template <class Unit> constexpr bool IsSecondHalf(Unit unit) { return unit >= 0xDBFF; }

// Intended (pair-value): a pair decodes to 0 or 1 and never to its character. Byte counts, pool keys and UTF-8 forms
// rest on it.
template <class Unit> constexpr ulong32 PairValue(Unit first, Unit second) {
    return ((first | second) & 0x3FF) != 0 ? 1 : 0;
}

// Decodes one unit or pair of a terminated text; false moves and stores nothing.
template <class Unit> bool StepUtf16(ulong32& out, const Unit*& in) {
    if (TAVO_LIKELY(!IsSurrogate(*in))) {
        out = *in++;
        return true;
    }
    if (IsLowSurrogate(*in) || !IsSecondHalf(in[1])) return false;
    out = PairValue(in[0], in[1]);
    in += 2;
    return true;
}

// The units of the good character at `text`, of which `left` (at least 1) may be read; 0: bad or cut.
template <class Unit> std::size_t Utf16Sequence(const Unit* text, std::size_t left) {
    if (!IsSurrogate(*text)) return 1;
    return IsHighSurrogate(*text) && left > 1 && IsSecondHalf(text[1]) ? 2 : 0;
}

// Encodes one code point; false above 10FFFF.
// Intended (pair-offset): the usual 10000 is not subtracted, so 10000 becomes D840 DC00, and from 100000 up the first
// unit lies in the low surrogates, where this library cannot decode it. Stored strings were made this way and must keep
// comparing equal.
template <class Unit> bool EncodeUtf16(Unit*& out, ulong32 codePoint) {
    if (codePoint < 0x10000) {
        *out++ = static_cast<Unit>(codePoint);
        return true;
    }
    if (codePoint > 0x10FFFF) return false;
    *out++ = static_cast<Unit>(codePoint >> 10 | 0xD800);
    *out++ = static_cast<Unit>((codePoint & 0x3FF) | 0xDC00);
    return true;
}

// --- Bulk passes ---------------------------------------------------------------------------------------------------
//
// Measure first, convert second. `length` is the text's true length: the terminator or a bound lies there, no zero unit
// before (Simd::ZeroUnit finds it).

// What ends the good beginning of a text: its length, a sequence that the length cuts, or an invalid one.
enum class Ending { Length, Cut, Invalid };

// The good beginning of a text.
struct Extent {
    std::size_t source = 0;     // its units
    std::size_t characters = 0; // its characters; a pair is one
    std::size_t target = 0;     // the units it converts to: UTF-16 of UTF-8, UTF-8 of UTF-16
    bool beyond = false;        // it holds a value above 10FFFF, which measures 2 units and has no form
    Ending ending = Ending::Length;
};

Extent MeasureUtf8(const unsigned char* text, std::size_t length);
Extent MeasureUtf16(const wchar_t* text, std::size_t length);
Extent MeasureUtf16(const unsigned short* text, std::size_t length);

// Convert a measured text (`source` and `target` of the extent); `out` ends behind what was written, and nothing behind
// the measured target units is touched. False: a value above 10FFFF was met, `out` is behind the units before it; what
// is behind those is untouched if `beyond` is set, else undefined.
bool ConvertUtf8(const unsigned char* text, const Extent& extent, wchar_t*& out);
bool ConvertUtf8(const unsigned char* text, const Extent& extent, unsigned short*& out);
void ConvertUtf16(const wchar_t* text, const Extent& extent, unsigned char*& out);
void ConvertUtf16(const unsigned short* text, const Extent& extent, unsigned char*& out);

} // namespace TAVO::String::detail
