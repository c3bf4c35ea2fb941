#pragma once
// The library's checksum by carry-less multiplication: sixteen bytes a step, where the processor can. The same numbers
// as crc64.h.

#include "crc64.h"
#include "simd.h"

#if defined(TAVO_SSE2)
#define TAVO_CRC_FOLDS 1

namespace TAVO::crc64 {

// x^power modulo the polynomial.
constexpr std::uint64_t PowerOfX(int power) {
    std::uint64_t r = 1;
    for (; power > 0; --power) r = r >> 63 ? (r << 1) ^ kPolynomial : r << 1;
    return r;
}

// x^128 divided by the polynomial, without its top bit, x^64.
constexpr std::uint64_t Reciprocal() {
    std::uint64_t quotient = 0, rest = kPolynomial; // of x^64 after the first step
    for (int bit = 63; bit >= 0; --bit) {
        const bool carry = rest >> 63;
        rest <<= 1;
        if (carry) {
            rest ^= kPolynomial;
            quotient |= std::uint64_t{1} << bit;
        }
    }
    return quotient;
}

// What was fed so far, as a polynomial below x^128 that has the same checksum. Zero bytes in front change nothing, so a
// text that does not fill its blocks begins in the middle of the first.
class Fold {
public:
    // The first sixteen bytes, instead of Add.
    TAVO_MULTIPLIES void Start(Simd::Block reversed) { m_state = reversed; }

    // Appends sixteen bytes, the first one highest.
    TAVO_MULTIPLIES void Add(Simd::Block reversed) { m_state = Simd::Xor(Moved<128>(m_state), reversed); }

    // Appends twice sixteen bytes. Only one multiplication waits for the step before.
    TAVO_MULTIPLIES void Add(Simd::Block first, Simd::Block second) {
        m_state = Simd::Xor(Moved<256>(m_state), Simd::Xor(Moved<128>(first), second));
    }

    // Appends four times sixteen bytes.
    TAVO_MULTIPLIES void Add(Simd::Block first, Simd::Block second, Simd::Block third, Simd::Block fourth) {
        const Simd::Block later =
            Simd::Xor(Simd::Xor(Moved<384>(first), Moved<256>(second)), Simd::Xor(Moved<128>(third), fourth));
        m_state = Simd::Xor(Moved<512>(m_state), later);
    }

    TAVO_MULTIPLIES std::uint64_t Checksum() const {
        using namespace Simd;
        constexpr std::uint64_t kPower = PowerOfX(128);
        // The high words matter, which stay where they are: moving them to other registers takes as long as a
        // multiplication.
        return Reduce(Xor(MultiplyHigh(m_state, Pair(0, kPower)), LowToHigh(m_state)));
    }

    // Of thirty-two bytes, without a multiplication that waits for another before the last two.
    TAVO_MULTIPLIES static std::uint64_t ChecksumOf(Simd::Block first, Simd::Block second) {
        using namespace Simd;
        constexpr std::uint64_t kLow = PowerOfX(192), kHigh = PowerOfX(256), kSecond = PowerOfX(128);
        const Block by = Pair(kLow, kHigh);
        return Reduce(Xor(Xor(MultiplyHigh(first, by), MultiplyLow(first, by)),
                          Xor(MultiplyHigh(second, Pair(0, kSecond)), LowToHigh(second))));
    }

private:
    // The remainder, by Barrett's method, of what was multiplied by x^64, which is the room for the checksum.
    TAVO_MULTIPLIES static std::uint64_t Reduce(Simd::Block shifted) {
        using namespace Simd;
        constexpr std::uint64_t kReciprocal = Reciprocal();
        const Block quotient = Xor(shifted, MultiplyHigh(shifted, Pair(0, kReciprocal)));
        return LowWord(Xor(shifted, MultiplyHigh(quotient, Pair(0, kPolynomial))));
    }

    // Times x^bits: the low half by that, the high half by x^64 more.
    template <int bits> TAVO_MULTIPLIES static Simd::Block Moved(Simd::Block state) {
        constexpr std::uint64_t kLow = PowerOfX(bits), kHigh = PowerOfX(bits + 64);
        const auto by = Simd::Pair(kLow, kHigh);
        return Simd::Xor(Simd::MultiplyHigh(state, by), Simd::MultiplyLow(state, by));
    }

#if defined(TAVO_LINES)
    friend class LineFold;
#endif
    Simd::Block m_state = Simd::All8(0);
};

#if defined(TAVO_LINES)
// The same, a hundred and twenty-eight bytes a step.
class LineFold {
public:
    // Goes on after what was fed.
    TAVO_LINE_MULTIPLIES explicit LineFold(const Fold& before)
        : m_first(Simd::Line16(0)), m_second(Simd::LastBlock(before.m_state)) {}

    // Appends eight times sixteen bytes.
    TAVO_LINE_MULTIPLIES void Add(Simd::Line first, Simd::Line second) {
        m_first = Appended(m_first, first);
        m_second = Appended(m_second, second);
    }

    TAVO_LINE_MULTIPLIES Fold Sum() const {
        Fold sum;
        sum.Start(Simd::BlockOf<0>(m_first));
        sum.Add(Simd::BlockOf<1>(m_first));
        sum.Add(Simd::BlockOf<2>(m_first), Simd::BlockOf<3>(m_first));
        sum.Add(Simd::BlockOf<0>(m_second), Simd::BlockOf<1>(m_second), Simd::BlockOf<2>(m_second),
                Simd::BlockOf<3>(m_second));
        return sum;
    }

private:
    TAVO_LINE_MULTIPLIES static Simd::Line Appended(Simd::Line state, Simd::Line line) {
        constexpr std::uint64_t kLow = PowerOfX(1024), kHigh = PowerOfX(1024 + 64);
        const Simd::Line by = Simd::FourTimes(Simd::Pair(kLow, kHigh));
        return Simd::Xor3(Simd::MultiplyHigh(state, by), Simd::MultiplyLow(state, by), line);
    }

    Simd::Line m_first, m_second; // sums of every eighth block
};
#endif

} // namespace TAVO::crc64

#endif
