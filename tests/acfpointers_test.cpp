// Wrappers of interface pointers, and the bases of components, over fakes that count; identifiers and their text.

#include "support/acffakes.h"
#include "support/heapwatch.h"
#include "support/log.h"

#include <set>

using namespace TAVO::ACF;
using namespace support;

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

const std::string kText = "15603CD4-AB81-4D6F-B05F-C6BEA760A789", kNull = "00000000-0000-0000-0000-000000000000";

std::string Text(const cacfuid& id) {
    char text[cacfuid::TextUnits];
    id.GetText(text);
    return text;
}

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
    FakeFactory factory;
    // A plain wrapper finds out at its first use.
    const std::tuple<Mode, Mode, bool, bool> rows[] = {{Mode::Gives, Mode::Gives, true, true},
                                                       {Mode::Throws, Mode::Gives, false, false},
                                                       {Mode::GivesNull, Mode::Gives, false, false},
                                                       {Mode::Gives, Mode::Refuses, true, false}};
    TypeParam wrapper(&this->probe);
    for (const auto& [creation, query, created, typed] : rows) {
        factory.creation = creation;
        factory.made.query = query;
        const bool answer = this->type == kUnknown ? created : typed;
        EXPECT_TRUE(wrapper.createComponent(kClass, &factory) == answer && static_cast<bool>(wrapper) == typed);
        EXPECT_TRUE(wrapper.createInstance(kClass, &factory) == answer && static_cast<bool>(wrapper) == typed);
        EXPECT_TRUE(factory.askedClass == kClass && factory.askedType == kUnknown);
        EXPECT_EQ(factory.made.references, typed ? 2 : 1);
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
    ForEachFailingAllocation([] {
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

// --- identifiers -----------------------------------------------------------------------------------------------------

TEST(Identifier, ReadsAndWritesSixteenBytes) {
    const cacfuid id(_acfUID{0x15603CD4, 0xAB81, 0x4D6F, {0xB0, 0x5F, 0xC6, 0xBE, 0xA7, 0x60, 0xA7, 0x89}});
    EXPECT_EQ(Text(id), kText);
    EXPECT_STREQ(id.ANSI(), kText.c_str());
    EXPECT_STREQ(static_cast<TAVO::String::CACFWChar>(id), L"15603CD4-AB81-4D6F-B05F-C6BEA760A789");
    for (std::size_t byte = 0; byte < sizeof(_acfUID); ++byte) {
        cacfuid other(id), single;
        reinterpret_cast<unsigned char*>(&other.rec())[byte] ^= 1;
        reinterpret_cast<unsigned char*>(&single.rec())[byte] = 1;
        EXPECT_TRUE(other != id && !(other == id) && single) << byte;
        EXPECT_EQ(cacfuid(Text(single).c_str()), single) << byte;
        single.reset();
        EXPECT_FALSE(single) << byte;
    }
    std::set<std::string> seen;
    for (int i = 0; i < 200; ++i) { // new ones are random, of version four
        const std::string text = Text(cacfuid::New());
        EXPECT_TRUE(seen.insert(text).second && text[14] == '4' && text.find_first_of("89AB", 19) == 19) << text;
    }
}

// The fuzz replay compares any text with a plain reading of the rules; here is what the rules say.
// Intended: identifier-dashes
TEST(Identifier, IntendedReadingOfOtherTexts) {
    const std::string odd = "-AB81-4D6F-B05F-C6BEA760A789", read = "FFFF547F-4D6F-B05F-A789-C6BEA760A789";
    // Empty: refused, which leaves the null identifier.
    const std::pair<std::string, std::string> rows[] = {
        {kText, kText}, {'{' + kText + '}', ""},   {"", kNull},         {kText.substr(0, 24), ""},
        {odd, read},    {kText.substr(0, 35), ""}, {kText + '-', kNull}};
    for (const auto& [text, identifier] : rows) {
        const std::u16string wide(text.begin(), text.end());
        cacfuid fromNarrow(kText.c_str()), fromWide(kText.c_str());
        EXPECT_EQ(fromNarrow.Set(text.c_str()), !identifier.empty()) << text;
        EXPECT_EQ(fromWide.Set(reinterpret_cast<const wchar_t*>(wide.c_str())), !identifier.empty()) << text;
        EXPECT_EQ(Text(fromNarrow), identifier.empty() ? kNull : identifier) << text;
        EXPECT_EQ(fromNarrow, fromWide) << text;
    }
    cacfuid id(kText.c_str());
    EXPECT_TRUE(id.Set(static_cast<const char*>(nullptr)) && !id && id.Set(static_cast<const wchar_t*>(nullptr)));
}
