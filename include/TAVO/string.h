#pragma once
// Text: transcoding between UTF-8, UTF-16, UTF-32 and the ANSI code page, owned strings of one character set each,
// utilities over wide text, the pool of interned strings with its handles and arrays, and bytes as text.
//
// Wide characters have 16 bits and hold UTF-16, so every acfW function behaves as its UTF16 namesake.
// Threads: the functions keep no state and may be called from any thread; an object is for one thread at a time.

#include <cstddef>
#include <TAVO/buffers.h>
#include <TAVO/config.h>
#include <type_traits>
#include <utility>

namespace TAVO {
namespace String {

/// The wide character of the component framework: one UTF-16 unit.
using acfWChar = wchar_t;

// --- Transcoding ---------------------------------------------------------------------------------------------------
//
// These rules are the library's own and stored text depends on them. They leave the textbook in four places:
// - UTF-8 may be overlong, may encode surrogates and may reach 13FFFF; 80 to BF and F5 to FF begin no sequence.
// - A UTF-16 pair is a unit D800 to DBFF followed by any unit from DBFF up. It decodes to 0 when the low ten bits of
// both
//   units are zero, else to 1; so no character above FFFF ever comes out of UTF-16.
// - Such characters encode to UTF-16 without the usual offset: 10000 becomes D840 DC00, 10FFFF becomes DC3F DFFF, which
//   is no standard UTF-16. From 100000 up the first unit is a low surrogate, and this library cannot decode it either.
// - The UTF-32 counters include the element at index n.

/// The bytes of a code point in UTF-8: 1 to 4; 0 from 110000 up.
TAVO_API std::size_t UTF8Size(ulong32 codePoint);
/// The bytes of the sequence that begins with @p lead: 1 to 4; 0 for a byte that begins none.
TAVO_API std::size_t UTF8Len(unsigned char lead);
/// The units of a code point in UTF-16: 1 or 2; 0 above 110000, which itself counts 2.
TAVO_API std::size_t UTF16Size(ulong32 codePoint);
/// The units of the character that begins with @p unit: 1 or 2; 0 for a low surrogate.
TAVO_API std::size_t UTF16Len(unsigned short unit);
/// The wide characters of a code point: 1 below 10000, else 2, without an upper bound.
TAVO_API std::size_t acfWSize(ulong32 codePoint);
/// Always 1: a wide character has 16 bits, and surrogates are not looked at.
TAVO_API std::size_t acfWLen(wchar_t unit);

/// Steps over two-byte lead bytes (C0 to DF), and over nothing else: continuation bytes stay. Requires: a terminated
/// text.
TAVO_API void UTF8Sync(const unsigned char*& text);
/// Steps over low surrogates (DC00 to DFFF). Requires: a terminated text.
TAVO_API void UTF16Sync(const unsigned short*& text);
TAVO_API void acfWSync(const wchar_t*& text);

// Counting: how many target units the source converts to, its terminator not counted. The count ends at the source's
// terminator, before the index n (in source units) and before the first invalid or cut sequence; the result does not
// tell which. Nothing is read at or behind index n nor behind the terminator; any n beyond the terminator, SIZE_MAX for
// example, means the whole text. A null source counts 0. In the names w is acfWChar, w32 a code point, u16 a UTF-16
// unit, u8 a UTF-8 byte.

/// Code points of UTF-8 text.
TAVO_API std::size_t UTF8w32strlen(const unsigned char* source, std::size_t n);
/// UTF-16 units of UTF-8 text; values above 10FFFF, which no converter writes, count 2.
TAVO_API std::size_t UTF8u16strlen(const unsigned char* source, std::size_t n);
TAVO_API std::size_t UTF8wstrlen(const unsigned char* source, std::size_t n);
/// Code points of UTF-16 text; a pair counts 1.
TAVO_API std::size_t UTF16w32strlen(const unsigned short* source, std::size_t n);
TAVO_API std::size_t acfWw32strlen(const wchar_t* source, std::size_t n);
/// UTF-8 bytes of UTF-16 text; a pair counts 1, since it decodes to 0 or 1.
TAVO_API std::size_t UTF16u8strlen(const unsigned short* source, std::size_t n);
TAVO_API std::size_t acfWu8strlen(const wchar_t* source, std::size_t n);
/// Units before the terminator, at most n, nothing decoded. Guarded: 0 when any part of the text cannot be read, at the
/// cost of a system call per memory page.
TAVO_API std::size_t UTF16wstrlen(const unsigned short* source, std::size_t n);
TAVO_API std::size_t acfWu16strlen(const wchar_t* source, std::size_t n);
/// Units of UTF-32 text; a value above 110000 ends it. The element at index n is examined too: the array holds n + 1
/// elements or a terminator before. n = 0 counts 0.
TAVO_API std::size_t UTF32wstrlen(const ulong32* source, std::size_t n);
TAVO_API std::size_t UTF32u16strlen(const ulong32* source, std::size_t n);
/// UTF-8 bytes of UTF-32 text, index n included as above; a value from 110000 up ends it.
TAVO_API std::size_t UTF32u8strlen(const ulong32* source, std::size_t n);

// Step converters: one character each; both pointers advance behind what was read and written. False is failure, and
// leaves the output and both pointers as they were, except where the function says otherwise.
// Requires: non-null pointers, terminated sources, room for the longest character (4 bytes or 2 units).

/// Decodes one sequence. A byte that begins none stores 0; a bad continuation byte stores what was decoded before it
/// and leaves @p in on that byte.
TAVO_API bool utf8_acfW32(ulong32* out, const unsigned char*& in);
/// Decodes one unit or pair; a pair to 0 or 1.
TAVO_API bool acfW_acfW32(ulong32* out, const wchar_t*& in);
TAVO_API bool utf16_acfW32(ulong32* out, const unsigned short*& in);
/// Encodes one code point as 1 to 4 bytes; surrogates too. Fails above 10FFFF.
TAVO_API bool acfW32_utf8(unsigned char*& out, ulong32 codePoint);
/// Encodes one code point as 1 or 2 units, without the offset of 10000 (see above). Fails above 10FFFF.
TAVO_API bool acfW32_acfW(wchar_t*& out, ulong32 codePoint);
TAVO_API bool acfW32_utf16(unsigned short*& out, ulong32 codePoint);
/// utf8_acfW32, then acfW32_acfW. A failure moves @p in as the first does; a value above 10FFFF fails behind its
/// sequence.
TAVO_API bool utf8_acfW(wchar_t*& out, const unsigned char*& in);
TAVO_API bool utf8_utf16(unsigned short*& out, const unsigned char*& in);
/// Copies one unit as it is; always true.
TAVO_API bool utf16_acfW(wchar_t*& out, const unsigned short*& in);
/// acfW_acfW32, then acfW32_utf8; a pair becomes the byte 0 or 1.
TAVO_API bool acfW_utf8(unsigned char*& out, const wchar_t*& in);
TAVO_API bool utf16_utf8(unsigned char*& out, const unsigned short*& in);
/// acfW_acfW32, the value as one unit; a pair becomes the unit 0 or 1.
TAVO_API bool acfW_utf16(unsigned short*& out, const wchar_t*& in);

// Whole-string converters: with a null target the size needed, terminator included; else the units written, terminator
// included. 0 is failure: a null source, a capacity below the size needed (nothing is written then), or a sequence that
// was measured but cannot be converted (the units before it stay, no terminator).
// What is invalid ends a text silently: 41 80 42 gives the one letter 41 with result 2. But behind a character that
// takes more than one target unit, an invalid sequence makes the result 0. And F4 90 80 80, beyond 10FFFF, measures 3
// and then converts to 0. A text that the source length or the terminator cuts is no failure.

/// UTF-8 to wide text; lengths and result in source and target units. At most @p targetCapacity units are written.
TAVO_API std::size_t UTF8_To_acfWChar(const unsigned char* source, std::size_t sourceLength, wchar_t* target,
                                      std::size_t targetCapacity);
/// Wide text to UTF-8, as above; a pair becomes the byte 0 or 1.
TAVO_API std::size_t acfWChar_To_UTF8(const wchar_t* source, std::size_t sourceLength, unsigned char* target,
                                      std::size_t targetCapacity);

namespace OS {

/// Text of the ANSI code page (Linux: UTF-8, whatever the locale) to wide text, by the rules of the system's
/// conversion. Lengths are cut to 32-bit signed numbers: a negative source length (SIZE_MAX) means up to and including
/// the terminator; any other is converted as it is, without one. Capacity 0 asks for the size.
/// @return units written or needed; 0 on failure, a capacity too small included: the target is undefined then.
TAVO_API std::size_t ANSI_To_acfWChar(const char* source, std::size_t sourceLength, wchar_t* target,
                                      std::size_t targetCapacity);
/// Wide text to text of the ANSI code page, as above.
TAVO_API std::size_t acfWChar_To_ANSI(const wchar_t* source, std::size_t sourceLength, char* target,
                                      std::size_t targetCapacity);

} // namespace OS

// --- Strings of one character set ----------------------------------------------------------------------------------
//
// Each owns a zero-terminated buffer or none; every copy allocates its own. Text null is the absent string: the
// default, the result of a null source, of a failed allocation and of a failed ANSI conversion. It is not the empty
// text, which has a buffer. Conversions follow the rules above; what is invalid ends the text, and what was converted
// is kept. A new text is built before the old one is freed, so a source inside the string's own text is safe.
//
// len() is a record of the last assignment, not a measure: see each class. Look at operator bool before using it.

class CUTF8Char;
class CUTF16Char;
class CANSIChar;

/// Wide text, the library's working string.
/// len() counts the terminator after an assignment from wide text (a copy included) and from ANSI text, and does not
/// after one from UTF-8, UTF-16 or UTF-32. A null source gives 0. From wide text it is set even when the allocation
/// fails.
class TAVO_API CACFWChar {
public:
    CACFWChar() noexcept = default;
    CACFWChar(const CACFWChar& other);
    CACFWChar(const wchar_t* text);
    /// UTF-16 units, copied as they are.
    CACFWChar(const unsigned short* text);
    /// UTF-8.
    CACFWChar(const unsigned char* text);
    /// UTF-32; a value above 10FFFF ends the text.
    CACFWChar(const ulong32* text);
    /// The ANSI code page.
    CACFWChar(const char* text);
    CACFWChar(const CUTF8Char& text);
    CACFWChar(const CUTF16Char& text);
    CACFWChar(const CANSIChar& text);
    ~CACFWChar();

    /// Assigned to itself, a string keeps its text and gets the length of one assigned from wide text.
    CACFWChar& operator=(const CACFWChar& other);
    CACFWChar& operator=(const wchar_t* text);
    CACFWChar& operator=(const unsigned short* text);
    CACFWChar& operator=(const unsigned char* text);
    CACFWChar& operator=(const ulong32* text);
    CACFWChar& operator=(const char* text);
    CACFWChar& operator=(const CUTF8Char& text);
    CACFWChar& operator=(const CUTF16Char& text);
    CACFWChar& operator=(const CANSIChar& text);

    /// Replaces every "%s" by @p text, which is not scanned again. Null changes nothing, nor does a failed allocation.
    /// len() grows by the inserted units and not by less for the removed ones, so it is above the true count
    /// afterwards.
    void patch_percent_s_with(const wchar_t* text);

    std::size_t len() const noexcept { return m_length; }
    /// Whether there is a text; "" is one.
    operator bool() const noexcept { return m_text != nullptr; }
    /// The text, null when absent; valid until the next change.
    const wchar_t* operator*() const noexcept { return m_text; }
    operator const wchar_t*() const noexcept { return m_text; }

private:
    wchar_t* m_text = nullptr;
    std::size_t m_length = 0;
};

/// UTF-8 text. len() counts the bytes without the terminator.
/// A null UTF-8 source, a copy of an absent string included, gives len() SIZE_MAX; any other null source 0.
class TAVO_API CUTF8Char {
public:
    CUTF8Char() noexcept = default;
    CUTF8Char(const CUTF8Char& other);
    CUTF8Char(const wchar_t* text);
    CUTF8Char(const unsigned short* text);
    CUTF8Char(const unsigned char* text);
    /// The ANSI code page.
    CUTF8Char(const char* text);
    CUTF8Char(const CACFWChar& text);
    CUTF8Char(const CUTF16Char& text);
    CUTF8Char(const CANSIChar& text);
    ~CUTF8Char();

    /// Assigned to itself, a string stays as it is.
    CUTF8Char& operator=(const CUTF8Char& other);
    CUTF8Char& operator=(const wchar_t* text);
    CUTF8Char& operator=(const unsigned short* text);
    CUTF8Char& operator=(const unsigned char* text);
    CUTF8Char& operator=(const char* text);
    CUTF8Char& operator=(const CACFWChar& text);
    CUTF8Char& operator=(const CUTF16Char& text);
    CUTF8Char& operator=(const CANSIChar& text);

    std::size_t len() const noexcept { return m_length; }
    /// Whether there is a text; "" is one.
    operator bool() const noexcept { return m_text != nullptr; }
    /// The text, null when absent; valid until the next change.
    const unsigned char* operator*() const noexcept { return m_text; }
    operator const unsigned char*() const noexcept { return m_text; }

private:
    unsigned char* m_text = nullptr;
    std::size_t m_length = 0;
};

/// UTF-16 text. len() counts the units without the terminator.
/// A null UTF-16 source, a copy of an absent string included, gives len() SIZE_MAX; any other null source 0.
class TAVO_API CUTF16Char {
public:
    CUTF16Char() noexcept = default;
    CUTF16Char(const CUTF16Char& other);
    /// Wide text, decoded: a pair becomes the unit 0 or 1.
    CUTF16Char(const wchar_t* text);
    /// Copied as it is.
    CUTF16Char(const unsigned short* text);
    /// UTF-8.
    CUTF16Char(const unsigned char* text);
    /// The ANSI code page.
    CUTF16Char(const char* text);
    CUTF16Char(const CACFWChar& text);
    CUTF16Char(const CUTF8Char& text);
    CUTF16Char(const CANSIChar& text);
    ~CUTF16Char();

    /// Assigned to itself, a string stays as it is.
    CUTF16Char& operator=(const CUTF16Char& other);
    CUTF16Char& operator=(const wchar_t* text);
    CUTF16Char& operator=(const unsigned short* text);
    CUTF16Char& operator=(const unsigned char* text);
    CUTF16Char& operator=(const char* text);
    CUTF16Char& operator=(const CACFWChar& text);
    CUTF16Char& operator=(const CUTF8Char& text);
    CUTF16Char& operator=(const CANSIChar& text);

    std::size_t len() const noexcept { return m_length; }
    /// Whether there is a text; "" is one.
    operator bool() const noexcept { return m_text != nullptr; }
    /// The text, null when absent; valid until the next change.
    const unsigned short* operator*() const noexcept { return m_text; }
    operator const unsigned short*() const noexcept { return m_text; }

private:
    unsigned short* m_text = nullptr;
    std::size_t m_length = 0;
};

/// Text of the ANSI code page (Linux: UTF-8). len() counts the bytes without the terminator; a null source gives 0.
class TAVO_API CANSIChar {
public:
    CANSIChar() noexcept = default;
    CANSIChar(const CANSIChar& other);
    CANSIChar(const wchar_t* text);
    CANSIChar(const char* text);
    CANSIChar(const CACFWChar& text);
    ~CANSIChar();

    /// Assigned to itself, a string stays as it is.
    CANSIChar& operator=(const CANSIChar& other);
    CANSIChar& operator=(const wchar_t* text);
    CANSIChar& operator=(const char* text);
    CANSIChar& operator=(const CACFWChar& text);

    std::size_t len() const noexcept { return m_length; }
    /// Whether there is a text; "" is one.
    operator bool() const noexcept { return m_text != nullptr; }
    /// The text, null when absent; valid until the next change.
    const char* operator*() const noexcept { return m_text; }
    operator const char*() const noexcept { return m_text; }

private:
    char* m_text = nullptr;
    std::size_t m_length = 0;
};

static_assert(sizeof(CACFWChar) == 16 && sizeof(CUTF8Char) == 16 && sizeof(CUTF16Char) == 16 && sizeof(CANSIChar) == 16,
              "a string is its text and its length");

// --- Wide-character utilities --------------------------------------------------------------------------------------
//
// Letters fold A to Z and a to z and nothing else, on every platform and in every locale: stored hashes depend on it.
// All texts are zero-terminated.

/// A to Z to lower case; every other unit as it is.
TAVO_API wchar_t wctolower(const wchar_t& c);
/// a to z to upper case; every other unit as it is.
TAVO_API wchar_t wctoupper(const wchar_t& c);
/// Maps a text in place; null is ignored.
TAVO_API void wcslower(wchar_t* text);
TAVO_API void wcsupper(wchar_t* text);

/// 0 for the same letter in any case, else the difference of the two in lower case.
TAVO_API int wccmpi(wchar_t a, wchar_t b);
/// Compares two texts regardless of case: 0, or the difference of the first two units that differ in lower case.
/// Null and null are equal; a null text sorts AFTER every other, so null against a text gives 1, the reverse -1.
TAVO_API int wcscmpi(const wchar_t* a, const wchar_t* b);
/// wcscmpi over at most @p n units. n is taken as a 32-bit signed count: below 1, SIZE_MAX included, two texts are
/// equal. Null pointers are answered first, as wcscmpi does.
TAVO_API int wcsncmpi(const wchar_t* a, const wchar_t* b, std::size_t n);

/// Whether @p part occurs in @p text. True for one pointer given twice, null or empty included; else false when either
/// is null or empty.
TAVO_API bool wcscnt(const wchar_t* text, const wchar_t* part);
/// wcscnt within the first @p n units, which the whole occurrence must lie in. Nothing is read at or behind index n.
TAVO_API bool wcsncnt(const wchar_t* text, const wchar_t* part, std::size_t n);
/// wcscnt and wcsncnt regardless of case.
TAVO_API bool wcscnti(const wchar_t* text, const wchar_t* part);
TAVO_API bool wcsncnti(const wchar_t* text, const wchar_t* part, std::size_t n);
/// How many units of @p text equal @p c; 0 for null.
TAVO_API std::size_t wcscount(const wchar_t* text, wchar_t c);

/// '/' or '\'.
TAVO_API bool _isSlash(wchar_t c);
/// The space only, not the tab.
TAVO_API bool _isblank(wchar_t c);
/// Space, tab, line feed or carriage return.
TAVO_API bool _iswhitespace(wchar_t c);
/// Line feed or carriage return.
TAVO_API bool _isCRLF(wchar_t c);

// --- The string pool -----------------------------------------------------------------------------------------------
//
// Every distinct text is stored once in the process, as a reference-counted entry. Handles are one pointer; they
// compare and hash by their entries' precomputed fields. Entries that nobody holds stay until two sweeps in a row find
// them idle.
//
// Texts of equal length, equal hashes (two of 64 bits) and equal first ten units are one entry.
// A character above U+FFFF counts 1 in len() when it came as a pair of wide text, and 2 when it came as UTF-8; all its
// units are stored in both cases, so a text may have more units than len() says. The two are never one entry.

class CPPoolString;

namespace detail {

// What a pool entry holds; its text follows in the same block.
struct tagPOOLENTRY {
    std::uint32_t idleSweeps;  // how many sweeps in a row found the entry unreferenced
    std::size_t length;        // units as the key counts them: a pair of wide text counts 1
    std::size_t utf8Size;      // bytes of the text in UTF-8
    unsigned long long hash;   // CRC-64 of the text
    unsigned long long hashi;  // CRC-64 of the text in lower case
    const wchar_t* text;       // the zero-terminated text behind these fields
    const unsigned char* utf8; // the UTF-8 form, null until first asked for
};

} // namespace detail

/// Writes a text straight into a new pool entry.
class IStringSubmitter {
public:
    /// Units of the text to come.
    virtual std::size_t GetStringLen() = 0;
    /// Writes the text, at most GetStringLen() units, into @p out, which is zeroed and has room for a terminator.
    /// @return false to refuse. Called without any lock; an exception counts as false.
    virtual bool GetString(wchar_t* out) = 0;

protected:
    ~IStringSubmitter() = default;
};

/// The process-wide pool. Thread-safe; works from any static constructor or destructor, before AppInit and after
/// AppExit.
///
/// The names tell what a call does: Get interns a missing text, Query answers the null string for it; an "i" matches
/// regardless of case (A to Z) and answers the first variant interned; an "n" takes at most n units or bytes of the
/// text, never reading at or behind index n, and leaves out a character that this cuts. Null pointers give the null
/// string, empty texts the empty one; a text with an invalid sequence cannot be interned and gives the null string, as
/// does exhausted memory.
class TAVO_API CStringPool {
public:
    static CPPoolString GetStringRef(const wchar_t* text) noexcept;
    static CPPoolString GetStringRefn(const wchar_t* text, std::size_t n) noexcept;
    static CPPoolString QueryStringRef(const wchar_t* text) noexcept;
    static CPPoolString QueryStringRefn(const wchar_t* text, std::size_t n) noexcept;
    static CPPoolString GetStringRefi(const wchar_t* text) noexcept;
    static CPPoolString GetStringRefni(const wchar_t* text, std::size_t n) noexcept;
    static CPPoolString QueryStringRefi(const wchar_t* text) noexcept;
    static CPPoolString QueryStringRefni(const wchar_t* text, std::size_t n) noexcept;

    /// The same for UTF-8.
    static CPPoolString GetStringRef(const unsigned char* text) noexcept;
    static CPPoolString GetStringRefn(const unsigned char* text, std::size_t n) noexcept;
    static CPPoolString QueryStringRef(const unsigned char* text) noexcept;
    static CPPoolString QueryStringRefn(const unsigned char* text, std::size_t n) noexcept;
    static CPPoolString GetStringRefi(const unsigned char* text) noexcept;
    static CPPoolString GetStringRefni(const unsigned char* text, std::size_t n) noexcept;
    static CPPoolString QueryStringRefi(const unsigned char* text) noexcept;
    static CPPoolString QueryStringRefni(const unsigned char* text, std::size_t n) noexcept;

    /// UTF-16, as wide text.
    static CPPoolString GetStringRefn(const unsigned short* text, std::size_t n) noexcept;

    /// Interns what the submitter writes. A text shorter than announced is cut to size; one that starts with 0 is the
    /// empty string. No announced units raise an assertion and give the null string.
    static CPPoolString GetStringRef(IStringSubmitter* submitter) noexcept;

    /// Sweeps the pool for at most @p budget milliseconds, going on where the last sweep ended: an entry found
    /// unreferenced loses its UTF-8 form, and goes when the next sweep finds it so again. Looking a text up does not
    /// prolong its life.
    /// Then the heap is asked to give free memory of the calling thread's back to the system.
    /// @return true when a whole round finished in time. False, and nothing is done, unless the calling thread has
    ///         normal priority.
    static bool Collect(ulong32 budget) noexcept;
    /// Recomputes the keys of all entries; false at the first damaged one, and an assertion.
    static bool Verify() noexcept;
    /// Bytes of all entries, their block headers not counted.
    static unsigned long long GetSize() noexcept;
    /// The number of entries.
    static unsigned long long GetNItems() noexcept;

    /// Starts the background sweeps alone, which TAVO::AppInit does too: creates the pool's maintenance request and
    /// registers it; it runs while the maintenance thread does. False when there is one already, so an AppInit of the
    /// library after this one fails.
    static bool AppInit() noexcept;
    /// Stops the background sweeps, waiting for a sweep that runs.
    static void AppExit() noexcept;
};

/// Immutable text: a handle of a pool entry, one pointer, never null. The null string is a static entry without text,
/// the empty string another one with the text ""; the two are different. Copying costs one atomic increment; comparison
/// by entry costs nothing. Threads: as for every handle; the UTF-8 form is made safely by whoever asks first.
class TAVO_API CPPoolString : private Buffers::CPObjectMemory {
public:
    static const CPPoolString ptrue;  ///< "true"
    static const CPPoolString pfalse; ///< "false"
    static const CPPoolString pempty; ///< ""

    /// Identifies vectors and arrays of pooled strings by their element type.
    static std::size_t GetTypeID() noexcept;

    /// The null string.
    CPPoolString() noexcept : CPObjectMemory(NullBlock()) {}
    CPPoolString(std::nullptr_t) noexcept : CPPoolString() {}
    CPPoolString(const CPPoolString& other) noexcept = default;
    /// @p other is the null string afterwards.
    CPPoolString(CPPoolString&& other) noexcept : CPObjectMemory(std::exchange(other.m_pMH, NullBlock())) {}
    CPPoolString& operator=(const CPPoolString& other) noexcept = default;
    CPPoolString& operator=(CPPoolString&& other) noexcept {
        if (this != &other) TransferFrom(other);
        return *this;
    }
    ~CPPoolString() = default;

    /// Interned wide text.
    CPPoolString(const wchar_t* text) noexcept;
    /// Interned UTF-8.
    CPPoolString(const unsigned char* text) noexcept;
    /// Interned text of the ANSI code page.
    CPPoolString(const char* text) noexcept;
    /// The decimal text of the number's low 32 bits, signed as its type is: 4294967297ULL gives "1".
    template <class Number, std::enable_if_t<std::is_integral<Number>::value && !std::is_same<Number, bool>::value &&
                                                 !std::is_same<Number, wchar_t>::value,
                                             int> = 0>
    CPPoolString(Number number) noexcept
        : CPPoolString(static_cast<std::uint32_t>(number), std::is_signed<Number>::value) {}
    /// ptrue or pfalse; only for bool itself, so that no pointer becomes "true".
    template <class Bool, std::enable_if_t<std::is_same<Bool, bool>::value, bool> = true>
    CPPoolString(Bool value) noexcept : CPPoolString(value ? ptrue : pfalse) {}

    /// The text, never null; that of the null string is empty. It may hold more units than len() says, by one for each
    /// pair: size a copy by the terminator.
    operator const wchar_t*() const noexcept { return Entry().text; }
    /// The text in UTF-8, made on first use and kept with the entry while anyone holds it. Empty where UTF-8 has no
    /// form for the text (by this library's rules two pairs already) or memory is out.
    operator const unsigned char*() const noexcept;
    /// Units, a pair counting 1.
    std::size_t len() const noexcept { return Entry().length; }
    /// Bytes of the UTF-8 form.
    std::size_t UTF8Size() const noexcept { return Entry().utf8Size; }
    /// CRC-64 of the text, and of the text in lower case; 0 for the null and the empty string.
    unsigned long long sHash() const noexcept { return Entry().hash; }
    unsigned long long sHashi() const noexcept { return Entry().hashi; }

    /// Whether this is not the null string; the empty string is true.
    operator bool() const noexcept { return !isnull(); }
    bool isnull() const noexcept;
    bool isempty() const noexcept;
    /// Neither null nor empty.
    bool isdef() const noexcept { return Entry().length != 0; }

    /// Becomes the null string.
    void free() noexcept;
    /// Takes over @p other, which becomes the null string, without counting.
    void TransferFrom(CPPoolString& other) noexcept;
    /// Checks the entry against its text; false and an assertion when it is damaged.
    bool Verify() const noexcept;
    /// The text with its trailing decimal number raised by one, its width kept ("clip009" gives "clip010"); without
    /// such a number 1 is appended. The null string stays null.
    CPPoolString inc() const noexcept;

    /// Same entry: for strings interned alike the same as equal texts.
    bool operator==(const CPPoolString& other) const noexcept { return m_pMH == other.m_pMH; }
    bool operator!=(const CPPoolString& other) const noexcept { return !(*this == other); }
    /// Equal texts, by cmp.
    bool operator==(const wchar_t* other) const noexcept { return cmp(other) == 0; }
    bool operator!=(const wchar_t* other) const noexcept { return cmp(other) != 0; }

    // Comparisons: negative, 0 or positive. Raw texts are zero-terminated; a null one is the null string.

    /// Order of the units. The null string comes before everything, also before the empty string.
    int cmp(const CPPoolString& other) const noexcept;
    int cmp(const wchar_t* other) const noexcept;
    /// The same regardless of case; null and empty are equal here, and a null pointer comes AFTER every text.
    int cmpi(const CPPoolString& other) const noexcept;
    int cmpi(const wchar_t* other) const noexcept;
    /// 0 when this text starts with the other; -1 when it is shorter.
    int cmpp(const CPPoolString& other) const noexcept;
    int cmpp(const wchar_t* other) const noexcept;
    int cmppi(const CPPoolString& other) const noexcept;
    int cmppi(const wchar_t* other) const noexcept;
    /// 0 when this text ends with the other; -1 when it is shorter. Counted by len(): with pairs in the text it looks
    /// one unit per pair too early.
    int cmp_p(const CPPoolString& other) const noexcept;
    int cmp_p(const wchar_t* other) const noexcept;
    int cmp_pi(const CPPoolString& other) const noexcept;
    int cmp_pi(const wchar_t* other) const noexcept;
    /// Whether the other text occurs in this one, within len() units.
    bool cnt(const CPPoolString& other) const noexcept;
    bool cnt(const wchar_t* other) const noexcept;
    bool cnti(const CPPoolString& other) const noexcept;
    bool cnti(const wchar_t* other) const noexcept;
    /// Order of the entries' addresses: total, and stable while both live.
    int pcmp(const CPPoolString& other) const noexcept;
    /// Whether the texts are equal regardless of case; decided by the hashes nearly always.
    bool iequals(const CPPoolString& other) const noexcept;

private:
    friend class PoolAccess; // the library's own road to the entry's block

    constexpr explicit CPPoolString(Buffers::tagCPOMEMHEADER* entry) noexcept : CPObjectMemory(entry) {}
    CPPoolString(std::uint32_t number, bool isSigned) noexcept;

    static Buffers::tagCPOMEMHEADER* NullBlock() noexcept;
    const detail::tagPOOLENTRY& Entry() const noexcept { return *static_cast<const detail::tagPOOLENTRY*>(Payload()); }
};
static_assert(sizeof(CPPoolString) == sizeof(void*), "a pooled string is one pointer");

} // namespace String

namespace Buffers {
extern template class TAVO_TEMPLATE_DECL CPObjectVector<String::CPPoolString>;
} // namespace Buffers

namespace String {

/// Vector of pooled strings that can be kept sorted and free of duplicates, joined into one string and split from one.
/// Copies share their elements until one of them changes.
class TAVO_API CPPoolStringArray {
public:
    /// An empty array. @p sorted makes it a sorted set without duplicates, for good.
    explicit CPPoolStringArray(bool sorted) noexcept : m_sorted(sorted) {}
    CPPoolStringArray(const CPPoolStringArray& other) noexcept = default;
    CPPoolStringArray& operator=(const CPPoolStringArray& other) noexcept = default;
    /// Shares the block if it holds pooled strings, else becomes empty; then sorts a sorted array (duplicates stay;
    /// empty when there is no memory for sorting a copy).
    CPPoolStringArray& operator=(const Buffers::CPObjectMemory& block) noexcept;

    /// Sorts the elements by cmp.
    void Sort() noexcept;
    /// Sorted: inserts at its place unless it is there. Unsorted: appends. False only without memory.
    bool Add(const CPPoolString& text) noexcept;
    /// Unsorted arrays only: inserts before @p index; false beyond the end.
    bool Insert(const CPPoolString& text, std::size_t index) noexcept;
    /// Sorted arrays only: removes the string; true also when it is not there.
    bool Delete(const CPPoolString& text) noexcept;
    /// Sorted: where the string stands or would stand. All-ones for an unsorted array, or one that never held an
    /// element.
    std::size_t LocateEntry(const CPPoolString& text) const noexcept;

    /// All elements joined by the separator as one pooled string; the null string for an empty array, the empty string
    /// when there is nothing to join but one null or empty element.
    CPPoolString Flatten(wchar_t separator) const noexcept;
    /// Replaces the elements by the pieces of @p text between separators. Empty pieces become null strings, but for a
    /// trailing one, which is left out. With separator 0 the text is one piece. False when memory is out.
    bool Inflate(const CPPoolString& text, wchar_t separator) noexcept;

    std::size_t GetNItems() const noexcept { return m_elements.GetNItems(); }
    bool isEmpty() const noexcept { return m_elements.isEmpty(); }
    bool IsSorted() const noexcept { return m_sorted; }
    /// No bounds check.
    const CPPoolString& operator[](std::size_t index) const noexcept { return m_elements[index]; }

private:
    bool IsInOrder() const noexcept;
    bool AddPiece(const wchar_t* start, std::size_t units) noexcept;

    Buffers::CPObjectVector<CPPoolString> m_elements;
    bool m_sorted;
};

/// Joins strings with a separator.
class TAVO_API CStringArraySubmitter : public IStringSubmitter {
public:
    CStringArraySubmitter(const CPPoolString* first, std::size_t count, wchar_t separator) noexcept
        : m_first(first), m_count(count), m_separator(separator) {}
    std::size_t GetStringLen() override;
    bool GetString(wchar_t* out) override;

private:
    const CPPoolString* m_first;
    std::size_t m_count;
    wchar_t m_separator;
};

/// A piece of a text: @p count units from @p start, which must stay until the call that takes the submitter returns.
class TAVO_API CSubStringSubmitter : public IStringSubmitter {
public:
    CSubStringSubmitter(const wchar_t* start, std::size_t count) noexcept : m_start(start), m_count(count) {}
    std::size_t GetStringLen() override { return m_count; }
    bool GetString(wchar_t* out) override;

private:
    const wchar_t* m_start;
    std::size_t m_count;
};

// --- Bytes as text -------------------------------------------------------------------------------------------------
//
// Two ways to carry bytes in a pooled string. Take 3FFF: it brings every block back, and needs fewer units.
//
//          bytes -> units of a group   header unit                units of the groups
//   3F     3 -> 4, 6 bits in each      0100 + 3 - size % 3        0001 to 00FF
//   3FFF   7 -> 4, 14 bits in each     0300 + 7 - size % 7        4000 to 7FFF
//
// A text is its header and its groups; size 0 is a header alone. The header tells how many bytes pad the last group,
// where 3 (3F) and 7 (3FFF) stand for none. It is no encryption: there is no key.
//
// An encoder writes its text straight into the pool entry and keeps the bytes' address, so they must stay while it is
// given to the pool again. It holds the null string when the bytes are null with a size above 0, or memory is out. A
// decoder reads nothing behind the text's end and gives empty memory when it refuses the text or memory is out.
// Encoded texts are pooled like all others: two whose lengths, first ten units and hashes agree are one entry, and 3FFF
// has the same hash twice. Chance does not produce that, but the author of the bytes can.

/// Bytes as 3F text, for hosts that have such texts; new ones take C3FFFEncoder.
/// 3F does not bring every block back, and stays so, since stored texts depend on it: the decoder refuses every block
/// whose size is a multiple of 3, and reads some bytes back changed (7,680 of the 65,536 blocks of two bytes, and most
/// long ones). Units 1 to 4 and 11 to 14 (hexadecimal), which it uses, are not allowed in XML documents. It takes about
/// 1.5 bytes of UTF-8 for each byte, 3FFF 1.7; of UTF-16 2.7, 3FFF 1.1.
class TAVO_API C3FEncoder final : public IStringSubmitter {
public:
    C3FEncoder(const void* data, std::size_t size) noexcept;
    C3FEncoder(const Buffers::CPPlainMemory& bytes) noexcept;
    /// The encoded text.
    operator CPPoolString() const noexcept { return m_text; }

private:
    std::size_t GetStringLen() override;
    bool GetString(wchar_t* out) override;

    CPPoolString m_text;
    const void* m_data;
    std::size_t m_size;
};

/// 3F text as bytes. Null, another header than 0100 to 0102, and a length that is not a multiple of 4 behind the header
/// are refused with a log line; any units are taken. See C3FEncoder for what does not come back.
class TAVO_API C3FDecoder final {
public:
    C3FDecoder(const wchar_t* text) noexcept;
    C3FDecoder(const CPPoolString& text) noexcept;
    /// The decoded bytes.
    operator Buffers::CPPlainMemory() const noexcept { return m_bytes; }

private:
    Buffers::CPPlainMemory m_bytes;
};

/// Bytes as 3FFF text: 4 units for 7 bytes, every block comes back. Its header is a combining character and its units
/// are assigned characters, so the text passes through XML documents and every encoding of Unicode.
class TAVO_API C3FFFEncoder final : public IStringSubmitter {
public:
    C3FFFEncoder(const void* data, std::size_t size) noexcept;
    C3FFFEncoder(const Buffers::CPPlainMemory& bytes) noexcept;
    /// The encoded text.
    operator CPPoolString() const noexcept { return m_text; }

private:
    std::size_t GetStringLen() override;
    bool GetString(wchar_t* out) override;

    CPPoolString m_text;
    const void* m_data;
    std::size_t m_size;
};

/// 3FFF text as bytes. Refused, without a log line, are null, another header than 0301 to 0307, padding without a
/// group, a length that is not a multiple of 4 behind the header, and units outside 4000 to 7FFF. Padding bytes may
/// hold anything.
class TAVO_API C3FFFDecoder final {
public:
    C3FFFDecoder(const wchar_t* text) noexcept;
    C3FFFDecoder(const CPPoolString& text) noexcept;
    /// The decoded bytes.
    operator Buffers::CPPlainMemory() const noexcept { return m_bytes; }

private:
    Buffers::CPPlainMemory m_bytes;
};

} // namespace String
} // namespace TAVO
