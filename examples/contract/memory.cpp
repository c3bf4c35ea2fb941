// Blocks, vectors, sorting, checksums.

#include "contract.h"

#include <TAVO/buffers.h>

namespace contract {

using namespace TAVO::Buffers;

void Memory() {
    CPPlainMemory buffer;
    const bool made = buffer.Alloc(8);
    CPPlainMemory sharer(buffer);
    Is("resizing within the capacity is seen by all who share the block",
       made && buffer.Resize(4) && sharer.GetSize() == 4);
    Instead("clone first", buffer.clone() && buffer.Resize(2) && sharer.GetSize() == 4);
    Is("an address within the block's header is in the memory",
       sharer.isMemory(static_cast<char*>(static_cast<void*>(sharer)) - 1));

    CPOMVector vector;
    const bool begun = vector.Insert(CPPlainMemory(), 0);
    const CPOMVector shared(vector);
    Is("a change that fits a vector's capacity reaches all who share it",
       begun && vector.Insert(CPPlainMemory(), 1) && shared.GetNItems() == 2);
    Instead("clone first", vector.clone() && vector.Insert(CPPlainMemory(), 2) && shared.GetNItems() == 2);

    Is("a checksum of 8 bits is its initial value", CMachineCRC(8, 0x07).Eval("abc", 3, 0x55) == 0x55);
    Instead("16 bits and more", CMachineCRC(16, 0x1021).Eval("123456789", 9, 0xFFFF) == 0x29B1);

    struct Item {
        int key, serial;
    };
    Item items[40];
    for (int i = 0; i < 40; ++i) items[i] = {i % 3, i};
    Sort::vfqsort(items, 40, sizeof(Item), [](const void* a, const void* b) {
        const Item &x = *static_cast<const Item*>(a), &y = *static_cast<const Item*>(b);
        return x.key != y.key ? x.key - y.key : x.serial - y.serial;
    });
    bool inOrder = true;
    for (int i = 1; i < 40; ++i)
        inOrder = inOrder && (items[i].key > items[i - 1].key || items[i].serial > items[i - 1].serial);
    Instead("for a stable sort compare a serial number last", inOrder);
}

} // namespace contract
