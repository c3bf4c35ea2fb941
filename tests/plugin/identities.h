#pragma once
// The addresses by which the library tells its types and special strings apart, taken in three ways by whichever module
// includes this: by its static initialisers, by functions at run time, and from values that the library made.

#include <TAVO/acf.h>
#include <TAVO/buffers.h>
#include <TAVO/lookup.h>
#include <TAVO/string.h>
#include <TAVO/threading.h>
#include <TAVO/xml.h>

namespace identities {

enum Way { AtLoad, ByInlineFunction, FromValues, kWays };

enum Identity {
    PlainMemory,
    VectorOfHandles,
    VectorOfStrings,
    VectorOfHashEntries,
    PoolEntry,
    Element,
    Mutex,
    CriticalSection,
    RWInterlock,
    Event,
    MultipleEvent,
    Thread,
    WrapperOfEnumerations,
    TextOfTrue,
    TextOfFalse,
    TextOfEmpty,
    TextOfNull,
    TextInterned,
    kIdentities
};

constexpr const char* kNames[] = {
    "CPPlainMemory",
    "CPObjectVector<CPObjectMemory>",
    "CPObjectVector<CPPoolString>",
    "CPObjectVector<HASHENTRY>",
    "CPPoolString",
    "CPXMLObject",
    "CPMutex",
    "CPCriticalSection",
    "CPRWInterlock",
    "CPEvent",
    "CPMultipleEvent",
    "CPThread",
    "CPACI<IACFEnumDefinitions>",
    "ptrue",
    "pfalse",
    "pempty",
    "the null string",
    "an interned string",
};
static_assert(sizeof(kNames) / sizeof(*kNames) == kIdentities, "a name for each identity");

struct Table {
    const void* rows[kIdentities];
};

/// What a plug-in answers, and the name of its function.
using Answer = void (*)(Way way, Table* table);
constexpr const char* kFunction = "TavoTestIdentities";

using TAVO::Buffers::CPObjectMemory;
using TAVO::Buffers::CPObjectVector;
using TAVO::Buffers::CPPlainMemory;
using TAVO::String::CPPoolString;
using HashEntry = TAVO::Lookup::CBaseHashTable::HASHENTRY;

inline const void* Text(const CPPoolString& string) { return static_cast<const wchar_t*>(string); }
template <class Number> const void* Address(Number id) {
    return reinterpret_cast<const void*>(static_cast<std::size_t>(id));
}

// The virtual table, which is the class where modules meet.
inline const void* VirtualTable(const TAVO::ACF::CPIACFUnknown& wrapper) {
    return *reinterpret_cast<const void* const*>(&wrapper);
}
using EnumWrapper = TAVO::ACF::CPACI<IACFEnumDefinitions>;

// Everything below belongs to one module alone, even where the loader could merge it with another's.
namespace {

const CPPoolString g_interned(L"interned by every module");
const EnumWrapper g_wrapper;

const Table g_atLoad = {{
    &CPPlainMemory::_vtbl,
    &CPObjectVector<CPObjectMemory>::_vtbl,
    &CPObjectVector<CPPoolString>::_vtbl,
    &CPObjectVector<HashEntry>::_vtbl,
    Address(CPPoolString::GetTypeID()),
    &TAVO::XML::CPXMLObject::_vtbl,
    &TAVO::Threading::CPMutex::_vtbl,
    &TAVO::Threading::CPCriticalSection::_vtbl,
    &TAVO::Threading::CPRWInterlock::_vtbl,
    &TAVO::Threading::CPEvent::_vtbl,
    &TAVO::Threading::CPMultipleEvent::_vtbl,
    &TAVO::Threading::CPThread::_vtbl,
    VirtualTable(g_wrapper),
    Text(CPPoolString::ptrue),
    Text(CPPoolString::pfalse),
    Text(CPPoolString::pempty),
    Text(CPPoolString()),
    Text(g_interned),
}};

Table ByFunctions() {
    using namespace TAVO;
    CPPoolString moved(L"moved from");
    const CPPoolString taken(static_cast<CPPoolString&&>(moved));
    return {{
        Address(CPPlainMemory::GetTypeID()),
        Address(CPObjectVector<CPObjectMemory>::GetTypeID()),
        Address(CPObjectVector<CPPoolString>::GetTypeID()),
        Address(CPObjectVector<HashEntry>::GetTypeID()),
        Address(CPPoolString::GetTypeID()),
        Address(XML::CPXMLObject::GetTypeID()),
        Address(Threading::CPMutex::GetTypeID()),
        Address(Threading::CPCriticalSection::GetTypeID()),
        Address(Threading::CPRWInterlock::GetTypeID()),
        Address(Threading::CPEvent::GetTypeID()),
        Address(Threading::CPMultipleEvent::GetTypeID()),
        Address(Threading::CPThread::GetTypeID()),
        VirtualTable(EnumWrapper()),
        Text(CPPoolString(true)),
        Text(CPPoolString(false)),
        Text(CPPoolString(L"")),
        Text(moved),
        Text(CPPoolString(L"interned by every module")),
    }};
}

/// The type of a block, as it stands in its header.
const void* TypeOf(const CPObjectMemory& block) { return Address(block.GetTypeID()); }

// Runs nothing.
struct Nothing {
    static constexpr _acfUID uid = {1, 2, 3, {4, 5, 6, 7, 8, 9, 10, 11}};
    void Run(unsigned long long) {}
};

struct RunningThread : TAVO::Threading::CPThread {
    RunningThread() { Execute(TAVO::Threading::CThreadWrapper<Nothing>::Create(), 0); }
    ~RunningThread() { Wait(TAVO::Threading::WaitForever); } // before a plug-in with its code goes
};

Table OfValues() {
    using namespace TAVO;
    CPPlainMemory plain;
    plain.Alloc(1);
    CPObjectVector<CPObjectMemory> handles(1);
    CPObjectVector<CPPoolString> strings(1);
    CPObjectVector<HashEntry> entries(1);
    XML::CPXMLObject element;
    element.SetName(L"element");
    return {{
        TypeOf(plain),
        TypeOf(handles),
        TypeOf(strings),
        TypeOf(entries),
        Address(CPPoolString::GetTypeID()),
        TypeOf(element),
        TypeOf(Threading::CPMutex()),
        TypeOf(Threading::CPCriticalSection()),
        TypeOf(Threading::CPRWInterlock()),
        TypeOf(Threading::CPEvent(true)),
        TypeOf(Threading::CPMultipleEvent()),
        TypeOf(RunningThread()),
        VirtualTable(EnumWrapper(g_wrapper)),
        Text(String::CStringPool::GetStringRefi(L"TRUE")),
        Text(String::CStringPool::GetStringRefi(L"False")),
        Text(String::CStringPool::GetStringRefn(L"text", 0)),
        Text(String::CStringPool::QueryStringRef(L"nobody interned this")),
        Text(String::CStringPool::GetStringRefi(L"INTERNED by every MODULE")),
    }};
}

Table Taken(Way way) { return way == AtLoad ? g_atLoad : way == ByInlineFunction ? ByFunctions() : OfValues(); }

} // namespace
} // namespace identities
