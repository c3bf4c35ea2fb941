// The classes of the process.

#include "classregistry.h"

#include "crc64.h"
#include "platform/platform.h"
#include "wide.h"

#include <atomic>
#include <cstring>
#include <mutex>
#include <TAVO/threading.h>

namespace TAVO::ACF {

using Buffers::CPObjectMemory;
using Buffers::CPOMVector;

unsigned long long CClassHash::GetHash(const SClassRegister& record) const {
    return crc64::AddBytes(0, &record.cls, sizeof record.cls);
}

long32 CClassHash::Compare(const SClassRegister& first, const SClassRegister& second) const {
    const int order = std::memcmp(&first.cls, &second.cls, sizeof first.cls);
    return order < 0 ? -1 : order > 0;
}

namespace classes {

namespace {

struct Registry {
    Threading::CPRWInterlock lock; // guards the rest
    Lookup::CPOMKeyTable<ClassRecord, CClassHash> table;
    std::uint64_t registered = 0; // how many classes ever were

    // A table without classes keeps no memory.
    void Trim() noexcept {
        if (table.GetNItems() == 0) table.ClearTable();
    }
};

// Made at the first use, in storage that no destructor touches: static objects of plug-ins register classes.
alignas(Registry) unsigned char g_storage[sizeof(Registry)];
constinit std::atomic<Registry*> g_registry{nullptr};
constinit Platform::Mutex g_making;

// Null while there is no memory for the lock.
Registry* TheRegistry() noexcept {
    if (Registry* registry = g_registry.load(std::memory_order_acquire)) return registry;
    const std::lock_guard making(g_making);
    if (Registry* registry = g_registry.load(std::memory_order_relaxed)) return registry;
    auto* const made = ::new (static_cast<void*>(g_storage)) Registry;
    if (made->lock.key() == 0) {
        made->~Registry();
        return nullptr;
    }
    g_registry.store(made, std::memory_order_release);
    return made;
}

struct Writing {
    const Threading::CPRWInterlock& lock;
    explicit Writing(const Registry& registry) noexcept : lock(registry.lock) { lock.Enter(); }
    Writing(const Writing&) = delete;
    Writing& operator=(const Writing&) = delete;
    ~Writing() { lock.Leave(); }
};

struct Reading {
    const Threading::CPRWInterlock& lock;
    explicit Reading(const Registry& registry) noexcept : lock(registry.lock) { lock.EnterRead(); }
    Reading(const Reading&) = delete;
    Reading& operator=(const Reading&) = delete;
    ~Reading() { lock.LeaveRead(); }
};

using Probe = Buffers::ObjectProbe<SClassRegister>;
Probe ProbeFor(const _acfUID& cls) noexcept {
    return Probe{.object = {.cls = cls, .category = {}, .names = {}, .create = nullptr, .order = 0}};
}

bool SameValues(const SClassRegister& a, const SClassRegister& b) noexcept {
    return acfIsSame(a.category, b.category) && a.names == b.names && a.create == b.create;
}

bool HasName(const SClassRegister& record, const wchar_t* name, std::size_t units) noexcept {
    for (const wchar_t* at = record.names;;) {
        const wchar_t* end = at;
        while (*end && *end != L';') ++end;
        if (static_cast<std::size_t>(end - at) == units && String::detail::WideEqualFolded(at, name, units))
            return true;
        if (!*end) return false;
        at = end + 1;
    }
}

int CompareOrder(const void* first, const void* second) noexcept {
    const auto order = [](const void* handle) {
        return ClassRecord::ObjectOf(*static_cast<const CPObjectMemory*>(handle)).order;
    };
    return order(first) < order(second) ? -1 : order(first) > order(second);
}

} // namespace

bool Register(const _acfUID& cls, const _acfUID& category, const String::CPPoolString& names,
              CPIACFUnknown::CreateFunction create) noexcept {
    Registry* const registry = TheRegistry();
    if (!registry) return false;
    const Writing writing(*registry);
    const auto record = ClassRecord::Make(cls, category, names, create, registry->registered);
    const ClassRecord stands = registry->table.Add(record, Lookup::eHashKeep);
    if (!stands) {
        registry->Trim();
        return false;
    }
    if (stands.key() != record.key()) return SameValues(*stands, *record);
    ++registry->registered;
    return true;
}

bool Unregister(const _acfUID& cls) noexcept {
    Registry* const registry = TheRegistry();
    if (!registry) return false;
    Probe probe = ProbeFor(cls);
    const Writing writing(*registry);
    if (!registry->table.Find(probe.Handle())) return false;
    registry->table.Delete(probe.Handle());
    registry->Trim();
    return true;
}

ClassRecord Find(const _acfUID& cls) noexcept {
    Registry* const registry = TheRegistry();
    if (!registry) return {};
    Probe probe = ProbeFor(cls);
    const Reading reading(*registry);
    return registry->table.Find(probe.Handle());
}

ClassRecord FindNamed(const wchar_t* name) noexcept {
    struct Visitor final : Lookup::IBaseHashTableEnum {
        const wchar_t* name;
        std::size_t units;
        CPObjectMemory first;

        bool OnItem(unsigned long long, const CPObjectMemory& item) override {
            if (!HasName(ClassRecord::ObjectOf(item), name, units)) return true;
            if (!first.key() || CompareOrder(&item, &first) < 0) first = item;
            return true;
        }
    } visitor;

    Registry* const registry = TheRegistry();
    if (!registry || !name || !*name) return {};
    visitor.name = name;
    visitor.units = String::detail::WideLength(name);
    const Reading reading(*registry);
    registry->table.Enum(&visitor);
    return ClassRecord(visitor.first);
}

bool List(const _acfUID& category, CPOMVector& records) noexcept {
    struct Visitor final : Lookup::IBaseHashTableEnum {
        const cacfuid category;
        CPOMVector& records;
        bool whole = true;

        Visitor(const _acfUID& wanted, CPOMVector& target) : category(wanted), records(target) {}
        bool OnItem(unsigned long long, const CPObjectMemory& item) override {
            if (category && category != ClassRecord::ObjectOf(item).category) return true;
            return whole = records.Insert(item, records.GetNItems());
        }
    } visitor(category, records);

    Registry* const registry = TheRegistry();
    if (!registry) return false;
    {
        const Reading reading(*registry);
        registry->table.Enum(&visitor);
    }
    records.Sort(CompareOrder);
    return visitor.whole;
}

void Unload() noexcept {
    Registry* const registry = g_registry.load(std::memory_order_acquire);
    if (!registry || !registry->lock.TryEnter(0)) return; // a thread that was stopped may hold it for ever
    g_registry.store(nullptr, std::memory_order_relaxed);
    registry->table.ClearTable();
    registry->lock.Leave();
    registry->~Registry();
}

} // namespace classes
} // namespace TAVO::ACF
