#pragma once
// The strings of one document on their way to the pool. Names and values repeat, so the parser keeps the ones it met in
// a small table and asks the pool only for the others.

#include "poolentry.h"

#include <atomic>
#include <cstring>

namespace TAVO::XML::detail {

using String::CPPoolString;

// References to one entry, taken from its count in bulk and handed out without touching it again: an atomic operation
// per text would cost as much as finding it.
class Credit {
public:
    Credit() = default;
    Credit(const Credit&) = delete;
    Credit& operator=(const Credit&) = delete;
    ~Credit() { Drop(); }

    Buffers::tagCPOMEMHEADER* Block() const { return m_block; }

    void Assign(const CPPoolString& text) {
        Drop();
        m_block = String::PoolAccess::Block(text);
        m_static = Count().load(std::memory_order_relaxed) <= 0;
        Draw(1);
    }

    CPPoolString Take() {
        if (TAVO_UNLIKELY(m_left == 1)) Draw(kBulk);
        if (!m_static) --m_left;
        return String::PoolAccess::Adopt(m_block);
    }

private:
    static constexpr std::int32_t kBulk = 64;

    std::atomic_ref<std::int32_t> Count() const { return std::atomic_ref<std::int32_t>(m_block->lRefCnt); }
    void Draw(std::int32_t references) {
        if (!m_static) Count().fetch_add(references);
        m_left += references;
    }
    void Drop() {
        if (!m_block) return;
        // All but one go at once; the last one may free the entry.
        if (!m_static && m_left > 1) Count().fetch_sub(m_left - 1);
        String::PoolAccess::Adopt(m_block);
        m_block = nullptr;
        m_left = 0;
    }

    Buffers::tagCPOMEMHEADER* m_block = nullptr;
    std::int32_t m_left = 0; // references held here, at least 1
    bool m_static = false;
};

// Interns `count` units below 80, none of them 0.
inline CPPoolString Intern(const unsigned char* text, std::size_t count) {
    return String::pool::InternAscii(text, count);
}
inline CPPoolString Intern(const wchar_t* text, std::size_t count) { return String::pool::InternWide(text, count); }

// A table of `Slots` strings, each in the one place that its text's mix selects. A text that is met for the second time
// in a row at a place moves in: values that occur once leave the others alone.
template <std::size_t Slots> class StringCache {
public:
    // Interns `count` ASCII bytes (or units below 80), none of them 0.
    template <class Unit> CPPoolString Get(const Unit* text, std::size_t count) {
        const std::uint32_t mix = Mix(text, count);
        Slot& slot = m_slots[mix % Slots];
        if (TAVO_LIKELY(slot.mix == mix && slot.credit.Block() && Same(slot.credit.Block(), text, count)))
            return slot.credit.Take();
        CPPoolString made = Intern(text, count);
        if (slot.candidate == mix && made.isdef()) {
            slot.credit.Assign(made);
            slot.mix = mix;
        } else {
            slot.candidate = mix;
        }
        return made;
    }

private:
    struct Slot {
        std::uint32_t mix = 0, candidate = 0;
        Credit credit;
    };

    static std::uint32_t Mix(const unsigned char* text, std::size_t count) {
        constexpr std::uint64_t kOdd = 0x9E3779B97F4A7C15;
        std::uint64_t mix = count * kOdd;
        if (count >= 8) {
            std::uint64_t word;
            for (; count > 8; count -= 8, text += 8) {
                std::memcpy(&word, text, 8);
                mix = (mix ^ word) * kOdd;
                mix ^= mix >> 32;
            }
            std::memcpy(&word, text + count - 8, 8); // the last eight, overlapping those before
            mix = (mix ^ word) * kOdd;
        } else {
            // Without a call: four bytes from each end, or single ones.
            std::uint32_t low = 0, high = 0;
            if (count >= 4) {
                std::memcpy(&low, text, 4);
                std::memcpy(&high, text + count - 4, 4);
            } else {
                low = text[0];
                high = static_cast<std::uint32_t>(text[count / 2] << 8 | text[count - 1]);
            }
            mix = (mix ^ (static_cast<std::uint64_t>(high) << 32 | low)) * kOdd;
        }
        return static_cast<std::uint32_t>(mix >> 32);
    }
    static std::uint32_t Mix(const wchar_t* text, std::size_t count) {
        return Mix(reinterpret_cast<const unsigned char*>(text), count * sizeof(wchar_t));
    }

    static bool Same(Buffers::tagCPOMEMHEADER* block, const unsigned char* text, std::size_t count) {
        if (String::UnitsOf(block) != count) return false;
        const wchar_t* units = String::EntryOf(block).text;
        for (; count >= 8; count -= 8, units += 8, text += 8) {
            std::uint64_t four[2], bytes;
            std::memcpy(four, units, 16);
            std::memcpy(&bytes, text, 8);
            if ((Spread(static_cast<std::uint32_t>(bytes)) ^ four[0]) | (Spread(bytes >> 32) ^ four[1])) return false;
        }
        for (; count; --count)
            if (*units++ != *text++) return false;
        return true;
    }
    static bool Same(Buffers::tagCPOMEMHEADER* block, const wchar_t* text, std::size_t count) {
        return String::UnitsOf(block) == count &&
               std::memcmp(String::EntryOf(block).text, text, count * sizeof(wchar_t)) == 0;
    }
    static std::uint64_t Spread(std::uint64_t bytes) {
        bytes = (bytes | bytes << 16) & 0x0000FFFF0000FFFF;
        return (bytes | bytes << 8) & 0x00FF00FF00FF00FF;
    }

    Slot m_slots[Slots];
};

} // namespace TAVO::XML::detail
