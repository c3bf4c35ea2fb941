// The platform layer: what both systems promise.

#include "platform/platform.h"

#include <gtest/gtest.h>
#include <string>
#include <thread>
#include <vector>

using namespace TAVO;

TEST(CodePage, FollowsTheCallProtocol) {
    wchar_t wide[8];
    char narrow[8];
    EXPECT_EQ(Platform::AnsiToWide("abc", -1, nullptr, 0), 4) << "with the terminator";
    EXPECT_EQ(Platform::AnsiToWide("abc", -7, wide, 4), 4) << "any negative length";
    EXPECT_STREQ(wide, L"abc");
    EXPECT_EQ(Platform::AnsiToWide("abc", -1, wide, 3), 0) << "too small";
    EXPECT_EQ(Platform::AnsiToWide("abc", 2, wide, 2), 2) << "no terminator";
    EXPECT_EQ(Platform::AnsiToWide("abc", 0, wide, 8), 0);
    EXPECT_EQ(Platform::AnsiToWide("abc", -1, wide, -1), 0);
    EXPECT_EQ(Platform::AnsiToWide(nullptr, -1, wide, 8), 0);
    EXPECT_EQ(Platform::WideToAnsi(L"abc", -1, nullptr, 0), 4);
    EXPECT_EQ(Platform::WideToAnsi(L"abc", -7, narrow, 4), 4);
    EXPECT_STREQ(narrow, "abc");
    EXPECT_EQ(Platform::WideToAnsi(L"abc", -1, narrow, 3), 0);
    EXPECT_EQ(Platform::WideToAnsi(L"abc", 2, narrow, 2), 2);
    EXPECT_EQ(Platform::WideToAnsi(L"abc", 0, narrow, 8), 0);
    EXPECT_EQ(Platform::WideToAnsi(L"abc", -1, narrow, -1), 0);
    EXPECT_EQ(Platform::WideToAnsi(nullptr, -1, narrow, 8), 0);
}

TEST(Memory, TellsReadableFromUnreadable) {
    static const char constant[] = "x";
    int local = 0;
    EXPECT_TRUE(Platform::IsReadable(constant));
    EXPECT_TRUE(Platform::IsReadable(&local));
    EXPECT_FALSE(Platform::IsReadable(nullptr));
    EXPECT_FALSE(Platform::IsReadable(reinterpret_cast<void*>(16)));
    EXPECT_FALSE(Platform::IsReadable(reinterpret_cast<void*>(~std::uintptr_t{0}))) << "the system's half";
}

TEST(Threads, HaveTheirOwnIdentityPriorityAndScope) {
    const std::uint32_t self = Platform::GetThreadId();
    EXPECT_NE(self, 0u);
    EXPECT_EQ(Platform::GetThreadId(), self);
    int scope = 0;
    Platform::SetReleaseScope(&scope);
    std::thread([&] {
        EXPECT_NE(Platform::GetThreadId(), 0u);
        EXPECT_NE(Platform::GetThreadId(), self);
        EXPECT_EQ(Platform::GetReleaseScope(), nullptr);
        int other = 0;
        Platform::SetReleaseScope(&other);
        for (int level : {-15, -2, 1, 0}) {
            Platform::SetThreadPriority(level);
            EXPECT_EQ(Platform::GetThreadPriority(), level) << "a lowered thread can be raised again";
        }
    }).join();
    EXPECT_EQ(Platform::GetReleaseScope(), &scope);
    Platform::SetReleaseScope(nullptr);
    EXPECT_EQ(Platform::GetThreadPriority(), 0);
}

TEST(Modules, TellATruncatedPath) {
    wchar_t whole[1024];
    bool truncated = true;
    const std::size_t length = Platform::GetModulePath(Platform::Module::Executable, whole, 1024, truncated);
    ASSERT_GT(length, 16u);
    EXPECT_FALSE(truncated);
    EXPECT_EQ(whole[length], 0);
    for (std::size_t capacity : {length + 1, length, std::size_t{8}}) {
        std::vector<wchar_t> cut(capacity + 1, L'#');
        const std::size_t kept = Platform::GetModulePath(Platform::Module::Executable, cut.data(), capacity, truncated);
        EXPECT_EQ(truncated, capacity <= length);
        EXPECT_EQ(kept, truncated ? capacity - 1 : length);
        EXPECT_EQ(cut[kept], 0);
        EXPECT_EQ(cut[capacity], L'#');
    }
}
