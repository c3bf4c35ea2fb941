#pragma once
// The texts of typed values, written and read without locale and allocation.

#include "numberscan.h"
#include "simd.h"

#include <bit>
#include <charconv>
#include <TAVO/math.h>

namespace TAVO::XML::detail {

// --- writing -------------------------------------------------------------------------------------------------------

// ASCII without a terminator; `out` has room for kValueRoom bytes, the result is the end. What lies behind it may be
// overwritten.
constexpr std::size_t kValueRoom = 64;

// The eight digits of a number, the highest one in the lowest byte.
inline std::uint64_t HexDigits(std::uint32_t number) {
    std::uint64_t x = number;
    x = (x >> 16 | x << 32) & 0x0000FFFF0000FFFF; // halves, bytes and digits to their places
    x = (x >> 8 & 0x000000FF000000FF) | (x & 0x000000FF000000FF) << 16;
    x = (x >> 4 & 0x000F000F000F000F) | (x & 0x000F000F000F000F) << 8;
    const std::uint64_t isLetter = (x + 0x0606060606060606) >> 4 & 0x0101010101010101;
    return x + 0x3030303030303030 + isLetter * ('a' - '0' - 10);
}

inline char* PutHex(char* out, std::uint64_t number) {
    static_assert(std::endian::native == std::endian::little);
    const int digits = number ? (67 - std::countl_zero(number)) / 4 : 1;
    number <<= 64 - 4 * digits; // all sixteen are written, the first one first
    const std::uint64_t text[2] = {HexDigits(static_cast<std::uint32_t>(number >> 32)),
                                   HexDigits(static_cast<std::uint32_t>(number))};
    std::memcpy(out, text, sizeof text);
    return out + digits;
}

inline char* PutDecimal(char* out, long32 number) { return std::to_chars(out, out + 11, number).ptr; }

inline char* PutRational(char* out, const Math::CRational& number) {
    out = PutDecimal(out, number.num());
    *out++ = '/';
    return PutDecimal(out, static_cast<long32>(number.den()));
}

inline char* PutDouble(char* out, double number) {
    out = PutHex(out, std::bit_cast<std::uint64_t>(number));
    *out++ = '(';
    out = std::to_chars(out, out + 16, number, std::chars_format::general, 4).ptr;
    *out++ = ')';
    return out;
}

// --- reading -------------------------------------------------------------------------------------------------------

// A text, whose last unit is followed by a terminator.
struct Text {
    const wchar_t* at;
    const wchar_t* end;
};

using numberscan::ScanNumber;

// Reads base 10 as ScanNumber does; the common case, digits alone, without its detours.
inline bool ScanDecimal(Text& text, std::uint64_t& value) {
    const wchar_t* at = text.at;
    unsigned digit = static_cast<unsigned>(*at) - '0';
    if (TAVO_UNLIKELY(digit > 9)) return ScanNumber<wchar_t>(text.at, text.end, 10, value);
    std::uint64_t number = 0;
    do number = number * 10 + digit;
    while ((digit = static_cast<unsigned>(*++at) - '0') <= 9);
    value = number;
    text.at = at;
    return true;
}

// Sixteen units as hexadecimal digits of either case: their numbers, one in each byte, and a bit for each that is one.
struct DigitBlock {
    Simd::Block numbers;
    std::uint32_t areDigits;
};
inline DigitBlock HexDigitsOf(const wchar_t* text) {
    using namespace Simd;
    const Block units = Narrow(Load(text), Load(text + 8));
    const Block letters = Or(units, All8(0x20));
    const Block isDecimal = AndNot(AtLeast8(units, All8('9' + 1)), AtLeast8(units, All8('0')));
    const Block isLetter = AndNot(AtLeast8(letters, All8('f' + 1)), AtLeast8(letters, All8('a')));
    const Block numbers =
        Or(And(isDecimal, Subtract8(units, All8('0'))), And(isLetter, Subtract8(letters, All8('a' - 10))));
    return {numbers, Mask(Or(isDecimal, isLetter))};
}

// The number of 16 digits, one in each byte of a block, the first one being the highest.
inline std::uint64_t JoinDigits(Simd::Block digits) {
    using namespace Simd;
    // Each unit of 16 bits holds a high digit in its low byte.
    const Block joined = And(Or(ShiftLeft16<4>(digits), ShiftRight16<8>(digits)), All16(0xFF));
    std::uint64_t bytes = LowHalf(Narrow(joined, joined)), number = 0;
    for (int i = 0; i < 8; ++i, bytes >>= 8) number = number << 8 | (bytes & 0xFF); // one instruction
    return number;
}

// Reads base 16 as ScanNumber does.
inline bool ScanHex(Text& text, std::uint64_t& value) {
    if (text.end - text.at >= 16) {
        const DigitBlock block = HexDigitsOf(text.at);
        const int digits = std::countr_one(block.areDigits);
        const bool isWhole = digits < 16 || numberscan::DigitOf(text.at[16]) == numberscan::kNoDigit;
        const bool isPrefix = digits == 1 && (text.at[1] | 0x20) == 'x';
        if (TAVO_LIKELY(digits && isWhole && !isPrefix)) {
            value = JoinDigits(block.numbers) >> (64 - 4 * digits);
            text.at += digits;
            return true;
        }
    }
    return ScanNumber<wchar_t>(text.at, text.end, 16, value);
}

inline bool ScanRational(Text text, Math::CRational& value) {
    std::uint64_t numerator, denominator;
    if (!ScanDecimal(text, numerator)) return false;
    while (numberscan::IsBlank(*text.at)) ++text.at;
    if (*text.at != '/') return false;
    ++text.at;
    if (!ScanDecimal(text, denominator)) return false;
    value.assign(static_cast<long32>(numerator), static_cast<long32>(denominator));
    return true;
}

inline bool ScanDoubleBits(Text text, double& value) {
    std::uint64_t bits;
    if (!ScanHex(text, bits)) return false;
    value = std::bit_cast<double>(bits);
    return true;
}

// The longest decimal prefix behind blanks, which may be of any length. Infinity and zero for what is too large or too
// small. Where leading digits end, the decimal point of the process's locale counts as '.'.
bool ScanDecimalDouble(Text text, double& value) noexcept;

} // namespace TAVO::XML::detail
