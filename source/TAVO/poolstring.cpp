// The pooled string: construction, its UTF-8 form, comparison.

#include "diagnostics.h"
#include "objectvector.h"
#include "platform/heap.h"
#include "poolentry.h"
#include "transcoding.h"

#include <atomic>
#include <cstring>

namespace TAVO::Buffers {
template class TAVO_TEMPLATE_DEF CPObjectVector<String::CPPoolString>;
} // namespace TAVO::Buffers

namespace TAVO::String {

using Buffers::tagCPOMEMHEADER;

std::size_t CPPoolString::GetTypeID() noexcept { return reinterpret_cast<std::size_t>(&g_entryTable); }

// --- construction ----------------------------------------------------------------------------------------------------

CPPoolString::CPPoolString(const wchar_t* text) noexcept : CPPoolString(CStringPool::GetStringRef(text)) {}
CPPoolString::CPPoolString(const unsigned char* text) noexcept : CPPoolString(CStringPool::GetStringRef(text)) {}
CPPoolString::CPPoolString(const char* text) noexcept
    : CPPoolString(CStringPool::GetStringRef(static_cast<const wchar_t*>(CACFWChar(text)))) {}

CPPoolString::CPPoolString(std::uint32_t number, bool isSigned) noexcept {
    // Intended (number-32-bits): 32 bits, also for 64-bit types: 4294967296 gives "0". Stored names were made so.
    const bool negative = isSigned && number >> 31;
    std::uint32_t rest = negative ? 0u - number : number;
    unsigned char digits[16], *first = digits + sizeof(digits);
    do *--first = static_cast<unsigned char>('0' + rest % 10);
    while (rest /= 10);
    if (negative) *--first = '-';
    *this = pool::InternAscii(first, static_cast<std::size_t>(digits + sizeof(digits) - first));
}

void CPPoolString::free() noexcept {
    if (!isnull()) *this = CPPoolString();
}

void CPPoolString::TransferFrom(CPPoolString& other) noexcept {
    if (this == &other) return;
    tagCPOMEMHEADER* old = std::exchange(m_pMH, std::exchange(other.m_pMH, NullBlock()));
    Free(old);
}

CPPoolString CPPoolString::inc() const noexcept {
    if (isnull()) return {};
    // A submitter that writes the raised text straight into its entry.
    class Raised final : public IStringSubmitter {
    public:
        explicit Raised(const CPPoolString& text) : m_text(text), m_units(UnitsOf(text)), m_digits(m_units) {
            while (m_digits > 0 && IsDigit(m_text[m_digits - 1])) --m_digits;
            std::size_t i = m_digits;
            while (i < m_units && m_text[i] == L'9') ++i;
            m_grows = i == m_units; // nothing but nines, or no digit at all
        }
        std::size_t GetStringLen() override { return m_units + m_grows; }
        bool GetString(wchar_t* out) override {
            detail::WideCopy(out, m_text, m_units);
            if (m_grows) {
                // No number: append 1. Nines: a 1 in front, and zeros.
                out[m_units] = L'0';
                out[m_digits] = L'1';
                for (std::size_t i = m_digits + 1; i <= m_units; ++i) out[i] = L'0';
                return true;
            }
            std::size_t i = m_units;
            while (out[i - 1] == L'9') out[--i] = L'0';
            ++out[i - 1];
            return true;
        }

    private:
        static bool IsDigit(wchar_t c) { return c >= L'0' && c <= L'9'; }
        const wchar_t* m_text;
        std::size_t m_units, m_digits; // where the trailing number begins
        bool m_grows;
    } raised(*this);
    return CStringPool::GetStringRef(&raised);
}

// --- the UTF-8 form --------------------------------------------------------------------------------------------------

CPPoolString::operator const unsigned char*() const noexcept {
    static constexpr unsigned char kNone[] = {0};
    auto& entry = const_cast<PoolEntry&>(Entry());
    std::atomic_ref<const unsigned char*> cache(entry.utf8);
    if (const unsigned char* made = cache.load(std::memory_order_acquire)) return made;

    const std::size_t size = entry.utf8Size + 1;
    auto* bytes = static_cast<unsigned char*>(Platform::Allocate(size));
    if (!bytes) return kNone;
    // Intended (pool-utf8-size): len() + 1 is the source length, so a text with two pairs or more, or one interned from
    // UTF-8 with a character above FFFF, does not come out at its size and has no UTF-8 form.
    if (acfWChar_To_UTF8(entry.text, entry.length + 1, bytes, size) != size) {
        Platform::Release(bytes);
        return kNone;
    }
    const unsigned char* first = nullptr;
    if (cache.compare_exchange_strong(first, bytes)) return bytes;
    Platform::Release(bytes); // another thread was faster
    return first;
}

// --- integrity -------------------------------------------------------------------------------------------------------

bool IsSound(tagCPOMEMHEADER* block) noexcept {
    const PoolEntry& entry = EntryOf(block);
    const std::size_t units = UnitsOf(block);
    const pool::Key stored{entry.length, entry.utf8Size, entry.hash, entry.hashi};
    pool::Key key;
    if (pool::KeyOfUnits(entry.text, units, key) && stored.SameText(key)) return true;
    for (const bool joined : {true, false})
        if (stored.SameText(pool::KeyOfStoredUtf8(entry.text, units, joined))) return true;
    // A text that mixes both kinds of surrogates cannot be told apart; its length must fit at least.
    std::size_t surrogates = 0;
    for (std::size_t i = 0; i < units; ++i) surrogates += detail::IsSurrogate(entry.text[i]);
    return surrogates > 2 && entry.length == units;
}

bool CPPoolString::Verify() const noexcept {
    if (isnull() || IsSound(m_pMH)) return true;
    diagnostics::IllegalCodePoint("String pool integrity violation");
    return false;
}

// --- comparison ------------------------------------------------------------------------------------------------------

namespace {

// Each comparison has one body over {text, length}; a handle gives its entry's, raw text what stands before its
// terminator.
struct Operand {
    const wchar_t* text; // null: the null string
    std::size_t length;
};

Operand Of(const CPPoolString& text) {
    return {text.isnull() ? nullptr : static_cast<const wchar_t*>(text), text.len()};
}
Operand Of(const wchar_t* text) { return {text, text ? detail::WideLength(text) : 0}; }

// Intended (pool-null-first): a null text sorts before everything here, while wcscmpi sorts it last.
int Compare(const wchar_t* a, const wchar_t* b) {
    if (a == b) return 0;
    if (!a || !b) return a ? 1 : -1;
    return detail::WideCompare(a, b);
}

// 0 when `text` starts with the units of `start`, or when both end at once within them.
int ComparePrefix(const wchar_t* text, const Operand& start) {
    for (std::size_t i = 0; i < start.length; ++i) {
        if (text[i] != start.text[i]) return text[i] < start.text[i] ? -1 : 1;
        if (!text[i]) return 0;
    }
    return 0;
}

int ComparePrefixFolded(const wchar_t* text, const Operand& start) {
    for (std::size_t i = 0; i < start.length; ++i) {
        if (const int order = wccmpi(text[i], start.text[i])) return order;
        if (!text[i]) return 0;
    }
    return 0;
}

} // namespace

int CPPoolString::cmp(const CPPoolString& other) const noexcept {
    return *this == other ? 0 : Compare(Of(*this).text, Of(other).text);
}
int CPPoolString::cmp(const wchar_t* other) const noexcept { return Compare(Of(*this).text, other); }

int CPPoolString::cmpi(const CPPoolString& other) const noexcept {
    return *this == other ? 0 : wcscmpi(Entry().text, other.Entry().text);
}
int CPPoolString::cmpi(const wchar_t* other) const noexcept { return wcscmpi(Entry().text, other); }

int CPPoolString::cmpp(const CPPoolString& other) const noexcept {
    if (*this == other) return 0;
    return len() < other.len() ? -1 : ComparePrefix(Entry().text, {other.Entry().text, other.len()});
}
int CPPoolString::cmpp(const wchar_t* other) const noexcept {
    const Operand start = Of(other);
    return len() < start.length ? -1 : ComparePrefix(Entry().text, start);
}

int CPPoolString::cmppi(const CPPoolString& other) const noexcept {
    if (*this == other) return 0;
    return len() < other.len() ? -1 : ComparePrefixFolded(Entry().text, {other.Entry().text, other.len()});
}
int CPPoolString::cmppi(const wchar_t* other) const noexcept {
    const Operand start = Of(other);
    if (!other) return -1; // as the comparison underneath answers a null text
    return len() < start.length ? -1 : ComparePrefixFolded(Entry().text, start);
}

// Intended (pool-suffix): offsets and limits are len() here and below, where a textbook would count units; with pairs
// in the text they lie one unit per pair too early. Results that hosts sorted by would change.
int CPPoolString::cmp_p(const CPPoolString& other) const noexcept {
    if (*this == other) return 0;
    if (len() < other.len()) return -1;
    return ComparePrefix(Entry().text + (len() - other.len()), {other.Entry().text, other.len()});
}
int CPPoolString::cmp_p(const wchar_t* other) const noexcept {
    const Operand end = Of(other);
    return len() < end.length ? -1 : ComparePrefix(Entry().text + (len() - end.length), end);
}

int CPPoolString::cmp_pi(const CPPoolString& other) const noexcept {
    if (*this == other) return 0;
    if (len() < other.len()) return -1;
    return ComparePrefixFolded(Entry().text + (len() - other.len()), {other.Entry().text, other.len()});
}
int CPPoolString::cmp_pi(const wchar_t* other) const noexcept {
    const Operand end = Of(other);
    if (!other) return -1;
    return len() < end.length ? -1 : ComparePrefixFolded(Entry().text + (len() - end.length), end);
}

bool CPPoolString::cnt(const CPPoolString& other) const noexcept {
    if (*this == other) return true;
    return len() >= other.len() && wcsncnt(Entry().text, other.Entry().text, len());
}
bool CPPoolString::cnt(const wchar_t* other) const noexcept {
    const Operand part = Of(other);
    return part.text && len() >= part.length && wcsncnt(Entry().text, other, len());
}

bool CPPoolString::cnti(const CPPoolString& other) const noexcept {
    if (*this == other) return true;
    return len() >= other.len() && wcsncnti(Entry().text, other.Entry().text, len());
}
bool CPPoolString::cnti(const wchar_t* other) const noexcept {
    const Operand part = Of(other);
    return part.text && len() >= part.length && wcsncnti(Entry().text, other, len());
}

int CPPoolString::pcmp(const CPPoolString& other) const noexcept {
    const auto mine = key(), theirs = other.key();
    return mine < theirs ? -1 : mine > theirs;
}

bool CPPoolString::iequals(const CPPoolString& other) const noexcept {
    if (sHashi() != other.sHashi()) return false;
    if (*this == other) return true;
    return len() == other.len() && wcscmpi(Entry().text, other.Entry().text) == 0;
}

} // namespace TAVO::String
