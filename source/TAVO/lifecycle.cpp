// The load step, the process facts and the counted start and stop of the services.

#include "lifecycle.h"

#include "classregistry.h"
#include "maintenance.h"
#include "poolentry.h"
#include "poolmaintenance.h"

#include <mutex>
#include <TAVO/core.h>
#include <TAVO/develop.h>

namespace TAVO {

constinit Switches g_switches;
constinit Platform::Mutex g_lifecycleMutex;

namespace {

constinit ProcessFacts g_facts;
constinit std::atomic<bool> g_loaded{false};
constinit std::atomic<bool> g_processEnding{false};

bool IsSeparator(wchar_t unit) { return unit == L'/' || unit == L'\\'; }

const wchar_t* FindLastSeparator(const wchar_t* path) {
    const wchar_t* last = nullptr;
    for (; *path; ++path)
        if (IsSeparator(*path)) last = path;
    return last;
}

// Copies at most `most` units, stops at the terminator, and terminates.
void CopyText(wchar_t* target, const wchar_t* source, std::size_t most) {
    for (; most && *source; --most) *target++ = *source++;
    *target = 0;
}

void ReadConfiguration() {
    wchar_t path[kModulePathUnits];
    bool truncated = false;
    const std::size_t length = Platform::GetModulePath(Platform::Module::Library, path, kModulePathUnits, truncated);
    if (length == 0 || truncated) return; // a cut path would name another file
    if (!MakeConfigurationPath(path, length)) return;

    constexpr const wchar_t* kSection = L"Debug";
    g_switches.assertBox = Platform::ReadConfigurationInteger(path, kSection, L"AssertBox") != 0;
    g_switches.logFailedHResult = Platform::ReadConfigurationInteger(path, kSection, L"LogFailedHRESULT") != 0;
    g_switches.breakOnHResult = Platform::ReadConfigurationInteger(path, kSection, L"BreakOnHRESULT") != 0;
}

// Builds the library's process-wide objects and takes them down, in this one place and order. While the process ends on
// a system that has killed its other threads by then, nothing is touched; elsewhere a forgotten maintenance thread is
// given a moment to end, and where it does not, it may go on using everything.
struct ProcessWide {
    ProcessWide() { Maintenance::Load(); }
    ~ProcessWide() {
        if (IsProcessEnding() || !Maintenance::Unload(kMostMillisecondsToEnd)) return;
        String::pool::DropMaintenance();
        ACF::classes::Unload(); // its records hold pooled strings
        String::pool::Unload();
    }

    static constexpr std::uint32_t kMostMillisecondsToEnd = 2000;
} g_processWide;

} // namespace

bool MakeConfigurationPath(wchar_t* libraryPath, std::size_t length) noexcept {
    constexpr wchar_t kExtension[] = L".ini";
    const std::size_t stem = Platform::FindConfigurationStem(libraryPath, length);
    if (stem == 0 || stem + std::size(kExtension) > kModulePathUnits) return false;
    CopyText(libraryPath + stem, kExtension, std::size(kExtension));
    return true;
}

bool DeriveProcessFacts(const wchar_t* executablePath, ProcessFacts& facts) noexcept {
    const wchar_t* separator = FindLastSeparator(executablePath);
    if (!separator) return false;
    CopyText(facts.processName, separator + 1, kFactUnits);

    // Intended (startup-path): as many units as lead up to the separator, but copied from the separator on. A textbook
    // would copy the folder from the start of the path; hosts have stored and compare this text.
    const auto folderUnits = static_cast<std::size_t>(separator - executablePath) + 1;
    CopyText(facts.startupPath, separator, folderUnits < kFactUnits ? folderUnits : kFactUnits);
    for (wchar_t* unit = facts.startupPath; *unit; ++unit)
        if (*unit == L'\\') *unit = L'/';
    return true;
}

bool OnLoad() noexcept {
    ReadConfiguration();
    Platform::GetProcessMilliseconds(); // fixes the clock's zero before anyone asks
    wchar_t path[kModulePathUnits];
    bool truncated = false; // of no matter here: the units that fitted give the facts
    if (Platform::GetModulePath(Platform::Module::Executable, path, kModulePathUnits, truncated) == 0) return false;
    if (!DeriveProcessFacts(path, g_facts)) return false;
    g_loaded = true;
    return true;
}

void OnProcessEnd() noexcept { g_processEnding = true; }
bool IsProcessEnding() noexcept { return g_processEnding; }

bool StartServices() noexcept {
    if (!g_loaded) return false; // a load that failed and could not be refused shows here
    if (Maintenance::IsStopPending()) StopServices();
    return Maintenance::Start() && String::pool::StartMaintenance();
}

void StopServices() noexcept {
    String::pool::StopMaintenance();
    Maintenance::Stop();
}

bool CountedServices::Enter() noexcept {
    for (;;) {
        std::uint32_t count = m_count;
        if (count != 0) {
            // Intended (failed-start-counts): this also counts on after a failed start, whose count stays raised, and
            // then answers true without trying again. A textbook would take the failed call back; hosts pair every call
            // with one AppExit.
            if (m_count.compare_exchange_weak(count, count + 1)) return true;
            continue;
        }
        if (m_services.isOwnThread()) {
            if (m_count.compare_exchange_weak(count, 1)) return false;
            continue;
        }
        const std::lock_guard lock(g_lifecycleMutex);
        if (m_count.compare_exchange_strong(count, 1)) return m_services.start();
    }
}

void CountedServices::Leave() noexcept {
    for (;;) {
        std::uint32_t count = m_count;
        if (count != 1) {
            // Intended (exit-wraps): from 0 the count wraps, so that the next AppInit does not reach 1 and starts
            // nothing. A textbook would refuse; the count is the host's promise of pairs and is taken as it comes.
            if (m_count.compare_exchange_weak(count, count - 1)) return;
            continue;
        }
        if (m_services.isOwnThread()) {
            if (m_count.compare_exchange_weak(count, 0)) return m_services.askToStop();
            continue;
        }
        const std::lock_guard lock(g_lifecycleMutex);
        if (m_count.compare_exchange_strong(count, 0)) return m_services.stop();
    }
}

namespace {

constinit CountedServices g_services({StartServices, StopServices, Maintenance::IsOwnThread, Maintenance::AskToStop});

} // namespace

bool AppInit() {
    const bool running = g_services.Enter();
    return running && g_loaded;
}

void AppExit() { g_services.Leave(); }

namespace Develop {

tagSWITCHES GetSwitches() noexcept {
    return {g_switches.assertBox, g_switches.logFailedHResult, g_switches.breakOnHResult};
}

} // namespace Develop

namespace Core::OS {

unsigned long long GetTimeNow() { return Platform::GetUtcMilliseconds(); }
// Intended (platform-name): on every system; hosts compare it.
const wchar_t* GetPlatformString() { return L"Windows"; }
const wchar_t* GetProcessName() { return g_facts.processName; }
const wchar_t* GetStartupPath() { return g_facts.startupPath; }

} // namespace Core::OS
} // namespace TAVO
