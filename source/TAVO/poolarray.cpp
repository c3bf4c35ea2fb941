// Arrays of pooled strings, and the submitters that join and cut them.

#include "blocks.h"
#include "diagnostics.h"
#include "poolentry.h"
#include "wide.h"

namespace TAVO::String {

namespace {

int CompareTexts(const void* first, const void* second) {
    return static_cast<const CPPoolString*>(first)->cmp(*static_cast<const CPPoolString*>(second));
}

} // namespace

// --- submitters ------------------------------------------------------------------------------------------------------

std::size_t CStringArraySubmitter::GetStringLen() {
    if (m_count == 0) return 0;
    // True units, not len(): texts with pairs hold more than their length says.
    std::size_t units = m_count - 1;
    for (std::size_t i = 0; i < m_count; ++i) {
        const std::size_t more = UnitsOf(m_first[i]);
        if (more > SIZE_MAX - units) return SIZE_MAX; // more than any heap has: refused there
        units += more;
    }
    return units;
}

bool CStringArraySubmitter::GetString(wchar_t* out) {
    for (std::size_t i = 0; i < m_count; ++i) {
        if (i) *out++ = m_separator;
        const std::size_t units = UnitsOf(m_first[i]);
        detail::WideCopy(out, static_cast<const wchar_t*>(m_first[i]), units);
        out += units;
    }
    *out = 0;
    return true;
}

bool CSubStringSubmitter::GetString(wchar_t* out) {
    if (m_count == 0) {
        diagnostics::RuntimeAssumptionFailed("sccLen > 0");
        return false;
    }
    detail::WideCopy(out, m_start, m_count);
    return true;
}

// --- the array -------------------------------------------------------------------------------------------------------

CPPoolStringArray& CPPoolStringArray::operator=(const Buffers::CPObjectMemory& block) noexcept {
    using Elements = Buffers::CPObjectVector<CPPoolString>;
    static_assert(sizeof(Elements) == sizeof(Buffers::CPObjectMemory));
    if (block.IsNAssignable(sizeof(CPPoolString), &Elements::_vtbl))
        m_elements = static_cast<const Elements&>(block);
    else
        m_elements.free();
    if (!m_sorted) return *this;
    // Intended (array-duplicates): sorted, and yet duplicates stay, which a set would drop; the counts are the block's.
    Sort();
    // Without memory for a copy of its own a shared block stays as it is, and a set out of order finds nothing.
    if (!IsInOrder()) m_elements.free();
    return *this;
}

bool CPPoolStringArray::IsInOrder() const noexcept {
    std::size_t count;
    const CPPoolString* elements = m_elements.GetArray(count);
    for (std::size_t i = 1; i < count; ++i)
        if (elements[i - 1].cmp(elements[i]) > 0) return false;
    return true;
}

void CPPoolStringArray::Sort() noexcept {
    // Copies of the array share the block: they must not see it change.
    if (!IsInOrder() && m_elements.clone()) m_elements.Sort(CompareTexts);
}

std::size_t CPPoolStringArray::LocateEntry(const CPPoolString& text) const noexcept {
    // Intended (array-locate): "not found" has no answer here but for arrays that never held anything; others tell
    // where the text would stand, also when they are empty again.
    if (!m_sorted || !m_elements.key()) return Buffers::NotFound;
    std::size_t count;
    const CPPoolString* elements = m_elements.GetArray(count);
    return Buffers::Sort::vfqfind(&text, elements, count, sizeof(CPPoolString), CompareTexts);
}

bool CPPoolStringArray::Add(const CPPoolString& text) noexcept {
    std::size_t position = GetNItems();
    if (m_sorted && m_elements.key()) {
        position = LocateEntry(text);
        if (position < GetNItems() && m_elements[position] == text) return true;
    }
    const CPPoolString added(text); // the argument may live in the block that is about to be left
    return m_elements.clone() && m_elements.Insert(added, position);
}

bool CPPoolStringArray::Insert(const CPPoolString& text, std::size_t index) noexcept {
    if (m_sorted || index > GetNItems()) return false;
    const CPPoolString added(text);
    return m_elements.clone() && m_elements.Insert(added, index);
}

bool CPPoolStringArray::Delete(const CPPoolString& text) noexcept {
    if (!m_sorted) return false;
    const std::size_t position = LocateEntry(text);
    if (position >= GetNItems() || m_elements[position] != text) return true;
    return m_elements.clone() && m_elements.Delete(position, false);
}

CPPoolString CPPoolStringArray::Flatten(wchar_t separator) const noexcept {
    std::size_t count;
    const CPPoolString* elements = m_elements.GetArray(count);
    if (count == 0) return {};
    CStringArraySubmitter joined(elements, count, separator);
    if (joined.GetStringLen() == 0) return CPPoolString::pempty; // one element, null or empty
    return CStringPool::GetStringRef(&joined);
}

bool CPPoolStringArray::AddPiece(const wchar_t* start, std::size_t units) noexcept {
    CSubStringSubmitter cut(start, units);
    const CPPoolString piece = units ? CStringPool::GetStringRef(&cut) : CPPoolString();
    // A piece with half a pair cannot be interned and is the null string; any other failed for want of memory.
    pool::Key key;
    if (units && piece.isnull() && pool::KeyOfUnits(start, units, key)) return false;
    return Add(piece);
}

bool CPPoolStringArray::Inflate(const CPPoolString& text, wchar_t separator) noexcept {
    const CPPoolString source(text); // may live in the elements that go now
    m_elements.free();
    if (source.isnull()) return true;
    const wchar_t* piece = source;
    const wchar_t* const end = piece + UnitsOf(source);
    std::size_t pieces = 1;
    if (separator)
        for (const wchar_t* unit = piece; unit < end; ++unit) pieces += *unit == separator;
    if (!m_elements.Reserve(pieces)) return false;
    for (const wchar_t* unit = piece; separator && unit < end; ++unit) {
        if (*unit != separator) continue;
        if (!AddPiece(piece, static_cast<std::size_t>(unit - piece))) return false;
        piece = unit + 1;
    }
    // Intended (split-trailing): a trailing empty piece adds nothing, while others add the null string. A textbook
    // split would treat all alike; lists that end in a separator would grow by an element.
    return piece == end || AddPiece(piece, static_cast<std::size_t>(end - piece));
}

} // namespace TAVO::String
