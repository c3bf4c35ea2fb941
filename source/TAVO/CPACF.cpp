// Wrappers of the framework's interface pointers.

#include "diagnostics.h"
#include "foreign.h"

namespace TAVO::ACF {

template class TAVO_TEMPLATE_DEF CPACI<IACFEnumDefinitions>;

// --- the wrapper of IACFUnknown, and all wrappers' life --------------------------------------------------------------

CPIACFUnknown::CPIACFUnknown(CPIACFUnknown&& other) noexcept : m_pointer(Marked(nullptr)) { Take(other); }

CPIACFUnknown& CPIACFUnknown::operator=(IACFUnknown* pointer) noexcept {
    _assign(_addRef(pointer));
    return *this;
}

CPIACFUnknown& CPIACFUnknown::operator=(const CPIACFUnknown& other) noexcept {
    Copy(other);
    return *this;
}

CPIACFUnknown& CPIACFUnknown::operator=(CPIACFUnknown&& other) noexcept {
    Take(other);
    return *this;
}

void CPIACFUnknown::free() noexcept {
    Drop();
    m_pointer = Marked(nullptr); // also for a word of 0
}

void CPIACFUnknown::ReportRelease() noexcept { diagnostics::IllegalCodePoint("CPIACFUnknown::free exception"); }

const _acfUID& CPIACFUnknown::GetType() const noexcept { return acfTypeOf<IACFUnknown>::uid; }

void CPIACFUnknown::_assign(IACFUnknown* pointer) noexcept {
    IACFUnknown* const old = Held();
    m_pointer = Marked(pointer);
    if (old) ReleaseQuietly(old);
}

void CPIACFUnknown::Take(CPIACFUnknown& other) noexcept {
    if (this == &other) return;
    IACFUnknown* const held = other._getptr();
    if (acfIsSame(GetType(), other.GetType())) {
        other.m_pointer = Marked(nullptr);
        return _assign(held);
    }
    _assign(_addRef(held));
    other.free();
}

IACFUnknown* CPIACFUnknown::Resolve() const noexcept {
    IACFUnknown* const stored = m_pointer;
    if (!stored) return nullptr;
    IACFUnknown* const queried = _addRef(stored);
    // A pointer that lacks the type must not stay: it would be released once more as if it had been checked.
    m_pointer = Marked(queried ? stored : nullptr);
    ReleaseQuietly(stored);
    // Intended (wrapper-keeps-stored): what was queried is answered, what was stored stays stored. A textbook would
    // store the queried pointer. The two differ only where a creation call wrote a pointer of another type than the
    // wrapper's, against its promise.
    return queried;
}

bool CPIACFUnknown::QueryRawInterface(IACFUnknown** out) const noexcept {
    if (!out) return false;
    *out = Held();
    if (*out && !AddRefQuietly(*out)) *out = nullptr;
    return *out != nullptr;
}

std::uint32_t CPIACFUnknown::GetLockCount() const noexcept {
    IACFUnknown* const held = Held();
    if (!held) return 0;
    try {
        const std::uint32_t count = held->AddRef();
        held->Release();
        return count - 1;
    } catch (...) {
        return 0;
    }
}

// --- creation --------------------------------------------------------------------------------------------------------

bool CPIACFUnknown::Create(Creation what, const _acfUID& cls, IACFComponentFactory* factory) noexcept {
    free();
    // Intended (create-without-factory): without a factory the answer is true, since the empty word is not zero. A
    // textbook would answer false; hosts that create through an optional factory look at the wrapper.
    if (!factory) return true;
    const auto create =
        what == Creation::Component ? &IACFComponentFactory::CreateComponent : &IACFComponentFactory::CreateInstance;
    try {
        if ((factory->*create)(cls, nullptr, acfTypeOf<IACFUnknown>::uid, rec()) < 0) m_pointer = nullptr;
    } catch (...) {
        m_pointer = nullptr;
    }
    return m_pointer != nullptr;
}

bool CPIACFUnknown::CreateTyped(Creation what, const _acfUID& cls, IACFComponentFactory* factory) noexcept {
    free();
    CPIACFUnknown made;
    if (!made.Create(what, cls, factory)) return false;
    Copy(made);
    return !factory || Held(); // as above
}

bool CPIACFUnknown::CreateTyped(Creation what, const _acfUID& cls) noexcept {
    const AcquiredFactory acquired;
    const bool created = CreateTyped(what, cls, acquired.Get());
    return created && acquired.Get();
}

bool CPIACFUnknown::createComponent(const _acfUID& cls, IACFComponentFactory* factory) noexcept {
    return Create(Creation::Component, cls, factory);
}

bool CPIACFUnknown::createInstance(const _acfUID& cls, IACFComponentFactory* factory) noexcept {
    return Create(Creation::Instance, cls, factory);
}

bool CPIACFUnknown::createComponent(const _acfUID& cls) noexcept {
    const AcquiredFactory acquired;
    const bool created = Create(Creation::Component, cls, acquired.Get());
    return created && acquired.Get();
}

bool CPIACFUnknown::createInstance(const _acfUID& cls) noexcept {
    const AcquiredFactory acquired;
    const bool created = Create(Creation::Instance, cls, acquired.Get());
    return created && acquired.Get();
}

// --- the wrapper whose type is chosen at run time --------------------------------------------------------------------

IPACF::~IPACF() = default;

const _acfUID& IPACF::GetType() const noexcept { return m_type; }

IPACF& IPACF::operator=(const IPACF& other) noexcept {
    m_type = other.m_type;
    Copy(other);
    return *this;
}

IPACF& IPACF::operator=(IPACF&& other) noexcept {
    m_type = other.m_type;
    Take(other);
    return *this;
}

bool IPACF::createComponent(const _acfUID& cls, IACFComponentFactory* factory) noexcept {
    return CreateTyped(Creation::Component, cls, factory);
}

bool IPACF::createInstance(const _acfUID& cls, IACFComponentFactory* factory) noexcept {
    return CreateTyped(Creation::Instance, cls, factory);
}

bool IPACF::createComponent(const _acfUID& cls) noexcept { return CreateTyped(Creation::Component, cls); }
bool IPACF::createInstance(const _acfUID& cls) noexcept { return CreateTyped(Creation::Instance, cls); }

} // namespace TAVO::ACF
