// The stack of pieces against a vector.

#include "stack.h"
#include "support/heapwatch.h"

#include <random>
#include <vector>

namespace {

TEST(Stack, GrowsAndShrinksAsAVectorOfWhatNeverMoves) {
    TAVO::Stack<int> stack;
    std::vector<int*> model; // where each element was put
    std::mt19937 random(1);
    std::size_t highest = 0;
    for (int round = 0; round < 200; ++round) {
        // Mostly up in the first half, mostly down in the second, over many pieces.
        for (std::size_t left = random() % 1000 + (round < 100 ? 500 : 0); left; --left) {
            model.push_back(stack.Add());
            ASSERT_NE(model.back(), nullptr);
            *model.back() = round;
        }
        highest = std::max(highest, model.size());
        for (std::size_t left = random() % 1000 + (round < 100 ? 0 : 500); left && !model.empty(); --left) {
            ASSERT_EQ(&stack.Last(), model.back());
            stack.Pop();
            model.pop_back();
        }
        std::vector<const int*> seen;
        stack.ForEach([&](const int& element) { return seen.push_back(&element), seen.size() < 20000; });
        ASSERT_TRUE(seen.size() == std::min<std::size_t>(model.size(), 20000) &&
                    std::equal(seen.begin(), seen.end(), model.begin()));
        ASSERT_TRUE(stack.Count() == model.size() && stack.Empty() == model.empty());
    }
    EXPECT_GT(highest, 40000u);
}

TEST(Stack, WithoutMemoryItStaysAsItIs) {
    TAVO::Stack<int> stack;
    support::FailingHeap heap(2);
    int count = 0;
    while (stack.Push(count)) ++count;
    EXPECT_TRUE(count > 0 && stack.Last() == count - 1 && stack.Count() == static_cast<std::size_t>(count));
}

} // namespace
