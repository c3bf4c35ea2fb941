// The stopwatch's word under a clock of the test's own.

#include "lapse.h"

#include <gtest/gtest.h>

using namespace TAVO::Develop::lapse;

TEST(StopwatchWord, HoldsStartOrTime) {
    constexpr std::uint64_t kYears292 = 1ULL << 63;
    const struct {
        std::uint64_t start, now, elapsed;
    } rows[] = {
        {0, 0, 0}, {5, 1000000005, 1000000000}, {kYears292 - 1, kYears292 + 6, 7}, {kYears292 + 3, kYears292 + 4, 1}};
    for (const auto& row : rows) {
        const Word running = StartedAt(row.start), stopped = StoppedAt(running, row.now);
        EXPECT_TRUE(Runs(running) && !Runs(stopped));
        EXPECT_EQ(Elapsed(running, row.now), row.elapsed);
        EXPECT_EQ(stopped, row.elapsed * 2);
        EXPECT_EQ(StoppedAt(stopped, row.now + 99), stopped) << "stays";
    }
}
