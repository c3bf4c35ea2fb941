// Windows: what unloading the library gives back.

#include "support/machine.h"

#include <gtest/gtest.h>
#include <TAVO/buffers.h>
#include <windows.h>

using TAVO::Buffers::tagCPOMEMHEADER;
using TAVO::Buffers::tagCPOVTABL;

TEST(Unload, GivesTheThreadSlotBack) {
    using NewBlock = tagCPOMEMHEADER* (*)(std::size_t, std::size_t, const tagCPOVTABL*);
    using Free = void (*)(tagCPOMEMHEADER*);
    static const tagCPOVTABL type{nullptr, nullptr, [](void*, std::size_t) {}, nullptr};
    const auto firstFreeSlot = [] {
        const DWORD slot = TlsAlloc();
        TlsFree(slot);
        return slot;
    };
    DWORD unused = 0;
    {
        const support::LibraryCopy copy("Slots", nullptr);
        const auto make = copy.Find<NewBlock>("", "_ZN4TAVO7Buffers14CPObjectMemory8NewBlockEyyPKNS0_11tagCPOVTABLE");
        const auto free = copy.Find<Free>("", "_ZN4TAVO7Buffers14CPObjectMemory4FreeEPNS0_15tagCPOMEMHEADERE");
        ASSERT_NE(make, nullptr);
        ASSERT_NE(free, nullptr);
        unused = firstFreeSlot();
        tagCPOMEMHEADER* block = make(8, 8, &type);
        ASSERT_NE(block, nullptr);
        free(block); // the last release of a block is what takes the slot
        EXPECT_NE(firstFreeSlot(), unused);
    }
    EXPECT_EQ(firstFreeSlot(), unused) << "the unload itself releases blocks, too";
}
