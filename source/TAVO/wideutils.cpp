// Utilities over wide text: case, comparison, search, character classes.

#include "wide.h"

#include <TAVO/string.h>

namespace TAVO::String {
namespace {

using namespace detail;

constexpr wchar_t Same(wchar_t c) { return c; }
constexpr wchar_t Folded(wchar_t c) { return FoldUnit(c); }

template <wchar_t (*map)(wchar_t)> void MapText(wchar_t* text) {
    if (!text) return;
    for (; *text; ++text) *text = map(*text);
}

// Settles the pointers: true when `result` is the answer.
// Intended (null-sorts-last): null sorts after every text, the reverse of the ordinal comparison of pooled strings.
bool ComparePointers(const wchar_t* a, const wchar_t* b, int& result) {
    result = a == b ? 0 : !a ? 1 : -1;
    return a == b || !a || !b;
}

int CompareFolded(const wchar_t* a, const wchar_t* b, std::size_t n) {
    for (std::size_t i = 0; i < n; ++i) {
        if (const int difference = wccmpi(a[i], b[i])) return difference;
        if (a[i] == 0) break;
    }
    return 0;
}

// Whether `part` occurs in the first `n` units of `text`, each unit seen through `map`.
template <wchar_t (*map)(wchar_t)> bool Contains(const wchar_t* text, const wchar_t* part, std::size_t n) {
    // Intended (empty-part): an empty text occurs in none but itself, where a textbook finds it everywhere; and null in
    // null.
    if (text == part) return true;
    if (!text || !part || !*part) return false;
    const std::size_t partLength = WideLength(part);
    const std::size_t textLength = WideLengthN(text, n);
    const wchar_t first = map(*part);
    for (std::size_t start = 0; partLength <= textLength - start; ++start) {
        if (map(text[start]) != first) continue;
        std::size_t matched = 1;
        while (matched < partLength && map(text[start + matched]) == map(part[matched])) ++matched;
        if (matched == partLength) return true;
    }
    return false;
}

} // namespace

wchar_t wctolower(const wchar_t& c) { return FoldUnit(c); }
wchar_t wctoupper(const wchar_t& c) { return UpperUnit(c); }
void wcslower(wchar_t* text) { MapText<FoldUnit<wchar_t>>(text); }
void wcsupper(wchar_t* text) { MapText<UpperUnit<wchar_t>>(text); }

int wccmpi(wchar_t a, wchar_t b) { return a == b ? 0 : static_cast<int>(FoldUnit(a)) - static_cast<int>(FoldUnit(b)); }

int wcscmpi(const wchar_t* a, const wchar_t* b) {
    int result;
    return ComparePointers(a, b, result) ? result : CompareFolded(a, b, SIZE_MAX);
}

int wcsncmpi(const wchar_t* a, const wchar_t* b, std::size_t n) {
    int result;
    if (ComparePointers(a, b, result)) return result;
    // Intended (signed-count): n is a 32-bit signed count, so SIZE_MAX does not mean the whole text but nothing.
    const auto count = static_cast<long32>(n);
    return count < 1 ? 0 : CompareFolded(a, b, static_cast<std::size_t>(count));
}

bool wcscnt(const wchar_t* text, const wchar_t* part) { return Contains<Same>(text, part, SIZE_MAX); }
bool wcsncnt(const wchar_t* text, const wchar_t* part, std::size_t n) { return Contains<Same>(text, part, n); }
bool wcscnti(const wchar_t* text, const wchar_t* part) { return Contains<Folded>(text, part, SIZE_MAX); }
bool wcsncnti(const wchar_t* text, const wchar_t* part, std::size_t n) { return Contains<Folded>(text, part, n); }

std::size_t wcscount(const wchar_t* text, wchar_t c) {
    if (!text) return 0;
    std::size_t count = 0;
    for (; *text; ++text) count += *text == c;
    return count;
}

bool _isSlash(wchar_t c) { return c == L'/' || c == L'\\'; }
// Intended (blank-is-space): the space alone; a textbook's blank includes the tab.
bool _isblank(wchar_t c) { return c == L' '; }
bool _iswhitespace(wchar_t c) { return c == L' ' || c == L'\n' || c == L'\r' || c == L'\t'; }
bool _isCRLF(wchar_t c) { return c == L'\n' || c == L'\r'; }

} // namespace TAVO::String
