#pragma once
// A second reader of documents, slow and plain, written from the rules: the parser is compared with it.

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <optional>
#include <sstream>
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
    // A blank of the source, or the units of a character.
    struct Token {
        bool blank;
        std::u16string units;
    };
    using Attributes = std::vector<std::pair<std::u16string, std::u16string>>;
    static constexpr char32_t kNone = 0xFFFFFFFF;

    XmlReference(const std::u32string& text, bool utf8) : m_text(text), m_utf8(utf8) {}

    Reading Read() {
        Reading reading;
        if (m_utf8 && !IsValid()) {
            reading.code = 13;
            reading.message = u"Offset: 0, Illegal UTF8 character";
            return reading;
        }
        try {
            Document();
            if (m_root) reading.outline = Outline(*m_root);
        } catch (const Error& error) {
            reading.code = error.code;
            reading.offset = error.offset;
            reading.message = Message(error);
        }
        return reading;
    }

    // --- units and characters ---

    std::size_t Size() const { return m_text.size(); }
    char32_t At(std::size_t i) const { return i < Size() ? m_text[i] : kNone; }
    bool Is(const char* what, std::size_t at) const {
        for (; *what; ++what, ++at)
            if (At(at) != static_cast<unsigned char>(*what)) return false;
        return true;
    }
    bool Is(const char* what) const { return Is(what, m_at); }
    bool AtEnd() const { return m_at >= Size(); }
    static bool Blank(char32_t c) { return c == ' ' || c == '\t' || c == '\r' || c == '\n'; }
    void Blanks() {
        while (Blank(At(m_at))) ++m_at;
    }

    static std::size_t Utf8Length(char32_t lead) {
        return lead < 0x80 ? 1 : lead < 0xC0 ? 0 : lead < 0xE0 ? 2 : lead < 0xF0 ? 3 : lead < 0xF5 ? 4 : 0;
    }
    // Units of the good character there, 0 for none.
    std::size_t Length(std::size_t at) const {
        const char32_t c = At(at);
        if (c == kNone) return 0;
        if (!m_utf8) {
            if (c < 0xD800 || c > 0xDFFF) return 1;
            return c < 0xDC00 && At(at + 1) != kNone && At(at + 1) >= 0xDBFF ? 2 : 0;
        }
        const std::size_t length = Utf8Length(c);
        for (std::size_t i = 1; i < length; ++i)
            if (At(at + i) == kNone || (At(at + i) & 0xC0) != 0x80) return 0;
        return length;
    }
    // Past that character, or that unit of none.
    std::size_t Step(std::size_t at) const { return Length(at) ? Length(at) : 1; }
    bool IsValid() const {
        std::size_t at = 0;
        while (Length(at)) at += Length(at);
        return at == Size();
    }
    char32_t Value(std::size_t at) const {
        const std::size_t length = m_utf8 ? Length(at) : 1;
        if (length == 1) return At(at);
        char32_t value = At(at) & (0xFFu >> (length + 1));
        for (std::size_t i = 1; i < length; ++i) value = value << 6 | (At(at + i) & 0x3F);
        return value;
    }
    // The library's own form of a character.
    static std::u16string Wide(char32_t value) {
        if (value < 0x10000) return std::u16string(1, static_cast<char16_t>(value));
        return {static_cast<char16_t>(0xD800 | value >> 10), static_cast<char16_t>(0xDC00 | (value & 0x3FF))};
    }
    // The units that the character there becomes; none of what is no character.
    std::u16string UnitsAt(std::size_t at, char32_t limit = 0x110000) const {
        const std::size_t length = Length(at);
        if (!m_utf8)
            return std::u16string(m_text.begin() + std::ptrdiff_t(at), m_text.begin() + std::ptrdiff_t(at + length));
        const char32_t value = Value(at);
        const bool isNone = !length || !value || value >= limit || (value >= 0xD800 && value <= 0xDFFF);
        return isNone ? std::u16string() : Wide(value);
    }

    // --- document ---

    void Document() {
        if (m_utf8 && Is("\xEF\xBB\xBF")) m_at = 3;
        if (!m_utf8 && At(0) == 0xFEFF) m_at = 1;
        Blanks();
        if (AtEnd()) throw Error{1, Size()};
        for (; Blanks(), !AtEnd();) {
            if (At(m_at) != '<') throw Error{5, m_at};
            if (m_at + 1 == Size()) throw Error{4, Size()};
            if (Is("<!")) {
                Declaration();
            } else if (Is("<?")) {
                Instruction(true);
            } else if (Is("</")) {
                throw m_at + 2 == Size() ? Error{4, Size()} : Error{14, m_at};
            } else {
                if (m_root) throw Error{17, m_at};
                m_root = Element(0);
            }
        }
    }

    void Declaration() {
        const std::size_t start = m_at;
        const bool comment = Is("<!--");
        m_at += 2;
        while (!AtEnd() && At(m_at) != '>') {
            const char32_t quote = At(m_at);
            const std::size_t end = quote == '"' || quote == '\'' ? m_text.find(quote, m_at + 1) : m_at;
            if (end == m_text.npos) throw Error{3, m_at};
            m_at = end + 1;
        }
        if (AtEnd()) throw comment ? Error{2, start} : Error{1, Size()};
        ++m_at;
    }

    std::size_t Find(const char* what, std::size_t from) const {
        while (from < Size() && !Is(what, from)) ++from;
        return from;
    }

    void Comment() {
        const std::size_t end = Find("-->", m_at + 4);
        if (end == Size()) throw Error{2, m_at};
        m_at = end + 3;
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
            if (key != u"encoding") continue;
            std::u16string lower;
            for (char16_t c : value) lower += c >= 'A' && c <= 'Z' ? static_cast<char16_t>(c + 32) : c;
            const bool known =
                m_utf8 ? lower == u"utf-8" : lower == u"utf-16" || lower == u"iso-10646-ucs-2" || lower == u"unicode";
            if (!known) throw Error{12, start};
        }
    }

    // --- tags ---

    static bool Names(char32_t c, bool first) {
        if (c < 0x80) {
            const bool start = (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_' || c == ':';
            return start || (!first && ((c >= '0' && c <= '9') || c == '.' || c == '-'));
        }
        if (c > 0xFFFF || (c >= 0xD800 && c <= 0xDFFF)) return false;
        const wchar_t text[] = {first ? static_cast<wchar_t>(c) : L'a', first ? L'\0' : static_cast<wchar_t>(c), 0};
        TAVO::XML::CPXMLObject element;
        return element.SetName(TAVO::String::CStringPool::GetStringRef(text));
    }

    // The name at the cursor; nothing of it is the given error, at the end of the text 4.
    std::u16string Name(unsigned missing) {
        if (AtEnd()) throw Error{4, Size()};
        std::u16string name;
        for (;;) {
            const std::size_t length = Length(m_at);
            if (!length || (length > 1 && !m_utf8)) break;
            if (!Names(Value(m_at), name.empty())) break;
            name += UnitsAt(m_at);
            m_at += length;
        }
        if (name.empty()) throw Error{missing, m_at};
        return name;
    }

    // Up to the end of the tag, which stays.
    Attributes ReadAttributes(bool instruction) {
        Attributes attributes;
        for (;;) {
            Blanks();
            const char32_t c = At(m_at);
            if (c == kNone || c == '<') throw Error{4, m_at};
            if (instruction ? Is("?>") : Is("/>") || c == '>') return attributes;
            if (c == (instruction ? U'?' : U'/')) throw Error{4, m_at + 1};
            if (c == '>') throw Error{4, m_at};
            const std::size_t start = m_at;
            const std::u16string name = Name(6);
            Blanks();
            if (AtEnd()) throw Error{4, m_at};
            if (At(m_at) != '=') throw Error{6, m_at};
            ++m_at;
            Blanks();
            const char32_t quote = At(m_at);
            if (quote == kNone) throw Error{4, m_at};
            if (quote != '"' && quote != '\'') throw Error{6, m_at};
            const std::size_t opened = m_at++;
            std::vector<Token> tokens;
            while (At(m_at) != quote) {
                if (AtEnd()) throw Error{3, opened};
                Piece(tokens);
            }
            ++m_at;
            for (const auto& kept : attributes)
                if (kept.first == name) throw Error{6, start};
            const std::u16string value = Text(tokens);
            if (!value.empty()) attributes.emplace_back(name, value);
        }
    }

    PlainElement Element(int depth) {
        if (depth > 200) throw TooDeep();
        PlainElement element;
        ++m_at;
        element.name = Name(5);
        element.attributes = ReadAttributes(false);
        if (Is("/>")) {
            m_at += 2;
            return element;
        }
        ++m_at;
        bool hadData = false;
        for (;;) {
            Blanks();
            if (AtEnd()) throw Error{1, Size()};
            const bool text = At(m_at) != '<' || Is("<![CDATA[");
            if (text && (hadData || !element.children.empty())) throw Error{15, m_at};
            if (text) {
                element.data = Data();
                hadData = true;
            } else if (Is("<!--")) {
                Comment();
            } else if (Is("<!")) {
                Declaration();
            } else if (Is("<?")) {
                Instruction(false);
            } else if (Is("</")) {
                EndTag(element.name, hadData ? 15 : 14);
                return element;
            } else {
                if (m_at + 1 == Size()) throw Error{4, Size()};
                if (hadData) throw Error{15, m_at};
                element.children.push_back(Element(depth + 1));
            }
        }
    }

    void EndTag(const std::u16string& name, unsigned wrong) {
        const std::size_t start = m_at;
        m_at += 2;
        if (AtEnd()) throw Error{4, Size()};
        bool same = false;
        try {
            same = Name(14) == name;
        } catch (const Error&) {
        }
        if (!same) throw Error{wrong, start};
        Blanks();
        if (At(m_at) != '>') throw Error{4, m_at};
        ++m_at;
    }

    // --- text ---

    std::u16string Data() {
        std::vector<Token> tokens;
        for (;;) {
            if (AtEnd()) throw Error{1, Size()};
            if (Is("<![CDATA[")) {
                const std::size_t start = m_at, end = Find("]]>", m_at + 9);
                if (end == Size()) throw Error{9, start};
                for (m_at += 9; m_at < end;) Character(tokens);
                m_at = end + 3;
            } else if (Is("<!--")) {
                Comment();
            } else if (Is("<!")) {
                Declaration();
            } else if (Is("<")) {
                return Text(tokens);
            } else if (Is("]]>")) {
                throw Error{10, m_at};
            } else {
                Piece(tokens);
            }
        }
    }

    // Blanks at both ends go, runs of them become one.
    static std::u16string Text(const std::vector<Token>& tokens) {
        std::size_t first = 0, last = tokens.size();
        while (first < last && tokens[first].blank) ++first;
        while (last > first && tokens[last - 1].blank) --last;
        std::u16string text;
        for (; first < last; ++first)
            if (!tokens[first].blank || !tokens[first - 1].blank) text += tokens[first].units;
        return text;
    }

    void Piece(std::vector<Token>& tokens) {
        if (Blank(At(m_at))) {
            tokens.push_back({true, u" "});
            ++m_at;
        } else if (Is("&")) {
            tokens.push_back({false, Wide(Reference())});
        } else {
            Character(tokens);
        }
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
        for (m_at += 2; At(m_at) >= '0' && At(m_at) <= ':'; ++m_at)
            if (value < 0x200000) value = value * 10 + (At(m_at) - '0');
        const bool allowed = value == 9 || value == 10 || value == 13 || (value >= 0x20 && value <= 0xD7FF) ||
                             (value >= 0xE000 && value <= 0x10FFFF && value != 0xFFFE && value != 0xFFFF);
        if (At(m_at) != ';' || !allowed) throw Error{7, start};
        if (value >= 0x100000) throw Error{16, start};
        ++m_at;
        return static_cast<char32_t>(value);
    }

    void Character(std::vector<Token>& tokens) {
        tokens.push_back({false, UnitsAt(m_at, 0x100000)});
        if (tokens.back().units.empty()) throw Error{16, m_at};
        m_at += Length(m_at);
    }

    // --- the message ---

    std::u16string Message(const Error& error) const {
        std::istringstream texts(
            "Bad file|End of file|Open comment|Open string|Open enclosure|Invalid tag|Bad attribute|"
            "Bad escape|External replacement|Open CDATA section|Bad data terminator|"
            "Version != 1.0|Unsupported encoding specified|Bad character encoding|"
            "Bad termination tag|Mixed content|Illegal character|Root element missing|DOM error");
        std::string text;
        for (unsigned code = 0; code <= error.code; ++code) std::getline(texts, text, '|');
        const auto lines = std::count(m_text.begin(), m_text.begin() + std::ptrdiff_t(error.offset), U'\n');
        const std::string header = "[" + text + ", Line " + std::to_string(lines + 1) + ", Offset " +
                                   std::to_string(error.offset) + (error.offset > 60 ? "]..." : "]");
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
        if (at < Size()) message += u"...";
        return message;
    }

    std::u32string m_text;
    bool m_utf8;
    std::size_t m_at = 0;
    std::optional<PlainElement> m_root;
};

} // namespace support
