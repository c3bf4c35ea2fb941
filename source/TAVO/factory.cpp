// The process's component factory, and what it is asked about classes.

#include "classregistry.h"
#include "diagnostics.h"
#include "foreign.h"
#include "recursivelock.h"
#include "scratch.h"

#include <mutex>
#include <TAVO/develop.h>

namespace TAVO::ACF {

using String::CACFWChar;

namespace {

constexpr const char* kSource = "source/TAVO/CPACF";

// Re-entrant: the factory's own AddRef may ask for the factory.
struct Factory {
    RecursiveLock lock; // guards the rest
    IACFComponentFactory* factory = nullptr;
    std::uint32_t locks = 0;
};
constinit Factory g_factory;

} // namespace

// --- the factory -----------------------------------------------------------------------------------------------------

bool CPIACFUnknown::Factory_Set(IACFComponentFactory* factory) noexcept {
    if (!factory) return false;
    const std::lock_guard guard(g_factory.lock);
    if (!g_factory.factory) {
        if (g_factory.locks != 0) diagnostics::RuntimeAssumptionFailed("g_uFactoryLock == 0");
        g_factory.factory = factory; // first: its AddRef may come back here
        if (!AddRefQuietly(factory)) {
            g_factory.factory = nullptr;
            g_factory.locks = 0;
            return false;
        }
    } else if (g_factory.factory != factory) {
        return false;
    }
    ++g_factory.locks;
    return true;
}

bool CPIACFUnknown::Factory_Set(IACFUnknown* factory) noexcept {
    const CPACI<IACFComponentFactory> queried(factory); // gives its reference back, set or not
    return Factory_Set(queried.Get());
}

bool CPIACFUnknown::Factory_Set(const CPIACFUnknown& factory) noexcept { return Factory_Set(factory._getptr()); }

bool CPIACFUnknown::Factory_Release() noexcept {
    IACFComponentFactory* released = nullptr;
    {
        const std::lock_guard guard(g_factory.lock);
        if (g_factory.locks > 0 && --g_factory.locks == 0) released = std::exchange(g_factory.factory, nullptr);
    }
    if (released) ReleaseQuietly(released); // out of the lock: this may be the end of a whole host
    return true;
}

bool CPIACFUnknown::Factory_Acquire(IACFComponentFactory** out) noexcept {
    if (!out) return false;
    const std::lock_guard guard(g_factory.lock);
    *out = g_factory.factory;
    if (*out && !AddRefQuietly(*out)) *out = nullptr;
    return *out != nullptr;
}

bool CPIACFUnknown::Factory_Acquire(CPIACFUnknown& out) noexcept {
    const AcquiredFactory factory;
    out = factory.Get();
    return static_cast<bool>(out);
}

bool CPIACFUnknown::Factory_IsAvailable() noexcept {
    const std::lock_guard guard(g_factory.lock);
    return g_factory.factory != nullptr;
}

// --- classes ---------------------------------------------------------------------------------------------------------

bool CPIACFUnknown::Factory_RegisterClass(const _acfUID& cls, const _acfUID& category,
                                          const String::CPPoolString& names, CreateFunction create) noexcept {
    if (names.isdef()) return classes::Register(cls, category, names, create);
    wchar_t text[cacfuid::TextUnits];
    cacfuid(cls).GetText(text);
    Develop::_logWrite(acfDebugError, L"TAVO", kSource, 645, L"Factory_RegisterClass: ClassNames are mandatory! %ls",
                       text);
    return false;
}

bool CPIACFUnknown::Factory_UnregisterClass(const _acfUID& cls) noexcept { return classes::Unregister(cls); }

bool CPIACFUnknown::Factory_CreateClass(const _acfUID& cls, CPIACFUnknown& out) noexcept {
    const cacfuid wanted(cls); // the caller's may lie in what out lets go
    out.free();
    const ClassRecord record = classes::Find(wanted);
    if (!record || !record->create) return false;
    try {
        out = record->create(wanted);
    } catch (...) {
    }
    return static_cast<bool>(out);
}

// --- definitions -----------------------------------------------------------------------------------------------------

namespace {

// Asks the factory's registry, or the library's own. What the question throws is no answer.
template <class Question> bool Ask(Question question) noexcept {
    const AcquiredFactory factory;
    const CPACI<IACFDefinitionRegistry> registry(factory.Get());
    IACFDefinitionRegistry* const asked = registry ? registry.Get() : CPIACFUnknown::Factory_GetRegistry();
    try {
        return question(*asked);
    } catch (...) {
        return false;
    }
}

// Puts what a registry gave into a wrapper, and its reference back.
bool Keep(CPIACFUnknown& out, IACFUnknown* given) noexcept {
    out = given;
    if (given) ReleaseQuietly(given);
    return static_cast<bool>(out);
}

// A definition's text, absent where it tells none. False without memory, or when the definition contradicts itself.
bool ReadText(IACFDefinition& definition, eACFDefinitionText which, CACFWChar& text) {
    constexpr std::uint64_t kMostUnits = 1 << 20;
    std::uint64_t units = 0;
    if (definition.GetText(which, nullptr, 0, &units) < 0 || units <= 1) return true;
    Scratch<wchar_t> buffer;
    if (units > kMostUnits || !buffer.Reserve(units)) return false;
    if (definition.GetText(which, buffer.First(), units, nullptr) != acfOk) return false;
    buffer.First()[units - 1] = 0;
    text = buffer.First();
    return static_cast<bool>(text);
}

bool CutAtFirstName(CACFWChar& names) {
    std::size_t units = 0;
    const wchar_t* const text = names;
    while (text && text[units] && text[units] != L';') ++units;
    if (!text || !text[units]) return true;
    Scratch<wchar_t> first;
    if (!first.Reserve(units + 1)) return false;
    std::memcpy(first.First(), text, units * sizeof(wchar_t));
    first.First()[units] = 0;
    names = first.First();
    return static_cast<bool>(names);
}

bool Describe(IACFDefinition& definition, tagCOMPONENT_INFO& info) {
    const struct {
        eACFDefinitionId which;
        cacfuid& id;
    } ids[] = {{acfIdClass, info.uidClass},
               {acfIdCategory, info.uidCategory},
               {acfIdVendor, info.uidVendor},
               {acfIdModule, info.uidModule},
               {acfIdInterface, info.uidInterface}};
    for (const auto& [which, id] : ids)
        if (definition.GetIdentifier(which, &id.rec()) < 0) id.reset();
    return ReadText(definition, acfTextNames, info.sName) && ReadText(definition, acfTextVendor, info.sVendor) &&
           ReadText(definition, acfTextModule, info.sModule) && CutAtFirstName(info.sName);
}

} // namespace

bool CPIACFUnknown::Factory_FindClass(const wchar_t* name, cacfuid& out) noexcept {
    cacfuid found;
    const bool known =
        name && Ask([&](IACFDefinitionRegistry& registry) { return registry.FindClass(name, &found.rec()) == acfOk; });
    out = known ? found : cacfuid();
    return known;
}

bool CPIACFUnknown::Factory_FindDefinition(const _acfUID& cls, CPIACFUnknown& out) noexcept {
    const cacfuid wanted(cls);
    out.free();
    return Ask([&](IACFDefinitionRegistry& registry) {
        IACFDefinition* given = nullptr;
        return registry.FindDefinition(wanted, &given) == acfOk && Keep(out, given);
    });
}

bool CPIACFUnknown::Factory_EnumDefinitions(const _acfUID& category, CPACI<IACFEnumDefinitions>& out) noexcept {
    const cacfuid wanted(category);
    out.free();
    return Ask([&](IACFDefinitionRegistry& registry) {
        IACFEnumDefinitions* given = nullptr;
        return registry.EnumDefinitions(wanted, &given) == acfOk && Keep(out, given);
    });
}

bool CPIACFUnknown::Factory_GetComponentInfo(const _acfUID& cls, tagCOMPONENT_INFO& info) noexcept {
    if (Develop::_istrue_(info.sSizeStruct != sizeof(tagCOMPONENT_INFO),
                          "source/TAVO/CPACF,554:CompInfo.sSizeStruct != sizeof(COMPONENT_INFO)"))
        return false;
    const cacfuid wanted(cls);
    info = {};
    CPACI<IACFDefinition> definition;
    if (!Factory_FindDefinition(wanted, definition)) return false;
    try {
        if (Describe(*definition.Get(), info)) return true;
    } catch (...) {
    }
    info = {};
    return false;
}

} // namespace TAVO::ACF
