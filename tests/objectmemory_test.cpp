// Blocks and their handles: counting, copying on write, static blocks, releases that nest or fail; plain memory.

#include "support/heapwatch.h"
#include "support/log.h"

#include <algorithm>
#include <atomic>
#include <cstring>
#include <gtest/gtest.h>
#include <random>
#include <TAVO/buffers.h>
#include <thread>

using namespace TAVO::Buffers;
using support::Texts;

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
    explicit Handle(tagCPOMEMHEADER* header) : CPObjectMemory(header) {}
    Handle(std::size_t size, const tagCPOVTABL& table) { EXPECT_TRUE(Alloc(size, &table)); }
    using CPObjectMemory::Alloc;
    using CPObjectMemory::GetAllocSize;
    using CPObjectMemory::GetSize;
    using CPObjectMemory::Incalloc;
    using CPObjectMemory::Payload;
    using CPObjectMemory::Reserve;
    using CPObjectMemory::SetSize;
    char* Bytes() const { return static_cast<char*>(Payload()); }
    std::string Text() const { return std::string(Bytes(), GetSize()); }
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
    EXPECT_TRUE(copy.clone() && block.clone() && Handle().clone());
    EXPECT_TRUE(block.lockcnt() == 1 && copy.lockcnt() == 1 && g_cloned == 1);
    EXPECT_EQ(copy.GetAllocSize(), 6u) << "spare room is not carried over";
    EXPECT_TRUE(copy.Text() == "abcdef" && block.Text() == "abcdef");
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
        EXPECT_FALSE(block.SetSize(4) || block.Incalloc(8));
        EXPECT_EQ(Texts(), m_assertions.Take());
        EXPECT_TRUE(block.clone());
        EXPECT_EQ(m_assertions.Take(), Texts{"m_pMH->lRefCnt>0"});
        EXPECT_EQ(block.Text(), std::string(constant->payload, constant->header.sUsed));
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
    using CPPlainMemory::_Alloc;
    using CPPlainMemory::_Reserve;
    using CPPlainMemory::_Resize;
    using CPPlainMemory::operator=;
    using CPPlainMemory::GetAllocSize;
    bool Reserve(std::size_t size) { return _Reserve(size, &CPPlainMemory::_vtbl); }
    char* Bytes() const { return static_cast<char*>(static_cast<void*>(*this)); }
    std::string Text() const { return std::string(Bytes(), GetSize()); }
};

const ConstantBlock kStaticBytes{{0, 16, 8, &CPPlainMemory::_vtbl}, "static payload."};

TEST(PlainMemory, TakesOnlyPlainBytes) {
    Buffer target("old"), zero("x");
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
    ASSERT_TRUE(buffer.Resize(4) && !Buffer().isMemory(&buffer) && !buffer.isMemory(nullptr));
    const char *const begin = buffer.Bytes() - sizeof(tagCPOMEMHEADER), *const end = buffer.Bytes() + 10;
    EXPECT_FALSE(buffer.isMemory(begin) || buffer.isMemory(end));
    EXPECT_TRUE(buffer.isMemory(begin + 1) && buffer.isMemory(end - 1)) << "allocated, not used";
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

} // namespace
