// Component identifiers: what texts give, and the text of each value.

#include <gtest/gtest.h>
#include <set>
#include <string>
#include <TAVO/acf.h>

using TAVO::ACF::cacfuid;

namespace {

const std::string kText = "15603CD4-AB81-4D6F-B05F-C6BEA760A789", kNull = "00000000-0000-0000-0000-000000000000";

std::string Text(const cacfuid& id) {
    char text[cacfuid::TextUnits];
    id.GetText(text);
    return text;
}

} // namespace

TEST(Identifier, ReadsAndWritesSixteenBytes) {
    const cacfuid id(_acfUID{0x15603CD4, 0xAB81, 0x4D6F, {0xB0, 0x5F, 0xC6, 0xBE, 0xA7, 0x60, 0xA7, 0x89}});
    EXPECT_EQ(Text(id), kText);
    EXPECT_STREQ(id.ANSI(), kText.c_str());
    EXPECT_STREQ(static_cast<TAVO::String::CACFWChar>(id), L"15603CD4-AB81-4D6F-B05F-C6BEA760A789");
    for (std::size_t byte = 0; byte < sizeof(_acfUID); ++byte) {
        cacfuid other(id), single;
        reinterpret_cast<unsigned char*>(&other.rec())[byte] ^= 1;
        reinterpret_cast<unsigned char*>(&single.rec())[byte] = 1;
        EXPECT_TRUE(other != id && !(other == id) && single) << byte;
        EXPECT_EQ(cacfuid(Text(single).c_str()), single) << byte;
        single.reset();
        EXPECT_FALSE(single) << byte;
    }
    std::set<std::string> seen;
    for (int i = 0; i < 200; ++i) { // new ones are random, of version four
        const std::string text = Text(cacfuid::New());
        EXPECT_TRUE(seen.insert(text).second && text[14] == '4' && text.find_first_of("89AB", 19) == 19) << text;
    }
}

// The fuzz replay compares any text with a plain reading of the rules; here is what the rules say.
// Intended: identifier-dashes
TEST(Identifier, IntendedReadingOfOtherTexts) {
    const std::pair<std::string, std::string> rows[] = {
        // empty: refused, which leaves the null identifier
        {kText, kText},
        {"", kNull},
        {kText + '-', kNull},
        {'{' + kText + '}', ""},
        {kText.substr(0, 24), ""},
        {kText.substr(0, 35), ""},
        {"-AB81-4D6F-B05F-C6BEA760A789", "FFFF547F-4D6F-B05F-A789-C6BEA760A789"}};
    for (const auto& [text, identifier] : rows) {
        const std::u16string wide(text.begin(), text.end());
        cacfuid fromNarrow(kText.c_str()), fromWide(kText.c_str());
        EXPECT_EQ(fromNarrow.Set(text.c_str()), !identifier.empty()) << text;
        EXPECT_EQ(fromWide.Set(reinterpret_cast<const wchar_t*>(wide.c_str())), !identifier.empty()) << text;
        EXPECT_EQ(Text(fromNarrow), identifier.empty() ? kNull : identifier) << text;
        EXPECT_EQ(fromNarrow, fromWide) << text;
    }
    cacfuid id(kText.c_str());
    EXPECT_TRUE(id.Set(static_cast<const char*>(nullptr)) && !id && id.Set(static_cast<const wchar_t*>(nullptr)));
}
