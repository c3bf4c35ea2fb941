#pragma once
// A stack of plain elements on the library's heap. It grows by pieces, so that nothing on it ever moves: a tree may be
// as deep as its document is long.

#include "platform/heap.h"

#include <algorithm>
#include <type_traits>
#include <utility>

namespace TAVO {

template <class T> class Stack {
    static_assert(std::is_trivially_copyable_v<T> && alignof(T) <= alignof(void*));

public:
    Stack() = default;
    Stack(const Stack&) = delete;
    Stack& operator=(const Stack&) = delete;
    ~Stack() {
        for (Piece* piece = m_bottom; piece;) Platform::Release(std::exchange(piece, piece->above));
    }

    bool Empty() const { return m_count == 0; }
    std::size_t Count() const { return m_count; }
    // Requires: not empty.
    T& Last() { return m_end[-1]; }

    // A new last element, not initialised; it stays where it is until it is popped. Null without memory.
    T* Add() {
        if (TAVO_UNLIKELY(m_end == m_limit) && !AddPiece()) return nullptr;
        ++m_count;
        return m_end++;
    }
    bool Push(const T& element) {
        T* place = Add();
        if (place) *place = element;
        return place != nullptr;
    }
    void Pop() {
        --m_count;
        if (TAVO_UNLIKELY(--m_end == m_top->First()) && m_top->below) LeavePiece();
    }

    // Calls `visit(element)` from the first one on, as long as it gives true.
    template <class Visit> void ForEach(Visit visit) const {
        for (Piece* piece = m_bottom; piece; piece = piece == m_top ? nullptr : piece->above) {
            const T* const end = piece == m_top ? m_end : piece->end;
            for (const T* element = piece->First(); element != end; ++element)
                if (!visit(*element)) return;
        }
    }

private:
    static constexpr std::size_t kFirst = 64, kMost = 8192; // elements of a piece

    struct Piece {
        Piece* below;
        Piece* above; // null, or one that was in use before and may be again
        T* end;

        T* First() { return reinterpret_cast<T*>(this + 1); }
    };

    TAVO_NOINLINE bool AddPiece() {
        Piece* piece = m_top ? m_top->above : nullptr;
        if (!piece) {
            const std::size_t size = m_top ? std::min(2 * SizeOf(*m_top), kMost) : kFirst;
            piece = static_cast<Piece*>(Platform::Allocate(sizeof(Piece) + size * sizeof(T)));
            if (!piece) return false;
            *piece = {m_top, nullptr, piece->First() + size};
            (m_top ? m_top->above : m_bottom) = piece;
        }
        Enter(piece, piece->First());
        return true;
    }
    TAVO_NOINLINE void LeavePiece() { Enter(m_top->below, m_top->below->end); }
    void Enter(Piece* piece, T* end) {
        m_top = piece;
        m_end = end;
        m_limit = piece->end;
    }
    static std::size_t SizeOf(Piece& piece) { return static_cast<std::size_t>(piece.end - piece.First()); }

    T* m_end = nullptr;
    T* m_limit = nullptr;
    Piece* m_top = nullptr;
    Piece* m_bottom = nullptr;
    std::size_t m_count = 0;
};

} // namespace TAVO
