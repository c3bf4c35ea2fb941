// Transcoding against a slow reading of its rules: single characters, counts, whole texts, and what is never touched,
// whatever the processor offers.

#include "simd.h"
#include "support/guardpage.h"
#include "support/texts.h"

#include <array>
#include <gtest/gtest.h>

namespace {

using namespace support;
using namespace TAVO::String;
using TAVO::ulong32;
using Numbers = std::vector<ulong32>;

constexpr std::size_t kAll = SIZE_MAX;

std::size_t TargetSize(const Bytes&, ulong32 value) { return value < 0x10000 ? 1 : 2; }
std::size_t TargetSize(const Units16&, ulong32 value) { return Encoded8(value).size(); }

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
        const Character c = LookAt(text, i, std::min(n, text.size() - 1)); // the terminator cuts as n does
        if (c.look == Look::Ended) break;
        if (c.look != Look::Good || c.value > 0x10FFFF) return {0, written};
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

// Intended: utf16-size-limit
TEST(TranscodingSizes, FollowTheirTables) {
    for (ulong32 value = 0; value <= 0x110001; ++value) {
        ASSERT_EQ(UTF8Size(value), value < 0x110000 ? Encoded8(value).size() : 0) << value;
        ASSERT_EQ(UTF16Size(value), value <= 0x110000 ? Encoded16(value).size() : 0) << value;
        ASSERT_EQ(acfWSize(value), Encoded16(value).size()) << value;
    }
    for (unsigned unit = 0; unit < 0x10000; ++unit) {
        ASSERT_EQ(UTF16Len(static_cast<unsigned short>(unit)), unit / 0x400 == 0x36 ? 2 : unit / 0x400 == 0x37 ? 0 : 1);
        ASSERT_EQ(acfWLen(static_cast<wchar_t>(unit)), 1u) << unit;
        ASSERT_EQ(UTF8Len(static_cast<unsigned char>(unit)), LeadLength(unit % 0x100)) << unit;
    }
}

// Intended: utf8-sync
TEST(TranscodingSync, Utf8SkipsLeadsAndNotContinuations_Intended) {
    const unsigned char text[] = {0xC3, 0xDF, 0xA9, 'a', 0}, longer[] = {0xE0, 0};
    const unsigned short units[] = {0xDC00, 0xDFFF, 0xE000, 0};
    const wchar_t wides[] = {0xDC00, 0xDBFF, 0};
    const unsigned char *at = text, *atLonger = longer;
    const unsigned short* unit = units;
    const wchar_t* wide = wides;
    for (int i = 0; i < 2; ++i) UTF8Sync(at), UTF8Sync(atLonger), UTF16Sync(unit), acfWSync(wide);
    EXPECT_TRUE(at == text + 2 && atLonger == longer) << "a continuation byte stays";
    EXPECT_TRUE(unit == units + 2 && wide == wides + 1);
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
    EXPECT_TRUE(std::vector<Unit>(target, out) == As<Unit>(expected) && *out == 7);
}
// A step that gives a number, as one that writes it.
template <class Source, bool (*kStep)(ulong32*, const Source*&)> bool Number(ulong32*& out, const Source*& in) {
    *out = 0xABCD;
    const bool good = kStep(out, in);
    ++out;
    return good;
}

TEST(TranscodingStep, Utf8IsTakenAsItIs_Intended) {
    using Row = std::tuple<const char*, Bytes, bool, ulong32, std::ptrdiff_t>; // good, its value, bytes moved
    for (const auto& [name, bytes, good, value, moved] :
         {Row{"terminator", {}, true, 0, 1}, Row{"overlong zero", {0xC0, 0x80}, true, 0, 2},
          Row{"beyond 10FFFF", {0xF4, 0xBF, 0xBF, 0xBF}, true, 0x13FFFF, 4},
          Row{"no lead", {0xF5, 0x80, 0x80, 0x80}, false, 0, 0}, Row{"broken", {0xE4, 'a', 0x80}, false, 0x4000, 1},
          Row{"cut", {0xF0, 0x9F, 0x98}, false, 0x1F600, 3}, Row{"cut at once", {0xF3}, false, 0xC0000, 1}}) {
        SCOPED_TRACE(name);
        const Bytes text = Terminated(bytes);
        const bool encodes = good && value <= 0x10FFFF;
        const Units16 expected = encodes ? Encoded16(value) : Units16();
        ExpectStep(Number<unsigned char, utf8_acfW32>, text, good, moved, Numbers{value});
        ExpectStep(utf8_utf16, text, encodes, moved, expected);
        ExpectStep(utf8_acfW, text, encodes, moved, expected);
    }
}

// Intended: pair-value, pair-second-unit
TEST(TranscodingStep, Utf16PairsDecodeToZeroOrOne_Intended) {
    constexpr unsigned short kCorners[] = {0,      0x41,   0x7F,   0x80,   0x7FF,  0x800,  0xD7FF, 0xD800, 0xD83D,
                                           0xDBFE, 0xDBFF, 0xDC00, 0xDE00, 0xDFFF, 0xE000, 0xFC00, 0xFFFF};
    for (const unsigned short first : kCorners)
        for (const unsigned short second : kCorners) {
            SCOPED_TRACE(testing::Message() << first << " " << second);
            const Units16 text = first ? Terminated(Units16{first, second}) : Units16{0};
            const auto wide = As<wchar_t>(text);
            const Character c = first ? LookAt(text, 0, kAll) : Character{Look::Good, 1, 0};
            const bool good = c.look == Look::Good;
            const auto moved = static_cast<std::ptrdiff_t>(c.units);
            const Numbers number{good ? c.value : 0xABCD};
            ExpectStep(Number<unsigned short, utf16_acfW32>, text, good, moved, number);
            ExpectStep(Number<wchar_t, acfW_acfW32>, wide, good, moved, number);
            ExpectStep(utf16_utf8, text, good, moved, good ? Encoded8(c.value) : Bytes());
            ExpectStep(acfW_utf8, wide, good, moved, good ? Encoded8(c.value) : Bytes());
            ExpectStep(acfW_utf16, wide, good, moved, good ? Encoded16(c.value) : Units16());
            ExpectStep(utf16_acfW, text, true, 1, Units16{first});
        }
}

template <class Unit, bool (*kStep)(Unit*&, ulong32)> bool Encode(Unit*& out, const ulong32*& in) {
    return kStep(out, *in++);
}

// Intended: pair-offset
TEST(TranscodingStep, EncodesWithoutTheOffset_Intended) {
    for (ulong32 value : {0x0u, 0x7Fu, 0x80u, 0x7FFu, 0x800u, 0xD800u, 0xDFFFu, 0xFFFFu, 0x10000u, 0x1F600u, 0xFFFFFu,
                          0x100000u, 0x10FFFFu, 0x110000u, 0xFFFFFFFFu}) {
        SCOPED_TRACE(value);
        const bool good = value <= 0x10FFFF;
        const Units16 units = good ? Encoded16(value) : Units16();
        ExpectStep(Encode<unsigned char, acfW32_utf8>, Numbers{value}, good, 1, good ? Encoded8(value) : Bytes());
        ExpectStep(Encode<unsigned short, acfW32_utf16>, Numbers{value}, good, 1, units);
        ExpectStep(Encode<wchar_t, acfW32_acfW>, Numbers{value}, good, 1, units);
    }
    EXPECT_EQ(Encoded16(0x10000), (Units16{0xD840, 0xDC00}));
    EXPECT_EQ(Encoded16(0x10FFFF), (Units16{0xDC3F, 0xDFFF})) << "begins with a low surrogate";
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
        return m_source.Place(text.data(), std::min(n, text.size()));
    }

    void Expect(const Bytes& text, std::size_t n) {
        const auto [characters, units] = Count(text, n);
        const unsigned char* const source = Place(text, n);
        ASSERT_EQ(UTF8w32strlen(source, n), characters);
        ASSERT_TRUE(UTF8u16strlen(source, n) == units && UTF8wstrlen(source, n) == units);
        ExpectConversion(UTF8_To_acfWChar, source, n, units + 1, Convert<Units16>(text, n, Encoded16));
    }
    void Expect(const Units16& text, std::size_t n) {
        const auto [characters, bytes] = Count(text, n);
        const std::size_t visible = std::min(n, text.size() - 1);
        const unsigned short* const source = Place(text, n);
        ASSERT_TRUE(UTF16w32strlen(source, n) == characters && UTF16u8strlen(source, n) == bytes);
        ASSERT_EQ(UTF16wstrlen(source, n), visible);
        const wchar_t* const wide = Place(As<wchar_t>(text), n);
        ASSERT_TRUE(acfWw32strlen(wide, n) == characters && acfWu8strlen(wide, n) == bytes);
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

    void TearDown() override { TAVO::Simd::g_hideLines = false; }

    support::GuardedMemory m_source;
};

// Invalid text is cut, or refused with what was written left in place, as Convert tells.
// Intended: cut-or-fail
TEST_F(Differential, RandomTextsAtEveryBound_Intended) {
    support::TextSource source(1);
    for (std::uint32_t i = 0; i < 1600 && !HasFatalFailure(); ++i) {
        SCOPED_TRACE(i);
        TAVO::Simd::g_hideLines = i % 2;
        ExpectAtBounds(Terminated(source.Utf8(source.Below(i % 9 ? 90 : 600))));
        ExpectAtBounds(Terminated(source.Utf16(source.Below(i % 9 ? 60 : 600))));
    }
}

TEST_F(Differential, LongTextsSumUp) {
    Bytes text;
    for (int i = 0; i < 5000; ++i) text.insert(text.end(), {'a', 0xC3, 0xA9, 0xE4, 0xB8, 0xAD, 0xF0, 0x9F, 0x98, 0x80});
    for (const Bytes& bytes : {text, Bytes(50000, 'x')}) Expect(Terminated(bytes), kAll);
    for (const int unit : {0x78, 0xE9, 0x4E2D})
        Expect(Terminated(Units16(40000, static_cast<unsigned short>(unit))), kAll);
}

// Texts are measured by pieces, and any character may lie across their ends, or the end of the text there.
TEST_F(Differential, CharactersLieAcrossPieces_Intended) {
    constexpr std::size_t kPiece = 1 << 15;
    const std::vector<Bytes> bytes = {
        {'a'},        {0xC3, 0xA9},       {0xE4, 0xB8, 0xAD},      {0xF0, 0x9F, 0x98, 0x80},
        {0xC3, 'a'},  {0xE4, 0xB8, 'a'},  {0xF0, 0x9F, 0x98, 'a'}, {0x80},
        {0xE4, 0xB8}, {0xF0, 0x9F, 0x98}, {0xF4, 0x90, 0x80, 0x80}};
    const std::vector<Units16> units = {{'a'}, {0xE9}, {0xD83D, 0xDE00}, {0xD83D, 'a'}, {0xDE00}, {0xD83D}};
    const auto expectAround = [this](const auto& head, const auto& tails) {
        for (std::size_t before = kPiece - 4; before <= kPiece; ++before)
            for (const auto& tail : tails) {
                auto text = head;
                text.resize(before, 'x');
                text.insert(text.end(), tail.begin(), tail.end());
                const std::size_t size = text.size();
                text.insert(text.end(), {'y', 0});
                for (const std::size_t n : {kAll, size, size - 1})
                    if (!HasFatalFailure()) Expect(text, n);
            }
    };
    expectAround(Bytes{0xC3, 0xA9}, bytes);
    expectAround(Bytes{}, bytes);
    expectAround(Units16{0xE9}, units);
    // What is invalid ends the text, however much follows.
    Bytes brokenBytes(2 * kPiece, 'x');
    Units16 brokenUnits(2 * kPiece, 'x');
    brokenBytes[100] = 0x80;
    brokenUnits[100] = 0xDE00;
    Expect(Terminated(brokenBytes), kAll);
    Expect(Terminated(brokenUnits), kAll);
}

// Intended: utf32-bound
TEST(TranscodingCounts, Utf32IncludesIndexN_Intended) {
    using Row = std::tuple<Numbers, std::size_t, std::size_t, std::size_t>; // bound, units, bytes
    support::GuardedMemory memory;
    for (const auto& [numbers, n, units, bytes] :
         {Row{{0x41, 0x42}, 1, 2, 2}, Row{{0x41, 0xE9, 0x4E2D, 0x1F600, 0}, kAll, 5, 10},
          Row{{0x110000, 0x41, 0}, kAll, 3, 0}, Row{{0x41, 0x110001, 0x41, 0}, kAll, 1, 1}}) {
        const ulong32* text = memory.Place(numbers.data(), numbers.size()); // nothing behind them is readable
        EXPECT_TRUE(UTF32wstrlen(text, n) == units && UTF32u16strlen(text, n) == units) << n;
        EXPECT_EQ(UTF32u8strlen(text, n), bytes) << n;
    }
}

TEST(TranscodingCounts, UnitScanSurvivesUnreadableMemory) {
    support::GuardedMemory memory;
    const Units16 text(6000, 'x'); // several pages, no terminator
    const unsigned short* const at = memory.Place(text.data(), text.size());
    EXPECT_EQ(UTF16wstrlen(at, kAll), 0u);
    EXPECT_EQ(UTF16wstrlen(at, text.size() + 1), 0u);
    EXPECT_EQ(acfWu16strlen(reinterpret_cast<const wchar_t*>(memory.End()), 1), 0u);
    EXPECT_EQ(acfWu16strlen(reinterpret_cast<const wchar_t*>(16), kAll), 0u);
}

TEST(TranscodingAnsi, FollowsTheSystemsProtocol) {
    using Row = std::array<std::size_t, 3>; // length, capacity, result
    for (const auto& [length, capacity, result] :
         {Row{kAll, 0, 4}, Row{kAll, 8, 4}, Row{kAll, 3, 0}, Row{0, 8, 0}, Row{kAll, kAll, 0}, Row{2, 8, 2},
          Row{0x100000002, 8, 2}, Row{0x80000000, 8, 4}}) {
        wchar_t wide[8] = L"#######";
        char narrow[8] = "#######";
        EXPECT_EQ(OS::ANSI_To_acfWChar("abc", length, wide, capacity), result) << length;
        EXPECT_EQ(OS::acfWChar_To_ANSI(L"abc", length, narrow, capacity), result) << length;
        EXPECT_TRUE(result != 2 || (wide[2] == '#' && narrow[2] == '#' && wide[1] == 'b' && narrow[1] == 'b'));
    }
}

} // namespace
