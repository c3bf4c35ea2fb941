// Vectors of handles against std::vector, what their holders share, and the set of one object per type.

#include "support/assertions.h"
#include "support/heapwatch.h"

#include <algorithm>
#include <gtest/gtest.h>
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
        switch (random() % 8) {
        case 0:
        case 1:
        case 2:
            ASSERT_TRUE(vector.Insert(objects[static_cast<std::size_t>(number)], at));
            model.insert(place, number);
            break;
        case 3: // one of its own elements
            if (model.empty()) break;
            ASSERT_TRUE(vector.Insert(vector[at % model.size()], at));
            model.insert(place, int{model[at % model.size()]});
            break;
        case 4: {
            const bool there = at < model.size();
            ASSERT_EQ(vector.Delete(at, random() % 2), there);
            if (there) model.erase(place);
            break;
        }
        case 5:
            if (random() % 4) break;
            ASSERT_TRUE(vector.Resize(at));
            model.resize(at, -1);
            break;
        case 6: {
            std::size_t expected = at + 1;
            while (expected < model.size() && model[expected] != number) ++expected;
            const auto found = vector.Find(objects[static_cast<std::size_t>(number)], at);
            ASSERT_EQ(found, expected < model.size() ? expected : NotFound);
            break;
        }
        default:
            ASSERT_TRUE(vector.Reserve(at + random() % 20));
        }
        ASSERT_EQ(vector.GetNItems(), model.size());
        ASSERT_EQ(vector.isEmpty(), model.empty());
        if (step % 16 == 0) {
            ASSERT_EQ(vector.Numbers(), model);
            for (int i = 0; i < 6; ++i)
                ASSERT_EQ(objects[static_cast<std::size_t>(i)].lockcnt(),
                          1 + std::count(model.begin(), model.end(), i));
        }
    }
}

TEST(Vectors, GrowBySixteenIntended) {
    Vector vector;
    const Numbered object(1);
    for (std::size_t count = 1; count <= 49; ++count) {
        ASSERT_TRUE(vector.Insert(object, kHuge));
        EXPECT_EQ(vector.Room(), (count + 15) / 16 * 16) << count;
    }
    ASSERT_TRUE(vector.Resize(65));
    EXPECT_EQ(vector.Room(), 65u) << "exactly";
    EXPECT_TRUE(vector[64].key() == 0);
    ASSERT_TRUE(vector.Insert(object, 0));
    EXPECT_EQ(vector.Room(), 81u);
    ASSERT_TRUE(vector.Alloc(0));
    EXPECT_EQ(vector.key(), 0u);
    ASSERT_TRUE(vector.Alloc(3));
    EXPECT_EQ(vector.Numbers(), (std::vector<int>{-1, -1, -1}));
    std::size_t count;
    EXPECT_EQ(vector.GetArray(count), &vector[0]);
    EXPECT_EQ(count, 3u);
    EXPECT_EQ(Vector().GetArray(count), nullptr);
    EXPECT_EQ(count, 0u);
    EXPECT_EQ(object.lockcnt(), 1u);
}

TEST(Vectors, DeletingTheLastElement) {
    Vector vector = VectorOf({7});
    EXPECT_FALSE(vector.Delete(1, true));
    EXPECT_TRUE(vector.Delete(0, false));
    EXPECT_NE(vector.key(), 0u);
    EXPECT_TRUE(vector.isEmpty());
    EXPECT_FALSE(vector.Delete(0, true));
    vector = VectorOf({7, 8});
    EXPECT_TRUE(vector.Delete(0, true));
    EXPECT_EQ(vector.Numbers(), std::vector<int>{8});
    EXPECT_TRUE(vector.Delete(0, true));
    EXPECT_EQ(vector.key(), 0u);
}

TEST(Vectors, FindGoesOnFromTheLastResult) {
    Vector vector;
    const Numbered wanted(1), same(1);
    for (const auto& object : {wanted, same, wanted, same}) ASSERT_TRUE(vector.Insert(object, kHuge));
    EXPECT_EQ(vector.Find(wanted, kHuge), 0u);
    EXPECT_EQ(vector.Find(wanted, 0), 2u);
    EXPECT_EQ(vector.Find(wanted, 2), NotFound) << "equal bytes are not the same block";
    EXPECT_EQ(vector.Find(same, 2), 3u);
    EXPECT_EQ(vector.Find(same, 3), NotFound);
    EXPECT_EQ(vector.Find(same, 1000), NotFound);
    EXPECT_EQ(vector.Find(CPObjectMemory(), kHuge), NotFound);
}

TEST(Vectors, ChangesInPlaceReachAllHoldersIntended) {
    Vector vector = VectorOf({1, 2, 3});
    Vector sharer(vector);
    EXPECT_TRUE(vector.Insert(Numbered(9), 1));
    EXPECT_EQ(sharer.Numbers(), (std::vector<int>{1, 9, 2, 3}));
    EXPECT_TRUE(sharer.Resize(2));
    EXPECT_EQ(vector.Numbers(), (std::vector<int>{1, 9}));
    EXPECT_TRUE(vector.Resize(16));
    EXPECT_EQ(sharer.GetNItems(), 16u);
    EXPECT_TRUE(vector.Insert(Numbered(4), 0)) << "no room: a block of its own";
    EXPECT_EQ(sharer.GetNItems(), 16u);
    EXPECT_EQ(vector.GetNItems(), 17u);
    EXPECT_EQ(sharer.lockcnt(), 1u);
    EXPECT_EQ(sharer[0].lockcnt(), 2u) << "the element is shared";
    Vector reserved(sharer);
    EXPECT_TRUE(reserved.Reserve(17));
    EXPECT_NE(reserved.key(), sharer.key());
    EXPECT_EQ(reserved.Numbers(), sharer.Numbers());
    EXPECT_TRUE(sharer.clone());
    EXPECT_EQ(sharer[0].lockcnt(), 3u);
}

TEST(Vectors, RefuseWhatCannotBeCounted) {
    Vector vector = VectorOf({1});
    for (const std::size_t count : {std::size_t{1} << 32, std::size_t{1} << 61, (std::size_t{1} << 61) + 2, kHuge}) {
        EXPECT_FALSE(vector.Reserve(count)) << count;
        EXPECT_FALSE(vector.Resize(count)) << count;
        EXPECT_FALSE(Vector().Alloc(count)) << count;
        EXPECT_TRUE(Vector(count).isEmpty());
        EXPECT_EQ(vector.Numbers(), std::vector<int>{1});
    }
}

TEST(Vectors, AreTypesOfTheirOwn) {
    const CPObjectVector<CPPoolString> strings(2);
    EXPECT_EQ(strings.GetNItems(), 2u);
    EXPECT_TRUE(strings[1].isnull()) << "its empty element";
    EXPECT_NE(CPOMVector::GetTypeID(), CPObjectVector<CPPoolString>::GetTypeID());
    const Numbered plain(5);
    Vector odd = VectorOf({1, 2});
    ASSERT_TRUE(odd.Delete(1, false)); // so that the broken size below covers no element twice
    Vector target = VectorOf({3});
    target = static_cast<const CPObjectMemory&>(odd);
    EXPECT_EQ(target.key(), odd.key());
    target = static_cast<const CPObjectMemory&>(strings);
    EXPECT_EQ(target.key(), 0u);
    target = VectorOf({3});
    target = static_cast<const CPObjectMemory&>(plain);
    EXPECT_EQ(target.key(), 0u);
    target = VectorOf({3});
    ASSERT_TRUE(odd.SetSize(12)); // one element and a half
    target = static_cast<const CPObjectMemory&>(odd);
    EXPECT_EQ(target.key(), 0u);
    EXPECT_EQ(CPOMVector(static_cast<const CPObjectMemory&>(odd)).key(), 0u);
    ASSERT_TRUE(odd.SetSize(8));
    target = VectorOf({3});
    target = CPObjectMemory();
    EXPECT_EQ(target.key(), 0u);
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
    EXPECT_TRUE(vector.Delete(2, true));
    EXPECT_TRUE(vector.Resize(2));
    EXPECT_TRUE(vector.Delete(0, true));
    EXPECT_TRUE(vector.Delete(0, true));
    EXPECT_EQ(g_seen, (std::vector<std::size_t>{5, 4, 3, 2, 1, 0}));
}

int CompareNumbers(const void* a, const void* b) {
    return Numbered::Of(*static_cast<const CPObjectMemory*>(a)) - Numbered::Of(*static_cast<const CPObjectMemory*>(b));
}

TEST(Vectors, SortInPlace) {
    Vector vector = VectorOf({5, 3, 9, 1, 1, 7, 8, 2, 6, 4, 0});
    const Vector sharer(vector);
    vector.Sort(CompareNumbers);
    EXPECT_EQ(sharer.Numbers(), (std::vector<int>{0, 1, 1, 2, 3, 4, 5, 6, 7, 8, 9}));
    Vector().Sort(CompareNumbers);
}

// A vector in constant data: any write ends the test program.
struct ConstantVector {
    tagCPOMEMHEADER header;
    void* elements[4];
};
const ConstantVector kStatic{{0, 32, 24, &CPOMVector::_vtbl}, {}};
class StaticVector : public Vector {
public:
    StaticVector() { m_pMH = const_cast<tagCPOMEMHEADER*>(&kStatic.header); }
};

TEST(Vectors, StaticOnesAreLeftForNewBlocks) {
    using Change = bool (*)(Vector&);
    const std::pair<Change, std::vector<int>> changes[] = {
        {[](Vector& v) { return v.Insert(Numbered(1), 1); }, {-1, 1, -1, -1}},
        {[](Vector& v) { return v.Delete(0, true); }, {-1, -1}},
        {[](Vector& v) { return v.Resize(1); }, {-1}},
        {[](Vector& v) { return v.Resize(4); }, {-1, -1, -1, -1}},
        {[](Vector& v) { return v.Resize(9); }, std::vector<int>(9, -1)},
        {[](Vector& v) { return v.Reserve(4); }, {-1, -1, -1}},
        {[](Vector& v) { return v.Sort(CompareNumbers), true; }, {-1, -1, -1}},
    };
    for (const auto& [change, expected] : changes) {
        StaticVector vector;
        EXPECT_TRUE(change(vector));
        EXPECT_EQ(vector.Numbers(), expected);
        EXPECT_EQ(vector.lockcnt(), 1u);
    }
}

TEST(Vectors, WithoutMemoryStayAsTheyWere) {
    const Numbered object(3);
    support::ForEachFailingAllocation([&] {
        Vector vector(16), sharer;
        if (vector.isEmpty()) return;
        if (vector.Insert(object, 2))
            EXPECT_EQ(Numbered::Of(vector[2]), 3);
        else
            EXPECT_EQ(vector.Numbers(), std::vector<int>(16, -1));
        sharer = vector;
        const auto before = vector.Numbers();
        const bool resized = sharer.Resize(100);
        EXPECT_EQ(sharer.GetNItems(), resized ? 100u : before.size());
        const bool reserved = sharer.Reserve(200);
        EXPECT_EQ(sharer.Room() >= 200, reserved);
        EXPECT_EQ(vector.Numbers(), before);
    });
    EXPECT_EQ(object.lockcnt(), 1u);
}

// --- the set of one object per type ----------------------------------------------------------------------------------

void CloneWord(void* target, const void* source, std::size_t) {
    *static_cast<long long*>(target) = *static_cast<const long long*>(source);
}
constexpr tagCPOVTABL kTypes[] = {{Nothing, CloneWord, Nothing, nullptr},
                                  {Nothing, CloneWord, Nothing, nullptr},
                                  {Nothing, CloneWord, Nothing, nullptr},
                                  {Nothing, CloneWord, Nothing, nullptr}};
constexpr tagCPOVTABL kUncopyable{Nothing, nullptr, Nothing, nullptr};
std::size_t Id(int type) { return reinterpret_cast<std::size_t>(&kTypes[type]); }

class Word : public CPObjectMemory {
public:
    Word(const CPObjectMemory& other) : CPObjectMemory(other) {}
    Word(const tagCPOVTABL& table, long long value) {
        if (Alloc(sizeof value, &table)) Value() = value;
    }
    long long& Value() const { return *static_cast<long long*>(Payload()); }
};

TEST(TypedVector, HoldsOneObjectOfEachType) {
    CPTypedObjectVector set;
    EXPECT_FALSE(set.Set(CPObjectMemory()));
    for (const int type : {2, 0, 3, 1, 0}) EXPECT_TRUE(set.Set(Word(kTypes[type], type * 10 + 1)));
    EXPECT_TRUE(set.Set(Word(kTypes[2], 99)));
    for (int type = 0; type < 4; ++type) EXPECT_EQ(Word(set.Get(Id(type))).Value(), type == 2 ? 99 : type * 10 + 1);
    EXPECT_TRUE(set.Delete(Id(0)));
    EXPECT_TRUE(set.Delete(Id(0)));
    EXPECT_EQ(set.Get(Id(0)).key(), 0u);
    EXPECT_EQ(Word(set.Get(Id(3))).Value(), 31);
    for (int type = 1; type < 4; ++type) EXPECT_TRUE(set.Delete(Id(type)));
    EXPECT_EQ(set.Get(Id(3)).key(), 0u);
    const support::Assertions assertions;
    EXPECT_FALSE(set.Set(Word(kUncopyable, 1)));
    EXPECT_EQ(set.Get(reinterpret_cast<std::size_t>(&kUncopyable)).key(), 0u);
}

TEST(TypedVector, GivesAndTakesPrivateCopies) {
    CPTypedObjectVector set;
    const Word object(kTypes[1], 1);
    ASSERT_TRUE(set.Set(object));
    EXPECT_EQ(object.lockcnt(), 1u);
    object.Value() = 2;
    const Word got(set.Get(Id(1)));
    EXPECT_EQ(got.Value(), 1);
    got.Value() = 3;
    EXPECT_EQ(Word(set.Get(Id(1))).Value(), 1);

    CPTypedObjectVector copy(set), assigned;
    assigned = set;
    ASSERT_TRUE(copy.Set(Word(kTypes[1], 4)));
    ASSERT_TRUE(assigned.Delete(Id(1)));
    ASSERT_TRUE(set.Set(Word(kTypes[2], 5)));
    EXPECT_EQ(Word(set.Get(Id(1))).Value(), 1);
    EXPECT_EQ(Word(copy.Get(Id(1))).Value(), 4);
    EXPECT_EQ(copy.Get(Id(2)).key(), 0u);
    EXPECT_EQ(assigned.Get(Id(1)).key(), 0u);
}

TEST(TypedVector, WithoutMemoryStaysAsItWas) {
    const Word first(kTypes[0], 1), second(kTypes[1], 2);
    support::ForEachFailingAllocation([&] {
        CPTypedObjectVector set;
        const bool one = set.Set(first);
        const CPTypedObjectVector copy(set);
        const bool two = set.Set(second);
        const bool gone = set.Delete(Id(0));
        const Word got(set.Get(Id(1)));
        EXPECT_TRUE(two || !got.key());
        EXPECT_TRUE((one && !gone) || !set.Get(Id(0)).key());
        EXPECT_EQ(copy.Get(Id(1)).key(), 0u);
    });
}

} // namespace
