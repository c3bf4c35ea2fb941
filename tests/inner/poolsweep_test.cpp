// Sweeps and threads' priorities, and what the pool tells at the end.

#include "platform/platform.h"
#include "poolentry.h"
#include "support/log.h"

#include <gtest/gtest.h>
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

// Kept: texts that are held while the tables go stand in no table afterwards, so no sweep finds them.
TEST(PoolUnload, TellsHowManyTextsAreHeldAndLetsThemLive) {
    const CPPoolString first(L"Held at the end"), second(L"HELD AT THE END");
    std::thread([] {
        const support::Log log;
        pool::Unload();
        const std::string start = "8 TAVO source/TAVO/cstringpool:0 SPool ClearTable: ";
        EXPECT_EQ(log.Take(),
                  (support::Texts{start + "Diagnosis started", start + "diagnosis done, %u items still referenced|2"}));
    }).join();
    EXPECT_EQ(CStringPool::GetNItems(), 0u);
    EXPECT_STREQ(static_cast<const wchar_t*>(first), L"Held at the end");
    EXPECT_TRUE(CPPoolString(L"HELD AT THE END") != second) << "interning goes on, with entries of its own";
}

} // namespace
