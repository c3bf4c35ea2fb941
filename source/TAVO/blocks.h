#pragma once
// The library's own road to the blocks behind handles of object memory.

#include <TAVO/buffers.h>

namespace TAVO::Buffers {

// Lifts the protection of CPObjectMemory's block operations for the sources; adds nothing.
class Block : public CPObjectMemory {
public:
    using CPObjectMemory::Acquire;
    using CPObjectMemory::CPObjectMemory;
    using CPObjectMemory::Free;
    using CPObjectMemory::IsPrivate;
    using CPObjectMemory::NewBlock;
    using CPObjectMemory::SetSize;

    static tagCPOMEMHEADER* Of(const CPObjectMemory& handle) { return static_cast<const Block&>(handle).m_pMH; }

    static tagCPOMEMHEADER*& RefOf(CPObjectMemory& handle) { return static_cast<Block&>(handle).m_pMH; }

    // The payload of a block that holds a T.
    template <class T> static T* PayloadOf(const CPObjectMemory& handle) {
        return reinterpret_cast<T*>(Of(handle) + 1);
    }

    // A handle that takes over a reference.
    static CPObjectMemory Adopt(tagCPOMEMHEADER* header) { return Block(header); }
};

} // namespace TAVO::Buffers
