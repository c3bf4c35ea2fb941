// Linux: library names, UTF-8 as the code page, protected pages.

#include "platform/platform.h"
#include "support/guardpage.h"

#include <gtest/gtest.h>

using namespace TAVO;

TEST(ConfigurationPath, DropsVersionDigits) {
    const struct {
        const wchar_t* path;
        std::size_t stem;
    } rows[] = {
        {L"/lib/libTAVO.so", 12},  {L"/lib/libTAVO.so.1.20.3", 12}, {L"/lib/a-1.2.so.3", 10}, {L"", 0},
        {L"/lib/libTAVO.1.2", 14}, {L"/lib/libTAVO.so.x1", 15},     {L"/a.b/libTAVO", 0},     {L"/a.so.1/lib", 0}};
    for (const auto& row : rows) {
        std::size_t length = 0;
        while (row.path[length]) ++length;
        EXPECT_EQ(Platform::FindConfigurationStem(row.path, length), row.stem) << row.stem;
    }
}

TEST(CodePage, IsUtf8AndReplacesWhatHasNoForm) {
    const std::pair<const char*, const wchar_t*> rows[] = {
        {"\x7F\xC2\x80\xDF\xBF\xE0\xA0\x80\xED\x9F\xBF\xEE\x80\x80", L"\x7F\x80\x7FF\x800\xD7FF\xE000"},
        {"\xEF\xBF\xBF\xF0\x90\x80\x80\xF4\x8F\xBF\xBF", L"\xFFFF\xD800\xDC00\xDBFF\xDFFF"},
        {"a\x80z", L"a\xFFFDz"},
        {"\xC0\x80\xC1z\xE0\x9F\xBF", L"\xFFFD\xFFFD\xFFFDz\xFFFD\xFFFD\xFFFD"}, // overlong
        {"\xED\xA0\x80", L"\xFFFD\xFFFD\xFFFD"},                                 // surrogate
        {"\xF0\x8F\xBF\xBF", L"\xFFFD\xFFFD\xFFFD\xFFFD"},                       // overlong
        {"\xF4\x90\x80\x80\xF5", L"\xFFFD\xFFFD\xFFFD\xFFFD\xFFFD"},             // above the last
        {"\xE2\x82z\xF0\x9F\x98", L"\xFFFDz\xFFFD"},                             // one for a start that is cut short
    };
    wchar_t wide[16];
    char narrow[32];
    for (const auto& row : rows) {
        ASSERT_GT(Platform::AnsiToWide(row.first, -1, wide, 16), 0);
        EXPECT_STREQ(wide, row.second) << row.first;
        if (&row - rows >= 2) continue; // the others lose something
        ASSERT_GT(Platform::WideToAnsi(row.second, -1, narrow, 32), 0);
        EXPECT_STREQ(narrow, row.first);
    }
    EXPECT_EQ(Platform::WideToAnsi(L"\xD83D\xDE00", 1, narrow, 8), 3) << "a length that cuts a pair";
    ASSERT_EQ(Platform::WideToAnsi(L"\xDC00\xD800", -1, narrow, 32), 7);
    EXPECT_STREQ(narrow, "\xEF\xBF\xBD\xEF\xBF\xBD");
    EXPECT_EQ(Platform::AnsiToWide("\xF0\x9F\x98\x80", 4, wide, 1), 0) << "a pair needs two";
    EXPECT_EQ(Platform::AnsiToWide("\xF0\x9F\x98\x80", 4, wide, 2), 2);
}

TEST(Memory, ProtectedPagesAreUnreadable) {
    const support::GuardedMemory memory;
    EXPECT_TRUE(Platform::IsReadable(memory.End() - 1)) << "the last byte before";
    for (const std::uintptr_t address :
         {reinterpret_cast<std::uintptr_t>(memory.End()), std::uintptr_t{0}, UINTPTR_MAX})
        EXPECT_FALSE(Platform::IsReadable(reinterpret_cast<void*>(address))) << address;
}
