// Keys of texts.

#include "poolkey.h"

#include "crc64.h"
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

// Four ASCII bytes as four units.
constexpr std::uint64_t Widen(std::uint32_t bytes) {
    std::uint64_t v = bytes;
    v = (v | v << 16) & 0x0000FFFF0000FFFF;
    return (v | v << 8) & 0x00FF00FF00FF00FF;
}

// `units` counts what was hashed: all of `count`, but for a pair that the end cuts when `mayCut`.
bool HashUnits(const wchar_t* text, std::size_t count, bool mayCut, Key& key, std::size_t& units) {
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
    const std::size_t count = Simd::ZeroUnit(text, limit);
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
