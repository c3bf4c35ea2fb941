// The process's component factory, the class registry, and definitions.

#include "support/acffakes.h"
#include "support/assertions.h"
#include "support/heapwatch.h"

#include <gtest/gtest.h>
#include <string>
#include <TAVO/develop.h>
#include <thread>
#include <vector>

using namespace TAVO::ACF;
using support::Assertions;
using support::FakeFactory;
using support::Probe;
using support::Texts;
using TAVO::String::CPPoolString;

namespace {

using Unknown = CPIACFUnknown;

struct ProbeObject final : CComponent<ProbeObject, IProbe> {
    int ACF_CALL Answer() override { return 5; }
};
CPIACFUnknown MakeProbe(const _acfUID&) { return ProbeObject::Make(); }
CPIACFUnknown MakeNothing(const _acfUID&) { return {}; }
CPIACFUnknown MakeTrouble(const _acfUID&) { throw std::runtime_error("make"); }

cacfuid Id(std::uint32_t number) { return _acfUID{number, 0, 0, {1}}; }
const cacfuid kFilters = Id(0xF1), kReaders = Id(0xF2);

std::string Ascii(const wchar_t* text) {
    std::string result;
    for (; text && *text; ++text) result += static_cast<char>(*text);
    return result;
}

// Four classes of two categories; registered while it lives.
struct Classes {
    Classes() {
        EXPECT_TRUE(Unknown::Factory_RegisterClass(Id(3), kFilters, L"Blur;soft", MakeProbe));
        EXPECT_TRUE(Unknown::Factory_RegisterClass(Id(1), kReaders, L"Reel;Soft", MakeNothing));
        EXPECT_TRUE(Unknown::Factory_RegisterClass(Id(2), kFilters, L"Sharpen", MakeTrouble));
        EXPECT_TRUE(Unknown::Factory_RegisterClass(Id(4), {}, L";Odd;", nullptr));
    }
    ~Classes() {
        for (std::uint32_t number = 1; number <= 4; ++number)
            EXPECT_TRUE(Unknown::Factory_UnregisterClass(Id(number))) << number;
    }
};

// The names of the definitions, in their order.
std::string Names(IACFEnumDefinitions& definitions) {
    std::string names;
    for (IACFDefinition* given; definitions.Next(&given) == acfOk; given->Release()) {
        wchar_t text[64];
        EXPECT_EQ(given->GetText(acfTextNames, text, 64, nullptr), acfOk);
        names += Ascii(text) + ' ';
    }
    return names;
}

// A host that serves definitions of its own.
struct HostFactory : FakeFactory {
    struct Registry final : support::Fake<IACFDefinitionRegistry> {
        bool throws = false;
        acfResult ACF_CALL EnumDefinitions(const _acfUID&, IACFEnumDefinitions** out) override {
            *out = nullptr;
            if (throws) throw 1;
            return acfFail;
        }
        acfResult ACF_CALL FindDefinition(const _acfUID&, IACFDefinition** out) override {
            *out = nullptr;
            if (throws) throw 1;
            return acfFail;
        }
        acfResult ACF_CALL FindClass(const wchar_t*, _acfUID* cls) override {
            if (throws) throw 1;
            *cls = Id(77);
            return acfOk;
        }
    } registry;

    acfResult ACF_CALL QueryInterface(const _acfUID& type, IACFUnknown** out) override {
        if (!cacfuid::Same(type, acfTypeOf<IACFDefinitionRegistry>::uid)) return Fake::QueryInterface(type, out);
        return registry.QueryInterface(type, out);
    }
};

} // namespace

// --- the factory -----------------------------------------------------------------------------------------------------

TEST(Factory, IsCountedAndTheFirstStays) {
    FakeFactory first, second;
    IACFComponentFactory* out = &first;
    EXPECT_FALSE(Unknown::Factory_IsAvailable() || Unknown::Factory_Acquire(&out) || out);
    EXPECT_TRUE(Unknown::Factory_Release()) << "nothing to release";

    EXPECT_FALSE(Unknown::Factory_Set(static_cast<IACFComponentFactory*>(nullptr)));
    EXPECT_TRUE(Unknown::Factory_Set(&first));
    EXPECT_TRUE(Unknown::Factory_Set(static_cast<IACFUnknown*>(&first)));
    EXPECT_TRUE(Unknown::Factory_Set(CPIACFUnknown(&first)));
    EXPECT_EQ(first.references, 2);
    EXPECT_FALSE(Unknown::Factory_Set(&second) || Unknown::Factory_Set(static_cast<IACFUnknown*>(&second)));
    EXPECT_EQ(second.references, 1);
    Probe probe;
    EXPECT_FALSE(Unknown::Factory_Set(static_cast<IACFUnknown*>(&probe)) || Unknown::Factory_Set(CPIACFUnknown()));
    EXPECT_EQ(probe.references, 1);

    EXPECT_FALSE(Unknown::Factory_Acquire(static_cast<IACFComponentFactory**>(nullptr)));
    EXPECT_TRUE(Unknown::Factory_Acquire(&out));
    EXPECT_EQ(out, &first);
    out->Release();
    {
        CPACI<IACFComponentFactory> held;
        CPACI<IProbe> other(&probe);
        EXPECT_TRUE(Unknown::Factory_Acquire(held));
        EXPECT_EQ(first.references, 3);
        EXPECT_FALSE(Unknown::Factory_Acquire(other) || other) << "not of the wrapper's type";
    }
    for (int left = 3; left > 0; --left) {
        EXPECT_TRUE(Unknown::Factory_IsAvailable());
        EXPECT_EQ(first.references, 2);
        Unknown::Factory_Release();
    }
    EXPECT_FALSE(Unknown::Factory_IsAvailable());
    EXPECT_EQ(first.references, 1);
    EXPECT_TRUE(Unknown::Factory_Set(&second));
    Unknown::Factory_Release();
}

TEST(Factory, MayThrowAndComeBack) {
    FakeFactory factory;
    factory.addRefThrows = true;
    EXPECT_FALSE(Unknown::Factory_Set(&factory) || Unknown::Factory_IsAvailable());
    factory.addRefThrows = false;
    factory.onAddRef = [] { EXPECT_FALSE(Unknown::Factory_IsAvailable()); };
    EXPECT_TRUE(Unknown::Factory_Set(&factory));
    factory.onAddRef = nullptr;
    factory.addRefThrows = true;
    IACFComponentFactory* out = &factory;
    EXPECT_FALSE(Unknown::Factory_Acquire(&out) || out);
    factory.addRefThrows = false;
    factory.releaseThrows = true;
    factory.onRelease = [&] { EXPECT_FALSE(Unknown::Factory_IsAvailable()); };
    EXPECT_TRUE(Unknown::Factory_Release());
    EXPECT_EQ(factory.references, 1);
}

// --- classes ---------------------------------------------------------------------------------------------------------

TEST(ClassRegistry, KeepsTheFirstAndTakesTheSameAgain) {
    const auto add = [](const cacfuid& category, const wchar_t* names, CPIACFUnknown::CreateFunction create) {
        return Unknown::Factory_RegisterClass(Id(9), category, names, create);
    };
    EXPECT_FALSE(Unknown::Factory_UnregisterClass(Id(9)));
    for (int round = 0; round < 2; ++round) {
        EXPECT_TRUE(add(kFilters, L"A", MakeProbe));
        EXPECT_TRUE(add(kFilters, L"A", MakeProbe));
        EXPECT_FALSE(add(kReaders, L"A", MakeProbe) || add(kFilters, L"B", MakeProbe) ||
                     add(kFilters, L"A", MakeNothing));
        CPIACFUnknown out;
        EXPECT_TRUE(Unknown::Factory_CreateClass(Id(9), out)) << "the first stayed";
        EXPECT_TRUE(Unknown::Factory_UnregisterClass(Id(9)));
        EXPECT_FALSE(Unknown::Factory_UnregisterClass(Id(9)) || Unknown::Factory_CreateClass(Id(9), out) || out);
    }
}

TEST(ClassRegistry, NamesAreMandatory) {
    static std::string line;
    TAVO::Develop::SetExternalLogger([](_acfDebugLevel level, const wchar_t* category, const char* source,
                                        TAVO::long32 number, const wchar_t* format, std::va_list arguments) {
        line += std::to_string(level) + ' ' + Ascii(category) + ' ' + source + ' ' + std::to_string(number) + ' ' +
                Ascii(format) + ' ' + Ascii(va_arg(arguments, const wchar_t*)) + '\n';
    });
    EXPECT_FALSE(Unknown::Factory_RegisterClass(Id(9), kFilters, CPPoolString(), MakeProbe));
    EXPECT_FALSE(Unknown::Factory_RegisterClass(Id(9), kFilters, L"", MakeProbe));
    TAVO::Develop::SetExternalLogger(nullptr);
    const std::string one = "1 TAVO source/TAVO/CPACF 645 Factory_RegisterClass: ClassNames are mandatory! %ls "
                            "00000009-0000-0000-0100-000000000000\n";
    EXPECT_EQ(line, one + one);
    EXPECT_FALSE(Unknown::Factory_UnregisterClass(Id(9)));
}

TEST(ClassRegistry, CreatesFindsAndEnumerates) {
    const Classes classes;
    Probe probe;
    const struct {
        const char* what;
        cacfuid cls;
        bool created;
    } objects[] = {{"made", Id(3), true},
                   {"empty", Id(1), false},
                   {"throws", Id(2), false},
                   {"no function", Id(4), false},
                   {"unknown", Id(5), false}};
    for (const auto& row : objects) {
        SCOPED_TRACE(row.what);
        CPACI<IProbe> out(&probe);
        CPACI<IACFClassFactory> other;
        EXPECT_EQ(Unknown::Factory_CreateClass(row.cls, out), row.created);
        EXPECT_EQ(out ? out->Answer() : 0, row.created ? 5 : 0);
        EXPECT_EQ(probe.references, 1);
        EXPECT_FALSE(Unknown::Factory_CreateClass(row.cls, other) || other);
    }

    const struct {
        const wchar_t* name;
        std::uint32_t number;
    } names[] = {{L"blur", 3},   {L"SOFT", 3},     {L"reel", 1},  {L"Sharpen", 2}, {L"odd", 4},
                 {L"Sharpe", 0}, {L"Sharpens", 0}, {L"Blur;", 0}, {L"", 0},        {nullptr, 0}};
    for (const auto& row : names) {
        cacfuid found = Id(8);
        EXPECT_EQ(Unknown::Factory_FindClass(row.name, found), row.number != 0) << Ascii(row.name);
        EXPECT_EQ(found, row.number ? Id(row.number) : cacfuid()) << Ascii(row.name);
    }

    const struct {
        cacfuid category;
        std::uint32_t count;
        const char* names;
    } lists[] = {{kFilters, 2, "Blur;soft Sharpen "},
                 {kReaders, 1, "Reel;Soft "},
                 {Id(0xF3), 0, ""},
                 {{}, 4, "Blur;soft Reel;Soft Sharpen ;Odd; "}};
    for (const auto& row : lists) {
        CPACI<IACFEnumDefinitions> list;
        ASSERT_TRUE(Unknown::Factory_EnumDefinitions(row.category, list));
        EXPECT_TRUE(Unknown::Factory_RegisterClass(Id(6), row.category, L"Late", MakeProbe));
        EXPECT_EQ(list->GetCount(), row.count);
        EXPECT_EQ(Names(*list.Get()), row.names);
        EXPECT_EQ(Names(*list.Get()), "") << "at its end";
        EXPECT_EQ(list->Reset(), acfOk);
        EXPECT_EQ(Names(*list.Get()), row.names);
        EXPECT_EQ(list->Next(nullptr), acfInvalidArgument);
        EXPECT_TRUE(Unknown::Factory_UnregisterClass(Id(6)));
    }
}

TEST(ClassRegistry, DefinitionsTellTextsPieceByPiece) {
    CPACI<IACFDefinition> definition;
    {
        const Classes classes;
        CPIACFUnknown none;
        EXPECT_FALSE(Unknown::Factory_FindDefinition(Id(5), none) || none);
        ASSERT_TRUE(Unknown::Factory_FindDefinition(Id(3), definition));
    }
    IACFDefinition& tells = *definition.Get(); // outlives its class
    const std::string whole = "Blur;soft";
    for (std::uint64_t capacity = 0; capacity <= 12; ++capacity) {
        wchar_t text[12];
        std::fill(text, text + 12, L'x');
        std::uint64_t needed = 0;
        EXPECT_EQ(tells.GetText(acfTextNames, capacity ? text : nullptr, capacity, &needed),
                  capacity >= 10 ? acfOk : acfEnd);
        EXPECT_EQ(needed, 10u);
        if (capacity) {
            EXPECT_EQ(Ascii(text), whole.substr(0, capacity - 1));
        }
        for (std::uint64_t i = std::min<std::uint64_t>(capacity, 10); i < 12; ++i) EXPECT_EQ(text[i], L'x') << i;
    }
    std::uint64_t needed = 0;
    EXPECT_EQ(tells.GetText(acfTextVendor, nullptr, 0, &needed), acfEnd);
    EXPECT_EQ(needed, 1u);
    EXPECT_EQ(tells.GetText(acfTextNames, nullptr, 1, &needed), acfInvalidArgument);
    EXPECT_EQ(tells.GetText(static_cast<eACFDefinitionText>(3), nullptr, 0, &needed), acfInvalidArgument);
    EXPECT_EQ(needed, 0u);
    cacfuid id(Id(8));
    EXPECT_EQ(tells.GetIdentifier(acfIdCategory, &id.rec()), acfOk);
    EXPECT_EQ(id, kFilters);
    EXPECT_EQ(tells.GetIdentifier(static_cast<eACFDefinitionId>(5), &id.rec()), acfInvalidArgument);
    EXPECT_FALSE(id);
    EXPECT_EQ(tells.GetIdentifier(acfIdClass, nullptr), acfInvalidArgument);
}

TEST(ClassRegistry, ComponentInformation) {
    const Classes classes;
    const Assertions kept;
    COMPONENT_INFO info;
    EXPECT_TRUE(Unknown::Factory_GetComponentInfo(Id(3), info));
    EXPECT_EQ(info.uidClass, Id(3));
    EXPECT_EQ(info.uidCategory, kFilters);
    EXPECT_EQ(Ascii(info.sName), "Blur");
    EXPECT_FALSE(info.uidVendor || info.sVendor || info.uidModule || info.sModule || info.uidInterface);
    EXPECT_TRUE(Unknown::Factory_GetComponentInfo(info.uidClass, info)) << "asked with its own field";
    EXPECT_EQ(info.uidClass, Id(3));
    EXPECT_FALSE(Unknown::Factory_GetComponentInfo(Id(5), info) || info.uidClass || info.sName);
    EXPECT_EQ(Assertions::Take(), Texts());
    --info.sSizeStruct;
    info.uidClass = Id(3);
    EXPECT_FALSE(Unknown::Factory_GetComponentInfo(Id(3), info));
    EXPECT_EQ(info.uidClass, Id(3)) << "a record of another size is not touched";
    EXPECT_EQ(Assertions::Take(), Texts{"source/TAVO/CPACF,554:CompInfo.sSizeStruct != sizeof(COMPONENT_INFO)"});
}

TEST(ClassRegistry, AsksTheFactoryThatKnowsDefinitions) {
    const Classes classes;
    cacfuid found;
    FakeFactory without;
    ASSERT_TRUE(Unknown::Factory_Set(&without));
    EXPECT_TRUE(Unknown::Factory_FindClass(L"Reel", found));
    EXPECT_EQ(found, Id(1)) << "the library's own list";
    Unknown::Factory_Release();

    HostFactory host;
    ASSERT_TRUE(Unknown::Factory_Set(&host));
    for (const bool throws : {false, true}) {
        host.registry.throws = throws;
        EXPECT_EQ(Unknown::Factory_FindClass(L"Reel", found), !throws);
        EXPECT_EQ(found, throws ? cacfuid() : Id(77));
        CPIACFUnknown definition;
        CPACI<IACFEnumDefinitions> list;
        COMPONENT_INFO info;
        EXPECT_FALSE(Unknown::Factory_FindDefinition(Id(1), definition) || Unknown::Factory_EnumDefinitions({}, list) ||
                     Unknown::Factory_GetComponentInfo(Id(1), info));
    }
    CPACI<IACFEnumDefinitions> list(Unknown::Factory_GetRegistry());
    EXPECT_FALSE(list);
    IACFEnumDefinitions* own = nullptr;
    ASSERT_EQ(Unknown::Factory_GetRegistry()->EnumDefinitions({}, &own), acfOk);
    EXPECT_EQ(own->GetCount(), 4u) << "the library's own list stays at hand";
    own->Release();
    Unknown::Factory_Release();
    EXPECT_EQ(host.references, 1);
    EXPECT_EQ(host.registry.references, 1);
}

TEST(ClassRegistry, LosesNothingWithoutMemory) {
    const CPPoolString names(L"Held;Names");
    support::ForEachFailingAllocation([&] {
        const bool added = Unknown::Factory_RegisterClass(Id(9), kFilters, names, MakeProbe);
        CPIACFUnknown object, definition;
        CPACI<IACFEnumDefinitions> list;
        COMPONENT_INFO info;
        const bool made = Unknown::Factory_CreateClass(Id(9), object);
        const bool listed = Unknown::Factory_EnumDefinitions({}, list);
        const bool told = Unknown::Factory_GetComponentInfo(Id(9), info);
        const bool defined = Unknown::Factory_FindDefinition(Id(9), definition);
        EXPECT_EQ(defined, static_cast<bool>(definition));
        EXPECT_EQ(made, static_cast<bool>(object));
        EXPECT_EQ(told, static_cast<bool>(info.uidClass));
        if (told) {
            EXPECT_EQ(Ascii(info.sName), "Held");
        }
        if (listed) {
            EXPECT_EQ(list->GetCount(), added ? 1u : 0u);
        }
        cacfuid found;
        EXPECT_EQ(Unknown::Factory_FindClass(L"names", found), added);
        EXPECT_EQ(Unknown::Factory_UnregisterClass(Id(9)), added);
    });
}

TEST(ClassRegistry, ServesThreadsAtOnce) {
    std::vector<std::thread> threads;
    for (std::uint32_t number = 21; number < 24; ++number)
        threads.emplace_back([number] {
            for (int round = 0; round < 200; ++round) {
                EXPECT_TRUE(Unknown::Factory_RegisterClass(Id(number), kFilters, L"Same", MakeProbe));
                CPACI<IProbe> object;
                EXPECT_TRUE(Unknown::Factory_CreateClass(Id(number), object));
                cacfuid found;
                EXPECT_TRUE(Unknown::Factory_FindClass(L"same", found));
                CPACI<IACFEnumDefinitions> list;
                ASSERT_TRUE(Unknown::Factory_EnumDefinitions(kFilters, list));
                EXPECT_GE(list->GetCount(), 1u);
                EXPECT_TRUE(Unknown::Factory_UnregisterClass(Id(number)));
            }
        });
    for (std::thread& thread : threads) thread.join();
}
