// Component identifiers: what texts give, and the text of each value.

#include <gtest/gtest.h>
#include <set>
#include <string>
#include <TAVO/acf.h>
#include <vector>

using TAVO::ACF::cacfuid;

namespace {

const char* const kText = "15603CD4-AB81-4D6F-B05F-C6BEA760A789";
const char* const kNull = "00000000-0000-0000-0000-000000000000";

std::string Text(const cacfuid& id) {
    char text[cacfuid::TextUnits];
    id.GetText(text);
    return text;
}

// Reads the text in both widths, each in a buffer that ends with its terminator. Null: Set fails.
void ExpectRead(const std::string& text, const char* identifier) {
    const std::vector<char> narrow(text.c_str(), text.c_str() + text.size() + 1);
    const std::vector<wchar_t> wide(narrow.begin(), narrow.end());
    cacfuid fromNarrow(kText), fromWide(kText);
    EXPECT_EQ(fromNarrow.Set(narrow.data()), identifier != nullptr) << text;
    EXPECT_EQ(fromWide.Set(wide.data()), identifier != nullptr) << text;
    EXPECT_EQ(Text(fromNarrow), identifier ? identifier : kNull) << text;
    EXPECT_EQ(fromNarrow, fromWide) << text;
}

} // namespace

TEST(Identifier, ReadsAndWritesSixteenBytes) {
    const cacfuid id(_acfUID{0x15603CD4, 0xAB81, 0x4D6F, {0xB0, 0x5F, 0xC6, 0xBE, 0xA7, 0x60, 0xA7, 0x89}});
    EXPECT_EQ(Text(id), kText);
    EXPECT_STREQ(static_cast<TAVO::String::CACFWChar>(id), L"15603CD4-AB81-4D6F-B05F-C6BEA760A789");
    EXPECT_STREQ(id.ANSI(), kText);
    for (std::size_t byte = 0; byte < sizeof(_acfUID); ++byte) {
        cacfuid other(id), single;
        reinterpret_cast<unsigned char*>(&other.rec())[byte] ^= 1;
        reinterpret_cast<unsigned char*>(&single.rec())[byte] = 1;
        EXPECT_TRUE(other != id && !(other == id) && single) << byte;
        EXPECT_EQ(cacfuid(Text(single).c_str()), single) << byte;
        single.reset();
        EXPECT_FALSE(single) << byte;
    }
}

// The fuzz replay compares any text with a plain reading of the rules; here is what the rules say.
// Intended: identifier-dashes
TEST(Identifier, IntendedReadingOfOtherTexts) {
    for (std::size_t length = 24; length < 36; ++length) ExpectRead(std::string(kText, length), nullptr);
    const std::pair<const char*, const char*> rows[] = {
        {kText, kText},
        {"", kNull},
        {"15603CD4-AB81-4D6F-B05F-C6BEA760A789-", kNull},
        {"-AB81-4D6F-B05F-C6BEA760A789", "FFFF547F-4D6F-B05F-A789-C6BEA760A789"},
        {"{15603CD4-AB81-4D6F-B05F-C6BEA760A789}", nullptr}};
    for (const auto& [text, identifier] : rows) ExpectRead(text, identifier);
    cacfuid id(kText);
    EXPECT_TRUE(id.Set(static_cast<const char*>(nullptr)) && !id && id.Set(static_cast<const wchar_t*>(nullptr)));
}

TEST(Identifier, NewOnesAreRandomOfVersionFour) {
    std::set<std::string> seen;
    for (int i = 0; i < 200; ++i) {
        const std::string text = Text(cacfuid::New());
        EXPECT_TRUE(seen.insert(text).second && text[14] == '4' && text.find_first_of("89AB", 19) == 19) << text;
    }
}
