// The bulk passes of the transcoders for processors with AVX-512: every text, long or short, is a few lines, of which
// the last is a part. Loads and stores touch only the lanes that they are for.

#include "transcodingchunks.h"

#if defined(TAVO_LINES)

namespace TAVO::String::detail::Lines {
namespace {

using namespace Simd;

constexpr std::size_t kLanes = 32;

constexpr std::size_t Least(std::size_t a, std::size_t b) { return a < b ? a : b; }

// Asks for what a pass comes to soon, if `left` bytes reach that far. Of texts that no near cache holds, the processor
// fetches in time by itself what is loaded and stored whole, but hardly what is so by lanes.
TAVO_LINE_INLINE void FetchAhead(const void* source, const void* target, std::size_t left) {
    constexpr std::uintptr_t kAhead = 1536;
    if (left <= kAhead) return;
    Prefetch(reinterpret_cast<const void*>(reinterpret_cast<std::uintptr_t>(source) + kAhead));
    Prefetch(reinterpret_cast<const void*>(reinterpret_cast<std::uintptr_t>(target) + kAhead));
}

// The UTF-8 of units below 800, in each lane the bytes that are not 0.
TAVO_LINE_INLINE Line Encode2(Line x, std::uint32_t ascii) {
    const Line two = Or(Or(ShiftRight16<6>(x), ShiftLeft16<8>(And(x, Line16(0x3F)))), Line16(0x80C0));
    return Select16(ascii, two, x);
}
// The same of any units, which are no surrogates, in lanes of 32 bits.
TAVO_LINE_INLINE Line Encode3(Line x) {
    const Line heads = Select32(IsBelow32(x, 0x800), Line32(0x8080E0), Line32(0x80C000));
    const Line bits =
        Or(Or(ShiftRight32<12>(x), And(ShiftLeft32<2>(x), Line32(0x3F00))), ShiftLeft32<16>(And(x, Line32(0x3F))));
    return Select32(IsBelow32(x, 0x80), Or(bits, heads), x);
}
TAVO_LINE_INLINE unsigned char* StoreBytes(unsigned char* out, Line encoded) {
    const std::uint64_t bytes = NonZero8(encoded); // the text holds no zero unit
    StoreLanes8(out, bytes, encoded);
    return out + Count(bytes);
}

} // namespace

TAVO_LINE void MeasureUtf8(const unsigned char* text, std::size_t length, Extent& extent) {
    Extent sum = extent;
    std::uint64_t expected = 0;
    while (sum.source < length) {
        const std::size_t size = Least(length - sum.source, kChunk);
        const Line x = LoadLine8(text + sum.source, First64(size));
        const ChunkBits bits = {High8(x), IsBelow8(x, 0xC0), IsAtLeast8(x, 0xE0), IsAtLeast8(x, 0xF0)};
        if (!AddPlain(bits, size, expected, sum)) break;
    }
    if (expected != 0) TakeBack(text, sum);
    extent = sum;
}

// For each of 32 bytes of a line from the third on: it and the byte before; the byte before that in the high half.
struct Neighbours {
    std::uint8_t pair[64], earlier[64];
};
alignas(64) constexpr Neighbours kNeighbours = [] {
    Neighbours table{};
    for (std::uint8_t lane = 0; lane < kLanes; ++lane) {
        table.pair[lane * 2] = static_cast<std::uint8_t>(lane + 2);
        table.pair[lane * 2 + 1] = static_cast<std::uint8_t>(lane + 1);
        table.earlier[lane * 2] = table.earlier[lane * 2 + 1] = lane;
    }
    return table;
}();

// Each byte is a lane. Those that end a sequence collect its bits from the two before them.
template <class Unit> TAVO_LINE Unit* ConvertUtf8(const unsigned char*& begin, const unsigned char* end, Unit* out) {
    const Line kPair = LoadLine(kNeighbours.pair), kEarlier = LoadLine(kNeighbours.earlier);
    std::uint64_t readable = ~3ull; // nothing stands before the text
    const unsigned char* text = begin;
    while (text < end) {
        const auto left = static_cast<std::size_t>(end - text);
        FetchAhead(text, out, left);
        const std::size_t size = Least(left, kLanes);
        const Line x = LoadLine8Before(text, 2, readable & First64(Least(left, kLanes + 1) + 2));
        readable = ~0ull;
        const std::uint64_t continuations = IsBelow8(x, 0xC0);
        const auto leads4 = static_cast<std::uint32_t>(IsAtLeast8(x, 0xF0) >> 2);
        const std::size_t good = leads4 != 0 ? static_cast<std::size_t>(std::countr_zero(leads4)) : size;
        const auto ends = First32(good) & ~static_cast<std::uint32_t>(continuations >> 3);
        const auto continued = static_cast<std::uint32_t>(continuations >> 2);
        const auto twice = static_cast<std::uint32_t>(continuations >> 2 & continuations >> 1);
        const Line pair = Gather8(x, kPair);
        const Line low = And(pair, Line16(0x7F));
        const Line middle = Keep16(continued, ShiftRight16<2>(And(pair, Line16(0x3F00))));
        const Line high = Keep16(twice, ShiftLeft16<12>(Gather8(x, kEarlier)));
        StoreLanes16(out, ends, Or(Or(low, middle), high));
        out += Count(ends);
        if (TAVO_UNLIKELY(leads4 != 0)) {
            text += good;
            break;
        }
        text += size;
    }
    begin = text;
    return out;
}

template <class Unit> TAVO_LINE void MeasureUtf16(const Unit* text, std::size_t length, Extent& extent) {
    std::size_t source = extent.source, characters = 0, target = 0;
    for (bool plain = true; plain && source < length;) {
        std::size_t size = Least(length - source, kLanes);
        std::uint32_t lanes = First32(size);
        const Line x = LoadLine16(text + source, lanes);
        const std::uint32_t surrogates = IsEqual16(And(x, Line16(0xF800)), 0xD800);
        if (TAVO_UNLIKELY(surrogates != 0)) {
            plain = false;
            size = static_cast<std::size_t>(std::countr_zero(surrogates));
            lanes = First32(size);
        }
        source += size;
        characters += size;
        target += 3 * size - Count(lanes & IsBelow16(x, 0x80)) - Count(lanes & IsBelow16(x, 0x800));
    }
    extent.source = source;
    extent.characters += characters;
    extent.target += target;
}

template <class Unit> TAVO_LINE unsigned char* ConvertUtf16(const Unit*& begin, const Unit* end, unsigned char* out) {
    const Unit* text = begin;
    for (bool plain = true; plain && text < end;) {
        const auto left = static_cast<std::size_t>(end - text);
        FetchAhead(text, out, left * sizeof(Unit));
        std::size_t size = Least(left, kLanes);
        Line x = LoadLine16(text, First32(size));
        const std::uint32_t surrogates = IsEqual16(And(x, Line16(0xF800)), 0xD800);
        if (TAVO_UNLIKELY(surrogates != 0)) {
            plain = false;
            size = static_cast<std::size_t>(std::countr_zero(surrogates));
            x = Keep16(First32(size), x);
        }
        const std::uint32_t ascii = IsBelow16(x, 0x80);
        if (ascii == ~0u) {
            StoreHalf8(out, First32(size), Narrow(x));
            out += size;
        } else if (IsBelow16(x, 0x800) == ~0u) {
            out = StoreBytes(out, Encode2(x, ascii));
        } else {
            out = StoreBytes(out, Encode3(Widen32(LowHalf(x))));
            if (size > kLanes / 2) out = StoreBytes(out, Encode3(Widen32(HighHalf(x))));
        }
        text += size;
    }
    begin = text;
    return out;
}

template void MeasureUtf16(const wchar_t*, std::size_t, Extent&);
template void MeasureUtf16(const unsigned short*, std::size_t, Extent&);
template wchar_t* ConvertUtf8(const unsigned char*&, const unsigned char*, wchar_t*);
template unsigned short* ConvertUtf8(const unsigned char*&, const unsigned char*, unsigned short*);
template unsigned char* ConvertUtf16(const wchar_t*&, const wchar_t*, unsigned char*);
template unsigned char* ConvertUtf16(const unsigned short*&, const unsigned short*, unsigned char*);

} // namespace TAVO::String::detail::Lines

#endif
