#pragma once
// The classes of the process: what was registered, and the definitions made of it.

#include "object.h"

#include <TAVO/acf.h>
#include <TAVO/lookup.h>

namespace TAVO::ACF {

struct SClassRegister {
    _acfUID cls;
    _acfUID category;
    String::CPPoolString names; // one or more, separated by ';'
    CPIACFUnknown::CreateFunction create;
    std::uint64_t order; // of registration, rising
};
using ClassRecord = Buffers::CPObject<SClassRegister>;

class CClassHash : public Lookup::IHashKey<SClassRegister> {
public:
    unsigned long long GetHash(const SClassRegister& record) const override;
    long32 Compare(const SClassRegister& first, const SClassRegister& second) const override;
};

namespace classes {

// False for a class that is registered with other values, and without memory.
bool Register(const _acfUID& cls, const _acfUID& category, const String::CPPoolString& names,
              CPIACFUnknown::CreateFunction create) noexcept;
bool Unregister(const _acfUID& cls) noexcept;
// Empty when it is not registered.
ClassRecord Find(const _acfUID& cls) noexcept;
// The first registered class of that name.
ClassRecord FindNamed(const wchar_t* name) noexcept;
// Those of a category, or all for the null identifier, in the order of their registration. False without memory.
bool List(const _acfUID& category, Buffers::CPOMVector& records) noexcept;

// At unload: lets the records go. Never waits.
void Unload() noexcept;

} // namespace classes
} // namespace TAVO::ACF
