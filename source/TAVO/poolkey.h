#pragma once
// The key of a text: what the pool's tables are searched by, computed in one pass over the text's own form.

#include <cstddef>
#include <cstdint>
#include <TAVO/config.h>

namespace TAVO::String::pool {

struct Key {
    // Intended (pool-length): 1 per value below 10000, else 2. A pair of wide text is one value (0 or 1) and counts 1,
    // the same character from UTF-8 counts 2, so that the two are different entries. A textbook would count units.
    std::size_t length = 0;
    std::size_t utf8Size = 0; // bytes of the text in UTF-8
    std::uint64_t hash = 0;   // CRC-64 of the values' low 16 bits, low byte first
    std::uint64_t hashi = 0;  // the same with A to Z folded

    bool operator==(const Key&) const = default;
    bool SameText(const Key& other) const {
        return length == other.length && hash == other.hash && hashi == other.hashi;
    }
};

// How far a text goes: units (or bytes) of what was hashed, a character that the limit cuts left out.
// Nothing is read at or behind `limit`, nor behind the terminator.
// False: an invalid sequence; the text cannot be interned.
bool KeyOfWide(const wchar_t* text, std::size_t limit, Key& key, std::size_t& units);
bool KeyOfUtf8(const unsigned char* text, std::size_t limit, Key& key, std::size_t& bytes);

// Of exactly `count` units; zero units are characters.
bool KeyOfUnits(const wchar_t* text, std::size_t count, Key& key);

// The key that a stored text has when it came from UTF-8: characters above FFFF, which are stored as two units without
// the usual offset, count 2 and hash their low 16 bits. Surrogates that UTF-8 encoded one by one look the same in
// store; `joined` tells how to read two of them in a row.
Key KeyOfStoredUtf8(const wchar_t* text, std::size_t units, bool joined);

// Of exactly `count` ASCII bytes without a zero.
void KeyOfAscii(const unsigned char* text, std::size_t count, Key& key);

} // namespace TAVO::String::pool
