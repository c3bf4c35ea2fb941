// The character classes of names.

#include "xmlnames.h"

#include <gtest/gtest.h>

using namespace TAVO::XML::detail;

TEST(XmlNames, TablesHaveTheRecommendationsRanges) {
    const auto& [baseChar, ideographic, combiningChar, digit, extender] = g_nameTables;
    std::vector<std::size_t> sizes;
    std::vector<int> members(0x10000);
    for (const auto table : {baseChar, ideographic, combiningChar, digit, extender}) {
        sizes.push_back(table.size());
        for (Range range : table)
            for (unsigned c = range.first; c <= range.last; ++c) ASSERT_EQ(++members[c], 1) << "in two classes: " << c;
    }
    EXPECT_EQ(sizes, (std::vector<std::size_t>{202, 3, 95, 15, 11}));
    for (Range range : digit) EXPECT_LE(range.last - range.first, 9);
}

TEST(XmlNames, MembersOfManyScripts) {
    constexpr unsigned kStart = 1, kName = 2, kDigit = 4, kLetter = 8;
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
        for (auto c : row.characters)
            EXPECT_EQ(IsNameStart(c) * kStart + IsNameChar(c) * kName + IsDigit(c) * kDigit + IsLetter(c) * kLetter,
                      row.classes)
                << c;
}
