// Transcoding: single characters, counts and whole texts, each one body for UTF-16 and wide text.

#include "transcoding.h"

#include "platform/platform.h"
#include <TAVO/string.h>

namespace TAVO::String {
namespace detail {
namespace {

using namespace Simd;

// --- Measuring UTF-8: 64 bytes at a time, one mask bit per byte ------------------------------------------------------

constexpr std::size_t kChunk = 64;

// One bit per byte of a chunk: the highest bit of what `test` makes of each block.
template <class Test> TAVO_INLINE std::uint64_t ChunkMask(const unsigned char* chunk, Test test) {
    std::uint64_t mask = 0;
    for (unsigned i = 0; i < kChunk; i += kBlock) mask |= static_cast<std::uint64_t>(Mask(test(Load(chunk + i)))) << i;
    return mask;
}
TAVO_INLINE std::uint64_t AtLeastMask(const unsigned char* chunk, int byte) {
    return ChunkMask(chunk, [byte](Block x) { return AtLeast8(x, All8(byte)); });
}

// Adds the whole characters of a chunk that begins with one; false: the chunk holds something invalid.
TAVO_INLINE bool MeasureChunk(const unsigned char* chunk, std::uint64_t high, Extent& extent) {
    const std::uint64_t continuations = ChunkMask(chunk, [](Block x) { return Below8(x, All8(0xC0)); });
    const std::uint64_t leads = high & ~continuations;
    const std::uint64_t leads3 = AtLeastMask(chunk, 0xE0); // and longer
    const std::uint64_t leads4 = AtLeastMask(chunk, 0xF0);
    if ((leads << 1 | leads3 << 2 | leads4 << 3) != continuations) return false;

    // The last character may reach behind the chunk; it is left to the next one.
    std::size_t bytes = kChunk;
    if ((leads >> 63 | leads3 >> 62 | leads4 >> 61) != 0)
        bytes = 63 - static_cast<std::size_t>(std::countl_zero(leads));
    const std::uint64_t whole = bytes == kChunk ? ~0ull : (1ull << bytes) - 1;
    std::size_t characters = bytes - CountBits(continuations & whole);

    std::size_t pairs = 0;
    if (TAVO_UNLIKELY((leads4 & whole) != 0)) {
        if (AtLeastMask(chunk, 0xF5) != 0) return false;
        const std::uint64_t below90 = ChunkMask(chunk, [](Block x) { return Below8(x, All8(0x90)); });
        const std::uint64_t leadsF0 = ChunkMask(chunk, [](Block x) { return Equal8(x, All8(0xF0)); });
        const std::uint64_t leadsF4 = ChunkMask(chunk, [](Block x) { return Equal8(x, All8(0xF4)); });
        const std::uint64_t overlong = leadsF0 & (below90 >> 1);
        pairs = CountBits(leads4 & whole & ~overlong);
        if ((leadsF4 & whole & ~(below90 >> 1)) != 0) extent.beyond = true;
    }
    extent.source += bytes;
    extent.characters += characters;
    extent.target += characters + pairs;
    return true;
}

// Adds the last characters of a text, fewer bytes than a chunk, unless something is wrong with them.
TAVO_NOINLINE void MeasureRest(const unsigned char* text, std::size_t length, Extent& extent) {
    const std::size_t rest = length - extent.source;
    if (rest < kBlock || rest >= kChunk) return;
    unsigned char chunk[kChunk] = {}; // filled up with zeros, each a character
    std::memcpy(chunk, text + extent.source, rest);
    if (!MeasureChunk(chunk, ChunkMask(chunk, [](Block x) { return x; }), extent)) return;
    extent.source -= kChunk - rest;
    extent.characters -= kChunk - rest;
    extent.target -= kChunk - rest;
}

// --- Converting UTF-8: runs of sequences of one length ---------------------------------------------------------------

// The UTF-16 units of eight two-byte sequences.
TAVO_INLINE Block Decode2(Block x) {
    return Or(ShiftLeft16<6>(And(x, All16(0x001F))), ShiftRight16<8>(And(x, All16(0x3F00))));
}
TAVO_INLINE std::uint32_t Read32(const unsigned char* text) {
    std::uint32_t value;
    std::memcpy(&value, text, 4);
    return value;
}
// The UTF-16 units of four three-byte sequences, in the low half.
TAVO_INLINE Block Decode3(const unsigned char* text) {
    const Block x = Lanes32(Read32(text), Read32(text + 3), Read32(text + 6), Read32(text + 9));
    return Low16Of32(Or(Or(ShiftLeft32<12>(And(x, All32(0x0F))), ShiftRight32<2>(And(x, All32(0x3F00)))),
                        ShiftRight32<16>(And(x, All32(0x3F0000)))));
}

// For every set of places in a window of eight: how to move what stands at the other places to the front.
struct Compaction {
    std::uint8_t shuffle[256][kBlock];
    std::uint8_t kept[256];
};

// Places are bytes and a set bit is a continuation byte: each sequence's first two bytes become one 16-bit lane.
constexpr Compaction kSequences = [] {
    Compaction table{};
    for (unsigned set = 0; set < 256; ++set) {
        unsigned lane = 0;
        for (unsigned place = 0; place < 8; ++place) {
            if (set >> place & 1) continue;
            table.shuffle[set][lane * 2] = static_cast<std::uint8_t>(place);
            table.shuffle[set][lane * 2 + 1] = static_cast<std::uint8_t>(place + 1);
            ++lane;
        }
        table.kept[set] = static_cast<std::uint8_t>(lane);
        for (; lane < 8; ++lane) table.shuffle[set][lane * 2] = table.shuffle[set][lane * 2 + 1] = 0x80;
    }
    return table;
}();

// Decodes the sequences of one and two bytes that begin in the eight bytes at `text`; returns their number.
template <class Unit>
TAVO_SHUFFLES inline std::size_t DecodeWindow(const unsigned char* text, std::uint32_t set, Unit* out) {
    const Block lanes = Shuffle(Load(text), Load(kSequences.shuffle[set]));
    const Block two = Equal16(And(lanes, All16(0x80)), All16(0x80));
    Store(out, Or(And(two, Decode2(lanes)), AndNot(two, And(lanes, All16(0x7F)))));
    return kSequences.kept[set];
}

// Decodes mixtures of one and two bytes, without a branch on which is which, up to the first block with something
// longer.
template <class Unit>
TAVO_SHUFFLES void ConvertMixture(const unsigned char*& text, const unsigned char* end, Unit*& out,
                                  const Unit* outEnd) {
    while (end - text >= 48 && outEnd - out >= 32) {
        const Block x = Load(text);
        const Block y = Load(text + 16);
        if (Mask(Or(x, y)) == 0) {
            Store(out, WidenLow(x));
            Store(out + 8, WidenHigh(x));
            Store(out + 16, WidenLow(y));
            Store(out + 24, WidenHigh(y));
            text += 32, out += 32;
            continue;
        }
        if (Mask(Or(AtLeast8(x, All8(0xE0)), AtLeast8(y, All8(0xE0)))) != 0) break;
        // A window may begin with the end of a sequence of the window before. Each finds that out by itself, so that
        // they do not wait for one another.
        const std::uint32_t continuations = Mask(Below8(x, All8(0xC0))) | Mask(Below8(y, All8(0xC0))) << 16;
        for (unsigned window = 0; window < 32; window += 8) {
            const std::uint32_t set = continuations >> window & 0xFF;
            const std::uint32_t skip = set & 1;
            out += DecodeWindow(text + window + skip, set >> skip | skip << 7, out);
        }
        text += 32;
        text += IsContinuation(*text);
    }
    while (end - text >= static_cast<std::ptrdiff_t>(kBlock) && outEnd - out >= 8) {
        const Block x = Load(text);
        if ((Mask(AtLeast8(x, All8(0xE0))) & 0xFF) != 0) return;
        out += DecodeWindow(text, Mask(Below8(x, All8(0xC0))) & 0xFF, out);
        text += 8;
        text += IsContinuation(*text);
    }
}

// Decodes runs while whole blocks can be loaded and stored; stores may reach into units that come later.
// False: a value above 10FFFF.
template <class Unit> bool ConvertRuns(const unsigned char*& text, const unsigned char* end, Unit*& out, Unit* outEnd) {
    constexpr std::uint32_t kEveryThird = 0x249; // bytes 0, 3, 6, 9
    const bool mixtures = HasShuffle();
    while (end - text >= static_cast<std::ptrdiff_t>(kBlock) && outEnd - out >= 8) {
        if (mixtures && *text < 0xE0) {
            const unsigned char* const before = text;
            ConvertMixture(text, end, out, outEnd);
            if (text != before) continue;
        }
        const Block x = Load(text);
        const std::uint32_t high = Mask(x);
        std::size_t run;
        if (high == 0) {
            Store(out, WidenLow(x));
            Store(out + 8, WidenHigh(x));
            text += 16, out += 16;
        } else if ((high & 1) == 0) {
            Store(out, WidenLow(x));
            run = static_cast<std::size_t>(std::countr_zero(high | 0x100));
            text += run, out += run;
        } else if (*text < 0xE0) {
            const Block good = Equal16(And(x, All16(0xC0E0)), All16(0x80C0));
            Store(out, Decode2(x));
            run = static_cast<std::size_t>(std::countr_zero(~Mask(good))) / 2;
            text += 2 * run, out += run;
        } else if ((Mask(Equal8(And(x, All8(0xF0)), All8(0xE0))) & kEveryThird) == kEveryThird) {
            StoreHalf(out, Decode3(text));
            text += 12, out += 4;
        } else if (*text < 0xF0) {
            *out++ = static_cast<Unit>((text[0] & 0x0F) << 12 | (text[1] & 0x3F) << 6 | (text[2] & 0x3F));
            text += 3;
        } else {
            ulong32 codePoint = 0;
            StepUtf8(codePoint, text);
            if (!EncodeUtf16(out, codePoint)) return false;
        }
    }
    return true;
}

template <class Unit> bool ConvertBytes(const unsigned char* text, const Extent& extent, Unit*& out) {
    const unsigned char* const end = text + extent.source;
    if (!extent.beyond && !ConvertRuns(text, end, out, out + extent.target)) return false;
    for (ulong32 codePoint; text < end && StepUtf8(codePoint, text);)
        if (!EncodeUtf16(out, codePoint)) return false;
    return true;
}

// --- UTF-16 ----------------------------------------------------------------------------------------------------------

constexpr std::size_t kUnits = kBlock / sizeof(wchar_t);

TAVO_INLINE Block Below80(Block x) { return Equal16(And(x, All16(0xFF80)), All16(0)); }
TAVO_INLINE Block Below800(Block x) { return Equal16(And(x, All16(0xF800)), All16(0)); }
TAVO_INLINE Block Surrogates(Block x) { return Equal16(And(x, All16(0xF800)), All16(0xD800)); }
// The lanes before the first that fails the test.
TAVO_INLINE std::size_t RunOf(Block test) { return static_cast<std::size_t>(std::countr_zero(~Mask(test))) / 2; }

// Adds blocks up to the first that holds a surrogate.
template <class Unit> void MeasureBlocks(const Unit* text, std::size_t length, Extent& extent) {
    constexpr std::size_t kBatch = 64; // blocks whose sums fit into bytes
    for (bool plain = true; plain && length - extent.source >= kUnits;) {
        Block saved = All8(0); // bytes that units below 800 and below 80 take less than 3
        std::size_t blocks = 0;
        for (; blocks < kBatch && length - extent.source >= 2 * kUnits; blocks += 2, extent.source += 2 * kUnits) {
            const Block x = Load(text + extent.source);
            const Block y = Load(text + extent.source + kUnits);
            if (Mask(Or(Surrogates(x), Surrogates(y))) != 0) break;
            saved = Subtract16(Subtract16(saved, Below80(x)), Below800(x));
            saved = Subtract16(Subtract16(saved, Below80(y)), Below800(y));
        }
        if (blocks < kBatch && length - extent.source >= kUnits) {
            const Block x = Load(text + extent.source);
            plain = Mask(Surrogates(x)) == 0;
            if (plain) {
                saved = Subtract16(Subtract16(saved, Below80(x)), Below800(x));
                ++blocks, extent.source += kUnits;
            }
        }
        extent.characters += blocks * kUnits;
        extent.target += blocks * kUnits * 3 - Sum8(saved);
    }
}

template <class Unit> Extent MeasureUnits(const Unit* text, std::size_t length) {
    Extent extent;
    MeasureBlocks(text, length, extent);
    while (extent.source < length) {
        const Unit* at = text + extent.source;
        const std::size_t units = Utf16Sequence(at, length - extent.source);
        if (units == 0) {
            extent.ending = IsHighSurrogate(*at) && length - extent.source == 1 ? Ending::Cut : Ending::Invalid;
            break;
        }
        extent.source += units;
        ++extent.characters;
        extent.target += units == 2 || *at < 0x80 ? 1 : *at < 0x800 ? 2 : 3;
        if (units == 2) MeasureBlocks(text, length, extent);
    }
    return extent;
}

// The UTF-8 of eight units from 80 to 7FF.
TAVO_INLINE Block Encode2(Block x) {
    return Or(Or(ShiftRight16<6>(x), ShiftLeft16<8>(And(x, All16(0x3F)))), All16(0x80C0));
}
// The UTF-8 of four units from 800 up in 32-bit lanes: six bytes in each half.
TAVO_INLINE Block Encode3(Block x) {
    x = Or(Or(ShiftRight32<12>(x), And(ShiftLeft32<2>(x), All32(0x3F00))),
           Or(ShiftLeft32<16>(And(x, All32(0x3F))), All32(0x8080E0)));
    const Block second = And(x, Lanes32(0, ~0u, 0, ~0u));
    return Or(And(x, Lanes32(~0u, 0, ~0u, 0)), ShiftRight64<8>(second));
}
TAVO_INLINE void Store3(unsigned char* out, Block halves) {
    StoreHalf(out, halves);
    StoreHalf(out + 6, HighHalf(halves));
}

// Places are units and a set bit is a unit below 80: two-byte lanes lose the second byte of those.
constexpr Compaction kBytesOfUnits = [] {
    Compaction table{};
    for (unsigned set = 0; set < 256; ++set) {
        unsigned kept = 0;
        for (unsigned byte = 0; byte < 16; ++byte)
            if (byte % 2 == 0 || (set >> byte / 2 & 1) == 0)
                table.shuffle[set][kept++] = static_cast<std::uint8_t>(byte);
        table.kept[set] = static_cast<std::uint8_t>(kept);
        while (kept < 16) table.shuffle[set][kept++] = 0x80;
    }
    return table;
}();

// Encodes mixtures of units below 800, without a branch on which take one byte, up to the first block with another.
template <class Unit>
TAVO_SHUFFLES void ConvertMixture(const Unit*& text, const Unit* end, unsigned char*& out,
                                  const unsigned char* outEnd) {
    while (end - text >= 16 && outEnd - out >= 16) {
        const Block x = Load(text);
        const Block y = Load(text + kUnits);
        if (Mask(Below80(Or(x, y))) == 0xFFFF) {
            Store(out, Narrow(x, y));
            text += 16, out += 16;
            continue;
        }
        if (Mask(Below800(x)) != 0xFFFF) return;
        const Block ascii = Below80(x);
        const std::uint32_t set = Mask(PackSigned(ascii, ascii)) & 0xFF;
        const Block lanes = Or(And(ascii, x), AndNot(ascii, Encode2(x)));
        Store(out, Shuffle(lanes, Load(kBytesOfUnits.shuffle[set])));
        text += kUnits, out += kBytesOfUnits.kept[set];
    }
}

// Encodes runs while whole blocks can be loaded and stored; stores may reach into bytes that come later.
template <class Unit>
void ConvertRuns(const Unit*& text, const Unit* end, unsigned char*& out, const unsigned char* outEnd) {
    const bool mixtures = HasShuffle();
    while (end - text >= static_cast<std::ptrdiff_t>(kUnits) && outEnd - out >= 16) {
        if (mixtures && *text < 0x800) {
            const Unit* const before = text;
            ConvertMixture(text, end, out, outEnd);
            if (text != before) continue;
        }
        const Block x = Load(text);
        std::size_t run;
        if (*text < 0x80) {
            StoreHalf(out, Narrow(x, x));
            run = RunOf(Below80(x));
            text += run, out += run;
        } else if (*text < 0x800) {
            Store(out, Encode2(x));
            run = RunOf(AndNot(Below80(x), Below800(x)));
            text += run, out += 2 * run;
        } else if ((Mask(Or(Below800(x), Surrogates(x))) & 0xFF) == 0) {
            Store3(out, Encode3(Widen32Low(x)));
            text += 4, out += 12;
        } else {
            ulong32 codePoint = 0;
            StepUtf16(codePoint, text);
            EncodeUtf8(out, codePoint);
        }
    }
}

template <class Unit> void ConvertUnits(const Unit* text, const Extent& extent, unsigned char*& out) {
    const Unit* const end = text + extent.source;
    ConvertRuns(text, end, out, out + extent.target);
    for (ulong32 codePoint; text < end && StepUtf16(codePoint, text);) EncodeUtf8(out, codePoint);
}

} // namespace

Extent MeasureUtf8(const unsigned char* text, std::size_t length) {
    Extent extent;
    while (length - extent.source >= kChunk) {
        const unsigned char* const chunk = text + extent.source;
        const std::uint64_t high = ChunkMask(chunk, [](Block x) { return x; });
        if (high != 0) {
            if (!MeasureChunk(chunk, high, extent)) break; // the steps below find where
            continue;
        }
        extent.source += kChunk;
        extent.characters += kChunk;
        extent.target += kChunk;
    }
    MeasureRest(text, length, extent);
    while (extent.source < length) {
        const unsigned char* at = text + extent.source;
        const std::size_t bytes = Utf8Sequence(at, length - extent.source);
        if (bytes == 0) {
            extent.ending = kUtf8Length[*at] > length - extent.source ? Ending::Cut : Ending::Invalid;
            break;
        }
        extent.source += bytes;
        ++extent.characters;
        extent.target += bytes == 4 && (at[0] > 0xF0 || at[1] >= 0x90) ? 2 : 1;
        if (at[0] == 0xF4 && at[1] >= 0x90) extent.beyond = true;
    }
    return extent;
}

Extent MeasureUtf16(const wchar_t* text, std::size_t length) { return MeasureUnits(text, length); }
Extent MeasureUtf16(const unsigned short* text, std::size_t length) { return MeasureUnits(text, length); }
bool ConvertUtf8(const unsigned char* text, const Extent& extent, wchar_t*& out) {
    return ConvertBytes(text, extent, out);
}
bool ConvertUtf8(const unsigned char* text, const Extent& extent, unsigned short*& out) {
    return ConvertBytes(text, extent, out);
}
void ConvertUtf16(const wchar_t* text, const Extent& extent, unsigned char*& out) { ConvertUnits(text, extent, out); }
void ConvertUtf16(const unsigned short* text, const Extent& extent, unsigned char*& out) {
    ConvertUnits(text, extent, out);
}

} // namespace detail

namespace {

using namespace detail;

Extent MeasureText(const unsigned char* text, std::size_t length) { return MeasureUtf8(text, length); }
template <class Unit> Extent MeasureText(const Unit* text, std::size_t length) { return MeasureUtf16(text, length); }

template <class Unit> Extent Measure(const Unit* text, std::size_t n) {
    return text ? MeasureText(text, Simd::ZeroUnit(text, n)) : Extent();
}

// Scans page by page and asks before each whether it can be read. A unit never straddles pages.
template <class Unit> std::size_t GuardedLength(const Unit* text, std::size_t n) {
    if (!text) return 0;
    std::size_t i = 0;
    while (i < n) {
        if (!Platform::IsReadable(text + i)) return 0;
        const std::size_t toPageEnd =
            Platform::PageSize - reinterpret_cast<std::uintptr_t>(text + i) % Platform::PageSize;
        const std::size_t units = (toPageEnd + sizeof(Unit) - 1) / sizeof(Unit);
        const std::size_t part = units < n - i ? units : n - i;
        const std::size_t length = WideLengthN(text + i, part);
        i += length;
        if (length < part) break;
    }
    return i;
}

// Intended (utf32-bound): the element at index n belongs to the count, where one would expect the bound to end it; n =
// 0 alone is nothing. Callers pass the index of the last element.
template <class Size> std::size_t CountUtf32(const ulong32* text, std::size_t n, ulong32 last, Size size) {
    if (!text || n == 0) return 0;
    std::size_t count = 0;
    for (std::size_t i = 0; i <= n && text[i] != 0 && text[i] <= last; ++i) {
        count += size(text[i]);
        if (i == SIZE_MAX) break;
    }
    return count;
}

// The common shape of the whole-string converters: measure, check the room, convert, terminate.
template <class Source, class Target, class Convert>
std::size_t ConvertWhole(const Source* source, std::size_t sourceLength, Target* target, std::size_t capacity,
                         Convert convert) {
    if (!source) return 0;
    // Asking for ASCII on the way costs next to nothing for bytes only.
    bool isAscii = false;
    const std::size_t length = Simd::ZeroUnit(source, sourceLength, sizeof(Source) == 1 ? &isAscii : nullptr);
    const Extent extent = isAscii ? Extent{length, length, length} : MeasureText(source, length);
    const std::size_t need = extent.target + 1;
    if (!target) return need;
    if (capacity < need) return 0;
    if (!convert(source, extent, target)) return 0;
    // Intended (cut-or-fail): as many characters are read as there are target units, so that behind a character that
    // took more than one an invalid sequence is met and fails the whole, while it ends other texts silently. One that
    // the terminator cuts is invalid; of one that the source length cuts nobody can tell.
    const bool invalid = extent.ending == Ending::Invalid || (extent.ending == Ending::Cut && length < sourceLength);
    if (invalid && extent.target > extent.characters) return 0;
    *target = 0;
    return need;
}

} // namespace

// --- Single characters ---------------------------------------------------------------------------------------------

std::size_t UTF8Size(ulong32 codePoint) {
    return codePoint < 0x80 ? 1 : codePoint < 0x800 ? 2 : codePoint < 0x10000 ? 3 : codePoint < 0x110000 ? 4 : 0;
}
std::size_t UTF8Len(unsigned char lead) { return kUtf8Length[lead]; }
// Intended (utf16-size-limit): 110000, one above the last code point, still counts 2.
std::size_t UTF16Size(ulong32 codePoint) { return codePoint < 0x10000 ? 1 : codePoint <= 0x110000 ? 2 : 0; }
std::size_t UTF16Len(unsigned short unit) { return IsLowSurrogate(unit) ? 0 : IsHighSurrogate(unit) ? 2 : 1; }
std::size_t acfWSize(ulong32 codePoint) { return codePoint < 0x10000 ? 1 : 2; }
std::size_t acfWLen(wchar_t) { return 1; }

// Intended (utf8-sync): steps over two-byte leads and not, as its UTF-16 sibling would suggest, over continuation
// bytes. Callers rely on it as it is.
void UTF8Sync(const unsigned char*& text) {
    while ((*text & 0xE0) == 0xC0) ++text;
}
void UTF16Sync(const unsigned short*& text) {
    while (IsLowSurrogate(*text)) ++text;
}
void acfWSync(const wchar_t*& text) {
    while (IsLowSurrogate(*text)) ++text;
}

// --- Counts --------------------------------------------------------------------------------------------------------

std::size_t UTF8w32strlen(const unsigned char* source, std::size_t n) { return Measure(source, n).characters; }
std::size_t UTF8u16strlen(const unsigned char* source, std::size_t n) { return Measure(source, n).target; }
std::size_t UTF8wstrlen(const unsigned char* source, std::size_t n) { return UTF8u16strlen(source, n); }
std::size_t UTF16w32strlen(const unsigned short* source, std::size_t n) { return Measure(source, n).characters; }
std::size_t acfWw32strlen(const wchar_t* source, std::size_t n) { return Measure(source, n).characters; }
std::size_t UTF16u8strlen(const unsigned short* source, std::size_t n) { return Measure(source, n).target; }
std::size_t acfWu8strlen(const wchar_t* source, std::size_t n) { return Measure(source, n).target; }
std::size_t UTF16wstrlen(const unsigned short* source, std::size_t n) { return GuardedLength(source, n); }
std::size_t acfWu16strlen(const wchar_t* source, std::size_t n) { return GuardedLength(source, n); }
std::size_t UTF32wstrlen(const ulong32* source, std::size_t n) { return CountUtf32(source, n, 0x110000, acfWSize); }
std::size_t UTF32u16strlen(const ulong32* source, std::size_t n) { return UTF32wstrlen(source, n); }
std::size_t UTF32u8strlen(const ulong32* source, std::size_t n) { return CountUtf32(source, n, 0x10FFFF, UTF8Size); }

// --- Steps ---------------------------------------------------------------------------------------------------------

namespace {

template <class Unit> bool Utf8ToUnit(Unit*& out, const unsigned char*& in) {
    ulong32 codePoint;
    return StepUtf8(codePoint, in) && EncodeUtf16(out, codePoint);
}
template <class Unit> bool UnitToUtf8(unsigned char*& out, const Unit*& in) {
    ulong32 codePoint;
    return StepUtf16(codePoint, in) && EncodeUtf8(out, codePoint);
}

} // namespace

bool utf8_acfW32(ulong32* out, const unsigned char*& in) { return StepUtf8(*out, in); }
bool acfW_acfW32(ulong32* out, const wchar_t*& in) { return StepUtf16(*out, in); }
bool utf16_acfW32(ulong32* out, const unsigned short*& in) { return StepUtf16(*out, in); }
bool acfW32_utf8(unsigned char*& out, ulong32 codePoint) { return EncodeUtf8(out, codePoint); }
bool acfW32_acfW(wchar_t*& out, ulong32 codePoint) { return EncodeUtf16(out, codePoint); }
bool acfW32_utf16(unsigned short*& out, ulong32 codePoint) { return EncodeUtf16(out, codePoint); }
bool utf8_acfW(wchar_t*& out, const unsigned char*& in) { return Utf8ToUnit(out, in); }
bool utf8_utf16(unsigned short*& out, const unsigned char*& in) { return Utf8ToUnit(out, in); }
bool utf16_acfW(wchar_t*& out, const unsigned short*& in) {
    *out++ = static_cast<wchar_t>(*in++);
    return true;
}
bool acfW_utf8(unsigned char*& out, const wchar_t*& in) { return UnitToUtf8(out, in); }
bool utf16_utf8(unsigned char*& out, const unsigned short*& in) { return UnitToUtf8(out, in); }
bool acfW_utf16(unsigned short*& out, const wchar_t*& in) {
    ulong32 codePoint;
    return StepUtf16(codePoint, in) && EncodeUtf16(out, codePoint);
}

// --- Whole texts ---------------------------------------------------------------------------------------------------

std::size_t UTF8_To_acfWChar(const unsigned char* source, std::size_t sourceLength, wchar_t* target,
                             std::size_t targetCapacity) {
    return ConvertWhole(
        source, sourceLength, target, targetCapacity,
        [](const unsigned char* text, const Extent& extent, wchar_t*& out) { return ConvertUtf8(text, extent, out); });
}

std::size_t acfWChar_To_UTF8(const wchar_t* source, std::size_t sourceLength, unsigned char* target,
                             std::size_t targetCapacity) {
    return ConvertWhole(source, sourceLength, target, targetCapacity,
                        [](const wchar_t* text, const Extent& extent, unsigned char*& out) {
                            ConvertUtf16(text, extent, out);
                            return true;
                        });
}

namespace OS {

std::size_t ANSI_To_acfWChar(const char* source, std::size_t sourceLength, wchar_t* target,
                             std::size_t targetCapacity) {
    if (!source) return 0;
    return static_cast<std::size_t>(
        Platform::AnsiToWide(source, static_cast<int>(sourceLength), target, static_cast<int>(targetCapacity)));
}

std::size_t acfWChar_To_ANSI(const wchar_t* source, std::size_t sourceLength, char* target,
                             std::size_t targetCapacity) {
    if (!source) return 0;
    return static_cast<std::size_t>(
        Platform::WideToAnsi(source, static_cast<int>(sourceLength), target, static_cast<int>(targetCapacity)));
}

} // namespace OS
} // namespace TAVO::String
