#pragma once
// What the library fixes when it is loaded, and the place where its services start and stop.

#include "platform/platform.h"

#include <atomic>

namespace TAVO {

// The diagnostics that the configuration file switches on; all off without it.
struct Switches {
    bool assertBox = false;        // assertions show a box
    bool logFailedHResult = false; // negative result codes write a trace line
    bool breakOnHResult = false;   // negative result codes raise an assertion
};

constexpr std::size_t kModulePathUnits = 260; // room for a module's path, terminator included
constexpr std::size_t kFactUnits = 260;       // the longest process fact, terminator excluded

struct ProcessFacts {
    wchar_t processName[kFactUnits + 1] = {};
    wchar_t startupPath[kFactUnits + 1] = {};
};

// Derives the facts from the executable's path. False, facts unchanged, when the path is empty or holds no separator.
bool DeriveProcessFacts(const wchar_t* executablePath, ProcessFacts& facts) noexcept;

// Puts ".ini" in the place of the extension of the library's path, in a buffer of kModulePathUnits.
// False when the path has no extension or leaves no room.
bool MakeConfigurationPath(wchar_t* libraryPath, std::size_t length) noexcept;

// The load step: reads the configuration and fixes the process facts. Called once by the platform's entry point, under
// the loader's lock and before anything else of the library. False makes the library unusable.
bool OnLoad() noexcept;

// The process is about to end: other threads were stopped wherever they stood, so no lock may be taken any more.
void OnProcessEnd() noexcept;
bool IsProcessEnding() noexcept;

// Fixed by OnLoad, read-only afterwards. Tests of the library's own may write.
extern Switches g_switches;

// Held while services start or stop, so that a stop and a start never interleave.
extern Platform::Mutex g_lifecycleMutex;

// What the counted start and stop work on. A thread of the services' own must not wait for its own end, so for it the
// stop is only asked for; the next start or stop brings it to its end.
struct Services {
    bool (*start)() noexcept;
    void (*stop)() noexcept;
    bool (*isOwnThread)() noexcept;
    void (*askToStop)() noexcept;
};

// Counts starts and stops: the call that raises the count to 1 starts, the one that brings it back to 0 stops, both
// under g_lifecycleMutex. Every other call only counts and returns at once, possibly before a start is through. Any
// thread.
class CountedServices {
public:
    constexpr explicit CountedServices(const Services& services) : m_services(services) {}

    // True when the services run or are being started by another call; false when starting failed, the count stays
    // raised.
    bool Enter() noexcept;
    void Leave() noexcept;

private:
    std::atomic<std::uint32_t> m_count{0};
    Services m_services;
};

// Starts the process-wide services in their order; false when one did not start, those before it stay started.
// Requires: g_lifecycleMutex held.
bool StartServices() noexcept;
// Stops them in the opposite order. Requires: g_lifecycleMutex held.
void StopServices() noexcept;

} // namespace TAVO
