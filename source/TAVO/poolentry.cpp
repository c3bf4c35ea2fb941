// Pool entries: their blocks, and the four that always exist.

#include "poolentry.h"

#include "crc64.h"
#include "platform/heap.h"

#include <atomic>
#include <new>

namespace TAVO::String {

using Buffers::Block;
using Buffers::tagCPOMEMHEADER;

namespace {

void CreateNothing(void*, std::size_t) {}
void Finalize(void* payload, std::size_t) { FreeUtf8(*static_cast<PoolEntry*>(payload)); }
void* NoInterface(void*, const _acfUID&) { return nullptr; }

template <std::size_t Size> struct StaticBlock {
    tagCPOMEMHEADER header;
    PoolEntry entry;
    wchar_t text[Size];
};

constexpr unsigned long long HashOf(const char* text) {
    std::uint64_t crc = 0;
    for (; *text; ++text) crc = crc64::Add1(crc, static_cast<unsigned char>(*text));
    return crc;
}

template <std::size_t Size> constexpr tagCPOMEMHEADER StaticHeader() {
    const std::size_t size = sizeof(PoolEntry) + Size * sizeof(wchar_t);
    return {0, size, size, &g_entryTable};
}

constexpr unsigned char kTrue[] = {'t', 'r', 'u', 'e', 0};
constexpr unsigned char kFalse[] = {'f', 'a', 'l', 's', 'e', 0};
constexpr unsigned char kNoText[] = {0};

// Constant-initialised: usable from any static constructor.
constinit StaticBlock<1> g_null = {StaticHeader<1>(), {0, 0, 0, 0, 0, g_null.text, kNoText}, L""};
constinit StaticBlock<1> g_empty = {StaticHeader<1>(), {0, 0, 0, 0, 0, g_empty.text, kNoText}, L""};
constinit StaticBlock<5> g_true = {
    StaticHeader<5>(), {0, 4, 4, HashOf("true"), HashOf("true"), g_true.text, kTrue}, L"true"};
constinit StaticBlock<6> g_false = {
    StaticHeader<6>(), {0, 5, 5, HashOf("false"), HashOf("false"), g_false.text, kFalse}, L"false"};

} // namespace

constinit const Buffers::tagCPOVTABL g_entryTable = {CreateNothing, nullptr, Finalize, NoInterface};

constinit const CPPoolString CPPoolString::ptrue(&g_true.header);
constinit const CPPoolString CPPoolString::pfalse(&g_false.header);
constinit const CPPoolString CPPoolString::pempty(&g_empty.header);

tagCPOMEMHEADER* StaticEntry(Static which) noexcept {
    switch (which) {
    case Static::Empty:
        return &g_empty.header;
    case Static::True:
        return &g_true.header;
    case Static::False:
        return &g_false.header;
    default:
        return &g_null.header;
    }
}

tagCPOMEMHEADER* CPPoolString::NullBlock() noexcept { return &g_null.header; }
bool CPPoolString::isnull() const noexcept { return m_pMH == &g_null.header; }
bool CPPoolString::isempty() const noexcept { return m_pMH == &g_empty.header; }

void SetKey(PoolEntry& entry, const pool::Key& key) noexcept {
    entry.length = key.length;
    entry.utf8Size = key.utf8Size;
    entry.hash = key.hash;
    entry.hashi = key.hashi;
}

tagCPOMEMHEADER* NewEntry(std::size_t units, const pool::Key& key, wchar_t*& text) noexcept {
    if (units > SIZE_MAX / 4) return nullptr;
    const std::size_t size = sizeof(PoolEntry) + (units + 1) * sizeof(wchar_t);
    tagCPOMEMHEADER* block = Block::NewBlock(size, size, &g_entryTable);
    if (!block) return nullptr;
    text = reinterpret_cast<wchar_t*>(reinterpret_cast<PoolEntry*>(block + 1) + 1);
    text[units] = 0;
    ::new (static_cast<void*>(block + 1)) PoolEntry{0, 0, 0, 0, 0, text, nullptr};
    SetKey(EntryOf(block), key);
    return block;
}

tagCPOMEMHEADER* ShortenEntry(tagCPOMEMHEADER* block, std::size_t units) noexcept {
    const std::size_t size = sizeof(PoolEntry) + (units + 1) * sizeof(wchar_t);
    if (auto* moved = static_cast<tagCPOMEMHEADER*>(Platform::Reallocate(block, sizeof(*block) + size))) {
        block = moved;
        block->sAllocated = size;
    }
    block->sUsed = size;
    PoolEntry& entry = EntryOf(block);
    auto* text = reinterpret_cast<wchar_t*>(&entry + 1);
    text[units] = 0;
    entry.text = text;
    return block;
}

void FreeUtf8(PoolEntry& entry) noexcept {
    Platform::Release(const_cast<unsigned char*>(std::atomic_ref(entry.utf8).exchange(nullptr)));
}

} // namespace TAVO::String
