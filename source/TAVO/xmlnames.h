#pragma once
// Which characters make names: the classes of XML 1.0 (second edition), Appendix B. None lies above U+FFFF.

#include <array>
#include <span>
#include <TAVO/config.h>

namespace TAVO::XML::detail {

// What a character below 128 may be, one bit per question.
enum AsciiClass : std::uint8_t {
    kNameStartBit = 1, // letter, '_' or ':'
    kNameBit = 2,      // that, a digit, '.' or '-'
    kBlankBit = 4,     // space, tab, CR, LF
    kEscapeBit = 8     // & < > " '
};

inline constexpr std::array<std::uint8_t, 128> kAsciiClasses = [] {
    std::array<std::uint8_t, 128> table{};
    const auto mark = [&table](const char* characters, int bits) {
        for (; *characters; ++characters)
            table[static_cast<unsigned char>(*characters)] |= static_cast<std::uint8_t>(bits);
    };
    mark("ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz_:", kNameStartBit | kNameBit);
    mark("0123456789.-", kNameBit);
    mark(" \t\r\n", kBlankBit);
    mark("&<>\"'", kEscapeBit);
    return table;
}();

// The ranges of a class, ascending and apart, both ends included.
struct Range {
    std::uint16_t first, last;
};
struct NameTables {
    std::span<const Range> baseChar, ideographic, combiningChar, digit, extender;
};
extern const NameTables g_nameTables;

// Any code point.
bool IsLetter(ulong32 c) noexcept;
bool IsDigit(ulong32 c) noexcept;
bool IsOtherNameStart(ulong32 c) noexcept; // for the two below: c is not ASCII
bool IsOtherNameChar(ulong32 c) noexcept;

inline bool IsAsciiClass(ulong32 c, int bits) { return c < 128 && (kAsciiClasses[c] & bits) != 0; }
inline bool IsBlank(ulong32 c) { return IsAsciiClass(c, kBlankBit); }
inline bool IsNameStart(ulong32 c) {
    return TAVO_LIKELY(c < 128) ? (kAsciiClasses[c] & kNameStartBit) != 0 : IsOtherNameStart(c);
}
inline bool IsNameChar(ulong32 c) {
    return TAVO_LIKELY(c < 128) ? (kAsciiClasses[c] & kNameBit) != 0 : IsOtherNameChar(c);
}

// The end of the name that starts at `text`; `text` itself when none does.
inline const wchar_t* ScanName(const wchar_t* text, const wchar_t* end) {
    if (text == end || !IsNameStart(*text)) return text;
    do ++text;
    while (text != end && IsNameChar(*text));
    return text;
}

} // namespace TAVO::XML::detail
