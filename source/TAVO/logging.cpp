// Log lines, assertions and result codes.

#include "logging.h"

#include "diagnostics.h"
#include "format.h"
#include "lifecycle.h"

#include <atomic>
#include <mutex>

namespace TAVO {
namespace Develop {

namespace {

// In a structure, since one compiler warns about a calling convention lost when a template takes the bare function
// type.
struct Logger {
    ExternalLogger call;
};

constinit std::atomic<Logger> g_logger{Logger{nullptr}};

constinit AssertionLock g_assertionLock;

// Every line of the host's logger leaves the library here.
void CallLogger(Logger logger, _acfDebugLevel level, const wchar_t* category, const char* source, long32 line,
                const wchar_t* format, std::va_list arguments) {
    try {
        logger.call(level, category, source, line, format, arguments);
    } catch (...) {
        g_logger.compare_exchange_strong(logger, Logger{nullptr}); // one that was installed meanwhile stays
    }
}

void WriteLine(_acfDebugLevel level, const wchar_t* category, const char* source, long32 line, const wchar_t* format,
               std::va_list arguments) {
    const double seconds = _getTicks();
    wchar_t message[kMessageUnits];
    FormatWideList(message, kMessageUnits, format, arguments);

    const wchar_t* label = FindLevelLabel(level);
    if (!label) {
        diagnostics::IllegalCodePoint("Unknown debug level");
        label = L"unknown";
    }
    wchar_t prefix[kPrefixUnits];
    FormatPrefix(prefix, seconds, label, category ? category : L"TAVO.default", source, line);

    Platform::WriteDebuggerOutput(prefix);
    Platform::WriteDebuggerOutput(message);
    Platform::WriteDebuggerOutput(L"\r\n");
}

} // namespace

const wchar_t* FindLevelLabel(_acfDebugLevel level) noexcept {
    static constexpr struct {
        _acfDebugLevel level;
        const wchar_t* label;
    } kLabels[] = {
        {acfDebugFull, L"FULL   "},    {acfDebugError, L"ERROR  "}, {acfDebugWarning, L"WARNING"},
        {acfDebugVerbose, L"verbose"}, {acfDebugTrace, L"trace  "}, {acfDebugInfo, L"INFO   "},
    };
    for (const auto& row : kLabels)
        if (row.level == level) return row.label;
    return nullptr;
}

void FormatPrefix(wchar_t* out, double seconds, const wchar_t* label, const wchar_t* category, const char* source,
                  long32 line) noexcept {
    if (source)
        FormatWide(out, kPrefixUnits, L"%8.3f [%ls] [%ls] [] {[file:%hs] [line:%d]} ", seconds, label, category, source,
                   static_cast<int>(line));
    else
        FormatWide(out, kPrefixUnits, L"%8.3f [%ls] [%ls] [] ", seconds, label, category);
}

bool IsLogHeard() noexcept { return g_logger.load().call || Platform::IsDebuggerAttached(); }

void WriteLog(_acfDebugLevel level, const wchar_t* category, const char* source, long32 line, const wchar_t* format,
              std::va_list arguments) {
    const Logger logger = g_logger;
    if (logger.call)
        CallLogger(logger, level, category, source, line, format, arguments);
    else if (Platform::IsDebuggerAttached())
        WriteLine(level, category, source, line, format, arguments);
}

void _logWrite(_acfDebugLevel level, const wchar_t* category, const char* source, long32 line, const wchar_t* format,
               ...) {
    std::va_list arguments;
    va_start(arguments, format);
    WriteLog(level, category, source, line, format, arguments);
    va_end(arguments);
}

void SetExternalLogger(ExternalLogger logger) { g_logger = Logger{logger}; }

bool _istrue_(bool condition, const char* text) {
    if (condition) OS::RTABox("RTA_ON_TRUE", text);
    return condition;
}

bool _isfalse_(bool condition, const char* text) {
    if (!condition) OS::RTABox("RTA_ON_FALSE", text);
    return condition;
}

namespace OS {

bool RTABox(const char* caption, const char* text) {
    bool cancelled = false;
    if (g_switches.assertBox) {
        const std::lock_guard lock(g_assertionLock);
        cancelled = Platform::AskOkCancel(caption, text);
    }
    _logWrite(acfDebugError, L"TAVO", "source/TAVO/BaseOS_Win", 201, L"Failed assumption: %hs:%hs", caption, text);
    return cancelled;
}

void OutputDebugMessage(const char* text) { Platform::WriteDebuggerOutput(text); }
void OutputDebugMessage(const wchar_t* text) { Platform::WriteDebuggerOutput(text); }

} // namespace OS
} // namespace Develop

hr::hr(long32 code) : lResult(code) {
    if (code >= 0) return;
    if (g_switches.breakOnHResult) Develop::_istrue_(true, "source/TAVO/TAVOACF,25:lResult < 0");
    if (g_switches.logFailedHResult)
        Develop::_logWrite(acfDebugTrace, L"TAVO", "source/TAVO/TAVOACF", 28, L"lResult < 0: %x",
                           static_cast<unsigned>(code));
}

} // namespace TAVO
