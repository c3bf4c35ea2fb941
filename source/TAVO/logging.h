#pragma once
// Log lines of the library itself, and the fixed forms of its assertions.

#include <TAVO/develop.h>

namespace TAVO::Develop {

constexpr std::size_t kMessageUnits = 2048; // of a message, terminator included
constexpr std::size_t kPrefixUnits = 512;   // of the stretch before it

// The seven characters printed for a level; null for a level that does not exist.
const wchar_t* FindLevelLabel(_acfDebugLevel level) noexcept;

// Lays the prefix of a line out in kPrefixUnits.
void FormatPrefix(wchar_t* out, double seconds, const wchar_t* label, const wchar_t* category, const char* source,
                  long32 line) noexcept;

// An assumption of the library's own failed; the text is the expression that should have held.
inline void FailAssumption(const char* expression) { OS::RTABox("Runtime assumption failed", expression); }

// A place was reached that cannot be.
inline void FailCodePoint(const char* what) { OS::RTABox("Illegal code point reached", what); }

} // namespace TAVO::Develop
