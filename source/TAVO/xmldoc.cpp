// Documents: opening files and texts, finding out their encoding, telling the first error.

#include "format.h"
#include "platform/heap.h"
#include "transcoding.h"
#include "xmlnames.h"
#include "xmlparser.h"

#include <cstring>
#include <memory>
#include <TAVO/develop.h>
#include <TAVO/files.h>
#include <TAVO/xml.h>

namespace TAVO::XML {

using namespace detail;
using namespace String::detail;

namespace {

constexpr const wchar_t* kMessages[] = {L"Bad file",
                                        L"End of file",
                                        L"Open comment",
                                        L"Open string",
                                        L"Open enclosure",
                                        L"Invalid tag",
                                        L"Bad attribute",
                                        L"Bad escape",
                                        L"External replacement",
                                        L"Open CDATA section",
                                        L"Bad data terminator",
                                        L"Version != 1.0",
                                        L"Unsupported encoding specified",
                                        L"Bad character encoding",
                                        L"Bad termination tag",
                                        L"Mixed content",
                                        L"Illegal character",
                                        L"Root element missing", // the message of a second root, by contract
                                        L"DOM error"};
static_assert(std::size(kMessages) == kDomError + 1);

constexpr wchar_t kMark = 0xFEFF, kSwappedMark = 0xFFFE;

struct FreeBlock {
    void operator()(void* block) const { Platform::Release(block); }
};
template <class T> using Owned = std::unique_ptr<T[], FreeBlock>;

template <class T> Owned<T> NewRun(std::size_t count) {
    return Owned<T>(static_cast<T*>(Platform::Allocate(count * sizeof(T))));
}

// --- the message of an error ---------------------------------------------------------------------------------------

// Writes text with its room in sight; what does not fit is left out.
class Message {
public:
    static constexpr std::size_t kRoom = 160; // the longest message has 139 characters

    std::size_t Length() const { return m_length; }
    const wchar_t* Text() {
        m_text[m_length] = 0;
        return m_text;
    }
    void Add(wchar_t c) {
        if (m_length < kRoom - 1) m_text[m_length++] = c;
    }
    void Add(const wchar_t* text) {
        while (*text) Add(*text++);
    }

    // The character at `at`, which moves behind it; units without a character are left out.
    void AddCharacter(const unsigned char*& at, const unsigned char* end) {
        const std::size_t units = Utf8Sequence(at, static_cast<std::size_t>(end - at));
        if (units == 0) {
            ++at;
            return;
        }
        ulong32 value;
        StepUtf8(value, at);
        wchar_t pair[2], *last = pair;
        if (value == 0 || IsSurrogateValue(value) || !EncodeUtf16(last, value)) return;
        for (const wchar_t* unit = pair; unit < last; ++unit) Add(*unit);
    }
    void AddCharacter(const wchar_t*& at, const wchar_t* end) {
        const std::size_t units = Utf16Sequence(at, static_cast<std::size_t>(end - at));
        for (std::size_t i = 0; i < units; ++i) Add(at[i]);
        at += units ? units : 1;
    }

private:
    static bool IsSurrogateValue(ulong32 value) { return value >= 0xD800 && value <= 0xDFFF; }

    wchar_t m_text[kRoom];
    std::size_t m_length = 0;
};

template <class Unit> void Describe(Message& message, const ParseResult& error, const Unit* text, std::size_t units) {
    constexpr std::size_t kBefore = 60; // units shown before the error
    constexpr std::size_t kWhole = 120; // characters after which the tail stops

    std::uint32_t line = 1;
    for (std::size_t i = 0; i < error.offset; ++i) line += text[i] == '\n';
    wchar_t header[128];
    FormatWide(header, std::size(header), L"[%ls, Line %u, Offset %u]", kMessages[error.code], line,
               static_cast<std::uint32_t>(error.offset));
    message.Add(header);

    const Unit* at = text;
    const Unit* const where = text + error.offset;
    if (error.offset > kBefore) {
        message.Add(L"...");
        at = where - kBefore;
    }
    while (at < where) {
        if (!IsBlank(*at)) {
            message.AddCharacter(at, where);
            continue;
        }
        message.Add(L' ');
        while (at < where && IsBlank(*at)) ++at;
    }
    message.Add(L"[[*]]");
    const Unit* const end = text + units;
    while (at < end && message.Length() < kWhole) message.AddCharacter(at, end);
    if (at < end) message.Add(L"...");
}

Buffers::CPPlainMemory StoreText(const wchar_t* text) {
    Buffers::CPPlainMemory stored;
    const std::size_t size = (String::detail::WideLength(text) + 1) * sizeof(wchar_t);
    if (stored.Alloc(size)) std::memcpy(static_cast<void*>(stored), text, size);
    return stored;
}

// --- encodings -----------------------------------------------------------------------------------------------------

// What a text may begin with, for its encoding to be told from it.
bool IsStart(unsigned char byte) { return byte == '<' || byte == ' ' || byte == '\t' || byte == '\r' || byte == '\n'; }

wchar_t FirstUnit(const void* data) {
    wchar_t unit;
    std::memcpy(&unit, data, sizeof(unit));
    return unit;
}

// The units before the first zero one, at most n. The address may be odd.
std::size_t CountUnits(const void* data, std::size_t n) {
    if (reinterpret_cast<std::uintptr_t>(data) % alignof(wchar_t) == 0)
        return String::detail::WideLengthN(static_cast<const wchar_t*>(data), n);
    std::size_t count = 0;
    for (const auto* bytes = static_cast<const unsigned char*>(data); count < n; ++count, bytes += sizeof(wchar_t))
        if (FirstUnit(bytes) == 0) break;
    return count;
}

// Exchanges the bytes of every unit.
void SwapUnits(wchar_t* unit, std::size_t count) {
    for (; count; --count, ++unit) *unit = static_cast<wchar_t>(*unit << 8 | *unit >> 8);
}

// A copy, its bytes exchanged when `swap`. Null without memory.
Owned<wchar_t> CopyUnits(const void* data, std::size_t units, bool swap) {
    Owned<wchar_t> copy = NewRun<wchar_t>(units + 1);
    if (!copy) return nullptr;
    std::memcpy(copy.get(), data, units * sizeof(wchar_t));
    if (swap) SwapUnits(copy.get(), units);
    return copy;
}

} // namespace

CXMLDoc::CXMLDoc() noexcept : m_errorOffset(0), m_errorCode(kBadFile) {}
CXMLDoc::CXMLDoc(const CXMLDoc& other) noexcept = default;
CXMLDoc& CXMLDoc::operator=(const CXMLDoc& other) noexcept = default;
CXMLDoc::~CXMLDoc() = default;

void CXMLDoc::Close() noexcept {
    m_errorText.free();
    m_errorOffset = 0;
    m_errorCode = kSuccess;
    m_root.free();
}

// Closed, and failed until a text was parsed.
bool CXMLDoc::Refuse() noexcept {
    Close();
    m_errorCode = kBadFile;
    return false;
}

template <class Unit> bool CXMLDoc::ParseUnits(const Unit* text, std::size_t units, bool isAscii) noexcept {
    Close();
    if constexpr (sizeof(Unit) == 1) {
        // Intended (xml-bad-utf8): where the bad sequence lies is not told, neither by the offset nor by the message,
        // and nothing is logged.
        if (!isAscii && MeasureUtf8(text, units).ending != Ending::Length) {
            m_errorCode = kBadCharacterEncoding;
            m_errorText = StoreText(L"Offset: 0, Illegal UTF8 character");
            return false;
        }
    }
    ParseResult result = Parse(text, units);
    m_errorCode = result.code;
    // Intended (xml-no-element): also without any element, which a textbook refuses; callers look at the root.
    if (result.code == kSuccess) {
        m_root = std::move(result.root);
        return true;
    }
    Message message;
    Describe(message, result, text, units);
    Develop::_logWrite(acfDebugWarning, L"TAVO", "source/TAVO/xmldoc", 0, L"XML parsing error %ls", message.Text());
    m_errorOffset = result.offset;
    m_errorText = StoreText(message.Text());
    return false;
}

bool CXMLDoc::ParseUtf16(const void* data, std::size_t most, bool swap) noexcept {
    // Nothing behind the text is read: the size may be any above it.
    const std::size_t units = CountUnits(data, most);
    // The caller's bytes are never written: a second call would swap them back. Odd addresses are copied too.
    Owned<wchar_t> copy;
    const auto* text = static_cast<const wchar_t*>(data);
    if (swap || reinterpret_cast<std::uintptr_t>(data) % alignof(wchar_t) != 0) {
        copy = CopyUnits(data, units, swap);
        if (!copy) return Refuse();
        text = copy.get();
    }
    return ParseUnits(text, units);
}

bool CXMLDoc::OpenDocText(void* data, unsigned long long size) noexcept {
    Refuse();
    return data && ParseBytes(static_cast<const unsigned char*>(data), size, size / sizeof(wchar_t));
}

// `wideUnits` of the bytes are the text when it is UTF-16.
bool CXMLDoc::ParseBytes(const unsigned char* bytes, std::size_t size, std::size_t wideUnits) noexcept {
    if (size < 4) return false;
    if (bytes[0] == 0) return IsStart(bytes[1]) && ParseUtf16(bytes, wideUnits, true);
    if (FirstUnit(bytes) == kMark) return FirstUnit(bytes + 2) != 0 && ParseUtf16(bytes, wideUnits, false);
    if (FirstUnit(bytes) == kSwappedMark) return ParseUtf16(bytes, wideUnits, true);
    if (bytes[1] == 0 && IsStart(bytes[0])) return ParseUtf16(bytes, wideUnits, false);
    bool isAscii;
    const std::size_t units = Simd::ZeroUnit(bytes, size, &isAscii);
    return ParseUnits(bytes, units, isAscii);
}

bool CXMLDoc::OpenDocText(const unsigned char* text) noexcept {
    if (!text) return Refuse();
    bool isAscii;
    const std::size_t units = Simd::ZeroUnit(text, SIZE_MAX, &isAscii);
    return ParseUnits(text, units, isAscii);
}

bool CXMLDoc::OpenDocText(const wchar_t* text) noexcept {
    return text ? ParseUnits(text, String::detail::WideLength(text)) : Refuse();
}

bool CXMLDoc::OpenDocText(const unsigned short* text) noexcept {
    return OpenDocText(reinterpret_cast<const wchar_t*>(text));
}

bool CXMLDoc::OpenDocFile(const wchar_t* path, eXMLEncoding encoding) noexcept {
    Refuse();
    if (!Files::OS::_TestFileExists(path)) return false;
    Files::OS::CFile file;
    if (!file.Open(path, Files::OS::FileAccessRead | Files::OS::FileAccessShareRead, Files::OS::OpenFileExisting))
        return false;
    const std::size_t size = file.GetSize();
    if (size > 0xFFFFFFFF) return false;

    // Zero bytes follow the data: two belong to the text, and every unit that begins in it is whole.
    Owned<unsigned char> data = NewRun<unsigned char>(size + 4);
    if (!data) return false;
    ulong32 done = 0;
    if (!file.Read(data.get(), static_cast<ulong32>(size), &done) || done != size) return false;
    std::memset(data.get() + size, 0, 4);
    file.Close();
    const std::size_t units = size / sizeof(wchar_t); // a last odd byte of UTF-16 is no part of the text

    switch (encoding) {
    case XMLEncodingAutomatic:
    case XMLEncodingUTF8:
        break; // forces nothing
    case XMLEncodingUTF16:
        if (FirstUnit(data.get()) == kSwappedMark)
            SwapUnits(reinterpret_cast<wchar_t*>(data.get()), CountUnits(data.get(), units));
        break;
    case XMLEncodingUTF16Raw:
        if (FirstUnit(data.get()) != kMark) return false;
        break;
    default:
        return false;
    }
    return ParseBytes(data.get(), size + 2, units);
}

ulong32 CXMLDoc::GetErrorInfo(unsigned long long* offset, String::CACFWChar* text) const noexcept {
    if (offset) *offset = m_errorOffset;
    if (text) {
        const auto* stored = static_cast<const wchar_t*>(static_cast<void*>(m_errorText));
        *text = stored ? stored : m_errorCode == kBadFile ? L"Bad file or bad encoding" : L"";
    }
    return m_errorCode;
}

} // namespace TAVO::XML
