// Allocation.

#include <algorithm>
#include <gtest/gtest.h>
#include <TAVO/core.h>

namespace OS = TAVO::Core::OS;

TEST(Allocation, CornersFollowTheProcessHeap) {
    void* empty = OS::_falloc(0);
    ASSERT_NE(empty, nullptr);
    EXPECT_EQ(OS::_frealloc(nullptr, 16), nullptr);
    void* kept = OS::_frealloc(empty, 0);
    ASSERT_NE(kept, nullptr);
    OS::_ffree(kept);
    OS::_ffree(nullptr);
}

TEST(Allocation, RefusesAbsurdSizesAndAlignsTo16) {
    EXPECT_EQ(OS::_falloc(static_cast<std::size_t>(-1)), nullptr);
    for (std::size_t size : {8u, 17u, 40u, 4096u}) {
        auto* block = static_cast<char*>(OS::_falloc(size));
        EXPECT_EQ(reinterpret_cast<std::uintptr_t>(block) % 16, 0u) << size;
        block[size - 1] = 'x';
        EXPECT_EQ(OS::_frealloc(block, static_cast<std::size_t>(-100)), nullptr);
        EXPECT_EQ(block[size - 1], 'x') << "the old block stays";
        OS::_ffree(block);
    }
}

TEST(Allocation, ResizedBlocksKeepWhatTheyHold) {
    constexpr std::size_t kMega = std::size_t{1} << 20;
    std::size_t held = 100;
    auto* block = static_cast<unsigned char*>(OS::_falloc(held));
    for (std::size_t i = 0; i < held; ++i) block[i] = static_cast<unsigned char>(i % 251);
    for (const std::size_t size :
         {kMega, 4 * kMega - 1, 4 * kMega, 9 * kMega, 40 * kMega, 41 * kMega, 5 * kMega, kMega, held}) {
        block = static_cast<unsigned char*>(OS::_frealloc(block, size));
        ASSERT_NE(block, nullptr);
        for (std::size_t i = 0; i < std::min(held, size); ++i) ASSERT_EQ(block[i], i % 251) << size;
        for (std::size_t i = held; i < size; ++i) block[i] = static_cast<unsigned char>(i % 251);
        held = size;
    }
    OS::_ffree(block);
}
