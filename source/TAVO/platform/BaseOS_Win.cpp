// Windows: process facts, configuration, diagnostics, clocks, code page and threads.

#define _CRT_RAND_S // for rand_s

#include "platform.h"

#include <atomic>
#include <clocale>
#include <cstdlib>
#include <cstring>
#include <windows.h>

namespace TAVO::Platform {

namespace {

HMODULE FindOwnModule() {
    HMODULE module = nullptr;
    GetModuleHandleExW(GET_MODULE_HANDLE_EX_FLAG_FROM_ADDRESS | GET_MODULE_HANDLE_EX_FLAG_UNCHANGED_REFCOUNT,
                       reinterpret_cast<LPCWSTR>(&FindOwnModule), &module);
    return module;
}

constexpr std::uint64_t kTicksPerMillisecond = 10000;    // of a file time, which counts 100 ns
constexpr std::uint64_t kUnixEpoch = 116444736000000000; // 1970-01-01 as a file time

std::uint64_t ToTicks(const FILETIME& time) {
    return static_cast<std::uint64_t>(time.dwHighDateTime) << 32 | time.dwLowDateTime;
}

std::uint64_t GetSystemTicks() {
    FILETIME now;
    GetSystemTimeAsFileTime(&now);
    return ToTicks(now);
}

// The high-resolution counter in milliseconds; 0 without one.
std::uint64_t GetCounterMilliseconds() {
    std::int64_t frequency = 0;
    std::int64_t ticks = 0;
    if (!GetCounterFrequency(frequency) || frequency <= 0 || !ReadCounter(ticks)) return 0;
    return static_cast<std::uint64_t>(ticks / frequency * 1000 + ticks % frequency * 1000 / frequency);
}

// How long the process has been running, by the system clock; 0 when unknown.
std::uint64_t GetProcessAge() {
    FILETIME created, ended, kernel, user;
    if (!GetProcessTimes(GetCurrentProcess(), &created, &ended, &kernel, &user)) return 0;
    const std::uint64_t now = GetSystemTicks();
    const std::uint64_t start = ToTicks(created);
    return now > start ? (now - start) / kTicksPerMillisecond : 0;
}

} // namespace

// --- modules and configuration -------------------------------------------------------------------------------------

std::size_t GetModulePath(Module module, wchar_t* buffer, std::size_t capacity, bool& truncated) noexcept {
    truncated = false;
    const HMODULE handle = module == Module::Library ? FindOwnModule() : nullptr;
    const DWORD length = GetModuleFileNameW(handle, buffer, static_cast<DWORD>(capacity));
    if (length < capacity) return length;
    truncated = true;
    buffer[capacity - 1] = 0;
    return capacity - 1;
}

void* HoldLibrary() noexcept {
    HMODULE module = nullptr;
    GetModuleHandleExW(GET_MODULE_HANDLE_EX_FLAG_FROM_ADDRESS, reinterpret_cast<LPCWSTR>(&FindOwnModule), &module);
    return module;
}

void DropLibrary(void* hold) noexcept {
    if (hold) FreeLibrary(static_cast<HMODULE>(hold));
}

std::size_t FindConfigurationStem(const wchar_t* libraryPath, std::size_t length) noexcept {
    for (std::size_t at = length; at-- > 0;) {
        if (libraryPath[at] == L'.') return at;
        if (libraryPath[at] == L'\\' || libraryPath[at] == L'/') return 0;
    }
    return 0;
}

int ReadConfigurationInteger(const wchar_t* path, const wchar_t* section, const wchar_t* key) noexcept {
    return static_cast<int>(GetPrivateProfileIntW(section, key, 0, path));
}

// --- debugger and message box --------------------------------------------------------------------------------------

bool IsDebuggerAttached() noexcept { return IsDebuggerPresent() != FALSE; }

void WriteDebuggerOutput(const char* text) noexcept {
    if (text) OutputDebugStringA(text);
}

void WriteDebuggerOutput(const wchar_t* text) noexcept {
    if (text) OutputDebugStringW(text);
}

bool AskOkCancel(const char* caption, const char* text) noexcept {
    // The box pumps the thread's messages, and with them runs code of the host, which may throw.
    try {
        return MessageBoxA(nullptr, text, caption, MB_OKCANCEL | MB_SYSTEMMODAL) == IDCANCEL;
    } catch (...) {
        return true;
    }
}

// --- clocks --------------------------------------------------------------------------------------------------------

std::uint64_t GetUtcMilliseconds() noexcept { return (GetSystemTicks() - kUnixEpoch) / kTicksPerMillisecond; }

std::uint64_t GetProcessMilliseconds() noexcept {
    // The counter's value at the start of the process; negative when the counter began later than the process.
    static constinit std::atomic<std::int64_t> g_start{INT64_MIN};
    const auto now = static_cast<std::int64_t>(GetCounterMilliseconds());
    std::int64_t start = g_start;
    if (start == INT64_MIN) {
        const std::int64_t found = now - static_cast<std::int64_t>(GetProcessAge());
        if (g_start.compare_exchange_strong(start, found)) start = found;
    }
    return now > start ? static_cast<std::uint64_t>(now - start) : 0;
}

bool GetCounterFrequency(std::int64_t& ticksPerSecond) noexcept {
    LARGE_INTEGER frequency;
    if (!QueryPerformanceFrequency(&frequency)) return false;
    ticksPerSecond = frequency.QuadPart;
    return true;
}

bool ReadCounter(std::int64_t& ticks) noexcept {
    LARGE_INTEGER counter;
    if (!QueryPerformanceCounter(&counter)) return false;
    ticks = counter.QuadPart;
    return true;
}

// --- chance --------------------------------------------------------------------------------------------------------

bool FillRandom(void* target, std::size_t size) noexcept {
    for (auto* at = static_cast<unsigned char*>(target); size;) {
        unsigned word; // rand_s asks the system's generator, not the C library's
        if (rand_s(&word) != 0) return false;
        const std::size_t some = size < sizeof word ? size : sizeof word;
        std::memcpy(at, &word, some);
        at += some;
        size -= some;
    }
    return true;
}

// --- code page -----------------------------------------------------------------------------------------------------

int AnsiToWide(const char* source, int length, wchar_t* target, int capacity) noexcept {
    if (!source || length == 0 || capacity < 0) return 0;
    return MultiByteToWideChar(CP_ACP, 0, source, length < 0 ? -1 : length, target, capacity);
}

int WideToAnsi(const wchar_t* source, int length, char* target, int capacity) noexcept {
    if (!source || length == 0 || capacity < 0) return 0;
    return WideCharToMultiByte(CP_ACP, 0, source, length < 0 ? -1 : length, target, capacity, nullptr, nullptr);
}

wchar_t GetDecimalPoint() noexcept {
    wchar_t point[2];
    return AnsiToWide(localeconv()->decimal_point, -1, point, 2) == 2 ? point[0] : L'.';
}

// --- memory ----------------------------------------------------------------------------------------------------------

bool IsReadable(const void* address) noexcept {
    MEMORY_BASIC_INFORMATION info;
    if (VirtualQuery(address, &info, sizeof info) == 0) return false;
    return info.State == MEM_COMMIT && (info.Protect & (PAGE_NOACCESS | PAGE_GUARD)) == 0;
}

// --- threads -------------------------------------------------------------------------------------------------------

std::uint32_t GetThreadId() noexcept { return GetCurrentThreadId(); }

std::uint64_t GetSystemThread() noexcept { return GetCurrentThreadId(); }
bool HasThreadEnded(std::uint64_t thread) noexcept {
    const HANDLE handle = OpenThread(SYNCHRONIZE, FALSE, static_cast<DWORD>(thread));
    if (!handle) return GetLastError() == ERROR_INVALID_PARAMETER; // no thread has that number
    const bool ended = WaitForSingleObject(handle, 0) == WAIT_OBJECT_0;
    CloseHandle(handle);
    return ended;
}

int GetThreadPriority() noexcept {
    const int priority = ::GetThreadPriority(GetCurrentThread());
    return priority == THREAD_PRIORITY_ERROR_RETURN ? THREAD_PRIORITY_NORMAL : priority;
}

void SetThreadPriority(int priority) noexcept { ::SetThreadPriority(GetCurrentThread(), priority); }

void MarkOwnThread() noexcept {}
bool IsOwnThread() noexcept { return true; }

namespace {

// The slot of the release scope. Taken by whoever needs it first, since static constructors of others may be earlier
// than ours; given back when the library is unloaded, or hosts that load and unload it all day would use up the
// process's slots.
constinit std::atomic<DWORD> g_scopeSlot{TLS_OUT_OF_INDEXES};

DWORD TakeScopeSlot() {
    const DWORD taken = TlsAlloc();
    DWORD slot = TLS_OUT_OF_INDEXES;
    if (g_scopeSlot.compare_exchange_strong(slot, taken)) return taken;
    if (taken != TLS_OUT_OF_INDEXES) TlsFree(taken);
    return slot;
}

DWORD GetScopeSlot() {
    const DWORD slot = g_scopeSlot.load(std::memory_order_acquire);
    return TAVO_LIKELY(slot != TLS_OUT_OF_INDEXES) ? slot : TakeScopeSlot();
}

// The first of the library's static objects, and so the last to be destroyed: the others may still release memory.
struct ScopeSlotOwner {
    ~ScopeSlotOwner() {
        const DWORD slot = g_scopeSlot.exchange(TLS_OUT_OF_INDEXES);
        if (slot != TLS_OUT_OF_INDEXES) TlsFree(slot);
    }
};
__attribute__((init_priority(101))) ScopeSlotOwner g_scopeSlotOwner;

} // namespace

void* GetReleaseScope() noexcept { return TlsGetValue(GetScopeSlot()); }
void SetReleaseScope(void* scope) noexcept { TlsSetValue(GetScopeSlot(), scope); }

// Wine has the function, but up to version 8 it does nothing.
bool CanFlushProcessors() noexcept { return !GetProcAddress(GetModuleHandleW(L"ntdll"), "wine_get_version"); }
void FlushProcessors() noexcept { FlushProcessWriteBuffers(); }

void YieldThread() noexcept { SwitchToThread(); }
void SleepMilliseconds(std::uint32_t milliseconds) noexcept { Sleep(milliseconds); }

namespace {

SRWLOCK* AsLock(std::uint64_t* storage) { return reinterpret_cast<SRWLOCK*>(storage); }
static_assert(sizeof(SRWLOCK) <= sizeof(std::uint64_t[5]));

} // namespace

void Mutex::lock() noexcept { AcquireSRWLockExclusive(AsLock(m_storage)); }
bool Mutex::try_lock() noexcept { return TryAcquireSRWLockExclusive(AsLock(m_storage)) != FALSE; }
void Mutex::unlock() noexcept { ReleaseSRWLockExclusive(AsLock(m_storage)); }

} // namespace TAVO::Platform
