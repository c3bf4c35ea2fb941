// Threads that a host started with the Boost that the library uses, too.

#include <boost/thread/thread_only.hpp>
#include <gtest/gtest.h>
#include <TAVO/threading.h>

using namespace TAVO::Threading;

TEST(ForeignThread, IsNotInterruptedByWaits) {
    bool asked = false;
    const CPEvent event(false);
    boost::thread host([&] {
        event.Wait(WaitForever);
        EXPECT_EQ(event.Wait(2), WaitTimedOut);
        CurrentThread::sleep(2);
        asked = boost::this_thread::interruption_requested();
    });
    host.interrupt();
    event.Set();
    host.join();
    EXPECT_TRUE(asked) << "still to be answered by the host";
}
