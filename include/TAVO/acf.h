#pragma once
// The component framework: identifiers and their text, wrappers of interface pointers, the base of components, and the
// factory and classes of the process. The framework's own interfaces stand in acfbase.h.

#include <atomic>
#include <cstring>
#include <TAVO/acfbase.h>
#include <TAVO/config.h>
#include <TAVO/core.h>
#include <TAVO/string.h>
#include <utility>

namespace TAVO {
namespace ACF {

/// The 16-byte identifier of an interface, class, category, vendor or module; a plain value. All zero is the null
/// identifier, which names nothing.
class TAVO_API cacfuid {
public:
    /// Units of the text form, terminator included.
    static constexpr std::size_t TextUnits = 37;

    /// The null identifier.
    constexpr cacfuid() noexcept : m_uid{} {}
    constexpr cacfuid(const _acfUID& uid) noexcept : m_uid(uid) {}
    /// As Set; the null identifier where that fails.
    cacfuid(const char* text) noexcept : m_uid{} { Set(text); }
    cacfuid(const wchar_t* text) noexcept : m_uid{} { Set(text); }

    /// A new identifier: 122 random bits of the system's generator, version 4. The null identifier when the system
    /// gives none. Any thread; costs a system call.
    static cacfuid New() noexcept;

    /// Reads the text form: "15603CD4-AB81-4D6F-B05F-C6BEA760A789", digits in any case, no braces. Text behind the last
    /// digit is ignored.
    ///
    /// Text without exactly four '-' (null and empty text too) is true and the null identifier: test the value. Numbers
    /// are scanned as C scans %x: blanks, a sign and "0x" may lead, and of too many digits the last ones count.
    /// @return false for other text; the identifier is then null.
    bool Set(const char* text) noexcept;
    bool Set(const wchar_t* text) noexcept;

    /// Writes the text form, upper case, into TextUnits units.
    void GetText(char* out) const noexcept;
    void GetText(wchar_t* out) const noexcept;
    /// The text form; absent (null) without memory.
    operator String::CACFWChar() const;
    String::CANSIChar ANSI() const;

    bool operator==(const cacfuid& other) const noexcept { return acfIsSame(m_uid, other.m_uid); }
    bool operator!=(const cacfuid& other) const noexcept { return !(*this == other); }
    /// Whether any byte is not zero.
    explicit operator bool() const noexcept { return !acfIsSame(m_uid, _acfUID{}); }

    /// Becomes the null identifier.
    void reset() noexcept { m_uid = {}; }
    _acfUID& rec() noexcept { return m_uid; }
    const _acfUID& rec() const noexcept { return m_uid; }
    operator const _acfUID&() const noexcept { return m_uid; }

private:
    _acfUID m_uid;
};
static_assert(sizeof(cacfuid) == sizeof(_acfUID), "an identifier is its 16 bytes");

// --- wrappers ------------------------------------------------------------------------------------------------------
//
// A wrapper owns one reference to an interface, always of the wrapper's own type: whatever is stored into it is queried
// for that type first, and what does not have it leaves the wrapper empty.
//
// Threads: a wrapper is for one thread at a time, reading included: the first look at a pointer that was written
// through rec() changes the wrapper. What it points to counts its own references. Nothing here throws; exceptions of
// the framework's objects end here, as failures.

struct tagCOMPONENT_INFO;
template <class I> class CPACI;

/// Wrapper of a plain IACFUnknown, and the base of the others. Also home of the process's component factory and of its
/// classes.
class TAVO_API CPIACFUnknown {
public:
    /// Makes an object of a class: empty when it cannot.
    using CreateFunction = CPIACFUnknown (*)(const _acfUID& cls);

    /// Empty.
    CPIACFUnknown() noexcept : m_pointer(Marked(nullptr)) {}
    /// Takes a reference of its own, of the wrapper's type; the caller keeps the one it has. Null gives an empty one.
    CPIACFUnknown(IACFUnknown* pointer) noexcept : CPIACFUnknown(pointer, acfTypeOf<IACFUnknown>::uid) {}
    /// Copies query, too: one call of QueryInterface each.
    CPIACFUnknown(const CPIACFUnknown& other) noexcept : CPIACFUnknown(other._getptr()) {}
    /// Takes over the reference where both have the same type; @p other is empty afterwards.
    CPIACFUnknown(CPIACFUnknown&& other) noexcept;
    /// Assignment queries first; then the old reference goes. The type stays this wrapper's.
    CPIACFUnknown& operator=(IACFUnknown* pointer) noexcept;
    CPIACFUnknown& operator=(const CPIACFUnknown& other) noexcept;
    CPIACFUnknown& operator=(CPIACFUnknown&& other) noexcept;
    virtual ~CPIACFUnknown() { Drop(); }

    /// Becomes empty, then releases the reference. A Release that throws raises an assertion.
    virtual void free() noexcept;
    /// The identifier of the interface that this wrapper holds.
    virtual const _acfUID& GetType() const noexcept;

    /// The same pointer, resolved or not; two empty wrappers are equal.
    bool operator==(const CPIACFUnknown& other) const noexcept { return Held() == other.Held(); }
    bool operator!=(const CPIACFUnknown& other) const noexcept { return !(*this == other); }
    /// Whether there is an interface.
    explicit operator bool() const noexcept { return _getptr() != nullptr; }

    /// Where a creation call may write a pointer together with a reference; it is released like any other. Make the
    /// wrapper empty before. The pointer must be of the wrapper's type; it is queried for it at the first use, and what
    /// does not have it is released. Do not read the word: it has a mark in bit 0.
    IACFUnknown** rec() noexcept { return &m_pointer; }
    /// Adds a reference and writes the pointer to @p out. False when empty, @p out is then null; false for a null out.
    bool QueryRawInterface(IACFUnknown** out) const noexcept;
    /// The object's count of references, by its own account; 0 when empty.
    std::uint32_t GetLockCount() const noexcept;

    /// The one shared object of a class, from the factory. Empties the wrapper first, so the factory must have another
    /// holder.
    /// @return whether the wrapper has a pointer. True also, and the wrapper empty, without a factory: look at the
    ///         wrapper, too.
    bool createComponent(const _acfUID& cls, IACFComponentFactory* factory) noexcept;
    /// A new object of a class; else the same.
    bool createInstance(const _acfUID& cls, IACFComponentFactory* factory) noexcept;
    /// The same from the process's factory. False, and the wrapper empty, without one.
    bool createComponent(const _acfUID& cls) noexcept;
    bool createInstance(const _acfUID& cls) noexcept;

    // --- The process's component factory. Any thread. ---

    /// Sets the factory, which is referenced until Factory_Release was called as often as this gave true. False for
    /// null, for another factory than the one that is set, and for an interface without a factory behind it.
    static bool Factory_Set(IACFComponentFactory* factory) noexcept;
    static bool Factory_Set(IACFUnknown* factory) noexcept;
    static bool Factory_Set(const CPIACFUnknown& factory) noexcept;
    /// Takes back one Factory_Set; the last one releases the factory. Always true, also without a factory.
    static bool Factory_Release() noexcept;
    /// The factory, with a reference for the caller. False, and null, without one.
    static bool Factory_Acquire(IACFComponentFactory** out) noexcept;
    static bool Factory_Acquire(CPIACFUnknown& out) noexcept;
    static bool Factory_IsAvailable() noexcept;

    // --- The classes of the process. Any thread. ---

    /// Enters a class that this library can then create.
    /// @param category  what enumerations select by; null is no category
    /// @param names     one or more names, separated by ';', the first is the one to show. Mandatory: without names the
    ///                  answer is false, and the log says so.
    /// @return false also when the class is registered with other values (the first one stays) and without memory. True
    ///         again for the same four values; that needs no second unregistering.
    static bool Factory_RegisterClass(const _acfUID& cls, const _acfUID& category, const String::CPPoolString& names,
                                      CreateFunction create) noexcept;
    /// Removes a class; false when it is not registered. A plug-in calls it before its code goes away, and makes sure
    /// that nobody is just creating an object.
    static bool Factory_UnregisterClass(const _acfUID& cls) noexcept;
    /// A new object of a registered class, queried for the type of @p out. A host's factory is built on this; it asks
    /// no factory itself. The creation function runs without a lock and may use all of the library.
    static bool Factory_CreateClass(const _acfUID& cls, CPIACFUnknown& out) noexcept;
    /// The library's own list of classes, for a host's factory to offer. Never null; lives as long as the library.
    static IACFDefinitionRegistry* Factory_GetRegistry() noexcept;

    // What classes there are: asked of the factory when it has the interface IACFDefinitionRegistry, else of the
    // library's own list. False, and an empty result, when there is none.

    /// Class of that name, in any case of A to Z; of several the first registered.
    static bool Factory_FindClass(const wchar_t* name, cacfuid& out) noexcept;
    /// Definition (IACFDefinition) of a class.
    static bool Factory_FindDefinition(const _acfUID& cls, CPIACFUnknown& out) noexcept;
    /// Definitions of all classes of a category, or of all classes for the null identifier, as they are now.
    static bool Factory_EnumDefinitions(const _acfUID& category, CPACI<IACFEnumDefinitions>& out) noexcept;
    /// What is known of a class. An assertion, and false, when info.sSizeStruct is not the record's size.
    static bool Factory_GetComponentInfo(const _acfUID& cls, tagCOMPONENT_INFO& info) noexcept;

protected:
    enum class Creation { Component, Instance };

    /// @p pointer queried for this wrapper's type; null when it is null or lacks it. The reference is the caller's.
    IACFUnknown* _addRef(IACFUnknown* pointer) const noexcept { return Query(pointer, GetType()); }
    /// The interface, resolved; null when empty.
    IACFUnknown* _getptr() const noexcept {
        return Word() & 1 ? Held() : Resolve(); // the mark says: checked
    }
    /// Takes over @p pointer as it is, without a new reference, and releases the old one.
    void _assign(IACFUnknown* pointer) noexcept;

    /// For derived wrappers, whose type the base cannot ask for while it is built.
    CPIACFUnknown(IACFUnknown* pointer, const _acfUID& type) noexcept : m_pointer(Marked(Query(pointer, type))) {}
    /// A derived wrapper's other constructors and assignments.
    void Copy(const CPIACFUnknown& other) noexcept { _assign(_addRef(other._getptr())); }
    void Take(CPIACFUnknown& other) noexcept;
    /// A derived wrapper's creation calls: into a plain wrapper, then queried for the type.
    bool CreateTyped(Creation what, const _acfUID& cls, IACFComponentFactory* factory) noexcept;
    bool CreateTyped(Creation what, const _acfUID& cls) noexcept;

private:
    static IACFUnknown* Query(IACFUnknown* pointer, const _acfUID& type) noexcept {
        if (!pointer) return nullptr;
        try {
            IACFUnknown* found = nullptr;
            return pointer->QueryInterface(type, &found) >= 0 ? found : nullptr;
        } catch (...) {
            return nullptr;
        }
    }
    std::size_t Word() const noexcept { return reinterpret_cast<std::size_t>(m_pointer); }
    IACFUnknown* Held() const noexcept { return reinterpret_cast<IACFUnknown*>(Word() & ~static_cast<std::size_t>(1)); }
    static IACFUnknown* Marked(IACFUnknown* pointer) noexcept {
        return reinterpret_cast<IACFUnknown*>(reinterpret_cast<std::size_t>(pointer) | 1);
    }
    // What free and the destructor do.
    void Drop() noexcept {
        IACFUnknown* const held = Held();
        if (!held) return;
        m_pointer = Marked(nullptr); // before the object hears of it: its end may lead back here
        try {
            held->Release();
        } catch (...) {
            ReportRelease();
        }
    }
    static void ReportRelease() noexcept;
    IACFUnknown* Resolve() const noexcept;
    bool Create(Creation what, const _acfUID& cls, IACFComponentFactory* factory) noexcept;

    // 1: empty. Pointer with bit 0 set: an interface of this wrapper's type and a reference. Pointer with bit 0 clear:
    // as a creation call wrote it, not looked at yet. 0: empty, likewise.
    mutable IACFUnknown* m_pointer;
};

/// Wrapper whose type is chosen when it is made.
class TAVO_API IPACF : public CPIACFUnknown {
public:
    explicit IPACF(const _acfUID& type) noexcept : m_type(type) {}
    IPACF(const _acfUID& type, IACFUnknown* pointer) noexcept : CPIACFUnknown(pointer, type), m_type(type) {}
    IPACF(const IPACF& other) noexcept : IPACF(other.m_type, other._getptr()) {}
    IPACF(IPACF&& other) noexcept : m_type(other.m_type) { Take(other); }
    /// Takes over the type, too.
    IPACF& operator=(const IPACF& other) noexcept;
    IPACF& operator=(IPACF&& other) noexcept;
    using CPIACFUnknown::operator=;
    ~IPACF() override;

    const _acfUID& GetType() const noexcept override;

    /// As those of the base, except that false is also an object that lacks the type.
    bool createComponent(const _acfUID& cls, IACFComponentFactory* factory) noexcept;
    bool createInstance(const _acfUID& cls, IACFComponentFactory* factory) noexcept;
    bool createComponent(const _acfUID& cls) noexcept;
    bool createInstance(const _acfUID& cls) noexcept;

private:
    _acfUID m_type;
};

/// Wrapper of the interface class I, one that acfTypeOf knows.
template <class I> class CPACI : public CPIACFUnknown {
public:
    CPACI() noexcept;
    CPACI(IACFUnknown* pointer) noexcept;
    CPACI(const CPACI& other) noexcept;
    CPACI(CPACI&& other) noexcept;
    CPACI(const CPIACFUnknown& other) noexcept;
    CPACI& operator=(IACFUnknown* pointer) noexcept;
    CPACI& operator=(const CPACI& other) noexcept;
    CPACI& operator=(CPACI&& other) noexcept;
    CPACI& operator=(const CPIACFUnknown& other) noexcept;
    ~CPACI() override;

    const _acfUID& GetType() const noexcept override;

    /// The interface, null when empty; the reference stays the wrapper's.
    I* Get() const noexcept;
    I* operator->() const noexcept;

    /// As those of the base, except that false is also an object that lacks the type.
    bool createComponent(const _acfUID& cls, IACFComponentFactory* factory) noexcept;
    bool createInstance(const _acfUID& cls, IACFComponentFactory* factory) noexcept;
    bool createComponent(const _acfUID& cls) noexcept;
    bool createInstance(const _acfUID& cls) noexcept;
};

// Outside the class, not inline: the one exported instantiation must hold them all.
template <class I> CPACI<I>::CPACI() noexcept {}
template <class I> CPACI<I>::CPACI(IACFUnknown* pointer) noexcept : CPIACFUnknown(pointer, acfTypeOf<I>::uid) {}
template <class I> CPACI<I>::CPACI(const CPACI& other) noexcept : CPIACFUnknown(other._getptr(), acfTypeOf<I>::uid) {}
template <class I> CPACI<I>::CPACI(CPACI&& other) noexcept : CPIACFUnknown() { Take(other); }
template <class I> CPACI<I>::CPACI(const CPIACFUnknown& other) noexcept : CPIACFUnknown() { Copy(other); }
template <class I> CPACI<I>& CPACI<I>::operator=(IACFUnknown* pointer) noexcept {
    _assign(_addRef(pointer));
    return *this;
}
template <class I> CPACI<I>& CPACI<I>::operator=(const CPACI& other) noexcept {
    Copy(other);
    return *this;
}
template <class I> CPACI<I>& CPACI<I>::operator=(CPACI&& other) noexcept {
    Take(other);
    return *this;
}
template <class I> CPACI<I>& CPACI<I>::operator=(const CPIACFUnknown& other) noexcept {
    Copy(other);
    return *this;
}
template <class I> CPACI<I>::~CPACI() {}
template <class I> const _acfUID& CPACI<I>::GetType() const noexcept { return acfTypeOf<I>::uid; }
template <class I> I* CPACI<I>::Get() const noexcept { return static_cast<I*>(_getptr()); }
template <class I> I* CPACI<I>::operator->() const noexcept { return Get(); }
template <class I> bool CPACI<I>::createComponent(const _acfUID& cls, IACFComponentFactory* factory) noexcept {
    return CreateTyped(Creation::Component, cls, factory);
}
template <class I> bool CPACI<I>::createInstance(const _acfUID& cls, IACFComponentFactory* factory) noexcept {
    return CreateTyped(Creation::Instance, cls, factory);
}
template <class I> bool CPACI<I>::createComponent(const _acfUID& cls) noexcept {
    return CreateTyped(Creation::Component, cls);
}
template <class I> bool CPACI<I>::createInstance(const _acfUID& cls) noexcept {
    return CreateTyped(Creation::Instance, cls);
}

extern template class TAVO_TEMPLATE_DECL CPACI<IACFEnumDefinitions>;

/// What Factory_GetComponentInfo tells of a class. What is not known is null, or the empty text.
struct tagCOMPONENT_INFO {
    std::size_t sSizeStruct = sizeof(tagCOMPONENT_INFO); ///< the record's size, as the caller was built
    cacfuid uidClass;
    cacfuid uidCategory;
    String::CACFWChar sName; ///< the first of the class's names
    cacfuid uidVendor;
    String::CACFWChar sVendor;
    cacfuid uidModule;
    String::CACFWChar sModule;
    cacfuid uidInterface; ///< the interface that the class is made for
};
using COMPONENT_INFO = tagCOMPONENT_INFO;

/// The vendor and the module of components that this library brings itself.
constexpr _acfUID LibraryVendor = {0x81CCB7F3, 0x1FA5, 0x4FC2, {0x8A, 0x33, 0x2F, 0x1E, 0x06, 0x55, 0x9E, 0x07}};
constexpr _acfUID LibraryModule = {0xABA477C7, 0xD5FF, 0x4914, {0xA2, 0x26, 0xF1, 0xAD, 0xD5, 0x36, 0xF6, 0xA7}};

// --- components ----------------------------------------------------------------------------------------------------

/// Base of components: their count of references, and the interfaces that all of them have. CComponent, below, adds
/// what a component of one's own needs.
/// Threads: counting is atomic, with full barriers.
class TAVO_API _cACFUnknown : public IACFComponent {
public:
    _cACFUnknown(const _cACFUnknown&) = delete;
    _cACFUnknown& operator=(const _cACFUnknown&) = delete;

    /// A null @p out gives acfInvalidArgument.
    acfResult ACF_CALL QueryInterface(const _acfUID& type, IACFUnknown** out) override;
    /// The new count; 0 for a static object.
    std::uint32_t ACF_CALL AddRef() override;
    std::uint32_t ACF_CALL Release() override;

protected:
    /// A counted object starts with the one reference of its maker. A static one is never counted nor destroyed.
    constexpr explicit _cACFUnknown(bool counted) noexcept : m_count(counted ? 1 : 0) {}
    ~_cACFUnknown() = default;

    /// Ends the object and frees it; called when the last reference went. References that its destructor adds and
    /// releases do not count any more.
    virtual void destroy() = 0;
    /// The object's interface @p type, not referenced, or null. Here this base itself, for IACFUnknown and
    /// IACFComponent.
    virtual IACFUnknown* _queryinterface(const _acfUID& type);

    std::uint32_t _addRef() noexcept {
        // Only who holds a reference may ask, so a count that is 0 stays 0.
        if (m_count.load(std::memory_order_relaxed) == 0) return 0;
        return static_cast<std::uint32_t>(m_count.fetch_add(1) + 1);
    }
    std::uint32_t _release() noexcept {
        if (m_count.load(std::memory_order_relaxed) == 0) return 0;
        const std::int32_t left = m_count.fetch_sub(1) - 1;
        if (left == 0) End();
        return static_cast<std::uint32_t>(left);
    }
    /// The interface with a reference for the caller, or null.
    IACFUnknown* _queryinterfaceadd(const _acfUID& type);

private:
    void End() noexcept;

    std::atomic<std::int32_t> m_count; // 0: static, or being destroyed
};

/// A component of class @p Component with the interfaces @p Interfaces, each one of them known to acfTypeOf:
///
///     class CCounter final : public CComponent<CCounter, ICounter> { ... };
///     CPIACFUnknown MakeCounter(const _acfUID&) { return CCounter::Make(); }
///
/// Its memory is the library's; its code must stay loaded until the last reference went.
template <class Component, class... Interfaces> class CComponent : public _cACFUnknown, public Interfaces... {
public:
    /// A new object in a wrapper; empty without memory or when the constructor throws.
    template <class... Arguments> static CPIACFUnknown Make(Arguments&&... arguments) noexcept {
        static_assert(alignof(Component) <= 16, "the heap aligns to 16");
        void* const memory = Core::OS::_falloc(sizeof(Component));
        if (!memory) return {};
        Component* made;
        try {
            made = ::new (memory, acfDebugFull) Component(std::forward<Arguments>(arguments)...);
        } catch (...) {
            Core::OS::_ffree(memory);
            return {};
        }
        CPIACFUnknown held(static_cast<_cACFUnknown*>(made));
        made->Release();
        return held;
    }

    acfResult ACF_CALL QueryInterface(const _acfUID& type, IACFUnknown** out) override {
        IACFUnknown* const found = out ? Find(type) : nullptr;
        if (!found) return _cACFUnknown::QueryInterface(type, out);
        _addRef();
        *out = found;
        return acfOk;
    }
    std::uint32_t ACF_CALL AddRef() override { return _addRef(); }
    std::uint32_t ACF_CALL Release() override { return _release(); }

protected:
    /// Not @p counted: a static object.
    constexpr explicit CComponent(bool counted = true) noexcept : _cACFUnknown(counted) {}
    ~CComponent() = default;

    void destroy() override {
        Component* const self = static_cast<Component*>(this);
        self->~Component();
        Core::OS::_ffree(self);
    }
    /// For interfaces beyond those of the list; call this one for what is not yours.
    IACFUnknown* _queryinterface(const _acfUID& type) override {
        IACFUnknown* const found = Find(type);
        return found ? found : _cACFUnknown::_queryinterface(type);
    }

private:
    IACFUnknown* Find(const _acfUID& type) noexcept {
        IACFUnknown* found = nullptr;
        const bool answered[] = {
            (!found && acfIsSame(type, acfTypeOf<Interfaces>::uid) && (found = static_cast<Interfaces*>(this)))...};
        static_cast<void>(answered);
        if (!found && acfIsSame(type, acfTypeOf<IACFUnknown>::uid)) found = static_cast<_cACFUnknown*>(this);
        return found;
    }
};

/// Base of static class factories: objects that create those of one class, and are not counted themselves.
class TAVO_API _csFactory : public IACFClassFactory {
public:
    _csFactory(const _csFactory&) = delete;
    _csFactory& operator=(const _csFactory&) = delete;

    /// Itself, for IACFUnknown and IACFClassFactory.
    acfResult ACF_CALL QueryInterface(const _acfUID& type, IACFUnknown** out) override;
    /// Always 2.
    std::uint32_t ACF_CALL AddRef() override;
    /// Always 0.
    std::uint32_t ACF_CALL Release() override;
    /// @p outer must be null: acfNoAggregation. acfClassNotAvailable when the class cannot be created.
    acfResult ACF_CALL CreateInstance(IACFUnknown* framework, IACFUnknown* outer, const _acfUID& type,
                                      IACFUnknown** out) override;

protected:
    constexpr _csFactory() noexcept = default;
    ~_csFactory() = default;

    /// Creates an object and writes its interface @p type, with a reference. False when that cannot be; an exception is
    /// the same.
    virtual bool Create(const _acfUID& type, IACFUnknown** out) = 0;
};

} // namespace ACF
} // namespace TAVO
