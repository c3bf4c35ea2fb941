#pragma once
// The library's one hash table: a map from 64-bit hashes, which the caller computes, to items of object memory.
//
// 2^n buckets, chosen by the hash's low bits; each bucket is a vector sorted by hash and, for equal hashes, by the
// derived class's comparison. The table never resizes.
//
// Threads: no lock of its own; the owner serialises every access.

#include <TAVO/buffers.h>

namespace TAVO {
namespace Lookup {

/// What AddItem does when an entry of the same hash exists.
enum eHashCollision : std::uint32_t {
    eHashKeep = 0,          ///< equal items: keep and return the old one; others are inserted beside it
    eHashReplace = 1,       ///< equal items: replace the old one; others are inserted beside it
    eHashKeepByHash = 2,    ///< the hash alone decides: keep and return the first entry of that hash
    eHashReplaceByHash = 3, ///< the hash alone decides: replace the first entry of that hash
    eHashRefuse = 4 ///< equal items: refuse with an empty handle (as does every value above); others are inserted
};

/// Visitor of a table.
class IBaseHashTableEnum {
public:
    /// @return true to go on (EnumTableBy) or to keep the entry (PurgeTable). An exception counts as the end of the
    /// walk.
    virtual bool OnItem(unsigned long long hash, const Buffers::CPObjectMemory& item) = 0;

protected:
    ~IBaseHashTableEnum() = default;
};

/// Base of every table; a derived class compares items and may say which of them can be disposed of.
class TAVO_API CBaseHashTable {
public:
    struct HASHENTRY {
        unsigned long long hash = 0;
        Buffers::CPObjectMemory item;
    };

    /// 1024 buckets.
    CBaseHashTable() noexcept;
    /// 2^@p uDirectIndexLength buckets, 4 to 63. Any other value raises an assertion and is taken modulo 64.
    explicit CBaseHashTable(std::uint32_t uDirectIndexLength) noexcept;
    CBaseHashTable(const CBaseHashTable&) = delete;
    CBaseHashTable& operator=(const CBaseHashTable&) = delete;

    virtual ~CBaseHashTable();

protected:
    /// The order of two items of equal hash: below 0, 0 for equal, above 0. It may not change the table. If it throws,
    /// nothing is found and nothing is inserted.
    virtual long32 CompareItems(const Buffers::CPObjectMemory& first, const Buffers::CPObjectMemory& second) = 0;
    /// Whether DisposeTable may drop the item; no by default. While it is asked, the table, the walk and the argument
    /// hold the item: an item that nobody else holds has a count of 3.
    virtual bool IsDisposable(Buffers::CPObjectMemory item);
    /// Called for an item just before DisposeTable and DeleteIndex drop it.
    virtual void OnDispose(const Buffers::CPObjectMemory& item);

public:
    /// Releases the index and with it every bucket and item.
    void ClearTable() noexcept;
    /// The number of entries; visits every bucket.
    unsigned long long GetNItems() const noexcept;

protected:
    /// Inserts @p item or resolves the collision. Returns the item that now stands for the hash; empty when the item is
    /// empty, the duplicate was refused or memory is out: the table is then as it was.
    Buffers::CPObjectMemory AddItem(unsigned long long hash, const Buffers::CPObjectMemory& item,
                                    eHashCollision collision) noexcept;
    /// The item of that hash that compares equal to the probe; empty when there is none.
    Buffers::CPObjectMemory FindItem(unsigned long long hash, const Buffers::CPObjectMemory& probe) noexcept;
    /// Removes the entry that equals the probe; false when there is none, true on a table that never held an item.
    bool DeleteItem(unsigned long long hash, const Buffers::CPObjectMemory& probe) noexcept;
    /// Drops the whole bucket that the hash selects, entries of other hashes included, after OnDispose for each; true.
    bool DeleteIndex(unsigned long long hash) noexcept;
    /// Visits every entry, or with @p byHash those of exactly @p hash. False when stopped, without a visitor or for an
    /// empty table. The visitor may change the table.
    bool EnumTableBy(IBaseHashTableEnum* visitor, unsigned long long hash, bool byHash) noexcept;
    /// Removes every entry that the visitor rejects. True when all were visited, also without a visitor or entries;
    /// false when the visitor threw: that entry stays.
    bool PurgeTable(IBaseHashTableEnum* visitor) noexcept;
    /// Drops disposable items, bucket after bucket from where the last call ended, for @p budget milliseconds.
    /// @return true when a whole round finished within the budget; false also when the derived class threw.
    bool DisposeTable(std::uint32_t budget) noexcept;

    /// Where an item stands, or where it would be inserted. Valid until the table changes.
    struct Place {
        std::size_t bucket;
        std::size_t index;
        bool found;
    };
    /// Finds the place of @p probe among the entries of @p hash; an empty probe stands for any item.
    Place Locate(unsigned long long hash, const Buffers::CPObjectMemory& probe) noexcept;
    /// The entry at a place that was found.
    HASHENTRY& At(const Place& place) noexcept;
    /// Inserts at a place that was not found, taking over the reference. False without memory: item and table are then
    /// as they were.
    bool InsertAt(const Place& place, unsigned long long hash, Buffers::CPObjectMemory&& item) noexcept;
    /// Takes the entry at a place that was found out of the table, with its reference.
    Buffers::CPObjectMemory RemoveAt(const Place& place) noexcept;

private:
    friend class TableAccess; // the library's own road to the buckets

    class Bucket;

    Bucket* Buckets() const noexcept;
    bool DisposeEntry(std::size_t bucket, std::size_t index); // whether it went

    unsigned long long m_mask;
    unsigned long long m_buckets;
    unsigned long long m_cursor; // the bucket where the next DisposeTable goes on
    Buffers::CPOMVector m_index; // one handle per bucket; empty until the first insertion
};

/// The key of objects of type T.
template <class T> class IHashKey {
public:
    virtual unsigned long long GetHash(const T& object) const = 0;
    /// The order of two objects of equal hash by their keys; 0 when the keys are equal.
    virtual long32 Compare(const T& first, const T& second) const = 0;

protected:
    ~IHashKey() = default;
};

/// A table of objects that know their key. T is a handle of a block: it has the type T::Object, a constructor from
/// CPObjectMemory, and `static const Object& T::ObjectOf(const CPObjectMemory&)`. H is an IHashKey<T::Object>.
template <class T, class H> class CPOMKeyTable : public CBaseHashTable {
public:
    /// 2^@p uDirectIndexLength buckets.
    explicit CPOMKeyTable(std::uint32_t uDirectIndexLength = 10) noexcept : CBaseHashTable(uDirectIndexLength) {}

    /// As AddItem: the item that now stands for the key, empty for a refused one or without memory.
    T Add(const T& item, eHashCollision collision) noexcept { return T(AddItem(HashOf(item), item, collision)); }
    /// The item whose key is that of @p probe; empty when there is none.
    T Find(const T& probe) noexcept { return T(FindItem(HashOf(probe), probe)); }
    /// Removes the item whose key is that of @p probe; false when there is none, true on a table that never held any.
    bool Delete(const T& probe) noexcept { return DeleteItem(HashOf(probe), probe); }
    /// Visits every item, in no order that means anything. False when stopped, without a visitor or for an empty table.
    bool Enum(IBaseHashTableEnum* visitor) noexcept { return EnumTableBy(visitor, 0, false); }

protected:
    long32 CompareItems(const Buffers::CPObjectMemory& first, const Buffers::CPObjectMemory& second) override {
        return m_key.Compare(T::ObjectOf(first), T::ObjectOf(second));
    }

private:
    // An empty handle has no key; the table refuses it whatever the hash.
    unsigned long long HashOf(const T& item) const noexcept {
        return item.key() ? m_key.GetHash(T::ObjectOf(item)) : 0;
    }

    H m_key;
};

} // namespace Lookup

namespace Buffers {
extern template class TAVO_TEMPLATE_DECL CPObjectVector<Lookup::CBaseHashTable::HASHENTRY>;
} // namespace Buffers
} // namespace TAVO
