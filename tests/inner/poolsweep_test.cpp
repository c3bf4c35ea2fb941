// Sweeps and threads' priorities, and what the pool tells at the end.

#include "platform/platform.h"
#include "poolentry.h"

#include <cstdarg>
#include <gtest/gtest.h>
#include <string>
#include <TAVO/develop.h>
#include <thread>
#include <vector>

using namespace TAVO;
using namespace TAVO::String;

namespace {

TEST(PoolSweepInner, OnlyThreadsOfNormalPrioritySweepIntended) {
    for (const int priority : {-15, -1, 1, 15})
        std::thread([=] {
            Platform::SetThreadPriority(priority);
            EXPECT_FALSE(CStringPool::Collect(60000)) << priority;
        }).join();
    std::thread([] {
        Platform::SetThreadPriority(15);
        Platform::SetThreadPriority(0);
        EXPECT_TRUE(CStringPool::Collect(60000));
    }).join();
}

std::vector<std::string> g_lines;
unsigned g_referenced;
void KeepLine(_acfDebugLevel level, const wchar_t*, const char* source, long32, const wchar_t* format,
              std::va_list arguments) {
    std::string line(std::to_string(level) + " " + source + " ");
    for (; *format; ++format) {
        line += static_cast<char>(*format);
        if (*format == L'%') g_referenced = va_arg(arguments, unsigned);
    }
    g_lines.push_back(line);
}

// Kept: texts that are held while the tables go stand in no table afterwards, so no sweep finds them.
TEST(PoolUnload, TellsHowManyTextsAreHeldAndLetsThemLive) {
    const CPPoolString first(L"Held at the end"), second(L"HELD AT THE END");
    std::thread([] {
        Develop::SetExternalLogger(KeepLine);
        pool::Unload();
        Develop::SetExternalLogger(nullptr);
    }).join();
    const std::vector<std::string> expected{
        "8 source/TAVO/cstringpool SPool ClearTable: Diagnosis started",
        "8 source/TAVO/cstringpool SPool ClearTable: diagnosis done, %u items still referenced"};
    EXPECT_EQ(g_lines, expected);
    EXPECT_EQ(g_referenced, 2u);
    EXPECT_EQ(CStringPool::GetNItems(), 0u);
    EXPECT_STREQ(static_cast<const wchar_t*>(first), L"Held at the end");
    EXPECT_TRUE(CPPoolString(L"HELD AT THE END") != second) << "interning goes on, with entries of its own";
}

} // namespace
