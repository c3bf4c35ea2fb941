#include "document.h"

#include "streams.h"

#include <iterator>
#include <TAVO/string.h>

namespace tool {

namespace {

constexpr std::size_t kTerminator = 4; // zero bytes behind the text
constexpr std::uint32_t kBadUtf8 = 13;

struct ErrorRow {
    const char* title; // the library's
    const char* meaning;
};

// By code.
constexpr ErrorRow kErrors[] = {
    {"Bad file", "this is no text that could be XML: it is empty, or its first bytes fit no encoding"},
    {"End of file", "the text ends before its last element or declaration does, or holds nothing but blanks"},
    {"Open comment", "this comment has no end; outside elements a quotation mark or apostrophe in a comment hides "
                     "what follows"},
    {"Open string", "this quoted text has no end; outside elements every apostrophe in a comment begins one"},
    {"Open enclosure", "a tag lacks its closing '>' here"},
    {"Invalid tag",
     "this cannot stand here: a tag begins with '<' and a name, text belongs into an element, and outside "
     "elements a comment ends at its first '>'"},
    {"Bad attribute", "an attribute is name=\"value\", in quotes, and each name stands once in a tag"},
    {"Bad escape", "a character reference is decimal, like &#233; for a letter; hexadecimal ones (&#x...) are never "
                   "read, nor are characters outside XML's ranges or references without their ';'"},
    {"External replacement", "a reference names something outside the document"},
    {"Open CDATA section", "this CDATA section lacks its ']]>'"},
    {"Bad data terminator", "']]>' stands in plain text; it may only end a CDATA section"},
    {"Version != 1.0", "the declaration names a version of XML other than 1.0"},
    {"Unsupported encoding specified", "the declaration names an encoding that does not fit: UTF-8 for text in bytes; "
                                       "UTF-16, ISO-10646-UCS-2 or Unicode for text in 16-bit units"},
    {"Bad character encoding", "these bytes are no UTF-8; the text may be in another encoding, such as Latin-1"},
    {"Bad termination tag", "this end tag does not match the element that is open, or none is open"},
    {"Mixed content", "an element holds either text or elements, and not both"},
    {"Illegal character",
     "a character cannot be kept: the byte sequence is not allowed, a surrogate stands alone, or it "
     "lies above U+FFFFF"},
    {"Root element missing", "a second element stands beside the root; a document has one"},
    {"DOM error", "the tree could not be built: memory is out, or a name cannot be kept"},
};
constexpr ErrorRow kNoElement = {"No element", "the text is well-formed so far and holds no element at all"};
constexpr std::uint32_t kOpened = 128; // the library's code for success

bool IsBlank(unsigned char c) { return c == ' ' || c == '\t' || c == '\r' || c == '\n'; }
bool CanStart(unsigned char c) { return c == '<' || IsBlank(c); }

} // namespace

int Document::Open(const std::string& name) {
    m_name = name == "-" ? "(standard input)" : name;
    m_root = CPXMLObject();
    m_error = ReadError();
    std::string trouble;
    if (!ReadAll(name, m_bytes, trouble)) {
        Complain(m_name + ": " + trouble);
        return kFileTrouble;
    }
    m_size = m_bytes.size();
    m_bytes.append(kTerminator, '\0');
    FindForm();

    TAVO::XML::CXMLDoc document;
    // The size of two zero bytes counts, as it does for files that the library reads itself.
    const bool read = document.OpenDocText(m_bytes.data(), m_size + 2);
    m_root = document.GetRootElement();
    if (read && m_root) return kFine;
    if (read) {
        m_error.code = kOpened;
        m_error.title = kNoElement.title;
        m_error.meaning = kNoElement.meaning;
        FindPlace(Units());
        return kBadInput;
    }
    SetError(document);
    return kBadInput;
}

int Document::Need(const std::string& name) {
    const int code = Open(name);
    if (code == kBadInput) Complain(Describe());
    return code;
}

CPXMLObject Document::Parse() const {
    TAVO::XML::CXMLDoc document;
    document.OpenDocText(const_cast<char*>(m_bytes.data()), m_size + 2); // which does not change the bytes
    return document.GetRootElement();
}

std::string Document::Describe() const {
    std::string text = m_name + ':' + std::to_string(m_error.line) + ':' + std::to_string(m_error.column) + ": error " +
                       std::to_string(m_error.code) + " (" + m_error.title + ") at offset " +
                       std::to_string(m_error.offset) + ": " + m_error.meaning;
    if (!m_error.excerpt.empty()) text += "\n    " + m_error.excerpt;
    return text;
}

// The library's rule for texts of unknown encoding, so that places are counted in its units.
void Document::FindForm() {
    const auto first = static_cast<unsigned char>(m_bytes[0]);
    const auto second = static_cast<unsigned char>(m_bytes[1]);
    m_form = Form::Utf8;
    if ((first == 0xFF && second == 0xFE) || (CanStart(first) && second == 0 && m_size > 1)) m_form = Form::Utf16;
    if ((first == 0xFE && second == 0xFF) || (first == 0 && CanStart(second))) m_form = Form::Utf16Swapped;
}

std::uint32_t Document::Unit(std::size_t index) const {
    const auto byte = [&](std::size_t at) {
        return static_cast<std::uint32_t>(static_cast<unsigned char>(m_bytes[at]));
    };
    switch (m_form) {
    case Form::Utf16:
        return byte(2 * index) | byte(2 * index + 1) << 8;
    case Form::Utf16Swapped:
        return byte(2 * index) << 8 | byte(2 * index + 1);
    default:
        return byte(index);
    }
}

void Document::SetError(TAVO::XML::CXMLDoc& document) {
    unsigned long long offset = 0;
    TAVO::String::CACFWChar message;
    m_error.code = document.GetErrorInfo(&offset, &message);
    const bool known = m_error.code < std::size(kErrors);
    m_error.title = known ? kErrors[m_error.code].title : "Unknown error";
    m_error.meaning = known ? kErrors[m_error.code].meaning : "";
    if (m_error.code == 0) return;
    // The library tells no place for bad UTF-8: it checks the whole text before it reads.
    if (m_error.code == kBadUtf8) return FindPlace(FindBadSequence());
    const std::string text = Shown(message, PairsKept());
    const auto header = text.find(']'); // "[title, Line 1, Offset 2]", then the excerpt
    if (header != text.npos) m_error.excerpt = text.substr(header + 1);
    FindPlace(static_cast<std::size_t>(offset));
}

void Document::FindPlace(std::size_t offset) {
    if (offset > Units()) offset = Units();
    m_error.offset = offset;
    for (std::size_t i = 0; i < offset; ++i) {
        const std::uint32_t unit = Unit(i);
        if (unit == '\n') {
            ++m_error.line;
            m_error.column = 1;
            continue;
        }
        const bool continues = IsUtf16() ? unit >= 0xDC00 && unit < 0xE000 : (unit & 0xC0) == 0x80;
        const bool mark = IsUtf16() ? i == 0 && unit == 0xFEFF : i == 0 && m_bytes.compare(0, 3, "\xEF\xBB\xBF") == 0;
        if (!continues && !mark) ++m_error.column;
    }
}

std::size_t Document::FindBadSequence() const {
    const auto* bytes = reinterpret_cast<const unsigned char*>(m_bytes.data());
    for (std::size_t i = 0; i < m_size;) {
        const std::size_t length = TAVO::String::UTF8Len(bytes[i]);
        if (length == 0) return i;
        for (std::size_t k = 1; k < length; ++k)
            if ((bytes[i + k] & 0xC0) != 0x80) return i; // the zero bytes behind the text stop this
        i += length;
    }
    return m_size;
}

bool Document::StartsWith(std::size_t index, std::string_view ascii) const {
    if (Units() - index < ascii.size()) return false;
    for (std::size_t i = 0; i < ascii.size(); ++i)
        if (Unit(index + i) != static_cast<unsigned char>(ascii[i])) return false;
    return true;
}

std::size_t Document::SkipBehind(std::size_t index, std::string_view ascii) const {
    while (index < Units() && !StartsWith(index, ascii)) ++index;
    return index;
}

std::size_t Document::CountNamedReferences() const {
    std::size_t count = 0;
    for (std::size_t i = 0; i < Units(); ++i) {
        const std::uint32_t unit = Unit(i);
        if (unit == '<' && StartsWith(i, "<!--")) i = SkipBehind(i, "-->");
        if (unit == '<' && StartsWith(i, "<![CDATA[")) i = SkipBehind(i, "]]>");
        if (unit == '&' && !StartsWith(i, "&#")) ++count;
    }
    return count;
}

void Document::NoteNamedReferences() const {
    const std::size_t count = CountNamedReferences();
    if (count == 0) return;
    Complain(m_name + ": note: " + Grouped(count) + (count == 1 ? " reference" : " references") +
             " by name, such as &amp;: the library reads &lt; as '>' and every other one as '<', skipping three "
             "characters; CDATA sections carry such characters unchanged");
}

} // namespace tool
