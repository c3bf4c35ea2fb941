#pragma once
// A growing run of plain elements on the library's heap, for work in progress.

#include "platform/heap.h"

#include <cstring>
#include <limits>
#include <type_traits>
#include <utility>

namespace TAVO {

template <class T> class Scratch {
    static_assert(std::is_trivially_copyable_v<T>);

public:
    Scratch() = default;
    Scratch(const Scratch&) = delete;
    Scratch& operator=(const Scratch&) = delete;
    ~Scratch() { Platform::Release(m_first); }

    std::size_t Count() const { return m_count; }
    bool Empty() const { return m_count == 0; }
    T* First() { return m_first; }
    T& operator[](std::size_t index) { return m_first[index]; }
    T& Last() { return m_first[m_count - 1]; }

    // False without memory; the run is then as it was.
    bool Push(const T& element) {
        T* place = Add();
        if (place) *place = element;
        return place != nullptr;
    }
    // The same, but the caller writes the element, all of it: one that was just put together elsewhere would have to
    // reach memory before a copy of it in larger pieces could begin.
    T* Add() { return TAVO_UNLIKELY(m_count == m_capacity) && !Grow(1) ? nullptr : m_first + m_count++; }
    // Room for `more` elements behind the last.
    bool Reserve(std::size_t more) { return m_capacity - m_count >= more || Grow(more); }
    void Cut(std::size_t count) { m_count = count; }

private:
    TAVO_NOINLINE bool Grow(std::size_t more) {
        const std::size_t most = std::numeric_limits<std::size_t>::max() / sizeof(T) / 2;
        if (more > most - m_count) return false;
        std::size_t capacity = m_capacity ? m_capacity * 2 : 64;
        if (capacity < m_count + more) capacity = m_count + more;
        void* grown =
            m_first ? Platform::Reallocate(m_first, capacity * sizeof(T)) : Platform::Allocate(capacity * sizeof(T));
        if (!grown) return false;
        m_first = static_cast<T*>(grown);
        m_capacity = capacity;
        return true;
    }

    T* m_first = nullptr;
    std::size_t m_count = 0, m_capacity = 0;
};

} // namespace TAVO
