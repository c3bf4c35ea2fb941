#pragma once
// Blocks of 16 bytes: the only place with compiler intrinsics. SSE2 belongs to every x86-64 processor; elsewhere, or
// with TAVO_NO_SIMD defined, the same operations are plain loops.

#include <bit>
#include <cstdint>
#include <cstring>
#include <TAVO/config.h>

#if (defined(__SSE2__) || defined(_M_X64)) && !defined(TAVO_NO_SIMD)
#include <tmmintrin.h>
#include <wmmintrin.h>
#define TAVO_SSE2 1
#if !defined(_MSC_VER) && !defined(TAVO_NO_LINES)
#include <immintrin.h>
#define TAVO_LINES 1
#endif
#endif

namespace TAVO::Simd {

constexpr std::size_t kBlock = 16;

#if defined(TAVO_SSE2)

using Block = __m128i;

TAVO_INLINE Block Load(const void* p) { return _mm_loadu_si128(static_cast<const Block*>(p)); }
// Eight bytes from each of two places.
TAVO_INLINE Block LoadHalves(const void* low, const void* high) {
    return _mm_unpacklo_epi64(_mm_loadl_epi64(static_cast<const Block*>(low)),
                              _mm_loadl_epi64(static_cast<const Block*>(high)));
}
TAVO_INLINE Block LoadAligned(const void* p) { return _mm_load_si128(static_cast<const Block*>(p)); }
TAVO_INLINE void Store(void* p, Block x) { _mm_storeu_si128(static_cast<Block*>(p), x); }
TAVO_INLINE void StoreHalf(void* p, Block x) { _mm_storel_epi64(static_cast<Block*>(p), x); }
TAVO_INLINE Block All8(int value) { return _mm_set1_epi8(static_cast<char>(value)); }
TAVO_INLINE Block All16(int value) { return _mm_set1_epi16(static_cast<short>(value)); }
TAVO_INLINE Block And(Block a, Block b) { return _mm_and_si128(a, b); }
TAVO_INLINE Block Or(Block a, Block b) { return _mm_or_si128(a, b); }
// b without the bits of a.
TAVO_INLINE Block AndNot(Block a, Block b) { return _mm_andnot_si128(a, b); }
TAVO_INLINE Block Equal8(Block a, Block b) { return _mm_cmpeq_epi8(a, b); }
TAVO_INLINE Block Equal16(Block a, Block b) { return _mm_cmpeq_epi16(a, b); }
// Unsigned a >= b.
TAVO_INLINE Block AtLeast8(Block a, Block b) { return _mm_cmpeq_epi8(_mm_max_epu8(a, b), a); }
// Signed a < b.
TAVO_INLINE Block Below8(Block a, Block b) { return _mm_cmplt_epi8(a, b); }
TAVO_INLINE Block Subtract8(Block a, Block b) { return _mm_sub_epi8(a, b); }
template <int bits> TAVO_INLINE Block ShiftLeft16(Block a) { return _mm_slli_epi16(a, bits); }
template <int bits> TAVO_INLINE Block ShiftRight16(Block a) { return _mm_srli_epi16(a, bits); }
// One bit per byte: its highest.
TAVO_INLINE std::uint32_t Mask(Block a) { return static_cast<std::uint32_t>(_mm_movemask_epi8(a)); }
// The bytes as 16-bit units, low and high half.
TAVO_INLINE Block WidenLow(Block a) { return _mm_unpacklo_epi8(a, _mm_setzero_si128()); }
TAVO_INLINE Block WidenHigh(Block a) { return _mm_unpackhi_epi8(a, _mm_setzero_si128()); }
// The low or high halves of both, lanes of so many bytes in turns.
template <std::size_t lane, bool high> TAVO_INLINE Block Interleave(Block a, Block b) {
    static_assert(lane == 1 || lane == 2 || lane == 4 || lane == 8);
    if constexpr (lane == 1) return high ? _mm_unpackhi_epi8(a, b) : _mm_unpacklo_epi8(a, b);
    if constexpr (lane == 2) return high ? _mm_unpackhi_epi16(a, b) : _mm_unpacklo_epi16(a, b);
    if constexpr (lane == 4) return high ? _mm_unpackhi_epi32(a, b) : _mm_unpacklo_epi32(a, b);
    return high ? _mm_unpackhi_epi64(a, b) : _mm_unpacklo_epi64(a, b);
}
// Bytes of two blocks of 16-bit units, in order; of units from 100 up 255, from 8000 up 0 or 255.
TAVO_INLINE Block Narrow(Block a, Block b) { return _mm_packus_epi16(a, b); }
TAVO_INLINE Block Add16(Block a, Block b) { return _mm_add_epi16(a, b); }
TAVO_INLINE Block Subtract16(Block a, Block b) { return _mm_sub_epi16(a, b); }
template <int bits> TAVO_INLINE Block ShiftLeft64(Block a) { return _mm_slli_epi64(a, bits); }
template <int bits> TAVO_INLINE Block ShiftRight64(Block a) { return _mm_srli_epi64(a, bits); }
TAVO_INLINE Block HighHalf(Block a) { return _mm_srli_si128(a, 8); }
// The bytes moved to higher or lower places, zeros behind them.
template <int places> TAVO_INLINE Block MoveUp(Block a) { return _mm_slli_si128(a, places); }
template <int places> TAVO_INLINE Block MoveDown(Block a) { return _mm_srli_si128(a, places); }
// Lanes of 16-bit numbers from -128 to 127 as bytes.
TAVO_INLINE Block PackSigned(Block a, Block b) { return _mm_packs_epi16(a, b); }
// The sum of all unsigned bytes.
TAVO_INLINE std::size_t Sum8(Block a) {
    const Block halves = _mm_sad_epu8(a, _mm_setzero_si128());
    return static_cast<std::size_t>(_mm_cvtsi128_si64(halves) + _mm_cvtsi128_si64(_mm_srli_si128(halves, 8)));
}

// Moving bytes by a table needs SSSE3, which nearly every processor has: functions marked TAVO_SHUFFLES may call
// Shuffle, and may be called when HasShuffle() is true.
#if defined(_MSC_VER)
#define TAVO_SHUFFLES
#else
#define TAVO_SHUFFLES __attribute__((target("ssse3")))
#endif
// TAVO_NO_SHUFFLE builds what processors without it run.
#if defined(_MSC_VER) || defined(TAVO_NO_SHUFFLE)
inline bool HasShuffle() { return false; }
#else
inline bool HasShuffle() { return __builtin_cpu_supports("ssse3"); }
#endif
// Byte i of the result is byte index[i]; 0 for an index with the highest bit.
TAVO_SHUFFLES inline Block Shuffle(Block a, Block index) { return _mm_shuffle_epi8(a, index); }

// Multiplying without carry needs PCLMULQDQ, which comes with Shuffle: functions marked TAVO_MULTIPLIES may call
// Shuffle and Multiply, and may be called when HasMultiply() is true. Blocks are pairs of 64-bit polynomials, the low
// one first.
#if defined(_MSC_VER)
#define TAVO_MULTIPLIES
#else
#define TAVO_MULTIPLIES __attribute__((target("ssse3,pclmul")))
#endif
#if defined(_MSC_VER) || defined(TAVO_NO_SHUFFLE)
inline bool HasMultiply() { return false; }
#else
inline bool HasMultiply() { return __builtin_cpu_supports("pclmul") && __builtin_cpu_supports("ssse3"); }
#endif
TAVO_MULTIPLIES inline Block MultiplyLow(Block a, Block b) { return _mm_clmulepi64_si128(a, b, 0x00); }
TAVO_MULTIPLIES inline Block MultiplyHigh(Block a, Block b) { return _mm_clmulepi64_si128(a, b, 0x11); }
TAVO_INLINE Block Pair(std::uint64_t low, std::uint64_t high) {
    return _mm_set_epi64x(static_cast<long long>(high), static_cast<long long>(low));
}
TAVO_INLINE std::uint64_t LowWord(Block a) { return static_cast<std::uint64_t>(_mm_cvtsi128_si64(a)); }
TAVO_INLINE std::uint64_t HighWord(Block a) { return LowWord(_mm_srli_si128(a, 8)); }
TAVO_INLINE Block LowToHigh(Block a) { return _mm_slli_si128(a, 8); }
TAVO_INLINE Block Xor(Block a, Block b) { return _mm_xor_si128(a, b); }
// Signed a > b.
TAVO_INLINE Block Above16(Block a, Block b) { return _mm_cmpgt_epi16(a, b); }

#else

#define TAVO_SHUFFLES
struct Block {
    std::uint8_t b[16];
};

namespace detail {
template <class Lane, class Function> Block Map(Block a, Block b, Function function) {
    Lane x[16 / sizeof(Lane)], y[16 / sizeof(Lane)];
    std::memcpy(x, &a, 16), std::memcpy(y, &b, 16);
    for (std::size_t i = 0; i < 16 / sizeof(Lane); ++i) x[i] = static_cast<Lane>(function(x[i], y[i]));
    std::memcpy(&a, x, 16);
    return a;
}
} // namespace detail

inline Block Load(const void* p) {
    Block x;
    std::memcpy(&x, p, 16);
    return x;
}
inline Block LoadHalves(const void* low, const void* high) {
    Block x;
    std::memcpy(x.b, low, 8), std::memcpy(x.b + 8, high, 8);
    return x;
}
inline Block LoadAligned(const void* p) { return Load(p); }
inline void Store(void* p, Block x) { std::memcpy(p, &x, 16); }
inline void StoreHalf(void* p, Block x) { std::memcpy(p, &x, 8); }
inline Block All8(int value) {
    Block x;
    std::memset(&x, value, 16);
    return x;
}
inline Block All16(int value) {
    return detail::Map<std::uint16_t>({}, {}, [=](int, int) { return value; });
}
inline Block And(Block a, Block b) {
    return detail::Map<std::uint8_t>(a, b, [](int x, int y) { return x & y; });
}
inline Block Or(Block a, Block b) {
    return detail::Map<std::uint8_t>(a, b, [](int x, int y) { return x | y; });
}
inline Block AndNot(Block a, Block b) {
    return detail::Map<std::uint8_t>(a, b, [](int x, int y) { return ~x & y; });
}
inline Block Equal8(Block a, Block b) {
    return detail::Map<std::uint8_t>(a, b, [](int x, int y) { return x == y ? 0xFF : 0; });
}
inline Block Equal16(Block a, Block b) {
    return detail::Map<std::uint16_t>(a, b, [](int x, int y) { return x == y ? 0xFFFF : 0; });
}
inline Block Above16(Block a, Block b) {
    return detail::Map<std::int16_t>(a, b, [](int x, int y) { return x > y ? -1 : 0; });
}
inline Block AtLeast8(Block a, Block b) {
    return detail::Map<std::uint8_t>(a, b, [](int x, int y) { return x >= y ? 0xFF : 0; });
}
inline Block Below8(Block a, Block b) {
    return detail::Map<std::int8_t>(a, b, [](int x, int y) { return x < y ? -1 : 0; });
}
inline Block Subtract8(Block a, Block b) {
    return detail::Map<std::uint8_t>(a, b, [](int x, int y) { return x - y; });
}
inline Block Add16(Block a, Block b) {
    return detail::Map<std::uint16_t>(a, b, [](int x, int y) { return x + y; });
}
inline Block Subtract16(Block a, Block b) {
    return detail::Map<std::uint16_t>(a, b, [](int x, int y) { return x - y; });
}
template <int bits> Block ShiftLeft64(Block a) {
    return detail::Map<std::uint64_t>(a, a, [](std::uint64_t x, std::uint64_t) { return x << bits; });
}
template <int bits> Block ShiftRight64(Block a) {
    return detail::Map<std::uint64_t>(a, a, [](std::uint64_t x, std::uint64_t) { return x >> bits; });
}
inline Block Pair(std::uint64_t low, std::uint64_t high) {
    Block x;
    std::memcpy(x.b, &low, 8);
    std::memcpy(x.b + 8, &high, 8);
    return x;
}
inline bool HasShuffle() { return true; }
inline Block Shuffle(Block a, Block index) {
    Block x;
    for (int i = 0; i < 16; ++i) x.b[i] = index.b[i] & 0x80 ? 0 : a.b[index.b[i] & 15];
    return x;
}
template <int places> Block MoveUp(Block a) {
    Block x{};
    std::memcpy(x.b + places, a.b, 16 - places);
    return x;
}
template <int places> Block MoveDown(Block a) {
    Block x{};
    std::memcpy(x.b, a.b + places, 16 - places);
    return x;
}
inline Block HighHalf(Block a) { return MoveDown<8>(a); }
template <int bits> Block ShiftLeft16(Block a) {
    return detail::Map<std::uint16_t>(a, a, [](int x, int) { return x << bits; });
}
template <int bits> Block ShiftRight16(Block a) {
    return detail::Map<std::uint16_t>(a, a, [](int x, int) { return x >> bits; });
}
inline std::uint32_t Mask(Block a) {
    std::uint32_t mask = 0;
    for (int i = 0; i < 16; ++i) mask |= static_cast<std::uint32_t>(a.b[i] >> 7) << i;
    return mask;
}
inline Block WidenLow(Block a) {
    Block x{};
    for (int i = 0; i < 8; ++i) x.b[i * 2] = a.b[i];
    return x;
}
inline Block WidenHigh(Block a) {
    Block x{};
    for (int i = 0; i < 8; ++i) x.b[i * 2] = a.b[i + 8];
    return x;
}
template <std::size_t lane, bool high> Block Interleave(Block a, Block b) {
    Block x;
    for (std::size_t i = 0, from = high ? 8 : 0; i < 16; i += 2 * lane, from += lane) {
        std::memcpy(x.b + i, a.b + from, lane);
        std::memcpy(x.b + i + lane, b.b + from, lane);
    }
    return x;
}
inline Block Narrow(Block a, Block b) {
    Block x;
    const auto byte = [](const std::uint8_t* unit) -> std::uint8_t { return unit[1] ? 0xFF : unit[0]; };
    for (int i = 0; i < 8; ++i) x.b[i] = byte(a.b + i * 2), x.b[i + 8] = byte(b.b + i * 2);
    return x;
}
inline Block PackSigned(Block a, Block b) {
    Block x;
    for (int i = 0; i < 8; ++i) x.b[i] = a.b[i * 2], x.b[i + 8] = b.b[i * 2];
    return x;
}
inline std::uint64_t LowWord(Block a) {
    std::uint64_t half;
    std::memcpy(&half, &a, sizeof half);
    return half;
}
inline std::uint64_t HighWord(Block a) { return LowWord(HighHalf(a)); }
inline std::size_t Sum8(Block a) {
    std::size_t sum = 0;
    for (std::uint8_t byte : a.b) sum += byte;
    return sum;
}

#endif

// The bytes (by Narrow) of the first 16 units of a zero-terminated text; those behind the terminator may be anything.
// What lies there is read, but for a page of which the text has nothing; sanitizers, which count bytes and not pages,
// are kept out.
TAVO_NOSANITIZE inline Block NarrowText(const wchar_t* text) {
    constexpr std::uintptr_t kPage = 4096, kBytes = 2 * kBlock;
    if (TAVO_LIKELY((reinterpret_cast<std::uintptr_t>(text) & (kPage - 1)) <= kPage - kBytes))
        return Narrow(Load(text), Load(text + 8));
    wchar_t copy[kBlock] = {};
    for (std::size_t i = 0; i < kBlock && text[i]; ++i) copy[i] = text[i];
    return Narrow(Load(copy), Load(copy + 8));
}

// The first bytes of a text of at most `limit` bytes that may be zero-terminated; those behind its end may be anything.
// Pages and sanitizers as for NarrowText.
TAVO_NOSANITIZE inline Block LoadText(const unsigned char* text, std::size_t limit) {
    if (TAVO_LIKELY((reinterpret_cast<std::uintptr_t>(text) & 4095) <= 4096 - kBlock)) return Load(text);
    unsigned char copy[kBlock] = {};
    for (std::size_t i = 0; i < kBlock && i < limit && text[i]; ++i) copy[i] = text[i];
    return Load(copy);
}

namespace detail {
template <class Word> TAVO_INLINE std::uint64_t Read(const unsigned char* p) {
    Word word;
    std::memcpy(&word, p, sizeof word);
    return word;
}
template <class Word> TAVO_INLINE void Write(unsigned char* p, std::uint64_t value) {
    const Word word = static_cast<Word>(value);
    std::memcpy(p, &word, sizeof word);
}
} // namespace detail

// The beginning and the end of texts that fill no block: two words that may overlap, so that nothing else is touched
// and no byte is handled by itself. The lower byte comes first, as on every processor with blocks.

// `count` bytes, 1 to 16; those behind are 0.
TAVO_INLINE Block LoadPart(const void* from, std::size_t count) {
    const auto* const p = static_cast<const unsigned char*>(from);
    if (count >= 8) {
        const std::size_t half = 4 * (16 - count); // a shift by 64 in one step would be undefined
        return Pair(detail::Read<std::uint64_t>(p), detail::Read<std::uint64_t>(p + count - 8) >> half >> half);
    }
    if (count >= 4)
        return Pair(detail::Read<std::uint32_t>(p) | detail::Read<std::uint32_t>(p + count - 4) << 8 * (count - 4), 0);
    return Pair(p[0] | static_cast<std::uint64_t>(p[count / 2]) << count / 2 * 8 |
                    static_cast<std::uint64_t>(p[count - 1]) << 8 * (count - 1),
                0);
}

// The first `count` bytes of a block, 0 to 16.
TAVO_INLINE void StorePart(void* to, Block x, std::size_t count) {
    auto* const p = static_cast<unsigned char*>(to);
    const std::uint64_t low = LowWord(x);
    if (count > 8) {
        const std::size_t half = 4 * (count - 8);
        detail::Write<std::uint64_t>(p, low);
        detail::Write<std::uint64_t>(p + count - 8, HighWord(x) << 8 * (16 - count) | low >> half >> half);
    } else if (count == 8) {
        detail::Write<std::uint64_t>(p, low);
    } else if (count >= 4) {
        detail::Write<std::uint32_t>(p, low);
        detail::Write<std::uint32_t>(p + count - 4, low >> 8 * (count - 4));
    } else if (count >= 2) {
        detail::Write<std::uint16_t>(p, low);
        detail::Write<std::uint16_t>(p + count - 2, low >> 8 * (count - 2));
    } else if (count == 1) {
        detail::Write<std::uint8_t>(p, low);
    }
}

// Set bits, without the processor's instruction, which the baseline lacks.
inline std::size_t CountBits(std::uint64_t x) {
    x -= (x >> 1) & 0x5555555555555555;
    x = (x & 0x3333333333333333) + ((x >> 2) & 0x3333333333333333);
    return static_cast<std::size_t>((((x + (x >> 4)) & 0x0F0F0F0F0F0F0F0F) * 0x0101010101010101) >> 56);
}

// The index of the first zero unit, at most n. With `ascii`: whether nothing above 7F stands before it; false may also
// mean that something stands just outside the text.
#if defined(TAVO_SSE2)
// Only whole aligned blocks that hold a unit of the text are loaded, or four of them in one cache line, so no page is
// touched that the text does not reach; sanitizers, which count bytes and not pages, are kept out.
template <class Unit> TAVO_NOSANITIZE std::size_t ZeroUnit(const Unit* text, std::size_t n, bool* ascii = nullptr) {
    constexpr std::size_t kLine = 4 * kBlock;
    if (ascii) *ascii = false;
    const auto address = reinterpret_cast<std::uintptr_t>(text);
    if (TAVO_UNLIKELY(address % sizeof(Unit) != 0)) { // no block holds whole units then
        std::size_t i = 0;
        while (i < n && text[i]) ++i;
        return i;
    }
    if (n == 0) return 0;
    const auto zeroes = [](Block block) {
        return sizeof(Unit) == 1 ? Equal8(block, All8(0)) : Equal16(block, All16(0));
    };
    const auto isAscii = [](Block all) {
        return Mask(Equal16(And(all, All16(sizeof(Unit) == 1 ? 0x8080 : 0xFF80)), All16(0))) == 0xFFFF;
    };
    const std::size_t skipped = address % kBlock;
    const auto* block = reinterpret_cast<const unsigned char*>(text) - skipped;
    Block all = LoadAligned(block); // or-ed
    std::uint32_t mask = Mask(zeroes(all)) >> skipped;
    std::size_t i = 0; // the unit that bit 0 of the mask stands for
    for (std::size_t next = (kBlock - skipped) / sizeof(Unit); !mask; next += kBlock / sizeof(Unit)) {
        if (next >= n) {
            if (ascii) *ascii = isAscii(all);
            return n;
        }
        i = next;
        block += kBlock;
        while (reinterpret_cast<std::uintptr_t>(block) % kLine == 0) {
            const Block a = LoadAligned(block), b = LoadAligned(block + kBlock);
            const Block c = LoadAligned(block + 2 * kBlock), d = LoadAligned(block + 3 * kBlock);
            if (Mask(Or(Or(zeroes(a), zeroes(b)), Or(zeroes(c), zeroes(d))))) break;
            all = Or(all, Or(Or(a, b), Or(c, d)));
            next += kLine / sizeof(Unit);
            if (next >= n) {
                if (ascii) *ascii = isAscii(all);
                return n;
            }
            i = next;
            block += kLine;
        }
        const Block one = LoadAligned(block);
        all = Or(all, one);
        mask = Mask(zeroes(one));
    }
    if (ascii) *ascii = isAscii(all);
    const std::size_t found = i + static_cast<std::size_t>(std::countr_zero(mask)) / sizeof(Unit);
    return found < n ? found : n;
}
#else
template <class Unit> std::size_t ZeroUnit(const Unit* text, std::size_t n, bool* ascii = nullptr) {
    std::size_t i = 0;
    while (i < n && text[i]) ++i;
    if (ascii) *ascii = false;
    return i;
}
#endif

// --- Lines of 64 bytes -----------------------------------------------------------------------------------------------
//
// Processors with AVX-512 and VBMI2 load and store any part of 64 bytes, touching nothing else, and move chosen lanes
// to the front. Functions marked TAVO_LINE may be called when HasLines() is true; TAVO_NO_LINES builds what other
// processors run. Masks have one bit per lane.

#if defined(TAVO_LINES)

#define TAVO_LINE __attribute__((target("avx512f,avx512bw,avx512vl,avx512vbmi,avx512vbmi2,bmi,bmi2,lzcnt,popcnt")))
#define TAVO_LINE_INLINE TAVO_LINE TAVO_INLINE

constexpr bool kLines = true;
inline bool g_hideLines = false; // set by tests, which also run what other processors do
inline bool HasLines() {
    return !g_hideLines && __builtin_cpu_supports("avx512bw") && __builtin_cpu_supports("avx512vl") &&
           __builtin_cpu_supports("avx512vbmi") && __builtin_cpu_supports("avx512vbmi2") &&
           __builtin_cpu_supports("bmi2") && __builtin_cpu_supports("popcnt");
}

using HalfLine = __m256i;
using Line = __m512i;

// A mask of the first `count` lanes.
TAVO_LINE_INLINE std::uint32_t First32(std::size_t count) { return _bzhi_u32(~0u, static_cast<unsigned>(count)); }
TAVO_LINE_INLINE std::uint64_t First64(std::size_t count) { return _bzhi_u64(~0ull, static_cast<unsigned>(count)); }
TAVO_LINE_INLINE std::size_t Count(std::uint64_t mask) { return static_cast<std::size_t>(__builtin_popcountll(mask)); }

// The lanes of the mask; the others are 0 and not touched.
TAVO_LINE_INLINE Line LoadLine8(const void* p, std::uint64_t mask) { return _mm512_maskz_loadu_epi8(mask, p); }
// The same from `back` bytes before p, which need not be anywhere.
TAVO_LINE_INLINE Line LoadLine8Before(const void* p, std::size_t back, std::uint64_t mask) {
    return LoadLine8(reinterpret_cast<const void*>(reinterpret_cast<std::uintptr_t>(p) - back), mask);
}
TAVO_LINE_INLINE Line LoadLine16(const void* p, std::uint32_t mask) { return _mm512_maskz_loadu_epi16(mask, p); }
// The lanes of the mask one after the other.
TAVO_LINE_INLINE void StoreLanes8(void* p, std::uint64_t mask, Line x) {
    _mm512_mask_storeu_epi8(p, First64(Count(mask)), _mm512_maskz_compress_epi8(mask, x));
}
TAVO_LINE_INLINE void StoreLanes16(void* p, std::uint32_t mask, Line x) {
    _mm512_mask_storeu_epi16(p, First32(Count(mask)), _mm512_maskz_compress_epi16(mask, x));
}
TAVO_LINE_INLINE void StoreHalf8(void* p, std::uint32_t mask, HalfLine x) { _mm256_mask_storeu_epi8(p, mask, x); }

TAVO_LINE_INLINE Line Line16(int value) { return _mm512_set1_epi16(static_cast<short>(value)); }
TAVO_LINE_INLINE Line Line32(int value) { return _mm512_set1_epi32(value); }
TAVO_LINE_INLINE Line And(Line a, Line b) { return _mm512_and_si512(a, b); }
TAVO_LINE_INLINE Line Or(Line a, Line b) { return _mm512_or_si512(a, b); }
template <int bits> TAVO_LINE_INLINE Line ShiftLeft16(Line a) { return _mm512_slli_epi16(a, bits); }
template <int bits> TAVO_LINE_INLINE Line ShiftRight16(Line a) { return _mm512_srli_epi16(a, bits); }
template <int bits> TAVO_LINE_INLINE Line ShiftLeft32(Line a) { return _mm512_slli_epi32(a, bits); }
template <int bits> TAVO_LINE_INLINE Line ShiftRight32(Line a) { return _mm512_srli_epi32(a, bits); }
// b where the mask has a bit, elsewhere a.
TAVO_LINE_INLINE Line Select16(std::uint32_t mask, Line a, Line b) { return _mm512_mask_mov_epi16(a, mask, b); }
TAVO_LINE_INLINE Line Select32(std::uint16_t mask, Line a, Line b) { return _mm512_mask_mov_epi32(a, mask, b); }
// a where the mask has a bit, elsewhere 0.
TAVO_LINE_INLINE Line Keep16(std::uint32_t mask, Line a) { return _mm512_maskz_mov_epi16(mask, a); }
// Byte i of the result is byte index[i].
TAVO_LINE_INLINE Line Gather8(Line a, Line index) { return _mm512_permutexvar_epi8(index, a); }
TAVO_LINE_INLINE Line LoadLine(const void* p) { return _mm512_loadu_si512(p); }
TAVO_LINE_INLINE Line Widen32(HalfLine units) { return _mm512_cvtepu16_epi32(units); }
TAVO_LINE_INLINE HalfLine Narrow(Line units) { return _mm512_cvtepi16_epi8(units); }
TAVO_LINE_INLINE HalfLine LowHalf(Line a) { return _mm512_castsi512_si256(a); }
TAVO_LINE_INLINE HalfLine HighHalf(Line a) { return _mm512_extracti64x4_epi64(a, 1); }

TAVO_LINE_INLINE std::uint64_t High8(Line a) { return _mm512_movepi8_mask(a); }
TAVO_LINE_INLINE std::uint64_t NonZero8(Line a) { return _mm512_test_epi8_mask(a, a); }
// Signed a < b, and unsigned comparisons.
TAVO_LINE_INLINE std::uint64_t IsBelow8(Line a, int b) {
    return _mm512_cmplt_epi8_mask(a, _mm512_set1_epi8(static_cast<char>(b)));
}
TAVO_LINE_INLINE std::uint64_t IsAtLeast8(Line a, int b) {
    return _mm512_cmpge_epu8_mask(a, _mm512_set1_epi8(static_cast<char>(b)));
}
TAVO_LINE_INLINE std::uint32_t IsBelow16(Line a, int b) { return _mm512_cmplt_epu16_mask(a, Line16(b)); }
TAVO_LINE_INLINE std::uint32_t IsEqual16(Line a, int b) { return _mm512_cmpeq_epi16_mask(a, Line16(b)); }
TAVO_LINE_INLINE std::uint16_t IsBelow32(Line a, int b) { return _mm512_cmplt_epu32_mask(a, Line32(b)); }

// What Multiply does, in the four blocks of a line side by side: functions marked TAVO_LINE_MULTIPLIES may call what
// those of lines and of multiplication may, and may be called when HasLineMultiply() is true.
#define TAVO_LINE_MULTIPLIES                                                                                           \
    __attribute__((target("avx512f,avx512bw,avx512vl,avx512vbmi,avx512vbmi2,bmi,bmi2,lzcnt,popcnt,ssse3,pclmul,"       \
                          "vpclmulqdq")))
inline bool HasLineMultiply() { return HasLines() && HasMultiply() && __builtin_cpu_supports("vpclmulqdq"); }
TAVO_LINE_MULTIPLIES inline Line MultiplyLow(Line a, Line b) { return _mm512_clmulepi64_epi128(a, b, 0x00); }
TAVO_LINE_MULTIPLIES inline Line MultiplyHigh(Line a, Line b) { return _mm512_clmulepi64_epi128(a, b, 0x11); }
TAVO_LINE_INLINE Line Xor3(Line a, Line b, Line c) { return _mm512_ternarylogic_epi64(a, b, c, 0x96); }
// With masks of all lanes: GCC warns of what the plain forms leave undefined.
TAVO_LINE_INLINE Line FourTimes(Block a) { return _mm512_maskz_broadcast_i32x4(0xFFFF, a); }
TAVO_LINE_INLINE Line LastBlock(Block a) { return _mm512_inserti32x4(_mm512_setzero_si512(), a, 3); }
template <int block> TAVO_LINE_INLINE Block BlockOf(Line a) { return _mm512_maskz_extracti32x4_epi32(0xF, a, block); }
// Words 0 to 3, or 4 to 7, each in the low half of a block; anything in the high halves.
template <bool high> TAVO_LINE_INLINE Line SpreadWords(Line a) {
    constexpr int first = high ? 4 : 0;
    return _mm512_maskz_permutexvar_epi64(0xFF, _mm512_set_epi64(0, first + 3, 0, first + 2, 0, first + 1, 0, first),
                                          a);
}
// Shuffle in each block.
TAVO_LINE_INLINE Line ShuffleBlocks(Line a, Line index) { return _mm512_shuffle_epi8(a, index); }
TAVO_LINE_INLINE Line AddWhere8(std::uint64_t mask, Line a, int value) {
    return _mm512_mask_add_epi8(a, mask, a, _mm512_set1_epi8(static_cast<char>(value)));
}

#else

#define TAVO_LINE
constexpr bool kLines = false;
inline bool g_hideLines = false;
inline bool HasLines() { return false; }
#endif

// Asks for the cache line at `address`, which need not be readable: to be read, or to be written soon.
TAVO_INLINE void Prefetch(const void* address) {
#if defined(TAVO_SSE2) && !defined(_MSC_VER)
    // Not the intrinsic: GCC takes a function that only prefetches for one that does nothing.
    __asm__ volatile("prefetcht0 %0" : : "m"(*static_cast<const char*>(address)));
#elif defined(TAVO_SSE2)
    _mm_prefetch(static_cast<const char*>(address), _MM_HINT_T0);
#else
    static_cast<void>(address);
#endif
}

// Tells the processor that this thread spins.
inline void Pause() {
#if defined(TAVO_SSE2)
    _mm_pause();
#endif
}

} // namespace TAVO::Simd
