#pragma once
// What a target requires of the library; a crash is what a fuzzer looks for.

#include <cstdlib>

inline void Require(bool condition) {
    if (!condition) std::abort();
}
