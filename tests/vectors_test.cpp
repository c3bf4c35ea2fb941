// Vectors of handles against std::vector, what their holders share, and the set of one object per type.

#include "support/heapwatch.h"
#include "support/log.h"

#include <algorithm>
#include <gtest/gtest.h>
#include <map>
#include <random>
#include <TAVO/string.h>
#include <vector>

using namespace TAVO::Buffers;
using TAVO::String::CPPoolString;

namespace {

constexpr std::size_t kHuge = ~std::size_t{0};

// An object with a number.
class Numbered : public CPPlainMemory {
public:
    Numbered() = default;
    explicit Numbered(int number) {
        if (Alloc(sizeof number)) *static_cast<int*>(static_cast<void*>(*this)) = number;
    }
    static int Of(const CPObjectMemory& object) {
        return object.key() ? *static_cast<int*>(static_cast<void*>(static_cast<const Numbered&>(object))) : -1;
    }
};

class Vector : public CPOMVector {
public:
    using CPOMVector::CPOMVector;
    using CPOMVector::operator=;
    using CPOMVector::GetAllocSize;
    using CPOMVector::SetSize;
    std::size_t Room() const { return GetAllocSize() / sizeof(CPObjectMemory); }
    std::vector<int> Numbers() const {
        std::vector<int> numbers;
        for (std::size_t i = 0; i < GetNItems(); ++i) numbers.push_back(Numbered::Of((*this)[i]));
        return numbers;
    }
};

Vector VectorOf(std::initializer_list<int> numbers) {
    Vector vector;
    for (const int number : numbers) EXPECT_TRUE(vector.Insert(Numbered(number), kHuge));
    return vector;
}

TEST(Vectors, BehaveLikeTheModel) {
    std::mt19937 random(1);
    std::vector<Numbered> objects;
    for (int i = 0; i < 6; ++i) objects.emplace_back(i);
    Vector vector;
    std::vector<int> model;
    for (int step = 0; step < 20000; ++step) {
        const std::size_t at = random() % (model.size() + 2);
        const auto place = model.begin() + static_cast<long>(std::min(at, model.size()));
        const int number = static_cast<int>(random() % objects.size());
        const Numbered& object = objects[static_cast<std::size_t>(number)];
        const unsigned kind = random() % 32;
        if (kind < 12) {
            ASSERT_TRUE(vector.Insert(object, at));
            model.insert(place, number);
        } else if (kind < 16 && !model.empty()) {
            ASSERT_TRUE(vector.Insert(vector[at % model.size()], at)) << "one of its own elements";
            model.insert(place, int{model[at % model.size()]});
        } else if (kind < 21) {
            const bool there = at < model.size(), release = random() % 2;
            ASSERT_EQ(vector.Delete(at, release), there);
            if (there) model.erase(place);
            ASSERT_TRUE(!there || !model.empty() || (vector.key() == 0) == release);
        } else if (kind < 22) {
            ASSERT_TRUE(vector.Resize(at));
            model.resize(at, -1);
        } else if (kind < 26) {
            ASSERT_TRUE(vector.Reserve(at + random() % 20));
        }
        const auto from = model.begin() + static_cast<long>(std::min(at + 1, model.size()));
        const auto found = std::find(from, model.end(), number) - model.begin();
        const bool there = static_cast<std::size_t>(found) < model.size();
        ASSERT_EQ(vector.Find(object, at), there ? static_cast<std::size_t>(found) : NotFound);
        if (step % 16) continue;
        ASSERT_EQ(vector.Numbers(), model);
        ASSERT_EQ(object.lockcnt(), 1 + std::count(model.begin(), model.end(), number));
    }
    const Vector twins = VectorOf({1, 1});
    EXPECT_EQ(twins.Find(twins[1], kHuge), 1u) << "equal bytes are not the same block";
}

// Intended: vector-growth
TEST(Vectors, GrowBySixteenIntended) {
    Vector vector;
    for (std::size_t count = 1; count <= 49; ++count) {
        ASSERT_TRUE(vector.Insert(Numbered(1), kHuge));
        EXPECT_EQ(vector.Room(), (count + 15) / 16 * 16) << count;
    }
    EXPECT_TRUE(vector.Resize(65) && vector.Room() == 65) << "exactly";
    EXPECT_TRUE(vector.Insert(Numbered(1), 0) && vector.Room() == 81);
    std::size_t count;
    EXPECT_TRUE(vector.Alloc(0) && !vector.key() && vector.GetArray(count) == nullptr && count == 0);
    EXPECT_TRUE(vector.Alloc(3) && vector.GetArray(count) == &vector[0] && count == 3);
    for (const std::size_t many : {std::size_t{1} << 32, std::size_t{1} << 61, (std::size_t{1} << 61) + 2, kHuge})
        EXPECT_FALSE(vector.Reserve(many) || vector.Resize(many) || Vector().Alloc(many)) << many;
    EXPECT_EQ(vector.Numbers(), (std::vector<int>{-1, -1, -1}));
}

int CompareNumbers(const void* a, const void* b) {
    return Numbered::Of(*static_cast<const CPObjectMemory*>(a)) - Numbered::Of(*static_cast<const CPObjectMemory*>(b));
}

// Intended: vector-shared
TEST(Vectors, ChangesInPlaceReachAllHoldersIntended) {
    Vector vector = VectorOf({1, 3, 2}), sharer(vector);
    EXPECT_TRUE(vector.Insert(Numbered(9), 1));
    vector.Sort(CompareNumbers);
    EXPECT_EQ(sharer.Numbers(), (std::vector<int>{1, 2, 3, 9}));
    EXPECT_TRUE(sharer.Resize(2) && vector.Resize(16) && sharer.GetNItems() == 16);
    EXPECT_TRUE(vector.Insert(Numbered(4), 0)) << "no room: a block of its own";
    EXPECT_TRUE(vector.GetNItems() == 17 && sharer.GetNItems() == 16 && sharer.lockcnt() == 1);
    EXPECT_EQ(sharer[0].lockcnt(), 2u) << "the element is shared";
    Vector reserved(sharer);
    EXPECT_TRUE(reserved.Reserve(17) && reserved.key() != sharer.key() && reserved.Numbers() == sharer.Numbers());
}

TEST(Vectors, AreTypesOfTheirOwn) {
    const CPObjectVector<CPPoolString> strings(2);
    EXPECT_TRUE(strings.GetNItems() == 2 && strings[1].isnull()) << "its empty element";
    Vector odd = VectorOf({1, 2});
    ASSERT_TRUE(odd.Delete(1, false) && odd.SetSize(12)); // one element and a half
    for (const CPObjectMemory& other : std::initializer_list<CPObjectMemory>{strings, Numbered(5), odd, {}}) {
        Vector target = VectorOf({3});
        target = other;
        EXPECT_TRUE(target.key() == 0 && CPOMVector(other).key() == 0);
    }
    ASSERT_TRUE(odd.SetSize(8));
}

// An object whose end looks at the vector that held it.
Vector* g_watched;
std::vector<std::size_t> g_seen;
void Nothing(void*, std::size_t) {}
void LookAtVector(void*, std::size_t) {
    g_seen.push_back(g_watched->GetNItems());
    for (std::size_t i = 0; i < g_watched->GetNItems(); ++i)
        if (CPObjectMemory((*g_watched)[i]).lockcnt() < 2) ADD_FAILURE() << "a dead element at " << i;
}
constexpr tagCPOVTABL kWatching{Nothing, nullptr, LookAtVector, nullptr};
class Watching : public CPObjectMemory {
public:
    Watching() { EXPECT_TRUE(Alloc(8, &kWatching)); }
};

TEST(Vectors, AreWholeWhenAnElementEnds) {
    Vector vector;
    g_watched = &vector;
    g_seen.clear();
    for (int i = 0; i < 6; ++i) ASSERT_TRUE(vector.Insert(Watching(), kHuge));
    EXPECT_TRUE(vector.Delete(2, true) && vector.Resize(2) && vector.Delete(0, true) && vector.Delete(0, true));
    EXPECT_EQ(g_seen, (std::vector<std::size_t>{5, 4, 3, 2, 1, 0}));
}

// A vector of three in constant data: any write ends the test program.
const struct {
    tagCPOMEMHEADER header;
    void* elements[4];
} kStatic{{0, 32, 24, &CPOMVector::_vtbl}, {}};
class StaticVector : public Vector {
public:
    StaticVector() { m_pMH = const_cast<tagCPOMEMHEADER*>(&kStatic.header); }
};

TEST(Vectors, StaticOnesAreLeftForNewBlocks) {
    using Change = bool (*)(Vector&);
    const std::pair<Change, std::size_t> changes[] = {
        {[](Vector& v) { return v.Insert({}, 1); }, 4}, {[](Vector& v) { return v.Delete(0, true); }, 2},
        {[](Vector& v) { return v.Resize(1); }, 1},     {[](Vector& v) { return v.Resize(9); }, 9},
        {[](Vector& v) { return v.Reserve(4); }, 3},    {[](Vector& v) { return v.Sort(CompareNumbers), true; }, 3}};
    for (const auto& [change, count] : changes) {
        StaticVector vector;
        EXPECT_TRUE(change(vector));
        EXPECT_EQ(vector.Numbers(), std::vector<int>(count, -1));
        EXPECT_EQ(vector.lockcnt(), 1u);
    }
}

TEST(Vectors, WithoutMemoryStayAsTheyWere) {
    const Numbered object(3);
    support::ForEachFailingAllocation([&] {
        Vector vector(16);
        if (vector.isEmpty()) return;
        const bool inserted = vector.Insert(object, 2);
        EXPECT_TRUE(vector.GetNItems() == (inserted ? 17 : 16) && Numbered::Of(vector[2]) == (inserted ? 3 : -1));
        Vector sharer(vector);
        const auto before = vector.Numbers();
        const bool resized = sharer.Resize(100), reserved = sharer.Reserve(200);
        EXPECT_TRUE(resized == (sharer.GetNItems() == 100) && reserved == (sharer.Room() >= 200));
        EXPECT_EQ(vector.Numbers(), before);
        CPTypedObjectVector set;
        EXPECT_TRUE(set.Set(object) || set.Get(CPPlainMemory::GetTypeID()).key() == 0);
    });
    EXPECT_EQ(object.lockcnt(), 1u);
}

void CloneNumber(void* target, const void* source, std::size_t) {
    *static_cast<int*>(target) = *static_cast<const int*>(source);
}
constexpr tagCPOVTABL kTypes[5] = {{Nothing, CloneNumber, Nothing, nullptr},
                                   {Nothing, CloneNumber, Nothing, nullptr},
                                   {Nothing, CloneNumber, Nothing, nullptr},
                                   {Nothing, CloneNumber, Nothing, nullptr},
                                   {Nothing, nullptr, Nothing, nullptr}}; // the last cannot be copied

struct Typed : CPObjectMemory {
    explicit Typed(const CPObjectMemory& other) : CPObjectMemory(other) {}
    Typed(std::size_t type, int value) { Alloc(sizeof value, &kTypes[type]) ? void(Value() = value) : void(); }
    int& Value() const { return *static_cast<int*>(Payload()); }
};

TEST(TypedVector, BehavesLikeAMapOfPrivateCopies) {
    std::mt19937 random(2);
    CPTypedObjectVector sets[2];
    std::map<std::size_t, int> models[2];
    for (int step = 0; step < 5000; ++step) {
        const std::size_t which = random() % 2, how = random() % 8, type = random() % 4;
        const auto id = reinterpret_cast<std::size_t>(&kTypes[type]);
        if (how == 0) {
            sets[which] = sets[!which];
            models[which] = models[!which];
        } else if (how < 3) {
            ASSERT_TRUE(sets[which].Delete(id));
            models[which].erase(type);
        } else if (how < 5) {
            const Typed given(type, step);
            ASSERT_TRUE(sets[which].Set(given));
            given.Value() = -2;
            models[which][type] = step;
        } else {
            const Typed got(sets[which].Get(id));
            ASSERT_EQ(got.key() ? got.Value() : -1, models[which].count(type) ? models[which][type] : -1);
            if (got.key()) got.Value() = -3;
        }
    }
    const support::Assertions assertions;
    EXPECT_FALSE(sets[0].Set(CPObjectMemory()) || sets[0].Set(Typed(4, 1)));
}

} // namespace
