// Blocks and their handles: counting, copying on write, static blocks, releases that nest or fail; plain memory.

#include "support/assertions.h"
#include "support/heapwatch.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <cstring>
#include <gtest/gtest.h>
#include <numeric>
#include <TAVO/buffers.h>
#include <thread>

using namespace TAVO::Buffers;
using support::Texts;

namespace {

constexpr std::size_t kHuge = ~std::size_t{0};

// What a payload type was asked to do.
struct Calls {
    std::atomic<int> cloned{0}, finalized{0};
    std::atomic<std::size_t> finalizedBytes{0};
};
Calls g_calls;

void CreateNothing(void*, std::size_t) {}
void CloneCounted(void* target, const void* source, std::size_t bytes) {
    ++g_calls.cloned;
    std::memcpy(target, source, bytes);
}
void CloneThrowing(void*, const void*, std::size_t) { throw 1; }
void FinalizeCounted(void*, std::size_t bytes) {
    ++g_calls.finalized;
    g_calls.finalizedBytes = bytes;
}
void FinalizeThrowing(void* payload, std::size_t bytes) {
    FinalizeCounted(payload, bytes);
    throw 1;
}
void* NoInterface(void*, const _acfUID&) { return nullptr; }
void* InterfaceAt8(void* payload, const _acfUID&) { return static_cast<char*>(payload) + 8; }
void* InterfaceThrowing(void*, const _acfUID&) { throw 1; }

constexpr tagCPOVTABL kCounted{CreateNothing, CloneCounted, FinalizeCounted, NoInterface};
constexpr tagCPOVTABL kOther{CreateNothing, CloneCounted, FinalizeCounted, InterfaceAt8};
constexpr tagCPOVTABL kUncopyable{CreateNothing, nullptr, FinalizeCounted, InterfaceThrowing};
constexpr tagCPOVTABL kCopyThrows{CreateNothing, CloneThrowing, FinalizeCounted, NoInterface};
constexpr tagCPOVTABL kEndThrows{CreateNothing, CloneCounted, FinalizeThrowing, NoInterface};

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
    using CPObjectMemory::queryinterface;
    using CPObjectMemory::Reserve;
    using CPObjectMemory::SetSize;
    char* Bytes() const { return static_cast<char*>(Payload()); }
    void Fill() { std::iota(Bytes(), Bytes() + GetSize(), 'a'); }
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
    void SetUp() override { g_calls.cloned = g_calls.finalized = 0; }
    support::Assertions m_assertions;
};

TEST_F(ObjectMemory, CountFollowsTheHandles) {
    Handle first(32, kCounted);
    EXPECT_EQ(first.lockcnt(), 1u);
    {
        const Handle second(first);
        Handle third;
        third = second;
        EXPECT_EQ(first.lockcnt(), 3u);
        Handle fourth(std::move(third));
        EXPECT_EQ(third.key(), 0u);
        EXPECT_EQ(first.lockcnt(), 3u);
        Handle& same = fourth;
        fourth = same;            // itself
        fourth = second;          // another handle of the same block
        fourth = std::move(same); // itself
        EXPECT_EQ(first.lockcnt(), 3u);
        fourth = Handle();
        EXPECT_EQ(first.lockcnt(), 2u);
    }
    EXPECT_EQ(first.lockcnt(), 1u);
    EXPECT_TRUE(first.SetSize(24));
    EXPECT_EQ(g_calls.finalized, 0);
    first.free();
    first.free();
    EXPECT_EQ(g_calls.finalized, 1);
    EXPECT_EQ(g_calls.finalizedBytes, 24u) << "the used size, not the allocated one";
    EXPECT_EQ(first.lockcnt(), 0u);
    EXPECT_EQ(Texts(), m_assertions.Take());
}

TEST_F(ObjectMemory, IdentityComesFromTheAddress) {
    const Handle block(8, kCounted), empty;
    const auto address = reinterpret_cast<std::uintptr_t>(block.Payload()) - sizeof(tagCPOMEMHEADER);
    EXPECT_EQ(block.key(), address >> 3);
    const auto mixed = static_cast<std::uint32_t>(address >> 32 ^ address);
    EXPECT_EQ(block.hash(), mixed ? mixed : 1);
    EXPECT_EQ(reinterpret_cast<std::uintptr_t>(block.Payload()) % 16, 0u);
    EXPECT_EQ(empty.hash(), 0u);
    EXPECT_EQ(empty.key(), 0u);
}

TEST_F(ObjectMemory, KnowsItsType) {
    const Handle block(24, kCounted), empty;
    const auto counted = reinterpret_cast<std::size_t>(&kCounted), other = reinterpret_cast<std::size_t>(&kOther);
    const std::size_t ids[] = {other, other, counted, counted};
    EXPECT_EQ(block.GetTypeID(), counted);
    EXPECT_TRUE(block.IsType(counted));
    EXPECT_FALSE(block.IsType(other) || empty.IsType(0) || empty.IsType(counted));
    EXPECT_EQ(block.GetType(ids, 4), 2u);
    EXPECT_EQ(block.GetType(ids, 2), 0xFFFFFFFFu);
    EXPECT_EQ(block.GetType(ids, 0), 0xFFFFFFFFu);
    EXPECT_EQ(empty.GetType(ids, 4), 0xFFFFFFFFu);

    struct Row {
        const char* name;
        const Handle& handle;
        std::size_t size;
        const tagCPOVTABL* table;
        bool one, many;
    };
    for (const Row& row : std::initializer_list<Row>{
             {"no size", block, 0, &kCounted, false, false},
             {"no table", block, 8, nullptr, false, false},
             {"empty without size", empty, 0, &kCounted, false, false},
             {"empty", empty, 8, &kCounted, true, true},
             {"exactly", block, 24, &kCounted, true, true},
             {"a third", block, 8, &kCounted, true, true},
             {"no divisor", block, 16, &kCounted, true, false},
             {"one more", block, 25, &kCounted, false, false},
             {"other type", block, 8, &kOther, false, false},
         }) {
        EXPECT_EQ(row.handle.IsAssignable(row.size, row.table), row.one) << row.name;
        EXPECT_EQ(row.handle.IsNAssignable(row.size, row.table), row.many) << row.name;
    }
}

TEST_F(ObjectMemory, AnswersInterfacesAsOffsets) {
    const _acfUID id{};
    EXPECT_EQ(Handle::queryinterface(Handle(16, kOther), id), 8u);
    EXPECT_EQ(Handle::queryinterface(Handle(16, kCounted), id), NotFound);
    EXPECT_EQ(Handle::queryinterface(Handle(16, kUncopyable), id), NotFound) << "it throws";
    EXPECT_EQ(Handle::queryinterface(Handle(), id), NotFound);
}

TEST_F(ObjectMemory, SizesStayInBounds) {
    Handle block;
    EXPECT_FALSE(block.SetSize(0));
    EXPECT_FALSE(block.Incalloc(8));
    EXPECT_FALSE(block.Alloc(8, nullptr));
    for (const std::size_t size : {kHuge, kHuge - 1, kHuge - sizeof(tagCPOMEMHEADER), kHuge / 2}) {
        EXPECT_FALSE(block.Alloc(size, &kCounted)) << size;
        EXPECT_FALSE(block.Reserve(size, &kCounted)) << size;
        EXPECT_EQ(block.GetTypeID(), 0u);
    }
    ASSERT_TRUE(block.Reserve(10, &kCounted));
    EXPECT_EQ(block.GetSize(), 0u);
    EXPECT_TRUE(block.SetSize(10));
    EXPECT_FALSE(block.SetSize(11));
    EXPECT_EQ(block.GetSize(), 10u);
    block.Fill();
    EXPECT_FALSE(block.Incalloc(0));
    EXPECT_FALSE(block.Incalloc(kHuge - 20));
    EXPECT_TRUE(block.Incalloc(5000));
    EXPECT_EQ(block.GetAllocSize(), 5010u);
    EXPECT_EQ(block.GetSize(), 10u);
    EXPECT_EQ(std::string(block.Bytes(), 10), "abcdefghij");
    const Handle sharer(block);
    EXPECT_FALSE(block.Incalloc(8)) << "shared";
}

TEST_F(ObjectMemory, CloneMakesASharedBlockPrivate) {
    Handle block, empty;
    EXPECT_TRUE(empty.clone());
    ASSERT_TRUE(block.Reserve(100, &kCounted));
    block.SetSize(6);
    block.Fill();
    const auto key = block.key();
    EXPECT_TRUE(block.clone());
    EXPECT_EQ(block.key(), key) << "already private";
    Handle copy(block);
    EXPECT_TRUE(copy.clone());
    EXPECT_NE(copy.key(), key);
    EXPECT_EQ(g_calls.cloned, 1);
    EXPECT_EQ(block.lockcnt(), 1u);
    EXPECT_EQ(copy.lockcnt(), 1u);
    EXPECT_EQ(copy.GetAllocSize(), 6u) << "spare room is not carried over";
    EXPECT_EQ(std::string(copy.Bytes(), 6), "abcdef");
}

TEST_F(ObjectMemory, CloneThatFailsKeepsTheSharedBlock) {
    struct Row {
        const tagCPOVTABL& table;
        const char* text;
    };
    for (const Row& row : {Row{kUncopyable, "CPObjectMemory::clone: Class does not allow cloning"},
                           Row{kCopyThrows, "CPObjectMemory::Clone exception"}}) {
        const Handle block(8, row.table);
        Handle copy(block);
        EXPECT_FALSE(copy.clone());
        EXPECT_EQ(copy.key(), block.key());
        EXPECT_EQ(block.lockcnt(), 2u);
        EXPECT_EQ(m_assertions.Take(), Texts{row.text});
    }
    Handle alone(8, kUncopyable);
    EXPECT_FALSE(alone.clone()) << "also unshared";
    support::ForEachFailingAllocation([] {
        Handle block;
        if (!block.Alloc(8, &kCounted)) return;
        Handle copy(block);
        const bool cloned = copy.clone();
        EXPECT_EQ(copy.key() != block.key(), cloned);
        EXPECT_EQ(block.lockcnt(), cloned ? 1u : 2u);
    });
}

TEST_F(ObjectMemory, StaticBlocksAreNeverTouched) {
    for (const ConstantBlock* constant : {&kStatic, &kVeryStatic}) {
        Handle block = constant->Take();
        {
            std::array<Handle, 10> handles;
            for (auto& handle : handles) handle = block;
            EXPECT_EQ(block.lockcnt(), static_cast<std::uint32_t>(constant->header.lRefCnt));
        }
        EXPECT_FALSE(block.SetSize(4));
        EXPECT_FALSE(block.Incalloc(8));
        EXPECT_EQ(Texts(), m_assertions.Take());
        EXPECT_TRUE(block.clone());
        EXPECT_EQ(m_assertions.Take(), Texts{"m_pMH->lRefCnt>0"});
        EXPECT_EQ(block.lockcnt(), 1u);
        EXPECT_EQ(block.GetSize(), constant->header.sUsed);
        EXPECT_EQ(std::memcmp(block.Payload(), constant->payload, block.GetSize()), 0);
        block.Bytes()[0] = 'S'; // private now
    }
    EXPECT_EQ(g_calls.finalized, 2) << "the two copies";
}

TEST_F(ObjectMemory, MissingTableIsReported) {
    tagCPOMEMHEADER broken{5, 0, 0, nullptr};
    {
        Handle block(&broken), copy(block);
        EXPECT_EQ(m_assertions.Take(), Texts{"pMHO->pVTbl"});
        EXPECT_EQ(broken.lRefCnt, 6);
        EXPECT_FALSE(copy.clone());
        EXPECT_EQ(m_assertions.Take(), Texts{"m_pMH->pVTbl"});
    }
    EXPECT_EQ(broken.lRefCnt, 4);
}

TEST_F(ObjectMemory, FinalizerThatThrowsStillFreesTheBlock) {
    Handle(8, kEndThrows).free();
    EXPECT_EQ(g_calls.finalized, 1);
    EXPECT_EQ(m_assertions.Take(), Texts{"CPObjectMemory::Free exception"}); // the block: seen by the leak check
}

// A node that holds others, each in a handle.
struct Node {
    CPObjectMemory next[2];
};
void FinalizeNode(void* payload, std::size_t) {
    ++g_calls.finalized;
    static_cast<Node*>(payload)->~Node();
}
constexpr tagCPOVTABL kNode{CreateNothing, nullptr, FinalizeNode, NoInterface};

Handle NewNode(CPObjectMemory first, CPObjectMemory second = {}) {
    Handle node(sizeof(Node), kNode);
    ::new (node.Payload()) Node{{std::move(first), std::move(second)}};
    return node;
}

TEST_F(ObjectMemory, DeepTreesAreReleasedWithoutDepth) {
    constexpr int kDepth = 500000;
    Handle chain;
    for (int i = 0; i < kDepth; ++i) chain = NewNode(std::move(chain), i % 1000 ? Handle() : NewNode({}));
    // On a stack that one frame per node would overrun many times.
    std::thread([&] { chain.free(); }).join();
    EXPECT_EQ(g_calls.finalized, kDepth + kDepth / 1000);
}

TEST_F(ObjectMemory, AssignmentFromInsideTheOldBlock) {
    Handle list = NewNode(NewNode(NewNode({})));
    for (int left = 2; left >= 0; --left) {
        const CPObjectMemory& next = static_cast<Node*>(list.Payload())->next[0];
        static_cast<CPObjectMemory&>(list) = next; // the source goes with the block that it replaces
        EXPECT_EQ(g_calls.finalized, 3 - left);
    }
    EXPECT_EQ(list.key(), 0u);
}

TEST_F(ObjectMemory, BlocksAreSharedBetweenThreads) {
    Handle block(64, kCounted);
    std::vector<std::thread> threads;
    for (int t = 0; t < 4; ++t)
        threads.emplace_back([block] {
            for (int i = 0; i < 5000; ++i) {
                Handle a(block), b;
                b = a;
                if (i % 64 == 0) {
                    a.clone();
                    a.Bytes()[0] = 1;
                }
                a = std::move(b);
            }
        });
    for (auto& thread : threads) thread.join();
    threads.clear();
    EXPECT_EQ(block.lockcnt(), 1u);
    block.free();
    EXPECT_EQ(g_calls.finalized, 1 + 4 * 79);
}

// --- plain memory ----------------------------------------------------------------------------------------------------

class Buffer : public CPPlainMemory {
public:
    Buffer() = default;
    using CPPlainMemory::_Alloc;
    using CPPlainMemory::_Reserve;
    using CPPlainMemory::_Resize;
    using CPPlainMemory::CPPlainMemory;
    using CPPlainMemory::operator=;
    using CPPlainMemory::GetAllocSize;
    char* Bytes() const { return static_cast<char*>(static_cast<void*>(*this)); }
    void Set(const char* text) {
        EXPECT_TRUE(Alloc(std::strlen(text)));
        std::memcpy(Bytes(), text, GetSize());
    }
    std::string Text() const { return std::string(Bytes(), GetSize()); }
};

TEST(PlainMemory, TakesOnlyPlainBytes) {
    Buffer full, zero;
    full.Set("bytes");
    zero.Set("x");
    ASSERT_TRUE(zero.Resize(0));
    const Handle foreign(8, kCounted);
    struct Row {
        const char* name;
        const CPObjectMemory& source;
        bool taken;
    };
    for (const Row& row : {Row{"plain", full, true}, Row{"no bytes", zero, false}, Row{"another type", foreign, false},
                           Row{"empty", Handle(), false}}) {
        Buffer target;
        target.Set("old");
        target = row.source;
        EXPECT_EQ(target.key(), row.taken ? row.source.key() : 0) << row.name;
        EXPECT_EQ(CPPlainMemory(row.source).key(), target.key()) << row.name;
    }
    EXPECT_TRUE(full.IsType(CPPlainMemory::GetTypeID()));
    EXPECT_EQ(static_cast<void*>(Buffer()), nullptr);
}

TEST(PlainMemory, AllocReplacesTheBytes) {
    Buffer buffer;
    buffer.Set("old");
    const Buffer sharer(buffer);
    EXPECT_TRUE(buffer.Alloc(7));
    EXPECT_EQ(buffer.GetSize(), 7u);
    EXPECT_EQ(sharer.Text(), "old");
    EXPECT_TRUE(buffer.Alloc(0));
    EXPECT_EQ(static_cast<void*>(buffer), nullptr);
    EXPECT_FALSE(buffer.Alloc(kHuge));
    EXPECT_TRUE(buffer._Alloc(4, &kCounted));
    EXPECT_TRUE(buffer.IsType(reinterpret_cast<std::size_t>(&kCounted)));
    EXPECT_TRUE(buffer.Resize(40));
    EXPECT_TRUE(buffer.IsType(reinterpret_cast<std::size_t>(&kCounted))) << "the type stays";
}

TEST(PlainMemory, ResizeGrowsToExactlyTheSize) {
    Buffer buffer;
    EXPECT_TRUE(buffer.Resize(0));
    EXPECT_EQ(buffer.key(), 0u);
    buffer.Set("abcdef");
    for (const std::size_t size : {7, 6, 3, 7, 8, 1000, 0, 1000, 1001}) {
        const std::size_t old = buffer.GetSize(), room = buffer.GetAllocSize();
        const auto key = buffer.key();
        EXPECT_TRUE(buffer.Resize(size));
        EXPECT_EQ(buffer.GetSize(), size);
        EXPECT_EQ(buffer.GetAllocSize(), size > room ? size : room);
        EXPECT_EQ(buffer.key() == key, size <= room);
        EXPECT_EQ(buffer.Text().substr(0, std::min({old, size, std::size_t{3}})),
                  std::string("abc").substr(0, std::min({old, size, std::size_t{3}})));
    }
    EXPECT_FALSE(buffer.Resize(kHuge));
    EXPECT_EQ(buffer.GetSize(), 1001u);
    Buffer empty;
    EXPECT_FALSE(empty._Resize(4, nullptr));
}

TEST(PlainMemory, ResizeInPlaceReachesAllHoldersIntended) {
    Buffer buffer;
    buffer.Set("abcdef");
    Buffer sharer(buffer);
    EXPECT_TRUE(buffer.Resize(2));
    EXPECT_EQ(sharer.Text(), "ab");
    EXPECT_TRUE(sharer.Resize(6));
    EXPECT_EQ(buffer.Text(), "abcdef");
    EXPECT_TRUE(buffer.Resize(7)) << "a block of its own";
    EXPECT_EQ(sharer.Text(), "abcdef");
    EXPECT_EQ(sharer.lockcnt(), 1u);
}

TEST(PlainMemory, ReserveLooksAtTheUsedSizeIntended) {
    Buffer buffer;
    EXPECT_TRUE(buffer._Reserve(0, nullptr));
    EXPECT_FALSE(buffer._Reserve(8, nullptr));
    EXPECT_TRUE(buffer._Reserve(8, &CPPlainMemory::_vtbl));
    EXPECT_EQ(buffer.GetSize(), 0u);
    EXPECT_EQ(buffer.GetAllocSize(), 8u);
    buffer.Set("abcdef");
    ASSERT_TRUE(buffer.Resize(3));
    auto key = buffer.key();
    EXPECT_TRUE(buffer._Reserve(3, &CPPlainMemory::_vtbl));
    EXPECT_EQ(buffer.key(), key);
    EXPECT_FALSE(buffer._Reserve(4, nullptr));
    const Buffer sharer(buffer);
    EXPECT_TRUE(buffer._Reserve(4, &CPPlainMemory::_vtbl)) << "within the capacity, and yet a new block";
    EXPECT_NE(buffer.key(), key);
    EXPECT_EQ(buffer.GetAllocSize(), 4u);
    EXPECT_EQ(buffer.Text(), "abc");
    EXPECT_EQ(sharer.Text(), "abc");
    EXPECT_FALSE(buffer._Reserve(kHuge, &CPPlainMemory::_vtbl));
    EXPECT_EQ(buffer.Text(), "abc");
}

TEST(PlainMemory, ContainsItsHeaderTooIntended) {
    Buffer buffer;
    EXPECT_FALSE(buffer.isMemory(&buffer));
    ASSERT_TRUE(buffer.Alloc(10));
    ASSERT_TRUE(buffer.Resize(4));
    const char* const payload = buffer.Bytes();
    const auto header = static_cast<long>(sizeof(tagCPOMEMHEADER));
    EXPECT_FALSE(buffer.isMemory(nullptr));
    EXPECT_FALSE(buffer.isMemory(payload - header));
    EXPECT_TRUE(buffer.isMemory(payload - header + 1));
    EXPECT_TRUE(buffer.isMemory(payload));
    EXPECT_TRUE(buffer.isMemory(payload + 9)) << "allocated, not used";
    EXPECT_FALSE(buffer.isMemory(payload + 10));
}

const ConstantBlock kStaticBytes{{0, 16, 8, &CPPlainMemory::_vtbl}, "static payload."};

TEST(PlainMemory, StaticBytesAreResizedInANewBlock) {
    for (const std::size_t size : {std::size_t{3}, std::size_t{12}, std::size_t{40}}) {
        Buffer buffer;
        static_cast<CPObjectMemory&>(buffer) = kStaticBytes.Take();
        EXPECT_TRUE(buffer.Resize(size));
        EXPECT_EQ(buffer.GetSize(), size);
        EXPECT_EQ(buffer.lockcnt(), 1u);
        EXPECT_EQ(buffer.Text().substr(0, 8), std::string("static p").substr(0, size));
    }
}

TEST(PlainMemory, WithoutMemoryTheOldBytesStay) {
    support::ForEachFailingAllocation([] {
        Buffer buffer;
        if (!buffer.Alloc(3)) {
            EXPECT_EQ(buffer.key(), 0u);
            return;
        }
        std::memcpy(buffer.Bytes(), "abc", 3);
        const bool resized = buffer.Resize(9);
        EXPECT_EQ(buffer.Text().substr(0, 3), "abc");
        EXPECT_EQ(buffer.GetSize(), resized ? 9u : 3u);
        const bool reserved = buffer._Reserve(20, &CPPlainMemory::_vtbl);
        EXPECT_EQ(buffer.GetAllocSize() == 20, reserved);
        EXPECT_EQ(buffer.Text().substr(0, 3), "abc");
    });
}

} // namespace
