// Typed values of elements and attributes: their texts, and what is read from texts.

#include "support/heapwatch.h"

#include <algorithm>
#include <bit>
#include <charconv>
#include <clocale>
#include <cmath>
#include <random>
#include <sstream>
#include <TAVO/acf.h>
#include <TAVO/xml.h>

using namespace TAVO;
using namespace TAVO::XML;
using ACF::cacfuid;
using Math::CRational;
using String::CPPoolString;
using TimeCode::timecode;

namespace {

using Bytes = std::vector<unsigned char>;

constexpr tagXMLFLAGMAP kMap[] = {{1, L"read"}, {6, L"write"}, {2, L"half"}, {0, L"none"}, {8, nullptr}, {16, L""}};
constexpr std::size_t kMapCount = std::size(kMap);

std::string Narrow(const CPPoolString& text) {
    std::string narrow;
    for (const wchar_t* c = text; *c; ++c) narrow += static_cast<char>(*c);
    return narrow;
}

CPXMLObject Element(const CPPoolString& data = nullptr) {
    CPXMLObject element;
    EXPECT_TRUE(element.SetName(L"e") && element.Add(data));
    return element;
}

// Stores a value by each of the six operations and requires the same text of all; that text.
template <class... Value> std::string Stored(const Value&... value) {
    CPXMLObject element = Element(), full = Element(L"x"), parent = Element();
    EXPECT_TRUE(element.Add(value...) && full.Set(value...));
    const std::string text = Narrow(element.GetData());
    EXPECT_EQ(Narrow(full.GetData()), text);
    EXPECT_EQ(element.Add(value...), text.empty()) << "data is never appended to";
    EXPECT_EQ(element.AddAttribute(L"a", value...), !text.empty());
    EXPECT_TRUE(full.AddAttribute(L"a", L"x") && full.SetAttribute(L"a", value...) == !text.empty());
    EXPECT_EQ(Narrow(element.FindAttribute(L"a")), text);
    EXPECT_EQ(Narrow(full.FindAttribute(L"a")), text);
    EXPECT_FALSE(element.AddAttribute(L"a", value...));
    EXPECT_EQ(parent.AddTag(L"t", value...).sIndex(), 0u);
    EXPECT_EQ(parent.AddTag(L"u", value...).sIndex(), 1u);
    EXPECT_EQ(Narrow(parent.item(1).GetData()), text);
    EXPECT_EQ(parent.SetTag(L"v", value...).sIndex(), 0u);
    EXPECT_EQ(Narrow(parent.FindElementData(L"v")), text);
    EXPECT_FALSE(parent.item(1) || parent.AddTag(L"0", value...) || parent.AddAttribute(L"0", value...));
    EXPECT_FALSE(CPXMLObject().Add(value...) || CPXMLObject().SetTag(L"t", value...));
    return text;
}

// --- readers by name -------------------------------------------------------------------------------------------------

template <class Number> std::string Shown(Number value) {
    char text[40];
    return {text, std::to_chars(text, text + sizeof text, value).ptr};
}
std::string Shown(bool value) { return value ? "yes" : "no"; }
std::string Shown(const CRational& value) { return Shown(value.num()) + '/' + Shown(value.den()); }
std::string Shown(const _acfUID& value) { return std::string(cacfuid(value).ANSI()).substr(24); }
std::string Shown(const timecode& value) { return Shown(static_cast<long long>(value)) + ' ' + Shown(value.sys()); }

template <class Value, class Read> std::string Show(Value one, Value other, Read read) {
    const Value first = read(one), second = read(other);
    if (Shown(first) == Shown(one) && Shown(second) == Shown(other)) return "-";
    EXPECT_EQ(Shown(first), Shown(second));
    return Shown(first);
}

// What the first child's data and an attribute read as: a value, or "-" for the default.
struct Reader {
    const char* name;
    std::pair<std::string, std::string> (*read)(const CPXMLObject& parent);
};

#define READER(Suffix, one, other, ...)                                                                                \
    {                                                                                                                  \
#Suffix, [](const CPXMLObject& parent) {                                                                       \
            const auto show = [](auto read) { return Show(one, other, read); };                                        \
            const auto data = show([&](auto d) { return parent.item(0).GetData##Suffix(__VA_ARGS__ d); });             \
            EXPECT_EQ(show([&](auto d) { return parent.FindElement##Suffix(L"e", __VA_ARGS__ d); }), data);            \
            return std::pair(data, show([&](auto d) { return parent.FindAttribute##Suffix(L"a", __VA_ARGS__ d); }));   \
        }       \
    }
const Reader kReaders[] = {
    READER(Int, 77, 78, ),
    READER(UInt, 77u, 78u, ),
    READER(LInt, 77LL, 78LL, ),
    READER(LUInt, 77ULL, 78ULL, ),
    READER(Hex, 77u, 78u, ),
    READER(EDouble, 0.77, 0.78, ),
    READER(Double, 0.77, 0.78, ),
    READER(FileTime, 77ULL, 78ULL, ),
    READER(Rational, CRational(77), CRational(78), ),
    READER(Bool, false, true, ),
    READER(GUID, (_acfUID{7, 7, 7, {7, 7, 7}}), (_acfUID{8, 8, 8, {8, 8, 8}}), ),
    READER(Timecode, timecode(77LL, 0), timecode(78LL, 1), ),
    READER(Index, std::size_t(77), std::size_t(78), L"a;bb;c", L';', ),
    READER(Flags, 77u, 78u, kMap, kMapCount, L';', ),
};
constexpr std::size_t kDataOnlyReaders = 7; // the first ones

const Reader& Named(const std::string& name) {
    return *std::find_if(std::begin(kReaders), std::end(kReaders), [&](auto& reader) { return reader.name == name; });
}

std::string Read(const Reader& reader, const CPPoolString& text) {
    CPXMLObject parent = Element();
    EXPECT_TRUE(parent.Add(Element(text)) && parent.AddAttribute(L"a", text) == text.isdef());
    const auto [data, attribute] = reader.read(parent);
    EXPECT_EQ(attribute, data) << reader.name;
    return data;
}

double ReadDouble(const std::string& text) { return Element(text.c_str()).GetDataDouble(0.25); }

std::uint64_t Bits(double value) { return std::bit_cast<std::uint64_t>(value); }

} // namespace

// --- writing ---------------------------------------------------------------------------------------------------------

TEST(XmlValues, TextsOfValues) {
    const std::pair<std::string, const char*> rows[] = {
        {Stored(0ULL), "0"},
        {Stored(std::size_t(0x123456789ABCDEF0)), "123456789abcdef0"},
        {Stored(255ULL), "ff"},
        {Stored(CRational(-30000, 1001)), "-30000/1001"},
        {Stored(CRational(1073741823, 1000)) + Stored(CRational(1, 0)), "1073741823/10001/0"},
        {Stored(1.5), "3ff8000000000000(1.5)"},
        {Stored(-0.1f) + Stored(0.0), "bfb99999a0000000(-0.1)0(0)"},
        {Stored(-1.7976931348623157e308), "ffefffffffffffff(-1.798e+308)"},
        {Stored(true) + Stored(false) + Stored(L"text"), "truefalsetext"},
        {Stored(timecode(1, 0, 0, 0, 0)) + Stored(timecode()), "01:00:00:00 {25/1}Hz--:--:--:-- {25/1}Hz"},
        {Stored(cacfuid(L"15603cd4-ab81-4d6f-b05f-c6bea760a789")), "15603CD4-AB81-4D6F-B05F-C6BEA760A789"},
        {Stored(_acfUID{}), "00000000-0000-0000-0000-000000000000"},
        {Stored(CPPoolString(-5)), "-5"}, // decimal numbers, the explicit way
    };
    for (const auto& [stored, text] : rows) EXPECT_EQ(stored, text);
}

// Which arguments compile.
template <class... Value>
concept CanAdd = requires(CPXMLObject e, Value... value) {
    e.Add(value...);
};
template <class... Value>
concept CanTag = requires(CPXMLObject e, Value... value) {
    e.AddTag(L"t", value...), e.SetTag(L"t", value...), e.AddAttribute(L"a", value...), e.SetAttribute(L"a", value...);
    e.Set(value...);
};
template <class... Values> constexpr bool kNoneFits = (!(CanAdd<Values> || CanTag<Values>)&&...);
enum Plain { kPlain };
static_assert(
    kNoneFits<int, unsigned, long, short, char, wchar_t, signed char, long long, char16_t, Plain, long double>);
static_assert(CanTag<unsigned long> == (sizeof(long) == 8), "32 bits on one system, never two meanings");
static_assert(kNoneFits<void*, const int*, CRational*, const unsigned short*> && !CanTag<const wchar_t*, int>);
static_assert(CanAdd<std::nullptr_t> && CanTag<const char*> && CanTag<const unsigned char*>, "text, not bool");

// Intended: xml-low-half-first
TEST(XmlValues, BytesLowHalfFirstIntended) {
    const unsigned char few[] = {0x12, 0xAB};
    EXPECT_EQ(Stored(few, 2ULL), "21BA");
    EXPECT_EQ(Stored(few, 0ULL), "") << "nothing to add";
    EXPECT_FALSE(Element().Add(static_cast<unsigned char*>(nullptr), 0)) << "the pointer is looked at first";
    EXPECT_FALSE(Element().Add(few, ~0ULL) || Element().Add(few, ~0ULL / 2 + 1));
    Bytes bytes(67), read(67);
    for (std::size_t i = 0; i < bytes.size(); ++i) bytes[i] = static_cast<unsigned char>(i * 7 + 9);
    for (std::size_t size = 1; size <= bytes.size(); ++size) {
        CPXMLObject element = Element();
        ASSERT_TRUE(element.Add(bytes.data(), size) && element.GetDataBinarySize() == size);
        read.assign(bytes.size(), 0xEE);
        EXPECT_FALSE(element.GetDataBinary(read.data(), size - 1) || element.GetDataBinary(nullptr, size));
        EXPECT_EQ(read[0], 0xEE) << "untouched";
        EXPECT_TRUE(element.GetDataBinary(read.data(), size));
        EXPECT_TRUE(std::equal(read.begin(), read.begin() + size, bytes.begin()) &&
                    Bytes(read.begin() + size, read.end()) == Bytes(read.size() - size, 0xEE));

        // One bad digit, wherever it stands; and one digit missing.
        std::string text = Narrow(element.GetData());
        for (const char bad : {'G', '/', ':', '@', '`', 'g', ' '}) {
            std::string damaged = text;
            damaged[size * 2 - 1 - size % 5] = bad;
            EXPECT_EQ(Element(damaged.c_str()).GetDataBinarySize(), 0u) << damaged;
        }
        EXPECT_FALSE(Element(text.substr(1).c_str()).GetDataBinary(read.data(), size));
    }
    EXPECT_TRUE(Element(L"1Fab").GetDataBinary(read.data(), 2) && read[0] == 0xF1 && read[1] == 0xBA) << "either case";
    EXPECT_EQ(Element(L"0000000000000\x130").GetDataBinarySize(), 0u) << "no digit's low byte";
    EXPECT_FALSE(Element().GetDataBinary(read.data(), 9) || CPXMLObject().GetDataBinarySize());
}

TEST(XmlValues, FlagsByName) {
    const struct {
        ulong32 flags;
        const char* text;
    } rows[] = {{1, "read"},       {7, "read;write"}, {2, "half"},      {9, "read;0x00000008"},
                {0, "0x00000000"}, {4, "0x00000004"}, {3, "read;half"}, {~0u, "read;write;0xfffffff8"}};
    for (const auto& row : rows) {
        EXPECT_EQ(Stored(row.flags, kMap, kMapCount, L';'), row.text);
        EXPECT_EQ(Element(row.text).GetDataFlags(kMap, kMapCount, L';', 99), row.flags);
    }
    EXPECT_EQ(Stored(1u, static_cast<const tagXMLFLAGMAP*>(nullptr), std::size_t(3), L';'), "0x00000001");
}

// --- reading ---------------------------------------------------------------------------------------------------------

TEST(XmlValues, WhatTextsRead) {
    // Text>value, with "-" for the default.
    const std::pair<const char*, const char*> tables[] = {
        {"Int", "42>42| \t\n-7x>-7|+3>3|0x1F>0|2147483648>-2147483648|4294967297>1|->-|+-1>-|x1>-|1.9>1"},
        {"UInt", "4294967295>4294967295|-1>4294967295|4294967296>0|/>-|:>-"},
        {"LInt", "-9223372036854775808>-9223372036854775808|9223372036854775808>-9223372036854775808"},
        {"LUInt", "18446744073709551615>18446744073709551615|18446744073709551617>1|-1>18446744073709551615"},
        {"FileTime", " 132539328000000000>132539328000000000|->-"},
        {"Hex",
         "fF>255| -0X10>4294967280|123456789>591751049|0x>-|g>-|0x0123456789abcdef>2309737967|00000000000000001f>31"},
        {"Rational",
         "30000/1001>30000/1001| -6 \n/ 4 x>-3/2|3/-6>-1/2|5/0>1/0|5>-|5/>-|/5>-|5:6>-|4294967299/6>1/2|5 / x>-"},
        {"Bool", "true>yes|false>no|true >-|1>-|yes>-"},
        {"EDouble",
         "3ff8000000000000(1.5)>1.5| 0x3FF8000000000000>1.5|0(0)>0|(1.5)>-|bff0000000000000>-1|53ff8000000000000>1.5"},
        {"Double",
         "1.5>1.5| -.5e+1x>-5|2.>2|1e>1|1e+>1|1e400>inf|-1e400>-inf|1e-400>0|0e99999999999999999999>0|1,5>1|.>-|"
         "-.e1>-|e1>-|1e99999999999999999999>inf|inf>-|nan>-|0x10>0|infinity and beyond>-"},
        {"GUID", "15603CD4-AB81-4D6F-B05F-C6BEA760A789>C6BEA760A789|1-2-3-4-5>-|15603CD4>000000000000"},
        {"Timecode",
         "00:00:01:00 {25/1}Hz>1200 0|00:00:00:02 {30000/1001}Hz/D>80 2|--:--:--:-- {24/1}Hz>0 131072|--:--:--:-->-|"
         "00:00:00:25 {25/1}Hz>0 65536|00:00:01:00>-|00:00:01:00 {25/3}Hz>-|"
         "00:00:01:00 {25/1}Hz                           >1200 0|00:00:01:00 {25/1}Hz                            >-"},
        {"Index", "a>0|bb>1|c>2|b>-|a;bb>0|c;>-"},
        {"Flags", "read>1|half;0x80>130|0xFFFFFFFF;read>4294967295|read;>-|;>-|read; "
                  "write>-|0x>-|0x000000001>-|8>-|0x1g>-|rea>-|none>-"},
    };
    for (const auto& [name, table] : tables) {
        EXPECT_EQ(Read(Named(name), nullptr), "-") << name;
        std::istringstream rows(table);
        for (std::string row; std::getline(rows, row, '|');) {
            const auto mark = row.rfind('>');
            EXPECT_EQ(Read(Named(name), row.substr(0, mark).c_str()), row.substr(mark + 1)) << name << ": " << row;
        }
    }
    for (const wchar_t* text : {L"\x0661", L"\xA0\x31", L"\x0131"})
        EXPECT_EQ(Read(Named("Int"), text) + Read(Named("Hex"), text) + Read(Named("Double"), text), "---");
    CPXMLObject element = Element(L"text");
    EXPECT_TRUE(element.AddTag(L"t", L"x") && element.AddAttribute(L"a", L"y"));
    EXPECT_TRUE(element.FindElementString(L"t") == L"x" && element.FindAttributeString(L"a", L"z") == L"y");
    EXPECT_TRUE(element.FindElementString(L"u", L"z") == L"z" && element.FindAttributeString(L"u").isempty());
    EXPECT_EQ(element.GetDataIndex(L"b", L';'), Buffers::NotFound);
    EXPECT_EQ(element.GetDataIndex(nullptr, L';'), Buffers::NotFound);
}

// The pool keeps its group for the variants of a static string.
TEST(XmlValues, BoolsInAnyCaseKeepsBlocks) {
    for (const wchar_t* text : {L"TrUe", L"TRUE", L"False"})
        EXPECT_EQ(Read(Named("Bool"), text), *text == L'T' ? "yes" : "no");
}

// Intended: xml-mixed-numbers
TEST(XmlValues, ElementsWithChildrenHaveNoNumbersIntended) {
    const CPPoolString text = L"3/4";
    CPXMLObject mixed = Element(text), parent = Element();
    EXPECT_TRUE(mixed.AddTag(L"child") && parent.Add(mixed) && parent.AddAttribute(L"a", text));
    for (std::size_t i = 0; i < std::size(kReaders); ++i) {
        const std::string alone = Read(kReaders[i], text);
        EXPECT_EQ(kReaders[i].read(parent), std::pair(i < kDataOnlyReaders ? std::string("-") : alone, alone));
        EXPECT_EQ(kReaders[i].read(CPXMLObject()).first, "-") << "no element at all";
    }
}

TEST(XmlValues, DoublesComeBackBitForBit) {
    std::mt19937_64 random(1);
    const auto check = [](std::uint64_t bits) {
        const double value = std::bit_cast<double>(bits);
        CPXMLObject element = Element();
        ASSERT_TRUE(element.Add(value));
        ASSERT_EQ(Bits(element.GetDataEDouble(7)), bits);
        if (!std::isfinite(value)) return; // how these read is the standard library's affair
        char readable[32], expected[32];
        const std::string text = Narrow(element.GetData());
        std::snprintf(expected, sizeof expected, "%llx(%.4g)", static_cast<unsigned long long>(bits), value);
        ASSERT_EQ(text, expected);
        // The shortest text is read as the same value by the decimal reader.
        *std::to_chars(readable, std::end(readable), value).ptr = 0;
        ASSERT_EQ(Bits(ReadDouble(readable)), bits) << readable;
    };
    for (std::uint64_t exponent = 0; exponent < 4096; ++exponent)
        for (const std::uint64_t fraction :
             {std::uint64_t(0), std::uint64_t(1), ~std::uint64_t(0) >> 12, random() >> 12})
            check(exponent << 52 | fraction);
    for (int i = 0; i < 20000; ++i) check(random());
}

TEST(XmlValues, DecimalTextsReadAsTheStandardLibraryDoes) {
    std::mt19937 random(2);
    const auto digits = [&](unsigned most) {
        std::string text(random() % (most + 1), '0');
        for (char& digit : text)
            if (random() % 4) digit = static_cast<char>('0' + random() % 10);
        return text;
    };
    for (int i = 0; i < 20000; ++i) {
        const unsigned most = i % 100 ? 25 : 1000;
        std::string text = digits(most) + '.' + digits(most) + '1';
        if (random() % 2) text += (random() % 2 ? "e" : "E-") + std::to_string(random() % 400);
        EXPECT_EQ(Bits(ReadDouble(text)), Bits(std::strtod(text.c_str(), nullptr))) << text;
    }
    // Halves between two doubles, and just above, with more digits than anyone keeps.
    std::string half = "9007199254740993." + std::string(2000, '0');
    EXPECT_EQ(ReadDouble(half), 9007199254740992.0);
    EXPECT_EQ(ReadDouble(half + '1'), 9007199254740994.0);
    EXPECT_EQ(ReadDouble("0." + std::string(5000, '0') + "25e5001"), 2.5);
    EXPECT_EQ(ReadDouble(std::string(5000, '1') + "e-4999"), ReadDouble("1." + std::string(30, '1')));
}

// Intended: xml-hexadecimal-writer
TEST(XmlValues, NoReaderOfTheUnsignedWriterIntended) {
    CPXMLObject element = Element();
    EXPECT_TRUE(element.Add(0x9000000A1ULL));
    EXPECT_EQ(element.GetDataHex(), 0xA1u);
    EXPECT_EQ(element.GetDataLUInt(7), 9000000u) << "its digits before the first letter";
    EXPECT_EQ(Bits(element.GetDataEDouble()), 0x9000000A1u);
}

// Intended: xml-double-text
TEST(XmlValues, DecimalReaderOfDoublesOwnTextIntended) {
    EXPECT_EQ(Element(L"3ff8000000000000(1.5)").GetDataDouble(), 3);
    EXPECT_EQ(Element(L"400e000000000000(3.75)").GetDataDouble(), 400);
}

// Intended: xml-decimal-point
TEST(XmlValues, LocalesMoveOneDecimalPointIntended) {
    const auto all = [] {
        std::string texts = Stored(-1234.5) + Stored(CRational(-5, 3)) + Stored(timecode(1LL, 0));
        for (const Reader& reader : kReaders)
            for (const wchar_t* text :
                 {L"1234.5", L"-7/2", L"00:00:01:00 {25/1}Hz", L" 1,5", L"-1,5", L"1.5,5", L"1.234,5"})
                texts += Read(reader, text) + ' ';
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
    // The pool forgets the values' texts, so that each time they must be made anew.
    const auto sweep = [] { EXPECT_TRUE(String::CStringPool::Collect(60000) && String::CStringPool::Collect(60000)); };
    sweep();
    support::ForEachFailingAllocation([&] {
        {
            CPXMLObject element, filled;
            if (!element.SetName(kName) || !filled.SetName(kName) || !filled.Add(true)) return;
            const bool added = element.Add(0x123456ULL);
            EXPECT_EQ(element.GetData().isdef(), added);
            EXPECT_TRUE(filled.Set(1.25) ? filled.GetDataEDouble() == 1.25 : filled.GetDataBool());
            const bool replaced = filled.Set(bytes.data(), bytes.size());
            EXPECT_EQ(filled.GetDataBinarySize(), replaced ? bytes.size() : 0);
            EXPECT_TRUE(filled.GetData().isdef()) << "what could not be replaced stays";
            const bool tagged = bool(element.AddTag(kName, 0x7654321u, kMap, kMapCount, L';'));
            EXPECT_EQ(element.GetNElements(kName), tagged ? 1u : 0u);
            EXPECT_EQ(element.FindElementFlags(kName, kMap, kMapCount, L';'), tagged ? 0x7654321u : 0u);
        }
        sweep();
    });
}
