#pragma once
// Log lines, runtime assertions, result codes, clocks, the stopwatch and random numbers.
// Threads: functions may be called from any thread; objects are for one thread at a time.

#include <cstdarg>
#include <TAVO/config.h>
#include <TAVO/core.h>
#include <TAVO/string.h> // the stopwatch keeps its name
#include <type_traits>

namespace TAVO {
namespace Develop {

/// A host's logger. Gets every line unformatted: the format is wide and follows the rules of _logWrite, @p category and
/// @p source may be null. Called on the thread that logs, several threads at once included. One that throws is removed
/// for good.
using ExternalLogger = void (*)(_acfDebugLevel level, const wchar_t* category, const char* source, long32 line,
                                const wchar_t* format, std::va_list arguments);

/// Writes one log line: to the host's logger if there is one, else to the debugger's output if a debugger is attached,
/// else nowhere. There is no level threshold.
/// Formats mean the same on every platform: %s, %ls and %c are wide, %hs, %S and %hc narrow (of the ANSI code page); a
/// length of `l` is 32 bits, `ll` and `I64` are 64; `*` and `%n$` work, %n does not; a null string prints "(null)";
/// numbers never depend on the locale. At most 2047 units are kept.
/// @param category  null means "TAVO.default"
/// @param source    module path for the line's prefix; null leaves file and line out
TAVO_API void _logWrite(_acfDebugLevel level, const wchar_t* category, const char* source, long32 line,
                        const wchar_t* format, ...);

/// Installs the host's logger, or removes it (null). Takes effect with the next line; calls that began before may still
/// be running when this returns.
TAVO_API void SetExternalLogger(ExternalLogger logger);

/// Raises an assertion with caption "RTA_ON_TRUE" when @p condition is true; returns the condition.
TAVO_API bool _istrue_(bool condition, const char* text);

/// Raises an assertion with caption "RTA_ON_FALSE" when @p condition is false; returns the condition.
TAVO_API bool _isfalse_(bool condition, const char* text);

/// The diagnostics that the configuration file switched on: section "Debug" of the file that has the library's path and
/// the extension ".ini".
struct tagSWITCHES {
    bool AssertBox;        ///< assertions show a message box
    bool LogFailedHRESULT; ///< negative result codes write a trace line
    bool BreakOnHRESULT;   ///< negative result codes raise an assertion
};
/// The switches, fixed when the library was loaded; all false without the file.
TAVO_API tagSWITCHES GetSwitches() noexcept;

namespace OS {

/// The runtime assertion: shows a message box when the configuration asks for it ("AssertBox"), writes an ERROR line in
/// every case, and returns; the process goes on.
/// @return true when the user chose Cancel in the box.
TAVO_API bool RTABox(const char* caption, const char* text);

/// Passes the text to the debugger's output unchanged; null is ignored.
TAVO_API void OutputDebugMessage(const char* text);
TAVO_API void OutputDebugMessage(const wchar_t* text);

} // namespace OS

/// The high-resolution monotonic clock in nanoseconds; 0 when the system has none.
TAVO_API unsigned long long _now_nano();
/// _now_nano in microseconds, rounded half up.
TAVO_API unsigned long long _now_micro();
/// _now_nano in milliseconds, rounded half up.
TAVO_API unsigned long long _now_milli();
/// Seconds since the process started, to the millisecond.
TAVO_API double _getTicks();

/// Stopwatch on the nanosecond clock that reports to the log: lines of level INFO whose category is the name, a dash
/// and the time, as in "import - 12.34ms", without source and line. Nothing is formatted when nobody listens. A stopped
/// watch keeps its time until the next Start, whatever else is called. One object is for one thread at a time.
class TAVO_API CHFLapse {
public:
    /// A named watch runs from now; one whose name is null or empty stands at 0 and reports as "CHFLapse".
    CHFLapse(const String::CPPoolString& name) noexcept;
    CHFLapse(const CHFLapse&) = delete; // a copy would report the total twice
    CHFLapse& operator=(const CHFLapse&) = delete;
    /// A named watch that runs reports with the label "Total".
    ~CHFLapse();

    /// Runs from now on, from 0.
    void Start() noexcept;
    /// Stops and keeps the time since the start.
    void Stop() noexcept;
    /// Stops and reports. The label is a format with arguments as for _logWrite; null is empty. Of a name with more
    /// than 490 units the line shows the beginning and may lack the time.
    void Stop(const wchar_t* label, ...);
    /// Reports the time since the start and runs on from that same start. A stopped watch reports and stays stopped.
    void Lapse(const wchar_t* label, ...);

    /// The time since the start, of a stopped watch the time kept: in seconds.
    double lapse_double() const noexcept;
    unsigned long long lapse_nano() const noexcept;
    /// Rounded half up.
    unsigned long long lapse_micro() const noexcept;
    unsigned long long lapse_milli() const noexcept;

    /// The watch's own word as a number of nanoseconds, and that is TWICE the time kept; of a running watch it says
    /// nothing of use. Take lapse_double and its like. In seconds.
    double count_double() const noexcept;
    /// Rounded half up.
    unsigned long long count_micro() const noexcept;
    unsigned long long count_milli() const noexcept;

private:
    void Report(const wchar_t* label, std::va_list arguments) noexcept;

    unsigned long long m_state = 0; // bit 0: runs; above it the start, or the time kept, in nanoseconds
    String::CPPoolString m_name;
};
static_assert(sizeof(CHFLapse) == 16, "a stopwatch is its word and its name");

/// True on a machine that stores the most significant byte first.
TAVO_API bool _isBigEndian();
/// Always false: wide characters have 16 bits.
TAVO_API bool _isWChar32();
/// The number of set bits.
TAVO_API unsigned long long bitcount64(unsigned long long value);

/// Random numbers of a twister with a state of 624 words; not for secrets.
/// Its sequence is its own: the first 624 outputs come from the seeded words without a regeneration before, and the
/// regeneration tests the new word for oddness. Both are part of the contract, so that seeds keep their sequences.
class TAVO_API CMTRandom {
public:
    /// Seeds with the low 32 bits of the nanosecond clock.
    CMTRandom();
    /// Starts the sequence of @p value; modulus and factor stay.
    void seed(std::uint32_t value);
    /// Makes rnd() answer 0 to @p maximum; 4294967295 means no limit.
    void maxrnd(std::uint32_t maximum);
    /// Sets the factor of drnd() to @p factor itself: for numbers from 0 to x pass x / 4294967295.
    void maxdrnd(double factor);
    std::uint32_t rnd();
    double drnd();

private:
    std::uint32_t Next();

    unsigned long long m_index;
    std::uint32_t m_state[624];
    std::uint32_t m_modulus;
    double m_factor;
};

/// The next number of the process-wide generator; lock-free.
TAVO_API std::uint32_t _random();
/// A number from 0 to @p maximum of the process-wide generator.
TAVO_API double _drandom(double maximum);

} // namespace Develop

// The generator is known under both names.
namespace Random {
using Develop::_drandom;
using Develop::_random;
using Develop::CMTRandom;
} // namespace Random

/// A signed 32-bit result code; negative means failure.
class TAVO_API hr {
public:
    /// Keeps the code. A negative one is reported: as an assertion when the configuration has "BreakOnHRESULT", as a
    /// trace line when it has "LogFailedHRESULT".
    hr(long32 code);
    /// Copies the code without a report.
    hr(const hr& other) noexcept = default;
    hr& operator=(const hr& other) noexcept = default;

    /// True for success.
    operator bool() const noexcept { return lResult >= 0; }
    operator long32() const noexcept { return lResult; }

    bool operator==(const hr& other) const noexcept { return lResult == other.lResult; }
    // A template for every integer type, since the two conversions above would make `h == 0` ambiguous.
    template <class Integer, class = std::enable_if_t<std::is_integral<Integer>::value>>
    bool operator==(Integer code) const noexcept {
        return lResult == static_cast<long32>(code);
    }
    template <class Integer, class = std::enable_if_t<std::is_integral<Integer>::value>>
    bool operator!=(Integer code) const noexcept {
        return lResult != static_cast<long32>(code);
    }
    bool operator!=(const hr& other) const noexcept { return lResult != other.lResult; }

    long32 lResult;
};

} // namespace TAVO
