// Random numbers: the twister as an object, and the one that all threads share.

#include "random.h"

#include "platform/platform.h"

#include <TAVO/develop.h>

namespace TAVO::Develop {

namespace {

constexpr double kLargestOutput = 4294967295.0;

std::uint32_t SeedFromClock() { return static_cast<std::uint32_t>(_now_nano()); }

constinit SharedTwister g_twister;

} // namespace

// --- CMTRandom -----------------------------------------------------------------------------------------------------

CMTRandom::CMTRandom() : m_modulus(0), m_factor(1.0 / kLargestOutput) { seed(SeedFromClock()); }

void CMTRandom::seed(std::uint32_t value) {
    m_state[0] = value;
    for (std::uint32_t i = 1; i < kTwisterWords; ++i) m_state[i] = SeedWord(m_state[i - 1], i);
    // Intended (random-first-outputs): the seeded words themselves are the first 624 outputs. The reference twister
    // regenerates first.
    m_index = 0;
}

void CMTRandom::maxrnd(std::uint32_t maximum) { m_modulus = maximum + 1; }
void CMTRandom::maxdrnd(double factor) { m_factor = factor; }

std::uint32_t CMTRandom::Next() {
    if (m_index >= kTwisterWords) {
        for (std::uint32_t i = 0; i < kTwisterWords; ++i)
            m_state[i] =
                Twist(m_state[i], m_state[(i + 1) % kTwisterWords], m_state[(i + kTwisterDistance) % kTwisterWords]);
        m_index = 0;
    }
    return Temper(m_state[m_index++]);
}

std::uint32_t CMTRandom::rnd() {
    const std::uint32_t output = Next();
    return m_modulus ? output % m_modulus : output;
}

double CMTRandom::drnd() { return Next() * m_factor; }

// --- the shared generator ------------------------------------------------------------------------------------------

void SharedTwister::Seed(std::uint32_t seed) noexcept {
    m_seeding.store(true, std::memory_order_relaxed);
    Block& first = m_blocks[0];
    std::uint32_t word = seed;
    for (std::uint32_t i = 0; i < kTwisterWords; ++i) {
        if (i) word = SeedWord(word, i);
        first[i].store(word, std::memory_order_relaxed);
    }
    MakeRound(1);
    m_position.store(0, std::memory_order_release);
}

// Makes the round from the one before, which lies in the other block, as the regeneration in place would.
void SharedTwister::MakeRound(std::uint64_t round) noexcept {
    Block& made = m_blocks[round & 1];
    const Block& before = m_blocks[~round & 1];
    const auto read = [](const Block& block, std::uint32_t i) { return block[i].load(std::memory_order_relaxed); };
    const auto look = [&](std::uint32_t i) {
        return i < kTwisterWords ? read(before, i) : read(made, i - kTwisterWords);
    };
    for (std::uint32_t i = 0; i < kTwisterWords; ++i)
        made[i].store(Twist(read(before, i), look(i + 1), look(i + kTwisterDistance)), std::memory_order_relaxed);
    m_ready.store(round, std::memory_order_release);
}

std::uint32_t SharedTwister::Next() noexcept {
    for (;;) {
        std::uint64_t position = m_position.load(std::memory_order_acquire);
        const std::uint64_t round = position >> 16;
        const auto index = static_cast<std::uint32_t>(position & 0xFFFF);
        if (TAVO_UNLIKELY(index > kTwisterWords)) {
            Wait();
            continue;
        }
        // Read before the claim: once the claim has succeeded the block may be made anew.
        const std::uint32_t word =
            index < kTwisterWords ? m_blocks[round & 1][index].load(std::memory_order_relaxed) : 0;
        if (!m_position.compare_exchange_weak(position, position + 1, std::memory_order_acq_rel)) continue;
        return Temper(index < kTwisterWords ? word : SwitchRound(round));
    }
}

// Whoever claimed the index behind the last word leads over to the next round and gets its first word.
std::uint32_t SharedTwister::SwitchRound(std::uint64_t round) noexcept {
    while (m_ready.load(std::memory_order_acquire) != round + 1) Platform::YieldThread();
    const std::uint32_t word = m_blocks[(round + 1) & 1][0].load(std::memory_order_relaxed);
    m_position.store((round + 1) << 16 | 1, std::memory_order_release);
    MakeRound(round + 2);
    return word;
}

void SharedTwister::Wait() noexcept {
    const bool seeded = m_position.load(std::memory_order_relaxed) != kUnseeded;
    if (!seeded && !m_seeding.exchange(true)) return Seed(SeedFromClock());
    Platform::YieldThread();
}

std::uint32_t _random() { return g_twister.Next(); }
double _drandom(double maximum) { return _random() * (maximum / kLargestOutput); }

} // namespace TAVO::Develop
