#pragma once
// The bodies of CPObjectVector; included by the source that instantiates a vector, once per element type.

#include "platform/heap.h"

#include <cstring>
#include <limits>
#include <new>
#include <TAVO/buffers.h>

namespace TAVO::Buffers {

template <class T> const tagCPOVTABL CPObjectVector<T>::_vtbl = {_create, _clone, _finalize, _queryinterface};

template <class T> std::size_t CPObjectVector<T>::GetTypeID() noexcept { return reinterpret_cast<std::size_t>(&_vtbl); }

template <class T> void CPObjectVector<T>::_create(void* payload, std::size_t bytes) {
    auto* elements = static_cast<T*>(payload);
    for (std::size_t i = 0; i < bytes / sizeof(T); ++i) ::new (static_cast<void*>(elements + i)) T();
}

template <class T> void CPObjectVector<T>::_clone(void* target, const void* source, std::size_t bytes) {
    auto* to = static_cast<T*>(target);
    auto* from = static_cast<const T*>(source);
    for (std::size_t i = 0; i < bytes / sizeof(T); ++i) ::new (static_cast<void*>(to + i)) T(from[i]);
}

template <class T> void CPObjectVector<T>::_finalize(void* payload, std::size_t bytes) {
    auto* elements = static_cast<T*>(payload);
    for (std::size_t i = 0; i < bytes / sizeof(T); ++i) elements[i].~T();
}

template <class T> void* CPObjectVector<T>::_queryinterface(void*, const _acfUID&) { return nullptr; }

namespace detail {

// The type tables count elements in 32 bits.
constexpr std::size_t kMostElements = 0xFFFFFFFF;

} // namespace detail

template <class T> CPObjectVector<T>::CPObjectVector() noexcept = default;

template <class T> CPObjectVector<T>::CPObjectVector(std::size_t count) noexcept { Alloc(count); }

template <class T> T* CPObjectVector<T>::Elements() const noexcept { return static_cast<T*>(Payload()); }

template <class T> std::size_t CPObjectVector<T>::GetNItems() const noexcept { return GetSize() / sizeof(T); }

template <class T> bool CPObjectVector<T>::isEmpty() const noexcept { return GetNItems() == 0; }

template <class T> T& CPObjectVector<T>::operator[](std::size_t index) noexcept { return Elements()[index]; }

template <class T> const T& CPObjectVector<T>::operator[](std::size_t index) const noexcept {
    return Elements()[index];
}

template <class T> T* CPObjectVector<T>::GetArray(std::size_t& count) const noexcept {
    count = GetNItems();
    return Elements();
}

template <class T> bool CPObjectVector<T>::Alloc(std::size_t count) noexcept {
    free();
    if (count == 0) return true;
    if (count > detail::kMostElements || !CPObjectMemory::Alloc(count * sizeof(T), &_vtbl)) return false;
    _create(Payload(), GetSize());
    return true;
}

// Gives the vector a block for `capacity` elements, more than it has now; the count stays. A block of this handle alone
// moves bitwise, or not at all; a shared one stays with the others, and its elements are shared one by one.
template <class T> bool CPObjectVector<T>::GrowTo(std::size_t capacity) noexcept {
    if (capacity > detail::kMostElements) return false;
    if (!m_pMH) return CPObjectMemory::Reserve(capacity * sizeof(T), &_vtbl);
    const std::size_t bytes = capacity * sizeof(T);
    if (IsPrivate() && bytes > GetAllocSize()) return Incalloc(bytes - GetAllocSize());
    tagCPOMEMHEADER* grown = NewBlock(bytes, GetSize(), &_vtbl);
    if (!grown) return false;
    _clone(grown + 1, Payload(), GetSize());
    Free(std::exchange(m_pMH, grown));
    return true;
}

template <class T> bool CPObjectVector<T>::LeaveStatic() noexcept { return !IsStatic() || GrowTo(GetNItems()); }

template <class T> bool CPObjectVector<T>::Reserve(std::size_t count) noexcept {
    if (count <= GetNItems()) return true;
    if (IsPrivate() && count * sizeof(T) <= GetAllocSize() && count <= detail::kMostElements) return true;
    return GrowTo(count);
}

template <class T> bool CPObjectVector<T>::Resize(std::size_t count) noexcept {
    const std::size_t old = GetNItems();
    if (count == old) return true;
    if (count > detail::kMostElements) return false;
    if (count < old) {
        if (!LeaveStatic()) return false;
        // One at a time from the end: a finalizer that looks at the vector never sees a dead element.
        for (std::size_t last = old; last-- > count;) {
            const T gone(std::move(Elements()[last]));
            SetSize(last * sizeof(T));
        }
        return true;
    }
    if ((IsStatic() || count * sizeof(T) > GetAllocSize()) && !GrowTo(count)) return false;
    _create(Elements() + old, (count - old) * sizeof(T));
    return SetSize(count * sizeof(T));
}

template <class T> bool CPObjectVector<T>::Insert(const T& element, std::size_t position) noexcept {
    T inserted(element); // counted before anything moves: the argument may live in this very vector
    // Intended (vector-growth): by 16 elements, where a textbook grows by a factor. Most vectors are short, and long
    // ones are reserved by their builders, who read the capacities.
    // Intended (vector-shared): with room the block changes in place also when it is shared, and every holder sees it.
    // A textbook would copy first; holders pass lists on that way, and clone() where they must not.
    const std::size_t count = GetNItems();
    if ((IsStatic() || GetSize() + sizeof(T) > GetAllocSize()) && !GrowTo(count + 16)) return false;
    m_pMH->sUsed = (count + 1) * sizeof(T);
    if (position > count) position = count;
    T* slot = Elements() + position;
    std::memmove(static_cast<void*>(slot + 1), static_cast<const void*>(slot), (count - position) * sizeof(T));
    ::new (static_cast<void*>(slot)) T(std::move(inserted));
    return true;
}

template <class T> bool CPObjectVector<T>::Delete(std::size_t index, bool releaseWhenEmpty) noexcept {
    if (index >= GetNItems() || !LeaveStatic()) return false;
    Extract(index, releaseWhenEmpty);
    return true;
}

template <class T> T CPObjectVector<T>::Extract(std::size_t index, bool releaseWhenEmpty) noexcept {
    // The element leaves and the gap closes before anything is released: a finalizer may look at the vector.
    const std::size_t count = GetNItems();
    T* slot = Elements() + index;
    T taken(std::move(*slot));
    slot->~T();
    SetSize((count - 1) * sizeof(T));
    std::memmove(static_cast<void*>(slot), static_cast<const void*>(slot + 1), (count - 1 - index) * sizeof(T));
    if (count == 1 && releaseWhenEmpty) free();
    return taken;
}

template <class T> std::size_t CPObjectVector<T>::Find(const T& element, std::size_t afterIndex) const noexcept {
    // Bitwise: two elements are the same when they hold the same block. All-ones wraps to the start.
    for (std::size_t i = afterIndex + 1; i < GetNItems(); ++i)
        if (std::memcmp(static_cast<const void*>(Elements() + i), static_cast<const void*>(&element), sizeof(T)) == 0)
            return i;
    return NotFound;
}

template <class T> void CPObjectVector<T>::Sort(int (*compare)(const void*, const void*)) noexcept {
    if (GetNItems() > 1 && LeaveStatic()) Buffers::Sort::vfqsort(Elements(), GetNItems(), sizeof(T), compare);
}

} // namespace TAVO::Buffers
