#pragma once
// What the library needs of the machine, once for both systems. The build picks the Windows or the POSIX sources of
// this folder; nothing above this folder asks which system it is.
//
// No function here throws. Paths and texts are 16-bit units, zero-terminated.

#include <cstddef>
#include <cstdint>
#include <TAVO/config.h>

namespace TAVO::Platform {

// --- heap (heap.h has the counted front that the library calls) ---------------------------------------------------

// Size 0 gives a block; blocks are aligned to 16; null when the system refuses.
void* HeapAllocate(std::size_t size) noexcept;
// Null gives null; size 0 keeps a block; null when refused, the old block then stays valid.
void* HeapResize(void* block, std::size_t size) noexcept;
// Null is ignored.
void HeapRelease(void* block) noexcept;
// Asks a heap that can be asked to give back to the system what the calling thread allocated and nobody needs any more.
// For now and then: it looks at every page of the thread's.
void HeapTrim() noexcept;

// --- modules and configuration -------------------------------------------------------------------------------------

enum class Module { Library, Executable };

// The module's path, cut to `capacity` units terminator included. 0 when unknown; `truncated` tells a cut path.
std::size_t GetModulePath(Module module, wchar_t* buffer, std::size_t capacity, bool& truncated) noexcept;

// Takes a reference on the library's own module, so that it stays mapped while a thread of its own runs. Null when
// refused.
void* HoldLibrary() noexcept;
// Gives the reference back; null is ignored. Not on a thread whose code it keeps mapped.
void DropLibrary(void* hold) noexcept;

// The length of the library's path without the extension, which the configuration file's ".ini" replaces; 0 when the
// file name has none. POSIX: version digits behind ".so" go too, so that an upgrade keeps its settings.
std::size_t FindConfigurationStem(const wchar_t* libraryPath, std::size_t length) noexcept;

// The integer at `key` of `section`, 0 when the file, the section or the key is missing. Section and key are ASCII and
// ignore case. "-5" and "0x10" are numbers, "12ab" is 12, "ab" is 0.
int ReadConfigurationInteger(const wchar_t* path, const wchar_t* section, const wchar_t* key) noexcept;

// --- debugger and message box --------------------------------------------------------------------------------------

// POSIX: a tracer; looked up at most once a second.
bool IsDebuggerAttached() noexcept;
// Null is ignored. POSIX: standard error as UTF-8, only while a tracer is attached.
void WriteDebuggerOutput(const char* text) noexcept;
void WriteDebuggerOutput(const wchar_t* text) noexcept;

// Shows a system-modal box with OK and Cancel; true when the user cancelled. POSIX: answers OK.
bool AskOkCancel(const char* caption, const char* text) noexcept;

// --- clocks --------------------------------------------------------------------------------------------------------

// Milliseconds since 1970-01-01 00:00 UTC.
std::uint64_t GetUtcMilliseconds() noexcept;
// Monotonic milliseconds since the process started; where the system does not tell its start, since the first call.
std::uint64_t GetProcessMilliseconds() noexcept;
// The high-resolution counter and its ticks per second; false when the system fails to tell.
bool GetCounterFrequency(std::int64_t& ticksPerSecond) noexcept;
bool ReadCounter(std::int64_t& ticks) noexcept;

// --- chance --------------------------------------------------------------------------------------------------------

// Fills the bytes from the system's generator of unpredictable numbers; false when it gives none.
bool FillRandom(void* target, std::size_t size) noexcept;

// --- code page -----------------------------------------------------------------------------------------------------

// The call protocol of MultiByteToWideChar and WideCharToMultiByte with the ANSI code page: length -1 (any negative
// one) means up to and including the terminator, capacity 0 asks for the size, 0 is failure. POSIX: the code page is
// UTF-8.
int AnsiToWide(const char* source, int length, wchar_t* target, int capacity) noexcept;
int WideToAnsi(const wchar_t* source, int length, char* target, int capacity) noexcept;

// The decimal point of the process's locale; '.' where it is not one character of 16 bits.
wchar_t GetDecimalPoint() noexcept;

// --- memory ----------------------------------------------------------------------------------------------------------

// Whether the byte at `address` can be read now. For the one scan that must survive a bad pointer; costs a system call.
bool IsReadable(const void* address) noexcept;
constexpr std::size_t PageSize = 4096;

// --- threads -------------------------------------------------------------------------------------------------------

// Identifies the calling thread among all that live; never 0. Locks ask on every call, so POSIX answers without one.
#if defined(_WIN32)
std::uint32_t GetThreadId() noexcept;
#else
extern constinit thread_local std::uint32_t t_id __attribute__((tls_model("initial-exec"))); // 0: none taken yet
std::uint32_t TakeThreadId() noexcept;
inline std::uint32_t GetThreadId() noexcept { return TAVO_LIKELY(t_id != 0) ? t_id : TakeThreadId(); }
#endif

// The system's own name of the calling thread, and whether the thread of that name has ended. A name that was given
// again counts as that of a living thread.
std::uint64_t GetSystemThread() noexcept;
bool HasThreadEnded(std::uint64_t thread) noexcept;

// The calling thread's priority in the system's words (0 normal, -15 idle, 15 time critical). POSIX: the level that was
// last set here, since an ordinary user's thread could not be raised again.
int GetThreadPriority() noexcept;
void SetThreadPriority(int priority) noexcept;

// Whether the library started the calling thread, which says so itself. Only there may an interruption be let out.
// Windows: true, since Boost is part of the library there and knows no other threads to interrupt.
void MarkOwnThread() noexcept;
bool IsOwnThread() noexcept;

// One pointer per thread, null at first: the thread's current release scope (object memory). Where the system has no
// slot left, it stays null.
void* GetReleaseScope() noexcept;
void SetReleaseScope(void* scope) noexcept;

// Makes every running thread of the process pass a full memory barrier, so that one side of a protocol can do without.
// CanFlushProcessors prepares it, and tells whether the system offers it. Costs some microseconds.
bool CanFlushProcessors() noexcept;
void FlushProcessors() noexcept;

// Gives up the processor, or sleeps.
void YieldThread() noexcept;
void SleepMilliseconds(std::uint32_t milliseconds) noexcept;

// A lock that is ready before any constructor has run and is never destroyed. Not recursive.
class Mutex {
public:
    constexpr Mutex() noexcept = default;
    Mutex(const Mutex&) = delete;
    Mutex& operator=(const Mutex&) = delete;
    void lock() noexcept; // names of the standard, for std::lock_guard
    bool try_lock() noexcept;
    void unlock() noexcept;

private:
    std::uint64_t m_storage[5] = {}; // the system's lock, whose initial state is all zero
};

} // namespace TAVO::Platform
