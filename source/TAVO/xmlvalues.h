#pragma once
// The texts of typed values, written and read without locale and allocation.

#include "numberscan.h"
#include "simd.h"

#include <algorithm>
#include <bit>
#include <charconv>
#include <iterator>
#include <limits>
#include <TAVO/math.h>

namespace TAVO::XML::detail {

// --- writing -------------------------------------------------------------------------------------------------------

// ASCII without a terminator; `out` has room for kValueRoom bytes, the result is the end. What lies behind it may be
// overwritten.
constexpr std::size_t kValueRoom = 64;

// The bytes of a number in reverse order; one instruction where there is one.
inline std::uint64_t Reverse(std::uint64_t x) {
    x = (x & 0x00FF00FF00FF00FF) << 8 | (x >> 8 & 0x00FF00FF00FF00FF);
    x = (x & 0x0000FFFF0000FFFF) << 16 | (x >> 16 & 0x0000FFFF0000FFFF);
    return x << 32 | x >> 32;
}

// The characters of sixteen digits, one in each byte; those of ten and above start with `ten`.
inline Simd::Block HexCharacters(Simd::Block digits, char ten) {
    using namespace Simd;
    const Block letters = And(AtLeast8(digits, All8(10)), All8('0' + 10 - ten));
    return Subtract8(Subtract8(digits, All8(-'0')), letters);
}

inline char* PutHex(char* out, std::uint64_t number) {
    static_assert(std::endian::native == std::endian::little);
    using namespace Simd;
    const int digits = (67 - std::countl_zero(number | 1)) / 4;
    // All sixteen are written, the first one first.
    const Block bytes = WidenLow(Pair(Reverse(number << (64 - 4 * digits)), 0));
    const Block halves = And(Or(ShiftRight16<4>(bytes), ShiftLeft16<8>(bytes)), All8(0x0F));
    Store(out, HexCharacters(halves, 'a'));
    return out + digits;
}

// The characters of the numbers below 100, two each, the first one in the low byte.
inline constexpr std::array<std::uint16_t, 100> kPairs = [] {
    std::array<std::uint16_t, 100> pairs{};
    for (unsigned i = 0; i < 100; ++i) pairs[i] = static_cast<std::uint16_t>('0' + i / 10 + ('0' + i % 10) * 256);
    return pairs;
}();

inline char* PutDecimal(char* out, long32 number) {
    constexpr ulong32 kGroup = 10000;
    const auto putGroup = [&out](ulong32 group, unsigned digits) {
        const std::uint32_t text =
            (kPairs[group / 100] | static_cast<std::uint32_t>(kPairs[group % 100]) << 16) >> (32 - 8 * digits);
        std::memcpy(out, &text, sizeof text);
        out += digits;
    };
    const auto putFirst = [&](ulong32 group) { putGroup(group, 1u + (group > 9) + (group > 99) + (group > 999)); };
    auto rest = static_cast<ulong32>(number);
    if (number < 0) *out++ = '-', rest = 0 - rest;
    if (rest < kGroup) {
        putFirst(rest);
    } else if (rest < kGroup * kGroup) {
        putFirst(rest / kGroup);
        putGroup(rest % kGroup, 4);
    } else {
        putFirst(rest / (kGroup * kGroup));
        putGroup(rest / kGroup % kGroup, 4);
        putGroup(rest % kGroup, 4);
    }
    return out;
}

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

// Sixteen characters as hexadecimal digits of either case: their numbers, and a bit for each that is one.
struct DigitBlock {
    Simd::Block numbers;
    std::uint32_t areDigits;
};
inline DigitBlock HexDigitsOf(Simd::Block units) {
    using namespace Simd;
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
    return Reverse(LowHalf(Narrow(joined, joined)));
}

// Reads base 16 as ScanNumber does.
inline bool ScanHex(Text& text, std::uint64_t& value) {
    const DigitBlock block = HexDigitsOf(Simd::NarrowText(text.at));
    const int digits = std::countr_one(block.areDigits);
    const bool isPrefix = digits == 1 && (text.at[1] | 0x20) == 'x';
    if (TAVO_UNLIKELY(digits == 0 || digits == 16 || isPrefix)) {
        const bool isWhole = digits == 16 && numberscan::DigitOf(text.at[16]) == numberscan::kNoDigit;
        if (!isWhole) return ScanNumber<wchar_t>(text.at, text.end, 16, value);
    }
    value = JoinDigits(block.numbers) >> (64 - 4 * digits);
    text.at += digits;
    return true;
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

// --- decimal fractions: three ways, each for what the one before leaves ----------------------------------------------

inline unsigned DecimalDigit(wchar_t unit) { return static_cast<unsigned>(unit) - '0'; }

// Reads a number without sign and exponent that has few digits: both operands of the one operation are exact then, so
// it rounds as it must. `point` is where the text has a decimal point that is no '.'.
inline bool ScanShort(const wchar_t* at, const wchar_t* point, double& value) {
    constexpr double kPowers[] = {1e0, 1e1, 1e2, 1e3, 1e4, 1e5, 1e6, 1e7, 1e8, 1e9, 1e10, 1e11, 1e12, 1e13, 1e14, 1e15};
    constexpr std::ptrdiff_t kMostDigits = 15;
    std::uint64_t number = 0;
    const auto scan = [&] {
        const wchar_t* const start = at;
        for (unsigned digit; (digit = DecimalDigit(*at)) < 10; ++at) number = number * 10 + digit;
        return at - start;
    };
    std::ptrdiff_t digits = scan(), fraction = 0;
    if (*at == '.' || at == point) {
        ++at;
        fraction = scan();
        digits += fraction;
    }
    if (digits == 0 || digits > kMostDigits || (*at | 0x20) == 'e') return false;
    value = static_cast<double>(number) / kPowers[fraction];
    return true;
}

// Reads a number that ends within the first units of a text of at least 16, by the standard library's scanner.
inline bool ScanMedium(Text text, const wchar_t* point, double& value) {
    using namespace Simd;
    constexpr std::ptrdiff_t kMost = 2 * kBlock;
    if (DecimalDigit(*text.at) > 9 && *text.at != '.' && text.at != point) return false; // "inf"
    const std::ptrdiff_t units = std::min(text.end - text.at, kMost);
    char narrow[kMost + kBlock];
    Store(narrow, NarrowText(text.at));
    const std::ptrdiff_t place = std::min<std::ptrdiff_t>(16, units);
    Store(narrow + place, NarrowText(text.at + place));
    if (point && point - text.at < units) narrow[point - text.at] = '.';
    const auto [end, error] = std::from_chars(narrow, narrow + units, value);
    return error == std::errc() && narrow + kMost - end > 2; // no exponent is cut
}

// Any number: its digits * 10^exponent. A double lies between two halves of at most 767 digits; of a number with more
// it is enough to know whether one of the others is not zero.
class Decimal {
public:
    // False without a digit.
    bool Scan(Text text, const wchar_t* point) {
        bool hasDigits = ScanDigits(text, 0);
        if (*text.at == '.' || text.at == point) {
            ++text.at;
            hasDigits |= ScanDigits(text, -1);
        }
        if (hasDigits && (*text.at | 0x20) == 'e') ScanExponent(text.at + 1);
        return hasDigits;
    }

    // Infinity and zero for what is too large or too small.
    double Value() {
        constexpr double kInfinity = std::numeric_limits<double>::infinity();
        constexpr std::int64_t kFarOut = 400; // digits before the point, or zeros behind it
        const std::int64_t magnitude = m_count ? m_exponent + m_count : -kFarOut;
        if (magnitude >= kFarOut) return kInfinity;
        if (magnitude <= -kFarOut) return 0;
        if (m_hasMore) {
            m_digits[m_count++] = '1';
            --m_exponent;
        }
        m_digits[m_count] = 'e';
        const char* end = std::to_chars(m_digits + m_count + 1, std::end(m_digits), m_exponent).ptr;
        double value;
        if (std::from_chars(m_digits, end, value).ec == std::errc()) return value;
        return magnitude > 0 ? kInfinity : 0;
    }

private:
    // `step` is what a digit adds to the exponent.
    bool ScanDigits(Text& text, int step) {
        const wchar_t* const first = text.at;
        for (unsigned digit; (digit = DecimalDigit(*text.at)) < 10; ++text.at) {
            if (m_count == kKept) {
                m_exponent += step + 1;
                m_hasMore |= digit != 0;
                continue;
            }
            m_exponent += step;
            if (m_count == 0 && digit == 0) continue;
            m_digits[m_count++] = static_cast<char>('0' + digit);
        }
        return text.at != first;
    }

    void ScanExponent(const wchar_t* at) {
        constexpr std::int64_t kEndless = std::numeric_limits<std::int64_t>::max() / 100;
        const bool negative = *at == '-';
        if (negative || *at == '+') ++at;
        std::int64_t exponent = 0;
        for (unsigned digit; (digit = DecimalDigit(*at)) < 10; ++at)
            if (exponent < kEndless) exponent = exponent * 10 + digit;
        m_exponent += negative ? -exponent : exponent;
    }

    static constexpr int kKept = 780;
    std::int64_t m_exponent = 0;
    int m_count = 0; // of digits, the first one not being 0
    bool m_hasMore = false;
    char m_digits[kKept + 32]; // room for one digit more and the exponent
};

// Reads the longest decimal prefix behind blanks, of any length.
inline bool ScanDecimalDouble(Text text, const wchar_t* point, double& value) {
    while (numberscan::IsBlank(*text.at)) ++text.at;
    const bool negative = *text.at == '-';
    if (negative || *text.at == '+') ++text.at;
    constexpr std::ptrdiff_t kShort = 16;
    const bool isShort = text.end - text.at <= kShort;
    if (!(isShort ? ScanShort(text.at, point, value) : ScanMedium(text, point, value))) {
        Decimal number;
        if (!number.Scan(text, point)) return false;
        value = number.Value();
    }
    if (negative) value = -value;
    return true;
}

} // namespace TAVO::XML::detail
