// Transcoding: single characters, counts and whole texts, each one body for UTF-16 and wide text.

#include "transcoding.h"
#include "transcodingchunks.h"

#include "platform/platform.h"
#include <TAVO/string.h>

namespace TAVO::String {
namespace detail {
namespace {

using namespace Simd;

// --- Measuring UTF-8: 64 bytes at a time, one mask bit per byte ------------------------------------------------------

// Up to 64 bytes in four blocks, which overlap if there are fewer. Its masks have zeros behind its end.
struct Chunk {
    Block parts[4];
    std::size_t at[4] = {0, 16, 32, 48}; // where each begins
    std::size_t skipped = 0;             // bytes of the blocks that stand before the chunk
};

TAVO_INLINE Chunk LoadChunk(const unsigned char* text) {
    return {{Load(text), Load(text + 16), Load(text + 32), Load(text + 48)}};
}

// The last bytes of a text, fewer than a chunk.
TAVO_INLINE Chunk LoadRest(const unsigned char* text, std::size_t length, std::size_t rest) {
    const auto skip = [](Chunk chunk, std::size_t bytes) {
        chunk.skipped = bytes;
        return chunk;
    };
    if (length >= kChunk) return skip(LoadChunk(text + length - kChunk), kChunk - rest);
    if (length < kBlock) return skip({{LoadPart(text, length), All8(0), All8(0), All8(0)}}, length - rest);
    const std::size_t last = length - kBlock, second = last < kBlock ? last : kBlock, third = last - second;
    return skip({{Load(text), Load(text + second), Load(text + third), Load(text + last)}, {0, second, third, last}},
                length - rest);
}

// One bit per byte of a chunk: the highest bit of what `test` makes of each block.
template <class Test> TAVO_INLINE std::uint64_t ChunkMask(const Chunk& chunk, Test test) {
    std::uint64_t mask = 0;
    for (unsigned i = 0; i < 4; ++i) mask |= static_cast<std::uint64_t>(Mask(test(chunk.parts[i]))) << chunk.at[i];
    return mask >> chunk.skipped;
}
TAVO_INLINE std::uint64_t HighMask(const Chunk& chunk) {
    return ChunkMask(chunk, [](Block x) { return x; });
}
TAVO_INLINE std::uint64_t AtLeastMask(const Chunk& chunk, int byte) {
    return ChunkMask(chunk, [byte](Block x) { return AtLeast8(x, All8(byte)); });
}

TAVO_INLINE ChunkBits BitsOf(const Chunk& chunk) {
    ChunkBits bits;
    bits.high = HighMask(chunk);
    if (bits.high == 0) return bits;
    bits.continuations = ChunkMask(chunk, [](Block x) { return Below8(x, All8(0xC0)); });
    bits.leads3 = AtLeastMask(chunk, 0xE0);
    if (bits.leads3 != 0) bits.leads4 = AtLeastMask(chunk, 0xF0);
    return bits;
}

// Adds chunks of sequences of up to three bytes.
void MeasurePlainChunks(const unsigned char* text, std::size_t length, Extent& extent) {
    if constexpr (kLines)
        if (HasLines()) return Lines::MeasureUtf8(text, length, extent);
    std::uint64_t expected = 0;
    while (length - extent.source >= kChunk)
        if (!AddPlain(BitsOf(LoadChunk(text + extent.source)), kChunk, expected, extent)) break;
    const std::size_t rest = length - extent.source;
    if (rest != 0 && rest < kChunk) AddPlain(BitsOf(LoadRest(text, length, rest)), rest, expected, extent);
    if (expected != 0) TakeBack(text, extent);
}

// Adds the whole characters of a chunk that begins with one; false: it holds something invalid, or the end of the text
// cuts a character.
TAVO_INLINE bool AddChunk(const Chunk& chunk, const ChunkBits& bits, std::size_t bytes, Extent& extent) {
    const std::uint64_t leads = bits.high & ~bits.continuations;
    if ((leads << 1 | bits.leads3 << 2 | bits.leads4 << 3) != bits.continuations) return false;

    // The last character may reach behind the chunk; it is left to the next one.
    std::uint64_t whole = ~0ull;
    if ((leads >> 63 | bits.leads3 >> 62 | bits.leads4 >> 61) != 0) {
        bytes = 63 - static_cast<std::size_t>(std::countl_zero(leads));
        whole = (1ull << bytes) - 1;
    }
    const std::size_t characters = bytes - CountBits(bits.continuations & whole);
    if (AtLeastMask(chunk, 0xF5) != 0) return false;
    const std::uint64_t below90 = ChunkMask(chunk, [](Block x) { return Below8(x, All8(0x90)); });
    const std::uint64_t leadsF0 = ChunkMask(chunk, [](Block x) { return Equal8(x, All8(0xF0)); });
    const std::uint64_t leadsF4 = ChunkMask(chunk, [](Block x) { return Equal8(x, All8(0xF4)); });
    const std::uint64_t overlong = leadsF0 & (below90 >> 1);
    if ((leadsF4 & whole & ~(below90 >> 1)) != 0) extent.beyond = true;
    extent.source += bytes;
    extent.characters += characters;
    extent.target += characters + CountBits(bits.leads4 & whole & ~overlong);
    return true;
}

// Adds chunks of any sequences up to one without sequences of four bytes. False: there is something wrong.
bool MeasureAnyChunks(const unsigned char* text, std::size_t length, Extent& extent) {
    while (extent.source < length) {
        const std::size_t rest = length - extent.source;
        const Chunk chunk = rest < kChunk ? LoadRest(text, length, rest) : LoadChunk(text + extent.source);
        const ChunkBits bits = BitsOf(chunk);
        if (!AddChunk(chunk, bits, rest < kChunk ? rest : kChunk, extent)) return false;
        if (bits.leads4 == 0) break;
    }
    return true;
}

// --- Converting UTF-8: windows of eight bytes, which may begin and end anywhere in a sequence ------------------------

// For every set of continuation bytes among nine, of which the first eight are a window: each sequence that ends in the
// window as a 16-bit lane, its last byte low and, unless it is the only one, the one before high. Places count from the
// byte before the window.
struct Sequences {
    std::uint8_t shuffle[512][kBlock];
    std::uint8_t count[512];
};
constexpr Sequences kSequences = [] {
    Sequences table{};
    for (unsigned set = 0; set < 512; ++set) {
        std::uint8_t* lane = table.shuffle[set];
        for (unsigned byte = 0; byte < kBlock; ++byte) lane[byte] = 0x80;
        for (unsigned place = 0; place < 8; ++place) {
            const bool continued = (set >> place & 1) != 0, ends = (set >> (place + 1) & 1) == 0;
            if (!ends) continue;
            lane[0] = static_cast<std::uint8_t>(place + 1);
            if (continued) lane[1] = static_cast<std::uint8_t>(place);
            lane += 2;
            ++table.count[set];
        }
    }
    return table;
}();

// The units of sequences of one and two bytes.
TAVO_INLINE Block Decode2(Block lanes) {
    return Or(And(lanes, All16(0x7F)), ShiftRight16<2>(And(lanes, All16(0x3F00))));
}
// The same of up to three bytes; `leads` are lanes of the bytes one before those of `lanes`.
TAVO_INLINE Block Decode3(Block lanes, Block leads) {
    const Block three = Equal16(And(lanes, All16(0xC000)), All16(0x8000));
    return Or(Decode2(lanes), And(three, ShiftLeft16<4>(And(leads, All16(0x0F00)))));
}

// Decodes mixtures of one and two bytes, without a branch on which is which, up to the first block with something
// longer. Two bytes before `text` are read: a longer sequence may end in the first block.
template <class Unit>
TAVO_SHUFFLES TAVO_INLINE void ConvertMixture(const unsigned char*& text, const unsigned char* end, Unit*& out,
                                              const Unit* outEnd) {
    if (text[-2] >= 0xE0 || text[-1] >= 0xE0) return;
    for (; end - text >= 40 && outEnd - out >= 32; text += 32) {
        const Block x = Load(text);
        const Block y = Load(text + 16);
        if (Mask(Or(AtLeast8(x, All8(0xE0)), AtLeast8(y, All8(0xE0)))) != 0) return;
        const std::uint64_t continuations = Mask(Below8(x, All8(0xC0))) |
                                            static_cast<std::uint64_t>(Mask(Below8(y, All8(0xC0)))) << 16 |
                                            static_cast<std::uint64_t>(IsContinuation(text[32])) << 32;
        for (unsigned window = 0; window < 32; window += 8) {
            const auto set = static_cast<std::uint32_t>(continuations >> window & 0x1FF);
            Store(out, Decode2(Shuffle(Load(text + window - 1), Load(kSequences.shuffle[set]))));
            out += kSequences.count[set];
        }
    }
}

// Decodes five sequences of three bytes.
constexpr std::uint32_t kLeadsOf5 = 0x1249; // bytes 0, 3, 6, 9, 12
TAVO_SHUFFLES TAVO_INLINE Block Decode5(Block x) {
    alignas(kBlock) static constexpr std::uint8_t kLast[] = {2,  1,  5,    4,    8,    7,    11,   10,
                                                             14, 13, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80};
    alignas(kBlock) static constexpr std::uint8_t kLeads[] = {0x80, 0,  0x80, 3,    0x80, 6,    0x80, 9,
                                                              0x80, 12, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80};
    return Or(Decode2(Shuffle(x, LoadAligned(kLast))), ShiftLeft16<4>(Shuffle(x, LoadAligned(kLeads))));
}

// Decodes runs of sequences of three bytes.
template <class Unit>
TAVO_SHUFFLES TAVO_INLINE void ConvertThrees(const unsigned char*& text, const unsigned char* end, Unit*& out,
                                             const Unit* outEnd) {
    while (end - text >= 16 && outEnd - out >= 8) {
        const Block x = Load(text);
        if ((Mask(Equal8(And(x, All8(0xF0)), All8(0xE0))) & kLeadsOf5) != kLeadsOf5) return;
        Store(out, Decode5(x));
        text += 15, out += 5;
    }
}

// The text around a window: the byte before it and those that follow, and the same from one byte earlier. Zeros stand
// for what is not the text's.
struct Window {
    Block before, earlier;
};
TAVO_INLINE Window FirstWindow(Block text) { return {MoveUp<1>(text), MoveUp<2>(text)}; }
TAVO_INLINE Window WindowAt(const unsigned char* text) { return {Load(text - 1), Load(text - 2)}; }
// Of the last `left` bytes, at most 14, of a text of a block or more.
TAVO_SHUFFLES TAVO_INLINE Window LastWindow(const unsigned char* end, std::size_t left) {
    alignas(kBlock) static constexpr std::uint8_t kSlide[] = {
        0,    1,    2,    3,    4,    5,    6,    7,    8,    9,    10,   11,   12,   13,   14,   15,
        0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80};
    const Block last = Load(end - kBlock);
    return {Shuffle(last, Load(kSlide + 15 - left)), Shuffle(last, Load(kSlide + 14 - left))};
}

// Decodes the sequences of up to three bytes that end in a window. If one of four begins there, decodes up to its end
// instead, step by step.
template <class Unit>
TAVO_SHUFFLES TAVO_INLINE void ConvertWindow(Window window, const unsigned char*& text, const unsigned char* end,
                                             Unit*& out, const Unit* outEnd) {
    if (TAVO_UNLIKELY((Mask(AtLeast8(window.before, All8(0xF0))) & 0x1FE) != 0)) {
        while (IsContinuation(*text)) --text;
        for (bool four = false; text < end && (!four || *text >= 0xF0);) {
            four = *text >= 0xF0;
            ulong32 codePoint = 0;
            StepUtf8(codePoint, text);
            EncodeUtf16(out, codePoint);
        }
        return;
    }
    const std::uint32_t set = Mask(Below8(window.before, All8(0xC0))) >> 1 & 0x1FF;
    const Block lanes = Load(kSequences.shuffle[set]);
    const Block units = Decode3(Shuffle(window.before, lanes), Shuffle(window.earlier, lanes));
    // Stores may reach into units that come later, not behind the last.
    const auto room = static_cast<std::size_t>(outEnd - out);
    const std::size_t count = kSequences.count[set];
    text += 8;
    if (TAVO_LIKELY(room >= 8)) {
        Store(out, units);
        out += count;
    } else {
        StorePart(out, units, (count < room ? count : room) * sizeof(Unit));
        out += count < room ? count : room;
    }
}

// Decodes a measured text without values above 10FFFF.
template <class Unit>
TAVO_SHUFFLES Unit* ConvertWindows(const unsigned char* text, const unsigned char* end, Unit* out, const Unit* outEnd) {
    const unsigned char* const begin = text;
    const auto length = static_cast<std::size_t>(end - text);
    if (length < kBlock) {
        const Block all = LoadPart(text, length);
        ConvertWindow(FirstWindow(all), text, end, out, outEnd);
        if (text == begin + 8 && text < end)
            ConvertWindow({MoveDown<7>(all), MoveDown<6>(all)}, text, end, out, outEnd);
        for (ulong32 codePoint; text < end && StepUtf8(codePoint, text);) EncodeUtf16(out, codePoint);
        return out;
    }
    ConvertThrees(text, end, out, outEnd);
    if (text == begin) ConvertWindow(FirstWindow(Load(text)), text, end, out, outEnd);
    while (end - text >= 15) {
        ConvertMixture(text, end, out, outEnd);
        for (int i = 0; i < 4 && end - text >= 15; ++i) ConvertWindow(WindowAt(text), text, end, out, outEnd);
        if (end - text >= 16 && *text >= 0xC0) ConvertThrees(text, end, out, outEnd);
    }
    while (text < end) ConvertWindow(LastWindow(end, static_cast<std::size_t>(end - text)), text, end, out, outEnd);
    return out;
}

// ASCII.
template <class Unit> TAVO_INLINE void Copy(const unsigned char* text, std::size_t count, Unit* out) {
    const auto block = [=](std::size_t at) {
        const Block x = Load(text + at);
        Store(out + at, WidenLow(x));
        Store(out + at + 8, WidenHigh(x));
    };
    if (count < kBlock) {
        if (count == 0) return;
        const Block x = LoadPart(text, count);
        const std::size_t low = count < 8 ? count : 8;
        StorePart(out, WidenLow(x), low * sizeof(Unit));
        StorePart(out + low, WidenHigh(x), (count - low) * sizeof(Unit));
        return;
    }
    for (std::size_t at = 0; at + kBlock <= count; at += kBlock) block(at);
    block(count - kBlock); // overlaps
}

template <class Unit> bool ConvertBytes(const unsigned char* text, const Extent& extent, Unit*& out) {
    const unsigned char* const end = text + extent.source;
    if (extent.target == extent.source) {
        Copy(text, extent.source, out);
        out += extent.target;
        return true;
    }
    const Unit* const outEnd = out + extent.target;
    if constexpr (kLines)
        if (HasLines()) out = Lines::ConvertUtf8(text, end, out);
    if (text == end) return true;
    if (!extent.beyond && HasShuffle()) {
        out = ConvertWindows(text, end, out, outEnd);
        return true;
    }
    for (ulong32 codePoint; text < end && StepUtf8(codePoint, text);)
        if (!EncodeUtf16(out, codePoint)) return false;
    return true;
}

// --- UTF-16 ----------------------------------------------------------------------------------------------------------

constexpr std::size_t kUnits = kBlock / sizeof(wchar_t);

TAVO_INLINE Block Below80(Block x) { return Equal16(And(x, All16(0xFF80)), All16(0)); }
TAVO_INLINE Block Below800(Block x) { return Equal16(And(x, All16(0xF800)), All16(0)); }
TAVO_INLINE Block Surrogates(Block x) { return Equal16(And(x, All16(0xF800)), All16(0xD800)); }

// Adds blocks up to the first that holds a surrogate.
template <class Unit> void MeasurePlain(const Unit* text, std::size_t length, Extent& extent) {
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
    if constexpr (kLines)
        if (HasLines()) Lines::MeasureUtf16(text, length, extent);
    if (extent.source == length) return extent;
    MeasurePlain(text, length, extent);
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
        if (units == 2) MeasurePlain(text, length, extent);
    }
    return extent;
}

// The UTF-8 of eight units below 800.
TAVO_INLINE Block Encode2(Block x, Block below80) {
    const Block two = Or(Or(ShiftRight16<6>(x), ShiftLeft16<8>(And(x, All16(0x3F)))), All16(0x80C0));
    return Or(And(below80, x), AndNot(below80, two));
}
// The UTF-8 of eight units that are no surrogates: the last bytes, and those before them, which shorter forms lack.
TAVO_INLINE Block LastBytes(Block x, Block below80) {
    return Or(And(below80, x), AndNot(below80, Or(And(x, All16(0x3F)), All16(0x80))));
}
TAVO_INLINE Block FirstBytes(Block x, Block below800) {
    const Block heads = Or(And(below800, All16(0xC000)), AndNot(below800, All16(0x80E0)));
    return Or(Or(ShiftRight16<12>(x), And(ShiftLeft16<2>(x), All16(0x3F00))), heads);
}

// For every set of places in a window of eight: how to move what stands at the other places to the front.
struct Compaction {
    std::uint8_t shuffle[256][kBlock];
    std::uint8_t kept[256];
};

// A block of encoded units as a table moves it: only the bytes that each has, by a test of each byte's place and the
// set.
template <class Test> constexpr Compaction Compact(Test isKept) {
    Compaction table{};
    for (unsigned set = 0; set < 256; ++set) {
        unsigned kept = 0;
        for (unsigned byte = 0; byte < kBlock; ++byte)
            if (isKept(set, byte)) table.shuffle[set][kept++] = static_cast<std::uint8_t>(byte);
        table.kept[set] = static_cast<std::uint8_t>(kept);
        while (kept < kBlock) table.shuffle[set][kept++] = 0x80;
    }
    return table;
}
// Eight units of up to two bytes; a set bit is a unit below 80.
constexpr Compaction kBytesOf8 =
    Compact([](unsigned set, unsigned byte) { return byte % 2 == 0 || (set >> byte / 2 & 1) == 0; });
// Four units of up to three bytes; the set's low half are the units below 80, its high half those below 800.
constexpr Compaction kBytesOf4 = Compact([](unsigned set, unsigned byte) {
    const bool kept[] = {(set >> (4 + byte / 4) & 1) == 0, (set >> byte / 4 & 1) == 0, true, false};
    return kept[byte % 4];
});

// Stores the bytes of a set. Stores may reach into bytes that come later, not behind the last.
TAVO_SHUFFLES TAVO_INLINE unsigned char* StoreBytes(Block encoded, const Compaction& table, std::uint32_t set,
                                                    unsigned char* out, const unsigned char* outEnd) {
    const Block bytes = Shuffle(encoded, Load(table.shuffle[set]));
    const auto room = static_cast<std::size_t>(outEnd - out);
    const std::size_t count = table.kept[set];
    if (TAVO_LIKELY(room >= kBlock)) {
        Store(out, bytes);
        return out + count;
    }
    StorePart(out, bytes, count < room ? count : room);
    return out + (count < room ? count : room);
}

// Encodes units below 800 up to the first eight with another.
template <class Unit>
TAVO_SHUFFLES TAVO_INLINE void ConvertMixture(const Unit*& text, const Unit* end, unsigned char*& out,
                                              const unsigned char* outEnd) {
    for (; end - text >= 8 && outEnd - out >= 16; text += kUnits) {
        const Block x = Load(text);
        if (Mask(Below800(x)) != 0xFFFF) return;
        const Block below80 = Below80(x);
        const std::uint32_t set = Mask(PackSigned(below80, below80)) & 0xFF;
        Store(out, Shuffle(Encode2(x, below80), Load(kBytesOf8.shuffle[set])));
        out += kBytesOf8.kept[set];
    }
}

// Encodes a measured text, eight units at a time, without a branch on which bytes they take unless some take three.
template <class Unit>
TAVO_SHUFFLES unsigned char* ConvertWindows(const Unit* text, const Unit* end, unsigned char* out,
                                            const unsigned char* outEnd) {
    while (text < end) {
        ConvertMixture(text, end, out, outEnd);
        if (text == end) break;
        const auto left = static_cast<std::size_t>(end - text);
        const Block x = left < kUnits ? LoadPart(text, left * sizeof(Unit)) : Load(text);
        const std::uint32_t surrogates = Mask(Surrogates(x));
        if (TAVO_UNLIKELY(surrogates != 0)) {
            for (const Unit* const surrogate = text + std::countr_zero(surrogates) / 2; text <= surrogate;) {
                ulong32 codePoint = 0;
                StepUtf16(codePoint, text);
                EncodeUtf8(out, codePoint);
            }
            continue;
        }
        const Block below80 = Below80(x), below800 = Below800(x);
        const std::uint32_t set = Mask(PackSigned(below80, below800));
        if (set >> 8 == 0xFF) {
            out = StoreBytes(Encode2(x, below80), kBytesOf8, set & 0xFF, out, outEnd);
        } else {
            const Block first = FirstBytes(x, below800), last = LastBytes(x, below80);
            const std::uint32_t low = (set & 0xF) | (set >> 4 & 0xF0), high = (set >> 4 & 0xF) | (set >> 8 & 0xF0);
            out = StoreBytes(Interleave<2, false>(first, last), kBytesOf4, low, out, outEnd);
            out = StoreBytes(Interleave<2, true>(first, last), kBytesOf4, high, out, outEnd);
        }
        text += left < kUnits ? left : kUnits;
    }
    return out;
}

// ASCII.
template <class Unit> TAVO_INLINE void Copy(const Unit* text, std::size_t count, unsigned char* out) {
    if (count < kBlock) {
        if (count == 0) return;
        const Block low = LoadPart(text, (count < kUnits ? count : kUnits) * sizeof(Unit));
        const Block high = count > kUnits ? LoadPart(text + kUnits, (count - kUnits) * sizeof(Unit)) : All8(0);
        StorePart(out, Narrow(low, high), count);
        return;
    }
    const auto block = [=](std::size_t at) { Store(out + at, Narrow(Load(text + at), Load(text + at + kUnits))); };
    for (std::size_t at = 0; at + kBlock <= count; at += kBlock) block(at);
    block(count - kBlock); // overlaps
}

template <class Unit> void ConvertUnits(const Unit* text, const Extent& extent, unsigned char*& out) {
    const Unit* const end = text + extent.source;
    if (extent.target == extent.source && extent.characters == extent.source) {
        Copy(text, extent.source, out);
        out += extent.target;
        return;
    }
    const unsigned char* const outEnd = out + extent.target;
    if constexpr (kLines)
        if (HasLines()) out = Lines::ConvertUtf16(text, end, out);
    if (text == end) return;
    if (HasShuffle()) {
        out = ConvertWindows(text, end, out, outEnd);
        return;
    }
    for (ulong32 codePoint; text < end && StepUtf16(codePoint, text);) EncodeUtf8(out, codePoint);
}

} // namespace

Extent MeasureUtf8(const unsigned char* text, std::size_t length) {
    Extent extent;
    do MeasurePlainChunks(text, length, extent);
    while (extent.source < length && MeasureAnyChunks(text, length, extent));
    // The steps find what is wrong, and where.
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

// Long texts are looked through for their end and measured in pieces small enough for the caches to hold.
constexpr std::size_t kPiece = std::size_t{1} << 15;

template <class Unit> TAVO_NOINLINE Extent MeasureByPieces(const Unit* text, std::size_t n) {
    Extent all;
    for (std::size_t length = kPiece; length == kPiece && all.ending != Ending::Invalid;) {
        // A piece begins with the character that the one before it cuts.
        const std::size_t left = n - all.source;
        bool isAscii = false;
        length =
            Simd::ZeroUnit(text + all.source, left < kPiece ? left : kPiece, sizeof(Unit) == 1 ? &isAscii : nullptr);
        const Extent piece = isAscii ? Extent{length, length, length} : MeasureText(text + all.source, length);
        all.source += piece.source;
        all.characters += piece.characters;
        all.target += piece.target;
        all.beyond = all.beyond || piece.beyond;
        all.ending = piece.ending;
        if (left == length) break;
    }
    return all;
}

template <class Unit> Extent Measure(const Unit* text, std::size_t n) {
    if (!text) return {};
    const std::size_t length = Simd::ZeroUnit(text, n < kPiece ? n : kPiece);
    return length < kPiece ? MeasureText(text, length) : MeasureByPieces(text, n);
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
TAVO_INLINE std::size_t ConvertMeasured(const Source* source, const Extent& extent, Target* target,
                                        std::size_t capacity, Convert convert) {
    const std::size_t need = extent.target + 1;
    if (!target) return need;
    if (capacity < need) return 0;
    if (!convert(source, extent, target)) return 0;
    // Intended (cut-or-fail): as many characters are read as there are target units, so that behind a character that
    // took more than one an invalid sequence is met and fails the whole, while it ends other texts silently. One that
    // the text's end cuts, be it the terminator or the source length, is not read.
    if (extent.ending == Ending::Invalid && extent.target > extent.characters) return 0;
    *target = 0;
    return need;
}

template <class Source, class Target, class Convert>
std::size_t ConvertWhole(const Source* source, std::size_t sourceLength, Target* target, std::size_t capacity,
                         Convert convert) {
    if (!source) return 0;
    // Asking for ASCII on the way costs next to nothing for bytes only.
    bool isAscii = false;
    const std::size_t length =
        Simd::ZeroUnit(source, sourceLength < kPiece ? sourceLength : kPiece, sizeof(Source) == 1 ? &isAscii : nullptr);
    if (TAVO_UNLIKELY(length == kPiece))
        return ConvertMeasured(source, MeasureByPieces(source, sourceLength), target, capacity, convert);
    const Extent extent = isAscii ? Extent{length, length, length} : MeasureText(source, length);
    return ConvertMeasured(source, extent, target, capacity, convert);
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
