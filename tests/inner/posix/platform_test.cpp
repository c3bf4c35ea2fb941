// Linux: library names, UTF-8 as the code page, protected pages.

#include "platform/platform.h"

#include <gtest/gtest.h>
#include <sys/mman.h>

using namespace TAVO;

TEST(ConfigurationPath, DropsVersionDigits) {
    const struct {
        const wchar_t* path;
        std::size_t stem;
    } rows[] = {
        {L"/lib/libTAVO.so", 12},    {L"/lib/libTAVO.so.1.20.3", 12},
        {L"/lib/a-1.2.so.3", 10},    {L"/lib/libTAVO.1.2", 14},
        {L"/lib/libTAVO.so.x1", 15}, {L"/a.b/libTAVO", 0},
        {L"/a.so.1/lib", 0},         {L"", 0},
    };
    for (const auto& row : rows) {
        std::size_t length = 0;
        while (row.path[length]) ++length;
        EXPECT_EQ(Platform::FindConfigurationStem(row.path, length), row.stem) << row.stem;
    }
}

TEST(CodePage, IsUtf8AndReplacesWhatHasNoForm) {
    const struct {
        const char* narrow;
        const wchar_t* wide;
        bool both; // good in both directions
    } rows[] = {
        {"\x7F\xC2\x80\xDF\xBF", L"\x7F\x80\x7FF", true},
        {"\xE0\xA0\x80\xED\x9F\xBF\xEE\x80\x80\xEF\xBF\xBF", L"\x800\xD7FF\xE000\xFFFF", true},
        {"\xF0\x90\x80\x80\xF4\x8F\xBF\xBF", L"\xD800\xDC00\xDBFF\xDFFF", true},
        {"a\x80z", L"a\xFFFDz", false},
        {"\xC0\x80\xC1z", L"\xFFFD\xFFFD\xFFFDz", false},                   // overlong
        {"\xE0\x9F\xBF", L"\xFFFD\xFFFD\xFFFD", false},                     // overlong
        {"\xED\xA0\x80", L"\xFFFD\xFFFD\xFFFD", false},                     // surrogate
        {"\xF0\x8F\xBF\xBF", L"\xFFFD\xFFFD\xFFFD\xFFFD", false},           // overlong
        {"\xF4\x90\x80\x80\xF5", L"\xFFFD\xFFFD\xFFFD\xFFFD\xFFFD", false}, // above the last
        {"\xE2\x82z\xF0\x9F\x98", L"\xFFFDz\xFFFD", false},                 // one for a start that is cut short
    };
    wchar_t wide[16];
    char narrow[32];
    for (const auto& row : rows) {
        ASSERT_GT(Platform::AnsiToWide(row.narrow, -1, wide, 16), 0);
        EXPECT_STREQ(wide, row.wide) << row.narrow;
        if (!row.both) continue;
        ASSERT_GT(Platform::WideToAnsi(row.wide, -1, narrow, 32), 0);
        EXPECT_STREQ(narrow, row.narrow);
    }
    EXPECT_EQ(Platform::WideToAnsi(L"\xD83D\xDE00", 1, narrow, 8), 3) << "a length that cuts a pair";
    ASSERT_EQ(Platform::WideToAnsi(L"\xDC00\xD800", -1, narrow, 32), 7);
    EXPECT_STREQ(narrow, "\xEF\xBF\xBD\xEF\xBF\xBD");
    EXPECT_EQ(Platform::AnsiToWide("\xF0\x9F\x98\x80", 4, wide, 1), 0) << "a pair needs two";
    EXPECT_EQ(Platform::AnsiToWide("\xF0\x9F\x98\x80", 4, wide, 2), 2);
}

TEST(Memory, ProtectedPagesAreUnreadable) {
    char* pages =
        static_cast<char*>(mmap(nullptr, 2 * Platform::PageSize, PROT_READ, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0));
    ASSERT_NE(pages, MAP_FAILED);
    mprotect(pages + Platform::PageSize, Platform::PageSize, PROT_NONE);
    EXPECT_TRUE(Platform::IsReadable(pages + Platform::PageSize - 1)) << "the last byte before";
    EXPECT_FALSE(Platform::IsReadable(pages + Platform::PageSize));
    munmap(pages, 2 * Platform::PageSize);
    for (const std::uintptr_t address : {reinterpret_cast<std::uintptr_t>(pages), std::uintptr_t{0}, UINTPTR_MAX})
        EXPECT_FALSE(Platform::IsReadable(reinterpret_cast<void*>(address)));
}
