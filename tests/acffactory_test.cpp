// The process's component factory, the class registry, and definitions.

#include "support/acffakes.h"
#include "support/heapwatch.h"
#include "support/log.h"

#include <algorithm>
#include <thread>

using namespace TAVO::ACF;
using namespace support;

namespace {

using Unknown = CPIACFUnknown;
using EnumDefinitions = CPACI<IACFEnumDefinitions>;

struct ProbeObject final : CComponent<ProbeObject, IProbe> {
    int ACF_CALL Answer() override { return 5; }
};
CPIACFUnknown MakeProbe(const _acfUID&) { return ProbeObject::Make(); }
CPIACFUnknown MakeNothing(const _acfUID&) { return {}; }
CPIACFUnknown MakeTrouble(const _acfUID&) { throw "make"; }

cacfuid Id(std::uint32_t number) { return _acfUID{number, 0, 0, {1}}; }
const cacfuid kFilters = Id(0xF1), kReaders = Id(0xF2);

// Four classes of two categories; registered while it lives.
struct Classes {
    Classes() {
        EXPECT_TRUE(Unknown::Factory_RegisterClass(Id(3), kFilters, L"Blur;soft", MakeProbe));
        EXPECT_TRUE(Unknown::Factory_RegisterClass(Id(1), kReaders, L"Reel;Soft", MakeNothing));
        EXPECT_TRUE(Unknown::Factory_RegisterClass(Id(2), kFilters, L"Sharpen", MakeTrouble));
        EXPECT_TRUE(Unknown::Factory_RegisterClass(Id(4), {}, L";Odd;", nullptr));
    }
    ~Classes() {
        for (const std::uint32_t number : {1, 2, 3, 4}) EXPECT_TRUE(Unknown::Factory_UnregisterClass(Id(number)));
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

// A host's factory with definitions of its own: one class, and no more to tell.
struct HostFactory : FakeFactory {
    struct Registry final : Fake<IACFDefinitionRegistry> {
        bool throws = false;
        acfResult None(auto* out) const {
            if (throws) throw "registry";
            *out = {};
            return acfFail;
        }
        acfResult ACF_CALL EnumDefinitions(const _acfUID&, IACFEnumDefinitions** out) override { return None(out); }
        acfResult ACF_CALL FindDefinition(const _acfUID&, IACFDefinition** out) override { return None(out); }
        acfResult ACF_CALL FindClass(const wchar_t*, _acfUID* cls) override {
            None(cls);
            *cls = Id(77);
            return acfOk;
        }
    } registry;

    acfResult ACF_CALL QueryInterface(const _acfUID& type, IACFUnknown** out) override {
        const bool isMine = acfIsSame(type, acfTypeOf<IACFDefinitionRegistry>::uid);
        return isMine ? registry.QueryInterface(type, out) : Fake::QueryInterface(type, out);
    }
};

} // namespace

TEST(Factory, IsCountedTheFirstStaysAndMayThrow) {
    FakeFactory first, second;
    Probe probe;
    IACFComponentFactory* out = &first;
    EXPECT_FALSE(Unknown::Factory_IsAvailable() || Unknown::Factory_Acquire(&out) || out);
    EXPECT_TRUE(Unknown::Factory_Release()) << "nothing to release";
    first.addRefThrows = true;
    EXPECT_FALSE(Unknown::Factory_Set(&first) || Unknown::Factory_IsAvailable());
    first.addRefThrows = false;
    EXPECT_TRUE(Unknown::Factory_Set(&first) && Unknown::Factory_Set(static_cast<IACFUnknown*>(&first)));
    EXPECT_FALSE(Unknown::Factory_Set(&second) || Unknown::Factory_Set(static_cast<IACFUnknown*>(&second)) ||
                 Unknown::Factory_Set(static_cast<IACFUnknown*>(&probe)) || Unknown::Factory_Set(CPIACFUnknown()));
    EXPECT_TRUE(first.references == 2 && second.references == 1 && probe.references == 1);
    {
        CPACI<IACFComponentFactory> held;
        CPACI<IProbe> other(&probe);
        EXPECT_TRUE(Unknown::Factory_Acquire(held));
        EXPECT_FALSE(Unknown::Factory_Acquire(other) || other) << "not of the wrapper's type";
        EXPECT_TRUE(first.references == 3 && probe.references == 1);
    }
    first.addRefThrows = true;
    EXPECT_FALSE(Unknown::Factory_Acquire(&out) || out);
    first.releaseThrows = true;
    first.onRelease = [] { EXPECT_FALSE(Unknown::Factory_IsAvailable()); };
    EXPECT_TRUE(Unknown::Factory_Release() && Unknown::Factory_IsAvailable() && first.references == 2);
    EXPECT_TRUE(Unknown::Factory_Release() && !Unknown::Factory_IsAvailable() && first.references == 1);
}

TEST(ClassRegistry, KeepsTheFirstAndTakesTheSameAgain) {
    const auto add = [](const cacfuid& category, const wchar_t* names, CPIACFUnknown::CreateFunction create) {
        return Unknown::Factory_RegisterClass(Id(9), category, names, create);
    };
    const Log log;
    for (int round = 0; round < 2; ++round) {
        EXPECT_TRUE(add(kFilters, L"A", MakeProbe) && add(kFilters, L"A", MakeProbe));
        EXPECT_FALSE(add(kReaders, L"A", MakeProbe) || add(kFilters, L"B", MakeProbe) ||
                     add(kFilters, L"A", MakeNothing));
        CPIACFUnknown out;
        EXPECT_TRUE(Unknown::Factory_CreateClass(Id(9), out)) << "the first stayed";
        EXPECT_TRUE(Unknown::Factory_UnregisterClass(Id(9)));
        EXPECT_FALSE(Unknown::Factory_UnregisterClass(Id(9)) || Unknown::Factory_CreateClass(Id(9), out) || out);
    }
    EXPECT_FALSE(add(kFilters, L"", MakeProbe));
    EXPECT_EQ(log.Take(), Texts{"1 TAVO source/TAVO/CPACF:645 Factory_RegisterClass: ClassNames are mandatory! %ls|"
                                "00000009-0000-0000-0100-000000000000"});
}

TEST(ClassRegistry, CreatesFindsAndEnumerates) {
    const Classes classes;
    Probe probe;
    for (const std::uint32_t number : {3, 1, 2, 4, 5}) { // made, empty, throws, no function, unknown
        CPACI<IProbe> out(&probe);
        CPACI<IACFClassFactory> other;
        EXPECT_EQ(Unknown::Factory_CreateClass(Id(number), out), number == 3);
        EXPECT_EQ(out ? out->Answer() : 0, number == 3 ? 5 : 0);
        EXPECT_FALSE(Unknown::Factory_CreateClass(Id(number), other) || other || probe.references != 1);
    }
    const std::pair<const wchar_t*, std::uint32_t> names[] = {
        {L"SOFT", 3}, {L"Sharpen", 2}, {L"odd", 4}, {nullptr, 0}, {L"Sharpe", 0}, {L"Sharpens", 0}, {L"Blur;", 0}};
    for (const auto& [name, number] : names) {
        cacfuid found = Id(8);
        EXPECT_EQ(Unknown::Factory_FindClass(name, found), number != 0) << Ascii(name);
        EXPECT_EQ(found, number ? Id(number) : cacfuid()) << Ascii(name);
    }
    const std::pair<cacfuid, std::string> lists[] = {{kFilters, "Blur;soft Sharpen "},
                                                     {kReaders, "Reel;Soft "},
                                                     {Id(0xF3), ""},
                                                     {{}, "Blur;soft Reel;Soft Sharpen ;Odd; "}};
    for (const auto& [category, expected] : lists) {
        EnumDefinitions list;
        ASSERT_TRUE(Unknown::Factory_EnumDefinitions(category, list));
        EXPECT_TRUE(Unknown::Factory_RegisterClass(Id(6), category, L"Late", MakeProbe));
        for (int round = 0; round < 2; ++round)
            EXPECT_TRUE(Names(*list.Get()) == expected && Names(*list.Get()) == "" && list->Reset() == acfOk);
        EXPECT_EQ(list->GetCount(), std::count(expected.begin(), expected.end(), ' '));
        EXPECT_TRUE(Unknown::Factory_UnregisterClass(Id(6)));
    }
}

TEST(ClassRegistry, DefinitionsOutliveTheirClassAndTellTextsPieceByPiece) {
    CPACI<IACFDefinition> tells;
    {
        const Classes classes;
        EXPECT_FALSE(Unknown::Factory_FindDefinition(Id(5), tells) || tells);
        ASSERT_TRUE(Unknown::Factory_FindDefinition(Id(3), tells));
    }
    std::uint64_t needed = 0;
    for (std::uint64_t capacity = 0; capacity <= 12; ++capacity) {
        std::vector<wchar_t> text(capacity, L'x'); // exact, so that a sanitizer sees its end
        const auto told = tells->GetText(acfTextNames, capacity ? text.data() : nullptr, capacity, &needed);
        EXPECT_TRUE(told == (capacity >= 10 ? acfOk : acfEnd) && needed == 10) << capacity;
        EXPECT_EQ(capacity ? Ascii(text.data()) : "", capacity ? std::string("Blur;soft").substr(0, capacity - 1) : "");
    }
    EXPECT_TRUE(tells->GetText(acfTextNames, nullptr, 1, &needed) == acfInvalidArgument && needed == 0);
    cacfuid id;
    EXPECT_TRUE(tells->GetIdentifier(acfIdCategory, &id.rec()) == acfOk && id == kFilters);
    EXPECT_TRUE(tells->GetIdentifier(static_cast<eACFDefinitionId>(5), &id.rec()) == acfInvalidArgument && !id);
}

TEST(ClassRegistry, ComponentInformation) {
    const Classes classes;
    const Assertions kept;
    COMPONENT_INFO info; // asked the second time with its own field
    EXPECT_TRUE(Unknown::Factory_GetComponentInfo(Id(3), info) &&
                Unknown::Factory_GetComponentInfo(info.uidClass, info));
    EXPECT_TRUE(info.uidClass == Id(3) && info.uidCategory == kFilters && Ascii(info.sName) == "Blur");
    EXPECT_FALSE(info.uidVendor || info.sVendor || info.uidModule || info.sModule || info.uidInterface);
    EXPECT_FALSE(Unknown::Factory_GetComponentInfo(Id(5), info) || info.uidClass || info.sName);
    --info.sSizeStruct;
    info.uidClass = Id(2);
    EXPECT_FALSE(Unknown::Factory_GetComponentInfo(Id(3), info) || info.uidClass != Id(2)) << "not touched";
    EXPECT_EQ(Assertions::Take(), Texts{"source/TAVO/CPACF,554:CompInfo.sSizeStruct != sizeof(COMPONENT_INFO)"});
}

TEST(ClassRegistry, AsksTheFactoryThatKnowsDefinitions) {
    const Classes classes;
    cacfuid found;
    FakeFactory without;
    ASSERT_TRUE(Unknown::Factory_Set(&without));
    EXPECT_TRUE(Unknown::Factory_FindClass(L"Reel", found) && found == Id(1)) << "the library's own list";
    Unknown::Factory_Release();

    HostFactory host;
    ASSERT_TRUE(Unknown::Factory_Set(&host));
    for (const bool throws : {false, true}) {
        host.registry.throws = throws;
        EXPECT_EQ(Unknown::Factory_FindClass(L"Reel", found), !throws);
        EXPECT_EQ(found, throws ? cacfuid() : Id(77));
        EnumDefinitions list;
        COMPONENT_INFO info;
        EXPECT_FALSE(Unknown::Factory_EnumDefinitions({}, list) || Unknown::Factory_GetComponentInfo(Id(1), info));
    }
    IACFEnumDefinitions* own = nullptr;
    ASSERT_EQ(Unknown::Factory_GetRegistry()->EnumDefinitions({}, &own), acfOk);
    EXPECT_EQ(own->GetCount(), 4u) << "the library's own list stays at hand";
    own->Release();
    Unknown::Factory_Release();
    EXPECT_TRUE(host.references == 1 && host.registry.references == 1);
}

TEST(ClassRegistry, LosesNothingWithoutMemory) {
    const TAVO::String::CPPoolString names(L"Held;Names");
    ForEachFailingAllocation([&] {
        CPIACFUnknown object;
        EnumDefinitions list;
        COMPONENT_INFO info;
        const bool added = Unknown::Factory_RegisterClass(Id(9), kFilters, names, MakeProbe);
        const bool made = Unknown::Factory_CreateClass(Id(9), object);
        const bool told = Unknown::Factory_GetComponentInfo(Id(9), info);
        EXPECT_TRUE(made == static_cast<bool>(object) && told == (Ascii(info.sName) == "Held"));
        EXPECT_TRUE(!Unknown::Factory_EnumDefinitions({}, list) || list->GetCount() == added);
        EXPECT_EQ(Unknown::Factory_UnregisterClass(Id(9)), added);
    });
}

TEST(ClassRegistry, ServesThreadsAtOnce) {
    std::vector<std::thread> threads;
    for (const std::uint32_t number : {21, 22, 23})
        threads.emplace_back([number] {
            for (int round = 0; round < 200; ++round) {
                CPACI<IProbe> object;
                EnumDefinitions list;
                cacfuid found;
                EXPECT_TRUE(Unknown::Factory_RegisterClass(Id(number), kFilters, L"Same", MakeProbe));
                EXPECT_TRUE(Unknown::Factory_CreateClass(Id(number), object) &&
                            Unknown::Factory_FindClass(L"same", found));
                EXPECT_TRUE(Unknown::Factory_EnumDefinitions(kFilters, list) && list->GetCount() >= 1);
                EXPECT_TRUE(Unknown::Factory_UnregisterClass(Id(number)));
            }
        });
    for (std::thread& thread : threads) thread.join();
}
