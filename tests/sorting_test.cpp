// Sorting and searching of raw arrays, and the checksum machine, against slow readings of their rules.

#include "support/guardpage.h"

#include <algorithm>
#include <cmath>
#include <gtest/gtest.h>
#include <random>
#include <string>
#include <TAVO/buffers.h>
#include <vector>

using namespace TAVO::Buffers;

namespace {

struct Element {
    int key;
    int tag; // tells equal keys apart
    bool operator==(const Element& other) const { return key == other.key && tag == other.tag; }
};
using Elements = std::vector<Element>;

int CompareKeys(const void* a, const void* b) {
    const int x = static_cast<const Element*>(a)->key, y = static_cast<const Element*>(b)->key;
    return x < y ? -5 : x > y ? 7 : 0;
}

// The stated sort, word by word, recursive: where equal elements end up is part of the contract.
void SlowSort(Elements& v, long lo, long hi) {
    if (hi - lo + 1 <= 8) {
        for (long end = hi; end > lo; --end) {
            long most = lo;
            for (long i = lo + 1; i <= end; ++i)
                if (v[i].key > v[most].key) most = i;
            std::swap(v[most], v[end]);
        }
        return;
    }
    std::swap(v[lo], v[lo + (hi - lo + 1) / 2]);
    const int pivot = v[lo].key;
    long left = lo, right = hi + 1;
    for (;;) {
        do ++left;
        while (left <= hi && v[left].key <= pivot);
        do --right;
        while (right > lo && v[right].key >= pivot);
        if (right < left) break;
        std::swap(v[left], v[right]);
    }
    std::swap(v[lo], v[right]);
    if (right - 1 > lo) SlowSort(v, lo, right - 1);
    if (hi > left) SlowSort(v, left, hi);
}

Elements RandomElements(std::mt19937& random, std::size_t count, unsigned keys) {
    Elements elements(count);
    for (std::size_t i = 0; i < count; ++i) elements[i] = {static_cast<int>(random() % keys), static_cast<int>(i)};
    return elements;
}

// Intended: sort-equal-elements
TEST(Sort, PlacesEqualElementsAsStatedIntended) {
    std::mt19937 random(1);
    // A random long range never runs out of patience, so the same holds there.
    for (std::size_t count = 0; count <= 20000; count += count < 80 ? 1 : count < 1000 ? 59 : 6007)
        for (const unsigned keys : {1u, 2u, 7u, 40u, 1u << 30}) {
            if (count > 1024 && keys <= 40) continue;
            Elements sorted = RandomElements(random, count, keys), expected = sorted;
            if (count) SlowSort(expected, 0, static_cast<long>(count) - 1);
            Sort::vfqsort(sorted.data(), count, sizeof(Element), CompareKeys);
            ASSERT_EQ(sorted, expected) << count << " elements of " << keys << " keys";
        }
}

TEST(Sort, MovesElementsOfEverySizeWhole) {
    std::mt19937 random(2);
    for (std::size_t size = 1; size <= 41; ++size) {
        std::vector<std::string> expected(137, std::string(size, 0));
        std::string bytes, sorted;
        for (auto& element : expected) {
            for (auto& byte : element) byte = static_cast<char>(random() % 3);
            bytes += element;
        }
        std::sort(expected.begin(), expected.end());
        for (const auto& element : expected) sorted += element;
        Sort::vfpqsort(bytes.data(), 137, size, &size, [](const void* a, const void* b, void* context) {
            return std::memcmp(a, b, *static_cast<std::size_t*>(context));
        });
        ASSERT_EQ(bytes, sorted) << size;
    }
    int untouched[] = {2, 1};
    Sort::vfqsort(untouched, 1, sizeof(int), nullptr);
    Sort::vfqsort(untouched, 2, 0, nullptr);
    Sort::vfqsort(nullptr, 0, sizeof(int), nullptr);
    EXPECT_EQ(untouched[0], 2);
}

// Counts comparisons and, when asked, fixes each value only when it has to: the worst order for any quicksort.
struct Adversary {
    std::vector<int> values;
    std::size_t comparisons = 0;
    int solid = 0, gas = 0, candidate = 0;

    static int Compare(const void* a, const void* b, void* context) {
        auto& self = *static_cast<Adversary*>(context);
        ++self.comparisons;
        const int x = *static_cast<const int*>(a), y = *static_cast<const int*>(b);
        int &vx = self.values[static_cast<std::size_t>(x)], &vy = self.values[static_cast<std::size_t>(y)];
        if (vx == self.gas && vy == self.gas) (x == self.candidate ? vx : vy) = self.solid++;
        if (vx == self.gas)
            self.candidate = x;
        else if (vy == self.gas)
            self.candidate = y;
        return vx < vy ? -1 : vx > vy;
    }
};

TEST(Sort, IsNeverQuadraticOnLongArrays) {
    for (const int n : {1025, 5000, 60000})
        for (const bool organPipe : {true, false}) {
            Adversary counter;
            std::vector<int> indexes;
            for (int i = 0; i < n; ++i)
                counter.values.push_back(organPipe ? std::min(i, n - i) : n), indexes.push_back(i);
            counter.gas = organPipe ? -1 : n;
            Sort::vfpqsort(indexes.data(), indexes.size(), sizeof(int), &counter, Adversary::Compare);
            // Ranges of up to 1024 elements may be quadratic.
            EXPECT_LT(static_cast<double>(counter.comparisons), n * (512 + 12 * std::log2(n))) << n;
            for (int& index : indexes) index = counter.values[static_cast<std::size_t>(index)];
            EXPECT_TRUE(std::is_sorted(indexes.begin(), indexes.end())) << n;
        }
}

// A context that allows so many comparisons and then throws.
struct Fuse {
    std::size_t left;
    static int Compare(const void* a, const void* b, void* context) {
        if (static_cast<Fuse*>(context)->left-- == 0) throw 1;
        return CompareKeys(a, b);
    }
};

TEST(Sort, ThrowingComparisonLeavesAPermutation) {
    std::mt19937 random(3);
    const Elements original = RandomElements(random, 3000, 2);
    for (std::size_t allowed = 0; allowed < 40000; allowed = allowed * 5 / 4 + 1) {
        Elements elements = original;
        Fuse fuse{allowed};
        Sort::vfpqsort(elements.data(), elements.size(), sizeof(Element), &fuse, Fuse::Compare);
        std::sort(elements.begin(), elements.end(), [](const Element& a, const Element& b) { return a.tag < b.tag; });
        ASSERT_EQ(elements, original);
    }
}

TEST(Search, FindsTheLowerBound) {
    Elements elements;
    for (int count = 0; count <= 70; ++count, elements.push_back({count / 3 * 2, count})) // runs of equal keys
        for (int key = -1; key <= count + 1; ++key) {
            const Element wanted{key, -1}; // a tag that no element has: the key comes first
            std::size_t expected = 0;
            while (expected < elements.size() && elements[expected].key < key) ++expected;
            const auto compare = [](const void* a, const void* b) {
                EXPECT_EQ(static_cast<const Element*>(a)->tag, -1);
                return CompareKeys(a, b);
            };
            ASSERT_EQ(Sort::vfqfind(&wanted, elements.data(), elements.size(), sizeof(Element), compare), expected);
            Fuse fuse{9}; // 2 for the ends and one for each halving
            ASSERT_EQ(Sort::vfpqsearch(&wanted, elements.data(), elements.size(), sizeof wanted, &fuse, Fuse::Compare),
                      expected);
        }
    Fuse blown{2};
    EXPECT_EQ(Sort::vfpqsearch(&elements[5], elements.data(), 70, sizeof(Element), &blown, Fuse::Compare), 70u);
}

constexpr unsigned long long kPoolPolynomial = 0x42F0E1EBA9EA3693;

unsigned long long BitByBit(unsigned width, unsigned long long polynomial, const unsigned char* data,
                            std::size_t length, unsigned long long initial) {
    const unsigned long long mask = ~0ULL >> (64 - width);
    unsigned long long crc = initial & mask;
    for (std::size_t i = 0; i < length; ++i)
        for (int bit = 7; bit >= 0; --bit) {
            const bool out = (crc >> (width - 1) & 1) != (data[i] >> bit & 1u);
            crc = (crc << 1 ^ (out ? polynomial : 0)) & mask;
        }
    return crc;
}

TEST(Checksum, AgreesWithBitByBitInEveryWidth) {
    const support::GuardedMemory memory;
    std::mt19937_64 random(4);
    unsigned char data[700];
    for (auto& byte : data) byte = static_cast<unsigned char>(random());
    for (unsigned width = 9; width <= 64; ++width) {
        const auto polynomial = random(), initial = random(); // bits above the width too
        const CMachineCRC machine(width, polynomial);
        for (std::size_t length = 0; length <= 64; ++length)
            ASSERT_EQ(machine.Eval(data + length / 3, length - length / 3, machine.Eval(data, length / 3, initial)),
                      BitByBit(width, polynomial, data, length, initial))
                << width << ", " << length;
    }
    const CMachineCRC machine(64, kPoolPolynomial);
    for (std::size_t length = 0; length <= 700; length += length < 150 ? 1 : 50)
        for (std::size_t offset = 0; offset < 17; ++offset) { // from the end of the memory
            auto* const place = static_cast<unsigned char*>(std::memcpy(memory.End() - length - offset, data, length));
            ASSERT_EQ(machine.Eval(place, length, 1), BitByBit(64, kPoolPolynomial, data, length, 1)) << length;
        }
    EXPECT_EQ(CMachineCRC(16, 0x1021).Eval("123456789", 9, 0xFFFF), 0x29B1u) << "the well-known check value";
}

// Intended: crc-eight-bits
TEST(Checksum, OfEightBitsComputesNothingIntended) {
    for (const unsigned width : {0u, 7u, 8u, 65u, 0xFFFFFFFFu})
        EXPECT_EQ(CMachineCRC(width, 0x07).Eval("abc", 3, 0x1234), 0x1234u) << width;
}

} // namespace
