// Threads: what the system knows of them.

#include "platform/platform.h"

#include <gtest/gtest.h>
#include <TAVO/threading.h>
#include <thread>

using namespace TAVO::Threading;
namespace Platform = TAVO::Platform;

// Intended: priority-levels
TEST(ThreadPriority, HasFiveLevelsOfMany_Intended) {
    // The level, and what the system gets, should the level be set; then what the system has, and the level told.
    constexpr int kLevels[][2] = {{-3, 0}, {-2, -15}, {-1, -2}, {0, 0}, {1, 2}, {2, 15}, {3, 0}, {-15, 0}};
    constexpr int kReadings[][2] = {{-15, -2}, {-2, -1}, {-1, -1}, {0, 0}, {1, 1}, {2, 1}, {15, 2}};
    std::thread([&] { // of its own, since a priority stays
        for (const auto& [level, set] : kLevels) {
            CurrentThread::OS::SetThreadPriority(static_cast<eThreadPriority>(level));
            EXPECT_EQ(Platform::GetThreadPriority(), set) << level;
        }
        for (const auto& [system, level] : kReadings) {
            Platform::SetThreadPriority(system);
            EXPECT_EQ(CurrentThread::OS::GetThreadPriority(), level) << system;
        }
    })
        .join();
}
