#pragma once
// The texts of typed values, written and read without locale and allocation.

#include "numberscan.h"
#include "simd.h"

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

// The characters of the numbers below 1000: three digits in the lower bytes, the first one lowest, and in the highest
// byte how many bits the zeros before the number take.
inline constexpr std::array<std::uint32_t, 1000> kTriples = [] {
    std::array<std::uint32_t, 1000> triples{};
    for (std::uint32_t i = 0; i < triples.size(); ++i) {
        const std::uint32_t zeros = i > 99 ? 0 : i > 9 ? 8 : 16;
        triples[i] = ('0' + i / 100) | ('0' + i / 10 % 10) << 8 | ('0' + i % 10) << 16 | zeros << 24;
    }
    return triples;
}();

inline char* PutDecimal(char* out, long32 number) {
    constexpr ulong32 kGroup = 1000;
    const auto putFirst = [&out](ulong32 group) {
        const std::uint32_t zeros = kTriples[group] >> 24, text = kTriples[group] >> zeros;
        std::memcpy(out, &text, sizeof text);
        out += 3 - zeros / 8;
    };
    const auto putNext = [&out](ulong32 group) {
        std::memcpy(out, &kTriples[group], sizeof kTriples[group]);
        out += 3;
    };
    auto rest = static_cast<ulong32>(number);
    if (number < 0) *out++ = '-', rest = 0 - rest;
    if (rest < kGroup) {
        putFirst(rest);
        return out;
    }
    if (rest < kGroup * kGroup) {
        putFirst(rest / kGroup);
    } else {
        const ulong32 millions = rest / (kGroup * kGroup);
        if (millions < kGroup) {
            putFirst(millions);
        } else {
            putFirst(millions / kGroup);
            putNext(millions % kGroup);
        }
        putNext(rest / kGroup % kGroup);
    }
    putNext(rest % kGroup);
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
    return Reverse(LowWord(Narrow(joined, joined)));
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

// --- decimal fractions: two ways, the second one for what the first one leaves --------------------------------------

inline unsigned DecimalDigit(wchar_t unit) { return static_cast<unsigned>(unit) - '0'; }

// Reads eight digits, if all of these units are.
inline bool ReadEight(const wchar_t* text, std::uint64_t& number) {
    using namespace Simd;
    const Block units = Load(text);
    std::uint64_t digits = LowWord(Narrow(units, units)); // the first one lowest
    const std::uint64_t beyondNine = digits + 0x0606060606060606;
    if (((digits & 0xF0F0F0F0F0F0F0F0) | (beyondNine & 0xF0F0F0F0F0F0F0F0) >> 4) != 0x3333333333333333) return false;
    digits -= 0x3030303030303030;
    digits = digits * 10 + (digits >> 8); // in every other byte a number of two digits
    constexpr std::uint64_t kLanes = 0x000000FF000000FF;
    number = ((digits & kLanes) * (100 + (1000000ull << 32)) + (digits >> 16 & kLanes) * (1 + (10000ull << 32))) >> 32;
    return true;
}

__extension__ using Wide = unsigned __int128; // both compilers have it

// The powers of ten by which doubles are scaled: the highest 128 bits of 5^n, since the rest of 10^n only moves the
// exponent. Cut for n above 55; rounded up for negative n, whose digits never end.
class FivePowers {
public:
    static constexpr int kFar = 64;

    constexpr FivePowers() {
        Number power{1};
        for (int n = 0; n <= kFar; ++n, power.MultiplyByFive()) {
            m_bits[kFar + n] = power.Highest();
            if (n > 0) m_bits[kFar - n] = power.Reciprocal() + 1;
        }
    }
    constexpr Wide operator[](int n) const { return m_bits[kFar + n]; }

private:
    // 256 bits, the lowest first: 5^64 has 149.
    struct Number {
        std::uint64_t words[4];

        constexpr void MultiplyByFive() {
            Wide carry = 0;
            for (std::uint64_t& word : words) {
                carry += static_cast<Wide>(word) * 5;
                word = static_cast<std::uint64_t>(carry);
                carry >>= 64;
            }
        }
        constexpr int Bits() const {
            int word = 3;
            while (words[word] == 0) --word;
            return 64 * (word + 1) - std::countl_zero(words[word]);
        }
        constexpr bool Bit(int place) const { return place >= 0 && (words[place / 64] >> place % 64 & 1); }
        constexpr Wide Highest() const {
            Wide bits = 0;
            for (int place = Bits() - 1, i = 0; i < 128; ++i, --place) bits = bits << 1 | Bit(place);
            return bits;
        }
        constexpr bool TakeAway(const Number& other) { // if it is not larger
            Number left{};
            std::uint64_t borrow = 0;
            for (int i = 0; i < 4; ++i) {
                const Wide difference = static_cast<Wide>(words[i]) - other.words[i] - borrow;
                left.words[i] = static_cast<std::uint64_t>(difference);
                borrow = static_cast<std::uint64_t>(difference >> 64) & 1;
            }
            if (borrow == 0) *this = left;
            return borrow == 0;
        }
        constexpr void Double() {
            for (int i = 3; i >= 0; --i) words[i] = words[i] << 1 | (i ? words[i - 1] >> 63 : 0);
        }
        // The highest 128 bits of 1 / this.
        constexpr Wide Reciprocal() const {
            Number rest{};
            rest.words[Bits() / 64] = 1ull << Bits() % 64; // the first power of two above: the first bit is set
            Wide bits = 0;
            for (int i = 0; i < 128; ++i, rest.Double()) bits = bits << 1 | rest.TakeAway(*this);
            return bits;
        }
    };

    Wide m_bits[2 * kFar + 1] = {};
};
inline constexpr FivePowers kFivePowers;

// number * 10^power, rounded once, half to even: the published way of Eisel and Lemire, who also prove that the highest
// 128 bits of the power suffice for every number of 64. Requires: number > 0, |power| <= kFar, which keeps the result
// away from both ends of the doubles' range.
inline double Scaled(std::uint64_t number, int power) {
    const int up = std::countl_zero(number);
    number <<= up;
    const Wide five = kFivePowers[power];
    Wide product = static_cast<Wide>(number) * static_cast<std::uint64_t>(five >> 64);
    constexpr std::uint64_t kBelowRounding = 0x1FF; // all set: what is missing may carry into the bits that count
    if ((static_cast<std::uint64_t>(product >> 64) & kBelowRounding) == kBelowRounding)
        product += static_cast<Wide>(number) * static_cast<std::uint64_t>(five) >> 64;
    const auto high = static_cast<std::uint64_t>(product >> 64), low = static_cast<std::uint64_t>(product);
    const int carried = static_cast<int>(high >> 63);
    std::uint64_t mantissa = high >> (carried + 9); // 53 bits and one to round by
    // Halfway between two doubles, which only small powers reach: down when the upper one is odd.
    const bool isHalf = low <= 1 && power >= -4 && power <= 23 && mantissa << (carried + 9) == high;
    if (isHalf && (mantissa & 3) == 1) mantissa &= ~1ull;
    mantissa = (mantissa + (mantissa & 1)) >> 1;
    // The mantissa's highest bit, and a carry above it, add themselves to the exponent.
    constexpr int kBitsOfTen = 217706; // of 2^16: log2(10)
    const int exponent = (kBitsOfTen * power >> 16) + 63 + carried - up + 1023;
    return std::bit_cast<double>((static_cast<std::uint64_t>(exponent - 1) << 52) + mantissa);
}

// Reads a number of few digits. `point` is where the text has a decimal point that is no '.'.
inline bool ScanShort(Text text, const wchar_t* point, double& value) {
    constexpr double kPowers[] = {1e0, 1e1, 1e2, 1e3, 1e4, 1e5, 1e6, 1e7, 1e8, 1e9, 1e10, 1e11, 1e12, 1e13, 1e14, 1e15};
    constexpr std::ptrdiff_t kExactDigits = 15; // of numbers that are doubles, as their powers of ten are
    constexpr std::ptrdiff_t kMostDigits = 19;  // of numbers of 64 bits
    const wchar_t* at = text.at;
    std::uint64_t number = 0;
    const auto scan = [&] {
        const wchar_t* const start = at;
        for (unsigned digit; (digit = DecimalDigit(*at)) < 10; ++at) number = number * 10 + digit;
        return at - start;
    };
    std::ptrdiff_t digits = scan(), fraction = 0;
    if (*at == '.' || at == point) {
        const wchar_t* const start = ++at;
        for (std::uint64_t eight; text.end - at >= 8 && ReadEight(at, eight); at += 8)
            number = number * 100000000 + eight;
        scan();
        fraction = at - start;
        digits += fraction;
    }
    if (digits == 0 || digits > kMostDigits) return false;
    const bool hasExponent = (*at | 0x20) == 'e';
    if (digits <= kExactDigits && !hasExponent) {
        value = static_cast<double>(number) / kPowers[fraction];
        return true;
    }
    int power = -static_cast<int>(fraction);
    if (hasExponent) {
        const bool negative = *++at == '-';
        if (negative || *at == '+') ++at;
        constexpr int kFewDigits = 3;
        int exponent = 0, count = 0;
        for (unsigned digit; (digit = DecimalDigit(*at)) < 10 && count <= kFewDigits; ++at, ++count)
            exponent = exponent * 10 + static_cast<int>(digit);
        if (count > kFewDigits) return false;
        power += negative ? -exponent : exponent;
    }
    if (power < -FivePowers::kFar || power > FivePowers::kFar) return false;
    value = number ? Scaled(number, power) : 0;
    return true;
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
    if (!ScanShort(text, point, value)) {
        Decimal number;
        if (!number.Scan(text, point)) return false;
        value = number.Value();
    }
    if (negative) value = -value;
    return true;
}

} // namespace TAVO::XML::detail
