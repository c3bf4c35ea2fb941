#pragma once
// A second reader of documents, slow and plain, written from the rules: the parser is compared with it.

#include "texts.h"

#include <algorithm>
#include <cctype>
#include <cstdint>
#include <cstdio>
#include <optional>
#include <set>
#include <string>
#include <TAVO/xml.h>
#include <utility>
#include <vector>

namespace support {

// An element as plain data.
struct PlainElement {
    std::u16string name, data;
    std::vector<std::pair<std::u16string, std::u16string>> attributes;
    std::vector<PlainElement> children;
};

// name attribute='value'(child,child) or name:data; units that are not printable ASCII as \XXXX.
inline std::string Printable(const std::u16string& text) {
    std::string out;
    for (char16_t unit : text) {
        char escaped[8];
        if (unit >= 0x20 && unit < 0x7F)
            out += static_cast<char>(unit);
        else
            std::snprintf(escaped, sizeof(escaped), "\\%04X", unit), out += escaped;
    }
    return out;
}

inline std::string Outline(const PlainElement& element) {
    std::string out = Printable(element.name);
    for (const auto& [name, value] : element.attributes)
        out.append(" ").append(Printable(name)).append("='").append(Printable(value)).append("'");
    if (!element.data.empty()) out.append(":").append(Printable(element.data));
    if (element.children.empty()) return out;
    for (std::size_t i = 0; i < element.children.size(); ++i)
        out.append(i ? "," : "(").append(Outline(element.children[i]));
    return out + ")";
}

inline std::u16string Units(const wchar_t* text) {
    std::u16string units;
    while (text && *text) units += static_cast<char16_t>(*text++);
    return units;
}
inline std::u16string Units(const TAVO::String::CPPoolString& text) { return Units(static_cast<const wchar_t*>(text)); }

inline PlainElement Plain(const TAVO::XML::CPXMLObject& element) {
    PlainElement plain{Units(element.GetName()), Units(element.GetData()), {}, {}};
    TAVO::String::CPPoolString name, value;
    for (std::size_t i = 0; i < element.GetNAttributes(); ++i) {
        element.GetAttribute(i, name, value);
        plain.attributes.emplace_back(Units(name), Units(value));
    }
    std::size_t count = 0;
    const auto* children = element.GetElements(count);
    for (std::size_t i = 0; i < count; ++i) plain.children.push_back(Plain(children[i]));
    return plain;
}

// What reading a text gives.
struct Reading {
    unsigned code = 128;
    std::size_t offset = 0;
    std::string outline; // empty when there is no root
    std::u16string message;

    bool operator==(const Reading& other) const = default;
};

// How CXMLDoc answers for the text that it has opened or refused.
inline Reading ReadingOf(TAVO::XML::CXMLDoc& document) {
    Reading reading;
    unsigned long long offset = 0;
    TAVO::String::CACFWChar message;
    reading.code = static_cast<unsigned>(document.GetErrorInfo(&offset, &message));
    reading.offset = static_cast<std::size_t>(offset);
    reading.message = Units(static_cast<const wchar_t*>(message));
    if (document.GetRootElement().key()) reading.outline = Outline(Plain(document.GetRootElement()));
    return reading;
}

class XmlReference {
public:
    struct TooDeep {};

    // No zero units; a text in UTF-8 or in UTF-16.
    static Reading Read(const std::string& bytes) {
        std::u32string units;
        for (char byte : bytes) units += static_cast<unsigned char>(byte);
        return XmlReference(units, true).Read();
    }
    static Reading Read(const std::u16string& text) {
        return XmlReference(std::u32string(text.begin(), text.end()), false).Read();
    }

private:
    struct Error {
        unsigned code;
        std::size_t offset;
    };
    using Attributes = std::vector<std::pair<std::u16string, std::u16string>>;
    static constexpr char32_t kNone = 0xFFFFFFFF;

    XmlReference(const std::u32string& text, bool utf8) : m_text(text), m_utf8(utf8) {}

    Reading Read() {
        Reading reading;
        try {
            std::size_t at = 0;
            while (m_utf8 && Length(at)) at += Length(at);
            if (m_utf8 && at < Size()) throw Error{13, 0};
            Document();
            if (m_root) reading.outline = Outline(*m_root);
        } catch (const Error& error) {
            reading.code = error.code;
            reading.offset = error.offset;
            reading.message = error.code == 13 ? u"Offset: 0, Illegal UTF8 character" : Message(error);
        }
        return reading;
    }

    // --- units and characters ---

    std::size_t Size() const { return m_text.size(); }
    char32_t At(std::size_t i) const { return i < Size() ? m_text[i] : kNone; }
    char32_t Here() const { return At(m_at); }
    bool Is(const char* what, std::size_t at) const {
        for (; *what; ++what, ++at)
            if (At(at) != static_cast<unsigned char>(*what)) return false;
        return true;
    }
    bool Is(const char* what) const { return Is(what, m_at); }
    bool AtEnd() const { return m_at >= Size(); }
    // The end of the text is this error.
    void NotAtEnd(unsigned code) const {
        if (AtEnd()) throw Error{code, Size()};
    }
    static bool Blank(char32_t c) { return c == ' ' || c == '\t' || c == '\r' || c == '\n'; }
    void Blanks() {
        while (Blank(Here())) ++m_at;
    }

    support::Character CharacterAt(std::size_t at) const {
        return m_utf8 ? LookAtUtf8(m_text, at, Size()) : LookAtUtf16(m_text, at, Size());
    }
    // Units of the good character there, 0 for none.
    std::size_t Length(std::size_t at) const { return CharacterAt(at).units; }
    // Past that character, or that unit of none.
    std::size_t Step(std::size_t at) const { return Length(at) ? Length(at) : 1; }
    // The library's own form of a character.
    static std::u16string Wide(char32_t value) {
        if (value < 0x10000) return std::u16string(1, static_cast<char16_t>(value));
        return {static_cast<char16_t>(0xD800 | value >> 10), static_cast<char16_t>(0xDC00 | (value & 0x3FF))};
    }
    // The units that the character there becomes; none of what is no character.
    std::u16string UnitsAt(std::size_t at, char32_t limit = 0x110000) const {
        const auto [look, length, value] = CharacterAt(at);
        if (!m_utf8)
            return std::u16string(m_text.begin() + std::ptrdiff_t(at), m_text.begin() + std::ptrdiff_t(at + length));
        const bool isNone = !length || !value || value >= limit || (value >= 0xD800 && value <= 0xDFFF);
        return isNone ? std::u16string() : Wide(value);
    }

    // --- document ---

    void Document() {
        if (m_utf8 && Is("\xEF\xBB\xBF")) m_at = 3;
        if (!m_utf8 && At(0) == 0xFEFF) m_at = 1;
        Blanks();
        NotAtEnd(1);
        for (; Blanks(), !AtEnd();) {
            if (Here() != '<') throw Error{5, m_at};
            if (m_at + 1 == Size() || (m_at + 2 == Size() && Is("</"))) throw Error{4, Size()};
            if (Is("</")) throw Error{14, m_at};
            if (Markup(true)) continue;
            if (m_root) throw Error{17, m_at};
            m_root = Element(0);
        }
    }

    // What is not part of the tree: whether there was any.
    bool Markup(bool top) {
        if (!top && Is("<!--")) return Find("-->", 4, 2), true;
        if (Is("<!")) return Declaration(), true;
        if (Is("<?")) return Instruction(top), true;
        return false;
    }

    void Declaration() {
        const std::size_t start = m_at;
        const bool comment = Is("<!--");
        for (m_at += 2; !AtEnd() && Here() != '>'; ++m_at) {
            if (Here() != '"' && Here() != '\'') continue;
            const std::size_t end = m_text.find(Here(), m_at + 1);
            if (end == m_text.npos) throw Error{3, m_at};
            m_at = end;
        }
        if (AtEnd()) throw comment ? Error{2, start} : Error{1, Size()};
        ++m_at;
    }

    // Past the three units that end what begins here with so many; without them, this error. Where they stand.
    std::size_t Find(const char* what, std::size_t opening, unsigned missing) {
        std::size_t end = m_at + opening;
        while (end < Size() && !Is(what, end)) ++end;
        if (end >= Size()) throw Error{missing, m_at};
        m_at = end + 3;
        return end;
    }

    void Instruction(bool top) {
        const std::size_t start = m_at;
        m_at += 2;
        const std::u16string name = Name(5);
        const Attributes attributes = ReadAttributes(true);
        m_at += 2;
        if (!top || name != u"xml") return;
        for (const auto& [key, value] : attributes)
            if (key == u"version" && value != u"1.0") throw Error{11, start};
        for (const auto& [key, value] : attributes) {
            static const std::set<std::string> kKnown[] = {{"utf-16", "iso-10646-ucs-2", "unicode"}, {"utf-8"}};
            std::string lower = Printable(value);
            for (char& c : lower) c = static_cast<char>(std::tolower(c));
            if (key == u"encoding" && !kKnown[m_utf8].count(lower)) throw Error{12, start};
        }
    }

    // --- tags ---

    // As the calls that set names are told; their tests check them.
    static bool Names(char32_t c, bool first) {
        if (c == 0 || c > 0xFFFF || (c >= 0xD800 && c <= 0xDFFF)) return false;
        const wchar_t text[] = {first ? static_cast<wchar_t>(c) : L'a', first ? L'\0' : static_cast<wchar_t>(c), 0};
        return TAVO::XML::CPXMLObject().SetName(TAVO::String::CStringPool::GetStringRef(text));
    }

    // The name at the cursor; nothing of it is the given error, at the end of the text 4.
    std::u16string Name(unsigned missing) {
        NotAtEnd(4);
        std::u16string name;
        while (Length(m_at) && (Length(m_at) == 1 || m_utf8) && Names(CharacterAt(m_at).value, name.empty())) {
            name += UnitsAt(m_at);
            m_at += Length(m_at);
        }
        if (name.empty()) throw Error{missing, m_at};
        return name;
    }

    // Up to the end of the tag, which stays.
    Attributes ReadAttributes(bool instruction) {
        Attributes attributes;
        for (;;) {
            Blanks();
            if (AtEnd() || Here() == '<') throw Error{4, m_at};
            if (instruction ? Is("?>") : Is("/>") || Is(">")) return attributes;
            if (Is(instruction ? "?" : "/")) throw Error{4, m_at + 1};
            if (Is(">")) throw Error{4, m_at};
            const std::size_t start = m_at;
            const std::u16string name = Name(6);
            Blanks();
            NotAtEnd(4);
            if (!Is("=")) throw Error{6, m_at};
            ++m_at;
            Blanks();
            NotAtEnd(4);
            if (!Is("\"") && !Is("'")) throw Error{6, m_at};
            const std::size_t opened = m_at++;
            std::u16string units;
            while (Here() != At(opened)) {
                if (AtEnd()) throw Error{3, opened};
                Piece(units);
            }
            ++m_at;
            for (const auto& kept : attributes)
                if (kept.first == name) throw Error{6, start};
            const std::u16string value = Text(units);
            if (!value.empty()) attributes.emplace_back(name, value);
        }
    }

    PlainElement Element(int depth) {
        if (depth > 200) throw TooDeep();
        PlainElement element;
        ++m_at;
        element.name = Name(5);
        element.attributes = ReadAttributes(false);
        const bool empty = Is("/>");
        m_at += empty ? 2 : 1;
        bool hadData = false;
        while (!empty) {
            Blanks();
            NotAtEnd(1);
            if (!Is("<") || Is("<![CDATA[")) {
                if (hadData || !element.children.empty()) throw Error{15, m_at};
                element.data = Data();
                hadData = true;
            } else if (Is("</")) {
                EndTag(element.name, hadData ? 15 : 14);
                break;
            } else if (!Markup(false)) {
                if (m_at + 1 == Size()) throw Error{4, Size()};
                if (hadData) throw Error{15, m_at};
                element.children.push_back(Element(depth + 1));
            }
        }
        return element;
    }

    void EndTag(const std::u16string& name, unsigned wrong) {
        const std::size_t start = m_at;
        m_at += 2;
        NotAtEnd(4);
        bool same = false;
        try {
            same = Name(14) == name;
        } catch (const Error&) {
        }
        if (!same) throw Error{wrong, start};
        Blanks();
        if (!Is(">")) throw Error{4, m_at};
        ++m_at;
    }

    // --- text ---

    std::u16string Data() {
        std::u16string units;
        for (;;) {
            NotAtEnd(1);
            if (Is("<![CDATA[")) {
                std::size_t at = m_at + 9;
                const std::size_t end = Find("]]>", 9, 9);
                while (at < end) at += Character(units, at);
            } else if (Is("<!")) {
                Markup(false);
            } else if (Is("<")) {
                return Text(units);
            } else if (Is("]]>")) {
                throw Error{10, m_at};
            } else {
                Piece(units);
            }
        }
    }

    // Blanks of the source, zeros here, go at both ends; runs of them become one.
    static std::u16string Text(std::u16string units) {
        units.erase(units.find_last_not_of(u'\0') + 1);
        std::u16string text;
        for (std::size_t i = 0; i < units.size(); ++i)
            if (units[i] || (i && units[i - 1])) text += units[i] ? units[i] : u' ';
        return text;
    }

    void Piece(std::u16string& units) {
        if (Blank(Here()))
            units += u'\0', ++m_at;
        else if (Is("&"))
            units += Wide(Reference());
        else
            m_at += Character(units, m_at);
    }

    char32_t Reference() {
        const std::size_t start = m_at;
        if (!Is("&#")) {
            const char32_t value = Is("&lt;") ? '>' : '<';
            if (start + 4 > Size()) throw Error{1, Size()};
            for (m_at = start + 1; m_at < start + 4;) m_at += Step(m_at);
            if (m_at != start + 4) throw Error{16, start + 4};
            return value;
        }
        std::uint64_t value = 0;
        for (m_at += 2; Here() >= '0' && Here() <= ':'; ++m_at)
            if (value < 0x200000) value = value * 10 + (Here() - '0');
        const bool allowed = value == 9 || value == 10 || value == 13 || (value >= 0x20 && value <= 0xD7FF) ||
                             (value >= 0xE000 && value <= 0x10FFFF && value != 0xFFFE && value != 0xFFFF);
        if (!Is(";") || !allowed) throw Error{7, start};
        if (value >= 0x100000) throw Error{16, start};
        ++m_at;
        return static_cast<char32_t>(value);
    }

    std::size_t Character(std::u16string& units, std::size_t at) const {
        const std::u16string more = UnitsAt(at, 0x100000);
        if (more.empty()) throw Error{16, at};
        units += more;
        return Length(at);
    }

    // --- the message ---

    std::u16string Message(const Error& error) const {
        static const char* const kTexts[] = {"Bad file",
                                             "End of file",
                                             "Open comment",
                                             "Open string",
                                             "Open enclosure",
                                             "Invalid tag",
                                             "Bad attribute",
                                             "Bad escape",
                                             "External replacement",
                                             "Open CDATA section",
                                             "Bad data terminator",
                                             "Version != 1.0",
                                             "Unsupported encoding specified",
                                             "Bad character encoding",
                                             "Bad termination tag",
                                             "Mixed content",
                                             "Illegal character",
                                             "Root element missing"};
        const auto lines = std::count(m_text.begin(), m_text.begin() + std::ptrdiff_t(error.offset), U'\n');
        const std::string header = std::string("[").append(kTexts[error.code]) + ", Line " + std::to_string(lines + 1) +
                                   ", Offset " + std::to_string(error.offset) + (error.offset > 60 ? "]..." : "]");
        std::u16string message(header.begin(), header.end());
        std::size_t at = error.offset > 60 ? error.offset - 60 : 0;
        // What the error position cuts is no character of the excerpt.
        const XmlReference before(m_text.substr(0, error.offset), m_utf8);
        for (; at < error.offset; at += before.Step(at))
            if (!Blank(At(at)))
                message += before.UnitsAt(at);
            else if (!Blank(At(at + 1)) || at + 1 == error.offset)
                message += u' ';
        message += u"[[*]]";
        for (; at < Size() && message.size() < 120; at += Step(at)) message += UnitsAt(at);
        return at < Size() ? message + u"..." : message;
    }

    std::u32string m_text;
    bool m_utf8;
    std::size_t m_at = 0;
    std::optional<PlainElement> m_root;
};

} // namespace support
