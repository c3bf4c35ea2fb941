// Threads.

#include "support/heapwatch.h"

#include <TAVO/threading.h>

using namespace TAVO::Threading;

namespace {
struct Sleeper {
    static constexpr _acfUID uid = {1, 2, 3, {}};
    void Run(unsigned long long ms) { CurrentThread::sleep(TAVO::ulong32(ms)); }
};
} // namespace

TEST(Thread, SmokeRuns) {
    const auto object = CThreadWrapper<Sleeper>::Create();
    CPThread thread;
    EXPECT_TRUE(thread.Execute(object, 1));
    EXPECT_FALSE(thread.Execute(object, 1));
    EXPECT_EQ(thread.Wait(WaitForever), 0u);
    EXPECT_EQ(CThreadWrapper<Sleeper>::From(object)->GetState(), ThreadEnded);
    EXPECT_TRUE(thread.Execute(object, 100000));
    EXPECT_EQ(thread.Wait(1), WaitTimedOut);
    EXPECT_TRUE(thread.Terminate());
    EXPECT_EQ(CThreadWrapper<Sleeper>::From(object)->GetState(), ThreadFailed);
}
