// Sweeps and threads' priorities, and what the pool tells at the end.

#include "platform/platform.h"
#include "poolentry.h"

#include <cstdarg>
#include <gtest/gtest.h>
#include <string>
#include <TAVO/develop.h>
#include <thread>

using namespace TAVO;
using namespace TAVO::String;

namespace {

// Intended: collect-priority
TEST(PoolSweepInner, OnlyThreadsOfNormalPrioritySweepIntended) {
    for (const int priority : {-15, -1, 1, 15, 0})
        std::thread([=] {
            Platform::SetThreadPriority(priority);
            EXPECT_EQ(CStringPool::Collect(60000), priority == 0) << priority;
        }).join();
}

std::string g_lines;
unsigned g_referenced;
void KeepLine(_acfDebugLevel level, const wchar_t*, const char* source, long32, const wchar_t* format,
              std::va_list arguments) {
    g_lines += std::to_string(level) + " " + source + " ";
    for (; *format; ++format) {
        g_lines += static_cast<char>(*format);
        if (*format == L'%') g_referenced = va_arg(arguments, unsigned);
    }
    g_lines += "\n";
}

// Kept: texts that are held while the tables go stand in no table afterwards, so no sweep finds them.
TEST(PoolUnload, TellsHowManyTextsAreHeldAndLetsThemLive) {
    const CPPoolString first(L"Held at the end"), second(L"HELD AT THE END");
    std::thread([] {
        Develop::SetExternalLogger(KeepLine);
        pool::Unload();
        Develop::SetExternalLogger(nullptr);
    }).join();
    EXPECT_EQ(g_lines, "8 source/TAVO/cstringpool SPool ClearTable: Diagnosis started\n"
                       "8 source/TAVO/cstringpool SPool ClearTable: diagnosis done, %u items still referenced\n");
    EXPECT_EQ(g_referenced, 2u);
    EXPECT_EQ(CStringPool::GetNItems(), 0u);
    EXPECT_STREQ(static_cast<const wchar_t*>(first), L"Held at the end");
    EXPECT_TRUE(CPPoolString(L"HELD AT THE END") != second) << "interning goes on, with entries of its own";
}

} // namespace
