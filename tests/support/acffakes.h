#pragma once
// Objects of the component framework that count what is done to them, and refuse or throw when told to.

#include <functional>
#include <stdexcept>
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

enum class Query { Answers, Refuses, Throws, AnswersNull, AnswersOther };

// Lives on the stack; the test holds the first reference.
template <class Interface> struct Fake : Interface {
    Query query = Query::Answers;
    IACFUnknown* other = nullptr; // what AnswersOther gives, already counted as one reference there
    bool addRefThrows = false, releaseThrows = false;
    std::function<void()> onAddRef, onRelease;
    int references = 1, queries = 0;
    cacfuid asked; // the last type

    acfResult ACF_CALL QueryInterface(const _acfUID& type, IACFUnknown** out) override {
        ++queries;
        asked = type;
        *out = nullptr;
        const bool known = cacfuid(type) == cacfuid(acfTypeOf<IACFUnknown>::uid) ||
                           cacfuid(type) == cacfuid(acfTypeOf<Interface>::uid);
        if (query == Query::Throws) throw std::runtime_error("query");
        if (query == Query::Refuses || !known) return acfNoInterface;
        if (query == Query::AnswersNull) return acfOk;
        *out = query == Query::AnswersOther ? other : this;
        (*out)->AddRef();
        return acfOk;
    }
    std::uint32_t ACF_CALL AddRef() override {
        if (onAddRef) onAddRef();
        if (addRefThrows) throw std::runtime_error("add");
        return static_cast<std::uint32_t>(++references);
    }
    std::uint32_t ACF_CALL Release() override {
        const int left = --references;
        if (onRelease) onRelease();
        if (releaseThrows) throw std::runtime_error("release");
        return static_cast<std::uint32_t>(left);
    }
};

struct Probe final : Fake<IProbe> {
    int ACF_CALL Answer() override { return 42; }
};

enum class Creation { Gives, Fails, Throws, GivesNull };

struct FakeFactory : Fake<IACFComponentFactory> {
    Creation creation = Creation::Gives;
    IACFUnknown* made = nullptr;
    int components = 0, instances = 0;
    cacfuid askedClass, askedType;

    acfResult ACF_CALL CreateComponent(const _acfUID& cls, IACFUnknown* outer, const _acfUID& type,
                                       IACFUnknown** out) override {
        ++components;
        return Create(cls, outer, type, out);
    }
    acfResult ACF_CALL CreateInstance(const _acfUID& cls, IACFUnknown* outer, const _acfUID& type,
                                      IACFUnknown** out) override {
        ++instances;
        return Create(cls, outer, type, out);
    }

private:
    acfResult Create(const _acfUID& cls, IACFUnknown* outer, const _acfUID& type, IACFUnknown** out) {
        askedClass = cls;
        askedType = type;
        *out = nullptr;
        if (creation == Creation::Throws) throw std::runtime_error("create");
        if (creation == Creation::Fails || outer) return acfFail;
        if (creation == Creation::GivesNull) return acfOk;
        made->AddRef();
        *out = made;
        return acfOk;
    }
};

} // namespace support
