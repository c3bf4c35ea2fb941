#pragma once
// Chunks of UTF-8 as the transcoders see them: 64 bytes, one mask bit per byte. How the masks come about depends on the
// processor.

#include "transcoding.h"

namespace TAVO::String::detail {

constexpr std::size_t kChunk = 64;

struct ChunkBits {
    std::uint64_t high = 0; // not ASCII
    std::uint64_t continuations = 0;
    std::uint64_t leads3 = 0, leads4 = 0; // leads of so many bytes and more
};

// Adds a chunk with zeros behind its `size` bytes, wherever a sequence goes on over its ends: `expected` is the
// continuation bytes that the chunk before lacked, then those that this one lacks. False, and nothing added: it holds
// sequences of four bytes or something invalid.
TAVO_INLINE bool AddPlain(const ChunkBits& bits, std::size_t size, std::uint64_t& expected, Extent& extent) {
    const std::uint64_t leads = bits.high & ~bits.continuations;
    if (bits.leads4 != 0 || (leads << 1 | bits.leads3 << 2 | expected) != bits.continuations) return false;
    expected = leads >> 63 | bits.leads3 >> 62;
    const std::size_t characters = size - Simd::CountBits(bits.continuations);
    extent.source += size;
    extent.characters += characters;
    extent.target += characters;
    return true;
}

// Takes back a last character of less than four bytes whose end is missing.
inline void TakeBack(const unsigned char* text, Extent& extent) {
    do --extent.source;
    while (IsContinuation(text[extent.source]));
    --extent.characters;
    --extent.target;
}

// The bulk passes for processors with lines. They may be called when Simd::HasLines() is true, and exist only when
// Simd::kLines is.
namespace Lines {

// Add characters up to the end or the first chunk that is not plain, or to the first surrogate.
TAVO_LINE void MeasureUtf8(const unsigned char* text, std::size_t length, Extent& extent);
template <class Unit> TAVO_LINE void MeasureUtf16(const Unit* text, std::size_t length, Extent& extent);

// Convert a measured text up to the first sequence of four bytes or surrogate, where `text` ends; they return the end
// of what was written.
template <class Unit> TAVO_LINE Unit* ConvertUtf8(const unsigned char*& text, const unsigned char* end, Unit* out);
template <class Unit> TAVO_LINE unsigned char* ConvertUtf16(const Unit*& text, const Unit* end, unsigned char* out);

} // namespace Lines
} // namespace TAVO::String::detail
