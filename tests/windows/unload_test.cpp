// Windows: what unloading the library gives back.

#include "support/machine.h"

#include <cstring>
#include <gtest/gtest.h>
#include <TAVO/threading.h>
#include <windows.h>

using TAVO::Buffers::tagCPOMEMHEADER;
using TAVO::Buffers::tagCPOVTABL;

namespace {

using NewBlock = tagCPOMEMHEADER* (*)(std::size_t, std::size_t, const tagCPOVTABL*);
using Free = void (*)(tagCPOMEMHEADER*);
constexpr const char* kFree = "_ZN4TAVO7Buffers14CPObjectMemory4FreeEPNS0_15tagCPOMEMHEADERE";
constexpr const char* kNewBlock = "_ZN4TAVO7Buffers14CPObjectMemory8NewBlockEyyPKNS0_11tagCPOVTABLE";

DWORD FirstFreeSlot() {
    const DWORD slot = TlsAlloc();
    TlsFree(slot);
    return slot;
}

struct Nothing final : TAVO::Threading::IThreadExecute {
    void Run(unsigned long long) override {}
    unsigned int GetState() override { return 0; }
    void* QueryInterface(_acfUID const&) override { return nullptr; }
};

} // namespace

TEST(Unload, GivesTheSlotOfThreadsBack) {
    using TAVO::Threading::CPThread;
    using Execute = bool (*)(void* self, const TAVO::Buffers::CPObjectMemory& object, unsigned long long);
    using Wait = unsigned long long (*)(void* self, TAVO::ulong32);
    static const tagCPOVTABL type{nullptr, nullptr, [](void*, std::size_t) {},
                                  [](void* payload, const _acfUID&) { return payload; }};
    DWORD unused = 0;
    for (int load = 0; load < 2; ++load) {
        const support::LibraryCopy copy("Threads", nullptr);
        const auto make = copy.Find<NewBlock>("", kNewBlock);
        const auto free = copy.Find<Free>("", kFree);
        const auto execute =
            copy.Find<Execute>("", "_ZN4TAVO9Threading8CPThread7ExecuteERKNS_7Buffers14CPObjectMemoryEy");
        const auto wait = copy.Find<Wait>("", "_ZN4TAVO9Threading8CPThread4WaitEm");
        ASSERT_TRUE(make && free && execute && wait);
        if (load == 0) unused = FirstFreeSlot();
        EXPECT_EQ(FirstFreeSlot(), unused) << "after the unload";
        tagCPOMEMHEADER* block = make(sizeof(Nothing), sizeof(Nothing), &type);
        ASSERT_NE(block, nullptr);
        new (block + 1) Nothing;
        TAVO::Buffers::CPObjectMemory object;
        CPThread thread; // the host's class, but the copy's operations
        std::memcpy(static_cast<void*>(&object), &block, sizeof block);
        EXPECT_TRUE(execute(&thread, object, 0));
        EXPECT_EQ(wait(&thread, TAVO::Threading::WaitForever), 0u);
        EXPECT_NE(FirstFreeSlot(), unused);
        std::memset(static_cast<void*>(&object), 0, sizeof object);
        free(block);
    }
    EXPECT_EQ(FirstFreeSlot(), unused);
}

TEST(Unload, GivesTheThreadSlotBack) {
    static const tagCPOVTABL type{nullptr, nullptr, [](void*, std::size_t) {}, nullptr};
    DWORD unused = 0;
    {
        const support::LibraryCopy copy("Slots", nullptr);
        const auto make = copy.Find<NewBlock>("", kNewBlock);
        const auto free = copy.Find<Free>("", kFree);
        ASSERT_NE(make, nullptr);
        ASSERT_NE(free, nullptr);
        unused = FirstFreeSlot();
        tagCPOMEMHEADER* block = make(8, 8, &type);
        ASSERT_NE(block, nullptr);
        free(block); // the last release of a block is what takes the slot
        EXPECT_NE(FirstFreeSlot(), unused);
    }
    EXPECT_EQ(FirstFreeSlot(), unused) << "the unload itself releases blocks, too";
}
