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
// in a row at a place moves in: values that occur once leave the others alone. Texts are those of the document and must
// stay where they are, 1 to 7F all of their units: what is met again is compared with where it stood before.
template <class Unit, std::size_t Slots> class StringCache {
    // A text and a mix of all its bytes, which no other text of that length has when there are eight or fewer.
    struct Text {
        std::uint64_t mix = 0;
        const Unit* units = nullptr;
        std::size_t count = 0;

        Text() = default;
        Text(const Unit* text, std::size_t length) : units(text), count(length) {
            constexpr std::uint64_t kOdd = 0x9E3779B97F4A7C15;
            const auto* bytes = reinterpret_cast<const unsigned char*>(text);
            std::size_t left = length * sizeof(Unit);
            mix = left;
            std::uint64_t word;
            if (left >= 8) {
                for (; left > 8; left -= 8, bytes += 8) {
                    std::memcpy(&word, bytes, 8);
                    mix = (mix ^ word) * kOdd;
                    mix ^= mix >> 32;
                }
                std::memcpy(&word, bytes + left - 8, 8); // the last eight, overlapping those before
            } else {
                // Without a call: four bytes from each end, or single ones.
                std::uint32_t low = 0, high = 0;
                if (left >= 4) {
                    std::memcpy(&low, bytes, 4);
                    std::memcpy(&high, bytes + left - 4, 4);
                } else {
                    low = bytes[0];
                    high = static_cast<std::uint32_t>(bytes[left / 2] << 8 | bytes[left - 1]);
                }
                word = static_cast<std::uint64_t>(high) << 32 | low;
            }
            mix = (mix ^ word) * kOdd;
        }

        std::size_t Place() const { return static_cast<std::size_t>(mix >> 40) % Slots; }
        bool operator==(const Text& other) const {
            return mix == other.mix && count == other.count &&
                   (count * sizeof(Unit) <= 8 || std::memcmp(units, other.units, count * sizeof(Unit)) == 0);
        }
    };

    struct Slot {
        Text text; // what the credit is for
        std::uint64_t candidate = 0;
        Credit credit;

        bool Holds(const Text& other) const { return text == other; }
        void Meet(const Text& other, const CPPoolString& made) {
            if (candidate == other.mix && made.isdef()) {
                credit.Assign(made);
                text = other;
            } else {
                candidate = other.mix;
            }
        }
    };

public:
    // Interns `count` units, 1 at least.
    CPPoolString Get(const Unit* text, std::size_t count) {
        const Text key(text, count);
        Slot& slot = m_slots[key.Place()];
        if (TAVO_LIKELY(slot.Holds(key))) return slot.credit.Take();
        CPPoolString made = Intern(text, count);
        slot.Meet(key, made);
        return made;
    }

    // The same in two steps, the second of which is quicker when something else is done meanwhile.
    class Later {
    public:
        // The null string when Finish gives it.
        CPPoolString Begin(StringCache& cache, const Unit* text, std::size_t count) {
            m_text = Text(text, count);
            m_slot = &cache.m_slots[m_text.Place()];
            if (m_slot->Holds(m_text)) return m_slot->credit.Take();
            CPPoolString known = m_announced.Begin(text, count);
            if (known.isdef()) m_slot->Meet(m_text, known);
            return known;
        }
        CPPoolString Finish() const {
            CPPoolString made = m_announced.Finish();
            m_slot->Meet(m_text, made);
            return made;
        }

    private:
        String::pool::Announced<Unit> m_announced;
        Text m_text;
        Slot* m_slot = nullptr;
    };

private:
    Slot m_slots[Slots];
};

} // namespace TAVO::XML::detail
