#pragma once
// Shared, reference-counted blocks of typed memory (the storage under nearly every value of the library), byte buffers
// and vectors made of them, sorting and searching of raw arrays, and the checksum machine.
//
// A handle is one pointer to a block: a header, then the payload, in one heap allocation. Copying a handle shares the
// block and counts; the last release finalizes the payload and frees the block.
//
// Threads: different handles of one block may be copied and released at once; one handle object is for one thread at a
// time. Contents have no lock.

#include <new>
#include <TAVO/core.h>
#include <utility>

namespace TAVO {
namespace Buffers {

/// What a payload type does; the table's address is the type's identity, so there is one per type in the process.
struct tagCPOVTABL {
    /// Constructs default elements over @p bytes bytes.
    void (*create)(void* payload, std::size_t bytes);
    /// Copy-constructs the source's elements into raw memory; null where a type allows no copies.
    void (*clone)(void* target, const void* source, std::size_t bytes);
    /// Destroys the elements; called once, with the used size, when the last handle goes. It must not hand out handles
    /// to the block itself.
    void (*finalize)(void* payload, std::size_t bytes);
    /// The interface @p type inside the payload, or null.
    void* (*queryinterface)(void* payload, const _acfUID& type);
};

/// What every block starts with; the payload follows in the same allocation, 16-byte aligned.
struct tagCPOMEMHEADER {
    std::int32_t lRefCnt;   ///< handles sharing the block; 0 or below marks a static block: never counted, never freed
    std::size_t sAllocated; ///< payload bytes available
    std::size_t sUsed;      ///< payload bytes in use, never above sAllocated
    const tagCPOVTABL* pVTbl; ///< the payload's type; never null in a live block
};
static_assert(sizeof(tagCPOMEMHEADER) == 32, "the payload behind the header is 16-byte aligned");

/// An index or position that is not there.
constexpr std::size_t NotFound = ~static_cast<std::size_t>(0);

/// Handle of a block of any type. One pointer; empty when null.
class TAVO_API CPObjectMemory {
public:
    CPObjectMemory() noexcept : m_pMH(nullptr) {}
    /// Shares the block: one atomic increment, none for a static block.
    CPObjectMemory(const CPObjectMemory& other) noexcept : m_pMH(other.m_pMH ? Acquire(other.m_pMH) : nullptr) {}
    /// Takes the block without counting; @p other is empty afterwards.
    CPObjectMemory(CPObjectMemory&& other) noexcept : m_pMH(std::exchange(other.m_pMH, nullptr)) {}
    CPObjectMemory& operator=(const CPObjectMemory& other) noexcept {
        CopyCPMemory(other);
        return *this;
    }
    CPObjectMemory& operator=(CPObjectMemory&& other) noexcept {
        if (this != &other) {
            tagCPOMEMHEADER* old = std::exchange(m_pMH, std::exchange(other.m_pMH, nullptr));
            if (old) Free(old);
        }
        return *this;
    }
    ~CPObjectMemory() {
        if (m_pMH) Free(m_pMH);
    }

    /// Releases the block and empties the handle.
    void free() noexcept {
        if (tagCPOMEMHEADER* old = std::exchange(m_pMH, nullptr)) Free(old);
    }

    /// Makes the block this handle's alone: a shared one is copied (used part only), a private one stays.
    /// @return true: writing is safe now (or the handle is empty). False when the type allows no copies, the heap
    ///         refused or copying threw; the handle then keeps the shared block.
    /// A static block raises an assertion and is copied.
    bool clone() noexcept;

    /// 0 for an empty handle, never 0 for another; from the block's address.
    std::uint32_t hash() const noexcept;
    /// Identity of the block: its address shifted right by 3; 0 when empty.
    std::size_t key() const noexcept { return reinterpret_cast<std::size_t>(m_pMH) >> 3; }
    /// The current count of handles; 0 when empty, 0 or "negative" for a static block.
    std::uint32_t lockcnt() const noexcept;

    /// Whether a value of @p size bytes of this type may be assigned: false without size or table; true when empty;
    /// else when the block has this table and at least @p size used bytes.
    bool IsAssignable(std::size_t size, const tagCPOVTABL* table) const noexcept;
    /// The same for arrays: the used size must be a multiple of @p size.
    bool IsNAssignable(std::size_t size, const tagCPOVTABL* table) const noexcept;
    /// Whether the handle holds a block of the type identified by @p id; false when empty.
    bool IsType(std::size_t id) const noexcept { return m_pMH && GetTypeID() == id; }
    /// The address of the block's type table, its run-time type; 0 when empty.
    std::size_t GetTypeID() const noexcept { return m_pMH ? reinterpret_cast<std::size_t>(m_pMH->pVTbl) : 0; }
    /// Index of the first of @p count ids that is this block's type; 0xFFFFFFFF when none is.
    std::uint32_t GetType(const std::size_t* ids, std::uint32_t count) const noexcept;

protected:
    /// A handle that takes over one reference of @p header.
    constexpr explicit CPObjectMemory(tagCPOMEMHEADER* header) noexcept : m_pMH(header) {}

    /// Shares the source's block, then releases the old one.
    void CopyCPMemory(const CPObjectMemory& source) noexcept;
    /// Releases the block and allocates one of @p size bytes, all used, not constructed. False (and empty) without a
    /// table or memory.
    bool Alloc(std::size_t size, const tagCPOVTABL* table) noexcept;
    /// As Alloc with a used size of 0.
    bool Reserve(std::size_t capacity, const tagCPOVTABL* table) noexcept;
    /// Adds @p extra bytes of capacity to a private block, in place or moved bitwise; the used size stays. False for an
    /// empty handle, a shared or static block, extra 0 or when the heap refuses: the block then stays as it is.
    bool Incalloc(std::size_t extra) noexcept;
    /// Drops one reference of @p header; the last one finalizes and frees. Null and static blocks are ignored.
    static void Free(tagCPOMEMHEADER* header) noexcept;
    /// Adds one reference of @p header, which must not be null; null when the block turned out to be dead.
    static tagCPOMEMHEADER* Acquire(tagCPOMEMHEADER* header) noexcept;
    /// A new block outside any handle, count 1; null without memory. Sizes near the end of the address space are
    /// refused.
    static tagCPOMEMHEADER* NewBlock(std::size_t capacity, std::size_t used, const tagCPOVTABL* table) noexcept;
    /// A new block that holds one T; null without memory, and when its constructor throws.
    template <class T, class... Arguments>
    static tagCPOMEMHEADER* NewObject(const tagCPOVTABL* table, Arguments&&... arguments) noexcept {
        static_assert(alignof(T) <= 16, "blocks are aligned to 16");
        tagCPOMEMHEADER* block = NewBlock(sizeof(T), sizeof(T), table);
        if (!block) return nullptr;
        try {
            ::new (static_cast<void*>(block + 1)) T(std::forward<Arguments>(arguments)...);
            return block;
        } catch (...) {
            Core::OS::_ffree(block);
            return nullptr;
        }
    }

    /// Used bytes; 0 when empty.
    std::size_t GetSize() const noexcept { return m_pMH ? m_pMH->sUsed : 0; }
    /// Available bytes; 0 when empty.
    std::size_t GetAllocSize() const noexcept { return m_pMH ? m_pMH->sAllocated : 0; }
    /// Sets the used size, constructing and finalizing nothing. False for an empty handle, a static block, or above the
    /// allocated size.
    bool SetSize(std::size_t size) noexcept;
    /// Byte offset of the interface @p type inside the payload of @p other; all-ones when it has none or is empty.
    static std::size_t queryinterface(const CPObjectMemory& other, const _acfUID& type) noexcept;
    /// Whether this handle is the block's only one, so that the block may be changed or moved.
    bool IsPrivate() const noexcept;
    /// Whether the block is static. It may lie in read-only memory, so every change goes to a new block instead.
    bool IsStatic() const noexcept;
    /// The payload, null when empty.
    void* Payload() const noexcept { return m_pMH ? m_pMH + 1 : nullptr; }

    tagCPOMEMHEADER* m_pMH;
};
static_assert(sizeof(CPObjectMemory) == sizeof(void*), "a handle is one pointer");

/// Shared, untyped bytes. The used size is the number of valid bytes.
class TAVO_API CPPlainMemory : public CPObjectMemory {
public:
    static const tagCPOVTABL _vtbl;
    static std::size_t GetTypeID() noexcept { return reinterpret_cast<std::size_t>(&_vtbl); }

    CPPlainMemory() noexcept = default;
    CPPlainMemory(const CPPlainMemory& other) noexcept = default;
    CPPlainMemory(CPPlainMemory&& other) noexcept = default;
    /// Shares @p other when it is plain memory with at least one used byte, else stays empty.
    explicit CPPlainMemory(const CPObjectMemory& other) noexcept;
    CPPlainMemory& operator=(const CPPlainMemory& other) noexcept = default;
    CPPlainMemory& operator=(CPPlainMemory&& other) noexcept = default;
    /// Shares @p other when it is plain memory with at least one used byte, else becomes empty.
    CPPlainMemory& operator=(const CPObjectMemory& other) noexcept;

    /// The bytes; null when empty.
    operator void*() const noexcept { return Payload(); }
    /// The number of valid bytes.
    std::size_t GetSize() const noexcept { return CPObjectMemory::GetSize(); }

    /// Releases the buffer and takes a new one of @p size undefined bytes; size 0 leaves it empty and is true.
    bool Alloc(std::size_t size) noexcept { return _Alloc(size, &_vtbl); }
    /// Changes the size, keeping the bytes; grows to exactly @p size. Within the capacity the block itself changes,
    /// also for every other handle that shares it: clone() first for a private buffer. A static block is left for a new
    /// one. False keeps the old buffer.
    bool Resize(std::size_t size) noexcept { return _Resize(size, m_pMH ? m_pMH->pVTbl : &_vtbl); }
    /// Whether @p address lies inside the block. The bytes of the block's header count too, but for the first.
    bool isMemory(const void* address) const noexcept;

protected:
    /// As Alloc, with a type table of the caller's.
    bool _Alloc(std::size_t size, const tagCPOVTABL* table) noexcept;
    bool _Resize(std::size_t size, const tagCPOVTABL* table) noexcept;
    /// Makes room for @p capacity bytes when that is above the used size: the block is then replaced even if it had
    /// room.
    bool _Reserve(std::size_t capacity, const tagCPOVTABL* table) noexcept;

    static void _create(void* payload, std::size_t bytes);
    static void _clone(void* target, const void* source, std::size_t bytes);
    static void _finalize(void* payload, std::size_t bytes);
    static void* _queryinterface(void* payload, const _acfUID& type);
};

/// Vector of handles of type T, itself a handle: copies share the elements. Changes are made in place and seen by all
/// who share the block, unless the call has to replace it (a static one always); clone() first for a private vector. T
/// must be movable bitwise and its default must be its empty value. Instantiated for CPObjectMemory, pooled strings and
/// the hash table's entries; each is a type of its own.
template <class T> class CPObjectVector : public CPObjectMemory {
public:
    static const tagCPOVTABL _vtbl;
    static std::size_t GetTypeID() noexcept;

    CPObjectVector() noexcept;
    /// A vector of @p count empty elements; stays empty when the heap refuses.
    explicit CPObjectVector(std::size_t count) noexcept;

    /// Releases the vector and makes one of @p count empty elements; count 0 leaves it empty and is true.
    bool Alloc(std::size_t count) noexcept;
    /// Makes room for @p count elements in a private or new block.
    bool Reserve(std::size_t count) noexcept;
    /// Drops elements at the end or adds empty ones; growing beyond the capacity takes exactly @p count.
    bool Resize(std::size_t count) noexcept;
    /// Puts a counted copy of @p element before position @p position, or at the end when that is beyond it.
    /// Capacity grows by 16 elements at a time. False only without memory; the vector is then unchanged.
    bool Insert(const T& element, std::size_t position) noexcept;
    /// Takes out the element at @p index and closes the gap. With @p releaseWhenEmpty the block goes with the last
    /// element.
    bool Delete(std::size_t index, bool releaseWhenEmpty) noexcept;
    /// Index of the first element after @p afterIndex that holds the same block as @p element; all-ones when none does.
    /// Pass all-ones to search from the start, the last result to go on.
    std::size_t Find(const T& element, std::size_t afterIndex) const noexcept;

    std::size_t GetNItems() const noexcept;
    bool isEmpty() const noexcept;
    /// No bounds check.
    T& operator[](std::size_t index) noexcept;
    const T& operator[](std::size_t index) const noexcept;
    /// The elements, null when empty; their number goes to @p count.
    T* GetArray(std::size_t& count) const noexcept;
    /// Sorts in place; the order of equal elements is that of Sort::vfqsort.
    void Sort(int (*compare)(const void* first, const void* second)) noexcept;

protected:
    static void _create(void* payload, std::size_t bytes);
    static void _clone(void* target, const void* source, std::size_t bytes);
    static void _finalize(void* payload, std::size_t bytes);
    static void* _queryinterface(void* payload, const _acfUID& type);

    T* Elements() const noexcept;
    bool GrowTo(std::size_t capacity) noexcept;
    bool LeaveStatic() noexcept;
    // Takes the element out, uncounted, and closes the gap. Requires: index below the count, a block that may change.
    T Extract(std::size_t index, bool releaseWhenEmpty) noexcept;
};

extern template class TAVO_TEMPLATE_DECL CPObjectVector<CPObjectMemory>;

/// Vector of handles of any type.
class TAVO_API CPOMVector : public CPObjectVector<CPObjectMemory> {
public:
    CPOMVector() noexcept = default;
    explicit CPOMVector(std::size_t count) noexcept : CPObjectVector(count) {}
    CPOMVector(const CPOMVector& other) noexcept = default;
    CPOMVector(CPOMVector&& other) noexcept = default;
    /// Shares @p other when it is such a vector, else stays empty.
    explicit CPOMVector(const CPObjectMemory& other) noexcept;
    CPOMVector& operator=(const CPOMVector& other) noexcept = default;
    CPOMVector& operator=(CPOMVector&& other) noexcept = default;
    CPOMVector& operator=(const CPObjectMemory& other) noexcept;
};

/// A set that holds at most one object per run-time type. What goes in and what comes out are private copies, so copies
/// of the set and objects outside it never change each other.
class TAVO_API CPTypedObjectVector {
public:
    CPTypedObjectVector() noexcept = default;
    CPTypedObjectVector(const CPTypedObjectVector&) noexcept = default;
    CPTypedObjectVector& operator=(const CPTypedObjectVector&) noexcept = default;
    virtual ~CPTypedObjectVector();

    /// Keeps a private copy of @p object in place of the one of its type. False for an empty handle, a type that allows
    /// no copies, or without memory; the set is then as it was.
    bool Set(const CPObjectMemory& object) noexcept;
    /// A private copy of the object of that type; empty when there is none or it could not be copied.
    CPObjectMemory Get(std::size_t typeId) const noexcept;
    /// Removes the object of that type; true also when there is none, false only without memory.
    bool Delete(std::size_t typeId) noexcept;

private:
    std::size_t Locate(std::size_t typeId, bool& found) const noexcept;

    CPOMVector m_objects; // ascending by type identifier
};

/// Exchanges two blocks of @p size bytes, which must be the same or apart.
TAVO_API void swap(void* first, void* second, std::size_t size) noexcept;

namespace Sort {

using Compare = int (*)(const void* first, const void* second);
using CompareWith = int (*)(const void* first, const void* second, void* context);

/// Sorts @p count elements of @p size bytes in place, without allocating; not stable. Nothing for fewer than two
/// elements or size 0. A comparison that throws ends the sort: the array is then some permutation of what it was. O(n
/// log n), also for the worst order of more than 1024 elements.
TAVO_API void vfqsort(void* base, std::size_t count, std::size_t size, Compare compare) noexcept;
/// The same with a context for the comparison.
TAVO_API void vfpqsort(void* base, std::size_t count, std::size_t size, void* context, CompareWith compare) noexcept;

/// Position of the first element that is not before @p key, 0 to @p count; an exact match is for the caller to confirm.
/// The comparison gets the key first. A comparison that throws gives @p count.
TAVO_API std::size_t vfqfind(const void* key, const void* base, std::size_t count, std::size_t size,
                             Compare compare) noexcept;
/// The same with a context for the comparison.
TAVO_API std::size_t vfpqsearch(const void* key, const void* base, std::size_t count, std::size_t size, void* context,
                                CompareWith compare) noexcept;

} // namespace Sort

/// Cyclic redundancy check of any width from 8 to 64 bits: most significant bit first, no reflection, no final XOR.
/// Immutable after construction, so any number of threads may use one.
class TAVO_API CMachineCRC {
public:
    /// @param width       bits of the checksum; outside 8 to 64 every Eval answers its initial value
    /// @param polynomial  in normal notation, without its top bit
    CMachineCRC(std::uint32_t width, unsigned long long polynomial) noexcept;

    /// The checksum of @p length bytes continuing from @p initial.
    /// A checksum of width 8 computes nothing and answers @p initial, as do invalid widths.
    unsigned long long Eval(const void* data, std::size_t length, unsigned long long initial) const noexcept;

private:
    std::int32_t m_shift; // width - 8
    unsigned long long m_mask;
    unsigned long long m_table[256];
};

} // namespace Buffers
} // namespace TAVO
