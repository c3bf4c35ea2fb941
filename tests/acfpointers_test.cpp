// Wrappers of interface pointers, and the bases of components, over fakes that count.

#include "support/acffakes.h"
#include "support/assertions.h"
#include "support/heapwatch.h"

#include <gtest/gtest.h>
#include <memory>

using namespace TAVO::ACF;
using support::Assertions;
using support::Creation;
using support::FakeFactory;
using support::Probe;
using support::Query;
using support::Texts;

namespace {

const _acfUID kProbe = acfTypeOf<IProbe>::uid;
const cacfuid kUnknown = acfTypeOf<IACFUnknown>::uid;
const cacfuid kClass("24508B8F-A78E-4243-9E68-71AA029C838A");

std::size_t Word(CPIACFUnknown& wrapper) { return reinterpret_cast<std::size_t>(*wrapper.rec()); }

// The three kinds of wrapper; each test of their common life runs for all.
struct Plain : CPIACFUnknown {
    using CPIACFUnknown::CPIACFUnknown;
    using CPIACFUnknown::operator=;
};
struct Chosen : IPACF {
    Chosen() : IPACF(kProbe) {}
    Chosen(IACFUnknown* pointer) : IPACF(kProbe, pointer) {}
    using IPACF::operator=;
};
using Typed = CPACI<IProbe>;

template <class Wrapper> struct WrapperOfAnyKind : testing::Test {
    const cacfuid type = Wrapper().GetType();
    Probe probe;

    ~WrapperOfAnyKind() override { EXPECT_EQ(probe.references, 1); }
};
using Kinds = testing::Types<Plain, Chosen, Typed>;
TYPED_TEST_SUITE(WrapperOfAnyKind, Kinds);

} // namespace

TYPED_TEST(WrapperOfAnyKind, OwnsOneReferenceOfItsType) {
    Probe& probe = this->probe;
    TypeParam empty;
    EXPECT_FALSE(empty);
    EXPECT_EQ(Word(empty), 1u);
    EXPECT_FALSE(TypeParam(static_cast<IACFUnknown*>(nullptr)));

    TypeParam held(&probe);
    EXPECT_EQ(probe.asked, this->type);
    EXPECT_EQ(probe.references, 2);
    EXPECT_EQ(Word(held), reinterpret_cast<std::size_t>(static_cast<IACFUnknown*>(&probe)) | 1);
    EXPECT_EQ(held.GetLockCount(), 2u);

    TypeParam copy(held);
    EXPECT_TRUE(copy == held && copy != empty);
    EXPECT_EQ(probe.references, 3);
    EXPECT_EQ(probe.queries, 2) << "a copy queries";
    EXPECT_EQ(probe.asked, this->type);

    TypeParam moved(std::move(copy));
    EXPECT_TRUE(moved && !copy);
    EXPECT_EQ(probe.references, 3);
    EXPECT_EQ(probe.queries, 2) << "a move does not";

    copy = moved;
    moved = *&moved;
    moved = static_cast<TypeParam&&>(*&moved);
    EXPECT_EQ(probe.references, 4);
    copy = std::move(moved);
    EXPECT_EQ(probe.references, 3);
    copy = &probe;
    EXPECT_EQ(probe.references, 3);
    copy = empty;
    EXPECT_FALSE(copy);
    copy.free();
    held.free();
    EXPECT_EQ(probe.references, 1);
    EXPECT_EQ(Word(held), 1u);
    EXPECT_EQ(held.GetLockCount(), 0u);
}

TYPED_TEST(WrapperOfAnyKind, StaysEmptyWhereTheQueryFails) {
    Probe& probe = this->probe;
    for (const Query query : {Query::Refuses, Query::Throws, Query::AnswersNull}) {
        const TypeParam good(&probe);
        probe.query = query;
        EXPECT_FALSE(TypeParam(&probe));
        EXPECT_FALSE(TypeParam(good));
        TypeParam assigned;
        *assigned.rec() = &probe; // a raw pointer without the type goes back, once
        probe.AddRef();
        EXPECT_FALSE(assigned);
        EXPECT_EQ(Word(assigned), 1u);
        assigned.free();
        probe.query = Query::Answers;
        assigned = &probe;
        probe.query = query;
        assigned = good;
        EXPECT_FALSE(assigned);
        probe.query = Query::Answers;
    }
}

TYPED_TEST(WrapperOfAnyKind, IntendedResolvingKeepsWhatWasStored) {
    Probe& probe = this->probe;
    Probe other;
    probe.query = Query::AnswersOther;
    probe.other = &other;
    {
        TypeParam raw;
        *raw.rec() = &probe;
        probe.AddRef();
        const TypeParam checked(raw); // resolves, then queries what was answered
        EXPECT_EQ(probe.references, 1);
        EXPECT_EQ(other.references, 3);
        EXPECT_EQ(Word(raw), reinterpret_cast<std::size_t>(static_cast<IACFUnknown*>(&probe)) | 1);
        probe.AddRef(); // the wrapper releases what it stored, not what it queried
        raw.free();
        EXPECT_EQ(probe.references, 1);
        other.Release();
    }
    EXPECT_EQ(other.references, 1);
}

TYPED_TEST(WrapperOfAnyKind, EndsWellWhenReleaseComesBackOrThrows) {
    Probe& probe = this->probe;
    const Assertions kept;
    {
        TypeParam held(&probe);
        probe.onRelease = [&] { held.free(); };
        held.free();
        EXPECT_EQ(probe.references, 1);
        held = &probe;
        held = TypeParam(&probe);
        probe.onRelease = nullptr;
    }
    probe.releaseThrows = true;
    { const TypeParam held(&probe); }
    EXPECT_EQ(Assertions::Take(), Texts{"CPIACFUnknown::free exception"});
    TypeParam assigned(&probe);
    assigned = TypeParam();
    EXPECT_EQ(Assertions::Take(), Texts());
    EXPECT_FALSE(assigned);
    probe.releaseThrows = false;
}

TYPED_TEST(WrapperOfAnyKind, CreatesThroughTheFactoryThatIsGiven) {
    FakeFactory factory;
    factory.made = &this->probe;
    const struct {
        Creation creation;
        Query query;
        bool created, typed;
    } rows[] = {
        {Creation::Gives, Query::Answers, true, true},    {Creation::Fails, Query::Answers, false, false},
        {Creation::Throws, Query::Answers, false, false}, {Creation::GivesNull, Query::Answers, false, false},
        {Creation::Gives, Query::Refuses, true, false}, // a plain wrapper finds out at its first use
    };
    const bool isPlain = this->type == kUnknown;
    for (const auto& row : rows) {
        TypeParam wrapper(&this->probe);
        factory.creation = row.creation;
        this->probe.query = row.query;
        EXPECT_EQ(wrapper.createComponent(kClass, &factory), isPlain ? row.created : row.typed);
        EXPECT_EQ(static_cast<bool>(wrapper), row.typed);
        EXPECT_EQ(wrapper.createInstance(kClass, &factory), isPlain ? row.created : row.typed);
        EXPECT_EQ(static_cast<bool>(wrapper), row.typed);
        EXPECT_EQ(factory.askedClass, kClass);
        EXPECT_EQ(factory.askedType, kUnknown);
        EXPECT_EQ(this->probe.references, row.typed ? 2 : 1);
        this->probe.query = Query::Answers;
    }
    EXPECT_EQ(factory.components, 5);
    EXPECT_EQ(factory.instances, 5);

    TypeParam wrapper(&this->probe);
    EXPECT_FALSE(wrapper.createComponent(kClass) || wrapper) << "no factory of the process";
    ASSERT_TRUE(CPIACFUnknown::Factory_Set(&factory));
    factory.creation = Creation::Gives;
    EXPECT_TRUE(wrapper.createComponent(kClass) && wrapper);
    EXPECT_TRUE(wrapper.createInstance(kClass) && wrapper);
    EXPECT_EQ(factory.references, 2);
    CPIACFUnknown::Factory_Release();
    EXPECT_EQ(factory.references, 1);
}

TYPED_TEST(WrapperOfAnyKind, IntendedCreationFromNoFactoryIsTrueAndEmpty) {
    TypeParam wrapper(&this->probe);
    EXPECT_TRUE(wrapper.createComponent(kClass, nullptr));
    EXPECT_FALSE(wrapper);
    EXPECT_TRUE(wrapper.createInstance(kClass, nullptr));
    EXPECT_FALSE(wrapper);
}

TEST(Wrapper, TakesPointersOfOtherKinds) {
    Probe probe;
    {
        Typed typed(&probe);
        CPIACFUnknown plain(typed);
        EXPECT_EQ(probe.asked, kUnknown);
        plain = std::move(typed); // another type: queried, and the source lets go
        EXPECT_EQ(probe.asked, kUnknown);
        EXPECT_FALSE(typed);
        EXPECT_EQ(probe.references, 2);
        typed = plain;
        EXPECT_EQ(probe.asked, cacfuid(kProbe));
        EXPECT_EQ(typed->Answer() + typed.Get()->Answer(), 84);

        IPACF chosen(acfTypeOf<IACFClassFactory>::uid, &probe);
        EXPECT_FALSE(chosen);
        chosen = IPACF(kProbe, &probe); // with its type
        EXPECT_EQ(cacfuid(chosen.GetType()), cacfuid(kProbe));
        EXPECT_TRUE(chosen == typed);
        const IPACF copy(chosen);
        chosen = copy;
        EXPECT_TRUE(chosen && cacfuid(copy.GetType()) == cacfuid(kProbe));
    }
    EXPECT_EQ(probe.references, 1);
}

TEST(Wrapper, ComparesAndCountsWithoutResolving) {
    Probe probe;
    {
        CPIACFUnknown raw, checked(&probe), zero;
        *raw.rec() = &probe;
        *zero.rec() = nullptr;
        probe.AddRef();
        EXPECT_TRUE(raw == checked && zero == CPIACFUnknown());
        EXPECT_EQ(raw.GetLockCount(), 3u);
        IACFUnknown* out = nullptr;
        EXPECT_TRUE(raw.QueryRawInterface(&out));
        EXPECT_EQ(out, &probe);
        out->Release();
        EXPECT_EQ(probe.queries, 1);
        EXPECT_FALSE(raw.QueryRawInterface(nullptr));
        EXPECT_FALSE(zero.QueryRawInterface(&out) || out || zero);
        probe.addRefThrows = true;
        EXPECT_FALSE(checked.QueryRawInterface(&out) || out);
        EXPECT_EQ(checked.GetLockCount(), 0u);
        probe.addRefThrows = false;
    }
    EXPECT_EQ(probe.references, 1);
}

// --- components ------------------------------------------------------------------------------------------------------

namespace {

struct Sink final : CComponent<Sink, IProbe, IACFDefinitionRegistry> {
    explicit Sink(int* ends, bool throws = false) : m_ends(ends) {
        if (throws) throw std::runtime_error("no");
    }
    ~Sink() {
        AddRef(), Release(); // as code does that a destructor calls
        ++*m_ends;
    }
    int ACF_CALL Answer() override { return 7; }
    acfResult ACF_CALL EnumDefinitions(const _acfUID&, IACFEnumDefinitions**) override { return acfFail; }
    acfResult ACF_CALL FindDefinition(const _acfUID&, IACFDefinition**) override { return acfFail; }
    acfResult ACF_CALL FindClass(const wchar_t*, _acfUID*) override { return acfFail; }

private:
    int* m_ends;
};

struct Fixed final : CComponent<Fixed, IProbe> {
    Fixed() : CComponent(false) {}
    int ACF_CALL Answer() override { return 1; }
};

} // namespace

TEST(Component, IsOneObjectBehindAllItsInterfaces) {
    int ends = 0;
    {
        const CPIACFUnknown made = Sink::Make(&ends);
        ASSERT_TRUE(made);
        EXPECT_EQ(made.GetLockCount(), 1u);
        const CPACI<IProbe> probe(made);
        const CPACI<IACFDefinitionRegistry> registry(made);
        const CPACI<IACFComponent> component(registry);
        ASSERT_TRUE(probe && registry && component);
        EXPECT_EQ(probe->Answer(), 7);
        EXPECT_EQ(registry->FindClass(nullptr, nullptr), acfFail);
        EXPECT_TRUE(CPIACFUnknown(probe) == made && CPIACFUnknown(registry) == made) << "one identity";
        EXPECT_EQ(made.GetLockCount(), 4u);
        EXPECT_FALSE(CPACI<IACFClassFactory>(made));
        EXPECT_EQ(registry->QueryInterface(kProbe, nullptr), acfInvalidArgument);
    }
    EXPECT_EQ(ends, 1);
    EXPECT_FALSE(Sink::Make(&ends, true));
    support::ForEachFailingAllocation([] {
        int once = 0;
        const bool there = static_cast<bool>(Sink::Make(&once));
        EXPECT_EQ(once, there);
    });
}

TEST(Component, IntendedStaticOnesAreNotCounted) {
    Fixed fixed;
    EXPECT_EQ(fixed.AddRef(), 0u);
    EXPECT_EQ(fixed.Release(), 0u);
    const CPACI<IProbe> held(static_cast<IProbe*>(&fixed));
    ASSERT_TRUE(held);
    EXPECT_EQ(held->Answer(), 1);
}

TEST(ClassFactory, IntendedCountsAndResults) {
    struct Maker final : _csFactory {
        Creation creation = Creation::Gives;
        Probe* probe = nullptr;
        bool Create(const _acfUID& type, IACFUnknown** out) override {
            if (creation == Creation::Throws) throw std::runtime_error("create");
            if (creation != Creation::Gives) return creation == Creation::GivesNull;
            return probe->QueryInterface(type, out) >= 0;
        }
    } maker;
    Probe probe, outer;
    maker.probe = &probe;
    EXPECT_EQ(maker.AddRef(), 2u);
    EXPECT_EQ(maker.AddRef(), 2u);
    EXPECT_EQ(maker.Release(), 0u);

    IACFUnknown* out = nullptr;
    EXPECT_EQ(static_cast<std::uint32_t>(maker.QueryInterface(kProbe, nullptr)), 0x80000003u);
    for (const _acfUID& type : {acfTypeOf<IACFUnknown>::uid, acfTypeOf<IACFClassFactory>::uid}) {
        EXPECT_EQ(maker.QueryInterface(type, &out), 0);
        EXPECT_EQ(out, &maker);
    }
    EXPECT_EQ(static_cast<std::uint32_t>(maker.QueryInterface(kProbe, &out)), 0x80000004u);
    EXPECT_EQ(out, nullptr);

    EXPECT_EQ(static_cast<std::uint32_t>(maker.CreateInstance(nullptr, &outer, kProbe, nullptr)), 0x80000003u);
    EXPECT_EQ(static_cast<std::uint32_t>(maker.CreateInstance(nullptr, &outer, kProbe, &out)), 0x80040110u);
    EXPECT_EQ(maker.CreateInstance(nullptr, nullptr, kProbe, &out), 0);
    EXPECT_EQ(out, &probe);
    out->Release();
    for (const Creation creation : {Creation::Fails, Creation::Throws, Creation::GivesNull}) {
        maker.creation = creation;
        EXPECT_EQ(static_cast<std::uint32_t>(maker.CreateInstance(nullptr, nullptr, kProbe, &out)), 0x80040111u);
        EXPECT_EQ(out, nullptr);
    }
    EXPECT_EQ(probe.references, 1);
    EXPECT_EQ(outer.references, 1);
}
