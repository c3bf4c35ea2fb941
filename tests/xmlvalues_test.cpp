// Typed values of elements and attributes: their texts, and what is read from texts.

#include "support/heapwatch.h"
#include "support/log.h"
#include "support/texts.h"

#include <algorithm>
#include <bit>
#include <charconv>
#include <climits>
#include <clocale>
#include <cmath>
#include <optional>
#include <TAVO/acf.h>
#include <TAVO/xml.h>

using namespace TAVO;
using namespace TAVO::XML;
using ACF::cacfuid, Math::CRational, String::CPPoolString, support::Bytes, TimeCode::timecode;

namespace {

constexpr tagXMLFLAGMAP kMap[] = {{1, L"read"}, {6, L"write"}, {2, L"half"}, {0, L"none"}, {8, nullptr}, {16, L""}};
constexpr std::size_t kMapCount = std::size(kMap);

std::string Narrow(const CPPoolString& text) { return support::Ascii(text); }

CPXMLObject Element(const CPPoolString& data = nullptr) {
    CPXMLObject element;
    EXPECT_TRUE(element.SetName(L"e") && element.Add(data));
    return element;
}

// Stores a value by each of the six operations and requires the same text of all; that text.
template <class... Value> std::string Stored(const Value&... value) {
    CPXMLObject element = Element(), full = Element(L"x"), parent = Element(), none;
    EXPECT_TRUE(element.Add(value...) && full.Set(value...) && full.AddAttribute(L"a", L"x"));
    const std::string text = Narrow(element.GetData());
    EXPECT_EQ(element.Add(value...), text.empty()) << "data is never appended to";
    EXPECT_EQ(element.AddAttribute(L"a", value...), !text.empty());
    EXPECT_EQ(full.SetAttribute(L"a", value...), !text.empty());
    EXPECT_TRUE(parent.AddTag(L"t", value...).sIndex() == 0 && parent.AddTag(L"u", value...).sIndex() == 1);
    for (const CPPoolString& stored :
         {full.GetData(), element.FindAttribute(L"a"), full.FindAttribute(L"a"), parent.item(1).GetData()})
        EXPECT_EQ(Narrow(stored), text);
    EXPECT_TRUE(parent.SetTag(L"v", value...).sIndex() == 0 && Narrow(parent.FindElementData(L"v")) == text);
    EXPECT_FALSE(element.AddAttribute(L"a", value...) || parent.item(1) || parent.AddTag(L"0", value...) ||
                 parent.AddAttribute(L"0", value...) || none.Add(value...) || none.SetTag(L"t", value...));
    return text;
}

template <class Value> Value Key(const Value& value) { return value; }
cacfuid Key(const _acfUID& value) { return value; }
auto Key(const timecode& value) { return std::pair(static_cast<long long>(value), value.sys()); }

// Texts, and what they read as; nothing for the default.
template <class Value> using Readings = std::initializer_list<std::pair<const wchar_t*, std::optional<Value>>>;

// What all three readers of a type make of them: of an element's data, of the first child's and of an attribute.
template <class Value, class Data, class Child, class Attribute>
void ExpectReadings(const char* type, bool isNumber, const Value& one, Readings<Value> readings, Data data, Child child,
                    Attribute attribute) {
    for (const auto& [text, read] : readings)
        for (const bool mixed : {false, true}) {
            CPXMLObject parent = Element(), holder = Element(text);
            EXPECT_TRUE((!mixed || holder.AddTag(L"child")) && parent.Add(holder) && parent.AddAttribute(L"a", text));
            const Value expected = read.value_or(one);
            // Intended: xml-mixed-numbers
            const auto ofData = Key(mixed && isNumber ? one : expected);
            EXPECT_TRUE(Key(data(parent.item(0), one)) == ofData && Key(child(parent, one)) == ofData &&
                        Key(attribute(parent, one)) == Key(expected))
                << type << ": " << Narrow(text) << (mixed ? ", beside a child" : "");
        }
    const CPXMLObject none, empty = Element();
    for (const CPXMLObject* each : {&none, &empty})
        EXPECT_TRUE(Key(data(*each, one)) == Key(one) && Key(child(*each, one)) == Key(one) &&
                    Key(attribute(*each, one)) == Key(one))
            << type << " of nothing";
}
#define EXPECT_READINGS(Suffix, isNumber, one, ...)                                                                    \
    ExpectReadings(                                                                                                    \
        #Suffix, isNumber, one, {__VA_ARGS__}, [](const CPXMLObject& e, auto d) { return e.GetData##Suffix(d); },      \
        [](const CPXMLObject& e, auto d) { return e.FindElement##Suffix(L"e", d); },                                   \
        [](const CPXMLObject& e, auto d) { return e.FindAttribute##Suffix(L"a", d); })

double ReadDouble(const std::string& text) { return Element(text.c_str()).GetDataDouble(0.25); }

std::uint64_t Bits(double value) { return std::bit_cast<std::uint64_t>(value); }

} // namespace

// --- writing ---------------------------------------------------------------------------------------------------------

TEST(XmlValues, TextsOfValues) {
    using Row = std::pair<std::string, const char*>;
    for (const auto& [stored, text] :
         {Row{Stored(0ULL), "0"}, Row{Stored(std::size_t(0x123456789ABCDEF0)), "123456789abcdef0"},
          Row{Stored(255ULL), "ff"}, Row{Stored(CRational(-30000, 1001)), "-30000/1001"},
          Row{Stored(CRational(1073741823, 1000)) + Stored(CRational(1, 0)), "1073741823/10001/0"},
          Row{Stored(1.5), "3ff8000000000000(1.5)"}, Row{Stored(-0.1f) + Stored(0.0), "bfb99999a0000000(-0.1)0(0)"},
          Row{Stored(-1.7976931348623157e308), "ffefffffffffffff(-1.798e+308)"},
          Row{Stored(true) + Stored(false) + Stored(L"text"), "truefalsetext"},
          Row{Stored(timecode(1, 0, 0, 0, 0)) + Stored(timecode()), "01:00:00:00 {25/1}Hz--:--:--:-- {25/1}Hz"},
          Row{Stored(cacfuid(L"15603cd4-ab81-4d6f-b05f-c6bea760a789")), "15603CD4-AB81-4D6F-B05F-C6BEA760A789"},
          Row{Stored(_acfUID{}), "00000000-0000-0000-0000-000000000000"}, Row{Stored(CPPoolString(-5)), "-5"}})
        EXPECT_EQ(stored, text);
}

// Which arguments compile.
template <class... Value>
concept Fits = requires(CPXMLObject e, Value... value) {
    e.Add(value...), e.AddTag(L"t", value...), e.AddAttribute(L"a", value...);
};
template <class... Values> constexpr bool kNoneFits = (!Fits<Values> && ...);
static_assert(kNoneFits<int, unsigned, long, short, char, wchar_t, signed char, long long, char16_t, long double>);
static_assert(Fits<unsigned long> == (sizeof(long) == 8), "32 bits on one system, never two meanings");
static_assert(kNoneFits<void*, const int*, CRational*, const unsigned short*> && !Fits<const wchar_t*, int>);
static_assert(Fits<const char*> && Fits<const unsigned char*>, "text, not bool");

// Intended: xml-low-half-first
TEST(XmlValues, BytesLowHalfFirstIntended) {
    const unsigned char few[] = {0x12, 0xAB};
    EXPECT_EQ(Stored(few, 2ULL) + Stored(few, 0ULL), "21BA");
    EXPECT_FALSE(Element().Add(static_cast<unsigned char*>(nullptr), 0)) << "the pointer is looked at first";
    EXPECT_FALSE(Element().Add(few, ~0ULL) || Element().Add(few, ~0ULL / 2 + 1));
    unsigned char read[] = {7, 7, 7};
    EXPECT_FALSE(Element(L"21BA").GetDataBinary(read, 1) || Element(L"21BA").GetDataBinary(nullptr, 2) || read[0] != 7);
    EXPECT_TRUE(Element(L"21BA").GetDataBinary(read, 3) && std::equal(few, few + 2, read) && read[2] == 7);
    EXPECT_FALSE(Element(L"1F2").GetDataBinarySize() || Element(L"1G").GetDataBinarySize());
    EXPECT_TRUE(Element(L"1Fab").GetDataBinary(read, 2) && read[0] == 0xF1 && read[1] == 0xBA) << "either case";
    EXPECT_EQ(Element(L"0000000000000\x130").GetDataBinarySize(), 0u) << "no digit's low byte";
    EXPECT_FALSE(Element().GetDataBinary(read, 3) || CPXMLObject().GetDataBinarySize());
}

TEST(XmlValues, FlagsByName) {
    using Row = std::pair<ulong32, const char*>;
    for (const auto& [flags, text] : {Row{1, "read"}, Row{7, "read;write"}, Row{2, "half"}, Row{9, "read;0x00000008"},
                                      Row{0, "0x00000000"}, Row{3, "read;half"}, Row{~0u, "read;write;0xfffffff8"}}) {
        EXPECT_EQ(Stored(flags, kMap, kMapCount, L';'), text);
        EXPECT_EQ(Element(text).GetDataFlags(kMap, kMapCount, L';', 99), flags);
    }
    EXPECT_EQ(Stored(1u, static_cast<const tagXMLFLAGMAP*>(nullptr), std::size_t(3), L';'), "0x00000001");
}

// --- reading ---------------------------------------------------------------------------------------------------------

// The fuzz target's readers compare more texts.
TEST(XmlValues, WhatTextsReadIntended) {
    constexpr auto kNone = std::nullopt;
    EXPECT_READINGS(Int, true, 77, {L" \t\n-7x", -7}, {L"+3", 3}, {L"2147483648", INT_MIN}, {L"4294967297", 1},
                    {L"+-1", kNone}, {L"\x0661", kNone}, {L"\xA0\x31", kNone});
    EXPECT_READINGS(UInt, true, 77u, {L"-1", 4294967295u}, {L":", kNone});
    EXPECT_READINGS(LInt, true, 77LL, {L"9223372036854775808", LLONG_MIN});
    EXPECT_READINGS(LUInt, true, 77ULL, {L"18446744073709551617", 1u});
    EXPECT_READINGS(FileTime, false, 77ULL, {L" 132539328000000000", 132539328000000000u}, {L"-", kNone});
    EXPECT_READINGS(Hex, true, 77u, {L"fF", 255u}, {L" -0X10", 4294967280u}, {L"123456789", 591751049u},
                    {L"0x", kNone});
    EXPECT_READINGS(Rational, false, CRational(77), {L"30000/1001", CRational(30000, 1001)},
                    {L" -6 \n/ 4 x", CRational(-3, 2)}, {L"3/-6", CRational(-1, 2)}, {L"5/0", CRational(1, 0)},
                    {L"4294967299/6", CRational(1, 2)}, {L"5", kNone}, {L"5/", kNone}, {L"/5", kNone});
    EXPECT_READINGS(Bool, false, false, {L"true", true}, {L"true ", kNone}, {L"1", kNone});
    EXPECT_READINGS(Bool, false, true, {L"false", false}, {L"no", kNone});
    EXPECT_READINGS(EDouble, true, 0.77, {L"3ff8000000000000(1.5)", 1.5}, {L" 0x3FF8000000000000", 1.5},
                    {L"(1.5)", kNone}, {L"53ff8000000000000", 1.5});
    EXPECT_READINGS(Double, true, 0.77, {L"-.5e+1x", -5}, {L"2.", 2}, {L"1e+", 1}, {L"1e400", HUGE_VAL}, {L"1e-400", 0},
                    {L"0e99999999999999999999", 0}, {L"1e99999999999999999999", HUGE_VAL}, {L"1,5", 1}, {L".", kNone},
                    {L"-.e1", kNone}, {L"inf", kNone}, {L"nan", kNone}, {L"0x10", 0});
    EXPECT_READINGS(GUID, false, (_acfUID{7, 7, 7, {7}}),
                    {L"15603CD4-AB81-4D6F-B05F-C6BEA760A789", cacfuid(L"15603CD4-AB81-4D6F-B05F-C6BEA760A789").rec()},
                    {L"1-2-3-4-5", kNone});
    EXPECT_READINGS(Timecode, false, timecode(77LL, 0), {L"00:00:01:00 {25/1}Hz", timecode(1200LL, 0)},
                    {L"00:00:00:02 {30000/1001}Hz/D", timecode(80LL, 2)},
                    {L"00:00:01:00 {25/1}Hz                           ", timecode(1200LL, 0)},
                    {L"00:00:01:00 {25/1}Hz                            ", kNone}, {L"--:--:--:--", kNone},
                    {L"00:00:01:00", kNone}, {L"00:00:01:00 {25/3}Hz", kNone});
    EXPECT_TRUE(Element(L"--:--:--:-- {24/1}Hz").GetDataTimecode().sys() == 131072 &&
                Element(L"00:00:00:25 {25/1}Hz").GetDataTimecode().sys() == 65536);

    ExpectReadings<std::size_t>(
        "Index", false, 77, {{L"a", 0u}, {L"bb", 1u}, {L"c", 2u}, {L"b", kNone}, {L"a;bb", 0u}, {L"c;", kNone}},
        [](const auto& e, auto d) { return e.GetDataIndex(L"a;bb;c", L';', d); },
        [](const auto& e, auto d) { return e.FindElementIndex(L"e", L"a;bb;c", L';', d); },
        [](const auto& e, auto d) { return e.FindAttributeIndex(L"a", L"a;bb;c", L';', d); });
    ExpectReadings<ulong32>(
        "Flags", false, 77,
        {{L"half;0x80", 130u},
         {L"0xFFFFFFFF;read", 4294967295u},
         {L"read;", kNone},
         {L";", kNone},
         {L"read; write", kNone},
         {L"0x", kNone},
         {L"0x000000001", kNone},
         {L"8", kNone},
         {L"rea", kNone}},
        [](const auto& e, auto d) { return e.GetDataFlags(kMap, kMapCount, L';', d); },
        [](const auto& e, auto d) { return e.FindElementFlags(L"e", kMap, kMapCount, L';', d); },
        [](const auto& e, auto d) { return e.FindAttributeFlags(L"a", kMap, kMapCount, L';', d); });

    CPXMLObject element = Element(L"text");
    EXPECT_TRUE(element.AddTag(L"t", L"x") && element.AddAttribute(L"a", L"y"));
    EXPECT_TRUE(element.FindElementString(L"t") == L"x" && element.FindAttributeString(L"a", L"z") == L"y");
    EXPECT_TRUE(element.FindElementString(L"u", L"z") == L"z" && element.FindAttributeString(L"u").isempty());
    EXPECT_EQ(element.GetDataIndex(nullptr, L';'), Buffers::NotFound);
}

// The pool keeps its group for the variants of a static string.
TEST(XmlValues, BoolsInAnyCaseKeepsBlocks) {
    EXPECT_TRUE(Element(L"TrUe").GetDataBool() && Element(L"TRUE").GetDataBool() &&
                !Element(L"False").GetDataBool(true));
}

TEST(XmlValues, DoublesComeBackBitForBit) {
    for (std::uint64_t bits = 0; bits < 1ULL << 63; bits += (1ULL << 50) + 0x123456789) {
        const double value = std::bit_cast<double>(bits);
        CPXMLObject element = Element();
        ASSERT_TRUE(element.Add(value) && Bits(element.GetDataEDouble(7)) == bits);
        if (!std::isfinite(value)) continue; // how these read is the standard library's affair
        char readable[32], expected[32];
        std::snprintf(expected, sizeof expected, "%llx(%.4g)", static_cast<unsigned long long>(bits), value);
        ASSERT_EQ(Narrow(element.GetData()), expected);
        // The shortest text is read as the same value by the decimal reader.
        *std::to_chars(readable, std::end(readable), value).ptr = 0;
        ASSERT_EQ(Bits(ReadDouble(readable)), bits) << readable;
    }
}

TEST(XmlValues, DecimalTextsOfManyDigitsAreRounded) {
    // Halves between two doubles, and just above, with more digits than anyone keeps.
    std::string half = "9007199254740993." + std::string(2000, '0');
    EXPECT_EQ(ReadDouble(half), 9007199254740992.0);
    EXPECT_EQ(ReadDouble(half + '1'), 9007199254740994.0);
    EXPECT_EQ(ReadDouble("0." + std::string(5000, '0') + "25e5001"), 2.5);
    EXPECT_EQ(ReadDouble(std::string(5000, '1') + "e-4999"), ReadDouble("1." + std::string(30, '1')));
}

// Intended: xml-hexadecimal-writer, xml-double-text
TEST(XmlValues, NoDecimalReaderOfHexadecimalWritersIntended) {
    CPXMLObject element = Element();
    EXPECT_TRUE(element.Add(0x9000000A1ULL) && element.GetDataHex() == 0xA1);
    EXPECT_EQ(element.GetDataLUInt(7), 9000000u) << "its digits before the first letter";
    EXPECT_EQ(Bits(element.GetDataEDouble()), 0x9000000A1u);
    EXPECT_EQ(Element(L"3ff8000000000000(1.5)").GetDataDouble(), 3);
    EXPECT_EQ(Element(L"400e000000000000(3.75)").GetDataDouble(), 400);
}

// Intended: xml-decimal-point
TEST(XmlValues, LocalesMoveOneDecimalPointIntended) {
    const auto all = [] {
        std::string texts = Stored(-1234.5) + Stored(CRational(-5, 3)) + Stored(timecode(1LL, 0));
        for (const char* text : {"1234.5", "-7/2", " 1,5", "-1,5", "1.5,5", "1.234,5"}) {
            const CPXMLObject e = Element(text);
            for (double value : {1. * e.GetDataInt(), 1. * e.GetDataHex(), e.GetDataEDouble(), e.GetDataDouble()})
                texts += ' ' + std::to_string(Bits(value));
            texts += Stored(e.GetDataRational());
        }
        return texts;
    };
    const std::string inC = all();
    EXPECT_EQ(ReadDouble("1,5"), 1) << "no comma in C";
    int found = 0;
    for (const char* name : {"de_DE.UTF-8", "fr_FR.UTF-8", "German", "French"}) {
        if (!std::setlocale(LC_ALL, name) || *std::localeconv()->decimal_point != ',') continue;
        ++found;
        EXPECT_EQ(all(), inC) << name;
        for (const char* text : {"1,5", "00,15e1", "1,5x"}) EXPECT_EQ(ReadDouble(text), 1.5) << text;
        EXPECT_EQ(ReadDouble(",5"), 0.5);
        std::setlocale(LC_ALL, "C");
    }
    if (found == 0) GTEST_SKIP() << "no locale with a decimal comma is installed: run tools/setup";
}

TEST(XmlValues, FailingAllocationsLeaveElementsUsable) {
    const CPPoolString kName = L"name";
    const Bytes bytes(5000, 0x5A);
    support::Sweep();
    support::ForEachFailingAllocation([&] {
        {
            CPXMLObject element, filled;
            if (!element.SetName(kName) || !filled.SetName(kName) || !filled.Add(true)) return;
            EXPECT_TRUE(filled.Set(1.25) ? filled.GetDataEDouble() == 1.25 : filled.GetDataBool());
            const bool replaced = filled.Set(bytes.data(), bytes.size());
            EXPECT_TRUE(filled.GetDataBinarySize() == replaced * bytes.size() && filled.GetData().isdef());
            const bool tagged = bool(element.AddTag(kName, 0x7654321u, kMap, kMapCount, L';'));
            EXPECT_EQ(element.FindElementFlags(kName, kMap, kMapCount, L';'), tagged * 0x7654321u);
        }
        support::Sweep(); // so that each time the values' texts must be made anew
    });
}
