// Linux: process facts, configuration, diagnostics, clocks, code page and threads.

#include "heap.h"
#include "platform.h"

#include <atomic>
#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <dlfcn.h>
#include <fcntl.h>
#include <langinfo.h>
#include <link.h>
#include <pthread.h>
#include <sched.h>
#include <sys/random.h>
#include <sys/syscall.h>
#include <sys/uio.h>
#include <time.h>
#include <unistd.h>

namespace TAVO::Platform {

namespace {

constexpr std::size_t kPathBytes = 4096;

class File {
public:
    explicit File(const char* path) : m_descriptor(open(path, O_RDONLY | O_CLOEXEC)) {}
    File(const File&) = delete;
    File& operator=(const File&) = delete;
    ~File() {
        if (m_descriptor >= 0) close(m_descriptor);
    }

    // Reads up to `most` bytes; fewer only at the end of the file or on failure.
    std::size_t Read(char* target, std::size_t most) const {
        std::size_t done = 0;
        while (m_descriptor >= 0 && done < most) {
            const ssize_t got = read(m_descriptor, target + done, most - done);
            if (got < 0 && errno == EINTR) continue;
            if (got <= 0) break;
            done += static_cast<std::size_t>(got);
        }
        return done;
    }

private:
    int m_descriptor;
};

// Reads a small file of the process file system as text; false when there is none.
template <std::size_t Size> bool ReadProcessFile(const char* path, char (&text)[Size]) {
    const std::size_t length = File(path).Read(text, Size - 1);
    text[length] = 0;
    return length != 0;
}

std::int64_t ReadClock(clockid_t clock) {
    timespec now{};
    clock_gettime(clock, &now);
    return std::int64_t{now.tv_sec} * 1000000000 + now.tv_nsec;
}

constexpr std::int64_t kNanosecondsPerMillisecond = 1000000;

} // namespace

// --- modules and configuration -------------------------------------------------------------------------------------

namespace {

bool FindLibraryPath(char* path) {
    Dl_info info;
    if (!dladdr(reinterpret_cast<void*>(&GetModulePath), &info) || !info.dli_fname) return false;
    const std::size_t length = std::strlen(info.dli_fname);
    if (length == 0 || length >= kPathBytes) return false;
    std::memcpy(path, info.dli_fname, length + 1);
    return true;
}

bool FindExecutablePath(char* path) {
    const ssize_t length = readlink("/proc/self/exe", path, kPathBytes - 1);
    if (length <= 0) return false;
    path[length] = 0;
    return true;
}

} // namespace

std::size_t GetModulePath(Module module, wchar_t* buffer, std::size_t capacity, bool& truncated) noexcept {
    truncated = false;
    char path[kPathBytes];
    if (!(module == Module::Library ? FindLibraryPath(path) : FindExecutablePath(path))) return 0;
    wchar_t wide[kPathBytes]; // never more units than bytes
    const int units = AnsiToWide(path, -1, wide, static_cast<int>(kPathBytes));
    if (units <= 1 || capacity == 0) return 0;
    std::size_t length = static_cast<std::size_t>(units) - 1;
    truncated = length >= capacity;
    if (truncated) length = capacity - 1;
    std::memcpy(buffer, wide, length * sizeof(wchar_t));
    buffer[length] = 0;
    return length;
}

void* HoldLibrary() noexcept {
    Dl_info info;
    link_map* map = nullptr;
    if (!dladdr1(reinterpret_cast<void*>(&HoldLibrary), &info, reinterpret_cast<void**>(&map), RTLD_DL_LINKMAP))
        return nullptr;
    const char* name = map->l_name && *map->l_name ? map->l_name : nullptr; // the program itself has none
    return dlopen(name, RTLD_NOW | RTLD_NOLOAD);
}

void DropLibrary(void* hold) noexcept {
    if (hold) dlclose(hold);
}

namespace {

bool IsDigit(int unit) { return unit >= '0' && unit <= '9'; }

// The length without one trailing ".12", or the length itself.
std::size_t SkipVersionNumber(const wchar_t* path, std::size_t length) {
    std::size_t at = length;
    while (at > 0 && IsDigit(path[at - 1])) --at;
    return at < length && at > 0 && path[at - 1] == L'.' ? at - 1 : length;
}

bool EndsInSo(const wchar_t* path, std::size_t length) {
    return length > 3 && path[length - 3] == L'.' && path[length - 2] == L's' && path[length - 1] == L'o';
}

} // namespace

std::size_t FindConfigurationStem(const wchar_t* libraryPath, std::size_t length) noexcept {
    std::size_t end = length;
    for (std::size_t shorter; (shorter = SkipVersionNumber(libraryPath, end)) != end;) end = shorter;
    if (!EndsInSo(libraryPath, end)) end = length; // the digits were no library version
    for (std::size_t at = end; at-- > 0;) {
        if (libraryPath[at] == L'.') return at;
        if (libraryPath[at] == L'/') return 0;
    }
    return 0;
}

namespace {

constexpr std::size_t kConfigurationBytes = 65536; // far more than anyone writes; what lies behind is not read

// A stretch of the configuration's text.
struct Span {
    const char* begin;
    const char* end;

    bool IsEmpty() const { return begin == end; }
    char First() const { return IsEmpty() ? '\0' : *begin; }
};

bool IsBlank(char c) { return c == ' ' || c == '\t' || c == '\r' || c == '\v' || c == '\f'; }

Span Trim(Span text) {
    while (!text.IsEmpty() && IsBlank(*text.begin)) ++text.begin;
    while (!text.IsEmpty() && IsBlank(text.end[-1])) --text.end;
    return text;
}

int ToLower(int c) { return c >= 'A' && c <= 'Z' ? c + 32 : c; }

bool EqualsIgnoringCase(Span text, const wchar_t* name) {
    for (; !text.IsEmpty(); ++text.begin, ++name)
        if (ToLower(static_cast<unsigned char>(*text.begin)) != ToLower(*name)) return false; // also at the name's end
    return *name == 0;
}

const char* FindIn(Span text, char wanted) {
    const void* at =
        text.IsEmpty() ? nullptr : std::memchr(text.begin, wanted, static_cast<std::size_t>(text.end - text.begin));
    return at ? static_cast<const char*>(at) : text.end;
}

// Takes the first line off the text.
Span TakeLine(Span& text) {
    const char* end = FindIn(text, '\n');
    const Span line{text.begin, end};
    text.begin = end == text.end ? end : end + 1;
    return Trim(line);
}

unsigned TakeBase(Span& digits) {
    if (digits.end - digits.begin < 2 || digits.begin[0] != '0') return 10;
    unsigned base = 10;
    switch (digits.begin[1]) { // capitals are no prefix on the other system either
    case 'x':
        base = 16;
        break;
    case 'o':
        base = 8;
        break;
    case 'b':
        base = 2;
        break;
    default:
        return 10;
    }
    digits.begin += 2;
    return base;
}

unsigned DigitValue(char c) {
    if (IsDigit(c)) return static_cast<unsigned>(c - '0');
    const int lower = ToLower(static_cast<unsigned char>(c));
    return lower >= 'a' && lower <= 'f' ? static_cast<unsigned>(lower - 'a') + 10 : 99;
}

// Reads up to the first character that is no digit, like the other system's profile functions; overflow wraps.
int ToInteger(Span text) {
    if (text.end - text.begin >= 2 && (text.First() == '"' || text.First() == '\'') && text.end[-1] == text.First())
        text = Trim({text.begin + 1, text.end - 1});
    const bool negative = text.First() == '-';
    if (negative || text.First() == '+') ++text.begin;
    const unsigned base = TakeBase(text);
    unsigned value = 0;
    for (; !text.IsEmpty() && DigitValue(*text.begin) < base; ++text.begin)
        value = value * base + DigitValue(*text.begin);
    return static_cast<int>(negative ? 0u - value : value);
}

int FindInteger(Span text, const wchar_t* section, const wchar_t* key) {
    bool inside = false;
    while (!text.IsEmpty()) {
        const Span line = TakeLine(text);
        if (line.First() == ';') continue;
        if (line.First() == '[') {
            if (inside) return 0; // only the first section of the name counts
            const char* bracket = FindIn(line, ']');
            inside = bracket != line.end && EqualsIgnoringCase(Trim({line.begin + 1, bracket}), section);
            continue;
        }
        const char* equals = FindIn(line, '=');
        if (!inside || equals == line.end || !EqualsIgnoringCase(Trim({line.begin, equals}), key)) continue;
        return ToInteger(Trim({equals + 1, line.end}));
    }
    return 0;
}

// Makes UTF-16 (marked little endian) and marked UTF-8 plain; characters outside ASCII matter to no key.
std::size_t DropByteOrderMark(char* text, std::size_t length) {
    if (length >= 3 && std::memcmp(text, "\xEF\xBB\xBF", 3) == 0) {
        std::memmove(text, text + 3, length - 3);
        return length - 3;
    }
    if (length < 2 || std::memcmp(text, "\xFF\xFE", 2) != 0) return length;
    std::size_t units = 0;
    for (std::size_t at = 2; at + 1 < length; at += 2) text[units++] = text[at + 1] == 0 ? text[at] : '?';
    return units;
}

} // namespace

int ReadConfigurationInteger(const wchar_t* path, const wchar_t* section, const wchar_t* key) noexcept {
    char narrow[kPathBytes];
    if (WideToAnsi(path, -1, narrow, static_cast<int>(sizeof narrow)) == 0) return 0;
    const File file(narrow);
    char* text = static_cast<char*>(HeapAllocate(kConfigurationBytes));
    if (!text) return 0;
    const std::size_t length = DropByteOrderMark(text, file.Read(text, kConfigurationBytes));
    const int value = FindInteger({text, text + length}, section, key);
    HeapRelease(text);
    return value;
}

// --- debugger and message box --------------------------------------------------------------------------------------

namespace {

bool LookForTracer() {
    char status[4096];
    if (!ReadProcessFile("/proc/self/status", status)) return false;
    constexpr char kField[] = "\nTracerPid:";
    const char* field = std::strstr(status, kField);
    return field && std::atoi(field + sizeof kField - 1) != 0;
}

void WriteError(const char* text, std::size_t length) {
    while (length) {
        const ssize_t written = write(STDERR_FILENO, text, length);
        if (written < 0 && errno == EINTR) continue;
        if (written <= 0) return;
        text += written;
        length -= static_cast<std::size_t>(written);
    }
}

} // namespace

bool IsDebuggerAttached() noexcept {
    // One word, so that threads agree: the second of the last look plus one, times two, plus the answer. 0: never
    // looked.
    static constinit std::atomic<std::int64_t> g_last{0};
    const std::int64_t second = ReadClock(CLOCK_MONOTONIC) / 1000000000 + 1;
    const std::int64_t last = g_last.load(std::memory_order_relaxed);
    if (last >> 1 == second) return (last & 1) != 0;
    const bool attached = LookForTracer();
    g_last.store(second << 1 | (attached ? 1 : 0), std::memory_order_relaxed);
    return attached;
}

void WriteDebuggerOutput(const char* text) noexcept {
    if (text && IsDebuggerAttached()) WriteError(text, std::strlen(text));
}

void WriteDebuggerOutput(const wchar_t* text) noexcept {
    if (!text || !IsDebuggerAttached()) return;
    while (*text) {
        constexpr std::size_t kPiece = 512;
        std::size_t units = 0;
        while (units < kPiece && text[units]) ++units;
        const bool splitsPair = units > 1 && text[units] && (text[units - 1] & 0xFC00) == 0xD800;
        if (splitsPair) --units;
        char bytes[kPiece * 3];
        const int length = WideToAnsi(text, static_cast<int>(units), bytes, static_cast<int>(sizeof bytes));
        WriteError(bytes, static_cast<std::size_t>(length));
        text += units;
    }
}

bool AskOkCancel(const char*, const char*) noexcept { return false; }

// --- clocks --------------------------------------------------------------------------------------------------------

std::uint64_t GetUtcMilliseconds() noexcept {
    return static_cast<std::uint64_t>(ReadClock(CLOCK_REALTIME) / kNanosecondsPerMillisecond);
}

namespace {

// How long the process has been running; 0 when the system does not tell.
std::int64_t GetProcessAgeMilliseconds() {
    char stat[1024];
    if (!ReadProcessFile("/proc/self/stat", stat)) return 0;
    const char* at = std::strrchr(stat, ')'); // the command's name is in brackets and may hold anything
    constexpr int kStartField = 22;           // ticks from the machine's start; the name is field 2
    for (int field = 2; at && field < kStartField; ++field) at = std::strchr(at + 1, ' ');
    const long ticksPerSecond = sysconf(_SC_CLK_TCK);
    if (!at || ticksPerSecond <= 0) return 0;
    const std::int64_t start = std::strtoll(at, nullptr, 10) * 1000 / ticksPerSecond;
    const std::int64_t age = ReadClock(CLOCK_BOOTTIME) / kNanosecondsPerMillisecond - start;
    return age > 0 ? age : 0;
}

} // namespace

std::uint64_t GetProcessMilliseconds() noexcept {
    // The clock's value at the start of the process; negative when the clock began later than the process.
    static constinit std::atomic<std::int64_t> g_start{INT64_MIN};
    const std::int64_t now = ReadClock(CLOCK_MONOTONIC) / kNanosecondsPerMillisecond;
    std::int64_t start = g_start;
    if (start == INT64_MIN) {
        const std::int64_t found = now - GetProcessAgeMilliseconds();
        if (g_start.compare_exchange_strong(start, found)) start = found;
    }
    return now > start ? static_cast<std::uint64_t>(now - start) : 0;
}

bool GetCounterFrequency(std::int64_t& ticksPerSecond) noexcept {
    ticksPerSecond = 1000000000;
    return true;
}

bool ReadCounter(std::int64_t& ticks) noexcept {
    timespec now;
    if (clock_gettime(CLOCK_MONOTONIC, &now) != 0) return false;
    ticks = std::int64_t{now.tv_sec} * 1000000000 + now.tv_nsec;
    return true;
}

// --- chance --------------------------------------------------------------------------------------------------------

bool FillRandom(void* target, std::size_t size) noexcept {
    auto* at = static_cast<unsigned char*>(target);
    while (size) {
        const ssize_t got = getrandom(at, size, 0);
        if (got < 0 && errno == EINTR) continue;
        if (got <= 0) return false;
        at += got;
        size -= static_cast<std::size_t>(got);
    }
    return true;
}

// --- code page -----------------------------------------------------------------------------------------------------

namespace {

constexpr std::uint32_t kReplacement = 0xFFFD;

// How a lead byte opens a UTF-8 sequence: how many bytes follow, the bits it gives, and the range of the first
// follower, which rules out overlong forms, surrogates and values above U+10FFFF.
struct Lead {
    int followers; // -1: opens nothing
    std::uint8_t bits;
    std::uint8_t low, high;
};

constexpr Lead ReadLead(std::uint8_t byte) {
    if (byte < 0x80) return {0, byte, 0, 0};
    if (byte < 0xC2 || byte > 0xF4) return {-1, 0, 0, 0};
    if (byte < 0xE0) return {1, static_cast<std::uint8_t>(byte & 0x1F), 0x80, 0xBF};
    if (byte < 0xF0)
        return {2, static_cast<std::uint8_t>(byte & 0x0F), static_cast<std::uint8_t>(byte == 0xE0 ? 0xA0 : 0x80),
                static_cast<std::uint8_t>(byte == 0xED ? 0x9F : 0xBF)};
    return {3, static_cast<std::uint8_t>(byte & 0x07), static_cast<std::uint8_t>(byte == 0xF0 ? 0x90 : 0x80),
            static_cast<std::uint8_t>(byte == 0xF4 ? 0x8F : 0xBF)};
}

// Takes one character off; U+FFFD for the longest start of a sequence that cannot be completed.
std::uint32_t TakeUtf8(const std::uint8_t*& at, const std::uint8_t* end) {
    const Lead lead = ReadLead(*at++);
    if (lead.followers < 0) return kReplacement;
    std::uint32_t code = lead.bits;
    for (int i = 0; i < lead.followers; ++i) {
        if (at == end) return kReplacement;
        const std::uint8_t low = i == 0 ? lead.low : 0x80;
        const std::uint8_t high = i == 0 ? lead.high : 0xBF;
        if (*at < low || *at > high) return kReplacement;
        code = code << 6 | (*at++ & 0x3Fu);
    }
    return code;
}

std::uint32_t TakeUtf16(const wchar_t*& at, const wchar_t* end) {
    const std::uint32_t unit = *at++;
    if ((unit & 0xF800) != 0xD800) return unit;
    if ((unit & 0x0400) || at == end || (*at & 0xFC00) != 0xDC00) return kReplacement;
    return 0x10000 + ((unit & 0x3FF) << 10) + (*at++ & 0x3FFu);
}

// Writes what fits, counts what would be needed.
template <class Unit> class Sink {
public:
    Sink(Unit* target, int capacity) : m_target(target), m_capacity(static_cast<std::size_t>(capacity)) {}

    void Put(std::uint32_t unit) {
        if (m_count < m_capacity && m_target) m_target[m_count] = static_cast<Unit>(unit);
        ++m_count;
    }

    // What the conversion answers: the units written, or needed when none were asked for; 0 for failure.
    int Result() const {
        const bool fits = m_count <= INT_MAX && (m_capacity == 0 || (m_target && m_count <= m_capacity));
        return fits ? static_cast<int>(m_count) : 0;
    }

private:
    Unit* m_target;
    std::size_t m_capacity;
    std::size_t m_count = 0;
};

void PutUtf16(Sink<wchar_t>& sink, std::uint32_t code) {
    if (code < 0x10000) return sink.Put(code);
    sink.Put(0xD800 + ((code - 0x10000) >> 10));
    sink.Put(0xDC00 + ((code - 0x10000) & 0x3FF));
}

void PutUtf8(Sink<char>& sink, std::uint32_t code) {
    if (code < 0x80) return sink.Put(code);
    if (code < 0x800) {
        sink.Put(0xC0 | code >> 6);
    } else {
        if (code < 0x10000) {
            sink.Put(0xE0 | code >> 12);
        } else {
            sink.Put(0xF0 | code >> 18);
            sink.Put(0x80 | (code >> 12 & 0x3F));
        }
        sink.Put(0x80 | (code >> 6 & 0x3F));
    }
    sink.Put(0x80 | (code & 0x3F));
}

// The units to convert: those given, or up to and including the terminator.
template <class Unit> std::size_t SourceLength(const Unit* source, int length) {
    if (length >= 0) return static_cast<std::size_t>(length);
    std::size_t count = 0;
    while (source[count]) ++count;
    return count + 1;
}

} // namespace

int AnsiToWide(const char* source, int length, wchar_t* target, int capacity) noexcept {
    if (!source || length == 0 || capacity < 0) return 0;
    auto* at = reinterpret_cast<const std::uint8_t*>(source);
    const std::uint8_t* end = at + SourceLength(source, length);
    Sink<wchar_t> sink(target, capacity);
    while (at != end) PutUtf16(sink, TakeUtf8(at, end));
    return sink.Result();
}

int WideToAnsi(const wchar_t* source, int length, char* target, int capacity) noexcept {
    if (!source || length == 0 || capacity < 0) return 0;
    const wchar_t* at = source;
    const wchar_t* end = at + SourceLength(source, length);
    Sink<char> sink(target, capacity);
    while (at != end) PutUtf8(sink, TakeUtf16(at, end));
    return sink.Result();
}

// Not localeconv, which fills a record that threads would share.
wchar_t GetDecimalPoint() noexcept {
    wchar_t point[2];
    return AnsiToWide(nl_langinfo(RADIXCHAR), -1, point, 2) == 2 ? point[0] : L'.';
}

// --- memory ----------------------------------------------------------------------------------------------------------

namespace {

// The longer road, for sandboxes that forbid reading a process: a pipe takes the byte only when it can be read.
bool IsReadableByPipe(const void* address) {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC | O_NONBLOCK) != 0) return false;
    const bool readable = write(ends[1], address, 1) == 1;
    close(ends[0]);
    close(ends[1]);
    return readable;
}

} // namespace

bool IsReadable(const void* address) noexcept {
    char byte;
    const iovec local{&byte, 1};
    const iovec remote{const_cast<void*>(address), 1};
    if (process_vm_readv(getpid(), &local, 1, &remote, 1, 0) == 1) return true;
    return errno != EFAULT && IsReadableByPipe(address);
}

// --- threads -------------------------------------------------------------------------------------------------------

// One access by a fixed offset, without a call, from a library that is loaded late.
#define TAVO_THREAD_FIELD constinit thread_local __attribute__((tls_model("initial-exec")))

constinit thread_local std::uint32_t t_id = 0; // declared with its access model

namespace {

TAVO_THREAD_FIELD int t_priority = 0;
TAVO_THREAD_FIELD bool t_own = false;
TAVO_THREAD_FIELD void* t_releaseScope = nullptr;

} // namespace

// Kernel ids are reused; a new thread must not pass for a dead owner of something.
TAVO_NOINLINE std::uint32_t TakeThreadId() noexcept {
    static constinit std::atomic<std::uint32_t> g_lastId{0};
    do t_id = ++g_lastId;
    while (t_id == 0);
    return t_id;
}

#undef TAVO_THREAD_FIELD

std::uint64_t GetSystemThread() noexcept { return static_cast<std::uint64_t>(syscall(SYS_gettid)); }
bool HasThreadEnded(std::uint64_t thread) noexcept {
    return syscall(SYS_tgkill, getpid(), static_cast<pid_t>(thread), 0) != 0 && errno == ESRCH;
}

int GetThreadPriority() noexcept { return t_priority; }
void SetThreadPriority(int priority) noexcept { t_priority = priority; }

void MarkOwnThread() noexcept { t_own = true; }
bool IsOwnThread() noexcept { return t_own; }

void* GetReleaseScope() noexcept { return t_releaseScope; }
void SetReleaseScope(void* scope) noexcept { t_releaseScope = scope; }

namespace {
// The numbers of <linux/membarrier.h>, which old systems lack.
constexpr int kExpedited = 1 << 3, kRegisterExpedited = 1 << 4;
} // namespace

bool CanFlushProcessors() noexcept { return syscall(SYS_membarrier, kRegisterExpedited, 0) == 0; }
void FlushProcessors() noexcept { syscall(SYS_membarrier, kExpedited, 0); }

void YieldThread() noexcept { sched_yield(); }

void SleepMilliseconds(std::uint32_t milliseconds) noexcept {
    timespec rest{static_cast<time_t>(milliseconds / 1000), static_cast<long>(milliseconds % 1000) * 1000000};
    while (nanosleep(&rest, &rest) != 0 && errno == EINTR) {
    }
}

namespace {

pthread_mutex_t* AsLock(std::uint64_t* storage) { return reinterpret_cast<pthread_mutex_t*>(storage); }
static_assert(sizeof(pthread_mutex_t) <= sizeof(std::uint64_t[5]) &&
              alignof(pthread_mutex_t) <= alignof(std::uint64_t));

} // namespace

void Mutex::lock() noexcept { pthread_mutex_lock(AsLock(m_storage)); }
bool Mutex::try_lock() noexcept { return pthread_mutex_trylock(AsLock(m_storage)) == 0; }
void Mutex::unlock() noexcept { pthread_mutex_unlock(AsLock(m_storage)); }

} // namespace TAVO::Platform
