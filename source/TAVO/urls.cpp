// URLs: escaping, and the URLs of local paths.

#include "numberscan.h"
#include "scratch.h"
#include "transcoding.h"

#include <TAVO/internetional.h>

namespace TAVO::Internetional {

namespace {

using namespace Simd;
using Bytes = const unsigned char*;

// --- Classes of bytes ------------------------------------------------------------------------------------------------

// A set of bytes, one bit each, in the shape in which sixteen bytes are looked up at once.
class ByteSet {
public:
    constexpr void Add(unsigned char byte) {
        m_rows[byte >> 7][byte & 15] = static_cast<std::uint8_t>(m_rows[byte >> 7][byte & 15] | 1 << (byte >> 4 & 7));
    }
    constexpr void Add(unsigned char first, unsigned char last) {
        for (unsigned byte = first; byte <= last; ++byte) Add(static_cast<unsigned char>(byte));
    }
    constexpr bool Has(unsigned char byte) const { return (m_rows[byte >> 7][byte & 15] >> (byte >> 4 & 7) & 1) != 0; }
    const std::uint8_t* Row(unsigned half) const { return m_rows[half]; }

private:
    std::uint8_t m_rows[2][16] = {}; // by the byte's highest bit and low digit; a bit for each high digit
};

constexpr ByteSet kUnreserved = [] {
    ByteSet set;
    set.Add('A', 'Z'), set.Add('a', 'z'), set.Add('0', '9');
    for (const char c : {'-', '_', '.', '~'}) set.Add(static_cast<unsigned char>(c));
    return set;
}();

// Intended (url-percent): a '%' in the extra set is kept like any other byte, in encoding and in checking, where one
// expects that it is escaped or begins an escape. Hosts that pass it count on text with escapes staying as it is.
ByteSet Kept(Bytes extra) {
    ByteSet set = kUnreserved;
    if (extra)
        for (; *extra; ++extra) set.Add(*extra);
    return set;
}

// Both digits of every byte.
constexpr std::array<std::array<char, 2>, 256> kDigits = [] {
    constexpr const char* kHex = "0123456789ABCDEF";
    std::array<std::array<char, 2>, 256> table{};
    for (unsigned byte = 0; byte < 256; ++byte) table[byte] = {kHex[byte >> 4], kHex[byte & 15]};
    return table;
}();

// The byte that the escape at `text` denotes, -1 when it is none. The second digit is read only behind a first one, so
// nothing behind a terminator is.
TAVO_INLINE int Escaped(Bytes text) {
    if (*text != '%') return -1;
    const unsigned high = numberscan::DigitOf(text[1]);
    if (high == numberscan::kNoDigit) return -1;
    const unsigned low = numberscan::DigitOf(text[2]);
    return low == numberscan::kNoDigit ? -1 : static_cast<int>(high << 4 | low);
}

// --- Sixteen bytes at a time -----------------------------------------------------------------------------------------
//
// The loops answer where they stopped: a rest that is shorter than what they look at, or write at, in one step.

bool HasLeft(Bytes in, Bytes end, std::size_t bytes) { return static_cast<std::size_t>(end - in) >= bytes; }

// The bytes of a block that a set has.
class Members {
public:
    TAVO_SHUFFLES explicit Members(const ByteSet& set) : m_low(Load(set.Row(0))), m_high(Load(set.Row(1))) {}

    // FF where the set has the byte, else 0.
    TAVO_SHUFFLES Block Of(Block bytes) const {
        static constexpr std::uint8_t kBits[] = {1, 2, 4, 8, 16, 32, 64, 128, 0, 0, 0, 0, 0, 0, 0, 0};
        // A byte of the other half has its highest bit set as an index, and gives 0.
        const Block low = Shuffle(m_low, And(bytes, All8(0x8F)));
        const Block high = Shuffle(m_high, And(Subtract8(bytes, All8(0x80)), All8(0x8F)));
        const Block bit = Shuffle(Load(kBits), And(ShiftRight16<4>(bytes), All8(7)));
        return Equal8(And(Or(low, high), bit), bit);
    }

private:
    Block m_low, m_high;
};

constexpr std::uint32_t kWhole = 0xFFFF; // a mask of all bytes

// Hexadecimal digits as numbers, and FF where a byte is one.
struct Digits {
    Block values, valid;
};
TAVO_INLINE Digits DigitsOf(Block bytes) {
    const Block number = Subtract8(bytes, All8('0'));
    const Block letter = Subtract8(Or(bytes, All8(0x20)), All8('a'));
    const Block isNumber = AtLeast8(All8(9), number), isLetter = AtLeast8(All8(5), letter);
    return {Or(And(isNumber, number), And(isLetter, Subtract8(letter, All8(-10)))), Or(isNumber, isLetter)};
}

// The escapes that begin in a block, with what they denote. Requires: two more bytes.
struct Escapes {
    Escapes(Bytes in, Block block) {
        const Digits first = DigitsOf(Load(in + 1)), second = DigitsOf(Load(in + 2));
        const Block begin = And(Equal8(block, All8('%')), And(first.valid, second.valid));
        const Block byte = Or(ShiftLeft16<4>(first.values), second.values);
        decoded = Or(And(begin, byte), AndNot(begin, block));
        begins = Mask(begin);
        digits = begins << 1 | begins << 2;
    }
    // Digits behind the block, as a mask of the next one and as their number.
    std::uint32_t Behind() const { return digits >> kBlock; }
    std::size_t CountBehind() const { return begins >> (kBlock - 2); } // the last two bytes cannot both begin one

    Block decoded;
    std::uint32_t begins, digits; // a bit for each of their bytes
};

// All of a text that has a block at least: the last one takes in what was counted before.
TAVO_SHUFFLES std::size_t CountBlocks(const ByteSet& set, Bytes in, Bytes end) {
    const Members kept(set);
    std::size_t count = 0;
    for (; HasLeft(in, end, kBlock); in += kBlock) count += CountBits(Mask(kept.Of(Load(in))));
    const auto rest = static_cast<unsigned>(end - in);
    return count + CountBits(Mask(kept.Of(Load(end - kBlock))) >> (kBlock - rest));
}

// Null: something is neither kept nor part of an escape.
TAVO_SHUFFLES Bytes CheckBlocks(const ByteSet& set, Bytes in, Bytes end) {
    const Members kept(set);
    for (; HasLeft(in, end, kBlock + 2); in += kBlock) { // digits are examined again, and are kept
        const Block block = Load(in);
        const std::uint32_t members = Mask(kept.Of(block));
        if (members != kWhole && (members | Escapes(in, block).begins) != kWhole) return nullptr;
    }
    return in;
}

// How four bytes become up to twelve: picked from their eight digits, themselves and a '%'. By a bit for each byte that
// is kept.
struct Expansion {
    std::uint8_t picks[16], length;
};
constexpr std::array<Expansion, 16> kExpansions = [] {
    std::array<Expansion, 16> table{};
    for (unsigned kept = 0; kept < 16; ++kept) {
        Expansion& row = table[kept];
        for (unsigned i = 0; i < 4; ++i) {
            if (kept >> i & 1) {
                row.picks[row.length++] = static_cast<std::uint8_t>(8 + i);
                continue;
            }
            for (const unsigned pick : {12u, 2 * i, 2 * i + 1})
                row.picks[row.length++] = static_cast<std::uint8_t>(pick);
        }
    }
    return table;
}();

TAVO_SHUFFLES inline void Expand(unsigned char*& out, Block group, std::uint32_t kept) {
    const Expansion& row = kExpansions[kept & 15];
    Store(out, Shuffle(group, Load(row.picks)));
    out += row.length;
}

TAVO_SHUFFLES Bytes EncodeBlocks(const ByteSet& set, Bytes in, Bytes end, unsigned char*& target) {
    static constexpr char kHex[] = "0123456789ABCDEF";
    // The output has at least as many bytes to come as the input, and a terminator: that is the room for a block at the
    // fourth group.
    constexpr std::size_t kLeast = kBlock + 11;
    const Members kept(set);
    const Block hex = Load(kHex), percent = All8('%');
    unsigned char* out = target;
    for (; HasLeft(in, end, kLeast); in += kBlock) {
        const Block block = Load(in);
        const std::uint32_t members = Mask(kept.Of(block));
        if (members == kWhole) {
            Store(out, block);
            out += kBlock;
            continue;
        }
        const Block high = Shuffle(hex, And(ShiftRight16<4>(block), All8(15)));
        const Block low = Shuffle(hex, And(block, All8(15)));
        const Block digits = Interleave<1, false>(high, low), self = Interleave<4, false>(block, percent);
        Expand(out, Interleave<8, false>(digits, self), members);
        Expand(out, Interleave<8, true>(digits, self), members >> 4);
        const Block digits2 = Interleave<1, true>(high, low), self2 = Interleave<4, true>(block, percent);
        Expand(out, Interleave<8, false>(digits2, self2), members >> 8);
        Expand(out, Interleave<8, true>(digits2, self2), members >> 12);
    }
    target = out;
    return in;
}

// Eight bytes without some of them: the places of the others, and their number. By a bit for each that stays.
struct Selection {
    std::uint8_t places[8], length;
};
constexpr std::array<Selection, 256> kSelections = [] {
    std::array<Selection, 256> table{};
    for (unsigned stay = 0; stay < 256; ++stay)
        for (unsigned i = 0; i < 8; ++i)
            if (stay >> i & 1) table[stay].places[table[stay].length++] = static_cast<std::uint8_t>(i);
    return table;
}();

// `target` may be in the same text, at or before `in`: what is written over has been read.
TAVO_SHUFFLES Bytes DecodeBlocks(Bytes in, Bytes end, unsigned char*& target) {
    static constexpr std::uint8_t kHalves[] = {0, 0, 0, 0, 0, 0, 0, 0, 8, 8, 8, 8, 8, 8, 8, 8};
    // What follows becomes at least a third of its bytes: the room for eight at any place.
    constexpr std::size_t kLeast = kBlock + 3 * 8 + 2;
    unsigned char* out = target;
    std::uint32_t behind = 0; // digits at the beginning of the block that belong to an escape before it
    std::size_t countBehind = 0;
    for (; HasLeft(in, end, kLeast); in += kBlock) {
        const Block block = Load(in);
        if (behind == 0 && Mask(Equal8(block, All8('%'))) == 0) {
            Store(out, block);
            out += kBlock;
            continue;
        }
        const Escapes escapes(in, block);
        const std::uint32_t stay = ~(escapes.digits | behind);
        behind = escapes.Behind(), countBehind = escapes.CountBehind();
        const Selection &low = kSelections[stay & 0xFF], &high = kSelections[stay >> 8 & 0xFF];
        const Block places = Or(LoadHalves(low.places, high.places), Load(kHalves));
        const Block selected = Shuffle(escapes.decoded, places);
        StoreHalf(out, selected);
        out += low.length;
        StoreHalf(out, HighHalf(selected));
        out += high.length;
    }
    target = out;
    return in + countBehind;
}

// --- Whole texts, of known length ------------------------------------------------------------------------------------

std::size_t LengthOf(Bytes text) { return ZeroUnit(text, SIZE_MAX); }

std::size_t EncodedLength(const ByteSet& kept, Bytes text, std::size_t length) {
    std::size_t count = 0;
    if (length >= kBlock && HasShuffle())
        count = CountBlocks(kept, text, text + length);
    else
        for (std::size_t i = 0; i < length; ++i) count += kept.Has(text[i]);
    return 3 * length - 2 * count;
}

// Ends behind what it writes, without a terminator, for which there must be room.
unsigned char* Encode(const ByteSet& kept, unsigned char* out, Bytes in, std::size_t length) {
    Bytes const end = in + length;
    if (HasShuffle()) in = EncodeBlocks(kept, in, end, out);
    for (; HasLeft(in, end, 2); ++in) { // what is written in one step is there for two bytes and the terminator
        const bool self = kept.Has(*in);
        *out = self ? *in : '%';
        std::memcpy(out + 1, kDigits[*in].data(), 2);
        out += self ? 1 : 3;
    }
    if (in == end) return out;
    if (kept.Has(*in)) {
        *out = *in;
        return out + 1;
    }
    *out = '%';
    std::memcpy(out + 1, kDigits[*in].data(), 2);
    return out + 3;
}

// Copies less than a block; the texts may overlap.
TAVO_INLINE void CopyShort(unsigned char* out, Bytes in, std::size_t count) {
    const auto copyEnds = [=](auto first) { // both are read before either is written
        auto last = first;
        std::memcpy(&first, in, sizeof(first)), std::memcpy(&last, in + count - sizeof(last), sizeof(last));
        std::memcpy(out, &first, sizeof(first)), std::memcpy(out + count - sizeof(last), &last, sizeof(last));
    };
    if (count >= 8) return copyEnds(std::uint64_t());
    if (count >= 4) return copyEnds(std::uint32_t());
    for (std::size_t i = 0; i < count; ++i) out[i] = in[i];
}

// Copies up to the next '%' or the end; answers the bytes copied.
TAVO_INLINE std::size_t CopyToPercent(unsigned char* out, Bytes in, Bytes end) {
    std::size_t done = 0;
    for (; HasLeft(in + done, end, kBlock); done += kBlock) {
        const Block block = Load(in + done);
        if (const std::uint32_t percents = Mask(Equal8(block, All8('%')))) {
            const auto run = static_cast<std::size_t>(std::countr_zero(percents));
            CopyShort(out + done, in + done, run);
            return done + run;
        }
        Store(out + done, block);
    }
    for (; in + done < end && in[done] != '%'; ++done) out[done] = in[done];
    return done;
}

// Ends behind what it writes, without a terminator. `out` may be in the same text, at or before `in`.
// Intended (url-zero): %00 becomes a byte 0 like any other, so that the text seems to end there; a wary decoder refuses
// it. Hosts that decode bytes and not texts need it.
unsigned char* Decode(unsigned char* out, Bytes in, std::size_t length) {
    Bytes const end = in + length;
    if (HasShuffle()) in = DecodeBlocks(in, end, out);
    for (;;) {
        const std::size_t run = CopyToPercent(out, in, end);
        in += run, out += run;
        if (in == end) return out;
        while (*in == '%') {
            const int byte = Escaped(in);
            *out++ = static_cast<unsigned char>(byte < 0 ? '%' : byte);
            in += byte < 0 ? 1 : 3;
        }
    }
}

// --- File URLs -------------------------------------------------------------------------------------------------------

constexpr char kScheme[] = "file://", kLocalHost[] = "localhost";
constexpr std::size_t kSchemeLength = sizeof(kScheme) - 1, kLocalHostLength = sizeof(kLocalHost) - 1;

bool StartsWith(Bytes text, const char* lowerCase) {
    for (; *lowerCase; ++text, ++lowerCase)
        if (String::detail::FoldUnit(*text) != static_cast<unsigned char>(*lowerCase)) return false;
    return true;
}

bool IsSeparator(unsigned char c) { return c == '/' || c == '\\'; }

// "C:", alone or before a separator.
bool IsDrivePath(Bytes path) {
    const unsigned char letter = String::detail::FoldUnit(path[0]);
    return letter >= 'a' && letter <= 'z' && path[1] == ':' && (!path[2] || IsSeparator(path[2]));
}

// Whether the library converts all of a text, and to one without a zero inside: what it drops would not be seen by
// anyone who checks the path.
template <class Unit, class Step> bool ConvertsWhole(const Unit* text, const Unit* end, Step step) {
    for (ulong32 value; text < end;)
        if (!step(value, text) || value == 0 || value > 0x10FFFF) return false;
    return true;
}
bool IsWholeUtf8(Bytes text, Bytes end) { return ConvertsWhole(text, end, String::detail::StepUtf8); }
bool IsWholeWide(const wchar_t* text) {
    return ConvertsWhole(text, text + String::detail::WideLength(text), String::detail::StepUtf16<wchar_t>);
}

} // namespace

bool URL_decodebuffer(unsigned char* dst, const unsigned char* src) noexcept {
    if (!dst || !src) return false;
    *Decode(dst, src, LengthOf(src)) = 0;
    return true;
}

bool URL_checkescape(const unsigned char* text, const unsigned char* extra) noexcept {
    if (!text) return false;
    const ByteSet kept = Kept(extra);
    Bytes const end = text + LengthOf(text);
    if (HasShuffle()) text = CheckBlocks(kept, text, end);
    if (!text) return false;
    for (; text < end; ++text)
        if (!kept.Has(*text) && Escaped(text) < 0) return false;
    return true;
}

std::size_t URL_encoderequired(const unsigned char* text, const unsigned char* extra) noexcept {
    return text ? EncodedLength(Kept(extra), text, LengthOf(text)) : 0;
}

bool URL_encodebuffer(unsigned char* dst, const unsigned char* src, const unsigned char* extra) noexcept {
    if (!dst || !src || dst == src) return false;
    *Encode(Kept(extra), dst, src, LengthOf(src)) = 0;
    return true;
}

String::CUTF8Char file_EncodeURL(const wchar_t* path) noexcept {
    // Intended (file-url-whole): one expects the URL of as much as was converted. It would name another file, a folder
    // above it perhaps.
    if (!path || !*path || !IsWholeWide(path)) return {};
    // Intended (file-url-pairs): a character above U+FFFF becomes the one byte 1, as in all UTF-8 of this library,
    // where one expects its four. URLs that hosts have stored would change.
    const String::CUTF8Char bytes(path);
    if (!bytes) return {};
    ByteSet kept = kUnreserved;
    kept.Add('/');
    Scratch<unsigned char> url;
    if (!url.Reserve(kSchemeLength + 1 + EncodedLength(kept, bytes, bytes.len()) + 1)) return {};
    std::memcpy(url.First(), kScheme, kSchemeLength);
    // Intended (file-url-letter): a textbook turns '\' into '/', leaves the drive's ':' and takes the first '/' of an
    // absolute path for the URL's third. Here the path stands there as it is, so that it comes back exactly.
    url.First()[kSchemeLength] = '/';
    *Encode(kept, url.First() + kSchemeLength + 1, bytes, bytes.len()) = 0;
    return String::CUTF8Char(static_cast<Bytes>(url.First()));
}

String::CACFWChar file_DecodeURL(const unsigned char* url) noexcept {
    if (!url || !StartsWith(url, kScheme)) return {};
    url += kSchemeLength;
    if (StartsWith(url, kLocalHost) && url[kLocalHostLength] == '/') url += kLocalHostLength;
    if (!*url) return {};
    const bool host = *url != '/';
    if (!host) ++url;

    const std::size_t length = LengthOf(url);
    Scratch<unsigned char> path;
    if (!path.Reserve(2 + length + 1)) return {};
    path.First()[0] = path.First()[1] = '/';
    unsigned char* const decoded = path.First() + 2;
    unsigned char* const end = Decode(decoded, url, length);
    *end = 0;
    if (!IsWholeUtf8(decoded, end)) return {};
    // Intended (file-url-relative): what is neither drive path nor begins with a separator gets one, also when a
    // relative path was encoded: a URL names a place, and the working folder is none.
    const std::size_t slashes = host ? 2 : IsSeparator(*decoded) || IsDrivePath(decoded) ? 0 : 1;
    return String::CACFWChar(static_cast<Bytes>(decoded - slashes));
}

String::CACFWChar file_DecodeURL(const wchar_t* url) noexcept {
    if (!url || !IsWholeWide(url)) return {};
    return file_DecodeURL(*String::CUTF8Char(url));
}

} // namespace TAVO::Internetional
