// The platform layer: what both systems promise.

#include "platform/platform.h"

#include <cstdio>
#include <fstream>
#include <gtest/gtest.h>
#include <string>
#include <thread>
#include <vector>

using namespace TAVO;

namespace {

// What the reader finds for the key "Level" of section "Debug" in a file with this content.
int ReadLevel(const std::string& content) {
    wchar_t path[1024];
    char narrow[1024];
    bool truncated = false;
    const std::size_t length = Platform::GetModulePath(Platform::Module::Executable, path, 1000, truncated);
    for (std::size_t i = 0; i <= 4; ++i) path[length + i] = L".ini"[i]; // beside the program: the one folder known here
    Platform::WideToAnsi(path, -1, narrow, sizeof narrow);
    std::ofstream(narrow, std::ios::binary) << content;
    const int value = Platform::ReadConfigurationInteger(path, L"Debug", L"Level");
    std::remove(narrow);
    return value;
}

} // namespace

TEST(ConfigurationFile, MeansTheSameOnBothSystems) {
    const std::pair<const char*, int> rows[] = {{"[Debug]\nLevel=5\nLevel=6\n", 5},
                                                {"  [ Debug ] ; ours\n\t Level \t=\t +5 \t\r\n", 5},
                                                {"[Debug]\nLevel=0x1F\n", 31},
                                                {"[Debug]\nLevel=0X1f\n", 0},
                                                {"[Debug]\nLevel=12ab\n", 12},
                                                {"[Debug]\nLevel=\"7\"\n", 7},
                                                {"[Debug]\nLevel=4294967297\n", 1},
                                                {"[Debug]\nLevels=5\nLeve=6\n[Debugs]\nLevel=7\n[Debu]\nLevel=8", 0},
                                                {"Level=5\n[Debug]\n[Other]\nLevel=6\n[Debug]\nLevel=5\n", 0},
                                                {"[Debug\nLevel=5\n", 0}};
    for (const auto& [content, value] : rows) EXPECT_EQ(ReadLevel(content), value) << content;
    EXPECT_EQ(ReadLevel("\xEF\xBB\xBF[Debug]\nLevel=5\n"), 5) << "with a mark in front";
    std::string utf16 = "\xFF\xFE";
    for (const char c : std::string("[Debug]\r\nLevel=5\r\n")) (utf16 += c) += '\0';
    EXPECT_EQ(ReadLevel(utf16), 5);
    EXPECT_EQ(ReadLevel(utf16.substr(0, 3)), 0);

    const std::string whole = "[Debug]\nA=1\nLevel=\"0x15\"";
    for (std::size_t length = 0; length < whole.size() - 5; ++length)
        EXPECT_EQ(ReadLevel(whole.substr(0, length)), 0) << "cut at " << length;
}

TEST(Threads, HaveTheirOwnIdentityPriorityAndScope) {
    int scope = 0;
    Platform::SetReleaseScope(&scope);
    std::thread([self = Platform::GetThreadId()] {
        EXPECT_TRUE(Platform::GetThreadId() != self && Platform::GetReleaseScope() == nullptr);
        for (int level : {-15, -2, 1, 0}) {
            Platform::SetThreadPriority(level);
            EXPECT_EQ(Platform::GetThreadPriority(), level) << "a lowered thread can be raised again";
        }
    }).join();
    EXPECT_EQ(Platform::GetReleaseScope(), &scope);
    Platform::SetReleaseScope(nullptr);
}

TEST(Modules, TellATruncatedPath) {
    wchar_t path[1024];
    bool truncated = true;
    const std::size_t length = Platform::GetModulePath(Platform::Module::Executable, path, 1024, truncated);
    for (std::size_t capacity : {length + 1, length, std::size_t{8}}) {
        path[capacity] = L'#';
        const std::size_t kept = Platform::GetModulePath(Platform::Module::Executable, path, capacity, truncated);
        EXPECT_TRUE(truncated == (capacity <= length) && kept == (truncated ? capacity - 1 : length));
        EXPECT_TRUE(path[kept] == 0 && path[capacity] == L'#');
    }
}
