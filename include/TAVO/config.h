#pragma once
// The version, and marks of compilers and platforms: the one header that may name compilers. Everything else is plain
// C++.

#include <cstddef>
#include <cstdint>

/// The version of the library that these headers belong to; the build takes its own from here. Hosts and plug-ins of
/// one process must agree in the first number.
#define TAVO_VERSION "1.0.0"

#if defined(_WIN32)
#define TAVO_EXPORT __declspec(dllexport)
#define TAVO_IMPORT __declspec(dllimport)
#else
#define TAVO_EXPORT __attribute__((visibility("default")))
#define TAVO_IMPORT __attribute__((visibility("default")))
#endif

// TAVO_API marks what the library exports; it stands between "class" and the name.
// TAVO_TEMPLATE_DECL and TAVO_TEMPLATE_DEF mark the declaration and the one definition of an exported class template
// instantiation: compilers disagree about which of the two carries the attribute.
#if defined(TAVO_BUILDING)
#define TAVO_API TAVO_EXPORT
#else
#define TAVO_API TAVO_IMPORT
#endif
#if defined(TAVO_BUILDING) && defined(_MSC_VER)
#define TAVO_TEMPLATE_DECL
#define TAVO_TEMPLATE_DEF TAVO_EXPORT
#elif defined(TAVO_BUILDING)
#define TAVO_TEMPLATE_DECL TAVO_EXPORT
#define TAVO_TEMPLATE_DEF
#else
#define TAVO_TEMPLATE_DECL TAVO_IMPORT
#define TAVO_TEMPLATE_DEF
#endif

// For the library's own hot paths. TAVO_NOSANITIZE is for loops that load aligned blocks around the text they may read.
#if defined(_MSC_VER)
#define TAVO_NOINLINE __declspec(noinline)
#define TAVO_INLINE __forceinline
#define TAVO_LIKELY(condition) (condition)
#define TAVO_UNLIKELY(condition) (condition)
#define TAVO_NOSANITIZE
#else
#define TAVO_NOINLINE __attribute__((noinline))
#define TAVO_INLINE inline __attribute__((always_inline))
#define TAVO_LIKELY(condition) __builtin_expect(!!(condition), 1)
#define TAVO_UNLIKELY(condition) __builtin_expect(!!(condition), 0)
#define TAVO_NOSANITIZE __attribute__((no_sanitize("address"), no_sanitize("thread")))
#endif

namespace TAVO {

// "long" of the contract: 32 bits on both platforms. Pass LL and ULL literals or these types where a call overloads.
#if defined(_WIN32)
using long32 = long;
using ulong32 = unsigned long;
#else
using long32 = int;
using ulong32 = unsigned int;
#endif

static_assert(sizeof(long32) == 4 && sizeof(ulong32) == 4, "32-bit numbers on both platforms");
static_assert(sizeof(wchar_t) == 2 && static_cast<wchar_t>(-1) > 0,
              "wide characters have 16 bits: build with -fshort-wchar");
static_assert(sizeof(std::size_t) == 8 && sizeof(void*) == 8, "64-bit targets only");

} // namespace TAVO
