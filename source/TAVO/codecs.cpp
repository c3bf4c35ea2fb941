// Bytes as text: the 3F and 3FFF codecs.
//
// A group of bytes stands in one half of a block, its four units in the same half of another, so each codec is one
// formula in either direction, for two groups at once.

#include "poolentry.h"
#include "simd.h"
#include "wide.h"

#include <cstring>
#include <TAVO/develop.h>

namespace TAVO::String {

using Buffers::CPPlainMemory;
using Simd::Block;

namespace {

constexpr char kSource[] = "source/TAVO/cstringpool";
constexpr std::size_t kUnits = 4; // of a group
constexpr std::size_t kHalf = sizeof(Block) / 2;
constexpr std::size_t kRest = 3 * kHalf; // room for what two groups at once leave over: below 15 bytes, read by halves
constexpr unsigned kUnpadded = 0xFF;     // a padding that no text has

// What `mask` leaves of both halves.
TAVO_INLINE Block Bits(Block x, std::uint64_t mask) { return Simd::And(x, Simd::Pair(mask, mask)); }
TAVO_INLINE Block AnyOf(Block a, Block b, Block c, Block d) { return Simd::Or(Simd::Or(a, b), Simd::Or(c, d)); }

struct Codec3F {
    static constexpr std::size_t kGroup = 3; // bytes
    static constexpr unsigned kMark = 0x0100;

    // Six bits in a unit, counted up from '!'.
    // Intended (3f-wrap): the second unit has its upper four bits from bit 4 on, so that it takes eight bits, and what
    // exceeds them is lost when '!' is added. A textbook would shift by 2. Some bytes come back changed, but stored
    // texts have this form.
    TAVO_INLINE static Block Encode(Block bytes) {
        const Block second = Simd::Or(Bits(Simd::ShiftLeft64<10>(bytes), 0x03ULL << 16),
                                      Bits(Simd::ShiftLeft64<12>(bytes), 0xF0ULL << 16));
        const Block units = AnyOf(Bits(bytes, 0x3F), second, Bits(Simd::ShiftLeft64<20>(bytes), 0x3FULL << 32),
                                  Bits(Simd::ShiftLeft64<30>(bytes), 0x3FULL << 48));
        return Simd::And(Simd::Add16(units, Simd::All16('!')), Simd::All16(0xFF));
    }

    // Any units are taken. In 16 bits the difference keeps every bit that reaches a byte, of a negative one too.
    TAVO_INLINE static Block Decode(Block units) {
        const Block x = Simd::Subtract16(units, Simd::All16('!'));
        const Block first = Simd::Or(Bits(x, 0xFF), Bits(Simd::ShiftRight64<10>(x), 0xC0));
        return AnyOf(first, Bits(Simd::ShiftRight64<12>(x), 0xFF00), Bits(Simd::ShiftRight64<20>(x), 0xFFF000),
                     Bits(Simd::ShiftRight64<30>(x), 0xFC0000));
    }

    TAVO_INLINE static Block AreUnits(Block) { return Simd::All8(0xFF); }

    // Intended (3f-multiples): 3, which the encoder writes for a size that is a multiple of 3, is refused. A textbook
    // would read it as 0, which is read though never written. Hosts count on the log line.
    static unsigned Padding(unsigned mark) { return mark < 3 ? mark : kUnpadded; }
};

struct Codec3FFF {
    static constexpr std::size_t kGroup = 7;
    static constexpr unsigned kMark = 0x0300;

    // Seven bytes, lowest first, are 56 bits: 28 to each quarter of the block, then 14 to each unit.
    TAVO_INLINE static Block Encode(Block bytes) {
        const Block quarters =
            Simd::Or(Bits(bytes, 0x0FFFFFFF), Bits(Simd::ShiftLeft64<4>(bytes), 0x0FFFFFFFULL << 32));
        const Block units =
            Simd::Or(Bits(quarters, 0x00003FFF00003FFF), Bits(Simd::ShiftLeft64<2>(quarters), 0x3FFF00003FFF0000));
        return Simd::Or(units, Simd::All16(0x4000));
    }

    TAVO_INLINE static Block Decode(Block units) {
        const Block quarters =
            Simd::Or(Bits(units, 0x00003FFF00003FFF), Bits(Simd::ShiftRight64<2>(units), 0x0FFFC0000FFFC000));
        return Simd::Or(Bits(quarters, 0x0FFFFFFF), Bits(Simd::ShiftRight64<4>(quarters), 0x0FFFFFFFULL << 28));
    }

    // All ones where the unit is one that the encoder writes.
    TAVO_INLINE static Block AreUnits(Block units) {
        return Simd::Equal16(Simd::And(units, Simd::All16(0xC000)), Simd::All16(0x4000));
    }

    // 7 is what the encoder writes when there is no padding.
    static unsigned Padding(unsigned mark) { return mark >= 1 && mark <= 7 ? mark % 7 : kUnpadded; }
};

// Intended (codec-announced): one group for the tail is announced also when there is none, four units too many; the
// pool cuts them off again. A textbook would count them exactly. Submitters' users see the number.
template <class Codec> std::size_t AnnouncedUnits(std::size_t size) {
    const std::size_t groups = size / Codec::kGroup;
    if (groups > (SIZE_MAX - 1) / kUnits - 1) return SIZE_MAX; // more than any heap has: refused there
    return groups * kUnits + 1 + kUnits;
}

template <class Codec> bool EncodeText(const void* data, std::size_t size, wchar_t* out) {
    if (!data && size) return false;
    const auto* bytes = static_cast<const unsigned char*>(data);
    *out++ = static_cast<wchar_t>(Codec::kMark + Codec::kGroup - size % Codec::kGroup);
    // Two groups, while a whole half can be read from the second on.
    for (; size >= Codec::kGroup + kHalf; size -= 2 * Codec::kGroup, bytes += 2 * Codec::kGroup, out += 2 * kUnits)
        Simd::Store(out, Codec::Encode(Simd::LoadHalves(bytes, bytes + Codec::kGroup)));
    unsigned char rest[kRest] = {};
    if (size) std::memcpy(rest, bytes, size);
    for (std::size_t at = 0; at < size; at += Codec::kGroup, out += kUnits)
        Simd::StoreHalf(out, Codec::Encode(Simd::LoadHalves(rest + at, rest + at)));
    *out = 0;
    return true;
}

// False for units that the codec never writes. Requires: groups for all of `size`.
template <class Codec> bool DecodeGroups(const wchar_t* text, unsigned char* bytes, std::size_t size) {
    Block good = Simd::All8(0xFF);
    for (; size >= Codec::kGroup + kHalf; size -= 2 * Codec::kGroup, bytes += 2 * Codec::kGroup, text += 2 * kUnits) {
        const Block units = Simd::Load(text);
        good = Simd::And(good, Codec::AreUnits(units));
        const Block groups = Codec::Decode(units);
        Simd::StoreHalf(bytes, groups);
        Simd::StoreHalf(bytes + Codec::kGroup, Simd::HighHalf(groups));
    }
    unsigned char rest[kRest];
    for (std::size_t at = 0; at < size; at += Codec::kGroup, text += kUnits) {
        const Block units = Simd::LoadHalves(text, text);
        good = Simd::And(good, Codec::AreUnits(units));
        Simd::StoreHalf(rest + at, Codec::Decode(units));
    }
    std::memcpy(bytes, rest, size);
    return Simd::Mask(good) == 0xFFFF;
}

// False for a text that is refused. Memory is empty then, and when there is none.
template <class Codec> bool DecodeText(const wchar_t* text, std::size_t length, CPPlainMemory& memory) {
    if (!text || length % kUnits != 1 || (*text & 0xFF00) != Codec::kMark) return false;
    const unsigned padding = Codec::Padding(*text & 0xFF);
    if (padding == kUnpadded) return false;
    const std::size_t size = length / kUnits * Codec::kGroup;
    if (size <= padding || !memory.Alloc(size - padding)) return true; // a header alone has nothing to pad
    const bool good =
        DecodeGroups<Codec>(text + 1, static_cast<unsigned char*>(static_cast<void*>(memory)), size - padding);
    if (!good) memory.free();
    return good;
}

std::size_t LengthOf(const wchar_t* text) { return text ? detail::WideLength(text) : 0; }

CPPlainMemory Decode3F(const wchar_t* text, std::size_t length) {
    CPPlainMemory memory;
    if (!DecodeText<Codec3F>(text, length, memory))
        Develop::_logWrite(acfDebugWarning, L"TAVO", kSource, 0, L"C3FDecoder: Invalid string passed");
    return memory;
}

CPPlainMemory Decode3FFF(const wchar_t* text, std::size_t length) {
    CPPlainMemory memory;
    DecodeText<Codec3FFF>(text, length, memory);
    return memory;
}

} // namespace

// --- 3F --------------------------------------------------------------------------------------------------------------

C3FEncoder::C3FEncoder(const void* data, std::size_t size) noexcept : m_data(data), m_size(size) {
    if (data || size == 0) m_text = CStringPool::GetStringRef(this);
}
C3FEncoder::C3FEncoder(const CPPlainMemory& bytes) noexcept : C3FEncoder(bytes, bytes.GetSize()) {}
std::size_t C3FEncoder::GetStringLen() { return AnnouncedUnits<Codec3F>(m_size); }
bool C3FEncoder::GetString(wchar_t* out) { return EncodeText<Codec3F>(m_data, m_size, out); }

C3FDecoder::C3FDecoder(const wchar_t* text) noexcept : m_bytes(Decode3F(text, LengthOf(text))) {}
C3FDecoder::C3FDecoder(const CPPoolString& text) noexcept : m_bytes(Decode3F(text, UnitsOf(text))) {}

// --- 3FFF ------------------------------------------------------------------------------------------------------------

C3FFFEncoder::C3FFFEncoder(const void* data, std::size_t size) noexcept : m_data(data), m_size(size) {
    if (data || size == 0) m_text = CStringPool::GetStringRef(this);
}
C3FFFEncoder::C3FFFEncoder(const CPPlainMemory& bytes) noexcept : C3FFFEncoder(bytes, bytes.GetSize()) {}
std::size_t C3FFFEncoder::GetStringLen() { return AnnouncedUnits<Codec3FFF>(m_size); }
bool C3FFFEncoder::GetString(wchar_t* out) { return EncodeText<Codec3FFF>(m_data, m_size, out); }

C3FFFDecoder::C3FFFDecoder(const wchar_t* text) noexcept : m_bytes(Decode3FFF(text, LengthOf(text))) {}
C3FFFDecoder::C3FFFDecoder(const CPPoolString& text) noexcept : m_bytes(Decode3FFF(text, UnitsOf(text))) {}

} // namespace TAVO::String
