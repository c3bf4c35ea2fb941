#pragma once
// The twister's rules, and the generator that all threads share.

#include <atomic>
#include <cstdint>

namespace TAVO::Develop {

constexpr std::uint32_t kTwisterWords = 624;
constexpr std::uint32_t kTwisterDistance = 397;

// The word that follows `previous` at `index` of a freshly seeded state.
constexpr std::uint32_t SeedWord(std::uint32_t previous, std::uint32_t index) {
    return 1812433253u * (previous ^ (previous >> 30)) + index;
}

// The regenerated word from itself, the one behind it and the one 397 places on.
constexpr std::uint32_t Twist(std::uint32_t word, std::uint32_t next, std::uint32_t distant) {
    const std::uint32_t value = ((word & 0x80000001u) | (next & 0x7FFFFFFEu)) >> 1 ^ distant;
    // Intended (random-oddness): the new value is tested for oddness, where the reference twister tests `next`. Seeds
    // that hosts stored must keep their sequences.
    return value & 1 ? value ^ 0x9908B0DFu : value;
}

constexpr std::uint32_t Temper(std::uint32_t word) {
    word ^= word >> 11;
    word ^= (word << 7) & 0x9D2C5680u;
    word ^= (word << 15) & 0xEFC60000u;
    return word ^ word >> 18;
}

// Hands each word of the twister's sequence to exactly one caller, without a lock. Any thread.
//
// Rounds of 624 words lie alternately in two blocks: round r in block r mod 2. One position, round and index in one
// number that only rises, is claimed by compare-and-swap: a word read before a successful claim is therefore of that
// round. While round r is handed out, the block of round r + 1 is ready or being made.
class SharedTwister {
public:
    constexpr SharedTwister() noexcept = default;

    // Starts the sequence of `seed`. Requires: nobody calls Next meanwhile.
    void Seed(std::uint32_t seed) noexcept;
    // The next number; seeds itself from the clock when nobody has.
    std::uint32_t Next() noexcept;

private:
    using Block = std::atomic<std::uint32_t>[kTwisterWords];

    // Indexes above 624 belong to nobody: the switch to the next round is under way, or the first seeding.
    static constexpr std::uint64_t kUnseeded = 0xFFFF;

    std::uint32_t SwitchRound(std::uint64_t round) noexcept;
    void MakeRound(std::uint64_t round) noexcept;
    void Wait() noexcept;

    std::atomic<std::uint64_t> m_position{kUnseeded}; // round << 16 | index
    std::atomic<std::uint64_t> m_ready{0};            // the last round that is completely made
    std::atomic<bool> m_seeding{false};
    Block m_blocks[2] = {};
};

} // namespace TAVO::Develop
