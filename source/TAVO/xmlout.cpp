// Output of element trees: encoding, targets, and the element writer.

#include "xmlout.h"

#include "platform/heap.h"
#include "poolentry.h"
#include "simd.h"
#include "stack.h"
#include "xmlnames.h"
#include "xmlnode.h"

#include <algorithm>

namespace TAVO::XML {

using Buffers::Block;
using Buffers::tagCPOMEMHEADER;

// --- Encoding ------------------------------------------------------------------------------------------------------

namespace {

constexpr std::size_t kLongest = 4; // bytes of a character
constexpr std::size_t kUnitsPerBlock = Simd::kBlock / sizeof(wchar_t);

bool IsAscii(Simd::Block units) {
    return Simd::Mask(Simd::Equal16(Simd::And(units, Simd::All16(0xFF80)), Simd::All16(0))) == 0xFFFF;
}

bool HasEscape(Simd::Block units) {
    using namespace Simd;
    // & and ' differ in bit 0, < and > in bit 1.
    const Simd::Block references = Equal16(And(units, All16(0xFFFE)), All16('&'));
    const Simd::Block brackets = Equal16(And(units, All16(0xFFFD)), All16('<'));
    return Mask(Or(Or(references, brackets), Equal16(units, All16('"')))) != 0;
}

template <bool escapes> bool IsPlain(wchar_t unit) {
    return unit < 0x80 && !(escapes && (detail::kAsciiClasses[unit] & detail::kEscapeBit));
}

// The same of what Narrow made of units other than 0: 0, or a byte with the highest bit, where they are not ASCII.
template <bool escapes> TAVO_INLINE bool ArePlain(Simd::Block bytes) {
    using namespace Simd;
    Simd::Block others = Or(bytes, Equal8(bytes, All8(0)));
    if constexpr (escapes) {
        // & and ' differ in bit 0, < and > in bit 1.
        const Simd::Block references = Equal8(Or(bytes, All8(1)), All8('\''));
        const Simd::Block brackets = Equal8(Or(bytes, All8(2)), All8('>'));
        others = Or(Or(others, Equal8(bytes, All8('"'))), Or(references, brackets));
    }
    return Mask(others) == 0;
}

// Stores all units as bytes if they are ASCII, none of them 0, and with `escapes` none of & < > " '; else false. Most
// names and values are shorter than two blocks, so there is no loop over single units: the last block overlaps the one
// before it.
template <bool escapes> TAVO_INLINE bool NarrowWhole(unsigned char* out, const wchar_t* text, std::size_t count) {
    constexpr std::size_t kHalf = kUnitsPerBlock / 2;
    if (count >= Simd::kBlock) {
        for (std::size_t i = 0;; i = std::min(i + Simd::kBlock, count - Simd::kBlock)) {
            const Simd::Block bytes = Simd::Narrow(Simd::Load(text + i), Simd::Load(text + i + kUnitsPerBlock));
            if (!ArePlain<escapes>(bytes)) return false;
            Simd::Store(out + i, bytes);
            if (i + Simd::kBlock == count) return true;
        }
    }
    if (count >= kUnitsPerBlock) {
        const std::size_t last = count - kUnitsPerBlock;
        const Simd::Block bytes = Simd::Narrow(Simd::Load(text), Simd::Load(text + last));
        if (!ArePlain<escapes>(bytes)) return false;
        Simd::StoreHalf(out, bytes);
        Simd::StoreHalf(out + last, Simd::HighHalf(bytes));
        return true;
    }
    if (count >= kHalf) {
        const Simd::Block units = Simd::LoadHalves(text, text + count - kHalf);
        const Simd::Block narrow = Simd::Narrow(units, units);
        if (!ArePlain<escapes>(narrow)) return false;
        const std::uint64_t bytes = Simd::LowWord(narrow), last = bytes >> 32;
        std::memcpy(out, &bytes, kHalf);
        std::memcpy(out + count - kHalf, &last, kHalf);
        return true;
    }
    for (std::size_t i = 0; i < count; ++i) {
        if (!IsPlain<escapes>(text[i])) return false;
        out[i] = static_cast<unsigned char>(text[i]);
    }
    return true;
}

// Stores the leading ASCII units as bytes; how many. Nothing is read or written at or behind `count`.
std::size_t NarrowAscii(unsigned char* out, const wchar_t* text, std::size_t count) {
    std::size_t i = 0;
    for (; count - i >= kUnitsPerBlock; i += kUnitsPerBlock) {
        const Simd::Block units = Simd::Load(text + i);
        if (!IsAscii(units)) break;
        Simd::StoreHalf(out + i, Simd::Narrow(units, units));
    }
    for (; i < count && text[i] < 0x80; ++i) out[i] = static_cast<unsigned char>(text[i]);
    return i;
}

// The first surrogate.
const wchar_t* FindSurrogate(const wchar_t* text, const wchar_t* end) {
    for (; end - text >= static_cast<std::ptrdiff_t>(kUnitsPerBlock); text += kUnitsPerBlock) {
        const Simd::Block tops = Simd::And(Simd::Load(text), Simd::All16(0xF800));
        if (Simd::Mask(Simd::Equal16(tops, Simd::All16(0xD800)))) break;
    }
    while (text != end && !String::detail::IsSurrogate(*text)) ++text;
    return text;
}

// Takes one character off the text; false at a surrogate that has no other half.
// Intended (xml-pair-written): a pair is taken as 0 or 1 and not as its character, which a textbook would write.
// Readers of these files know them that way.
bool TakeCharacter(ulong32& character, const wchar_t*& text, const wchar_t* end) {
    const std::size_t units = String::detail::Utf16Sequence(text, static_cast<std::size_t>(end - text));
    if (units == 0) return false;
    character = units == 1 ? *text : String::detail::PairValue(text[0], text[1]);
    text += units;
    return true;
}

} // namespace

_CXMLOut::_CXMLOut() noexcept : m_buffer(static_cast<unsigned char*>(Platform::Allocate(kBufferSize))) {}
_CXMLOut::~_CXMLOut() { Platform::Release(m_buffer); }

bool _CXMLOut::Begin(eXMLEncoding encoding, bool pretty) {
    m_failed = true;
    if (!m_buffer || encoding < XMLEncodingUTF8 || encoding > XMLEncodingUTF16Raw) return false;
    m_pretty = m_atLineStart = pretty;
    m_level = 0;
    m_free = kBufferSize;
    m_encoding = encoding;
    const bool written = encoding == XMLEncodingUTF8 ? Put("<?xml version=\"1.0\" encoding=\"UTF-8\"?>")
                                                     : Put("<?xml version=\"1.0\" encoding=\"UTF-16\"?>");
    if (!written) return false;
    m_failed = false;
    EndLine();
    return !m_failed;
}

template <bool escapes, std::size_t before, std::size_t behind>
TAVO_INLINE bool _CXMLOut::Compose(const char (&prefix)[before], const wchar_t* text, std::size_t count,
                                   const char (&suffix)[behind]) {
    constexpr std::size_t kMarkup = before + behind - 2;
    if (m_encoding != XMLEncodingUTF8 || m_free < count + kMarkup) return false;
    unsigned char* target = Target() + (before - 1);
    if (!NarrowWhole<escapes>(target, text, count)) return false;
    std::memcpy(target - (before - 1), prefix, before - 1);
    std::memcpy(target + count, suffix, behind - 1);
    m_free -= count + kMarkup;
    return true;
}

template <std::size_t before, std::size_t behind>
TAVO_INLINE bool _CXMLOut::Put(const char (&prefix)[before], const wchar_t* text, std::size_t count,
                               const char (&suffix)[behind]) {
    if (TAVO_UNLIKELY(m_atLineStart) && !PutIndentation()) return false;
    return Compose<false>(prefix, text, count, suffix) ||
           (EncodeMarkup(prefix, before - 1) && Encode(text, count) && EncodeMarkup(suffix, behind - 1));
}

template <std::size_t behind>
TAVO_INLINE bool _CXMLOut::PutIfPlain(const wchar_t* text, std::size_t count, const char (&suffix)[behind]) {
    return !m_atLineStart && Compose<true>("", text, count, suffix);
}

TAVO_NOINLINE bool _CXMLOut::EncodeMarkup(const char* markup, std::size_t count) {
    wchar_t text[64];
    for (std::size_t i = 0; i < count; ++i) text[i] = static_cast<wchar_t>(markup[i]);
    return Encode(text, count);
}

bool _CXMLOut::Write(const wchar_t* text, std::size_t count) { return Put(text, count); }

bool _CXMLOut::EndLine() {
    if (!m_pretty) return true;
    if (!Put("\r\n")) SetFailed(); // not told here; the mark voids the result
    m_atLineStart = true;
    return true;
}

bool _CXMLOut::PutIndentation() {
    static constexpr wchar_t kBlanks[] = L"                                                                ";
    constexpr std::size_t kMost = std::size(kBlanks) - 1;
    static_assert(kMost == 64);
    m_atLineStart = false;
    std::size_t levels = m_level;
    for (; levels > kMost / 2; levels -= kMost / 2)
        if (!Encode(kBlanks, kMost)) return false;
    return Encode(kBlanks, levels * 2);
}

bool _CXMLOut::Encode(const wchar_t* text, std::size_t count) {
    switch (m_encoding) {
    case XMLEncodingUTF8:
        return EncodeUtf8(text, text + count);
    case XMLEncodingUTF16:
        return EncodeUtf16(text, text + count);
    case XMLEncodingUTF16Raw:
        return CopyUnits(text, text + count);
    default:
        return false;
    }
}

// Encodes in the room that is left, which a character may cross: it then goes out byte by byte.
// Intended (xml-ffff): on that path FFFF takes four bytes, where a textbook encodes it in three as everywhere else.
// Files compared byte by byte would differ.
bool _CXMLOut::PutCharacter(ulong32 character) {
    if (m_free == 0 && !Flush()) return false;
    unsigned char bytes[kLongest];
    unsigned char* end = bytes;
    if (m_free < kLongest && character == 0xFFFF) {
        for (unsigned char byte : {0xF0, 0x8F, 0xBF, 0xBF}) *end++ = byte;
    } else {
        String::detail::EncodeUtf8(end, character);
    }
    for (const unsigned char* byte = bytes; byte != end; ++byte) {
        if (m_free == 0 && !Flush()) return false;
        *Target() = *byte;
        --m_free;
    }
    return true;
}

bool _CXMLOut::EncodeUtf8(const wchar_t* text, const wchar_t* end) {
    constexpr std::size_t kFew = 8; // characters, which are encoded sooner one by one
    while (text != end) {
        const std::size_t ascii = NarrowAscii(Target(), text, std::min(static_cast<std::size_t>(end - text), m_free));
        text += ascii;
        m_free -= ascii;
        // What can be encoded at once, none of it where fewer than four bytes are left: that is for PutCharacter.
        const std::size_t fitting = m_free > 0 ? (m_free - 1) / 3 : 0;
        const std::size_t whole = std::min(static_cast<std::size_t>(end - text), fitting);
        unsigned char* target = Target();
        ulong32 character;
        if (whole > kFew) {
            const String::detail::Extent good = String::detail::MeasureUtf16(text, whole);
            String::detail::ConvertUtf16(text, good, target);
            text += good.source;
            m_free -= good.target;
            if (good.ending == String::detail::Ending::Invalid) return false;
            continue;
        }
        while (text != end && *text >= 0x80 && target <= m_buffer + kBufferSize - kLongest) {
            if (!TakeCharacter(character, text, end)) return false;
            String::detail::EncodeUtf8(target, character);
        }
        m_free = static_cast<std::size_t>(m_buffer + kBufferSize - target);
        if (text != end && m_free < kLongest && (!TakeCharacter(character, text, end) || !PutCharacter(character)))
            return false;
    }
    return true;
}

bool _CXMLOut::EncodeUtf16(const wchar_t* text, const wchar_t* end) {
    while (text != end) {
        const wchar_t* surrogate = FindSurrogate(text, end);
        if (!CopyUnits(text, surrogate)) return false;
        text = surrogate;
        ulong32 character;
        if (text == end) break;
        if (!TakeCharacter(character, text, end)) return false;
        const wchar_t unit = static_cast<wchar_t>(character);
        if (!CopyUnits(&unit, &unit + 1)) return false;
    }
    return true;
}

bool _CXMLOut::CopyUnits(const wchar_t* text, const wchar_t* end) {
    while (text != end) {
        if (m_free == 0 && !Flush()) return false;
        const std::size_t count = std::min(static_cast<std::size_t>(end - text), m_free / sizeof(wchar_t));
        std::memcpy(Target(), text, count * sizeof(wchar_t));
        m_free -= count * sizeof(wchar_t);
        text += count;
    }
    return true;
}

// --- Targets -------------------------------------------------------------------------------------------------------

_CFileOut::_CFileOut(const wchar_t* path) noexcept : m_path(path) {
    using namespace Files::OS;
    m_isOpen = m_file.Open(path, FileAccessWrite, OpenFileCreate | OpenFileTruncate);
}

_CFileOut::~_CFileOut() {
    if (m_isOpen) Discard();
}

// Intended (xml-write-replaces): a file that stood at the path is gone by now, where a textbook would write beside it
// and rename. Hosts that look for the file after a failure would notice.
void _CFileOut::Discard() {
    m_isOpen = false;
    m_file.Close();
    Files::OS::CFile::DeleteFileW(m_path);
}

bool _CFileOut::Flush() {
    const auto size = static_cast<ulong32>(BufferedSize());
    ulong32 written = 0;
    if (size && (!m_file.Write(Buffered(), size, &written) || written != size)) return false;
    EmptyBuffer();
    return true;
}

bool _CFileOut::Finish() {
    if (!m_isOpen) return false;
    if (HasFailed() || !Flush()) {
        Discard();
        return false;
    }
    m_isOpen = false;
    return m_file.Close();
}

namespace {
constexpr double kMostGrowth = 16;
} // namespace

bool _CMemOut::Grow(std::size_t capacity) {
    tagCPOMEMHEADER*& block = Block::RefOf(m_collected);
    auto* grown = block ? static_cast<tagCPOMEMHEADER*>(Platform::Reallocate(block, sizeof(*block) + capacity))
                        : Block::NewBlock(capacity, 0, &Buffers::CPPlainMemory::_vtbl);
    if (!grown) return false;
    block = grown;
    block->sAllocated = capacity;
    return true;
}

bool _CMemOut::Flush() {
    const std::size_t size = BufferedSize();
    tagCPOMEMHEADER*& block = Block::RefOf(m_collected);
    const std::size_t used = block ? block->sUsed : 0, needed = used + size;
    if (!block || block->sAllocated < needed) {
        // As much as the whole text will take if it goes on as it began, within reason: moving a large text costs as
        // much as writing it.
        const double expected = static_cast<double>(needed) * 1.03 / GetDone();
        const double most = static_cast<double>(needed) * kMostGrowth;
        const std::size_t capacity =
            std::max(std::max(needed, used * 2), static_cast<std::size_t>(std::min(expected, most)));
        if (!Grow(capacity) && !Grow(needed)) return false;
    }
    // NOLINTNEXTLINE(clang-analyzer-core.NonNullParamChecker): growing has made a block
    std::memcpy(reinterpret_cast<unsigned char*>(block + 1) + used, Buffered(), size);
    block->sUsed = needed;
    EmptyBuffer();
    return true;
}

bool _CMemOut::Finish(Buffers::CPPlainMemory& out) {
    if (HasFailed() || !Put(L"", 1) || !Flush()) {
        m_collected.free();
        out.free();
        return false;
    }
    tagCPOMEMHEADER*& block = Block::RefOf(m_collected);
    if (block->sAllocated != block->sUsed) {
        void* trimmed = Platform::Reallocate(block, sizeof(*block) + block->sUsed);
        if (trimmed) block = static_cast<tagCPOMEMHEADER*>(trimmed); // else it stays as large as it is
        if (trimmed) block->sAllocated = block->sUsed;
    }
    out = m_collected;
    m_collected.free();
    return true;
}

// --- The element writer --------------------------------------------------------------------------------------------

namespace {

using namespace detail;

bool MustEscape(wchar_t unit) { return IsAsciiClass(unit, kEscapeBit); }

// The first of & < > " '.
const wchar_t* FindEscape(const wchar_t* text, const wchar_t* end) {
    for (; end - text >= static_cast<std::ptrdiff_t>(kUnitsPerBlock); text += kUnitsPerBlock)
        if (HasEscape(Simd::Load(text))) break;
    while (text != end && !MustEscape(*text)) ++text;
    return text;
}

// The '>' of the next "]]>".
const wchar_t* FindSectionEnd(const wchar_t* text, const wchar_t* end) {
    for (std::ptrdiff_t brackets = 0; text != end; ++text) {
        if (*text == L'>' && brackets >= 2) return text;
        brackets = *text == L']' ? brackets + 1 : 0;
    }
    return end;
}

struct TextRange {
    explicit TextRange(const CPPoolString& text) : first(text), end(first + String::UnitsOf(text)) {}
    std::size_t Count() const { return static_cast<std::size_t>(end - first); }
    const wchar_t* first;
    const wchar_t* end;
};

// An element whose children are being written. It has what its end takes: by then a node of a deep tree is out of the
// caches.
struct Frame {
    tagCPOMEMHEADER* name;
    const CPXMLObject* first;
    const CPXMLObject* next;
    const CPXMLObject* end;
};

class ElementWriter final : _IProgress {
public:
    explicit ElementWriter(_CXMLOut& out) : m_out(out) { out.SetProgress(this); }
    ElementWriter(const ElementWriter&) = delete;
    ElementWriter& operator=(const ElementWriter&) = delete;
    ~ElementWriter() { m_out.SetProgress(nullptr); }

    bool Run(const CPXMLObject& element) {
        if (!Open(element)) return false;
        // Every element above the current one is on the path, its tag open.
        while (!m_path.Empty()) {
            Frame& last = m_path.Last();
            if (last.next != last.end) {
                const CPXMLObject& child = *last.next++;

                if (!Open(child)) return false;
                continue;
            }
            tagCPOMEMHEADER* name = last.name;
            m_path.Pop();
            if (!Close(name)) return false;
        }
        return true;
    }

private:
    // The children of an element take equal shares of it. Only children tell nothing, however many follow each other.
    double GetDone() const override {
        double done = 0, share = 1;
        int levels = 4096;
        m_path.ForEach([&](const Frame& frame) {
            const auto children = static_cast<double>(frame.end - frame.first);
            const auto left = static_cast<double>(frame.end - frame.next);
            if (children == 0) return false;
            share /= children;
            done += share * (children - left - 1); // the next one after that which is being written
            return share >= 1e-3 && --levels > 0;
        });
        return std::max(done, 1e-3);
    }

    static bool IsContainer(const wchar_t* name) { return *name == L'<'; }

    // Writes an element up to its first child, or all of it when it has none.
    bool Open(const CPXMLObject& element) {
        if (!IsLive(element) || !NodeOf(element).name.isdef()) return false;
        const Node& node = NodeOf(element);
        if (node.contentKind == kInstruction) return PutInstruction(node);
        if (IsContainer(node.name)) return Descend(node);
        if (!Put("<", node.name, "") || !PutAttributes(node)) return false;
        switch (node.contentKind) {
        case kNothing:
            return m_out.Put("/>") && m_out.EndLine();
        case kElements:
            if (!m_out.Put(">") || !m_out.EndLine()) return false;
            m_out.Indent();
            return Descend(node);
        case kData:
            return m_out.Put(">") && PutData(node) && PutEndTag(String::PoolAccess::Block(node.name));
        default:
            // Intended (xml-mixed-content): children and data together, which a textbook writes, would not read back.
            return false;
        }
    }

    bool Close(tagCPOMEMHEADER* name) {
        if (IsContainer(String::EntryOf(name).text)) return true;
        m_out.Outdent();
        return PutEndTag(name);
    }

    bool Descend(const Node& node) {
        const CPXMLObject* first = Elements::First(node.elements);
        const CPXMLObject* end = first + Elements::Count(node.elements);
        return m_path.Push({String::PoolAccess::Block(node.name), first, first, end});
    }

    template <std::size_t before, std::size_t behind>
    bool Put(const char (&prefix)[before], const CPPoolString& text, const char (&suffix)[behind]) {
        return m_out.Put(prefix, text, String::UnitsOf(text), suffix);
    }

    bool PutEndTag(tagCPOMEMHEADER* name) {
        return m_out.Put("</", String::EntryOf(name).text, String::UnitsOf(name), ">") && m_out.EndLine();
    }

    bool PutInstruction(const Node& node) {
        return node.data.isdef() && Put("<?", node.name, " ") && Put("", node.data, "?>");
    }

    bool PutAttributes(const Node& node) {
        const Attribute* attribute = Attributes::First(node.attributes);
        for (std::size_t left = Attributes::Count(node.attributes); left; --left, ++attribute) {
            if (!Put(" ", attribute->name, "=\"")) return false;
            const TextRange value(attribute->value);
            if (!m_out.PutIfPlain(value.first, value.Count(), "\"") && !PutEscaped(value)) return false;
        }
        return true;
    }

    TAVO_NOINLINE bool PutEscaped(const TextRange& value) {
        for (const wchar_t* text = value.first;;) {
            const wchar_t* escape = FindEscape(text, value.end);
            if (!PutRange(text, escape)) return false;
            if (escape == value.end) return m_out.Put("\"");
            if (!PutReference(*escape)) return false;
            text = escape + 1;
        }
    }

    bool PutReference(wchar_t unit) {
        switch (unit) {
        case L'&':
            return m_out.Put("&amp;");
        case L'<':
            return m_out.Put("&lt;");
        case L'>':
            return m_out.Put("&gt;");
        case L'"':
            return m_out.Put("&quot;");
        default:
            return m_out.Put("&apos;");
        }
    }

    bool PutData(const Node& node) {
        const TextRange range(node.data);
        return m_out.PutIfPlain(range.first, range.Count(), "") || PutSections(range);
    }

    // Data with a character that needs escaping goes out literally, in as many CDATA sections as it takes.
    TAVO_NOINLINE bool PutSections(const TextRange& range) {
        if (FindEscape(range.first, range.end) == range.end) return PutRange(range.first, range.end);
        for (const wchar_t* text = range.first; text != range.end;) {
            const wchar_t* sectionEnd = FindSectionEnd(text, range.end);
            if (!m_out.Put("<![CDATA[", text, static_cast<std::size_t>(sectionEnd - text), "]]>")) return false;
            text = sectionEnd;
        }
        return true;
    }

    bool PutRange(const wchar_t* first, const wchar_t* end) {
        return m_out.Put(first, static_cast<std::size_t>(end - first));
    }

    _CXMLOut& m_out;
    Stack<Frame> m_path; // down to the current element
};

} // namespace

bool WriteElement(const CPXMLObject& element, _CXMLOut& out) noexcept { return ElementWriter(out).Run(element); }

namespace {

void WriteDocument(const CPXMLObject& element, _CXMLOut& out, eXMLEncoding encoding, bool pretty) {
    if (encoding == XMLEncodingAutomatic) encoding = XMLEncodingUTF8;
    if (!out.Begin(encoding, pretty) || !WriteElement(element, out)) out.SetFailed();
}

} // namespace

bool CPXMLObject::Write(const wchar_t* path, eXMLEncoding encoding, bool pretty) const noexcept {
    _CFileOut out(path);
    if (!out.IsOpen()) return false;
    WriteDocument(*this, out, encoding, pretty);
    return out.Finish();
}

bool CPXMLObject::Write(Buffers::CPPlainMemory& out, eXMLEncoding encoding, bool pretty) const noexcept {
    _CMemOut target;
    WriteDocument(*this, target, encoding, pretty);
    return target.Finish(out);
}

} // namespace TAVO::XML
