// 16-bit versions of the wide functions that the test framework calls; the linker substitutes them (Linux only).
#include <cstddef>

extern "C" std::size_t __wrap_wcslen(const wchar_t* s) {
    std::size_t n = 0;
    while (s[n]) ++n;
    return n;
}

extern "C" int __wrap_wcscmp(const wchar_t* a, const wchar_t* b) {
    while (*a && *a == *b) ++a, ++b;
    return *a < *b ? -1 : *a > *b;
}

extern "C" int __wrap_wcscasecmp(const wchar_t* a, const wchar_t* b) {
    auto fold = [](wchar_t c) { return c >= L'A' && c <= L'Z' ? wchar_t(c + 32) : c; };
    while (*a && fold(*a) == fold(*b)) ++a, ++b;
    return int(fold(*a)) - int(fold(*b));
}

extern "C" const wchar_t* __wrap_wcsstr(const wchar_t* text, const wchar_t* part) {
    for (;; ++text) {
        std::size_t i = 0;
        while (part[i] && text[i] == part[i]) ++i;
        if (!part[i]) return text;
        if (!*text) return nullptr;
    }
}
