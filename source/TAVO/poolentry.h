#pragma once
// Pool entries from inside: their blocks, the static ones, and interning from forms that the public interface lacks.

#include "blocks.h"
#include "poolkey.h"

#include <TAVO/string.h>

namespace TAVO::String {

using PoolEntry = detail::tagPOOLENTRY;

// The type of entries' blocks. Entries allow no copies: a text exists once.
extern const Buffers::tagCPOVTABL g_entryTable;

// The static entries: count 0, so never counted, swept or freed; one address in the process.
enum class Static { Null, Empty, True, False };
Buffers::tagCPOMEMHEADER* StaticEntry(Static which) noexcept;

// Handles from inside.
class PoolAccess {
public:
    static Buffers::tagCPOMEMHEADER* Block(const CPPoolString& text) { return text.m_pMH; }
    static const Buffers::CPObjectMemory& Handle(const CPPoolString& text) { return text; }
    // Takes over a reference.
    static CPPoolString Adopt(Buffers::tagCPOMEMHEADER* block) { return CPPoolString(block); }
    static CPPoolString Share(Buffers::tagCPOMEMHEADER* block) {
        block = Buffers::Block::Acquire(block);
        return block ? CPPoolString(block) : CPPoolString();
    }
};

inline PoolEntry& EntryOf(Buffers::tagCPOMEMHEADER* block) { return *reinterpret_cast<PoolEntry*>(block + 1); }

// All units of the text, without the terminator; never below its length, above it for texts with pairs.
inline std::size_t UnitsOf(const Buffers::tagCPOMEMHEADER* block) {
    return (block->sUsed - sizeof(PoolEntry)) / sizeof(wchar_t) - 1;
}
// The same from the text's own place: who goes on to read the text need not have the header in the cache. Texts hold no
// zero, so one at the key's length is the terminator.
inline std::size_t UnitsOf(const CPPoolString& text) {
    const wchar_t* units = text;
    const std::size_t length = text.len();
    return TAVO_LIKELY(units[length] == 0) ? length : UnitsOf(PoolAccess::Block(text));
}

// A new block for a text of `units` units, which go to `text`; the terminator is there. Count 1; null without memory.
Buffers::tagCPOMEMHEADER* NewEntry(std::size_t units, const pool::Key& key, wchar_t*& text) noexcept;

// Gives back the units behind `units`; the key may then be set anew. The block may move.
Buffers::tagCPOMEMHEADER* ShortenEntry(Buffers::tagCPOMEMHEADER* block, std::size_t units) noexcept;

void SetKey(PoolEntry& entry, const pool::Key& key) noexcept;

// Whether the entry's text gives its key, by either road: wide text, or UTF-8 with characters above FFFF.
bool IsSound(Buffers::tagCPOMEMHEADER* block) noexcept;

// Frees the cached UTF-8 form.
void FreeUtf8(PoolEntry& entry) noexcept;

namespace pool {

// Interns `count` ASCII bytes, none of them 0; the caller has looked at them.
CPPoolString InternAscii(const unsigned char* text, std::size_t count) noexcept;

// Interns `count` units, none of them 0. The null string when they hold a bad sequence.
CPPoolString InternWide(const wchar_t* text, std::size_t count) noexcept;

// Interning in two steps, for who has something else to do meanwhile: the first starts to fetch from memory what the
// second looks at. Unit is a byte or wchar_t; `count` units, 1 at least, all from 1 to 7F, which stay where they are.
template <class Unit> class Announced {
public:
    // The string when it can be told at once; else the null string, and Finish gives it.
    CPPoolString Begin(const Unit* text, std::size_t count) noexcept;
    // Requires: Begin gave the null string. The null string without memory.
    CPPoolString Finish() const noexcept;

private:
    Key m_key;
    const Unit* m_text = nullptr;
    std::size_t m_count = 0;
    bool m_searched = false, m_fetched = false;
};
extern template class Announced<unsigned char>;
extern template class Announced<wchar_t>;

// At unload: tells how many strings are still held and lets the tables go. Skipped when the lock is taken.
void Unload() noexcept;

} // namespace pool
} // namespace TAVO::String
