// Blocks and their handles: counting, copying on write, static blocks, releases that nest or fail; plain memory;
// vectors of handles against std::vector, what their holders share, and the set of one object per type.

#include "support/heapwatch.h"
#include "support/log.h"

#include <algorithm>
#include <atomic>
#include <cstring>
#include <map>
#include <random>
#include <TAVO/string.h>
#include <thread>

using namespace TAVO::Buffers;
using support::Texts, TAVO::String::CPPoolString;

namespace {

constexpr std::size_t kHuge = ~std::size_t{0};

// What payloads were asked to do.
std::atomic<int> g_cloned, g_finalized;
std::atomic<std::size_t> g_finalizedBytes;

void CreateNothing(void*, std::size_t) {}
void CloneCounted(void* target, const void* source, std::size_t bytes) {
    ++g_cloned;
    std::memcpy(target, source, bytes);
}
void CloneThrowing(void*, const void*, std::size_t) { throw 1; }
void FinalizeCounted(void*, std::size_t bytes) { ++g_finalized, g_finalizedBytes = bytes; }
void FinalizeThrowing(void*, std::size_t) { throw 1; }

constexpr tagCPOVTABL kCounted{CreateNothing, CloneCounted, FinalizeCounted, nullptr};
constexpr tagCPOVTABL kUncopyable{CreateNothing, nullptr, FinalizeCounted, nullptr};
constexpr tagCPOVTABL kCopyThrows{CreateNothing, CloneThrowing, FinalizeCounted, nullptr};
constexpr tagCPOVTABL kEndThrows{CreateNothing, CloneCounted, FinalizeThrowing, nullptr};

// The operations that typed classes use.
class Handle : public CPObjectMemory {
public:
    Handle() = default;
    explicit Handle(const CPObjectMemory& other) : CPObjectMemory(other) {}
    explicit Handle(tagCPOMEMHEADER* header) : CPObjectMemory(header) {}
    Handle(std::size_t size, const tagCPOVTABL& table) { EXPECT_TRUE(Alloc(size, &table)); }
    using CPObjectMemory::Alloc, CPObjectMemory::GetAllocSize, CPObjectMemory::Incalloc, CPObjectMemory::Payload,
        CPObjectMemory::Reserve, CPObjectMemory::SetSize;
    char* Bytes() const { return static_cast<char*>(Payload()); }
    std::string Text() const { return std::string(Bytes(), GetSize()); }
    int& Number() const { return *static_cast<int*>(Payload()); }
};

// A block that stands in constant data: any write ends the test program.
struct ConstantBlock {
    tagCPOMEMHEADER header;
    char payload[16];
    Handle Take() const { return Handle(const_cast<tagCPOMEMHEADER*>(&header)); }
};
constexpr ConstantBlock kStatic{{0, 16, 16, &kCounted}, "static payload."};
constexpr ConstantBlock kVeryStatic{{-7, 16, 8, &kCounted}, "static payload."};

class ObjectMemory : public testing::Test {
protected:
    void SetUp() override { g_cloned = 0, g_finalized = 0; }
    support::Assertions m_assertions;
};

TEST_F(ObjectMemory, CountsFollowTheHandles) {
    std::mt19937 random(1);
    const Handle blocks[] = {Handle(8, kCounted), Handle(24, kCounted), Handle()};
    Handle handles[6];
    std::vector<std::size_t> model(6, 2); // which block each holds
    for (int step = 0; step < 5000; ++step) {
        const std::size_t to = random() % 6, from = random() % 6, block = random() % 3, how = random() % 4;
        const std::size_t held = how < 2 ? block : model[from];
        if (how == 0) handles[to] = blocks[block];
        if (how == 1) handles[to] = Handle(blocks[block]);
        if (how == 2) handles[to] = handles[from];
        if (how == 3) handles[to] = std::move(handles[from]), model[from] = 2;
        model[to] = held;
        ASSERT_EQ(handles[to].key(), blocks[held].key());
        ASSERT_EQ(blocks[held].lockcnt(), held == 2 ? 0 : 1 + std::count(model.begin(), model.end(), held));
    }
    EXPECT_EQ(g_finalized, 0);
    EXPECT_EQ(blocks[0].key(), (reinterpret_cast<std::uintptr_t>(blocks[0].Payload()) - sizeof(tagCPOMEMHEADER)) / 8);
}

TEST_F(ObjectMemory, KnowsItsType) {
    const Handle block(24, kCounted), empty;
    const auto counted = reinterpret_cast<std::size_t>(&kCounted), other = reinterpret_cast<std::size_t>(&kEndThrows);
    const std::size_t ids[] = {other, other, counted, counted};
    EXPECT_FALSE(block.IsType(other) || empty.IsType(0) || empty.IsType(counted) || !block.IsType(counted));
    EXPECT_TRUE(block.GetType(ids, 4) == 2 && block.GetType(ids, 2) == 0xFFFFFFFF);
    for (std::size_t size = 0; size <= 48; ++size) {
        EXPECT_EQ(block.IsAssignable(size, &kCounted), size > 0 && size <= 24) << size;
        EXPECT_EQ(block.IsNAssignable(size, &kCounted), size > 0 && 24 % size == 0) << size;
        EXPECT_EQ(empty.IsAssignable(size, &kCounted) && empty.IsNAssignable(size, &kCounted), size > 0);
        EXPECT_FALSE(block.IsAssignable(size, &kEndThrows) || block.IsNAssignable(size, nullptr));
    }
}

TEST_F(ObjectMemory, SizesStayInBounds) {
    Handle block;
    EXPECT_FALSE(block.SetSize(0) || block.Incalloc(8) || block.Alloc(8, nullptr));
    for (const std::size_t size : {kHuge, kHuge - sizeof(tagCPOMEMHEADER), kHuge / 2})
        EXPECT_FALSE(block.Alloc(size, &kCounted) || block.Reserve(size, &kCounted)) << size;
    ASSERT_TRUE(block.Reserve(10, &kCounted) && block.SetSize(6));
    EXPECT_FALSE(block.SetSize(11) || block.Incalloc(0) || block.Incalloc(kHuge - 20));
    std::memcpy(block.Bytes(), "abcdef", 6);
    EXPECT_TRUE(block.Incalloc(5000) && block.GetAllocSize() == 5010);
    Handle copy(block);
    EXPECT_FALSE(block.Incalloc(8)) << "shared";
    EXPECT_TRUE(copy.clone() && block.clone() && Handle().clone() && g_cloned == 1);
    EXPECT_TRUE(block.lockcnt() == 1 && copy.lockcnt() == 1 && copy.Text() == "abcdef" && block.Text() == "abcdef");
    EXPECT_EQ(copy.GetAllocSize(), 6u) << "spare room is not carried over";
    copy.free();
    EXPECT_EQ(g_finalizedBytes, 6u);
}

TEST_F(ObjectMemory, FailuresAreReportedAndKeepTheBlock) {
    for (const tagCPOVTABL* table : {&kUncopyable, &kCopyThrows}) {
        const Handle block(8, *table);
        Handle copy(block);
        EXPECT_FALSE(copy.clone());
        EXPECT_TRUE(copy.key() == block.key() && block.lockcnt() == 2);
    }
    Handle(8, kEndThrows).free(); // that the block is freed: seen by the leak check
    tagCPOMEMHEADER broken{5, 0, 0, nullptr};
    EXPECT_FALSE(Handle(&broken).clone());
    EXPECT_EQ(m_assertions.Take(),
              (Texts{"CPObjectMemory::clone: Class does not allow cloning", "CPObjectMemory::Clone exception",
                     "CPObjectMemory::Free exception", "m_pMH->pVTbl"}));
    EXPECT_EQ(broken.lRefCnt, 4);
}

TEST_F(ObjectMemory, StaticBlocksAreNeverTouched) {
    for (const ConstantBlock* constant : {&kStatic, &kVeryStatic}) {
        Handle block = constant->Take();
        { const Handle copies[] = {block, block, block}; }
        EXPECT_EQ(block.lockcnt(), static_cast<std::uint32_t>(constant->header.lRefCnt));
        EXPECT_FALSE(block.SetSize(4) || block.Incalloc(8) || !m_assertions.Take().empty());
        EXPECT_TRUE(block.clone() && block.Text() == std::string(constant->payload, constant->header.sUsed));
        EXPECT_EQ(m_assertions.Take(), Texts{"m_pMH->lRefCnt>0"});
        block.Bytes()[0] = 'S'; // private now
    }
    EXPECT_EQ(g_finalized, 2) << "the two copies";
}

using Node = std::pair<CPObjectMemory, CPObjectMemory>; // a block that holds others
void FinalizeNode(void* payload, std::size_t) {
    ++g_finalized;
    static_cast<Node*>(payload)->~Node();
}
constexpr tagCPOVTABL kNode{CreateNothing, nullptr, FinalizeNode, nullptr};

Handle NewNode(CPObjectMemory first, CPObjectMemory second = {}) {
    Handle node(sizeof(Node), kNode);
    ::new (node.Payload()) Node(std::move(first), std::move(second));
    return node;
}

TEST_F(ObjectMemory, TreesAreReleasedWithoutDepth) {
    constexpr int kDepth = 500000;
    Handle chain;
    for (int i = 0; i < kDepth; ++i) chain = NewNode(std::move(chain), i % 2 ? Handle() : NewNode({}));
    // On a stack that one frame per node would overrun many times.
    std::thread([&] { chain.free(); }).join();
    CPObjectMemory list = NewNode(NewNode(NewNode({})));
    while (list.key()) {
        const CPObjectMemory& next = static_cast<Node*>(static_cast<Handle&>(list).Payload())->first;
        list = next; // the source goes with the block that it replaces
    }
    EXPECT_EQ(g_finalized, kDepth + kDepth / 2 + 3);
}

TEST_F(ObjectMemory, BlocksAreSharedBetweenThreads) {
    Handle block(64, kCounted);
    const auto work = [&block] {
        for (int i = 0; i < 5000; ++i) {
            Handle a(block), b(a);
            if (i % 50 == 0 && a.clone()) a.Bytes()[0] = 1;
            a = std::move(b);
        }
    };
    std::thread other(work);
    work();
    other.join();
    EXPECT_TRUE(block.lockcnt() == 1 && g_finalized == 200);
}

class Buffer : public CPPlainMemory {
public:
    Buffer() = default;
    explicit Buffer(const char* text) {
        if (Alloc(std::strlen(text))) std::memcpy(Bytes(), text, GetSize());
    }
    using CPPlainMemory::_Alloc, CPPlainMemory::_Reserve, CPPlainMemory::_Resize, CPPlainMemory::operator=,
                                                                                  CPPlainMemory::GetAllocSize;
    bool Reserve(std::size_t size) { return _Reserve(size, &CPPlainMemory::_vtbl); }
    char* Bytes() const { return static_cast<char*>(static_cast<void*>(*this)); }
    std::string Text() const { return std::string(Bytes(), GetSize()); }
};

const ConstantBlock kStaticBytes{{0, 16, 8, &CPPlainMemory::_vtbl}, "static payload."};

TEST(PlainMemory, TakesOnlyPlainBytes) {
    Buffer target, zero("x");
    ASSERT_TRUE(zero.Resize(0));
    for (const CPObjectMemory& source : std::initializer_list<CPObjectMemory>{zero, Handle(8, kCounted), Handle()}) {
        target = Buffer("old");
        target = source;
        EXPECT_TRUE(target.key() == 0 && CPPlainMemory(source).key() == 0);
    }
    for (const std::size_t size : {3, 12, 40}) {
        target = kStaticBytes.Take();
        EXPECT_TRUE(target.Resize(size) && target.GetSize() == size && target.lockcnt() == 1) << "in a new block";
        EXPECT_EQ(target.Text().substr(0, 8), std::string("static p").substr(0, size));
    }
}

// Intended: resize-shared
TEST(PlainMemory, ResizeInPlaceReachesAllHoldersIntended) {
    Buffer buffer("abcdef"), sharer(buffer);
    EXPECT_TRUE(buffer.Resize(2) && sharer.Text() == "ab");
    EXPECT_TRUE(sharer.Resize(6) && buffer.Text() == "abcdef");
    EXPECT_TRUE(buffer.Resize(7) && buffer.GetAllocSize() == 7 && sharer.lockcnt() == 1) << "a block of its own";
    EXPECT_EQ(buffer.Text().substr(0, 6), sharer.Text());
    EXPECT_FALSE(buffer.Resize(kHuge) || buffer._Resize(9, nullptr) || buffer.Alloc(kHuge));
    EXPECT_TRUE(buffer.Alloc(0) && !buffer.key() && buffer._Alloc(4, &kCounted) && buffer.Resize(40));
    EXPECT_TRUE(buffer.IsType(reinterpret_cast<std::size_t>(&kCounted))) << "the type stays";
}

// Intended: reserve-used-size
TEST(PlainMemory, ReserveLooksAtTheUsedSizeIntended) {
    Buffer buffer;
    EXPECT_TRUE(buffer._Reserve(0, nullptr) && !buffer._Reserve(8, nullptr));
    EXPECT_TRUE(buffer.Reserve(8) && buffer.GetSize() == 0 && buffer.GetAllocSize() == 8);
    buffer = Buffer("abcdef");
    ASSERT_TRUE(buffer.Resize(3));
    const Buffer sharer(buffer);
    EXPECT_TRUE(buffer.Reserve(3) && buffer.key() == sharer.key());
    EXPECT_FALSE(buffer._Reserve(4, nullptr) || buffer.Reserve(kHuge));
    EXPECT_TRUE(buffer.Reserve(4) && buffer.key() != sharer.key()) << "within the capacity, and yet a new block";
    EXPECT_TRUE(buffer.GetAllocSize() == 4 && buffer.Text() == "abc" && sharer.Text() == "abc");
}

// Intended: memory-header
TEST(PlainMemory, ContainsItsHeaderTooIntended) {
    Buffer buffer("0123456789");
    const char *const begin = buffer.Bytes() - sizeof(tagCPOMEMHEADER), *const end = buffer.Bytes() + 10;
    EXPECT_TRUE(buffer.Resize(4) && buffer.isMemory(begin + 1) && buffer.isMemory(end - 1)) << "allocated, not used";
    EXPECT_FALSE(buffer.isMemory(begin) || buffer.isMemory(end) || buffer.isMemory(nullptr) || Buffer().isMemory(end));
}

TEST(Blocks, WithoutMemoryStayAsTheyWere) {
    support::ForEachFailingAllocation([] {
        Buffer buffer("abc");
        if (!buffer.key()) return;
        const bool resized = buffer.Resize(9), reserved = buffer.Reserve(20);
        EXPECT_EQ(buffer.GetSize(), resized ? 9u : 3u);
        EXPECT_EQ(buffer.GetAllocSize() == 20, reserved);
        Buffer copy(buffer);
        const bool cloned = copy.clone();
        EXPECT_TRUE((copy.key() != buffer.key()) == cloned && buffer.lockcnt() == (cloned ? 1u : 2u));
        EXPECT_EQ(copy.Text().substr(0, 3), "abc");
    });
}

// An object with a number.
struct Numbered : CPPlainMemory {
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
    using CPOMVector::CPOMVector, CPOMVector::operator=, CPOMVector::SetSize;
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
        const bool there = at < model.size(), release = random() % 2;
        if (kind < 12) {
            ASSERT_TRUE(vector.Insert(object, at));
            model.insert(place, number);
        } else if (kind < 16 && !model.empty()) {
            ASSERT_TRUE(vector.Insert(vector[at % model.size()], at)) << "one of its own elements";
            model.insert(place, int{model[at % model.size()]});
        } else if (kind < 21) {
            ASSERT_EQ(vector.Delete(at, release), there);
            if (there) model.erase(place);
            ASSERT_TRUE(!there || !model.empty() || (vector.key() == 0) == release);
        } else if (kind < 26) {
            ASSERT_TRUE(kind < 22 ? vector.Resize(at) : vector.Reserve(at + random() % 20));
            if (kind < 22) model.resize(at, -1);
        }
        const auto from = model.begin() + static_cast<long>(std::min(at + 1, model.size()));
        const auto found = static_cast<std::size_t>(std::find(from, model.end(), number) - model.begin());
        ASSERT_EQ(vector.Find(object, at), found < model.size() ? found : NotFound);
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
    EXPECT_TRUE(vector.Insert(Numbered(4), 0) && vector.GetNItems() == 17 && sharer.GetNItems() == 16);
    EXPECT_TRUE(sharer.lockcnt() == 1 && sharer[0].lockcnt() == 2)
        << "no room: a block of its own, with the same elements";
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
void LookAtVector(void*, std::size_t) {
    g_seen.push_back(g_watched->GetNItems());
    for (std::size_t i = 0; i < g_watched->GetNItems(); ++i)
        EXPECT_GE(CPObjectMemory((*g_watched)[i]).lockcnt(), 2u) << "a dead element at " << i;
}
constexpr tagCPOVTABL kWatching{CreateNothing, nullptr, LookAtVector, nullptr};
TEST(Vectors, AreWholeWhenAnElementEnds) {
    Vector vector;
    g_watched = &vector;
    for (int i = 0; i < 6; ++i) ASSERT_TRUE(vector.Insert(Handle(8, kWatching), kHuge));
    EXPECT_TRUE(vector.Delete(2, true) && vector.Resize(2) && vector.Delete(0, true) && vector.Delete(0, true));
    EXPECT_EQ(g_seen, (std::vector<std::size_t>{5, 4, 3, 2, 1, 0}));
}

// A vector of three in constant data: any write ends the test program.
const struct {
    tagCPOMEMHEADER header;
    void* elements[4];
} kStaticVector{{0, 32, 24, &CPOMVector::_vtbl}, {}};
struct StaticVector : Vector {
    StaticVector() { m_pMH = const_cast<tagCPOMEMHEADER*>(&kStaticVector.header); }
};

TEST(Vectors, StaticOnesAreLeftForNewBlocks) {
    using Change = bool (*)(Vector&);
    const std::pair<Change, std::size_t> changes[] = {
        {[](Vector& v) { return v.Insert({}, 1); }, 4}, {[](Vector& v) { return v.Delete(0, true); }, 2},
        {[](Vector& v) { return v.Resize(1); }, 1},     {[](Vector& v) { return v.Resize(9); }, 9},
        {[](Vector& v) { return v.Reserve(4); }, 3},    {[](Vector& v) { return v.Sort(CompareNumbers), true; }, 3}};
    for (const auto& [change, count] : changes) {
        StaticVector vector;
        EXPECT_TRUE(change(vector) && vector.lockcnt() == 1);
        EXPECT_EQ(vector.Numbers(), std::vector<int>(count, -1));
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

constexpr tagCPOVTABL kType{CreateNothing, CloneCounted, CreateNothing, nullptr};
constexpr tagCPOVTABL kTypes[] = {kType, kType, kType, kType};

TEST(TypedVector, BehavesLikeAMapOfPrivateCopies) {
    std::mt19937 random(2);
    CPTypedObjectVector sets[2];
    std::map<std::size_t, int> models[2];
    for (int step = 0; step < 5000; ++step) {
        const std::size_t which = random() % 2, how = random() % 8, type = random() % 4;
        const auto id = reinterpret_cast<std::size_t>(&kTypes[type]);
        const Handle given(sizeof step, kTypes[type]), got(sets[which].Get(id));
        given.Number() = step;
        ASSERT_EQ(got.key() ? got.Number() : -1, models[which].count(type) ? models[which][type] : -1);
        if (got.key()) got.Number() = -3;
        if (how == 0) {
            sets[which] = sets[!which];
            models[which] = models[!which];
        } else if (how < 4) {
            ASSERT_TRUE(sets[which].Delete(id));
            models[which].erase(type);
        } else {
            ASSERT_TRUE(sets[which].Set(given));
            given.Number() = -2;
            models[which][type] = step;
        }
    }
    const support::Assertions assertions;
    EXPECT_FALSE(sets[0].Set(CPObjectMemory()) || sets[0].Set(Handle(8, kUncopyable)));
}

} // namespace
