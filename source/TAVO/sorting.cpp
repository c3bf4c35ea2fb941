// Sorting and searching of raw arrays.

#include <bit>
#include <cstring>
#include <TAVO/buffers.h>

namespace TAVO::Buffers {

void swap(void* first, void* second, std::size_t size) noexcept {
    if (first == second) return;
    auto* a = static_cast<unsigned char*>(first);
    auto* b = static_cast<unsigned char*>(second);
    for (; size >= 8; size -= 8, a += 8, b += 8) {
        std::uint64_t x, y;
        std::memcpy(&x, a, 8);
        std::memcpy(&y, b, 8);
        std::memcpy(a, &y, 8);
        std::memcpy(b, &x, 8);
    }
    for (; size; --size, ++a, ++b) {
        const unsigned char x = *a;
        *a = *b;
        *b = x;
    }
}

namespace Sort {

namespace {

// The one sort behind both spellings. Ranges are inclusive, in element indexes.
// Intended (sort-equal-elements): not stable, and yet every step is fixed, since the order of equal elements is visible
// to callers. A textbook sort would promise one or nothing.
template <class Order> class Sorter {
public:
    Sorter(void* base, std::size_t size, Order order)
        : m_base(static_cast<char*>(base)), m_size(size), m_order(order) {}

    void Run(std::size_t count) {
        Range pending[64]; // the larger part waits, so the depth stays below the bits of the count
        unsigned waiting = 0;
        Range range{0, count - 1, 2 * static_cast<unsigned>(std::bit_width(count))};
        for (;;) {
            const std::size_t items = range.hi - range.lo + 1;
            if (items <= kShort || (items > kLong && range.lopsidedLeft == 0)) {
                items <= kShort ? SelectionSort(range.lo, range.hi) : HeapSort(range.lo, items);
                if (waiting == 0) return;
                range = pending[--waiting];
                continue;
            }
            std::size_t left, right;
            Partition(range.lo, range.hi, left, right);
            // [lo, right) and [left, hi]; right is where the pivot stands.
            const std::size_t lower = right - range.lo, upper = left > range.hi ? 0 : range.hi - left + 1;
            if ((lower < upper ? lower : upper) < items / 8 && range.lopsidedLeft) --range.lopsidedLeft;
            const Range first{range.lo, right - (lower ? 1 : 0), range.lopsidedLeft};
            const Range second{left, range.hi, range.lopsidedLeft};
            const bool lowerWaits = lower >= upper; // equal parts: the left one waits
            const Range &larger = lowerWaits ? first : second, &smaller = lowerWaits ? second : first;
            if ((lowerWaits ? lower : upper) >= 2) pending[waiting++] = larger;
            if ((lowerWaits ? upper : lower) >= 2) {
                range = smaller;
            } else {
                if (waiting == 0) return;
                range = pending[--waiting];
            }
        }
    }

private:
    static constexpr std::size_t kShort = 8;   // finished by the selection sort
    static constexpr std::size_t kLong = 1024; // above this a range may run out of patience with bad pivots

    struct Range {
        std::size_t lo, hi;
        unsigned lopsidedLeft; // bad partitions until a long range is finished by the heap sort
    };

    char* At(std::size_t index) const { return m_base + index * m_size; }
    void Swap(std::size_t a, std::size_t b) { Buffers::swap(At(a), At(b), m_size); }
    int Compare(std::size_t a, std::size_t b) const { return m_order(At(a), At(b)); }

    // Leaves the pivot at `right`, elements at most equal to it before, at least equal from `left` on.
    void Partition(std::size_t lo, std::size_t hi, std::size_t& left, std::size_t& right) {
        Swap(lo, lo + (hi - lo + 1) / 2);
        left = lo;
        right = hi + 1;
        for (;;) {
            do ++left;
            while (left <= hi && Compare(left, lo) < 1);
            do --right;
            while (right > lo && Compare(right, lo) >= 0);
            if (right < left) break;
            Swap(left, right);
        }
        Swap(lo, right);
    }

    void SelectionSort(std::size_t lo, std::size_t hi) {
        for (std::size_t end = hi; end > lo; --end) {
            std::size_t most = lo;
            for (std::size_t i = lo + 1; i <= end; ++i)
                if (Compare(i, most) > 0) most = i;
            Swap(most, end);
        }
    }

    void HeapSort(std::size_t lo, std::size_t count) {
        for (std::size_t root = count / 2; root-- > 0;) Sink(lo, root, count);
        for (std::size_t end = count - 1; end > 0; --end) {
            Swap(lo, lo + end);
            Sink(lo, 0, end);
        }
    }

    void Sink(std::size_t lo, std::size_t root, std::size_t count) {
        for (std::size_t child; (child = 2 * root + 1) < count; root = child) {
            if (child + 1 < count && Compare(lo + child, lo + child + 1) < 0) ++child;
            if (Compare(lo + root, lo + child) >= 0) return;
            Swap(lo + root, lo + child);
        }
    }

    char* m_base;
    std::size_t m_size;
    Order m_order;
};

template <class Order> void Quicksort(void* base, std::size_t count, std::size_t size, Order order) noexcept {
    if (count < 2 || size == 0) return;
    try {
        Sorter<Order>(base, size, order).Run(count);
    } catch (...) {
        // Elements only ever change places, so the array is still a permutation of what it was.
    }
}

template <class Order>
std::size_t LowerBound(const void* key, const void* base, std::size_t count, std::size_t size, Order order) noexcept {
    const auto at = [=](std::size_t index) { return static_cast<const char*>(base) + index * size; };
    try {
        if (count == 0 || order(key, at(0)) < 1) return 0;
        if (order(key, at(count - 1)) > 0) return count;
        // The key is behind element `low` and not behind element `high`.
        std::size_t low = 0, high = count - 1;
        while (high - low > 1) {
            const std::size_t middle = low + (high - low) / 2;
            (order(key, at(middle)) < 1 ? high : low) = middle;
        }
        return high;
    } catch (...) {
        return count;
    }
}

} // namespace

void vfqsort(void* base, std::size_t count, std::size_t size, Compare compare) noexcept {
    Quicksort(base, count, size, compare);
}

void vfpqsort(void* base, std::size_t count, std::size_t size, void* context, CompareWith compare) noexcept {
    Quicksort(base, count, size, [=](const void* a, const void* b) { return compare(a, b, context); });
}

std::size_t vfqfind(const void* key, const void* base, std::size_t count, std::size_t size, Compare compare) noexcept {
    return LowerBound(key, base, count, size, compare);
}

std::size_t vfpqsearch(const void* key, const void* base, std::size_t count, std::size_t size, void* context,
                       CompareWith compare) noexcept {
    return LowerBound(key, base, count, size, [=](const void* a, const void* b) { return compare(a, b, context); });
}

} // namespace Sort
} // namespace TAVO::Buffers
