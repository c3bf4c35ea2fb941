#pragma once
// Numbers in text, for every reader of the library. The C libraries' scanners differ among themselves in the corners,
// follow the locale, and have no form for 16-bit text on every system.

#include <array>
#include <cstdint>

namespace TAVO::numberscan {

constexpr std::uint8_t kNoDigit = 0xFF;

// The value of each ASCII digit and letter A to F; kNoDigit for the rest.
inline constexpr std::array<std::uint8_t, 256> kDigits = [] {
    std::array<std::uint8_t, 256> digits{};
    digits.fill(kNoDigit);
    for (unsigned i = 0; i < 10; ++i) digits['0' + i] = static_cast<std::uint8_t>(i);
    for (unsigned i = 0; i < 6; ++i) digits['A' + i] = digits['a' + i] = static_cast<std::uint8_t>(10 + i);
    return digits;
}();

// Unit is char, unsigned char, wchar_t or unsigned short.
template <class Unit> constexpr unsigned Code(Unit unit) {
    return sizeof(Unit) == 1 ? static_cast<unsigned char>(unit) : static_cast<unsigned>(unit);
}
template <class Unit> constexpr unsigned DigitOf(Unit unit) {
    return Code(unit) < kDigits.size() ? kDigits[Code(unit)] : kNoDigit;
}
template <class Unit> constexpr bool IsBlank(Unit unit) { return Code(unit) == 0x20 || Code(unit) - 9 < 5; }

// Reads a number of base 10 or 16 as the C library's %d, %u and %x do: blanks (20, 09 to 0D), one sign, for base 16 one
// 0x or 0X, then digits, at least one. `value` gets its low 64 bits, negated as an unsigned number behind '-'; take the
// low bits of it for a smaller target. `text` then stands behind the last digit. The terminator is never passed, nor
// `end`, unless that is null. False, and nothing changed, when there is no number; "0x" alone is none.
template <class Unit>
constexpr bool ScanNumber(const Unit*& text, const Unit* end, unsigned base, std::uint64_t& value) noexcept {
    const Unit* at = text;
    const auto is = [&](char c) { return at != end && Code(*at) == static_cast<unsigned char>(c); };
    while (at != end && IsBlank(*at)) ++at;
    const bool negative = is('-');
    if (negative || is('+')) ++at;
    if (base == 16 && is('0')) {
        const Unit* const zero = at++;
        if (is('x') || is('X'))
            ++at;
        else
            at = zero;
    }
    const Unit* const first = at;
    std::uint64_t number = 0;
    for (unsigned digit; at != end && (digit = DigitOf(*at)) < base; ++at) number = number * base + digit;
    if (at == first) return false;
    value = negative ? 0 - number : number;
    text = at;
    return true;
}

} // namespace TAVO::numberscan
