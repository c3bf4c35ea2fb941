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

constexpr int kRefused = 1; // a frequency that is not told

std::int64_t g_frequency, g_ticks;
int g_failures, g_reads;

bool GetFrequency(std::int64_t& frequency) noexcept {
    frequency = g_frequency;
    return g_frequency != kRefused;
}

bool Read(std::int64_t& ticks) noexcept {
    ++g_reads;
    ticks = g_ticks;
    return g_failures-- <= 0;
}

std::uint64_t Nanoseconds(std::int64_t frequency, std::int64_t ticks, int failures = 0) {
    g_frequency = frequency, g_ticks = ticks;
    g_failures = failures, g_reads = 0;
    return ReadNanoseconds({GetFrequency, Read});
}

TEST(Clocks, NanosecondsAreExactAndFailuresGiveZero) {
    EXPECT_EQ(Nanoseconds(1000000000, 9007199254740993), 9007199254740993u) << "a double would lose the last bit";
    EXPECT_EQ(Nanoseconds(3, 10), 3333333333u);
    EXPECT_EQ(Nanoseconds(18000000000, 17999999999), 999999999u);
    EXPECT_EQ(Nanoseconds(10000000, 100LL * 365 * 86400 * 10000000 + 3), 100ULL * 365 * 86400 * 1000000000 + 300);
    EXPECT_TRUE(RoundHalfUp(499999, 1000000) == 0 && RoundHalfUp(500000, 1000000) == 1);
    EXPECT_EQ(RoundHalfUp(~0ULL, 1000), 18446744073709552u);
    for (const std::int64_t frequency : {0, -1, kRefused}) EXPECT_EQ(Nanoseconds(frequency, 5), 0u) << frequency;
    EXPECT_EQ(Nanoseconds(1000000000, 5, 3), 5u) << "the fourth attempt counts";
    EXPECT_EQ(Nanoseconds(1000000000, 5, 4), 0u);
    EXPECT_EQ(g_reads, 4);
}

// What four threads get, sorted.
std::vector<std::uint32_t> Draw(SharedTwister& shared, std::size_t perThread) {
    std::vector<std::uint32_t> words(4 * perThread);
    std::vector<std::thread> threads;
    for (std::size_t t = 0; t < 4; ++t)
        threads.emplace_back([&, t] {
            for (std::size_t i = 0; i < perThread; ++i) words[t * perThread + i] = shared.Next();
        });
    for (auto& thread : threads) thread.join();
    std::sort(words.begin(), words.end());
    return words;
}

TEST(SharedTwister, GivesTheSequenceOfItsSeedEachWordOnce) {
    constexpr std::size_t kPerThread = 624 * 40;
    SharedTwister shared;
    CMTRandom own;
    shared.Seed(5489);
    own.seed(5489);
    for (int i = 0; i < 624 * 3; ++i) ASSERT_EQ(shared.Next(), own.rnd()) << i;
    std::vector<std::uint32_t> expected(4 * kPerThread);
    for (auto& word : expected) word = own.rnd();
    std::sort(expected.begin(), expected.end());
    EXPECT_TRUE(Draw(shared, kPerThread) == expected);
    SharedTwister unseeded; // seeds itself once when threads race
    auto all = Draw(unseeded, 100);
    EXPECT_LE(all.end() - std::unique(all.begin(), all.end()), 1) << "words of one sequence, not of several alike";
}

} // namespace
