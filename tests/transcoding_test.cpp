// Transcoding against a slow reading of its rules: single characters, counts, whole texts, and what is never touched.

#include "support/guardpage.h"
#include "support/texts.h"

#include <gtest/gtest.h>
#include <string>
#include <TAVO/string.h>

namespace {

using namespace TAVO::String;
using support::Bytes;
using support::Units;
using TAVO::ulong32;
using Numbers = std::vector<ulong32>;

constexpr std::size_t kAll = SIZE_MAX;

enum class Look { Good, Invalid, Ended }; // Ended: terminator, bound, or cut by the bound

struct Character {
    Look look;
    std::size_t units = 0; // of the source
    ulong32 value = 0;
};

unsigned LeadLength(unsigned b) { return b < 0x80 ? 1 : b < 0xC0 ? 0 : b < 0xE0 ? 2 : b < 0xF0 ? 3 : b < 0xF5 ? 4 : 0; }

// `text` ends in a terminator; n bounds it.
Character LookAt(const Bytes& text, std::size_t i, std::size_t n) {
    if (i >= n || text[i] == 0) return {Look::Ended};
    const unsigned length = LeadLength(text[i]);
    if (length == 0) return {Look::Invalid};
    if (length > n - i) return {Look::Ended};
    if (length == 1) return {Look::Good, 1, text[i]};
    ulong32 value = text[i] & (length == 2 ? 0x1F : length == 3 ? 0x0F : 0x07);
    for (unsigned k = 1; k < length; ++k) {
        if (text[i + k] / 0x40 != 2) return {Look::Invalid};
        value = value * 0x40 + text[i + k] % 0x40;
    }
    return {Look::Good, length, value};
}

Character LookAt(const Units& text, std::size_t i, std::size_t n) {
    if (i >= n || text[i] == 0) return {Look::Ended};
    if (text[i] < 0xD800 || text[i] > 0xDFFF) return {Look::Good, 1, text[i]};
    if (text[i] >= 0xDC00) return {Look::Invalid};
    if (n - i < 2) return {Look::Ended};
    if (text[i + 1] < 0xDBFF) return {Look::Invalid};
    return {Look::Good, 2, text[i] % 0x400 == 0 && text[i + 1] % 0x400 == 0 ? 0u : 1u};
}

Units Encoded16(ulong32 value) {
    if (value < 0x10000) return {static_cast<unsigned short>(value)};
    return {static_cast<unsigned short>(0xD800 | value / 0x400), static_cast<unsigned short>(0xDC00 | value % 0x400)};
}
Bytes Encoded8(ulong32 value) {
    if (value < 0x80) return {static_cast<unsigned char>(value)};
    const unsigned trail = value < 0x800 ? 1 : value < 0x10000 ? 2 : 3;
    Bytes bytes(trail + 1);
    for (unsigned k = trail; k; --k, value /= 0x40) bytes[k] = static_cast<unsigned char>(0x80 + value % 0x40);
    bytes[0] = static_cast<unsigned char>(value + (trail == 1 ? 0xC0 : trail == 2 ? 0xE0 : 0xF0));
    return bytes;
}
std::size_t TargetSize(const Bytes&, ulong32 value) { return value < 0x10000 ? 1 : 2; }
std::size_t TargetSize(const Units&, ulong32 value) { return Encoded8(value).size(); }

// Characters, and the target units that they take.
template <class Text> std::pair<std::size_t, std::size_t> Count(const Text& text, std::size_t n) {
    std::size_t characters = 0, target = 0, i = 0;
    for (Character c; (c = LookAt(text, i, n)).look == Look::Good; i += c.units) {
        ++characters;
        target += TargetSize(text, c.value);
    }
    return {characters, target};
}

// What a whole-string converter leaves: its result, and the target units written, the terminator too if there is one.
template <class Target, class Text, class Encode>
std::pair<std::size_t, Target> Convert(const Text& text, std::size_t n, Encode encode) {
    const std::size_t need = Count(text, n).second + 1;
    Target written;
    std::size_t i = 0;
    for (std::size_t iteration = 1; iteration < need; ++iteration) {
        const Character c = LookAt(text, i, n);
        if (c.look == Look::Ended) break;
        if (c.look == Look::Invalid || c.value > 0x10FFFF) return {0, written};
        i += c.units;
        for (auto unit : encode(c.value)) written.push_back(unit);
    }
    written.push_back(0);
    return {need, written};
}

template <class Unit> std::vector<Unit> Terminated(std::vector<Unit> text) {
    text.push_back(0);
    return text;
}
template <class Unit, class From> std::vector<Unit> As(const From& units) { return {units.begin(), units.end()}; }

TEST(TranscodingSizes, FollowTheirTables) {
    struct Row {
        ulong32 value;
        std::size_t utf8, utf16, wide;
    };
    for (const Row& row :
         {Row{0x7F, 1, 1, 1}, Row{0x80, 2, 1, 1}, Row{0x7FF, 2, 1, 1}, Row{0x800, 3, 1, 1}, Row{0xFFFF, 3, 1, 1},
          Row{0x10000, 4, 2, 2}, Row{0x10FFFF, 4, 2, 2}, Row{0x110000, 0, 2, 2}, Row{0x110001, 0, 0, 2}}) {
        EXPECT_EQ(UTF8Size(row.value), row.utf8) << row.value;
        EXPECT_EQ(UTF16Size(row.value), row.utf16) << row.value;
        EXPECT_EQ(acfWSize(row.value), row.wide) << row.value;
    }
    for (unsigned unit = 0; unit < 0x10000; ++unit) {
        const std::size_t expected = unit < 0xD800 || unit > 0xDFFF ? 1 : unit < 0xDC00 ? 2 : 0;
        ASSERT_EQ(UTF16Len(static_cast<unsigned short>(unit)), expected) << unit;
        ASSERT_EQ(acfWLen(static_cast<wchar_t>(unit)), 1u) << unit;
        const auto byte = static_cast<unsigned char>(unit);
        ASSERT_EQ(UTF8Len(byte), LeadLength(byte)) << unit;
    }
}

TEST(TranscodingSync, Utf8SkipsLeadsAndNotContinuations_Intended) {
    const unsigned char text[] = {0xC3, 0xDF, 0xA9, 'a', 0}, longer[] = {0xE0, 0};
    const unsigned char *at = text, *atLonger = longer;
    for (int i = 0; i < 2; ++i) UTF8Sync(at);
    EXPECT_EQ(at, text + 2) << "a continuation byte stays";
    UTF8Sync(atLonger);
    EXPECT_EQ(atLonger, longer);
    const unsigned short units[] = {0xDC00, 0xDFFF, 0xE000, 0};
    const unsigned short* unit = units;
    UTF16Sync(unit);
    EXPECT_EQ(unit, units + 2);
    const wchar_t wides[] = {0xDC00, 0xDBFF, 0};
    const wchar_t* wide = wides;
    acfWSync(wide);
    EXPECT_EQ(wide, wides + 1);
}

// One step over the text, which ends at an inaccessible page: how far it goes and what it writes, failed or not.
template <class Unit, class Source, class Expected>
void ExpectStep(bool (*step)(Unit*&, const Source*&), const std::vector<Source>& text, bool good, std::ptrdiff_t moved,
                const Expected& expected) {
    static const support::GuardedMemory memory;
    const Source* const begin = memory.Place(text.data(), text.size());
    const Source* in = begin;
    Unit target[] = {7, 7, 7, 7, 7};
    Unit* out = target;
    EXPECT_EQ(step(out, in), good);
    EXPECT_EQ(in - begin, moved);
    EXPECT_EQ(std::vector<Unit>(target, out), As<Unit>(expected));
    EXPECT_EQ(*out, 7);
}
// A step that gives a number, as one that writes it.
template <class Source, bool (*kStep)(ulong32*, const Source*&)> bool Number(ulong32*& out, const Source*& in) {
    *out = 0xABCD;
    const bool good = kStep(out, in);
    ++out;
    return good;
}

TEST(TranscodingStep, Utf8IsTakenAsItIs_Intended) {
    struct Row {
        const char* name;
        Bytes bytes;
        bool good;
        ulong32 value;
        std::ptrdiff_t moved;
    };
    for (const Row& row : {
             Row{"terminator", {}, true, 0, 1},
             Row{"two", {0xC3, 0xA9}, true, 0xE9, 2},
             Row{"four", {0xF0, 0x9F, 0x98, 0x80}, true, 0x1F600, 4},
             Row{"overlong zero", {0xC0, 0x80}, true, 0, 2},
             Row{"surrogate", {0xED, 0xA0, 0x80}, true, 0xD800, 3},
             Row{"beyond 10FFFF", {0xF4, 0xBF, 0xBF, 0xBF}, true, 0x13FFFF, 4},
             Row{"lone continuation", {0x80}, false, 0, 0},
             Row{"no lead", {0xF5, 0x80, 0x80, 0x80}, false, 0, 0},
             Row{"two cut", {0xC3}, false, 0xC0, 1},
             Row{"three broken", {0xE4, 'a', 0x80}, false, 0x4000, 1},
             Row{"four cut", {0xF0, 0x9F, 0x98}, false, 0x1F600, 3},
             Row{"four at once", {0xF3}, false, 0xC0000, 1},
         }) {
        SCOPED_TRACE(row.name);
        const Bytes text = Terminated(row.bytes);
        const bool encodes = row.good && row.value <= 0x10FFFF;
        const Units expected = encodes ? Encoded16(row.value) : Units();
        ExpectStep(Number<unsigned char, utf8_acfW32>, text, row.good, row.moved, Numbers{row.value});
        ExpectStep(utf8_utf16, text, encodes, row.moved, expected);
        ExpectStep(utf8_acfW, text, encodes, row.moved, expected);
    }
}

TEST(TranscodingStep, Utf16PairsDecodeToZeroOrOne_Intended) {
    constexpr unsigned short kCorners[] = {0,      0x41,   0x7F,   0x80,   0x7FF,  0x800,  0xD7FF, 0xD800, 0xD83D,
                                           0xDBFE, 0xDBFF, 0xDC00, 0xDE00, 0xDFFF, 0xE000, 0xFC00, 0xFFFF};
    for (const unsigned short first : kCorners)
        for (const unsigned short second : kCorners) {
            SCOPED_TRACE(testing::Message() << first << " " << second);
            const Units text = first ? Terminated(Units{first, second}) : Units{0};
            const auto wide = As<wchar_t>(text);
            const Character c = first ? LookAt(text, 0, kAll) : Character{Look::Good, 1, 0};
            const bool good = c.look == Look::Good;
            const auto moved = static_cast<std::ptrdiff_t>(c.units);
            const Numbers number{good ? c.value : 0xABCD};
            ExpectStep(Number<unsigned short, utf16_acfW32>, text, good, moved, number);
            ExpectStep(Number<wchar_t, acfW_acfW32>, wide, good, moved, number);
            ExpectStep(utf16_utf8, text, good, moved, good ? Encoded8(c.value) : Bytes());
            ExpectStep(acfW_utf8, wide, good, moved, good ? Encoded8(c.value) : Bytes());
            ExpectStep(acfW_utf16, wide, good, moved, good ? Encoded16(c.value) : Units());
            ExpectStep(utf16_acfW, text, true, 1, Units{first});
        }
}

template <class Unit, bool (*kStep)(Unit*&, ulong32)> bool Encode(Unit*& out, const ulong32*& in) {
    return kStep(out, *in++);
}

TEST(TranscodingStep, EncodesWithoutTheOffset_Intended) {
    for (ulong32 value : {0x0u, 0x7Fu, 0x80u, 0x7FFu, 0x800u, 0xD800u, 0xDFFFu, 0xFFFFu, 0x10000u, 0x1F600u, 0xFFFFFu,
                          0x100000u, 0x10FFFFu, 0x110000u, 0xFFFFFFFFu}) {
        SCOPED_TRACE(value);
        const bool good = value <= 0x10FFFF;
        const Units units = good ? Encoded16(value) : Units();
        ExpectStep(Encode<unsigned char, acfW32_utf8>, Numbers{value}, good, 1, good ? Encoded8(value) : Bytes());
        ExpectStep(Encode<unsigned short, acfW32_utf16>, Numbers{value}, good, 1, units);
        ExpectStep(Encode<wchar_t, acfW32_acfW>, Numbers{value}, good, 1, units);
    }
    EXPECT_EQ(Encoded16(0x10000), (Units{0xD840, 0xDC00}));
    EXPECT_EQ(Encoded16(0x10FFFF), (Units{0xDC3F, 0xDFFF})) << "begins with a low surrogate";
}

// Runs a whole-string converter at its three capacities; the target ends where nothing more may be written.
template <class Unit, class Source, class Target>
void ExpectConversion(std::size_t (*convert)(const Source*, std::size_t, Unit*, std::size_t), const Source* source,
                      std::size_t n, std::size_t need, const std::pair<std::size_t, Target>& expected) {
    static const support::GuardedMemory memory;
    constexpr auto kFill = static_cast<Unit>(0xEEEE);
    ASSERT_EQ(convert(source, n, nullptr, 0), need);
    for (const std::size_t capacity : {need - 1, need, need + 1}) {
        const std::vector<Unit> filled(capacity, kFill);
        Unit* const target = memory.Place(filled.data(), capacity);
        ASSERT_EQ(convert(source, n, target, capacity), capacity < need ? 0 : expected.first);
        auto left = capacity < need ? std::vector<Unit>() : As<Unit>(expected.second);
        left.resize(capacity, kFill);
        ASSERT_EQ(std::vector<Unit>(target, target + capacity), left);
    }
}

class Differential : public testing::Test {
protected:
    // n units at the very end of memory, with the terminator when n reaches it.
    template <class Text> auto* Place(const Text& text, std::size_t n) {
        return m_source.Place(text.data(), n < text.size() ? n : text.size());
    }

    void Expect(const Bytes& text, std::size_t n) {
        const auto [characters, units] = Count(text, n);
        const unsigned char* const source = Place(text, n);
        ASSERT_EQ(UTF8w32strlen(source, n), characters);
        ASSERT_EQ(UTF8u16strlen(source, n), units);
        ASSERT_EQ(UTF8wstrlen(source, n), units);
        ExpectConversion(UTF8_To_acfWChar, source, n, units + 1, Convert<Units>(text, n, Encoded16));
    }

    void Expect(const Units& text, std::size_t n) {
        const auto [characters, bytes] = Count(text, n);
        const std::size_t visible = n < text.size() - 1 ? n : text.size() - 1;
        const unsigned short* const source = Place(text, n);
        ASSERT_EQ(UTF16w32strlen(source, n), characters);
        ASSERT_EQ(UTF16u8strlen(source, n), bytes);
        ASSERT_EQ(UTF16wstrlen(source, n), visible);
        const wchar_t* const wide = Place(As<wchar_t>(text), n);
        ASSERT_EQ(acfWw32strlen(wide, n), characters);
        ASSERT_EQ(acfWu8strlen(wide, n), bytes);
        ASSERT_EQ(acfWu16strlen(wide, n), visible);
        ExpectConversion(acfWChar_To_UTF8, wide, n, bytes + 1, Convert<Bytes>(text, n, Encoded8));
    }

    template <class Text> void ExpectAtBounds(const Text& text) {
        const std::size_t last = text.size() + 1;
        for (std::size_t n = 0; n <= last && !HasFatalFailure(); n += last > 300 && n > 20 && n + 20 < last ? 17 : 1)
            Expect(text, n);
        for (std::size_t n : {kAll, kAll - 1, kAll / 2, kAll / 2 + 1})
            if (!HasFatalFailure()) Expect(text, n);
    }

    template <class Text> void ExpectOddSequences(const std::vector<Text>& fillers, const std::vector<Text>& odds) {
        for (const Text& filler : fillers)
            for (const Text& odd : odds)
                for (std::size_t before = 0; before < 70 && !HasFatalFailure(); ++before) {
                    Text text;
                    for (std::size_t i = 0; i < 140; ++i) {
                        if (i == before) text.insert(text.end(), odd.begin(), odd.end());
                        text.insert(text.end(), filler.begin(), filler.end());
                    }
                    Expect(Terminated(text), kAll);
                    text.resize(before * filler.size() + odd.size());
                    Expect(Terminated(text), kAll);
                }
    }

    support::GuardedMemory m_source;
};

// Invalid text is cut, or refused with what was written left in place, as Convert tells.
TEST_F(Differential, RandomTextsAtEveryBound_Intended) {
    support::TextSource source(1);
    for (std::uint32_t i = 0; i < 400 && !HasFatalFailure(); ++i) {
        SCOPED_TRACE(i);
        ExpectAtBounds(Terminated(source.Utf8(source.Below(i % 10 ? 90 : 600))));
        ExpectAtBounds(Terminated(source.Utf16(source.Below(i % 10 ? 60 : 600))));
    }
}

// One odd sequence at every place of a text whose other characters have one length: all block and run borders.
TEST_F(Differential, OddSequencesAtEveryPlace) {
    std::vector<Bytes> odds;
    for (const std::string odd :
         {"b", "\xC3\xA9", "\xE4\xB8\xAD", "\xF0\x90\x80\x80", "\xF0\x8F\xBF\xBF", "\xC3", "\xE4\xB8", "\xF0\x9F\x98",
          "\xF4\x90\x80\x80", "\xF4\x8F\xBF\xBF", "\x80", "\xF5", "\xF8\x80\x80\x80\x80"})
        odds.push_back(As<unsigned char>(odd));
    ExpectOddSequences<Bytes>({{'a'}, {0xC3, 0xA9}, {0xE4, 0xB8, 0xAD}, {0xF0, 0x9F, 0x98, 0x80}}, odds);
    ExpectOddSequences<Units>(
        {{'a'}, {0xE9}, {0x4E2D}, {0xD83D, 0xDE00}},
        {{'b'}, {0x7FF}, {0xFFFF}, {0xD800, 0xDBFF}, {0xD800, 0xDC00}, {0xD800}, {0xDC00}, {0xD800, 0xDBFE}});
}

TEST_F(Differential, LongTextsSumUp) {
    Bytes text;
    for (int i = 0; i < 5000; ++i) text.insert(text.end(), {'a', 0xC3, 0xA9, 0xE4, 0xB8, 0xAD, 0xF0, 0x9F, 0x98, 0x80});
    for (const Bytes& bytes : {text, Bytes(50000, 'x')}) Expect(Terminated(bytes), kAll);
    for (const int unit : {0x78, 0xE9, 0x4E2D})
        Expect(Terminated(Units(40000, static_cast<unsigned short>(unit))), kAll);
}

TEST(TranscodingCounts, Utf32IncludesIndexN_Intended) {
    struct Row {
        const char* name;
        Numbers text; // no element behind those given is readable
        std::size_t n, units, bytes;
    };
    const Row rows[] = {
        {"index n", {0x41, 0x42}, 1, 2, 2},           {"zero n", {}, 0, 0, 0},
        {"terminator", {0x41, 0}, 5, 1, 1},           {"whole", {0x41, 0xE9, 0x4E2D, 0x1F600, 0}, kAll, 5, 10},
        {"110000", {0x110000, 0x41, 0}, kAll, 3, 0},  {"110001", {0x41, 0x110001, 0x41, 0}, kAll, 1, 1},
        {"largest", {0xFFFFFFFF, 0}, kAll - 1, 0, 0},
    };
    support::GuardedMemory memory;
    for (const Row& row : rows) {
        const ulong32* text = memory.Place(row.text.data(), row.text.size());
        EXPECT_EQ(UTF32wstrlen(text, row.n), row.units) << row.name;
        EXPECT_EQ(UTF32u16strlen(text, row.n), row.units) << row.name;
        EXPECT_EQ(UTF32u8strlen(text, row.n), row.bytes) << row.name;
    }
}

TEST(TranscodingCounts, NullCountsZero) {
    for (std::size_t n : {std::size_t(0), kAll})
        for (std::size_t count : {UTF8w32strlen(nullptr, n), UTF8u16strlen(nullptr, n), UTF16w32strlen(nullptr, n),
                                  acfWw32strlen(nullptr, n), acfWu8strlen(nullptr, n), UTF16wstrlen(nullptr, n),
                                  UTF32wstrlen(nullptr, n), UTF32u8strlen(nullptr, n),
                                  UTF8_To_acfWChar(nullptr, n, nullptr, 0), acfWChar_To_UTF8(nullptr, n, nullptr, 0)})
            EXPECT_EQ(count, 0u);
}

TEST(TranscodingCounts, UnitScanSurvivesUnreadableMemory) {
    support::GuardedMemory memory;
    const Units text(6000, 'x'); // several pages, no terminator
    const unsigned short* const at = memory.Place(text.data(), text.size());
    EXPECT_EQ(UTF16wstrlen(at, kAll), 0u);
    EXPECT_EQ(UTF16wstrlen(at, text.size() + 1), 0u);
    EXPECT_EQ(UTF16wstrlen(at, text.size()), text.size());
    EXPECT_EQ(acfWu16strlen(reinterpret_cast<const wchar_t*>(memory.End()), 1), 0u);
    EXPECT_EQ(acfWu16strlen(reinterpret_cast<const wchar_t*>(16), kAll), 0u);
}

// ASCII only, since the code page is the machine's.
TEST(TranscodingAnsi, FollowsTheSystemsProtocol) {
    struct Row {
        std::size_t length, capacity, result;
    };
    for (const Row& row : {Row{kAll, 0, 4}, Row{kAll, 8, 4}, Row{kAll, 3, 0}, Row{0, 8, 0}, Row{kAll, kAll, 0},
                           Row{2, 8, 2}, Row{0x100000002, 8, 2}, Row{0x80000000, 8, 4}}) {
        wchar_t wide[8] = L"#######";
        char narrow[8] = "#######";
        EXPECT_EQ(OS::ANSI_To_acfWChar("abc", row.length, wide, row.capacity), row.result) << row.length;
        EXPECT_EQ(OS::acfWChar_To_ANSI(L"abc", row.length, narrow, row.capacity), row.result) << row.length;
        if (row.result != 2) continue;
        EXPECT_STREQ(wide, L"ab#####");
        EXPECT_STREQ(narrow, "ab#####");
    }
}

} // namespace
