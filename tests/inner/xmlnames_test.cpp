// The character classes of names.

#include "xmlnames.h"

#include <gtest/gtest.h>

using namespace TAVO::XML::detail;

namespace {

constexpr unsigned kStart = 1, kName = 2, kDigit = 4, kLetter = 8;

unsigned Classes(TAVO::ulong32 c) {
    return (IsNameStart(c) ? kStart : 0) | (IsNameChar(c) ? kName : 0) | (IsDigit(c) ? kDigit : 0) |
           (IsLetter(c) ? kLetter : 0);
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
    const struct {
        unsigned classes;
        std::vector<TAVO::ulong32> characters;
    } kRows[] = {
        {0,
         {0, ' ', '/', '@', '[', 0x7F, 0x80, 0xD7, 0xF7, 0x132, 0x346, 0x66A, 0x1101, 0x4DFF, 0x9FA6, 0xD7A4, 0xD800,
          0xFFFF, 0x10041}},
        {kName, {'-', '.', 0xB7, 0x300, 0x387, 0xE31, 0x3005, 0x30FC}},
        {kStart | kName, {'_', ':'}},
        {kName | kDigit, {'0', 0x660, 0xF29}},
        {kStart | kName | kLetter,
         {'A', 'Z', 0xC0, 0x386, 0x430, 0x5D0, 0x905, 0x1100, 0x2126, 0x212A, 0x3007, 0x3021, 0x3041, 0x4E00, 0x9FA5,
          0xAC00, 0xD7A3}},
    };
    for (const auto& row : kRows)
        for (auto character : row.characters) EXPECT_EQ(Classes(character), row.classes) << character;
}
