// Threads: what the system knows of them.

#include "platform/platform.h"

#include <gtest/gtest.h>
#include <TAVO/threading.h>
#include <thread>

using namespace TAVO::Threading;
namespace Platform = TAVO::Platform;

TEST(ThreadPriority, HasFiveLevelsOfMany_Intended) {
    struct Row {
        int level, set; // what the system gets, should the level be set
    };
    constexpr Row kLevels[] = {{-3, 0}, {-2, -15}, {-1, -2}, {0, 0}, {1, 2}, {2, 15}, {3, 0}, {-15, 0}};
    struct Reading {
        int system, level;
    };
    constexpr Reading kReadings[] = {{-15, -2}, {-2, -1}, {-1, -1}, {0, 0}, {1, 1}, {2, 1}, {15, 2}};
    std::thread([&] { // of its own, since a priority stays
        for (const Row& row : kLevels) {
            CurrentThread::OS::SetThreadPriority(static_cast<eThreadPriority>(row.level));
            EXPECT_EQ(Platform::GetThreadPriority(), row.set) << row.level;
        }
        for (const Reading& row : kReadings) {
            Platform::SetThreadPriority(row.system);
            EXPECT_EQ(CurrentThread::OS::GetThreadPriority(), row.level) << row.system;
        }
    })
        .join();
}
