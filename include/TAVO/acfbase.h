#pragma once
// The component framework as this library needs it: identifiers, result codes and seven interfaces.
//
// Binary rules, so that modules of different compilers meet here safely (x86-64):
// - the virtual table is the operations in the order written, base first; no virtual destructor, no overloads
//   (some compilers reverse them), single inheritance between interfaces, no member data;
// - operations take and return numbers and pointers only, and let no exception out;
// - an out pointer is written on every path: null unless the result is acfOk. The caller owns one reference to what it
// gets.
#include <cstddef>
#include <cstdint>
#include <cstring>

#if defined(_WIN32)
#define ACF_CALL __stdcall // the one convention of x86-64; named for the reader
#else
#define ACF_CALL
#endif

// Levels of the log; the label printed for each is fixed.
enum _acfDebugLevel : std::int32_t {
    acfDebugFull = -1,
    acfDebugError = 1,
    acfDebugWarning = 2,
    acfDebugVerbose = 4,
    acfDebugTrace = 8,
    acfDebugInfo = 16
};

// 16-byte identifier of an interface, class, category, vendor or module. All zero names nothing.
struct _acfUID {
    std::uint32_t Data1;
    std::uint16_t Data2, Data3;
    std::uint8_t Data4[8];
};
static_assert(sizeof(_acfUID) == 16 && alignof(_acfUID) == 4, "identifiers are exchanged as 16 raw bytes");

// Whether two identifiers are the same 16 bytes; never compared by address, since modules may have copies of their own.
inline bool acfIsSame(_acfUID const& first, _acfUID const& second) {
    return std::memcmp(&first, &second, sizeof(_acfUID)) == 0;
}

// Result code: negative is failure.
using acfResult = std::int32_t;
constexpr acfResult acfOk = 0;
constexpr acfResult acfEnd = 1;                         // an enumeration has nothing more
constexpr acfResult acfFail = -2147467259;              // 0x80004005
constexpr acfResult acfInvalidArgument = -2147483645;   // 0x80000003
constexpr acfResult acfNoInterface = -2147483644;       // 0x80000004
constexpr acfResult acfNoAggregation = -2147221232;     // 0x80040110
constexpr acfResult acfClassNotAvailable = -2147221231; // 0x80040111

// acfTypeOf<I>::uid is the identifier of interface I.
template <class I> struct acfTypeOf;

// Base of every interface. A reference is owned by whoever AddRef'd or was handed it; thread-safe counting.
struct IACFUnknown {
    virtual acfResult ACF_CALL QueryInterface(_acfUID const& type, IACFUnknown** out) = 0; // adds a reference to *out
    virtual std::uint32_t ACF_CALL AddRef() = 0;                                           // the new count
    virtual std::uint32_t ACF_CALL Release() = 0;                                          // the new count; 0: gone

protected:
    ~IACFUnknown() = default; // only through Release
};

// Marker answered by every component built on the library's base; no operations of its own.
struct IACFComponent : IACFUnknown {};

// The host's way to create components. outer is reserved for aggregation and must be null.
struct IACFComponentFactory : IACFUnknown {
    // The one shared object of the class, kept by the factory until it is trimmed.
    virtual acfResult ACF_CALL CreateComponent(_acfUID const& cls, IACFUnknown* outer, _acfUID const& type,
                                               IACFUnknown** out) = 0;
    // A new object of the class.
    virtual acfResult ACF_CALL CreateInstance(_acfUID const& cls, IACFUnknown* outer, _acfUID const& type,
                                              IACFUnknown** out) = 0;
};

// Creates objects of one class.
struct IACFClassFactory : IACFUnknown {
    virtual acfResult ACF_CALL CreateInstance(IACFUnknown* framework, IACFUnknown* outer, _acfUID const& type,
                                              IACFUnknown** out) = 0;
};

// What a definition tells about its class.
enum eACFDefinitionId : std::uint32_t { acfIdClass, acfIdCategory, acfIdVendor, acfIdModule, acfIdInterface };
enum eACFDefinitionText : std::uint32_t { acfTextNames, acfTextVendor, acfTextModule };

// Describes one class.
struct IACFDefinition : IACFUnknown {
    virtual acfResult ACF_CALL GetIdentifier(eACFDefinitionId which,
                                             _acfUID* out) = 0; // null identifier when not given
    // Writes at most capacity units, terminator included; *needed (may be null) gets the units the whole text takes
    // with it. acfOk only when all fitted; capacity 0 with a null buffer asks for the length and answers acfEnd.
    virtual acfResult ACF_CALL GetText(eACFDefinitionText which, wchar_t* buffer, std::uint64_t capacity,
                                       std::uint64_t* needed) = 0;
};

// A fixed list, taken when the enumeration was made: classes that register later do not appear.
struct IACFEnumDefinitions : IACFUnknown {
    virtual acfResult ACF_CALL Next(IACFDefinition** out) = 0; // acfEnd with null after the last
    virtual acfResult ACF_CALL Reset() = 0;
    virtual std::uint32_t ACF_CALL GetCount() = 0;
};

// The list of known classes; offered by the library over its class registry and by a host over all modules.
struct IACFDefinitionRegistry : IACFUnknown {
    virtual acfResult ACF_CALL EnumDefinitions(_acfUID const& category,
                                               IACFEnumDefinitions** out) = 0; // null category: all
    virtual acfResult ACF_CALL FindDefinition(_acfUID const& cls, IACFDefinition** out) = 0;
    virtual acfResult ACF_CALL FindClass(wchar_t const* name, _acfUID* cls) = 0; // by one of its names, any case
};

#define ACF_TYPE(I, a, b, c, d, e, f, g, h, i, j, k)                                                                   \
    template <> struct acfTypeOf<I> { static constexpr _acfUID uid = {a, b, c, {d, e, f, g, h, i, j, k}}; }
ACF_TYPE(IACFUnknown, 0x05553443, 0xC85A, 0x4675, 0xA9, 0x29, 0x59, 0xBC, 0xD6, 0xD1, 0x38, 0xF1);
ACF_TYPE(IACFComponent, 0x8AD36F5B, 0x30F8, 0x47D8, 0xB7, 0x8C, 0xEA, 0x35, 0xDD, 0x8A, 0xC0, 0x2D);
ACF_TYPE(IACFComponentFactory, 0x6162FBE4, 0x2102, 0x4EBF, 0x95, 0xD4, 0x77, 0x21, 0x18, 0x8F, 0x6C, 0x21);
ACF_TYPE(IACFClassFactory, 0x51FC4D53, 0x6508, 0x41FA, 0x82, 0x60, 0x3F, 0x38, 0x2F, 0xC6, 0x75, 0x3F);
ACF_TYPE(IACFDefinition, 0x15EC3279, 0x6C5C, 0x48F6, 0x92, 0xE0, 0xD4, 0x98, 0x33, 0x1A, 0xC3, 0x84);
ACF_TYPE(IACFEnumDefinitions, 0xB2317C23, 0x147D, 0x44C4, 0x85, 0x01, 0xED, 0xC9, 0x62, 0x20, 0xA1, 0xC5);
ACF_TYPE(IACFDefinitionRegistry, 0xEE590980, 0x68B6, 0x4B02, 0xAB, 0xEC, 0xD0, 0x6D, 0xFB, 0x67, 0xA9, 0x10);
#undef ACF_TYPE
