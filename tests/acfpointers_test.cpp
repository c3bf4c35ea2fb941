// Wrappers of interface pointers, and the bases of components, over fakes that count.

#include "support/acffakes.h"
#include "support/heapwatch.h"
#include "support/log.h"

#include <gtest/gtest.h>

using namespace TAVO::ACF;
using support::Assertions;
using support::Mode;
using support::Probe;
using support::Texts;

namespace {

const cacfuid kProbe = acfTypeOf<IProbe>::uid, kUnknown = acfTypeOf<IACFUnknown>::uid;
const cacfuid kClass("24508B8F-A78E-4243-9E68-71AA029C838A");

std::size_t Word(CPIACFUnknown& wrapper) { return reinterpret_cast<std::size_t>(*wrapper.rec()); }
std::size_t Checked(const Probe& probe) { return reinterpret_cast<std::size_t>(&probe) | 1; }

// A pointer as a creation call leaves it, with a reference.
void PutRaw(CPIACFUnknown& wrapper, IACFUnknown& object) {
    *wrapper.rec() = &object;
    object.AddRef();
}

// The three kinds of wrapper; each test of their common life runs for all.
struct Chosen : IPACF {
    Chosen(IACFUnknown* pointer = nullptr) : IPACF(kProbe, pointer) {}
    using IPACF::operator=;
};
using Typed = CPACI<IProbe>;
template <class Wrapper> struct WrapperOfAnyKind : testing::Test {
    const cacfuid type = Wrapper().GetType();
    Probe probe;
    ~WrapperOfAnyKind() override { EXPECT_EQ(probe.references, 1); }
};
using Wrapper = WrapperOfAnyKind<CPIACFUnknown>;
using Kinds = testing::Types<CPIACFUnknown, Chosen, Typed>;
TYPED_TEST_SUITE(WrapperOfAnyKind, Kinds);

} // namespace

TYPED_TEST(WrapperOfAnyKind, OwnsOneReferenceOfItsType) {
    Probe& probe = this->probe;
    TypeParam empty, held(&probe);
    EXPECT_TRUE(!empty && Word(empty) == 1 && probe.asked == this->type && Word(held) == Checked(probe));
    TypeParam copy(held);
    EXPECT_TRUE(copy == held && copy != empty && held.GetLockCount() == 3);
    EXPECT_EQ(probe.queries, 2) << "a copy queries";
    TypeParam moved(std::move(copy));
    EXPECT_TRUE(moved && !copy && probe.references == 3);
    EXPECT_EQ(probe.queries, 2) << "a move does not";
    copy = moved;
    moved = *&moved;
    moved = static_cast<TypeParam&&>(*&moved);
    EXPECT_EQ(probe.references, 4);
    copy = std::move(moved);
    copy = &probe;
    EXPECT_EQ(probe.references, 3);
    copy = empty;
    held.free();
    EXPECT_TRUE(!copy && Word(held) == 1 && held.GetLockCount() == 0);
}

// Intended: wrapper-keeps-stored
TYPED_TEST(WrapperOfAnyKind, StaysEmptyWhereTheQueryFailsAndIntendedKeepsWhatWasStored) {
    Probe& probe = this->probe;
    for (const Mode query : {Mode::Refuses, Mode::Throws, Mode::GivesNull}) {
        const TypeParam good(&probe);
        TypeParam assigned(&probe), raw;
        PutRaw(raw, probe);
        probe.query = query;
        assigned = good;
        EXPECT_FALSE(TypeParam(&probe) || TypeParam(good) || assigned || raw);
        EXPECT_EQ(Word(raw), 1u) << "released, once";
        probe.query = Mode::Gives;
    }
    Probe other;
    probe.given = &other;
    TypeParam raw;
    PutRaw(raw, probe);
    EXPECT_TRUE(raw && Word(raw) == Checked(probe) && probe.references == 1 && other.references == 2);
    probe.AddRef(); // the wrapper will release what it stored, not what it queried
}

TYPED_TEST(WrapperOfAnyKind, EndsWellWhenReleaseComesBackOrThrows) {
    Probe& probe = this->probe;
    const Assertions kept;
    TypeParam held(&probe);
    probe.onRelease = [&] { held.free(); };
    held.free();
    EXPECT_EQ(probe.references, 1);
    probe.releaseThrows = true;
    held = &probe;
    held.free();
    EXPECT_EQ(Assertions::Take(), Texts{"CPIACFUnknown::free exception"});
    held = &probe;
    held = TypeParam();
    EXPECT_TRUE(!held && Assertions::Take().empty());
}

TYPED_TEST(WrapperOfAnyKind, CreatesThroughFactoriesIntended) {
    support::FakeFactory factory;
    const struct {
        Mode creation, query;
        bool created, typed;
    } rows[] = {{Mode::Gives, Mode::Gives, true, true},
                {Mode::Throws, Mode::Gives, false, false},
                {Mode::GivesNull, Mode::Gives, false, false},
                {Mode::Gives, Mode::Refuses, true, false}}; // a plain wrapper finds out at its first use
    TypeParam wrapper(&this->probe);
    for (const auto& row : rows) {
        factory.creation = row.creation;
        factory.made.query = row.query;
        const bool answer = this->type == kUnknown ? row.created : row.typed;
        EXPECT_TRUE(wrapper.createComponent(kClass, &factory) == answer && static_cast<bool>(wrapper) == row.typed);
        EXPECT_TRUE(wrapper.createInstance(kClass, &factory) == answer && static_cast<bool>(wrapper) == row.typed);
        EXPECT_TRUE(factory.askedClass == kClass && factory.askedType == kUnknown);
        EXPECT_EQ(factory.made.references, row.typed ? 2 : 1);
        wrapper = &this->probe;
    }
    EXPECT_EQ(factory.components, 4) << "half of them";
    factory.creation = factory.made.query = Mode::Gives;
    EXPECT_FALSE(wrapper.createComponent(kClass) || wrapper) << "no factory of the process";
    ASSERT_TRUE(CPIACFUnknown::Factory_Set(&factory));
    EXPECT_TRUE(wrapper.createComponent(kClass) && wrapper && wrapper.createInstance(kClass) && wrapper);
    CPIACFUnknown::Factory_Release();
    EXPECT_EQ(factory.references, 1);
    // Creation from no factory is true, and gives nothing.
    // Intended: create-without-factory
    EXPECT_TRUE(wrapper.createComponent(kClass, nullptr) && !wrapper);
    EXPECT_TRUE(wrapper.createInstance(kClass, nullptr) && !wrapper);
}

TEST_F(Wrapper, TakesPointersOfOtherKinds) {
    Typed typed(&probe);
    CPIACFUnknown plain(typed);
    probe.asked.reset();
    plain = std::move(typed); // another type: queried, and the source lets go
    EXPECT_TRUE(probe.asked == kUnknown && !typed && probe.references == 2);
    typed = plain;
    EXPECT_TRUE(probe.asked == kProbe && typed->Answer() == 42);
    IPACF chosen(acfTypeOf<IACFClassFactory>::uid, &probe);
    EXPECT_FALSE(chosen);
    chosen = IPACF(kProbe, &probe); // with its type
    EXPECT_TRUE(kProbe == chosen.GetType() && chosen == typed);
}

TEST_F(Wrapper, ComparesAndCountsWithoutResolving) {
    CPIACFUnknown raw, checked(&probe), zero;
    PutRaw(raw, probe);
    *zero.rec() = nullptr;
    IACFUnknown* out = nullptr;
    EXPECT_TRUE(raw == checked && zero == CPIACFUnknown() && raw.GetLockCount() == 3);
    EXPECT_TRUE(raw.QueryRawInterface(&out) && out == &probe && probe.queries == 1);
    out->Release();
    EXPECT_FALSE(raw.QueryRawInterface(nullptr) || zero.QueryRawInterface(&out) || out || zero);
    probe.addRefThrows = true;
    EXPECT_FALSE(checked.QueryRawInterface(&out) || out || checked.GetLockCount());
}

// --- components ------------------------------------------------------------------------------------------------------

namespace {

struct Twofold final : CComponent<Twofold, IProbe, IACFClassFactory> {
    explicit Twofold(int* ends, bool counted = true) : CComponent(counted), m_ends(ends) {
        if (!ends) throw "no";
    }
    ~Twofold() {
        AddRef(), Release(); // as code does that a destructor calls
        ++*m_ends;
    }
    int ACF_CALL Answer() override { return 7; }
    acfResult ACF_CALL CreateInstance(IACFUnknown*, IACFUnknown*, const _acfUID&, IACFUnknown**) override { return 8; }
    int* m_ends;
};

} // namespace

TEST(Component, IsOneObjectBehindAllItsInterfacesIntended) {
    int ends = 0;
    {
        const CPIACFUnknown made = Twofold::Make(&ends);
        ASSERT_TRUE(made);
        const CPACI<IProbe> probe(made);
        const CPACI<IACFClassFactory> factory(made);
        const CPACI<IACFComponent> component(factory);
        ASSERT_TRUE(probe && factory && component);
        EXPECT_EQ(probe->Answer() + factory->CreateInstance(nullptr, nullptr, kClass, nullptr), 15);
        EXPECT_TRUE(CPIACFUnknown(probe) == made && CPIACFUnknown(factory) == made) << "one identity";
        EXPECT_TRUE(made.GetLockCount() == 4 && !CPACI<IACFDefinition>(made));
    }
    EXPECT_EQ(ends, 1);
    Twofold fixed(&ends, false);
    EXPECT_TRUE(fixed.AddRef() == 0 && fixed.Release() == 0 && ends == 1) << "static ones are not counted";
    EXPECT_FALSE(Twofold::Make(nullptr));
    support::ForEachFailingAllocation([] {
        int once = 0;
        const bool there = static_cast<bool>(Twofold::Make(&once));
        EXPECT_EQ(once, there);
    });
}

// Intended: static-factory-counts
TEST(ClassFactory, IntendedCountsAndResults) {
    struct Maker final : _csFactory {
        Probe probe;
        bool Create(const _acfUID& type, IACFUnknown** out) override { return probe.QueryInterface(type, out) >= 0; }
    } maker;
    IACFUnknown* out = &maker.probe;
    // The result, where nothing is given out.
    const auto query = [&](const _acfUID& type, IACFUnknown** to) {
        return static_cast<std::uint32_t>(maker.QueryInterface(type, to)) + (to && *to ? 1u : 0u);
    };
    const auto create = [&](IACFUnknown* outer, IACFUnknown** to) {
        return static_cast<std::uint32_t>(maker.CreateInstance(nullptr, outer, kProbe, to)) + (to && *to ? 1u : 0u);
    };
    EXPECT_TRUE(maker.AddRef() == 2 && maker.AddRef() == 2 && maker.Release() == 0);
    EXPECT_TRUE(query(kProbe, &out) == 0x80000004u && query(kProbe, nullptr) == 0x80000003u);
    EXPECT_TRUE(query(kUnknown, &out) == 1 && out == &maker);
    EXPECT_TRUE(query(acfTypeOf<IACFClassFactory>::uid, &out) == 1 && out == &maker);
    EXPECT_TRUE(create(&maker.probe, &out) == 0x80040110u && create(nullptr, nullptr) == 0x80000003u);
    EXPECT_TRUE(create(nullptr, &out) == 1 && out == &maker.probe);
    for (const Mode mode : {Mode::Refuses, Mode::Throws, Mode::GivesNull}) {
        maker.probe.query = mode;
        EXPECT_EQ(create(nullptr, &out), 0x80040111u);
    }
}
