// Transcoding against a slow reading of its rules: single characters, counts, whole texts, and what is never touched.

#include "support/guardpage.h"
#include "support/texts.h"

#include <gtest/gtest.h>
#include <optional>
#include <string>
#include <TAVO/string.h>

namespace {

using namespace TAVO::String;
using support::Bytes;
using support::Units;
using TAVO::ulong32;
using Wides = std::vector<wchar_t>;

constexpr std::size_t kAll = SIZE_MAX;

// --- The rules, read slowly ----------------------------------------------------------------------------------------

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
    Bytes tail;
    if (value < 0x80) return {static_cast<unsigned char>(value)};
    const unsigned trail = value < 0x800 ? 1 : value < 0x10000 ? 2 : 3;
    Bytes bytes(trail + 1);
    for (unsigned k = trail; k; --k, value /= 0x40) bytes[k] = static_cast<unsigned char>(0x80 + value % 0x40);
    bytes[0] = static_cast<unsigned char>(value + (trail == 1 ? 0xC0 : trail == 2 ? 0xE0 : 0xF0));
    return bytes;
}
std::size_t TargetSize(const Bytes&, ulong32 value) { return value < 0x10000 ? 1 : 2; }
std::size_t TargetSize(const Units&, ulong32 value) { return Encoded8(value).size(); }

struct Counts {
    std::size_t characters = 0, target = 0;
};
template <class Text> Counts Count(const Text& text, std::size_t n) {
    Counts counts;
    for (std::size_t i = 0;;) {
        const Character c = LookAt(text, i, n);
        if (c.look != Look::Good) return counts;
        i += c.units;
        ++counts.characters;
        counts.target += TargetSize(text, c.value);
    }
}

// What a whole-string converter leaves: its result, and the target units written (terminator included when there is
// one).
template <class Target> struct Conversion {
    std::size_t result;
    Target written;
};
template <class Target, class Text, class Encode>
Conversion<Target> Convert(const Text& text, std::size_t n, Encode encode) {
    const std::size_t need = Count(text, n).target + 1;
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
Wides Wide(const Units& units) { return Wides(units.begin(), units.end()); }

// --- Single characters ---------------------------------------------------------------------------------------------

TEST(TranscodingSizes, FollowTheirTables) {
    struct Row {
        ulong32 value;
        std::size_t utf8, utf16, wide;
    };
    for (const Row& row :
         {Row{0, 1, 1, 1}, Row{0x7F, 1, 1, 1}, Row{0x80, 2, 1, 1}, Row{0x7FF, 2, 1, 1}, Row{0x800, 3, 1, 1},
          Row{0xFFFF, 3, 1, 1}, Row{0x10000, 4, 2, 2}, Row{0x10FFFF, 4, 2, 2}, Row{0x110000, 0, 2, 2},
          Row{0x110001, 0, 0, 2}, Row{0x7FFFFFFF, 0, 0, 2}, Row{0xFFFFFFFF, 0, 0, 2}}) {
        EXPECT_EQ(UTF8Size(row.value), row.utf8) << row.value;
        EXPECT_EQ(UTF16Size(row.value), row.utf16) << row.value;
        EXPECT_EQ(acfWSize(row.value), row.wide) << row.value;
    }
    for (unsigned lead = 0; lead < 256; ++lead)
        EXPECT_EQ(UTF8Len(static_cast<unsigned char>(lead)), LeadLength(lead)) << lead;
    for (unsigned unit = 0; unit < 0x10000; ++unit) {
        const std::size_t expected = unit < 0xD800 || unit > 0xDFFF ? 1 : unit < 0xDC00 ? 2 : 0;
        ASSERT_EQ(UTF16Len(static_cast<unsigned short>(unit)), expected) << unit;
        ASSERT_EQ(acfWLen(static_cast<wchar_t>(unit)), 1u) << unit;
    }
}

TEST(TranscodingSync, Utf8SkipsLeadsAndNotContinuations_Intended) {
    const unsigned char text[] = {0xC3, 0xDF, 0xA9, 'a', 0};
    const unsigned char* at = text;
    UTF8Sync(at);
    EXPECT_EQ(at, text + 2);
    UTF8Sync(at);
    EXPECT_EQ(at, text + 2) << "a continuation byte stays";
    const unsigned char longer[] = {0xE0, 0};
    at = longer;
    UTF8Sync(at);
    EXPECT_EQ(at, longer);
}

TEST(TranscodingSync, Utf16SkipsLowSurrogates) {
    const unsigned short units[] = {0xDC00, 0xDFFF, 0xE000, 0};
    const unsigned short* at = units;
    UTF16Sync(at);
    EXPECT_EQ(at, units + 2);
    const wchar_t wides[] = {0xDC00, 0xDBFF, 0};
    const wchar_t* wide = wides;
    acfWSync(wide);
    EXPECT_EQ(wide, wides + 1);
}

TEST(TranscodingStep, Utf8Decodes) {
    struct Row {
        const char* name;
        Bytes bytes;
        bool good;
        ulong32 value;
        std::ptrdiff_t moved;
    };
    const Row rows[] = {
        {"terminator", {}, true, 0, 1},
        {"ascii", {'a'}, true, 'a', 1},
        {"two", {0xC3, 0xA9}, true, 0xE9, 2},
        {"three", {0xE4, 0xB8, 0xAD}, true, 0x4E2D, 3},
        {"four", {0xF0, 0x9F, 0x98, 0x80}, true, 0x1F600, 4},
        {"overlong zero", {0xC0, 0x80}, true, 0, 2},
        {"overlong letter", {0xC1, 0x81}, true, 'A', 2},
        {"overlong three", {0xE0, 0x80, 0x80}, true, 0, 3},
        {"surrogate", {0xED, 0xA0, 0x80}, true, 0xD800, 3},
        {"beyond 10FFFF", {0xF4, 0xBF, 0xBF, 0xBF}, true, 0x13FFFF, 4},
        {"lone continuation", {0x80}, false, 0, 0},
        {"no lead", {0xF5, 0x80, 0x80, 0x80}, false, 0, 0},
        {"ff", {0xFF}, false, 0, 0},
        {"two cut", {0xC3}, false, 0xC0, 1},
        {"three cut", {0xE4, 0xB8}, false, 0x4E00, 2},
        {"three broken", {0xE4, 'a', 0x80}, false, 0x4000, 1},
        {"four cut", {0xF0, 0x9F, 0x98}, false, 0x1F600, 3},
        {"four at once", {0xF3}, false, 0xC0000, 1},
    };
    support::GuardedMemory memory;
    for (const Row& row : rows) {
        const Bytes text = Terminated(row.bytes);
        const unsigned char* const begin = memory.Place(text.data(), text.size());
        const unsigned char* in = begin;
        ulong32 value = 0xABCD;
        EXPECT_EQ(utf8_acfW32(&value, in), row.good) << row.name;
        EXPECT_EQ(value, row.value) << row.name;
        EXPECT_EQ(in - begin, row.moved) << row.name;

        unsigned short units[3] = {7, 7, 7};
        unsigned short* out = units;
        wchar_t wides[3] = {7, 7, 7};
        wchar_t* wideOut = wides;
        const unsigned char* again = begin;
        in = begin;
        const bool encodes = row.good && row.value <= 0x10FFFF;
        EXPECT_EQ(utf8_utf16(out, in), encodes) << row.name;
        EXPECT_EQ(utf8_acfW(wideOut, again), encodes) << row.name;
        EXPECT_EQ(in - begin, row.moved) << row.name;
        EXPECT_EQ(again, in) << row.name;
        const Units expected = encodes ? Encoded16(row.value) : Units();
        EXPECT_EQ(Units(units, out), expected) << row.name;
        EXPECT_EQ(Wides(wides, wideOut), Wide(expected)) << row.name;
        EXPECT_EQ(*out, 7) << row.name;
    }
}

TEST(TranscodingStep, Utf16PairsDecodeToZeroOrOne_Intended) {
    struct Row {
        const char* name;
        Units units;
        std::optional<ulong32> value;
        std::ptrdiff_t moved;
    };
    const Row rows[] = {
        {"unit", {0x41}, 0x41, 1},
        {"terminator", {}, 0, 1},
        {"above", {0xE000}, 0xE000, 1},
        {"first pair", {0xD800, 0xDC00}, 0, 2},
        {"pair", {0xD83D, 0xDE00}, 1, 2},
        {"E000 as second", {0xD800, 0xE000}, 0, 2},
        {"FC00 as second", {0xD800, 0xFC00}, 0, 2},
        {"DBFF as second", {0xD800, 0xDBFF}, 1, 2},
        {"DBFF first", {0xDBFF, 0xDC00}, 1, 2},
        {"FFFF as second", {0xD800, 0xFFFF}, 1, 2},
        {"DBFE as second", {0xD800, 0xDBFE}, std::nullopt, 0},
        {"letter as second", {0xD800, 0x41}, std::nullopt, 0},
        {"high at the end", {0xD800}, std::nullopt, 0},
        {"low", {0xDC00, 0xDC00}, std::nullopt, 0},
        {"last low", {0xDFFF}, std::nullopt, 0},
    };
    support::GuardedMemory memory;
    for (const Row& row : rows) {
        const Units text = Terminated(row.units);
        const unsigned short* const begin = memory.Place(text.data(), text.size());
        const unsigned short* in = begin;
        const Wides wide = Wide(text);
        const wchar_t* wideIn = wide.data();
        ulong32 value = 0xABCD, wideValue = 0xABCD;
        EXPECT_EQ(utf16_acfW32(&value, in), row.value.has_value()) << row.name;
        EXPECT_EQ(acfW_acfW32(&wideValue, wideIn), row.value.has_value()) << row.name;
        EXPECT_EQ(value, row.value.value_or(0xABCD)) << row.name;
        EXPECT_EQ(wideValue, value) << row.name;
        EXPECT_EQ(in - begin, row.moved) << row.name;
        EXPECT_EQ(wideIn - wide.data(), row.moved) << row.name;

        unsigned char bytes[8] = {7, 7, 7, 7, 7, 7, 7, 7}, wideBytes[8] = {7, 7, 7, 7, 7, 7, 7, 7};
        unsigned char *out = bytes, *wideOut = wideBytes;
        in = begin, wideIn = wide.data();
        EXPECT_EQ(utf16_utf8(out, in), row.value.has_value()) << row.name;
        EXPECT_EQ(acfW_utf8(wideOut, wideIn), row.value.has_value()) << row.name;
        EXPECT_EQ(in - begin, row.moved) << row.name;
        const Bytes expected = row.value ? Encoded8(*row.value) : Bytes();
        EXPECT_EQ(Bytes(bytes, out), expected) << row.name;
        EXPECT_EQ(Bytes(wideBytes, wideOut), expected) << row.name;
        EXPECT_EQ(*out, 7) << row.name;

        unsigned short unit[2] = {7, 7};
        unsigned short* unitOut = unit;
        wideIn = wide.data();
        EXPECT_EQ(acfW_utf16(unitOut, wideIn), row.value.has_value()) << row.name;
        EXPECT_EQ(unit[0], row.value.value_or(7)) << row.name;
        EXPECT_EQ(unitOut - unit, row.value ? 1 : 0) << row.name;
        EXPECT_EQ(wideIn - wide.data(), row.moved) << row.name;

        wchar_t copy[2] = {7, 7};
        wchar_t* copyOut = copy;
        in = begin;
        EXPECT_TRUE(utf16_acfW(copyOut, in)) << row.name;
        EXPECT_EQ(copy[0], static_cast<wchar_t>(text[0])) << row.name;
        EXPECT_EQ(copyOut - copy, 1);
        EXPECT_EQ(in - begin, 1);
    }
}

TEST(TranscodingStep, EncodesWithoutTheOffset_Intended) {
    for (ulong32 value : {0x0u, 0x7Fu, 0x80u, 0x7FFu, 0x800u, 0xD800u, 0xDFFFu, 0xFFFFu, 0x10000u, 0x1F600u, 0xFFFFFu,
                          0x100000u, 0x10FFFFu, 0x110000u, 0xFFFFFFFFu}) {
        const bool good = value <= 0x10FFFF;
        unsigned char bytes[5] = {7, 7, 7, 7, 7};
        unsigned char* out = bytes;
        EXPECT_EQ(acfW32_utf8(out, value), good) << value;
        EXPECT_EQ(Bytes(bytes, out), good ? Encoded8(value) : Bytes()) << value;
        EXPECT_EQ(*out, 7) << value;
        unsigned short units[3] = {7, 7, 7};
        unsigned short* unitOut = units;
        wchar_t wides[3] = {7, 7, 7};
        wchar_t* wideOut = wides;
        EXPECT_EQ(acfW32_utf16(unitOut, value), good) << value;
        EXPECT_EQ(acfW32_acfW(wideOut, value), good) << value;
        EXPECT_EQ(Units(units, unitOut), good ? Encoded16(value) : Units()) << value;
        EXPECT_EQ(Wides(wides, wideOut), Wide(good ? Encoded16(value) : Units())) << value;
        EXPECT_EQ(*unitOut, 7) << value;
    }
    EXPECT_EQ(Encoded16(0x10000), (Units{0xD840, 0xDC00}));
    EXPECT_EQ(Encoded16(0x1F600), (Units{0xD87D, 0xDE00}));
    EXPECT_EQ(Encoded16(0x10FFFF), (Units{0xDC3F, 0xDFFF})) << "begins with a low surrogate";
}

// --- Counts and whole texts ----------------------------------------------------------------------------------------

constexpr unsigned char kFill8 = 0xEE;
constexpr wchar_t kFill16 = 0xEEEE;

// Runs a whole-string converter at its three capacities; the target ends where nothing more may be written.
template <class Unit, class Source, class Function>
void ExpectConversion(const support::GuardedMemory& memory, Function function, const Source* source, std::size_t n,
                      std::size_t need, const Conversion<std::vector<Unit>>& expected, Unit fill) {
    ASSERT_EQ(function(source, n, nullptr, 0), need);
    const std::vector<Unit> filled(need + 1, fill);
    Unit* target = memory.Place(filled.data(), need);
    ASSERT_EQ(function(source, n, target, need), expected.result);
    std::vector<Unit> left = expected.written;
    left.resize(need, fill);
    ASSERT_EQ(std::vector<Unit>(target, target + need), left);

    target = memory.Place(filled.data(), need + 1);
    ASSERT_EQ(function(source, n, target, need + 1), expected.result);
    ASSERT_EQ(target[need], fill) << "behind what is needed";

    target = memory.Place(filled.data(), need - 1);
    ASSERT_EQ(function(source, n, target, need - 1), 0u);
    ASSERT_EQ(std::vector<Unit>(target, target + need - 1), std::vector<Unit>(need - 1, fill));
}

class Differential : public testing::Test {
protected:
    // n units at the very end of memory, with the terminator when n reaches it.
    template <class Text> auto* Place(const Text& text, std::size_t n) {
        return m_source.Place(text.data(), n < text.size() ? n : text.size());
    }

    void Expect(const Bytes& text, std::size_t n) {
        const Counts counts = Count(text, n);
        const unsigned char* const source = Place(text, n);
        ASSERT_EQ(UTF8w32strlen(source, n), counts.characters);
        ASSERT_EQ(UTF8u16strlen(source, n), counts.target);
        ASSERT_EQ(UTF8wstrlen(source, n), counts.target);
        auto expected = Convert<Units>(text, n, Encoded16);
        ExpectConversion<wchar_t>(m_target, UTF8_To_acfWChar, source, n, counts.target + 1,
                                  {expected.result, Wide(expected.written)}, kFill16);
    }

    void Expect(const Units& text, std::size_t n) {
        const Counts counts = Count(text, n);
        const unsigned short* const source = Place(text, n);
        ASSERT_EQ(UTF16w32strlen(source, n), counts.characters);
        ASSERT_EQ(UTF16u8strlen(source, n), counts.target);
        ASSERT_EQ(UTF16wstrlen(source, n), n < text.size() - 1 ? n : text.size() - 1);
        const Wides wide = Wide(text);
        const wchar_t* const wideSource = Place(wide, n);
        ASSERT_EQ(acfWw32strlen(wideSource, n), counts.characters);
        ASSERT_EQ(acfWu8strlen(wideSource, n), counts.target);
        ASSERT_EQ(acfWu16strlen(wideSource, n), n < text.size() - 1 ? n : text.size() - 1);
        ExpectConversion<unsigned char>(m_target, acfWChar_To_UTF8, wideSource, n, counts.target + 1,
                                        Convert<Bytes>(text, n, Encoded8), kFill8);
    }

    template <class Text> void ExpectAtBounds(const Text& text) {
        const std::size_t last = text.size() + 1;
        for (std::size_t n = 0; n <= last && !HasFatalFailure(); n += last > 300 && n > 20 && n + 20 < last ? 17 : 1)
            Expect(text, n);
        for (std::size_t n : {kAll, kAll - 1, kAll / 2, kAll / 2 + 1})
            if (!HasFatalFailure()) Expect(text, n);
    }

    support::GuardedMemory m_source, m_target;
};

TEST_F(Differential, RandomUtf8AtEveryBound) {
    support::TextSource source(1);
    for (int i = 0; i < 400 && !HasFatalFailure(); ++i) {
        const std::size_t length = source.Below(i % 10 ? 90 : 600);
        const Bytes text = Terminated(source.Utf8(length));
        SCOPED_TRACE(i);
        ExpectAtBounds(text);
    }
}

TEST_F(Differential, RandomUtf16AtEveryBound) {
    support::TextSource source(2);
    for (int i = 0; i < 400 && !HasFatalFailure(); ++i) {
        const std::size_t length = source.Below(i % 10 ? 60 : 600);
        const Units text = Terminated(source.Utf16(length));
        SCOPED_TRACE(i);
        ExpectAtBounds(text);
    }
}

// One odd sequence at every place of a text whose other characters have one length: all block and run borders.
TEST_F(Differential, OddSequencesAtEveryPlace) {
    const Bytes fillers8[] = {{'a'}, {0xC3, 0xA9}, {0xE4, 0xB8, 0xAD}, {0xF0, 0x9F, 0x98, 0x80}};
    const Bytes odd8[] = {{'b'},
                          {0xC3, 0xA9},
                          {0xE4, 0xB8, 0xAD},
                          {0xF0, 0x90, 0x80, 0x80},
                          {0xF0, 0x8F, 0xBF, 0xBF},
                          {0xC3},
                          {0xE4, 0xB8},
                          {0xF0, 0x9F, 0x98},
                          {0xF4, 0x90, 0x80, 0x80},
                          {0xF4, 0x8F, 0xBF, 0xBF},
                          {0x80},
                          {0xF5},
                          {0xF8, 0x80, 0x80, 0x80, 0x80}};
    for (const Bytes& filler : fillers8)
        for (const Bytes& odd : odd8)
            for (std::size_t before = 0; before < 70 && !HasFatalFailure(); ++before) {
                Bytes text;
                for (std::size_t i = 0; i < before; ++i) text.insert(text.end(), filler.begin(), filler.end());
                text.insert(text.end(), odd.begin(), odd.end());
                for (std::size_t i = 0; i < 70; ++i) text.insert(text.end(), filler.begin(), filler.end());
                Expect(Terminated(text), kAll);
                text.resize(before * filler.size() + odd.size());
                Expect(Terminated(text), kAll);
            }
    const Units fillers16[] = {{'a'}, {0xE9}, {0x4E2D}, {0xD83D, 0xDE00}};
    const Units odd16[] = {{'b'},    {0x7FF},  {0xFFFF},        {0xD800, 0xDBFF}, {0xD800, 0xDC00},
                           {0xD800}, {0xDC00}, {0xD800, 0xDBFE}};
    for (const Units& filler : fillers16)
        for (const Units& odd : odd16)
            for (std::size_t before = 0; before < 40 && !HasFatalFailure(); ++before) {
                Units text;
                for (std::size_t i = 0; i < before; ++i) text.insert(text.end(), filler.begin(), filler.end());
                text.insert(text.end(), odd.begin(), odd.end());
                for (std::size_t i = 0; i < 40; ++i) text.insert(text.end(), filler.begin(), filler.end());
                Expect(Terminated(text), kAll);
                text.resize(before * filler.size() + odd.size());
                Expect(Terminated(text), kAll);
            }
}

TEST_F(Differential, LongTextsSumUp) {
    support::TextSource source(3);
    for (int i = 0; i < 3; ++i) {
        Bytes text;
        while (text.size() < 50000) {
            const Bytes more = source.Utf8(1000);
            Bytes whole = Terminated(more);
            if (Convert<Units>(whole, kAll, Encoded16).result == Count(whole, kAll).target + 1)
                text.insert(text.end(), more.begin(), more.end());
        }
        Expect(Terminated(text), kAll);
    }
    Expect(Terminated(Units(40000, 'x')), kAll);
    Expect(Terminated(Units(40000, 0x4E2D)), kAll);
}

TEST(TranscodingWhole, InvalidTextIsCutOrRefused_Intended) {
    struct Row {
        const char* name;
        Units source;
        std::size_t length, result;
        Bytes left;
    };
    const Row rows[] = {
        {"two bytes", {0xE9}, kAll, 3, {0xC3, 0xA9, 0}},
        {"invalid behind two bytes", {0xE9, 0xDC00}, kAll, 0, {0xC3, 0xA9}},
        {"invalid behind one byte", {0x65, 0xDC00}, kAll, 2, {0x65, 0}},
        {"bound ends it", {0xE9, 0x41, 0x42}, 1, 3, {0xC3, 0xA9, 0}},
        {"bound before the invalid", {0xE9, 0xDC00}, 1, 3, {0xC3, 0xA9, 0}},
        {"bound cuts a pair", {0xE9, 0xD800, 0xDC00}, 2, 3, {0xC3, 0xA9, 0}},
        {"terminator cuts a pair", {0xE9, 0xD800}, kAll, 0, {0xC3, 0xA9}},
        {"pair", {0xD83D, 0xDE00}, kAll, 2, {1, 0}},
        {"invalid behind a pair", {0xD83D, 0xDE00, 0xDC00}, kAll, 2, {1, 0}},
        {"zero inside", {0xD800, 0xDC00, 0x41}, kAll, 3, {0, 0x41, 0}},
        {"empty", {}, kAll, 1, {0}},
    };
    for (const Row& row : rows) {
        const Wides text = Wide(Terminated(row.source));
        unsigned char target[8];
        std::memset(target, kFill8, sizeof target);
        EXPECT_EQ(acfWChar_To_UTF8(text.data(), row.length, target, 8), row.result) << row.name;
        Bytes left = row.left;
        left.resize(8, kFill8);
        EXPECT_EQ(Bytes(target, target + 8), left) << row.name;
    }
}

TEST(TranscodingWhole, Utf8IsCutOrRefused_Intended) {
    struct Row {
        const char* name;
        Bytes source;
        std::size_t length, size, result;
        Units left;
    };
    const Row rows[] = {
        {"four bytes", {0xF0, 0x9F, 0x98, 0x80}, kAll, 3, 3, {0xD87D, 0xDE00, 0}},
        {"invalid behind four", {0xF0, 0x9F, 0x98, 0x80, 0x80}, kAll, 3, 0, {0xD87D, 0xDE00}},
        {"invalid behind a letter", {0x41, 0x80, 0x42}, kAll, 2, 2, {0x41, 0}},
        {"beyond 10FFFF", {0xF4, 0x90, 0x80, 0x80}, kAll, 3, 0, {}},
        {"beyond behind a letter", {0x41, 0xF4, 0x90, 0x80, 0x80, 0x42}, kAll, 5, 0, {0x41}},
        {"bound cuts behind four", {0xF0, 0x9F, 0x98, 0x80, 0xC3, 0xA9}, 5, 3, 3, {0xD87D, 0xDE00, 0}},
        {"terminator cuts behind four", {0xF0, 0x9F, 0x98, 0x80, 0xC3}, kAll, 3, 0, {0xD87D, 0xDE00}},
        {"last code point", {0xF4, 0x8F, 0xBF, 0xBF}, kAll, 3, 3, {0xDC3F, 0xDFFF, 0}},
        {"surrogate", {0xED, 0xA0, 0x80}, kAll, 2, 2, {0xD800, 0}},
        {"zero inside", {0xC0, 0x80, 0x41}, kAll, 3, 3, {0, 0x41, 0}},
        {"empty bound", {0x41}, 0, 1, 1, {0}},
    };
    for (const Row& row : rows) {
        const Bytes text = Terminated(row.source);
        wchar_t target[8];
        for (auto& unit : target) unit = kFill16;
        EXPECT_EQ(UTF8_To_acfWChar(text.data(), row.length, nullptr, 0), row.size) << row.name;
        EXPECT_EQ(UTF8_To_acfWChar(text.data(), row.length, target, 8), row.result) << row.name;
        Units left = row.left;
        left.resize(8, kFill16);
        EXPECT_EQ(Wides(target, target + 8), Wide(left)) << row.name;
    }
}

TEST(TranscodingCounts, Utf32IncludesIndexN_Intended) {
    using Numbers = std::vector<ulong32>;
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
    const unsigned char* bytes = nullptr;
    const unsigned short* units = nullptr;
    const wchar_t* wide = nullptr;
    const ulong32* numbers = nullptr;
    for (std::size_t n : {std::size_t(0), std::size_t(1), kAll}) {
        for (std::size_t count :
             {UTF8w32strlen(bytes, n), UTF8u16strlen(bytes, n), UTF8wstrlen(bytes, n), UTF16w32strlen(units, n),
              acfWw32strlen(wide, n), UTF16u8strlen(units, n), acfWu8strlen(wide, n), UTF16wstrlen(units, n),
              acfWu16strlen(wide, n), UTF32wstrlen(numbers, n), UTF32u16strlen(numbers, n), UTF32u8strlen(numbers, n),
              UTF8_To_acfWChar(nullptr, n, nullptr, 0), acfWChar_To_UTF8(nullptr, n, nullptr, 0),
              OS::ANSI_To_acfWChar(nullptr, n, nullptr, 0), OS::acfWChar_To_ANSI(nullptr, n, nullptr, 0)})
            EXPECT_EQ(count, 0u);
    }
}

TEST(TranscodingCounts, UnitScanSurvivesUnreadableMemory) {
    support::GuardedMemory memory;
    const Units text(6000, 'x'); // several pages, no terminator
    const unsigned short* const at = memory.Place(text.data(), text.size());
    EXPECT_EQ(UTF16wstrlen(at, kAll), 0u);
    EXPECT_EQ(UTF16wstrlen(at, text.size() + 1), 0u);
    EXPECT_EQ(UTF16wstrlen(at, text.size()), text.size());
    const Wides wide = Wide(text);
    const wchar_t* const wideAt = memory.Place(wide.data(), wide.size());
    EXPECT_EQ(acfWu16strlen(wideAt, kAll), 0u);
    EXPECT_EQ(acfWu16strlen(wideAt, wide.size()), wide.size());
    EXPECT_EQ(acfWu16strlen(reinterpret_cast<const wchar_t*>(memory.End()), 1), 0u);
    EXPECT_EQ(acfWu16strlen(reinterpret_cast<const wchar_t*>(memory.End()), 0), 0u);
    EXPECT_EQ(acfWu16strlen(reinterpret_cast<const wchar_t*>(16), kAll), 0u);
}

// --- ANSI: ASCII only, since the code page is the machine's ----------------------------------------------------------

TEST(TranscodingAnsi, FollowsTheSystemsProtocol) {
    wchar_t wide[8];
    EXPECT_EQ(OS::ANSI_To_acfWChar("abc", kAll, nullptr, 0), 4u);
    EXPECT_EQ(OS::ANSI_To_acfWChar("abc", kAll, wide, 8), 4u);
    EXPECT_STREQ(wide, L"abc");
    EXPECT_EQ(OS::ANSI_To_acfWChar("abc", kAll, wide, 3), 0u) << "too small";
    EXPECT_EQ(OS::ANSI_To_acfWChar("abc", 0, wide, 8), 0u);
    EXPECT_EQ(OS::ANSI_To_acfWChar("abc", kAll, wide, kAll), 0u) << "negative capacity";
    wide[2] = L'#';
    EXPECT_EQ(OS::ANSI_To_acfWChar("abc", 2, wide, 8), 2u);
    EXPECT_EQ(wide[2], L'#') << "no terminator converted";
    EXPECT_EQ(OS::ANSI_To_acfWChar("abc", 0x100000002, wide, 8), 2u) << "cut to 32 bits";
    EXPECT_EQ(OS::ANSI_To_acfWChar("abc", 0x80000000, wide, 8), 4u) << "negative";

    char narrow[8];
    EXPECT_EQ(OS::acfWChar_To_ANSI(L"abc", kAll, nullptr, 0), 4u);
    EXPECT_EQ(OS::acfWChar_To_ANSI(L"abc", kAll, narrow, 8), 4u);
    EXPECT_STREQ(narrow, "abc");
    EXPECT_EQ(OS::acfWChar_To_ANSI(L"abc", 0x100000001, narrow, 8), 1u);
    EXPECT_EQ(OS::acfWChar_To_ANSI(L"abc", kAll, narrow, 2), 0u);
    EXPECT_EQ(OS::acfWChar_To_ANSI(L"abc", 0, narrow, 8), 0u);
    EXPECT_EQ(OS::acfWChar_To_ANSI(L"", kAll, narrow, 8), 1u);
}

} // namespace
