#pragma once
// Start and stop of the library, its allocator, its atomic primitives and the facts about the process.
// Threads: everything here may be called from any thread at any time.

#include <TAVO/acfbase.h>
#include <TAVO/config.h>

namespace TAVO {

/// Starts the process-wide services, counted: the first call starts them, every later call only counts.
/// Allocation, logging, interning and all value types work without it; only background upkeep needs it.
/// @return true when the services run; false when starting them failed. A failed call stays counted, so pair every
/// call,
///         also a failed one, with one AppExit.
TAVO_API bool AppInit();

/// Takes back one AppInit; the call that takes back the first one stops the services.
/// Without a preceding AppInit it wraps the count, after which AppInit answers true without starting anything.
TAVO_API void AppExit();

namespace Core {

/// Compares @p target with @p comparand and stores @p exchange in it when they are equal; a full barrier.
/// @return what @p target held before, whether or not it was exchanged.
TAVO_API std::size_t InterlockedCompareSwapSize_t(std::size_t& target, std::size_t comparand, std::size_t exchange);

/// Stores @p value in @p target atomically; a full barrier.
TAVO_API void InterlockedSet(std::size_t& target, std::size_t value);

namespace OS {

/// Allocates @p size bytes, not zeroed, aligned to 16. Size 0 gives a block too.
/// @return null when the heap refuses; never throws.
TAVO_API void* _falloc(std::size_t size);

/// Gives the block at @p block a new size, moving it if need be. Null gives null; size 0 keeps a (small) block.
/// @return the block, or null when the heap refuses: the old block is then still valid.
TAVO_API void* _frealloc(void* block, std::size_t size);

/// Frees a block of _falloc or _frealloc; null is ignored.
TAVO_API void _ffree(void* block);

/// Adds 1 atomically and returns the new value; a full barrier.
TAVO_API std::uint32_t InterlockedIncrement32(std::uint32_t& value);

/// Subtracts 1 atomically and returns the new value; a full barrier.
TAVO_API std::uint32_t InterlockedDecrement32(std::uint32_t& value);

/// Milliseconds since 1970-01-01 00:00 UTC by the system clock, which may be set while the process runs.
TAVO_API unsigned long long GetTimeNow();

/// Always "Windows": hosts compare it, on every platform.
TAVO_API const wchar_t* GetPlatformString();

/// The executable's file name without its folder. Empty only where the library could not find it out.
TAVO_API const wchar_t* GetProcessName();

/// The startup path: the executable path's last separator followed by the start of the file name, in all as many
/// characters as lie before and at that separator, with '/' for '\'. So C:\Apps\host.exe gives "/host.ex".
/// It is not the executable's folder, and never was; hosts that need the folder ask the system.
TAVO_API const wchar_t* GetStartupPath();

} // namespace OS
} // namespace Core
} // namespace TAVO

// Placement forms that no host operator can replace; the level only selects the overload.
inline void* operator new(std::size_t, void* where, _acfDebugLevel) noexcept { return where; }
inline void operator delete(void*, void*, _acfDebugLevel) noexcept {}
