// The character classes of names.

#include "xmlnames.h"

#include <gtest/gtest.h>

using namespace TAVO::XML::detail;

namespace {

unsigned Classes(TAVO::ulong32 c) {
    return (IsNameStart(c) ? 1u : 0u) | (IsNameChar(c) ? 2u : 0u) | (IsDigit(c) ? 4u : 0u) | (IsLetter(c) ? 8u : 0u);
}

} // namespace

TEST(XmlNames, TablesHaveTheRecommendationsRanges) {
    EXPECT_EQ(g_nameTables.baseChar.size(), 202u);
    EXPECT_EQ(g_nameTables.ideographic.size(), 3u);
    EXPECT_EQ(g_nameTables.combiningChar.size(), 95u);
    EXPECT_EQ(g_nameTables.digit.size(), 15u);
    EXPECT_EQ(g_nameTables.extender.size(), 11u);
    std::vector<int> members(0x10000);
    for (auto table : {g_nameTables.baseChar, g_nameTables.ideographic, g_nameTables.combiningChar, g_nameTables.digit,
                       g_nameTables.extender})
        for (Range range : table)
            for (unsigned c = range.first; c <= range.last; ++c) ++members[c];
    for (unsigned c = 0; c < members.size(); ++c) ASSERT_LE(members[c], 1) << "in two classes: " << c;
    for (Range range : g_nameTables.digit) EXPECT_LE(range.last - range.first, 9);
}

TEST(XmlNames, MembersOfManyScripts) {
    constexpr unsigned kStart = 1, kName = 2, kDigitClass = 4, kLetterClass = 8;
    constexpr unsigned kLetter = kStart | kName | kLetterClass;
    constexpr struct {
        TAVO::ulong32 character;
        unsigned classes;
        const char* what;
    } kRows[] = {
        {'A', kLetter, "first capital"},
        {'Z', kLetter, "last capital"},
        {'@', 0, "before A"},
        {'[', 0, "behind Z"},
        {'_', kStart | kName, "underscore"},
        {':', kStart | kName, "colon"},
        {'-', kName, "hyphen"},
        {'.', kName, "full stop"},
        {'0', kName | kDigitClass, "digit"},
        {'/', 0, "before 0"},
        {' ', 0, "blank"},
        {0, 0, "zero"},
        {0x7F, 0, "last ASCII"},
        {0x80, 0, "first behind ASCII"},
        {0xB7, kName, "middle dot"},
        {0xC0, kLetter, "A grave"},
        {0xD7, 0, "multiplication sign"},
        {0xF7, 0, "division sign"},
        {0x132, 0, "ligature IJ"},
        {0x300, kName, "combining grave"},
        {0x346, 0, "behind 345"},
        {0x386, kLetter, "Greek"},
        {0x387, kName, "Greek middle dot"},
        {0x430, kLetter, "Cyrillic"},
        {0x5D0, kLetter, "Hebrew"},
        {0x660, kName | kDigitClass, "Arabic digit"},
        {0x66A, 0, "behind Arabic digits"},
        {0x905, kLetter, "Devanagari"},
        {0xE31, kName, "Thai vowel"},
        {0xF29, kName | kDigitClass, "last Tibetan digit"},
        {0x1100, kLetter, "Hangul jamo"},
        {0x1101, 0, "a jamo left out"},
        {0x2126, kLetter, "ohm"},
        {0x212A, kLetter, "kelvin"},
        {0x3005, kName, "iteration mark"},
        {0x3007, kLetter, "zero ideograph"},
        {0x3021, kLetter, "Hangzhou"},
        {0x3041, kLetter, "Hiragana"},
        {0x30FC, kName, "sound mark"},
        {0x4DFF, 0, "before ideographs"},
        {0x4E00, kLetter, "first ideograph"},
        {0x9FA5, kLetter, "last ideograph"},
        {0x9FA6, 0, "behind ideographs"},
        {0xAC00, kLetter, "first syllable"},
        {0xD7A3, kLetter, "last syllable"},
        {0xD7A4, 0, "behind syllables"},
        {0xD800, 0, "surrogate"},
        {0xFFFF, 0, "last unit"},
        {0x10041, 0, "beyond the tables"},
    };
    for (const auto& row : kRows) EXPECT_EQ(Classes(row.character), row.classes) << row.what;
}

TEST(XmlNames, ScanStopsAtTheFirstOtherCharacter) {
    constexpr struct {
        const wchar_t* text;
        std::ptrdiff_t units, length;
    } kRows[] = {{L"abc", 3, 3}, {L"abc", 2, 2},  {L"abc", 0, 0}, {L"a b", 3, 1},          {L"1a", 2, 0},
                 {L"-a", 2, 0},  {L"a-1.", 4, 4}, {L":a=", 3, 2}, {L"\x4E00\x300/", 3, 2}, {L"\x300", 1, 0}};
    for (const auto& row : kRows) EXPECT_EQ(ScanName(row.text, row.text + row.units) - row.text, row.length);
}
