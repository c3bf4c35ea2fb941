#pragma once
// The two kinds of assertion that the library raises about itself.

#include <TAVO/develop.h>

namespace TAVO::diagnostics {

// An assumption does not hold; `expression` is what should have held. The caller goes on.
inline void RuntimeAssumptionFailed(const char* expression) noexcept {
    Develop::OS::RTABox("Runtime assumption failed", expression);
}

// A state that cannot be, told in a sentence.
inline void IllegalCodePoint(const char* sentence) noexcept {
    Develop::OS::RTABox("Illegal code point reached", sentence);
}

} // namespace TAVO::diagnostics
