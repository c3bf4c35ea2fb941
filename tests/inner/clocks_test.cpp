// The arithmetic of the clocks and the generator that all threads share.

#include "clocks.h"
#include "random.h"

#include <algorithm>
#include <gtest/gtest.h>
#include <TAVO/develop.h>
#include <thread>
#include <vector>

using namespace TAVO::Develop;

namespace {

std::int64_t g_frequency, g_ticks;
bool g_hasFrequency;
int g_failures, g_reads;

bool GetFrequency(std::int64_t& frequency) noexcept {
    frequency = g_frequency;
    return g_hasFrequency;
}

bool Read(std::int64_t& ticks) noexcept {
    ++g_reads;
    ticks = g_ticks;
    return g_failures-- <= 0;
}

std::uint64_t Nanoseconds(std::int64_t frequency, std::int64_t ticks, int failures = 0) {
    g_frequency = frequency;
    g_ticks = ticks;
    g_hasFrequency = true;
    g_failures = failures;
    g_reads = 0;
    return ReadNanoseconds({GetFrequency, Read});
}

TEST(Clocks, NanosecondsAreExact) {
    EXPECT_EQ(Nanoseconds(1000000000, 9007199254740993), 9007199254740993u) << "a double would lose the last bit";
    EXPECT_EQ(Nanoseconds(3, 10), 3333333333u);
    EXPECT_EQ(Nanoseconds(18000000000, 17999999999), 999999999u);
    EXPECT_EQ(Nanoseconds(10000000, 100LL * 365 * 86400 * 10000000 + 3), 100ULL * 365 * 86400 * 1000000000 + 300);
    EXPECT_EQ(RoundHalfUp(499999, 1000000), 0u);
    EXPECT_EQ(RoundHalfUp(500000, 1000000), 1u);
    EXPECT_EQ(RoundHalfUp(~0ULL, 1000), 18446744073709552u);
}

TEST(Clocks, FailuresGiveZeroAndAreNotRemembered) {
    EXPECT_EQ(Nanoseconds(0, 5), 0u);
    EXPECT_EQ(Nanoseconds(-1, 5), 0u);
    g_hasFrequency = false;
    EXPECT_EQ(ReadNanoseconds({GetFrequency, Read}), 0u);
    EXPECT_EQ(Nanoseconds(1000000000, 5, 3), 5u) << "the fourth attempt counts";
    EXPECT_EQ(g_reads, 4);
    EXPECT_EQ(Nanoseconds(1000000000, 5, 4), 0u);
    EXPECT_EQ(g_reads, 4);
}

// What four threads get, sorted.
std::vector<std::uint32_t> Draw(SharedTwister& shared, int perThread) {
    std::vector<std::vector<std::uint32_t>> got(4);
    std::vector<std::thread> threads;
    for (auto& words : got)
        threads.emplace_back([&] {
            for (int i = 0; i < perThread; ++i) words.push_back(shared.Next());
        });
    for (auto& thread : threads) thread.join();
    std::vector<std::uint32_t> all;
    for (const auto& words : got) all.insert(all.end(), words.begin(), words.end());
    std::sort(all.begin(), all.end());
    return all;
}

TEST(SharedTwister, EqualsTheObjectOfTheSameSeed) {
    SharedTwister shared;
    CMTRandom own;
    shared.Seed(5489);
    own.seed(5489);
    for (int i = 0; i < 624 * 5 + 3; ++i) ASSERT_EQ(shared.Next(), own.rnd()) << i;
}

TEST(SharedTwister, ThreadsGetEachWordExactlyOnce) {
    constexpr int kPerThread = 624 * 40;
    SharedTwister shared;
    shared.Seed(42);
    CMTRandom own;
    own.seed(42);
    std::vector<std::uint32_t> expected;
    for (int i = 0; i < 4 * kPerThread; ++i) expected.push_back(own.rnd());
    std::sort(expected.begin(), expected.end());
    EXPECT_TRUE(Draw(shared, kPerThread) == expected);
}

TEST(SharedTwister, SeedsItselfOnceWhenThreadsRace) {
    SharedTwister shared;
    auto all = Draw(shared, 100);
    EXPECT_LE(all.end() - std::unique(all.begin(), all.end()), 1) << "words of one sequence, not of several alike";
}

} // namespace
