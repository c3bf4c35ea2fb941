#pragma once
// How a line for the debugger is laid out, and the lock of the assertion box.

#include "recursivelock.h"

#include <TAVO/develop.h>

namespace TAVO::Develop {

constexpr std::size_t kMessageUnits = 2048; // of a message, terminator included
constexpr std::size_t kPrefixUnits = 512;   // of the stretch before it

// The seven characters printed for a level; null for a level that does not exist.
const wchar_t* FindLevelLabel(_acfDebugLevel level) noexcept;

// Lays the prefix of a line out in kPrefixUnits.
void FormatPrefix(wchar_t* out, double seconds, const wchar_t* label, const wchar_t* category, const char* source,
                  long32 line) noexcept;

// Whether a line would arrive anywhere.
bool IsLogHeard() noexcept;
// _logWrite with its arguments in a list.
void WriteLog(_acfDebugLevel level, const wchar_t* category, const char* source, long32 line, const wchar_t* format,
              std::va_list arguments);

// Lets one thread show boxes at a time; that thread may show a nested one, since a box runs the host's message
// handlers.
using AssertionLock = RecursiveLock;

} // namespace TAVO::Develop
