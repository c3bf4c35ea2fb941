// Events.

#include "support/heapwatch.h"

#include <TAVO/threading.h>
#include <thread>

using namespace TAVO::Threading;

TEST(Event, SmokeHandOver) {
    const CPEvent there(false), back(false);
    std::thread other([&] {
        for (int i = 0; i < 2000; ++i) {
            EXPECT_EQ(there.Wait(WaitForever), 0u);
            back.Set();
        }
    });
    for (int i = 0; i < 2000; ++i) {
        there.Set();
        EXPECT_EQ(back.Wait(60000), 0u);
    }
    other.join();
    EXPECT_EQ(back.Wait(0), WaitTimedOut);
    EXPECT_EQ(back.Wait(5), WaitTimedOut);
    CPMultipleEvent both;
    EXPECT_TRUE(both.Attach(there));
    EXPECT_TRUE(both.Attach(back));
    EXPECT_EQ(both.Wait(5), WaitTimedOut);
    back.Set();
    EXPECT_EQ(both.Wait(WaitForever), 1u);
}
