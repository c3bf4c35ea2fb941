#pragma once
// The list of maintenance requests, and the choice which one runs next. No lock and no thread: the owner has both.

#include <TAVO/maintenance.h>

namespace TAVO::Maintenance {

// One registered request, and what is remembered of it between passes.
struct Entry {
    Buffers::CPObjectMemory block;
    std::size_t position = 0; // of the interface inside the block
    std::uint32_t flags = 0;
    std::int32_t bonus = 0; // what waiting has added to the priority

    enum : std::uint32_t {
        Retired = 1,        // passed over, waits to be removed
        RemoveAfterRun = 2, // nobody waits for its run any more
    };

    IMaintenanceRequest& Request() const;
    bool IsRetired() const { return (flags & Retired) != 0; }
    // The same request: never an index, which may mean another one after the lock was left.
    bool Is(const Buffers::CPObjectMemory& other, std::size_t otherPosition) const {
        return block.key() == other.key() && position == otherPosition;
    }
};

// In order of registration. Requests are asked for due time and priority here; one that throws is retired.
class RequestList {
public:
    constexpr RequestList() = default;
    RequestList(const RequestList&) = delete;
    RequestList& operator=(const RequestList&) = delete;
    ~RequestList() { Clear(); }

    // False without memory. Room grows by 16 entries at a time.
    bool Append(const Buffers::CPObjectMemory& block, std::size_t position) noexcept;
    // Takes the entry out; what it held is the caller's to drop, without the lock: a finalizer is foreign code.
    Entry Take(std::size_t index) noexcept;
    // The entry at that index; null for NotFound.
    Entry* At(std::size_t index) noexcept { return index < m_count ? m_entries + index : nullptr; }
    std::size_t Find(const Buffers::CPObjectMemory& block, std::size_t position) const noexcept;
    std::size_t GetCount() const noexcept { return m_count; }
    void Clear() noexcept;

    // The most urgent request that is due, NotFound when none is. Ages those that are due, and resets the chosen one.
    std::size_t Choose(unsigned long long now) noexcept;
    // The earliest due time; false when no request waits.
    bool NextDue(unsigned long long& due) noexcept;

private:
    Entry* m_entries = nullptr;
    std::size_t m_count = 0, m_capacity = 0;
};

} // namespace TAVO::Maintenance
