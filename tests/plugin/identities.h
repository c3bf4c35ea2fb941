#pragma once
// The addresses by which the library tells its types and special strings apart, taken in two ways by whichever module
// includes this: by its static initialisers, and from values that the library made.

#include <TAVO/acf.h>
#include <TAVO/buffers.h>
#include <TAVO/lookup.h>
#include <TAVO/string.h>
#include <TAVO/threading.h>
#include <TAVO/xml.h>

namespace identities {

enum Way { AtLoad, FromValues };

constexpr const char* kNames[] = {"CPPlainMemory", "handles",        "strings",         "HASHENTRY",
                                  "CPPoolString",  "CPXMLObject",    "CPMutex",         "CPCriticalSection",
                                  "CPRWInterlock", "CPEvent",        "CPMultipleEvent", "CPThread",
                                  "CPACI",         "ptrue",          "pfalse",          "pempty",
                                  "null string",   "interned string"};
constexpr int kIdentities = sizeof(kNames) / sizeof(*kNames);

struct Table {
    const void* rows[kIdentities];
};

/// What a plug-in answers, and the name of its function.
using Answer = void (*)(Way way, Table* table);
constexpr const char* kFunction = "TavoTestIdentities";

using namespace TAVO;
using namespace TAVO::Threading;
using String::CPPoolString;
using Handles = Buffers::CPObjectVector<Buffers::CPObjectMemory>;
using Strings = Buffers::CPObjectVector<CPPoolString>;
using HashEntries = Buffers::CPObjectVector<Lookup::CBaseHashTable::HASHENTRY>;
using EnumWrapper = ACF::CPACI<IACFEnumDefinitions>;

// Everything below belongs to one module alone, even where the loader could merge it with another's.
namespace {

const void* Text(const CPPoolString& string) { return static_cast<const wchar_t*>(string); }
/// The type of a block, as it stands in its header.
const void* TypeOf(const Buffers::CPObjectMemory& block) { return reinterpret_cast<const void*>(block.GetTypeID()); }
// The virtual table, which is the class where modules meet.
const void* ClassOf(const EnumWrapper& wrapper) { return *reinterpret_cast<const void* const*>(&wrapper); }

const CPPoolString g_interned(L"interned by every module");
const EnumWrapper g_wrapper;
const Table g_atLoad = {{&Buffers::CPPlainMemory::_vtbl, &Handles::_vtbl, &Strings::_vtbl, &HashEntries::_vtbl,
                         reinterpret_cast<const void*>(CPPoolString::GetTypeID()), &XML::CPXMLObject::_vtbl,
                         &CPMutex::_vtbl, &CPCriticalSection::_vtbl, &CPRWInterlock::_vtbl, &CPEvent::_vtbl,
                         &CPMultipleEvent::_vtbl, &CPThread::_vtbl, ClassOf(g_wrapper), Text(CPPoolString::ptrue),
                         Text(CPPoolString::pfalse), Text(CPPoolString::pempty), Text(CPPoolString()),
                         Text(g_interned)}};

// Runs nothing.
struct Nothing {
    static constexpr _acfUID uid = {1, 2, 3, {4, 5, 6, 7, 8, 9, 10, 11}};
    void Run(unsigned long long) {}
};

struct RunningThread : CPThread {
    RunningThread() { Execute(CThreadWrapper<Nothing>::Create(), 0); }
    ~RunningThread() { Wait(WaitForever); } // before a plug-in with its code goes
};

Table OfValues() {
    using Pool = String::CStringPool;
    Buffers::CPPlainMemory plain;
    plain.Alloc(1);
    XML::CPXMLObject element;
    element.SetName(L"element");
    return {{TypeOf(plain), TypeOf(Handles(1)), TypeOf(Strings(1)), TypeOf(HashEntries(1)),
             reinterpret_cast<const void*>(CPPoolString::GetTypeID()), TypeOf(element), TypeOf(CPMutex()),
             TypeOf(CPCriticalSection()), TypeOf(CPRWInterlock()), TypeOf(CPEvent(true)), TypeOf(CPMultipleEvent()),
             TypeOf(RunningThread()), ClassOf(EnumWrapper(g_wrapper)), Text(Pool::GetStringRefi(L"TRUE")),
             Text(Pool::GetStringRefi(L"False")), Text(Pool::GetStringRefn(L"text", 0)),
             Text(Pool::QueryStringRef(L"nobody interned this")),
             Text(Pool::GetStringRefi(L"INTERNED by every MODULE"))}};
}

Table Taken(Way way) { return way == AtLoad ? g_atLoad : OfValues(); }

} // namespace
} // namespace identities
