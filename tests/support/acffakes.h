#pragma once
// Objects of the component framework that count what is done to them, and refuse or throw when told to.

#include <functional>
#include <TAVO/acf.h>

// An interface of the tests.
struct IProbe : IACFUnknown {
    virtual int ACF_CALL Answer() = 0;
};
template <> struct acfTypeOf<IProbe> {
    static constexpr _acfUID uid = {0xA5C1D7F2, 0x11B3, 0x4E0A, {0x9D, 0x51, 0x7C, 0x22, 0x40, 0x8E, 0x16, 0x93}};
};

namespace support {

using TAVO::ACF::cacfuid;

enum class Mode { Gives, Refuses, Throws, GivesNull };

// Lives on the stack; the test holds the first reference.
template <class Interface> struct Fake : Interface {
    Mode query = Mode::Gives;
    IACFUnknown* given = this; // what a query answers
    bool addRefThrows = false, releaseThrows = false;
    std::function<void()> onRelease;
    int references = 1, queries = 0;
    cacfuid asked; // the last type

    acfResult ACF_CALL QueryInterface(const _acfUID& type, IACFUnknown** out) override {
        ++queries;
        asked = type;
        if (asked != acfTypeOf<IACFUnknown>::uid && asked != acfTypeOf<Interface>::uid) return Give(Mode::Refuses, out);
        return Give(query, out);
    }
    std::uint32_t ACF_CALL AddRef() override {
        if (addRefThrows) throw "add";
        return static_cast<std::uint32_t>(++references);
    }
    std::uint32_t ACF_CALL Release() override {
        const int left = --references;
        if (onRelease) onRelease();
        if (releaseThrows) throw "release";
        return static_cast<std::uint32_t>(left);
    }

    acfResult Give(Mode mode, IACFUnknown** out) const {
        *out = nullptr;
        if (mode == Mode::Throws) throw "give";
        if (mode == Mode::Refuses) return acfNoInterface;
        if (mode == Mode::Gives) (*out = given)->AddRef();
        return acfOk;
    }
};

struct Probe final : Fake<IProbe> {
    int ACF_CALL Answer() override { return 42; }
};

struct FakeFactory : Fake<IACFComponentFactory> {
    Probe made;
    Mode creation = Mode::Gives;
    int components = 0; // asked for, shared ones
    cacfuid askedClass, askedType;

    acfResult ACF_CALL CreateComponent(const _acfUID& cls, IACFUnknown* outer, const _acfUID& type,
                                       IACFUnknown** out) override {
        ++components;
        return CreateInstance(cls, outer, type, out);
    }
    acfResult ACF_CALL CreateInstance(const _acfUID& cls, IACFUnknown* outer, const _acfUID& type,
                                      IACFUnknown** out) override {
        askedClass = cls;
        askedType = type;
        return made.Give(outer ? Mode::Refuses : creation, out);
    }
};

} // namespace support
