#pragma once
// Handles of blocks that hold one object each, for the library's own types.

#include "blocks.h"

#include <new>
#include <utility>

namespace TAVO::Buffers {

// Handle of a block with a T, which does not change once it is made: handles may be shared by threads.
template <class T> class CPObject : public CPObjectMemory {
    static_assert(alignof(T) <= 16, "blocks are aligned to 16");

public:
    using Object = T;
    static const tagCPOVTABL _vtbl;

    CPObject() noexcept = default;
    // Shares the block when it holds a T, else stays empty.
    explicit CPObject(const CPObjectMemory& other) noexcept
        : CPObjectMemory(other.IsAssignable(sizeof(T), &_vtbl) ? other : CPObjectMemory()) {}

    // A new object; empty without memory.
    template <class... Arguments> static CPObject Make(Arguments&&... arguments) noexcept {
        CPObject made;
        if (tagCPOMEMHEADER* block = NewBlock(sizeof(T), sizeof(T), &_vtbl)) {
            ::new (static_cast<void*>(block + 1)) T{std::forward<Arguments>(arguments)...};
            made.m_pMH = block;
        }
        return made;
    }
    // A handle of an object that lives elsewhere, behind a header that says so; it is not counted.
    static CPObject Of(tagCPOMEMHEADER& header) noexcept {
        CPObject made;
        made.m_pMH = &header;
        return made;
    }

    explicit operator bool() const noexcept { return m_pMH != nullptr; }
    const T& operator*() const noexcept { return ObjectOf(*this); }
    const T* operator->() const noexcept { return &ObjectOf(*this); }
    // The object in the block; the handle must not be empty.
    static const T& ObjectOf(const CPObjectMemory& handle) noexcept { return *Block::PayloadOf<T>(handle); }
};

// No table entry for copies: objects are shared.
template <class T>
const tagCPOVTABL CPObject<T>::_vtbl = {[](void* payload, std::size_t) { ::new (payload) T(); }, nullptr,
                                        [](void* payload, std::size_t) { static_cast<T*>(payload)->~T(); },
                                        [](void*, const _acfUID&) -> void* { return nullptr; }};

// An object on the stack that a table can be asked with.
template <class T> struct ObjectProbe {
    tagCPOMEMHEADER header{0, sizeof(T), sizeof(T), &CPObject<T>::_vtbl};
    T object;

    CPObject<T> Handle() noexcept {
        static_assert(sizeof(header) % alignof(T) == 0, "the object stands right behind its header");
        return CPObject<T>::Of(header);
    }
};

} // namespace TAVO::Buffers
