// Keys of texts.

#include "poolkey.h"

#include "crc64fold.h"
#include "transcoding.h"

#include <cstring>

namespace TAVO::String::pool {

namespace {

// Both checksums of a text in one pass. They are the same until the first capital letter, and mostly to the end.
class Hasher {
public:
    // Four units in memory order, none of them a surrogate; `ascii`: none above 7F.
    TAVO_INLINE void Four(std::uint64_t units, bool ascii) {
        if (TAVO_LIKELY(!m_folded)) {
            const std::uint64_t capitals = ascii ? Capitals(units) : CapitalsOfAny(units);
            if (TAVO_LIKELY(capitals == 0)) {
                m_hash = crc64::Add4(m_hash, units);
                return;
            }
            m_folded = true;
            m_hashi = m_hash;
        }
        const std::uint64_t capitals = ascii ? Capitals(units) : CapitalsOfAny(units);
        m_hash = crc64::Add4(m_hash, units);
        m_hashi = crc64::Add4(m_hashi, units | capitals >> 2);
    }

    TAVO_INLINE void One(std::uint16_t unit) {
        const std::uint16_t folded = detail::FoldUnit(unit);
        if (!m_folded) {
            if (TAVO_LIKELY(folded == unit)) {
                m_hash = crc64::Add1(m_hash, unit);
                return;
            }
            m_folded = true;
            m_hashi = m_hash;
        }
        m_hash = crc64::Add1(m_hash, unit);
        m_hashi = crc64::Add1(m_hashi, folded);
    }

    void Store(Key& key) const {
        key.hash = m_hash;
        key.hashi = m_folded ? m_hashi : m_hash;
    }

private:
    static constexpr std::uint64_t kEach = 0x0001000100010001;

    // 0x80 in every unit that is A to Z; all units below 80. Adding 3F carries into bit 7 from 41 on, adding 25 from 5B
    // on.
    static std::uint64_t Capitals(std::uint64_t units) {
        return (units + 0x3F * kEach) & ~(units + 0x25 * kEach) & 0x80 * kEach;
    }

    static std::uint64_t CapitalsOfAny(std::uint64_t units) {
        const std::uint64_t low = units & 0x7F * kEach;
        const std::uint64_t high = units & 0xFF80 * kEach;
        // 0x80 in every unit with nothing above bit 6.
        const std::uint64_t ascii = ~((((high >> 1) & 0x7FFF * kEach) + 0x7FC0 * kEach) >> 8) & 0x80 * kEach;
        return Capitals(low) & ascii;
    }

    std::uint64_t m_hash = 0, m_hashi = 0;
    bool m_folded = false; // whether the two differ
};

constexpr std::uint64_t kNotAscii = 0xFF80FF80FF80FF80;

// Whether one of four units is a surrogate: the test is exact for none and may be true for others too.
constexpr bool MayHoldSurrogate(std::uint64_t units) { return (units & (units << 1) & 0x8000800080008000) != 0; }

constexpr std::size_t Utf8SizeOf(std::uint16_t unit) { return 1 + (unit >= 0x80) + (unit >= 0x800); }

bool IsAscii(const unsigned char* text, std::size_t count) {
    std::size_t i = 0;
    for (; count - i >= Simd::kBlock; i += Simd::kBlock)
        if (Simd::Mask(Simd::Load(text + i))) return false;
    unsigned char all = 0;
    for (; i < count; ++i) all |= text[i];
    return all < 0x80;
}

// Four ASCII bytes as four units.
constexpr std::uint64_t Widen(std::uint32_t bytes) {
    std::uint64_t v = bytes;
    v = (v | v << 16) & 0x0000FFFF0000FFFF;
    return (v | v << 8) & 0x00FF00FF00FF00FF;
}

// Wide texts shorter than this take the tables: folding loads whole blocks.
constexpr std::size_t kFewUnits = 8;

#if defined(TAVO_CRC_FOLDS)

// Both checksums of a text, eight units or more at a step. The first step takes what is left over.
class Folder {
public:
    // One block or two, and the same in lower case; `capitals` tells whether the two differ.
    template <class... Blocks> TAVO_MULTIPLIES void Add(bool capitals, Blocks... blocks) {
        if (capitals && !m_folded) {
            m_folded = true;
            m_lower = m_exact;
        }
        m_exact.Add(blocks...);
    }
    template <class... Blocks> TAVO_MULTIPLIES void AddLower(Blocks... blocks) {
        if (m_folded) m_lower.Add(blocks...);
    }
    // The first block, and the same in lower case.
    TAVO_MULTIPLIES void Start(bool capitals, Simd::Block exact, Simd::Block lower) {
        m_exact.Start(exact);
        m_folded = capitals;
        if (capitals) m_lower.Start(lower);
    }
#if defined(TAVO_LINES)
    // Adds ASCII bytes as units, sixty-four at a step, and returns how many.
    TAVO_LINE_MULTIPLIES std::size_t AddLines(const unsigned char* text, std::size_t count, Simd::Block order) {
        using namespace Simd;
        constexpr std::size_t kLine = sizeof(Line);
        const Line orders = FourTimes(order);
        crc64::LineFold exact(m_exact), lower(m_lower);
        const auto add = [&](crc64::LineFold& fold, Line bytes) TAVO_LINE_MULTIPLIES {
            fold.Add(ShuffleBlocks(SpreadWords<false>(bytes), orders), ShuffleBlocks(SpreadWords<true>(bytes), orders));
        };
        std::size_t i = 0;
        for (; count - i >= kLine; i += kLine) {
            const Line bytes = LoadLine(text + i);
            const std::uint64_t capitals = IsAtLeast8(bytes, 'A') & ~IsAtLeast8(bytes, 'Z' + 1);
            if (capitals && !m_folded) {
                m_folded = true;
                lower = exact;
            }
            add(exact, bytes);
            if (m_folded) add(lower, AddWhere8(capitals, bytes, 'a' - 'A'));
        }
        m_exact = exact.Sum();
        if (m_folded) m_lower = lower.Sum();
        return i;
    }
#endif
    TAVO_MULTIPLIES void Store(Key& key) const {
        key.hash = m_exact.Checksum();
        key.hashi = m_folded ? m_lower.Checksum() : key.hash;
    }

private:
    crc64::Fold m_exact, m_lower;
    bool m_folded = false;
};

// Moves the first `bytes` bytes to the low end, the first one highest, and clears the rest.
TAVO_MULTIPLIES inline Simd::Block Reverse(Simd::Block block, std::size_t bytes) {
    alignas(16) static constexpr unsigned char kOrder[32] = {
        15,   14,   13,   12,   11,   10,   9,    8,    7,    6,    5,    4,    3,    2,    1,    0,
        0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80};
    return Simd::Shuffle(block, Simd::Load(kOrder + (16 - bytes)));
}

// FF in every byte that is A to Z.
TAVO_MULTIPLIES inline Simd::Block CapitalsIn(Simd::Block bytes) {
    using namespace Simd;
    return And(Below8(All8('A' - 1), bytes), Below8(bytes, All8('Z' + 1)));
}
TAVO_MULTIPLIES inline Simd::Block Lowered(Simd::Block bytes, Simd::Block capitals) {
    return Simd::Or(bytes, Simd::And(capitals, Simd::All8(0x20)));
}

// The checksum of bytes as units; the last one lowest, none behind the first.
TAVO_MULTIPLIES inline std::uint64_t ChecksumOfReversed(Simd::Block reversed) {
    using namespace Simd;
    return crc64::Fold::ChecksumOf(Interleave<1, true>(All8(0), reversed), Interleave<1, false>(All8(0), reversed));
}

// The same for `count` ASCII bytes at the low end of one block, the most usual text: no branch but for capitals.
TAVO_MULTIPLIES inline void FoldBlock(Simd::Block bytes, std::size_t count, Key& key) {
    const Simd::Block reversed = Reverse(bytes, count), capitals = CapitalsIn(reversed);
    key.length = key.utf8Size = count;
    key.hash = key.hashi = ChecksumOfReversed(reversed);
    if (Simd::Mask(capitals)) key.hashi = ChecksumOfReversed(Lowered(reversed, capitals));
}

// A text that ends, by a terminator or the limit, within a block's bytes and is ASCII; else false, and nothing is done.
TAVO_MULTIPLIES bool FoldShort(const unsigned char* text, std::size_t limit, Key& key) {
    using namespace Simd;
    const Block bytes = LoadText(text, limit);
    const std::uint32_t ends = Mask(Equal8(bytes, All8(0))) | 1u << kBlock;
    const std::size_t end = static_cast<std::size_t>(std::countr_zero(ends)), count = end < limit ? end : limit;
    if (count == kBlock || (Mask(bytes) & ((1u << count) - 1))) return false;
    FoldBlock(bytes, count, key);
    return true;
}

TAVO_MULTIPLIES void FoldAscii(const unsigned char* text, std::size_t count, Key& key) {
    using namespace Simd;
    if (count <= kBlock) return FoldBlock(LoadPart(text, count), count, key);
    // Byte i becomes unit i: its place from the top, a zero byte behind it. Two halves of a block.
    const Block low = Pair(0x0480058006800780, 0x0080018002800380);
    const Block high = Pair(0x0C800D800E800F80, 0x088009800A800B80);
    Folder folder;

    std::size_t i = count % 8 ? count % 8 : 8;
    std::uint64_t first;
    std::memcpy(&first, text, 8);
    const Block head = Pair(first << 8 * (8 - i), 0), headCapitals = CapitalsIn(head);
    folder.Start(Mask(headCapitals) != 0, Shuffle(head, low), Shuffle(Lowered(head, headCapitals), low));
    if ((count - i) % kBlock) {
        std::memcpy(&first, text + i, 8);
        const Block next = Pair(first, 0), capitals = CapitalsIn(next);
        folder.Add(Mask(capitals) != 0, Shuffle(next, low));
        folder.AddLower(Shuffle(Lowered(next, capitals), low));
        i += 8;
    }
#if defined(TAVO_LINES)
    constexpr std::size_t kMany = 256; // summing up takes as long as some lines
    if (count - i >= kMany && HasLineMultiply()) i += folder.AddLines(text + i, count - i, low);
#endif
    for (; count - i >= 2 * kBlock; i += 2 * kBlock) {
        const Block a = Load(text + i), b = Load(text + i + kBlock);
        const Block capitalsA = CapitalsIn(a), capitalsB = CapitalsIn(b);
        const Block lowerA = Lowered(a, capitalsA), lowerB = Lowered(b, capitalsB);
        folder.Add(Mask(Or(capitalsA, capitalsB)) != 0, Shuffle(a, low), Shuffle(a, high), Shuffle(b, low),
                   Shuffle(b, high));
        folder.AddLower(Shuffle(lowerA, low), Shuffle(lowerA, high), Shuffle(lowerB, low), Shuffle(lowerB, high));
    }
    if (i < count) {
        const Block bytes = Load(text + i), capitals = CapitalsIn(bytes);
        const Block lower = Lowered(bytes, capitals);
        folder.Add(Mask(capitals) != 0, Shuffle(bytes, low), Shuffle(bytes, high));
        folder.AddLower(Shuffle(lower, low), Shuffle(lower, high));
    }
    key.length = key.utf8Size = count;
    folder.Store(key);
}

// False when the text holds a surrogate: it must be decoded.
TAVO_MULTIPLIES bool FoldUnits(const wchar_t* text, std::size_t count, Key& key) {
    using namespace Simd;
    Folder folder;
    key = Key{};
    key.length = count;
    std::size_t taken = count % 8 ? count % 8 : 8;
    for (std::size_t i = 0; i < count; i += taken, taken = 8) {
        const Block units = Load(text + i);
        const Block high = And(units, All16(0xF800));
        const std::uint32_t present = 0xFFFFu >> (16 - 2 * taken);
        if (Mask(Equal16(high, All16(0xD800))) & present) return false;
        // A unit has three bytes, or fewer by these two tests.
        const std::uint32_t below800 = Mask(Equal16(high, All16(0))) & present;
        const std::uint32_t below80 = Mask(Equal16(And(units, All16(0xFF80)), All16(0))) & present;
        key.utf8Size += 3 * taken - CountBits(below800 | below80 << 16) / 2;
        const Block letters = And(Above16(units, All16('A' - 1)), Above16(All16('Z' + 1), units));
        folder.Add((Mask(letters) & present) != 0, Reverse(units, 2 * taken));
        folder.AddLower(Reverse(Or(units, And(letters, All16(0x20))), 2 * taken));
    }
    folder.Store(key);
    return true;
}

#endif

// `units` counts what was hashed: all of `count`, but for a pair that the end cuts when `mayCut`.
bool HashUnits(const wchar_t* text, std::size_t count, bool mayCut, Key& key, std::size_t& units) {
#if defined(TAVO_CRC_FOLDS)
    if (count >= kFewUnits && Simd::HasMultiply() && FoldUnits(text, count, key)) {
        units = count;
        return true;
    }
#endif
    Hasher hasher;
    key = Key{};
    std::size_t i = 0;
    while (i < count) {
        if (count - i >= 4) {
            std::uint64_t four;
            std::memcpy(&four, text + i, 8);
            const bool ascii = (four & kNotAscii) == 0;
            if (ascii || !MayHoldSurrogate(four)) {
                hasher.Four(four, ascii);
                key.length += 4;
                key.utf8Size += 4;
                if (!ascii)
                    for (std::size_t k = 0; k < 4; ++k) key.utf8Size += Utf8SizeOf(text[i + k]) - 1;
                i += 4;
                continue;
            }
        }
        std::uint16_t value = text[i];
        std::size_t taken = 1;
        if (detail::IsSurrogate(text[i])) {
            taken = detail::Utf16Sequence(text + i, count - i);
            if (taken == 0) {
                if (mayCut && i + 1 == count && detail::IsHighSurrogate(text[i])) break;
                return false;
            }
            value = static_cast<std::uint16_t>(detail::PairValue(text[i], text[i + 1]));
        }
        hasher.One(value);
        key.length += 1; // a pair too: its value is 0 or 1
        key.utf8Size += Utf8SizeOf(value);
        i += taken;
    }
    units = i;
    hasher.Store(key);
    return true;
}

} // namespace

bool KeyOfWide(const wchar_t* text, std::size_t limit, Key& key, std::size_t& units) {
    const std::size_t count = detail::WideLengthN(text, limit);
    return HashUnits(text, count, count == limit, key, units);
}

bool KeyOfUnits(const wchar_t* text, std::size_t count, Key& key) {
    std::size_t units;
    return HashUnits(text, count, false, key, units);
}

bool KeyOfUtf8(const unsigned char* text, std::size_t limit, Key& key, std::size_t& bytes) {
#if defined(TAVO_CRC_FOLDS)
    if (Simd::HasMultiply() && FoldShort(text, limit, key)) {
        bytes = key.length;
        return true;
    }
#endif
    const std::size_t count = Simd::ZeroUnit(text, limit);
    if (IsAscii(text, count)) {
        KeyOfAscii(text, bytes = count, key);
        return true;
    }
    Hasher hasher;
    key = Key{};
    std::size_t i = 0;
    while (i < count) {
        if (count - i >= 4) {
            std::uint32_t four;
            std::memcpy(&four, text + i, 4);
            if ((four & 0x80808080) == 0) {
                hasher.Four(Widen(four), true);
                key.length += 4;
                i += 4;
                continue;
            }
        }
        const std::size_t taken = detail::Utf8Sequence(text + i, count - i);
        if (taken == 0) {
            // Cut by the limit, and nothing wrong with what is there?
            bool cut = count == limit && detail::kUtf8Length[text[i]] > count - i;
            for (std::size_t k = i + 1; cut && k < count; ++k) cut = detail::IsContinuation(text[k]);
            if (cut) break;
            return false;
        }
        const unsigned char* in = text + i;
        ulong32 value;
        detail::StepUtf8(value, in);
        hasher.One(static_cast<std::uint16_t>(value)); // bits above 15 are not hashed
        key.length += value < 0x10000 ? 1 : 2;
        i += taken;
    }
    bytes = key.utf8Size = i;
    hasher.Store(key);
    return true;
}

Key KeyOfStoredUtf8(const wchar_t* text, std::size_t units, bool joined) {
    Hasher hasher;
    Key key;
    for (std::size_t i = 0; i < units; ++i) {
        const unsigned first = text[i];
        ++key.length;
        // 10000 is D840 DC00, 10FFFF is DC3F DFFF.
        if (joined && i + 1 < units && first >= 0xD840 && first <= 0xDC3F && detail::IsLowSurrogate(text[i + 1])) {
            ++key.length;
            hasher.One(static_cast<std::uint16_t>((first & 0x3F) << 10 | (text[++i] & 0x3FF)));
        } else {
            hasher.One(text[i]);
        }
    }
    hasher.Store(key);
    return key;
}

void KeyOfAscii(const unsigned char* text, std::size_t count, Key& key) {
#if defined(TAVO_CRC_FOLDS)
    if (Simd::HasMultiply()) return FoldAscii(text, count, key);
#endif
    Hasher hasher;
    std::size_t i = 0;
    for (; count - i >= 4; i += 4) {
        std::uint32_t four;
        std::memcpy(&four, text + i, 4);
        hasher.Four(Widen(four), true);
    }
    for (; i < count; ++i) hasher.One(text[i]);
    key.length = key.utf8Size = count;
    hasher.Store(key);
}

} // namespace TAVO::String::pool
